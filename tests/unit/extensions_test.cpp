// "-config NAME": merging config.NAME.N arguments into the launcher's own.
#include <gtest/gtest.h>

#include <cstdlib>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

using Strings = std::vector<std::wstring>;

TEST(ExtensionsTest, MergesConfiguredArguments) {
    struct Case {
        const char* what;
        Strings argv;
        std::vector<std::pair<std::wstring, std::wstring>> props;
        Strings expected;
    } cases[] = {
        {"before own -vmargs, VM arguments after",
         {L"a", L"-config", L"x", L"b", L"-vmargs", L"v"},
         {{L"config.x.1", L"-foo"}, {L"config.x.2", L"-vmargs"}, {L"config.x.3", L"-Xmx1g"}},
         {L"a", L"b", L"-foo", L"-vmargs", L"v", L"-Xmx1g"}},
        {"several before own -vmargs keep their order",
         {L"p", L"-config", L"x", L"-vmargs", L"v"},
         {{L"config.x.1", L"-a"}, {L"config.x.2", L"-b"}},
         {L"p", L"-a", L"-b", L"-vmargs", L"v"}},
        {"no own -vmargs: all appended",
         {L"p", L"-config", L"x", L"b"},
         {{L"config.x.1", L"-foo"}, {L"config.x.2", L"-vmargs"}, {L"config.x.3", L"-Xmx1g"}},
         {L"p", L"b", L"-foo", L"-vmargs", L"-Xmx1g"}},
        {"empty values skipped, a gap ends the list",
         {L"p", L"-config", L"x"},
         {{L"config.x.1", L"-a"}, {L"config.x.2", L""}, {L"config.x.3", L"-b"}, {L"config.x.5", L"-c"},
          {L"config.y.4", L"-d"}, {L"config.x.10", L"-e"}},
         {L"p", L"-a", L"-b"}},
        {"-config after -vmargs inserts two places early",
         {L"p", L"a", L"b", L"-vmargs", L"v", L"-config", L"x"},
         {{L"config.x.1", L"-foo"}},
         {L"p", L"-foo", L"a", L"b", L"-vmargs", L"v"}},
        {"-config right after -vmargs in first place",
         {L"p", L"-vmargs", L"-config", L"x"},
         {{L"config.x.1", L"-foo"}},
         {L"p", L"-vmargs", L"-foo"}},
        {"-config after -vmargs in second place",
         {L"p", L"a", L"-vmargs", L"-config", L"x"},
         {{L"config.x.1", L"-foo"}},
         {L"-foo", L"p", L"a", L"-vmargs"}},
        {"second option word removed, its value stays",
         {L"p", L"-data", L"d1", L"-config", L"x"},
         {{L"config.x.1", L"-data"}, {L"config.x.2", L"d2"}, {L"config.x.3", L"-nl"}, {L"config.x.4", L"de"}},
         {L"p", L"-data", L"d1", L"d2", L"-nl", L"de"}},
        {"-personality removed twice",
         {L"p", L"-personality", L"p1", L"-config", L"x"},
         {{L"config.x.1", L"-personality"}, {L"config.x.2", L"p2"}, {L"config.x.3", L"-personality"},
          {L"config.x.4", L"p3"}, {L"config.x.5", L"-vm"}, {L"config.x.6", L"-vm"}, {L"config.x.7", L"-vm"}},
         {L"p", L"-personality", L"p1", L"p2", L"p3", L"-vm", L"-vm"}},
        {"no configured arguments",
         {L"p", L"-config", L"none", L"-debug"},
         {{L"config.x.1", L"-a"}},
         {L"p", L"-debug"}},
    };
    for (const Case& c : cases) {
        rcptest::WArgs args(c.argv);
        rcptest::PropArray props;
        for (const auto& kv : c.props) {
            props.v().push_back(copyString(kv.first.c_str()));
            props.v().push_back(copyString(kv.second.c_str()));
        }
        int cargc = -1;
        wchar_t** cargv = nullptr;
        Strings newargs{L"stale"};
        ASSERT_TRUE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), props.v(), newargs)) << c.what;
        EXPECT_EQ(newargs, c.expected) << c.what;
        ASSERT_EQ(cargc, static_cast<int>(newargs.size()));
        for (int i = 0; i < cargc; ++i) EXPECT_EQ(cargv[i], newargs[i].c_str()) << c.what;
        free(cargv);
    }
}

TEST(ExtensionsTest, WithoutAUsableConfigOptionNothingChanges) {
    const Strings cases[] = {
        {L"p"}, {L"p", L"-data", L"d"}, {L"p", L"x", L"-config"}, {L"-config", L"x"}, {L"p", L"-Config", L"x"},
    };
    rcptest::PropArray props{{L"config.x.1", L"-a"}};
    for (const Strings& argv : cases) {
        rcptest::WArgs args(argv);
        int cargc = 7;
        wchar_t** cargv = args.argv();
        Strings newargs{L"kept"};
        EXPECT_FALSE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), props.v(), newargs));
        EXPECT_EQ(cargc, 7);
        EXPECT_EQ(cargv, args.argv());
        EXPECT_EQ(newargs, Strings{L"kept"});
    }
}

}  // namespace
