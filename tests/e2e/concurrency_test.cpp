// Many launchers of one user started at the same moment on one workspace:
// the platform lock must let exactly one of them become the main process
// while every other one hands over to the platform that one started, and the
// per-user files must come out as a single launch writes them, whether the
// race is a later launch or the user's very first one (where the launchers
// also race to create the workspace, log and configuration directories).
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/types.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

const int kLaunchers = 32;

const char* const kUserFiles[] = {".config/rcpinstall.properties", ".config/config.ini",
                                  ".config/org.eclipse.update/platform.xml"};

// Every path below the home directory except the log, which all launchers
// rewrite at once and whose bytes therefore mean nothing.
std::vector<std::string> userTree(const std::string& home) {
    std::vector<std::string> tree = listTree(home);
    tree.erase(std::remove_if(tree.begin(), tree.end(),
                              [](const std::string& p) { return p.find("logs/rcplauncher.log") != std::string::npos; }),
               tree.end());
    return tree;
}

TEST(Concurrency, ManyLaunchersAtOnceMakeOneMainProcess) {
    // Round 0 races a later launch; every other round the user's first one
    // (the race starts in an empty home). That race on the directories is a
    // matter of timing, so it runs a few times (RCP_RACE_ROUNDS, default 5)
    // to be seen reliably.
    const char* roundsText = getenv("RCP_RACE_ROUNDS");
    const int rounds = roundsText && *roundsText ? atoi(roundsText) : 5;
    for (int round = 0; round <= rounds; round++) {
        const bool firstLaunch = round > 0;
        SCOPED_TRACE((firstLaunch ? "first launch, round " : "later launch, round ") + std::to_string(round));
        Sandbox sb;
        sb.setupInstall("user", "", "resetDir.a=org.x\n");
        const std::string ws = sb.defaultWorkspace();

        // What one launch writes, in a home of its own: the per-user files
        // hold no home path, so they must come out byte for byte the same.
        RunOptions single;
        single.args = {"-n", "0"};
        single.env = {{"HOME", sb.path("refhome")}};
        LaunchResult ref = sb.run(single);
        ASSERT_EQ(ref.status, 0) << ref.describe();
        const std::string refWs = sb.path("refhome") + "/KEL/RCP/ID42/tester";
        if (!firstLaunch) {
            LaunchResult earlier = sb.run(single);
            ASSERT_EQ(earlier.status, 0) << earlier.describe();
        }

        // Every launcher gets its own number, so the startup record tells
        // which one wrote it. The children outlive the whole race: a platform
        // that ended half-way would rightly make a later launcher main again.
        std::vector<RunOptions> runs(kLaunchers);
        for (int i = 0; i < kLaunchers; i++) {
            runs[i].args = {"-n", std::to_string(i + 1)};
            runs[i].env = {{"RCP_STUB_SLEEP", "300"}};
        }
        sb.beginRuns();
        std::vector<pid_t> launchers = sb.startTogether(runs);
        std::vector<int> statuses;
        for (pid_t p : launchers) statuses.push_back(sb.waitFor(p, 120));
        std::vector<ChildRecord> children =
            sb.collectChildren(static_cast<int>(std::count(statuses.begin(), statuses.end(), 0)), 30);
        sb.releaseChildren(children, true);

        const std::string failure = "\n--- terminal ---\n" + sb.terminalOutput() + "--- /tmp/rcplauncher.log ---\n" +
                                    readText(kTmpLog) + "--- workspace log ---\n" +
                                    readText(ws + "/logs/rcplauncher.log");
        EXPECT_EQ(statuses, std::vector<int>(kLaunchers, 0)) << failure;
        ASSERT_EQ(children.size(), static_cast<size_t>(kLaunchers)) << failure;
        EXPECT_EQ(sb.terminalOutput(), "");
        EXPECT_FALSE(pathExists(kTmpLog)) << failure;
        EXPECT_EQ(readText(ws + "/logs/rcplauncher.log").find("RLNCH"), std::string::npos) << failure;

        // Exactly one main child; every other one is handed its process id.
        auto isMain = [](const ChildRecord& child) { return child.argIndex("-useDaemon") == -1; };
        ASSERT_EQ(std::count_if(children.begin(), children.end(), isMain), 1) << failure;
        const ChildRecord& main = *std::find_if(children.begin(), children.end(), isMain);
        const std::string mainPid = std::to_string(main.pid);
        for (const auto& child : children) {
            if (&child == &main) continue;
            EXPECT_EQ(child.argAfter("-useDaemon"), mainPid) << "child " << child.pid;
        }

        // The lock names the main child, which still runs, in the exact
        // format; the record is the main launcher's own.
        EXPECT_EQ(readText(ws + "/.rcp.lock"), mainPid + std::string(10, ' '));
        EXPECT_EQ(kill(static_cast<pid_t>(main.pid), 0), 0);
        const std::string n = main.argAfter("-n");
        EXPECT_EQ(readText(ws + "/.config/args.properties"),
                  "arg0=" + sb.launcher() + "\narg1=-n\narg2=" + n + "\nargc=3\n");

        EXPECT_EQ(userTree(sb.home()), userTree(sb.path("refhome")));
        for (const char* f : kUserFiles) EXPECT_EQ(readText(ws + "/" + f), readText(refWs + "/" + f)) << f;

        sb.killChildren();
        // With the platform gone, the next launcher is the main one again.
        LaunchResult after = sb.run(single);
        ASSERT_EQ(after.status, 0) << after.describe();
        EXPECT_EQ(after.child().argIndex("-useDaemon"), -1);
    }
}

}  // namespace
