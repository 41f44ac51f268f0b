// The platform's own options: pass-through of the launcher's arguments, the
// computed locations, and options supplied by the properties.
#include <gtest/gtest.h>

#include "cmd_test_support.h"

using cmdtest::Args;
using rcptest::PropArray;
using rcptest::TempDir;
using rcptest::WArgs;

namespace {

TEST(CmdlineOptionsTest, PassThroughLocationsAndPropertySuppliedOptions) {
    const Args loc{L"-data", L"/data/ws", L"-configuration", L"/data/ws/.config"};
    const Args props{L"-application", L"app.p", L"-plugincustomization", L"/pc.ini", L"-product", L"prod.l",
                     L"-personality", L"pers.p"};
    auto cat = [](std::initializer_list<Args> parts) {
        Args all;
        for (const Args& p : parts) all.insert(all.end(), p.begin(), p.end());
        return all;
    };
    struct Case {
        installCfg cfg;
        bool restart;
        Args args;
        Args expected;
    };
    const Case cases[] = {
        {user, false, {L"l", L"-debug", L"-perfJar", L"/p.jar", L"x y"},
         cat({{L"-debug", L"-perfJar", L"/p.jar", L"x y"}, loc, props})},
        // The launcher's own pairs and orders are held back, by index only.
        {user, false,
         {L"l", L"-configuration", L"/c", L"-vm", L"/j", L"-k", L"-restart", L"-resetconfig", L"-vm", L"/b"},
         cat({{L"-k", L"-vm", L"/b"}, loc, props})},
        {user, false, {L"l", L"-data", L"/mine/", L"-x", L"-data", L"/second"},
         cat({{L"-x", L"-data", L"/second", L"-data", L"/mine", L"-configuration", L"/mine/.config"}, props})},
        // Nothing after "-vmargs", but a value is consumed even there.
        {user, false, {L"l", L"-a", L"-vmargs", L"-b"}, cat({{L"-a"}, loc, props})},
        {user, false, {L"l", L"-vm", L"-vmargs", L"-Xmx1g"}, cat({loc, props})},
        // Given options are written once, at their place; a last one has no value.
        {multiuser, true,
         {L"l", L"-restart", L"-console", L"-product", L"c", L"-application", L"a", L"-plugincustomization", L"p",
          L"-personality"},
         cat({{L"-product", L"c", L"-application", L"a", L"-plugincustomization", L"p", L"-personality"}, loc})},
        {service, false, {L"l", L"-x"},
         cat({{L"-nosplash", L"-x", L"-data", L"/inst/eclipse/.workspace", L"-configuration",
               L"/inst/eclipse/.config"},
              props})},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        bRestart = c.restart;
        PropArray install{{L"rcp.install.id", L"ID"},  {L"rcp.data", L"/data/ws"},    {L"product", L"prod.i"},
                          {L"application", L"app.p"}, {L"personality", L"pers.p"}, {L"plugincustomization", L"/pc.ini"}};
        PropArray launcher{{L"product", L"prod.l"}};
        std::wstring installDir = L"/inst";
        WArgs args(c.args);
        addMainOptionsToCommandLine(install.v(), launcher.v(), args.argc(), args.argv(), installDir);
        EXPECT_EQ(launchArgs, c.expected) << rcptest::narrow(c.args[1]);
    }

    // Without the launcher's product the installation's is used.
    cmdtest::resetCommandState(user);
    PropArray install{{L"rcp.install.id", L"ID"}, {L"rcp.data", L"/data/ws"}, {L"product", L"prod.i"}}, launcher;
    std::wstring installDir = L"/inst";
    WArgs args{L"l"};
    addMainOptionsToCommandLine(install.v(), launcher.v(), args.argc(), args.argv(), installDir);
    EXPECT_EQ(launchArgs, cat({loc, {L"-product", L"prod.i"}}));

    TempDir dir;
    PropArray noId{{L"rcp.data", L"/data/ws"}};
    EXPECT_FATAL_IN(dir, addMainOptionsToCommandLine(noId.v(), launcher.v(), args.argc(), args.argv(), installDir),
                    "RLNCH0005E: Couldn't find the rcp.install.id property!");
}

}  // namespace
