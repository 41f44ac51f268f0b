// Shared by the unit tests: the launcher's globals back to a known state, and
// a check that calls end the launch through the fatal path with their message.
#ifndef RCP_UNIT_SUPPORT_H
#define RCP_UNIT_SUPPORT_H

#include <gtest/gtest.h>

#include <clocale>
#include <functional>
#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"
#include "test_util.h"

using namespace rcptest;
using Strings = std::vector<std::wstring>;

inline void resetState(installCfg cfg = undefined, bool mainProcess = true) {
    setlocale(LC_CTYPE, "C.UTF-8");
    resetLoggingForTest();
    setDebug(false);
    launchArgs.clear();
    bRestart = bWaitMode = userFirstLaunch = false;
    eConfig = cfg;
    setMainProcess(mainProcess);
    pid = 0;
}

struct Fatal {
    std::function<void()> run;
    std::string message;  // must appear in the log
};

// Each call must end the process with status 255; its log goes to a
// directory of its own instead of the shared /tmp/rcplauncher.log.
inline void expectFatal(const std::vector<Fatal>& cases) {
    for (const Fatal& c : cases) {
        SCOPED_TRACE(c.message);
        TempDir dir;
        auto run = [&] { enableLogging(dir.wpath()); c.run(); };
        EXPECT_EXIT(run(), ::testing::ExitedWithCode(255), "");
        const std::string log = readText(dir.sub("rcplauncher.log"));
        EXPECT_NE(log.find(c.message), std::string::npos) << log;
    }
}

// An owned properties array from key/value pairs.
inline void addProps(PropArray& props, const std::vector<std::pair<std::wstring, std::wstring>>& pairs) {
    for (const auto& p : pairs) {
        props.v().push_back(copyString(p.first.c_str()));
        props.v().push_back(copyString(p.second.c_str()));
    }
}

#endif  // RCP_UNIT_SUPPORT_H
