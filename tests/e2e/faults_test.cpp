// Launches that meet a broken or hostile file system: areas that cannot be
// written, a read-only launcher properties file that must be appended to, a
// reset whose backup cannot be made, a full disk, and launchers killed at
// random moments of a first launch. Each must end with its message and
// status, never a crash or a hang, and must not lose a file that was there.
//
// The tests run as root, for whom permission bits mean nothing. What can be
// simulated without privileges is simulated with the file system's own
// shapes: a regular file where a directory is expected, a path through a
// file, a directory where a file is expected, FIFOs, links and devices where
// files are expected. Where only permissions can do it (an unwritable home, a
// read-only properties file), the launcher runs as the user "nobody" (the
// sandbox drops privileges in the forked child); a full disk is a small
// tmpfs. Those cases are skipped when the tests do not run as root. Not
// simulated: a rename across file systems and a directory that even root
// cannot remove (both need immutable attributes or more mounts).
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <functional>
#include <map>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

const int kNobody = 65534;

std::string errorLine(const std::string& message, int err) { return message + " : " + strerror(err); }

std::string lastLine(const std::string& log) {
    std::vector<std::string> lines = logLines(log);
    return lines.empty() ? "" : lines.back();
}

// Hands a tree (its root included) to another owner, links included.
void chownTree(const std::string& root, int uid) {
    ASSERT_EQ(lchown(root.c_str(), static_cast<uid_t>(uid), static_cast<gid_t>(uid)), 0) << root;
    for (const auto& rel : listTree(root)) {
        std::string p = root + "/" + rel;
        if (!rel.empty() && rel.back() == '/') p.pop_back();
        ASSERT_EQ(lchown(p.c_str(), static_cast<uid_t>(uid), static_cast<gid_t>(uid)), 0) << p;
    }
}

// The regular files below root with their bytes and times, except the log
// and the lock file, which every launch rewrites by design.
std::map<std::string, FileState> userFiles(const std::string& root) {
    std::map<std::string, FileState> files;
    for (const auto& rel : listTree(root)) {
        struct stat st;
        // Only regular files: a link to a device (/dev/full) reads forever.
        if (lstat((root + "/" + rel).c_str(), &st) != 0 || !S_ISREG(st.st_mode)) continue;
        if (rel.find("logs/rcplauncher.log") != std::string::npos || rel.find(".rcp.lock") != std::string::npos)
            continue;
        files[rel] = fileState(root + "/" + rel);
    }
    return files;
}

void expectKept(const std::map<std::string, FileState>& before, const std::string& root) {
    for (const auto& f : before) EXPECT_TRUE(fileState(root + "/" + f.first) == f.second) << "changed or lost: " << f.first;
}

// A broken area, the launch that meets it, and the line it must end with.
// In the message "%W" stands for the default workspace, "%C" for its
// configuration area, "%S" for the sandbox root and "%P" for the launcher
// properties.
struct Fault {
    const char* name;
    bool asNobody;   // needs a user for whom permissions count
    bool inTmpLog;   // the launch ends before its log directory is known
    std::function<void(Sandbox&, RunOptions&)> prepare;
    std::string message;
    int err;         // the errno the error line reports
};

const int kAnyErrno = -1;

// A first launch, then "-resetconfig"; for a user, the workspace becomes
// root's (and not writable for others) while all in it is the user's.
void resetAfterFirstLaunch(Sandbox& sb, RunOptions& o, bool lockWorkspace) {
    ASSERT_EQ(sb.run().status, 0);
    o.args = {"-resetconfig"};
    if (!lockWorkspace) return;
    chownTree(sb.defaultWorkspace(), kNobody);
    ASSERT_EQ(chown(sb.defaultWorkspace().c_str(), 0, 0), 0);
    ASSERT_EQ(chmod(sb.defaultWorkspace().c_str(), 0755), 0);
}

std::string expand(std::string text, const Sandbox& sb) {
    const std::map<std::string, std::string> names = {
        {"%W", sb.defaultWorkspace()}, {"%C", sb.defaultConfig()}, {"%S", sb.root()}, {"%P", sb.launcherProperties()}};
    for (const auto& n : names)
        for (size_t p; (p = text.find(n.first)) != std::string::npos;) text.replace(p, 2, n.second);
    return text;
}

