// Provisioning launches: a user's first launch, a new manifest level and the
// installer's request each run the provisioning child in its own command-line
// order, wait for it, release the lock and exit without starting the
// platform; an unchanged level (or none shipped) starts the platform as
// usual, and so does a launcher that finds a platform running.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

// The provisioning child's command line: the platform options, the
// provisioning application (and "-userProvLaunch" unless the installer
// asked), the JVM, the start-up jar and the JVM's own arguments. No
// "-useDaemon" and no "-XstartOnFirstThread": the launcher ends inside its
// startup sequence.
std::vector<std::string> provisioningArgs(const Sandbox& sb, const std::string& configuration,
                                          const std::vector<std::string>& passed, bool userLaunch,
                                          const std::string& installArea) {
    const std::string ws = sb.defaultWorkspace();
    std::vector<std::string> args = {sb.eclipse()};
    args.insert(args.end(), passed.begin(), passed.end());
    for (const std::string& a : {std::string("-data"), ws, std::string("-configuration"), sb.defaultConfig(),
                                 std::string("-application"), std::string("com.kel.demo.app"),
                                 std::string("-application"), std::string("com.kel.provision")})
        args.push_back(a);
    if (userLaunch) args.push_back("-userProvLaunch");
    for (const std::string& a :
         {std::string("-vm"), sb.jvm(), std::string("-startup"), sb.base() + "/launcher.jar", std::string("-vmargs"),
          std::string("-Dvmarg.one=1"), "-Drcp.home=" + sb.inst(), "-Drcp.data=" + ws,
          std::string("-Dcom.kel.rcp.install.id=ID42"), "-Drcp.install.config=" + configuration,
          std::string("-Dbase.prop=one"),
          "-Drcp.osgi.install.area=" + installArea,
          std::string("-Xmx256m"), std::string("-cp"), sb.inst() + "/lib/boot.jar"})
        args.push_back(a);
    return args;
}

