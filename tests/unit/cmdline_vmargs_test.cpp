// What the JVM itself gets: "-vmargs", the user's VM arguments, the console
// fix, "vmarg." values, system properties, -X options and boot class path.
#include <gtest/gtest.h>

#include "cmd_test_support.h"

using cmdtest::Args;
using rcptest::PropArray;
using rcptest::TempDir;
using rcptest::WArgs;

namespace {

TEST(CmdlineVmargsTest, VmArgumentsInTheirOrder) {
    struct Case {
        installCfg cfg;
        bool restart;  // as main sets it for "-restart"
        Args args;
        Args expected;
    };
    const Case cases[] = {
        {user, false, {L"l"}, {L"-vmargs", L"-Dws=/ws/x/y", L"-Xb", L"-Xa"}},  // file order, first fix only
        {user, false, {L"l", L"-console"}, {L"-vmargs", L"-Xb", L"-Xa"}},
        {lockdown, true, {L"l", L"-console", L"-restart"}, {L"-vmargs", L"-Dws=/ws/x/y", L"-Xb", L"-Xa"}},
        {service, false, {L"l", L"-console"}, {L"-Xb", L"-Xa"}},
        {multiuser_service, false, {L"l", L"-console"}, {L"-Xb", L"-Xa"}},
        {multiuser, false, {L"l", L"-console", L"-vmargs", L"-Xmx1g", L"-console", L"a b"},
         {L"-vmargs", L"-Xmx1g", L"-console", L"a b", L"-Xb", L"-Xa"}},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        bRestart = c.restart;
        PropArray install{{L"vmarg.2", L"-Xb"},
                          {L"vmfix.noconsole", L"-Dws=${workspace.location}\\y"},
                          {L"vmarg.3", L""},
                          {L"vmfix.noconsole.2", L"-Dsecond"},
                          {L"vmarg.1", L"-Xa"}};
        WArgs args(c.args);
        addVmargsToCommandLine(L"/ws/x", install.v(), args.argc(), args.argv());
        EXPECT_EQ(launchArgs, c.expected) << rcptest::narrow(c.args.back());
    }
}

TEST(CmdlineVmargsTest, SystemPropertiesAndXOptions) {
    TempDir dir;
    rcptest::makeDirs(dir.sub("with/eclipse"));
    const std::pair<installCfg, const wchar_t*> names[] = {
        {service, L"service"},     {lockdown, L"lockdown"},           {user, L"user"},
        {serial_multiuser, L"serial.multiuser"}, {multiuser, L"multiuser"}, {multiuser_service, L"multiuser"},
        {userpb, L"userpb"}};
    for (const auto& n : names) {
        cmdtest::resetCommandState(n.first);
        std::wstring installDir = dir.wsub("with");
        PropArray install{{L"rcp.install.id", L"ID7"}, {L"-Dempty", L""}, {L"rcp.data", L"/data/ws/"},
                          {L"-Dx", L"a=b c"}};
        PropArray launcher{{L"osgi.splashPath", L"platform:/base/splash"}};
        WArgs args{L"l"};
        addDashDToCommandLine(install.v(), launcher.v(), args.argc(), args.argv(), installDir);
        std::wstring ws = n.first == service             ? installDir + L"/eclipse/.workspace"
                          : n.first == multiuser_service ? installDir + L"/eclipse/.muservice"
                                                         : L"/data/ws";
        EXPECT_EQ(launchArgs, (Args{L"-Drcp.home=" + installDir, L"-Drcp.data=" + ws,
                                    L"-Dosgi.splashPath=platform:/base/splash", L"-Dcom.kel.rcp.install.id=ID7",
                                    std::wstring(L"-Drcp.install.config=") + n.second, L"-Dempty=", L"-Dx=a=b c",
                                    L"-Drcp.osgi.install.area=" + installDir + L"/eclipse"}));
    }

    // No "eclipse" directory: rcp/eclipse, whether it exists or not.
    cmdtest::resetCommandState(user);
    std::wstring bare = dir.wsub("bare");
    PropArray install{{L"rcp.install.id", L"ID7"},  {L"-Xmx", L"=512m"}, {L"Xbootclasspath.append", L"/a.jar"},
                      {L"-Xss512k", L""},           {L"Xbootclasspath.prepend", L"/p.jar"}};
    PropArray launcher;
    WArgs args{L"l", L"-data", L"/explicit/"};
    addDashDToCommandLine(install.v(), launcher.v(), args.argc(), args.argv(), bare);
    addXargsToCommandLine(install.v());
    EXPECT_EQ(launchArgs, (Args{L"-Drcp.home=" + bare, L"-Drcp.data=/explicit", L"-Dcom.kel.rcp.install.id=ID7",
                                L"-Drcp.install.config=user", L"-Drcp.osgi.install.area=" + bare + L"/rcp/eclipse",
                                L"-Xmx=512m", L"-Xss512k", L"-Xbootclasspath/p:/p.jar", L"-Xbootclasspath/a:/a.jar"}));

    PropArray noId{{L"-Dx", L"1"}};
    EXPECT_FATAL_IN(dir, addDashDToCommandLine(noId.v(), launcher.v(), args.argc(), args.argv(), bare),
                    "RLNCH0005E: Couldn't find the rcp.install.id property!");
    eConfig = undefined;
    EXPECT_FATAL_IN(dir, addDashDToCommandLine(install.v(), launcher.v(), args.argc(), args.argv(), bare),
                    "RLNCH0025E: The platform rcp.install.id must be provided for this configuration!");
}

}  // namespace
