// The platform lock between launchers of one workspace: many launchers
// started at the same moment make exactly one main process, and a launcher
// that restarts the platform waits for the one it replaces.
#include <chrono>
#include <thread>

#include "sandbox.h"

using namespace rcptest;

// 32 launchers at once: exactly one becomes the main process while every
// other one hands over to the platform that one started, whether the race is
// a later launch or the user's very first one (where the launchers also race
// to create the workspace, log and configuration directories: a directory
// another launcher just made is no failure). Round 0 races a later launch,
// the other rounds a first one; that race is a matter of timing, so it runs
// a few times (RCP_RACE_ROUNDS, default 5). The children outlive the whole
// race: a platform that ended half-way would rightly make a later launcher
// main again.
TEST(Concurrency, ManyLaunchersAtOnceMakeOneMainProcess) {
    const int rounds = getenv("RCP_RACE_ROUNDS") ? atoi(getenv("RCP_RACE_ROUNDS")) : 5;
    Sandbox sb;
    ASSERT_EQ(sb.run().status, 0);
    for (int round = 0; round <= rounds; round++) {
        SCOPED_TRACE("round " + std::to_string(round));
        if (round > 0) sb.freshHome();
        Result r = sb.runMany(std::vector<Launch>(32, Launch{{}, {{"RCP_STUB_SLEEP", "300"}}}));
        ASSERT_EQ(r.children.size(), 32u) << r.describe();
        EXPECT_EQ(r.tmpLog, "");
        EXPECT_EQ(r.log.find("RLNCH"), std::string::npos) << r.log;
        auto isMain = [](const Child& child) { return child.index("-useDaemon") == -1; };
        ASSERT_EQ(std::count_if(r.children.begin(), r.children.end(), isMain), 1);
        const std::string mainPid = std::to_string(std::find_if(r.children.begin(), r.children.end(), isMain)->pid);
        for (const Child& child : r.children) EXPECT_EQ(isMain(child) ? mainPid : child.after("-useDaemon"), mainPid);
    }
}

// The platform asks for a restart by starting a new launcher with
// "-restart". That launcher gives the old platform time to end: it proceeds
// as soon as the recorded process is gone, or after about 20 seconds
// declares it stale and goes on as the main launcher anyway. Either way the
// new platform is a main one (a '-config NAME' extension without typed VM
// arguments follows the typed options), never interactive, so it gets the
// console fix that "-console" alone holds back (its own platform stays up,
// so a launcher that waited for it because of "-console" would run into its
// time limit), the startup record is the restarted launcher's without the
// "-restart" the platform added, and the restarted launcher writes no debug
// output, "-debug" or not: the log of the first launch is gone and nothing
// else is there, not even the note that the lock file was declared stale.
// The old platform is a process of this test: one that ends (and is reaped,
// as its real parent would) after 2 seconds, or the test itself, which
// outlives the wait.
TEST(Concurrency, RestartWaitsForThePlatformItReplaces) {
    for (const bool oldEnds : {true, false}) {
        SCOPED_TRACE(oldEnds ? "old platform ends during the wait" : "old platform keeps running");
        Sandbox sb("user", "config.s.1=-fromconfig\n", "vmfix.noconsole=-Dfix=1\n");
        Result first = sb.run({{"-debug", "-console"}});
        ASSERT_NE(lastLine(first.log), "");
        EXPECT_EQ(first.child().index("-Dfix=1"), -1);  // with a console, no console fix
        pid_t old = getpid();
        if (oldEnds && (old = fork()) == 0) {
            sleep(2);
            _exit(0);
        }
        std::thread reaper([=] { return oldEnds && waitpid(old, nullptr, 0) == old; });
        sb.write(sb.ws + "/.rcp.lock", std::to_string(old));
        const auto start = std::chrono::steady_clock::now();
        Result r = sb.run({{"-restart", "-debug", "-console", "-config", "s", "-second"}, {{"RCP_STUB_SLEEP", "600"}}});
        const auto ms = std::chrono::duration_cast<std::chrono::milliseconds>(std::chrono::steady_clock::now() - start);
        reaper.join();
        ASSERT_EQ(r.children.size(), 1u) << r.describe();
        EXPECT_GE(ms.count(), oldEnds ? 1900 : 19000);
        EXPECT_LT(ms.count(), oldEnds ? 15000 : 45000);
        for (const char* absent : {"-useDaemon", "-debug", "-console", "-restart"})
            EXPECT_EQ(r.child().index(absent), -1) << absent;
        EXPECT_EQ(r.child().after("-second"), "-fromconfig");
        EXPECT_NE(r.child().index("-Dfix=1"), -1);
        EXPECT_EQ(readText(sb.cfg + "/args.properties"),
                  "arg0=" + sb.launcher + "\narg1=-debug\narg2=-console\narg3=-config\narg4=s\narg5=-second\nargc=6\n");
        EXPECT_EQ(lastLine(r.log) + r.tmpLog, "") << r.describe();
    }
}
