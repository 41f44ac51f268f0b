// The launcher's own options and flags.
#include <gtest/gtest.h>

#include <clocale>
#include <cstring>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::WArgs;

namespace {

TEST(OptionsTest, FindOptionMatchesWholeArgumentsFromIndexOne) {
    struct Case {
        WArgs args;
        const wchar_t* opt;
        int expected;
    } cases[] = {
        {WArgs{L"-debug"}, L"-debug", -1},  // element 0 is the program
        {WArgs{L"prog", L"-debug", L"-debug"}, L"-debug", 1},
        {WArgs{L"prog", L"-Debug", L"-debug=1", L"--debug"}, L"-debug", -1},
        {WArgs{L"prog", L"x", L"-vm"}, L"-vm", 2},
    };
    for (auto& c : cases) EXPECT_EQ(findOption(c.opt, c.args.argc(), c.args.argv()), c.expected);
}

TEST(OptionsTest, Predicates) {
    WArgs restartDebug{L"p", L"-debug", L"-restart"};
    EXPECT_FALSE(isDebug(restartDebug.argc(), restartDebug.argv()));
    EXPECT_TRUE(isRestart(restartDebug.argc(), restartDebug.argv()));
    WArgs debug{L"p", L"-debug"};
    EXPECT_TRUE(isDebug(debug.argc(), debug.argv()));

    WArgs waitOnly{L"p", L"-rcpLauncherWait"};
    EXPECT_FALSE(isISMPProvisioning(waitOnly.argc(), waitOnly.argv()));
    WArgs ismp{L"p", L"-provManifest", L"m", L"-rcpLauncherWait"};
    EXPECT_TRUE(isISMPProvisioning(ismp.argc(), ismp.argv()));

    WArgs misc{L"p", L"-resetconfig", L"-vm", L"/j", L"-initMUService"};
    EXPECT_TRUE(isResetConfig(misc.argc(), misc.argv()));
    EXPECT_TRUE(isVmOverride(misc.argc(), misc.argv()));
    EXPECT_TRUE(isInitMUService(misc.argc(), misc.argv()));
    EXPECT_FALSE(isResetConfig(debug.argc(), debug.argv()));
}

TEST(OptionsTest, Flags) {
    bWaitMode = false;
    setWaitMode();
    EXPECT_TRUE(isWaitMode());
    setMainProcess(true);
    EXPECT_TRUE(isMainProcess());
    setMainProcess(false);
    EXPECT_FALSE(isMainProcess());
    IS_LOCKDOWN = true;
    EXPECT_TRUE(isLockdownConfig());
    IS_LOCKDOWN = false;
}

TEST(OptionsTest, VersionWritesOneLineAndEndsWith255) {
    setlocale(LC_CTYPE, "C.UTF-8");
    rcptest::TempDir dir;
    WArgs args{L"p", L"-debug", L"-version", L"-data", L"x"};
    EXPECT_EXIT(
        {
            resetLoggingForTest();
            enableLogging(dir.wpath());
            errno = 0;
            doVersionCheck(args.argc(), args.argv());
        },
        ::testing::ExitedWithCode(255), "");
    EXPECT_EQ(rcptest::readText(dir.sub("rcplauncher.log")),
              std::string("\nRLNCH0031I:   version = \"2006-06-27\" : ") + strerror(0) + "\n");

    WArgs none{L"p", L"-debug"};
    doVersionCheck(none.argc(), none.argv());  // returns without effect
}

}  // namespace
