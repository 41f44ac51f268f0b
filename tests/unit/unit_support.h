// Shared by the unit tests: the launcher's globals back to a known state,
// wide text, owned properties arrays, and the check that
// calls end the launch through the fatal path with their message.
#ifndef RCP_UNIT_SUPPORT_H
#define RCP_UNIT_SUPPORT_H

#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstring>
#include <functional>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"
#include "test_util.h"

using namespace rcptest;
using Strings = std::vector<std::wstring>;
using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;

// The locale of a launch, an empty log queue and no debug output.
inline void resetState(installCfg cfg = undefined) {
    setlocale(LC_CTYPE, utf8Locale());
    resetLoggingForTest();
    setDebug(false);
    eConfig = cfg;
}

// ASCII test text (paths, messages) as wide text.
inline std::wstring W(const std::string& s) { return std::wstring(s.begin(), s.end()); }

// A properties array that owns its strings, as the reader's arrays do.
struct Props : std::vector<String> {
    Props(std::initializer_list<Pairs::value_type> pairs = {}) { add(pairs); }
    ~Props() { freeProperties(*this); }
    void add(const Pairs& pairs) {
        for (const auto& [key, value] : pairs) insert(end(), {copyString(key.c_str()), copyString(value.c_str())});
    }
};

// Each call must end the process with status 255 and log its message; the
// log goes to a directory of its own instead of /tmp/rcplauncher.log.
using Fatal = std::pair<std::function<void()>, std::string>;
inline void expectFatal(const std::vector<Fatal>& cases) {
    for (const auto& [run, message] : cases) {
        TempDir dir;
        EXPECT_EXIT((enableLogging(W(dir.path())), run()), ::testing::ExitedWithCode(255), "") << message;
        const std::string log = readText(dir.sub("rcplauncher.log"));
        EXPECT_NE(log.find(message), std::string::npos) << message << " not in:\n" << log;
    }
}

#endif  // RCP_UNIT_SUPPORT_H