TEST(Faults, UnwritableAreasEndWithTheirMessage) {
    const std::string cannotCreate = "RLNCH0010E: Unable to create ";
    const std::vector<Fault> faults = {
        {"home is a regular file", false, true,
         [](Sandbox& sb, RunOptions&) {
             removeTree(sb.home());
             writeText(sb.home(), "not a directory\n");
         },
         cannotCreate + "%W directory.", ENOTDIR},
        // mkdirs reports its last level: the levels below the refused one
        // are missing.
        {"home not writable by the user", true, true, [](Sandbox&, RunOptions&) {},
         cannotCreate + "%W directory.", ENOENT},
        {"workspace is a regular file", false, true,
         [](Sandbox& sb, RunOptions& o) {
             sb.writeFile("wsfile", "user data\n");
             o.args = {"-data", sb.path("wsfile")};
         },
         cannotCreate + "%S/wsfile directory.", EEXIST},
        {"log directory is a regular file", false, true,
         [](Sandbox& sb, RunOptions&) { writeText(sb.defaultWorkspace() + "/logs", "x\n"); },
         cannotCreate + "%W/logs directory.", EEXIST},
        {"log file is a directory", false, true,
         [](Sandbox& sb, RunOptions&) { makeDirs(sb.defaultWorkspace() + "/logs/rcplauncher.log"); },
         "RLNCH0019E: Could not open %W/logs/rcplauncher.log for writing!", EISDIR},
        {"workspace not writable by the user", true, true,
         [](Sandbox& sb, RunOptions&) { makeDirs(sb.defaultWorkspace()); }, cannotCreate + "%W/logs directory.",
         EACCES},
        {"lock file is a directory", false, false,
         [](Sandbox& sb, RunOptions&) { makeDirs(sb.defaultWorkspace() + "/.rcp.lock"); },
         "RLNCH0054E: Error locating platform lock file", EISDIR},
        {"configuration area is a regular file", false, false,
         [](Sandbox& sb, RunOptions&) { writeText(sb.defaultConfig(), "x\n"); }, cannotCreate + "%C directory.",
         EEXIST},
        {"configuration area not writable by the user", true, false,
         [](Sandbox& sb, RunOptions&) {
             makeDirs(sb.defaultConfig());
             makeDirs(sb.defaultWorkspace() + "/logs");
             chownTree(sb.defaultWorkspace(), kNobody);
             ASSERT_EQ(chown(sb.defaultConfig().c_str(), 0, 0), 0);
         },
         "RLNCH0019E: Could not open %C/args.properties for writing!", EACCES},
        // In a workspace other users may write, the lock file could be a
        // link to anything: it is never followed, so nothing is created or
        // overwritten where it points (the file starts with a digit, as a
        // lock file would).
        {"lock file is a link to another file", false, false,
         [](Sandbox& sb, RunOptions&) {
             writeText(sb.home() + "/victim", "1234 first line\n");
             makeDirs(sb.defaultWorkspace());
             ASSERT_EQ(symlink((sb.home() + "/victim").c_str(), (sb.defaultWorkspace() + "/.rcp.lock").c_str()), 0);
         },
         "RLNCH0054E: Error locating platform lock file", ELOOP},
        // A FIFO would block the open for ever, a device be read without end:
        // files the launcher reads must be regular files.
        {"launcher properties are a FIFO", false, true,
         [](Sandbox& sb, RunOptions&) {
             unlink(sb.launcherProperties().c_str());
             ASSERT_EQ(mkfifo(sb.launcherProperties().c_str(), 0644), 0);
         },
         "RLNCH0014E: Unable to load %P file!", EINVAL},
        {"per-user installation properties are a FIFO", false, false,
         [](Sandbox& sb, RunOptions&) {
             makeDirs(sb.defaultConfig());
             ASSERT_EQ(mkfifo((sb.defaultConfig() + "/rcpinstall.properties").c_str(), 0644), 0);
         },
         "RLNCH0014E: Unable to load %C/rcpinstall.properties file!", EINVAL},
        {"base installation properties are a link to /dev/zero", false, false,
         [](Sandbox& sb, RunOptions&) {
             unlink((sb.base() + "/rcpinstall.properties").c_str());
             ASSERT_EQ(symlink("/dev/zero", (sb.base() + "/rcpinstall.properties").c_str()), 0);
         },
         "RLNCH0190E: Unable to open source file %S/inst/base/rcpinstall.properties to be copied", EINVAL},
        {"update directory is a regular file", false, false,
         [](Sandbox& sb, RunOptions&) { writeText(sb.defaultConfig() + "/org.eclipse.update", "x\n"); },
         cannotCreate + "%C/org.eclipse.update directory.", EEXIST},
        {"read-only launcher properties of a package-builder install", true, true,
         [](Sandbox& sb, RunOptions&) {
             sb.writeLauncherProperties("rcp.base.location=${rcp.home}/base\n"
                                        "jvm.location=${rcp.home}/jre/bin/java\n"
                                        "install.configuration=userpb\n");
             ASSERT_EQ(chmod(sb.launcherProperties().c_str(), 0444), 0);
         },
         "RLNCH0017E: Could not open %P to append rcp.install.id!", EACCES},
        // A reset moves the configuration area to "<area>bak" after removing
        // an older backup; when either cannot be done the area stays as it
        // was. Removing a tree follows links (the data areas are not meant to
        // hold any), so a dangling link cannot be examined and stays: root
        // meets a backup it cannot remove. For a user, a workspace directory
        // that is not writable refuses both the removal and the rename.
        {"reset meets an old backup holding a dangling link", false, false,
         [](Sandbox& sb, RunOptions& o) {
             resetAfterFirstLaunch(sb, o, false);
             makeDirs(sb.defaultConfig() + "bak");
             ASSERT_EQ(symlink("/nonexistent/target", (sb.defaultConfig() + "bak/dangling").c_str()), 0);
         },
         "RLNCH0084E end: Unable to remove all files in the old directory. Please correct the problems listed above",
         kAnyErrno},
        {"reset meets an old backup file the user may not delete", true, false,
         [](Sandbox& sb, RunOptions& o) {
             resetAfterFirstLaunch(sb, o, true);
             writeText(sb.defaultConfig() + "bak", "old\n");
         },
         "RLNCH0111E: Can't delete old copy of file '%Cbak'", EACCES},
        {"reset in a workspace that does not let the user rename the area", true, false,
         [](Sandbox& sb, RunOptions& o) { resetAfterFirstLaunch(sb, o, true); },
         "RLNCH0112E: Can't move file/dir  '%C'", EACCES},
    };

    for (const Fault& f : faults) {
        SCOPED_TRACE(f.name);
        if (f.asNobody && geteuid() != 0) {
            std::cout << "skipped (needs root to run the launcher as nobody): " << f.name << "\n";
            continue;
        }
        Sandbox sb;
        sb.setupInstall("user");
        RunOptions o;
        if (f.asNobody) o.uid = o.gid = kNobody;
        f.prepare(sb, o);
        if (::testing::Test::HasFatalFailure()) return;
        const auto homeBefore = userFiles(sb.home());
        const auto instBefore = userFiles(sb.inst());

        LaunchResult r = sb.run(o);
        EXPECT_EQ(r.status, 255) << r.describe();
        EXPECT_FALSE(r.hasChild());
        EXPECT_EQ(r.terminal, "");
        EXPECT_EQ(r.tmpLogWritten, f.inTmpLog) << r.describe();
        const std::string last = lastLine(f.inTmpLog ? r.tmpLog : r.log);
        if (f.err == kAnyErrno) EXPECT_TRUE(isErrorLine(last, expand(f.message, sb))) << r.describe();
        else EXPECT_EQ(last, errorLine(expand(f.message, sb), f.err)) << r.describe();
        expectKept(homeBefore, sb.home());
        expectKept(instBefore, sb.inst());
    }
}

