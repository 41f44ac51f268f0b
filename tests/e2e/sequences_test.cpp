// How launches follow one another: whether a launcher stays until its
// platform ends, and a platform that asks to be restarted while it is still
// going down (or never goes down).
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

using Clock = std::chrono::steady_clock;

// The test process adopts the platforms that launchers leave behind, and an
// ended platform that nobody reaps still answers kill(pid, 0). This reaps one
// of them the moment it ends, as its real parent would.
class Reaper {
public:
    explicit Reaper(long pid)
        : thread_([this, pid] {
              const auto deadline = Clock::now() + std::chrono::seconds(120);
              while (!stop_ && Clock::now() < deadline) {
                  int status;
                  pid_t r = waitpid(static_cast<pid_t>(pid), &status, WNOHANG);
                  if (r == static_cast<pid_t>(pid)) return;
                  if (r == -1 && errno == ECHILD && kill(static_cast<pid_t>(pid), 0) == -1 && errno == ESRCH)
                      return;
                  std::this_thread::sleep_for(std::chrono::milliseconds(20));
              }
          }) {}
    ~Reaper() {
        stop_ = true;
        thread_.join();
    }

private:
    std::atomic<bool> stop_{false};
    std::thread thread_;
};

// The lock file after a launch that recorded pid: the id and ten blanks,
// written over whatever longer content (the 14 blanks of an invalidation)
// was there.
std::string lockAfter(long pid, bool invalidated) {
    std::string text = std::to_string(pid) + std::string(10, ' ');
    if (invalidated && text.size() < 14) text.resize(14, ' ');
    return text;
}

// The launcher stays until its platform ends only when it was given
// "-rcpLauncherWait" or when the platform's own command line holds
// "-console" (also when that comes from the launcher properties); it then
// exits 0 whatever the platform's status. Otherwise it leaves at once.
TEST(Sequences, LauncherWaitsForThePlatformOnlyWhenAsked) {
    struct Case {
        std::vector<std::string> args;
        bool waits;
    };
    const std::vector<Case> cases = {
        {{"-foo"}, false},
        {{"-console"}, true},
        {{"-rcpLauncherWait"}, true},
        {{"-config", "dbg"}, true},  // config.dbg.1=-console
        {{"-restart", "-console"}, false},
        {{"-restart", "-rcpLauncherWait"}, true},
    };
    Sandbox sb;
    sb.setupInstall("user", "config.dbg.1=-console\n");
    for (const Case& c : cases) {
        SCOPED_TRACE(::testing::PrintToString(c.args));
        RunOptions o;
        o.args = c.args;
        o.env = {{"RCP_STUB_SLEEP", "3"}, {"RCP_STUB_EXIT", "7"}};
        o.keepChildren = true;
        const auto start = Clock::now();
        LaunchResult r = sb.run(o);
        const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start).count();
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u);
        // A launcher that waited has also reaped its platform.
        const bool platformGone = kill(static_cast<pid_t>(r.child().pid), 0) == -1 && errno == ESRCH;
        EXPECT_EQ(platformGone, c.waits);
        EXPECT_EQ(seconds >= 3, c.waits) << seconds << " s";
        sb.killChildren();
    }
}

// The platform asks for a restart by starting a new launcher with
// "-restart". That launcher gives the old platform time to end: it proceeds
// as soon as the recorded process is gone, or after about 20 seconds blanks
// the lock file and goes on as the main launcher anyway. Either way the new
// platform is a main one, never interactive, and the restarted launcher
// writes no debug output. One case waits the full 20 seconds.
TEST(Sequences, RestartWaitsForThePlatformItReplaces) {
    struct Case {
        const char* name;
        int oldPlatformSeconds;  // how long the first platform runs
        bool invalidated;        // the wait runs out
        int minSeconds, maxSeconds;
    };
    const Case cases[] = {
        {"old platform ends during the wait", 3, false, 1, 15},
        {"old platform keeps running", 600, true, 19, 45},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        Sandbox sb;
        sb.setupInstall("user");
        const std::string ws = sb.defaultWorkspace();
        const std::string lock = ws + "/.rcp.lock";

        // A first launch with debug output, whose platform stays up.
        RunOptions firstRun;
        firstRun.args = {"-debug", "-first"};
        firstRun.env = {{"RCP_STUB_SLEEP", std::to_string(c.oldPlatformSeconds)}};
        firstRun.keepChildren = true;
        LaunchResult first = sb.run(firstRun);
        ASSERT_EQ(first.status, 0) << first.describe();
        ASSERT_TRUE(first.hasChild());
        const long oldPid = first.child().pid;
        ASSERT_EQ(readText(lock), lockAfter(oldPid, false));
        ASSERT_NE(first.log.find("RLNCH0132I"), std::string::npos) << first.describe();
        Reaper reaper(oldPid);

        // The restart, with the interactive options the user gave first time;
        // its own platform stays up too, so a launcher that waited for it
        // (because of "-console") would run into its time limit.
        RunOptions restart;
        restart.args = {"-restart", "-debug", "-console", "-second"};
        restart.env = {{"RCP_STUB_SLEEP", "600"}};
        restart.keepChildren = true;
        restart.timeoutSeconds = c.maxSeconds + 15;
        const auto start = Clock::now();
        LaunchResult r = sb.run(restart);
        const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(Clock::now() - start).count();
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u) << r.describe();
        EXPECT_GE(seconds, c.minSeconds);
        EXPECT_LT(seconds, c.maxSeconds);
        EXPECT_EQ(r.terminal, "");
        EXPECT_FALSE(r.tmpLogWritten);

        // The old platform is left alone; it ends only when it wants to.
        EXPECT_EQ(kill(static_cast<pid_t>(oldPid), 0) == 0, c.invalidated);

        // A main platform: no hand-over, and neither "-debug" nor "-console".
        const ChildRecord& child = r.child();
        EXPECT_EQ(child.argIndex("-useDaemon"), -1);
        EXPECT_EQ(child.argIndex("-debug"), -1);
        EXPECT_EQ(child.argIndex("-console"), -1);
        EXPECT_EQ(child.argIndex("-restart"), -1);
        EXPECT_NE(child.argIndex("-second"), -1);
        ASSERT_FALSE(child.argv.empty());
        EXPECT_EQ(child.argv.back(), "-XstartOnFirstThread");

        // The lock names the new platform; the record is the restarted
        // launcher's, without the "-restart" the platform added.
        EXPECT_EQ(readText(lock), lockAfter(child.pid, c.invalidated));
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
