// The two fixed paths the launcher uses in the world-writable /tmp: the
// fallback log /tmp/rcplauncher.log and the preload link
// /tmp/kel.rcp.<user>.<id>.<library>. Another user can plant anything there
// first. The launcher must never write through a planted link into another
// file, never remove or replace another user's entry, and never hand the
// child a preload path that another user controls.
//
// The kernel's own protections for sticky directories (protected_symlinks,
// protected_regular) may or may not be on, so the cases are chosen to hold
// either way: a link planted by the owner of /tmp (root) is followed by the
// kernel for every user, and root itself may remove any entry. Cases that
// plant another user's entry or run the launcher as "nobody" need root and
// are skipped otherwise.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <functional>
#include <string>
#include <vector>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

const int kNobody = 65534;

// What lies at a path: type, owner, and a link's target or a file's bytes.
struct Entry {
    bool present = false;
    mode_t type = 0;
    uid_t owner = 0;
    std::string content;
    bool operator==(const Entry& o) const {
        return present == o.present && type == o.type && owner == o.owner && content == o.content;
    }
};

Entry entryAt(const std::string& path) {
    Entry e;
    struct stat st;
    if (lstat(path.c_str(), &st) != 0) return e;
    e = {true, static_cast<mode_t>(st.st_mode & S_IFMT), st.st_uid, ""};
    char buf[4096];
    ssize_t n = S_ISLNK(st.st_mode) ? readlink(path.c_str(), buf, sizeof buf) : 0;
    if (n > 0) e.content.assign(buf, static_cast<size_t>(n));
    if (S_ISREG(st.st_mode)) e.content = readText(path);
    return e;
}

void removeEntry(const std::string& path) {
    if (entryAt(path).type == S_IFDIR) removeTree(path);
    else unlink(path.c_str());
}

// An entry planted at the fallback log's path before a launch that ends
// before its log directory is known (no base location, with -debug and more
// than a pipe holds queued): the launch ends as always (no hang on a FIFO),
// the entry stays exactly as it was, and no line reaches a file through a
// link or a file another user made (who could read the queued arguments).
TEST(SharedTmp, FallbackLogIsOnlyEverOurOwnFile) {
    const int self = static_cast<int>(geteuid());
    struct Case {
        const char* name;
        int owner;      // who planted the entry
        bool asNobody;  // the launcher's user
        std::function<void(const std::string& victim)> plant;
    };
    auto link = [](const std::string& victim) { ASSERT_EQ(symlink(victim.c_str(), kTmpLog), 0); };
    const Case cases[] = {
        {"the user's own link", self, false, link},
        {"another user's link, launcher run by root", kNobody, false, link},
        {"link of /tmp's owner, launcher run by a user who may write the target", 0, true, link},
        {"a FIFO", self, false, [](const std::string&) { ASSERT_EQ(mkfifo(kTmpLog, 0666), 0); }},
        {"another user's file open to all", kNobody, false,
         [](const std::string&) { writeText(kTmpLog, "another user's log\n", 0666); }},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        if ((c.asNobody || c.owner != self) && geteuid() != 0) {
            std::cout << "skipped (needs root): " << c.name << "\n";
            continue;
        }
        Sandbox sb;
        sb.writeLauncherProperties("rcp.install.id=ID42\n# " + std::string(70000, 'q') + "\n");
        const std::string victim = sb.path("victim");
        writeText(victim, "another file's content\n", 0666);
        RunOptions o;
        o.args = {"-debug"};
        if (c.asNobody) o.uid = o.gid = kNobody;

        sb.beginRuns();  // removes any earlier log
        c.plant(victim);
        ASSERT_EQ(lchown(kTmpLog, static_cast<uid_t>(c.owner), static_cast<gid_t>(c.owner)), 0);
        const Entry planted = entryAt(kTmpLog);
        const Entry target = entryAt(victim);
        const int status = sb.waitFor(sb.start(o));
        const Entry after = entryAt(kTmpLog);
        const Entry targetAfter = entryAt(victim);
        unlink(kTmpLog);

        EXPECT_EQ(status, 255);
        EXPECT_EQ(sb.terminalOutput(), "");
        EXPECT_TRUE(after == planted) << "the planted entry was replaced or written: " << after.content;
        EXPECT_TRUE(targetAfter == target) << "written through the link: " << targetAfter.content;
    }
}

