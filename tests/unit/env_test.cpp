// The child's environment: "env.set" variables, the library path, the
// preloaded library and its link under /tmp, and JAVA_HIGH_ZIPFDS.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

#include "cmd_test_support.h"

using rcptest::PropArray;
using rcptest::TempDir;

namespace {

std::string env(const char* name) {
    const char* v = getenv(name);
    return v != nullptr ? v : "<unset>";
}

TEST(EnvTest, VariablesLibraryPathAndZipLimit) {
    cmdtest::resetCommandState(user);
    setenv("CMDT_LEFT", "inherited", 1);
    setenv("JAVA_HIGH_ZIPFDS", "7", 1);
    PropArray install{{L"env.set.CMDT_A", L"first"}, {L"env.setCMDT_B", L"no dot"},  // 8 characters dropped
                      {L"env.set", L"too short"},    {L"env.set.", L"no name"},
                      {L"env.set.CMDT_A", L"second"}, {L"env.set.CMDT_LEFT", L""}};
    addEnvSetToCommandLine(install.v());
    addEnvJavaHighZipfds(install.v());
    EXPECT_EQ(env("CMDT_A"), "second");
    EXPECT_EQ(env("MDT_B"), "no dot");
    EXPECT_EQ(env("CMDT_LEFT"), "");
    EXPECT_EQ(env("JAVA_HIGH_ZIPFDS"), "500");
    PropArray zip{{L"env.JAVA_HIGH_ZIPFDS", L"1024"}};
    addEnvJavaHighZipfds(zip.v());
    EXPECT_EQ(env("JAVA_HIGH_ZIPFDS"), "1024");

    struct Case {
        const char *prepend, *inherited, *append, *expected;  // null: absent / unset
    };
    const Case cases[] = {
        {nullptr, nullptr, nullptr, nullptr}, {nullptr, "/c", nullptr, "/c"}, {nullptr, nullptr, "/a", "/a"},
        {"/p", "/c", "/a", "/p:/c:/a"},       {"/p", nullptr, "/a", "/p:/a"},
        // An empty piece would mean "the current directory": never written.
        {nullptr, "", "/a", "/a"},            {"", "/c", nullptr, "/c"},      {"", nullptr, "", nullptr},
    };
    for (const Case& c : cases) {
        if (c.inherited) setenv("LD_LIBRARY_PATH", c.inherited, 1);
        else unsetenv("LD_LIBRARY_PATH");
        PropArray lib;
        for (auto kv : {std::make_pair(L"library.path.prepend", c.prepend),
                        std::make_pair(L"library.path.append", c.append)}) {
            if (!kv.second) continue;
            lib.v().push_back(copyString(kv.first));
            lib.v().push_back(copyString(rcptest::widen(kv.second).c_str()));
        }
        addLibpathToCommandLine(lib.v());
        EXPECT_EQ(env("LD_LIBRARY_PATH"), c.expected ? c.expected : "<unset>")
            << (c.prepend ? c.prepend : "-") << "|" << (c.inherited ? c.inherited : "-") << "|"
            << (c.append ? c.append : "-");
    }
    unsetenv("LD_LIBRARY_PATH");
}

class PreloadTest : public ::testing::Test {
protected:
    void SetUp() override {
        cmdtest::resetCommandState(user);
        setenv("USER", "cmdtester", 1);
        unsetenv("LD_PRELOAD");
        id_ = "cmdt" + std::to_string(getpid());
        rcptest::writeText(dir_.sub("my libs/libhook.so"), "", 0755);
        library_ = dir_.sub("my libs/libhook.so");
        link_ = "/tmp/kel.rcp.cmdtester." + id_ + ".libhook.so";
        unlink(link_.c_str());
    }
    void TearDown() override {
        unlink(link_.c_str());
        unsetenv("LD_PRELOAD");
    }
    void preload() { setPreload(rcptest::widen(library_).c_str(), rcptest::widen(id_).c_str()); }
    std::string linkTarget() {
        char buf[4096];
        ssize_t n = readlink(link_.c_str(), buf, sizeof buf);
        return n < 0 ? "<no link>" : std::string(buf, static_cast<size_t>(n));
    }

