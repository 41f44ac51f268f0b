// The child's command line and the start of the child.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <clocale>
#include <cstdlib>

#include "rcp_launcher.h"
#include "sandbox.h"
#include "test_util.h"

using rcptest::WArgs;

namespace {

class LaunchTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        setDebug(false);
        launchArgs.clear();
        bRestart = false;
        setMainProcess(false);
    }
    void TearDown() override {
        launchArgs.clear();
        bRestart = false;
    }
};

TEST_F(LaunchTest, RestartKeepsInteractiveOptionsAwayFromTheChild) {
    for (bool restart : {false, true}) {
        launchArgs.clear();
        bRestart = restart;
        for (const wchar_t* a : {L"-debug", L"-console", L"-Debug", L"-consoleLog", L"x y"})
            addArgToCommandLine(a, true);
        std::vector<std::wstring> expected =
            restart ? std::vector<std::wstring>{L"-Debug", L"-consoleLog", L"x y"}
                    : std::vector<std::wstring>{L"-debug", L"-console", L"-Debug", L"-consoleLog", L"x y"};
        EXPECT_EQ(launchArgs, expected) << "restart=" << restart;
    }
}

TEST_F(LaunchTest, PathRestartsTheCommandLine) {
    addArgToCommandLine(L"-a");
    addArgToCommandLine(L"-b");
    addPathToCommandLine(L"/opt/jvm/bin/java");
    EXPECT_EQ(launchArgs, std::vector<std::wstring>{L"/opt/jvm/bin/java"});
}

TEST_F(LaunchTest, HaveLaunchOptionIncludesElementZero) {
    char a0[] = "-restart", a1[] = "x";
    char* args[] = {a0, a1};
    EXPECT_TRUE(haveLaunchOption("-restart", args, 2));
    EXPECT_FALSE(haveLaunchOption("-restart", args + 1, 1));
    EXPECT_FALSE(haveLaunchOption("x", args, 1));
}

TEST_F(LaunchTest, StartsTheChildWithItsArgumentsAndWaitsWhenAsked) {
    rcptest::TempDir dir;
    std::string record = dir.sub("record");
    setenv("RCP_STUB_RECORD", record.c_str(), 1);
    addPathToCommandLine(rcptest::widen(RCP_STUB_CHILD));
    addArgToCommandLine(L"with blank");
    addArgToCommandLine(L"line\nbreak");
    addArgToCommandLine(L"-XstartOnFirstThread");
    WArgs args{L"launcher", L"-rcpLauncherWait"};
    launchEclipse(args.argc(), args.argv());
    unsetenv("RCP_STUB_RECORD");
    // Waited: the record is complete as soon as launchEclipse returns.
    rcptest::ChildRecord child;
    ASSERT_TRUE(rcptest::parseChildRecord(rcptest::readText(record), child));
    EXPECT_EQ(child.argv, (std::vector<std::string>{RCP_STUB_CHILD, "with blank", "line\nbreak",
                                                    "-XstartOnFirstThread"}));
}

TEST_F(LaunchTest, ConsoleAmongTheChildArgumentsAlsoWaits) {
    rcptest::TempDir dir;
    std::string record = dir.sub("record");
    setenv("RCP_STUB_RECORD", record.c_str(), 1);
    setenv("RCP_STUB_EXIT", "7", 1);
    addPathToCommandLine(rcptest::widen(RCP_STUB_CHILD));
    addArgToCommandLine(L"-console");
    WArgs args{L"launcher"};
    launchEclipse(args.argc(), args.argv());
    unsetenv("RCP_STUB_RECORD");
    unsetenv("RCP_STUB_EXIT");
    EXPECT_TRUE(rcptest::pathExists(record));
}

TEST_F(LaunchTest, AFailedExecEndsTheChildQuietlyWithStatusZero) {
    addPathToCommandLine(L"/nonexistent/program");
    WArgs args{L"launcher", L"-rcpLauncherWait"};
    launchEclipse(args.argc(), args.argv());
    // The parent's log holds only its own lines, never the child's.
    EXPECT_EQ(getLogQueue(), "");
}

}  // namespace