// The preload library's path holds a blank, so the child reaches it through
// the link /tmp/kel.rcp.<user>.<id>.<name>. The launcher makes and uses that
// link only when the entry there is (or becomes) its own link to the
// library: anything another user planted stays as it is and is not handed
// to the child, and the launch still starts the platform.
TEST(SharedTmp, PreloadLinkIsOnlyEverOurOwn) {
    // A user name of this test run, so that runs in parallel do not meet.
    const std::string user = "rcptmp" + std::to_string(getpid());
    const std::string linkPath = "/tmp/kel.rcp." + user + ".ID42.libhook.so";

    struct Case {
        const char* name;
        bool asNobody;
        bool needsRoot;  // plants an entry of another user
        // Plants an entry at the link path; lib is the library, victim a
        // file of someone else.
        std::function<void(const std::string& lib, const std::string& victim)> plant;
        bool used;  // the child gets the link in LD_PRELOAD
    };
    auto plantLink = [&](const std::string& to, int owner) {
        ASSERT_EQ(symlink(to.c_str(), linkPath.c_str()), 0);
        ASSERT_EQ(lchown(linkPath.c_str(), static_cast<uid_t>(owner), static_cast<gid_t>(owner)), 0);
    };
    const std::vector<Case> cases = {
        {"nothing there", false, false, [](const std::string&, const std::string&) {}, true},
        {"our own link to another library", false, false,
         [&](const std::string&, const std::string& victim) { plantLink(victim, static_cast<int>(geteuid())); }, true},
        {"another user's link to another file", false, true,
         [&](const std::string&, const std::string& victim) { plantLink(victim, kNobody); }, false},
        {"another user's regular file", false, true,
         [&](const std::string&, const std::string&) {
             writeText(linkPath, "planted\n", 0666);
             ASSERT_EQ(chown(linkPath.c_str(), kNobody, kNobody), 0);
         },
         false},
        {"root's link to another file, launcher run by a user", true, true,
         [&](const std::string&, const std::string& victim) { plantLink(victim, 0); }, false},
    };

    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        if (c.needsRoot && geteuid() != 0) {
            std::cout << "skipped (needs root): " << c.name << "\n";
            continue;
        }
        Sandbox sb;
        const std::string lib = sb.path("lib dir/libhook.so");
        const std::string victim = sb.path("victim.so");
        sb.setupInstall("user", "", "library.preload=" + lib + "\n");
        writeText(lib, "not really a library\n");
        writeText(victim, "someone else's file\n", 0666);
        RunOptions o;
        o.env = {{"USER", user}};
        if (c.asNobody) {
            o.uid = o.gid = kNobody;
            ASSERT_EQ(chown(sb.home().c_str(), kNobody, kNobody), 0);
        }

        removeEntry(linkPath);
        c.plant(lib, victim);
        if (::testing::Test::HasFatalFailure()) return;
        const Entry planted = entryAt(linkPath);
        const Entry victimBefore = entryAt(victim);
        LaunchResult r = sb.run(o);
        const Entry after = entryAt(linkPath);
        removeEntry(linkPath);

        EXPECT_EQ(r.status, 0) << r.describe();
        ASSERT_TRUE(r.hasChild());
        EXPECT_TRUE(entryAt(victim) == victimBefore) << "written through the link";
        const auto preload = r.child().env.find("LD_PRELOAD");
        const bool linkUsed = preload != r.child().env.end() && preload->second.find(linkPath) != std::string::npos;
        EXPECT_EQ(linkUsed, c.used);
        if (c.used) {
            EXPECT_EQ(preload->second, linkPath);
            EXPECT_EQ(after.type, static_cast<mode_t>(S_IFLNK));
            EXPECT_EQ(after.content, lib);
            EXPECT_EQ(after.owner, geteuid());
        } else {
            EXPECT_TRUE(after == planted) << "another user's entry was replaced";
        }
    }
}

}  // namespace