    TempDir dir_;
    std::string id_, library_, link_;
};

TEST_F(PreloadTest, PathsWithoutBlanksAreSetDirectlyOthersThroughOurLink) {
    PropArray install{{L"library.preload", L"/does/not/exist.so"}, {L"rcp.install.id", L"ID"}};
    addLdPreloadToCommandLine(install.v());
    EXPECT_EQ(env("LD_PRELOAD"), "/does/not/exist.so");

    unsetenv("LD_PRELOAD");  // blanks, but no such library: nothing is set
    setPreload(rcptest::widen(dir_.sub("my libs/none.so")).c_str(), L"ID");
    EXPECT_EQ(env("LD_PRELOAD"), "<unset>");

    setDebug(true);
    preload();
    EXPECT_EQ(linkTarget(), library_);
    EXPECT_EQ(env("LD_PRELOAD"), link_);
    for (const std::string& line : {"setPreload():linkPath=" + link_, std::string("setPreload(): symlink() result = 0"),
                                    "setPreload():getenv LD_PRELOAD=" + link_})
        EXPECT_NE(getLogQueue().find(line + "\n"), std::string::npos) << line;

    // A later launch keeps the link that already points to the library.
    struct stat before, after;
    ASSERT_EQ(lstat(link_.c_str(), &before), 0);
    preload();
    ASSERT_EQ(lstat(link_.c_str(), &after), 0);
    EXPECT_EQ(before.st_ino, after.st_ino);
}

TEST_F(PreloadTest, OnlyOurOwnLinkIsReplacedOrUsed) {
    const uid_t me = geteuid();
    const uid_t stranger = me == 0 ? 54321 : me;
    struct Case {
        const char* what;
        std::string target;  // planted link's target; empty: a regular file
        uid_t owner;
        bool ours;  // afterwards our link, and LD_PRELOAD on it
    };
    const Case cases[] = {
        {"our link elsewhere", dir_.sub("other.so"), me, true},
        {"a regular file", "", me, false},
        {"someone else's link to our library", library_, stranger, false},
        {"someone else's link elsewhere", dir_.sub("other.so"), stranger, false},
    };
    for (const Case& c : cases) {
        if (c.owner != me && me != 0) continue;  // planting for someone else needs root
        unlink(link_.c_str());
        unsetenv("LD_PRELOAD");
        if (c.target.empty()) rcptest::writeText(link_, "planted");
        else ASSERT_EQ(symlink(c.target.c_str(), link_.c_str()), 0);
        ASSERT_EQ(lchown(link_.c_str(), c.owner, static_cast<gid_t>(-1)), 0);

        preload();
        struct stat st;
        ASSERT_EQ(lstat(link_.c_str(), &st), 0) << c.what;
        EXPECT_EQ(env("LD_PRELOAD"), c.ours ? link_ : "<unset>") << c.what;
        if (c.ours) {
            EXPECT_EQ(linkTarget(), library_) << c.what;
        } else {  // left exactly as planted
            EXPECT_EQ(st.st_uid, c.owner) << c.what;
            EXPECT_EQ(c.target.empty() ? rcptest::readText(link_) : linkTarget(),
                      c.target.empty() ? "planted" : c.target)
                << c.what;
        }
    }
}

TEST_F(PreloadTest, FatalCases) {
    TempDir logDir;
    PropArray noId{{L"library.preload", L"/lib/x.so"}};
    EXPECT_FATAL_IN(logDir, addLdPreloadToCommandLine(noId.v()), "RLNCH0005E: Couldn't find the rcp.install.id property!");
    rcptest::writeText(dir_.sub("lib with blank.so"), "");
    EXPECT_FATAL_IN(logDir, if (chdir(dir_.path().c_str()) == 0) setPreload(L"lib with blank.so", L"ID"),
                    "RLNCH0189E: Couldn't find filename for library.preload property");
    EXPECT_FATAL_IN(logDir, unsetenv("USER"); preload(), "RLNCH0006E: Couldn't find the user name!");
}

}  // namespace
