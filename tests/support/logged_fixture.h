// A test fixture whose log goes to its own temporary directory, so that the
// fatal paths can be run in death tests and their lines read back.
#ifndef RCP_LOGGED_FIXTURE_H
#define RCP_LOGGED_FIXTURE_H

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

namespace rcptest {

class LoggedTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetLoggingForTest();
        makeDirs(tmp.sub("log"));
        ASSERT_TRUE(enableLogging(tmp.wsub("log")));
        eConfig = undefined;
        userFirstLaunch = false;
    }
    void TearDown() override { resetLoggingForTest(); }
    std::string log() const { return readText(tmp.sub("log/rcplauncher.log")); }
    bool logged(const std::string& text) const { return log().find(text) != std::string::npos; }
    TempDir tmp;
};

// Appends owned copies of the pairs to a properties array.
inline void addProps(PropArray& props, const std::vector<std::pair<std::wstring, std::wstring>>& pairs) {
    for (const auto& p : pairs) {
        props.v().push_back(copyString(p.first.c_str()));
        props.v().push_back(copyString(p.second.c_str()));
    }
}

}  // namespace rcptest

#endif  // RCP_LOGGED_FIXTURE_H