// A small tmpfs at a directory of the sandbox, unmounted however the test
// ends.
class SmallDisk {
public:
    explicit SmallDisk(const std::string& dir) : dir_(dir) { makeDirs(dir); }
    ~SmallDisk() { unmount(); }
    bool mountWith(long bytes) {
        unmount();
        mounted_ = mount("tmpfs", dir_.c_str(), "tmpfs", 0, ("size=" + std::to_string(bytes)).c_str()) == 0;
        return mounted_;
    }
    // Room for more, or (bytes = 0) exactly what is used now: full.
    bool resize(long bytes) {
        struct statvfs v;
        if (bytes == 0 && statvfs(dir_.c_str(), &v) == 0) bytes = static_cast<long>((v.f_blocks - v.f_bfree) * v.f_frsize);
        return mount("tmpfs", dir_.c_str(), "tmpfs", MS_REMOUNT, ("size=" + std::to_string(bytes)).c_str()) == 0;
    }
    void unmount() {
        if (mounted_) umount2(dir_.c_str(), MNT_DETACH);
        mounted_ = false;
    }

private:
    std::string dir_;
    bool mounted_ = false;
};

// The disk fills at any moment of a first launch: for every amount of free
// space (in pages), the launch starts the platform or ends with its message,
// every file it writes for the user is complete or absent (a missing
// platform.xml is only reported with -debug; a missing per-user
// rcpinstall.properties ends the launch), and once there is room again the
// next launch writes exactly what a launch with room writes. A startup record
// that changed but no longer fits leaves the previous one.
TEST(Faults, FullDiskLeavesEveryFileCompleteOrAbsent) {
    if (geteuid() != 0) GTEST_SKIP() << "needs root to mount a small tmpfs";
    Sandbox sb;
    // Base files of several pages, so that a copy can be cut half-way.
    sb.setupInstall("user", "", "# " + std::string(20000, 'p') + "\n");
    std::string xml = "<config>\n";
    while (xml.size() < 40000) xml += "  <site url=\"platform:/base/" + std::to_string(xml.size()) + "\"/>\n";
    sb.writeBase("platform.xml", xml + "</config>\n");
    SmallDisk disk(sb.path("disk"));
    const long room = 1 << 20, page = 4096;
    if (!disk.mountWith(room)) GTEST_SKIP() << "cannot mount a tmpfs here: " << strerror(errno);
    RunOptions o;
    o.args = {"-data", sb.path("disk/ws")};
    const std::string cfg = sb.path("disk/ws/.config"), log = sb.path("disk/ws/logs/rcplauncher.log");
    ASSERT_EQ(sb.run(o).status, 0);
    const auto reference = userFiles(cfg);
    const auto referenceTree = listTree(cfg);
    ASSERT_EQ(reference.size(), 4u);

    std::set<std::string> endings;
    for (long pages = 1;; pages++) {  // (a size of 0 means no limit)
        SCOPED_TRACE(std::to_string(pages) + " pages free");
        ASSERT_TRUE(disk.mountWith(pages * page));
        LaunchResult r = sb.run(o);
        EXPECT_EQ(r.terminal, "");
        const std::string last = lastLine(r.tmpLogWritten ? r.tmpLog : readText(log));
        if (r.status == 255) {
            EXPECT_FALSE(r.hasChild());
            endings.insert(last.substr(0, last.find(':')));
        } else {
            EXPECT_EQ(r.status, 0) << r.describe();
        }
        for (const auto& f : userFiles(cfg)) {
            EXPECT_TRUE(reference.count(f.first)) << "left behind: " << f.first;
            if (reference.count(f.first)) {
                EXPECT_EQ(f.second.bytes, reference.at(f.first).bytes) << f.first;
            }
        }
        const bool everything = r.status == 0 && userFiles(cfg).size() == reference.size();
        ASSERT_TRUE(disk.resize(room));
        ASSERT_EQ(sb.run(o).status, 0);
        EXPECT_EQ(listTree(cfg), referenceTree);
        for (const auto& f : userFiles(cfg)) EXPECT_EQ(f.second.bytes, reference.at(f.first).bytes) << f.first;
        if (everything || ::testing::Test::HasFailure() || pages > 64) break;
    }
    // Among the endings: the per-user properties could not be completed.
    EXPECT_TRUE(endings.count("RLNCH0014E")) << ::testing::PrintToString(endings);

    const std::string record = readText(cfg + "/args.properties");
    ASSERT_TRUE(disk.resize(0));
    RunOptions changed = o;
    changed.args.push_back("-changed");
    LaunchResult r = sb.run(changed);
    EXPECT_EQ(r.status, 255);
    EXPECT_EQ(lastLine(readText(log)), errorLine("RLNCH0020E: Error writing to " + cfg + "/args.properties file.", ENOSPC));
    EXPECT_EQ(readText(cfg + "/args.properties"), record);
    EXPECT_EQ(listTree(cfg), referenceTree);
}

