// A platform that asks to be restarted while it is still going down (or
// never goes down).
#include <gtest/gtest.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

using Clock = std::chrono::steady_clock;

// The lock file after a launch that recorded pid: the id and ten blanks,
// written over whatever longer content (the 14 blanks of an invalidation)
// was there.
std::string lockAfter(long pid, bool invalidated) {
    std::string text = std::to_string(pid) + std::string(10, ' ');
    if (invalidated && text.size() < 14) text.resize(14, ' ');
    return text;
}

// The platform asks for a restart by starting a new launcher with
// "-restart". That launcher gives the old platform time to end: it proceeds
// as soon as the recorded process is gone, or after about 20 seconds blanks
// the lock file and goes on as the main launcher anyway. Either way the new
// platform is a main one, never interactive, and the restarted launcher
// writes no debug output. The old platform is a process of this test: one
// that ends (and is reaped, as its real parent would) after 3 seconds, or
// the test itself, which outlives the wait.
TEST(Sequences, RestartWaitsForThePlatformItReplaces) {
    for (const bool oldEnds : {true, false}) {
        SCOPED_TRACE(oldEnds ? "old platform ends during the wait" : "old platform keeps running");
        Sandbox sb;
        sb.setupInstall("user");
        const std::string lock = sb.defaultWorkspace() + "/.rcp.lock";

        // A first launch with debug output.
        LaunchResult first = sb.run({"-debug", "-first"});
        ASSERT_EQ(first.status, 0) << first.describe();
        ASSERT_NE(first.log.find("RLNCH0132I"), std::string::npos) << first.describe();
        pid_t old = getpid();
        if (oldEnds && (old = fork()) == 0) {
            sleep(3);
            _exit(0);
        }
        std::thread reaper([old, oldEnds] {
            if (oldEnds) waitpid(old, nullptr, 0);
        });
        writeText(lock, lockAfter(old, false));

        // The restart, with the interactive options the user gave first time;
        // its own platform stays up, so a launcher that waited for it
        // (because of "-console") would run into its time limit.
        RunOptions restart;
        restart.args = {"-restart", "-debug", "-console", "-second"};
        restart.env = {{"RCP_STUB_SLEEP", "600"}};
        restart.keepChildren = true;
        restart.timeoutSeconds = 60;
        const auto start = Clock::now();
        LaunchResult r = sb.run(restart);
        const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start).count();
        reaper.join();
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u) << r.describe();
        EXPECT_GE(seconds, oldEnds ? 1 : 19);
        EXPECT_LT(seconds, oldEnds ? 15 : 45);
        EXPECT_EQ(r.terminal, "");
        EXPECT_FALSE(r.tmpLogWritten);

        // A main platform: no hand-over, and neither "-debug" nor "-console".
        const ChildRecord& child = r.child();
        for (const char* absent : {"-useDaemon", "-debug", "-console", "-restart"})
            EXPECT_EQ(child.argIndex(absent), -1) << absent;
        EXPECT_NE(child.argIndex("-second"), -1);
        EXPECT_EQ(child.argv.back(), "-XstartOnFirstThread");

        // The lock names the new platform; the record is the restarted
        // launcher's, without the "-restart" the platform added.
        EXPECT_EQ(readText(lock), lockAfter(child.pid, !oldEnds));
        EXPECT_EQ(readText(sb.defaultConfig() + "/args.properties"),
                  "arg0=" + sb.launcher() + "\narg1=-debug\narg2=-console\narg3=-second\nargc=4\n");

        // A restarted launcher writes no debug output, "-debug" or not: the
        // log of the first launch is gone and nothing else is there, not even
        // the note that the lock file was declared stale.
        EXPECT_EQ(logLines(r.log), std::vector<std::string>{}) << r.describe();
        sb.killChildren();
    }
}

}  // namespace
