// Helpers shared by the command-line, environment, provisioning and service
// tests: a clean command-line state, and a check that a statement ends the
// launch through the fatal path with a given message in the log.
#ifndef RCP_CMD_TEST_SUPPORT_H
#define RCP_CMD_TEST_SUPPORT_H

#include <gtest/gtest.h>

#include <clocale>
#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

namespace cmdtest {

using Args = std::vector<std::wstring>;

// Every global that a builder reads or writes, back to a known state.
inline void resetCommandState(installCfg cfg, bool mainProcess = true) {
    setlocale(LC_CTYPE, "C.UTF-8");
    resetLoggingForTest();
    setDebug(false);
    launchArgs.clear();
    bRestart = false;
    bWaitMode = false;
    userFirstLaunch = false;
    eConfig = cfg;
    setMainProcess(mainProcess);
    pid = 0;
}

inline std::string logIn(const rcptest::TempDir& dir) { return rcptest::readText(dir.sub("rcplauncher.log")); }

}  // namespace cmdtest

// The statement must end the process with status 255, leaving `message` in
// the log, which goes to `dir` instead of the shared /tmp/rcplauncher.log.
#define EXPECT_FATAL_IN(dir, statement, message)                                                        \
    do {                                                                                                \
        EXPECT_EXIT(                                                                                    \
            {                                                                                           \
                enableLogging((dir).wpath());                                                           \
                statement;                                                                              \
            },                                                                                          \
            ::testing::ExitedWithCode(255), "");                                                        \
        EXPECT_NE(cmdtest::logIn(dir).find(message), std::string::npos) << cmdtest::logIn(dir);         \
    } while (0)

#endif  // RCP_CMD_TEST_SUPPORT_H
