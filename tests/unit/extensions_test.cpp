// "-config NAME": merging config.NAME.N arguments into the launcher's own.
#include <gtest/gtest.h>

#include <cstdlib>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

using Strings = std::vector<std::wstring>;

TEST(ExtensionsTest, MergesConfiguredArguments) {
    struct Case {
        Strings argv;
        Strings values;  // config.x.1, config.x.2, ...
        Strings expected;
    } cases[] = {
        {{L"a", L"-config", L"x", L"b", L"-vmargs", L"v"}, {L"-foo", L"-vmargs", L"-Xmx1g"},
         {L"a", L"b", L"-foo", L"-vmargs", L"v", L"-Xmx1g"}},
        {{L"p", L"-config", L"x", L"-vmargs", L"v"}, {L"-a", L"", L"-b"}, {L"p", L"-a", L"-b", L"-vmargs", L"v"}},
        {{L"p", L"-config", L"x", L"b"}, {L"-foo", L"-vmargs", L"-X"}, {L"p", L"b", L"-foo", L"-vmargs", L"-X"}},
        // "-config" after "-vmargs": the insertion point is two places early
        {{L"p", L"a", L"b", L"-vmargs", L"v", L"-config", L"x"}, {L"-foo"}, {L"p", L"-foo", L"a", L"b", L"-vmargs", L"v"}},
        {{L"p", L"a", L"-vmargs", L"-config", L"x"}, {L"-foo"}, {L"-foo", L"p", L"a", L"-vmargs"}},
        // "-vmargs" right after the program: the insertion point would lie
        // before the start and is taken as the start
        {{L"p", L"-vmargs", L"-config", L"x"}, {L"-foo"}, {L"-foo", L"p", L"-vmargs"}},
        // the command line has its own "-vmargs", so the extension's "-vmargs"
        // word is never added, wherever the command line's stands
        {{L"p", L"-vmargs", L"v", L"-config", L"x"}, {L"-vmargs", L"-Xmx1g"}, {L"p", L"-vmargs", L"v", L"-Xmx1g"}},
        // the second option word goes, its value stays; "-personality" is removed twice
        {{L"p", L"-data", L"d1", L"-config", L"x"}, {L"-data", L"d2", L"-nl", L"de"}, {L"p", L"-data", L"d1", L"d2", L"-nl", L"de"}},
        {{L"p", L"-personality", L"1", L"-config", L"x"}, {L"-personality", L"2", L"-personality", L"3", L"-vm", L"-vm", L"-vm"},
         {L"p", L"-personality", L"1", L"2", L"3", L"-vm", L"-vm"}},
        {{L"p", L"-config", L"none", L"-debug"}, {}, {L"p", L"-debug"}},
    };
    for (const Case& c : cases) {
        rcptest::WArgs args(c.argv);
        rcptest::PropArray props{{L"config.x.10", L"-ten"}, {L"config.y.1", L"-y"}};
        for (size_t j = 0; j < c.values.size(); ++j) {
            props.v().push_back(copyString((L"config.x." + std::to_wstring(j + 1)).c_str()));
            props.v().push_back(copyString(c.values[j].c_str()));
        }
        if (c.argv[2] == L"x") {  // a gap ends the list
            props.v().push_back(copyString((L"config.x." + std::to_wstring(c.values.size() + 2)).c_str()));
            props.v().push_back(copyString(L"-gap"));
        }
        int cargc = -1;
        wchar_t** cargv = nullptr;
        Strings newargs{L"stale"};
        ASSERT_TRUE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), props.v(), newargs));
        EXPECT_EQ(newargs, c.expected);
        ASSERT_EQ(cargc, static_cast<int>(newargs.size()));
        for (int i = 0; i < cargc; ++i) EXPECT_EQ(cargv[i], newargs[i].c_str());
        free(cargv);
    }
    for (const Strings& argv : {Strings{L"p"}, Strings{L"p", L"x", L"-config"}, Strings{L"-config", L"x"}}) {
        rcptest::WArgs args(argv);
        int cargc = 7;
        wchar_t** cargv = args.argv();
        Strings newargs{L"kept"};
        EXPECT_FALSE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), {}, newargs));
        EXPECT_TRUE(cargc == 7 && cargv == args.argv() && newargs == Strings{L"kept"});
    }
}

}  // namespace
