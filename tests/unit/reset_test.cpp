// Resetting a configuration area and starting a fresh one for a workspace
// left by another installation.
#include <gtest/gtest.h>
#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <functional>
#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::isDir;
using rcptest::pathExists;
using rcptest::readText;
using rcptest::TempDir;
using rcptest::widen;
using rcptest::writeText;

namespace {

std::vector<std::string> listDir(const std::string& dir) {
    std::vector<std::string> names;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d)) {
            std::string n = e->d_name;
            if (n != "." && n != "..") names.push_back(n);
        }
        closedir(d);
    }
    std::sort(names.begin(), names.end());
    return names;
}

class ResetTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetLoggingForTest();
        rcptest::makeDirs(tmp.sub("log"));
        ASSERT_TRUE(enableLogging(tmp.wsub("log")));
        eConfig = user;
    }
    void TearDown() override { resetLoggingForTest(); }
    std::string log() const { return readText(tmp.sub("log/rcplauncher.log")); }
    std::string ws(const std::string& rel = "") const { return tmp.sub(rel.empty() ? "ws" : "ws/" + rel); }
    std::wstring wws() const { return tmp.wsub("ws"); }
    std::wstring wcfg() const { return tmp.wsub("ws/.config"); }
    std::wstring wcore() const { return tmp.wsub("core"); }

    // A used area: user properties listing reset directories, config.ini,
    // the update manager's files, and plug-in state in the workspace.
    void makeArea(const std::string& props, bool registry = true, bool platformXml = true) {
        writeText(ws(".config/rcpinstall.properties"), props);
        writeText(ws(".config/config.ini"), "ini\n");
        if (registry) writeText(ws(".config/org.eclipse.update/registry"), "reg 1\nreg 2\n");
        if (platformXml) writeText(ws(".config/org.eclipse.update/platform.xml"), "<old/>\n");
        for (const char* p : {"org.x", "org.y", "org.z"}) writeText(ws(".metadata/.plugins/") + p + "/state", p);
    }
    TempDir tmp;
};

TEST_F(ResetTest, ResetKeepsRegistryBacksUpTheAreaAndClearsListedPluginState) {
    makeArea("resetDir.a=org.x\nresetDir.b = org.y\nresetDir.c=org.missing\nresetDir.d=../../outside\nother=org.z\n");
    writeText(tmp.sub("outside/keep"), "mine");
    writeText(ws(".configbak/stale"), "older backup");

    resetWorkspace(wws(), wcfg(), wcore());

    EXPECT_EQ(listDir(ws(".metadata/.plugins")), std::vector<std::string>{"org.z"});
    EXPECT_EQ(readText(tmp.sub("outside/keep")), "mine");  // never outside the plug-in state
    EXPECT_EQ(listDir(ws(".config")), std::vector<std::string>{"org.eclipse.update"});
    EXPECT_EQ(listDir(ws(".config/org.eclipse.update")), std::vector<std::string>{"registry"});
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "reg 1\nreg 2\n");
    EXPECT_EQ(listDir(ws(".configbak")),
              (std::vector<std::string>{"config.ini", "org.eclipse.update", "rcpinstall.properties"}));
    EXPECT_EQ(readText(ws(".configbak/org.eclipse.update/platform.xml")), "<old/>\n");
    EXPECT_FALSE(pathExists(ws("registry.old")));
    EXPECT_FALSE(pathExists(ws("platform.xml.old")));

    // a second reset replaces the first backup; the area now lacks its user
    // properties, so the list comes from the base copy
    writeText(ws(".config/marker"), "second");
    writeText(tmp.sub("core/config/user/rcpinstall.properties"), "resetDir.all=\n");
    resetWorkspace(wws(), wcfg(), wcore());
    EXPECT_EQ(listDir(ws(".configbak")), (std::vector<std::string>{"marker", "org.eclipse.update"}));
    EXPECT_FALSE(pathExists(ws(".metadata/.plugins")));  // an empty value names the whole directory
    EXPECT_TRUE(isDir(ws(".metadata")));
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "reg 1\nreg 2\n");
}

TEST_F(ResetTest, ResetWithoutRegistryOrListStillGivesAFreshArea) {
    makeArea("k=v\n", false, false);
    resetWorkspace(wws(), wcfg(), wcore());
    EXPECT_EQ(listDir(ws(".config")), std::vector<std::string>{"org.eclipse.update"});
    EXPECT_TRUE(listDir(ws(".config/org.eclipse.update")).empty());
    EXPECT_EQ(listDir(ws(".metadata/.plugins")), (std::vector<std::string>{"org.x", "org.y", "org.z"}));
    EXPECT_NE(log().find("RLNCH0110I: '" + ws(".config/org.eclipse.update/registry") + "' not found"),
              std::string::npos)
        << log();

    // a registry.old directory left in the way is replaced by the saved copy
    writeText(ws(".config/org.eclipse.update/registry"), "r\n");
    writeText(ws("registry.old/sub/f"), "left over");
    handleCopy(wws(), L"registry.old", wcfg() + L"/org.eclipse.update", L"registry", true, false);
    EXPECT_EQ(readText(ws("registry.old")), "r\n");
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "r\n");

    // a registry.old left by a reset that stopped half-way is the user's
    // registry: the next reset carries it into the fresh area
    rcptest::removeTree(ws(".config/org.eclipse.update/registry"));
    writeText(tmp.sub("core/rcpinstall.properties"), "k=v\n");
    resetWorkspace(wws(), wcfg(), wcore());
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "r\n");
    EXPECT_FALSE(pathExists(ws("registry.old")));
}