TEST(Provisioning, LaunchSequence) {
    const bool superuser = geteuid() == 0;
    for (const std::string configuration : {"user", "multiuser", "lockdown"}) {
        SCOPED_TRACE(configuration);
        Sandbox sb;
        const std::string shared = sb.path("shared-classes");
        sb.writeFile(shared + "/cache.bin", "x");
        sb.setupInstall(configuration, "provisioning=true\nprovisioning.manifest.version=2\n",
                        "provisioning.application=com.kel.provision\njvm.shareclasses.fullpath=" + shared + "\n");
        const std::string lock = sb.defaultWorkspace() + "/.rcp.lock";
        const std::string userProps = sb.defaultConfig() + "/rcpinstall.properties";
        // A multi-user installation provisioned by the superuser gets the
        // service's own area in the installation.
        const bool serviceArea = superuser && configuration != "user";

        // A user's first launch provisions; the level recorded by nobody yet
        // is new, so the shared classes go too. The launcher waits for its
        // provisioning child: when it has ended, the child is gone as well.
        RunOptions firstRun;
        firstRun.args = {"-foo", "-debug"};
        firstRun.env = {{"RCP_STUB_SLEEP", "1"}};
        firstRun.keepChildren = true;
        LaunchResult first = sb.run(firstRun);
        ASSERT_EQ(first.status, 0) << first.describe();
        ASSERT_EQ(first.children.size(), 1u);
        EXPECT_EQ(kill(static_cast<pid_t>(first.child().pid), 0), -1);
        EXPECT_EQ(first.child().argv, provisioningArgs(sb, configuration, {"-foo", "-debug"}, true, sb.inst() + "/rcp/eclipse"));
        EXPECT_EQ(readText(lock), "");
        EXPECT_TRUE(isDir(shared));
        EXPECT_FALSE(pathExists(shared + "/cache.bin"));
        EXPECT_EQ(pathExists(sb.inst() + "/eclipse/.muservice/.config/rcpinstall.properties"), serviceArea);
        EXPECT_EQ(pathExists(sb.inst() + "/eclipse/.muservice/.config/org.eclipse.update/platform.xml"), serviceArea);
        EXPECT_NE(first.log.find("RLNCH0129I: ===== Begin Provisioning Parameters ====="), std::string::npos);
        EXPECT_EQ(first.terminal, "");

        // The provisioned level recorded in the user's properties, and the
        // installation ships no level or the same one: nothing new, so the
        // platform itself starts, and the shared classes stay.
        sb.writeFile(userProps, readText(userProps) + "provisioning.manifest.version=2\n");
        for (const std::string shipped : {"", "provisioning.manifest.version=2\n"}) {
            sb.writeLauncherProperties(Sandbox::standardLauncherProperties(configuration) + "provisioning=true\n" + shipped);
            sb.writeFile(shared + "/cache.bin", "x");
            LaunchResult normal = sb.run({"-foo"});
            ASSERT_EQ(normal.status, 0) << normal.describe();
            ASSERT_EQ(normal.children.size(), 1u);
            EXPECT_EQ(normal.child().argIndex("com.kel.provision"), -1);
            EXPECT_EQ(normal.child().argv.back(), "-XstartOnFirstThread");
            EXPECT_EQ(readText(lock), std::to_string(normal.child().pid) + std::string(10, ' '));
            EXPECT_TRUE(pathExists(shared + "/cache.bin")) << shipped;
        }

        // The installer asks: provisioning at the same level, without
        // "-userProvLaunch", its options passed on to the platform.
        LaunchResult installer = sb.run({"-rcpLauncherWait", "-provManifest", "m.xml"});
        ASSERT_EQ(installer.status, 0) << installer.describe();
        ASSERT_EQ(installer.children.size(), 1u);
        EXPECT_EQ(installer.child().argv,
                  provisioningArgs(sb, configuration, {"-rcpLauncherWait", "-provManifest", "m.xml"}, false,
                                   sb.inst() + (serviceArea ? "/eclipse" : "/rcp/eclipse")));
        EXPECT_TRUE(pathExists(shared + "/cache.bin"));

        // Only "true" exactly enables provisioning, whatever the level says;
        // a new level still clears the shared classes of the normal launch.
        // What cannot be removed (a dangling link cannot even be examined) is
        // listed inside one error block, and the launch goes on.
        sb.writeLauncherProperties(Sandbox::standardLauncherProperties(configuration) +
                                   "provisioning=TRUE\nprovisioning.manifest.version=3\n");
        ASSERT_EQ(symlink("/nonexistent", (shared + "/dangling").c_str()), 0);
        LaunchResult disabled = sb.run({"-rcpLauncherWait", "-provManifest", "m.xml"});
        ASSERT_EQ(disabled.status, 0) << disabled.describe();
        EXPECT_EQ(disabled.child().argIndex("com.kel.provision"), -1);
        EXPECT_EQ(disabled.child().argv.back(), "-XstartOnFirstThread");
        EXPECT_FALSE(pathExists(shared + "/cache.bin"));
        EXPECT_NE(disabled.log.find("\nRLNCH0086E begin: Error removing shared classes directory\nCan't stat " + shared +
                                    "/dangling  -  Failed with error 2: " + strerror(ENOENT) +
                                    "\n\nRLNCH0087E end: Unable to remove all files in the shared classes directory. "
                                    "Please correct the problems listed above : "),
                  std::string::npos) << disabled.log;

        // Only the main launcher provisions: one that finds a platform
        // running (this test process stands for it) starts a normal child
        // handed to it, even at a new level, and leaves the lock and the
        // startup record alone.
        sb.writeLauncherProperties(Sandbox::standardLauncherProperties(configuration) +
                                   "provisioning=true\nprovisioning.manifest.version=4\n");
        const std::string runningPid = std::to_string(getpid());
        writeText(lock, runningPid);
        const FileState record = fileState(sb.defaultConfig() + "/args.properties");
        LaunchResult secondary = sb.run();
        ASSERT_EQ(secondary.status, 0) << secondary.describe();
        ASSERT_EQ(secondary.children.size(), 1u);
        EXPECT_EQ(secondary.child().argIndex("com.kel.provision"), -1);
        EXPECT_EQ(secondary.child().argIndex("-userProvLaunch"), -1);
        // The hand-over follows the JVM: "-vm <jvm> -useDaemon <pid>".
        EXPECT_EQ(secondary.child().argAfter(sb.jvm()), "-useDaemon");
        EXPECT_EQ(secondary.child().argAfter("-useDaemon"), runningPid);
        EXPECT_EQ(readText(lock), runningPid);
        EXPECT_TRUE(fileState(sb.defaultConfig() + "/args.properties") == record);
    }
}

}  // namespace
