// Resetting a configuration area and starting a fresh one for a workspace
// left by another installation.
#include <dirent.h>
#include <unistd.h>

#include <algorithm>
#include <functional>

#include "logged_fixture.h"

using namespace rcptest;

namespace {

using Names = std::vector<std::string>;

Names listDir(const std::string& dir) {
    Names names;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d)) {
            if (std::string(e->d_name) != "." && std::string(e->d_name) != "..") names.push_back(e->d_name);
        }
        closedir(d);
    }
    std::sort(names.begin(), names.end());
    return names;
}

class ResetTest : public LoggedTest {
protected:
    std::string ws(const std::string& rel) const { return tmp.sub("ws/" + rel); }
    std::wstring wws() const { return tmp.wsub("ws"); }
    std::wstring wcfg() const { return tmp.wsub("ws/.config"); }
    // A used area and plug-in state in its workspace.
    void makeArea(const std::string& props, bool registry) {
        writeText(ws(".config/rcpinstall.properties"), props);
        writeText(ws(".config/org.eclipse.update/platform.xml"), "<old/>\n");
        if (registry) writeText(ws(".config/org.eclipse.update/registry"), "reg\n");
        for (const char* p : {"org.x", "org.y", "org.z"}) writeText(ws(".metadata/.plugins/") + p + "/s", p);
    }
};

TEST_F(ResetTest, ResetKeepsRegistryReplacesTheBackupAndClearsListedPluginState) {
    makeArea("resetDir.a=org.x\nresetDir.b = org.y\nresetDir.c=org.none\nresetDir.d=../../../out\n", true);
    writeText(tmp.sub("out/keep"), "mine");
    writeText(ws(".configbak/stale"), "older backup");

    resetWorkspace(wws(), wcfg(), tmp.wsub("core"));
    EXPECT_EQ(listDir(ws(".metadata/.plugins")), Names{"org.z"});
    EXPECT_EQ(readText(tmp.sub("out/keep")), "mine");  // never outside the plug-in state
    EXPECT_EQ(listDir(ws(".config")), Names{"org.eclipse.update"});
    EXPECT_EQ(listDir(ws(".config/org.eclipse.update")), Names{"registry"});
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "reg\n");
    EXPECT_EQ(listDir(ws(".configbak")), (Names{"org.eclipse.update", "rcpinstall.properties"}));
    EXPECT_FALSE(pathExists(ws("registry.old")));

    // second reset: the list comes from the base copy, the backup is replaced
    writeText(tmp.sub("core/config/user/rcpinstall.properties"), "resetDir.all=\n");
    eConfig = user;
    resetWorkspace(wws(), wcfg(), tmp.wsub("core"));
    EXPECT_EQ(listDir(ws(".configbak")), Names{"org.eclipse.update"});
    EXPECT_FALSE(pathExists(ws(".metadata/.plugins")));  // an empty value: the whole directory
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "reg\n");

    // a registry.old left by a reset that stopped half-way is carried over
    removeTree(ws(".config/org.eclipse.update/registry"));
    writeText(ws("registry.old"), "saved\n");
    resetWorkspace(wws(), wcfg(), tmp.wsub("core"));
    EXPECT_EQ(readText(ws(".config/org.eclipse.update/registry")), "saved\n");
}

TEST_F(ResetTest, ReusableWorkspaceSavesPlatformXmlAndLeavesPluginStateAlone) {
    makeArea("resetDir.a=org.x\n", false);
    writeText(ws("platform.xml.old/sub/f"), "in the way");
    createReusableWorkspace(wws(), wcfg());
    EXPECT_EQ(readText(ws("platform.xml.old")), "<old/>\n");
    EXPECT_EQ(listDir(ws(".metadata/.plugins")), (Names{"org.x", "org.y", "org.z"}));
    EXPECT_EQ(listDir(ws(".config")), Names{"org.eclipse.update"});
    EXPECT_TRUE(listDir(ws(".config/org.eclipse.update")).empty());
    EXPECT_TRUE(logged("RLNCH0110I: '" + ws(".config/org.eclipse.update/registry") + "' not found"));

    // the fresh area has no platform.xml: it cannot be reused again
    EXPECT_EXIT(createReusableWorkspace(wws(), wcfg()), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0109E: Unable to locate '" + ws(".config/org.eclipse.update/platform.xml") +
                       "' for copying : "));
    EXPECT_TRUE(isDir(ws(".config/org.eclipse.update")));
}

TEST_F(ResetTest, FailuresEndTheLaunchWithTheirMessages) {
    using Fn = std::function<void(const std::string&)>;
    // a link inside a tree is emptied but cannot be removed with rmdir
    const Fn linkIn = [](const std::string& dir) {
        makeDirs(dir);
        makeDirs(dir + "/../target");
        ASSERT_EQ(symlink((dir + "/../target").c_str(), (dir + "/link").c_str()), 0);
    };
    const std::string notADir = "/link  -  Failed with error 20: Not a directory\n\n";
    const std::tuple<const char*, Fn, Fn, std::string> cases[] = {
        {"noprops", [](const std::string& b) { makeDirs(b + "/ws/.config"); },
         [](const std::string& b) { resetMetaDataDirs(widen(b + "/ws"), widen(b + "/ws/.config"), widen(b + "/c")); },
         "RLNCH0106E: Unable to locate @/c/rcpinstall.properties file. : "},
        {"plugins",
         [&](const std::string& b) {
             writeText(b + "/ws/.config/rcpinstall.properties", "resetDir.a=org.x\n");
             linkIn(b + "/ws/.metadata/.plugins/org.x");
         },
         [](const std::string& b) { resetWorkspace(widen(b + "/ws"), widen(b + "/ws/.config"), widen(b + "/c")); },
         "\nRLNCH0107E begin: Error removing metadata plugin directory\nCan't delete dir @/ws/.metadata/.plugins/org.x" +
             notADir +
             "RLNCH0108E end: Unable to remove all files in the metadata plugin directory. Please correct the "
             "problems listed above : "},
        {"olddir",
         [&](const std::string& b) {
             writeText(b + "/src", "s");
             linkIn(b + "/dst/old");
         },
         [](const std::string& b) { handleFileMove(widen(b + "/dst"), L"old", widen(b), L"src", true); },
         "\nRLNCH0083E begin: Error removing old directory\nCan't delete dir @/dst/old" + notADir +
             "RLNCH0084E end: Unable to remove all files in the old directory. Please correct the problems listed "
             "above : "},
        {"move", [](const std::string& b) { makeDirs(b + "/d/sub"); },
         [](const std::string& b) { handleDirMove(widen(b + "/d/sub/in"), widen(b + "/d"), true); },
         "RLNCH0112E: Can't move file/dir  '@/d' : "},
        {"delete", [](const std::string& b) { writeText(b + "/src", "s"); },  // not deletable even for root
         [](const std::string& b) { handleCopy(L"/proc", L"version", widen(b), L"src", true, false); },
         "RLNCH0111E: Can't delete old copy of file '/proc/version' : "},
    };
    for (const auto& [name, setup, run, message] : cases) {
        const std::string base = tmp.sub(name);
        makeDirs(base);
        setup(base);
        EXPECT_EXIT(run(base), ::testing::ExitedWithCode(255), "") << name;
        std::string expected = message;
        if (size_t at = expected.find('@'); at != std::string::npos) expected.replace(at, 1, base);
        EXPECT_TRUE(logged(expected)) << name << "\n" << log();
    }
}

}  // namespace