// Waits until every process this test started or adopted has ended: a child
// that a killed launcher forked is reparented to the test (a subreaper) and
// must be gone, or the next launch would rightly take it for a platform.
void waitForNoChildren(int timeoutSeconds) {
    auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(timeoutSeconds);
    int status;
    while (std::chrono::steady_clock::now() < deadline) {
        pid_t r = waitpid(-1, &status, WNOHANG);
        if (r < 0 && errno == ECHILD) return;
        if (r == 0) std::this_thread::sleep_for(std::chrono::milliseconds(2));
    }
    ADD_FAILURE() << "children left running";
}

int envNumber(const char* name, int fallback) {
    const char* v = getenv(name);
    return v && *v ? atoi(v) : fallback;
}

// A first launch killed at a random moment (SIGKILL: no handler, no exit
// path) must leave nothing that makes the next launch fail or lose a file:
// the next launch starts the platform as the main process, the user's own
// files are all still there, and the per-user files are the ones a clean
// first launch writes. Every other round runs in an existing workspace
// holding user data ("-data"), the others in a fresh home. The moments are
// spread over the time a whole launch takes, measured here (so sanitizers
// and valgrind stretch them alike). RCP_KILL_ROUNDS and RCP_KILL_SEED
// repeat a longer or a given run.
TEST(Faults, LaunchesKilledAtRandomMomentsLeaveAUsableArea) {
    Sandbox sb;
    sb.setupInstall("user", "", "resetDir.a=org.x\n");
    const int rounds = envNumber("RCP_KILL_ROUNDS", 10);
    const unsigned seed = static_cast<unsigned>(envNumber("RCP_KILL_SEED", static_cast<int>(std::random_device()())));
    std::mt19937 rng(seed);
    SCOPED_TRACE("RCP_KILL_SEED=" + std::to_string(seed));

    // The reference: one clean first launch, timed.
    RunOptions ref;
    ref.env["HOME"] = sb.path("refhome");
    sb.beginRuns();
    auto t0 = std::chrono::steady_clock::now();
    ASSERT_EQ(sb.waitFor(sb.start(ref)), 0);
    const auto launchTime = std::chrono::duration_cast<std::chrono::microseconds>(std::chrono::steady_clock::now() - t0);
    sb.releaseChildren(sb.collectChildren(1), false);
    const std::string refConfig = sb.path("refhome/KEL/RCP/ID42/tester/.config");
    const std::map<std::string, FileState> refFiles = userFiles(refConfig);
    std::uniform_int_distribution<long> delay(0, static_cast<long>(launchTime.count()));

    for (int round = 0; round < rounds; round++) {
        const bool existingWorkspace = round % 2 == 1;
        const std::string home = sb.path("home" + std::to_string(round));
        const std::string data = sb.path("data" + std::to_string(round));
        writeText(home + "/notes.txt", "the user's own file\n");
        RunOptions o;
        o.env["HOME"] = home;
        if (existingWorkspace) {
            writeText(data + "/project/a.txt", "project file\n");
            writeText(data + "/.metadata/.plugins/org.x/state", "plug-in state\n");
            o.args = {"-data", data};
        }
        const std::string ws = existingWorkspace ? data : home + "/KEL/RCP/ID42/tester";
        const std::map<std::string, FileState> userBefore = userFiles(existingWorkspace ? data : home);

        // A child the killed launcher may still have started records
        // elsewhere, so that it is not taken for the next launch's child.
        RunOptions killed = o;
        killed.env["RCP_STUB_RECORD"] = sb.path("killed.record");
        const long us = delay(rng);
        SCOPED_TRACE("round " + std::to_string(round) + ", killed after " + std::to_string(us) + " us");
        sb.beginRuns();
        pid_t pid = sb.start(killed);
        std::this_thread::sleep_for(std::chrono::microseconds(us));
        kill(pid, SIGKILL);
        const int killedStatus = sb.waitFor(pid);
        EXPECT_TRUE(killedStatus == 128 + SIGKILL || killedStatus == 0) << killedStatus;
        waitForNoChildren(15);

        LaunchResult r = sb.run(o);
        ASSERT_EQ(r.status, 0) << r.describe() << readText(ws + "/logs/rcplauncher.log");
        ASSERT_TRUE(r.hasChild());
        EXPECT_EQ(r.child().argIndex("-useDaemon"), -1);
        EXPECT_EQ(r.terminal, "");
        expectKept(userBefore, existingWorkspace ? data : home);
        // The same files as after a clean launch, no work file left over.
        EXPECT_EQ(listTree(ws + "/.config"), listTree(refConfig));
        const std::map<std::string, FileState> files = userFiles(ws + "/.config");
        ASSERT_EQ(files.size(), refFiles.size());
        for (const auto& f : refFiles) {
            if (f.first == "args.properties") continue;  // names the workspace
            EXPECT_EQ(files.at(f.first).bytes, f.second.bytes) << f.first;
        }
        if (::testing::Test::HasFailure()) break;
    }
}

}  // namespace