TEST_F(ResetTest, ReusableWorkspaceNeedsPlatformXmlAndLeavesPluginStateAlone) {
    makeArea("resetDir.a=org.x\n");
    writeText(ws("platform.xml.old"), "older\n");
    createReusableWorkspace(wws(), wcfg());
    EXPECT_EQ(readText(ws("platform.xml.old")), "<old/>\n");
    EXPECT_EQ(listDir(ws(".metadata/.plugins")), (std::vector<std::string>{"org.x", "org.y", "org.z"}));
    EXPECT_EQ(listDir(ws(".config/org.eclipse.update")), std::vector<std::string>{"registry"});
    EXPECT_EQ(readText(ws(".configbak/rcpinstall.properties")), "resetDir.a=org.x\n");

    // the fresh area has no platform.xml: a second attempt cannot proceed
    EXPECT_EXIT(createReusableWorkspace(wws(), wcfg()), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0109E: Unable to locate '" + ws(".config/org.eclipse.update/platform.xml") +
                         "' for copying : "),
              std::string::npos)
        << log();
    EXPECT_EQ(listDir(ws(".config/org.eclipse.update")), std::vector<std::string>{"registry"});
}

TEST_F(ResetTest, FailuresEndTheLaunchWithTheirMessages) {
    const std::string notADir = "-  Failed with error 20: Not a directory\n";
    struct Case {
        const char* name;  // also the case's directory below the temp dir
        std::function<void(const std::string&)> setup;
        std::function<void(const std::string&)> run;
        std::function<std::string(const std::string&)> message;
    };
    const Case cases[] = {
        {"noprops", [](const std::string& b) { rcptest::makeDirs(b + "/ws/.config"); },
         [](const std::string& b) { resetMetaDataDirs(widen(b + "/ws"), widen(b + "/ws/.config"), widen(b + "/core")); },
         [](const std::string& b) { return "RLNCH0106E: Unable to locate " + b + "/core/rcpinstall.properties file. : "; }},
        // a link inside the state is followed for its contents but cannot be
        // removed with rmdir, so the removal reports it
        {"pluginstate",
         [](const std::string& b) {
             writeText(b + "/ws/.config/rcpinstall.properties", "resetDir.a=org.x\n");
             rcptest::makeDirs(b + "/target");
             rcptest::makeDirs(b + "/ws/.metadata/.plugins/org.x");
             ASSERT_EQ(symlink((b + "/target").c_str(), (b + "/ws/.metadata/.plugins/org.x/link").c_str()), 0);
         },
         [](const std::string& b) { resetWorkspace(widen(b + "/ws"), widen(b + "/ws/.config"), widen(b + "/core")); },
         [&](const std::string& b) {
             return "\nRLNCH0107E begin: Error removing metadata plugin directory\nCan't delete dir " + b +
                    "/ws/.metadata/.plugins/org.x/link  " + notADir +
                    "\nRLNCH0108E end: Unable to remove all files in the metadata plugin directory. Please correct "
                    "the problems listed above : ";
         }},
        {"olddir",
         [](const std::string& b) {
             writeText(b + "/src", "s");
             rcptest::makeDirs(b + "/target");
             rcptest::makeDirs(b + "/dst/old");
             ASSERT_EQ(symlink((b + "/target").c_str(), (b + "/dst/old/link").c_str()), 0);
         },
         [](const std::string& b) { handleFileMove(widen(b + "/dst"), L"old", widen(b), L"src", true); },
         [&](const std::string& b) {
             return "\nRLNCH0083E begin: Error removing old directory\nCan't delete dir " + b + "/dst/old/link  " +
                    notADir +
                    "\nRLNCH0084E end: Unable to remove all files in the old directory. Please correct the problems "
                    "listed above : ";
         }},
        {"move", [](const std::string& b) { rcptest::makeDirs(b + "/srcdir/sub"); },
         [](const std::string& b) { handleDirMove(widen(b + "/srcdir/sub/inside"), widen(b + "/srcdir"), true); },
         [](const std::string& b) { return "RLNCH0112E: Can't move file/dir  '" + b + "/srcdir' : "; }},
        // a file the system will not delete, even for root
        {"delete", [](const std::string& b) { writeText(b + "/src", "s"); },
         [](const std::string& b) { handleCopy(L"/proc", L"version", widen(b), L"src", true, false); },
         [](const std::string&) { return std::string("RLNCH0111E: Can't delete old copy of file '/proc/version' : "); }},
        {"missing", [](const std::string&) {},
         [](const std::string& b) { handleFileMove(widen(b), L"d", widen(b), L"s", true); },
         [](const std::string& b) { return "RLNCH0109E: Unable to locate '" + b + "/s' for copying : "; }},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string base = tmp.sub(c.name);
        rcptest::makeDirs(base);
        c.setup(base);
        EXPECT_EXIT(c.run(base), ::testing::ExitedWithCode(255), "");
        EXPECT_NE(log().find(c.message(base)), std::string::npos) << log();
    }
    // the optional source that is missing changes nothing
    handleFileMove(tmp.wpath(), L"d", tmp.wpath(), L"s", false);
    EXPECT_FALSE(pathExists(tmp.sub("d")));
}

}  // namespace
