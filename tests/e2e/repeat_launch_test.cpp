// Launches of the same user one after the other: each rewrites the log and
// the startup record that the launch before left, and must leave exactly
// its own text in them, however long the earlier text was.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

TEST(RepeatLaunch, LogAndStartupRecordHoldOnlyTheLatestLaunch) {
    Sandbox sb;
    sb.setupInstall("user");
    const std::string record = sb.defaultConfig() + "/args.properties";
    const std::string longArg = "/a/long/argument/" + std::string(3000, 'x');

    LaunchResult verbose = sb.run({"-debug", "-someOption", longArg});
    ASSERT_EQ(verbose.status, 0) << verbose.describe();
    ASSERT_NE(verbose.log.find(longArg), std::string::npos) << "the debug log shows the child's arguments";
    EXPECT_EQ(readText(record),
              "arg0=" + sb.launcher() + "\narg1=-debug\narg2=-someOption\narg3=" + longArg + "\nargc=4\n");

    // Without "-debug" a successful launch logs nothing but the empty line
    // that closes its (empty) queue.
    LaunchResult quiet = sb.run({"-x"});
    ASSERT_EQ(quiet.status, 0) << quiet.describe();
    EXPECT_EQ(quiet.log, "\n");
    EXPECT_EQ(readText(record), "arg0=" + sb.launcher() + "\narg1=-x\nargc=2\n");
    EXPECT_EQ(quiet.terminal, "");

    // Growing again works as well.
    LaunchResult again = sb.run({"-debug"});
    ASSERT_EQ(again.status, 0) << again.describe();
    EXPECT_EQ(readText(record), "arg0=" + sb.launcher() + "\narg1=-debug\nargc=2\n");
    const std::vector<std::string> lines = logLines(again.log);
    ASSERT_FALSE(lines.empty());
    EXPECT_EQ(again.log.find(longArg), std::string::npos) << "a line of the first launch survived";
}

}  // namespace
