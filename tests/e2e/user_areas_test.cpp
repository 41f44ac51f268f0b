// What a launch leaves in the user's areas: the files of a first launch,
// their stability on later launches, resets, an area of another
// installation, and the launch variants decided during startup (a "-vm"
// override, an initial configuration run).
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

const char* const kPlatformFiles[] = {"config.ini", "rcpinstall.properties", "org.eclipse.update/platform.xml"};

// A first launch into an empty home creates exactly the user's areas and
// files; a second launch leaves every per-user file alone even though the
// installation's copies changed in between, and rewrites its log and startup
// record however long the earlier text was. The base files begin with empty
// lines and hold bytes in two encodings, and the first launch has no LANG
// (as when the Finder starts it): the copies carry every byte unchanged.
TEST(UserAreas, FirstLaunchCreatesThePerUserFilesAndLaterLaunchesKeepThem) {
    Sandbox sb;
    sb.setupInstall("user", "com.kel.rcp.core.locale=fr_FR\n",
                    "os.value.macosx=mac\n"
                    "os.value.win32=win\\\n"
                    "    continued\n"
                    "os.value.linux=tux\n"
                    "\n"
                    "# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\n");
    const std::string configIni = Sandbox::standardConfigIni() + "# caf\xe9 \xc3\xb6\n";
    sb.writeBase("rcpinstall.properties", "\n\n" + readText(sb.base() + "/rcpinstall.properties"));
    sb.writeBase("platform.xml", "\n" + Sandbox::standardPlatformXml() + "<!-- caf\xe9 \xc3\xb6 -->\n");
    sb.writeBase("config.ini", configIni);
    // "-resetconfig" on a first launch resets nothing and is not recorded.
    const std::string longArg = "/a/long/argument/" + std::string(3000, 'x');
    RunOptions o;
    o.args = {"-resetconfig", "-debug", "a b", longArg};
    o.env["LANG"] = "";
    LaunchResult first = sb.run(o);
    ASSERT_EQ(first.status, 0) << first.describe();
    ASSERT_TRUE(first.hasChild());
    EXPECT_FALSE(first.tmpLogWritten);
    EXPECT_EQ(first.terminal, "");

    const std::string ws = "KEL/RCP/ID42/tester/";
    const std::vector<std::string> expectedTree = {
        "KEL/", "KEL/RCP/", "KEL/RCP/ID42/", ws,
        ws + ".config/", ws + ".config/args.properties", ws + ".config/config.ini",
        ws + ".config/org.eclipse.update/", ws + ".config/org.eclipse.update/platform.xml",
        ws + ".config/rcpinstall.properties", ws + ".rcp.lock",
        ws + "applications/", ws + "applications/eclipse/", ws + "applications/eclipse/features/",
        ws + "applications/eclipse/plugins/", ws + "logs/", ws + "logs/rcplauncher.log"};
    EXPECT_EQ(listTree(sb.home()), expectedTree);

    const std::string cfg = sb.defaultConfig();
    EXPECT_EQ(readText(cfg + "/args.properties"),
              "arg0=" + sb.launcher() + "\narg1=-debug\narg2=a b\narg3=" + longArg + "\nargc=4\n");
    EXPECT_NE(first.log.find(longArg), std::string::npos) << "the debug log shows the child's arguments";
    EXPECT_EQ(readText(cfg + "/config.ini"), configIni);
    EXPECT_EQ(readText(cfg + "/org.eclipse.update/platform.xml"),
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n"
              "<site url=\"platform:/base/\" enabled=\"true\">\n<feature>\n</site>\n</config>\n"
              "<!-- caf\xe9 \xc3\xb6 -->\n");
    EXPECT_EQ(readText(cfg + "/rcpinstall.properties"),
              Sandbox::standardInstallProperties() +
                  "os.value=mac\n"
                  "# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\n"
                  "rcp.install.id=ID42\n"
                  "vm=${rcp.home}/jre/bin/java\n"
                  "rcp.base.location=${rcp.home}/base\n"
                  "install.configuration=user\n"
                  "com.kel.rcp.core.locale=fr_FR\n");
    EXPECT_EQ(readText(sb.defaultWorkspace() + "/.rcp.lock"),
              std::to_string(first.child().pid) + std::string(10, ' '));

    std::map<std::string, FileState> before;
    for (const char* f : kPlatformFiles) before[f] = fileState(cfg + "/" + f);
    sb.writeBase("config.ini", "changed=1\n");
    sb.writeBase("platform.xml", "<changed/>\n");
    sb.writeBase("rcpinstall.properties", "changed=1\n");
    sb.writeLauncherProperties(Sandbox::standardLauncherProperties("user") + "com.kel.rcp.core.bidi=true\n");

    // The log and the startup record are rewritten and hold only the second
    // launch's shorter text; without "-debug" the log is just the empty line
    // that closes the (empty) queue.
    LaunchResult second = sb.run({"-x"});
    ASSERT_EQ(second.status, 0) << second.describe();
    EXPECT_EQ(listTree(sb.home()), expectedTree);
    for (const char* f : kPlatformFiles) EXPECT_TRUE(fileState(cfg + "/" + f) == before[f]) << f;
    EXPECT_EQ(readText(cfg + "/args.properties"), "arg0=" + sb.launcher() + "\narg1=-x\nargc=2\n");
    EXPECT_EQ(second.log, "\n");
    EXPECT_EQ(second.terminal, "");
}

// Only "-resetconfig" typed on the command line of a later launch resets:
// the configuration area goes to its backup, the listed plug-in state
// directories go, and the files come back from the installation's copies.
TEST(UserAreas, ResetComesOnlyFromTheTypedCommandLine) {
    Sandbox sb;
    sb.setupInstall("user", "config.rs.1=-resetconfig\n", "resetDir.a=org.x\n");
    const std::string ws = sb.defaultWorkspace();
    const std::string cfg = sb.defaultConfig();

    LaunchResult first = sb.run({"-resetconfig"});
    ASSERT_EQ(first.status, 0) << first.describe();
    EXPECT_FALSE(pathExists(ws + "/.configbak"));
    writeText(cfg + "/marker", "old area");
    writeText(ws + "/.metadata/.plugins/org.x/state", "x");
    writeText(ws + "/.metadata/.plugins/org.y/state", "y");

    // "-resetconfig" coming from the launcher properties is not a request.
    LaunchResult fromProps = sb.run({"-config", "rs"});
    ASSERT_EQ(fromProps.status, 0) << fromProps.describe();
    EXPECT_FALSE(pathExists(ws + "/.configbak"));
    EXPECT_TRUE(pathExists(cfg + "/marker"));
    EXPECT_TRUE(pathExists(ws + "/.metadata/.plugins/org.x/state"));

    sb.writeBase("config.ini", "fresh=1\n");
    LaunchResult reset = sb.run({"-resetconfig"});
    ASSERT_EQ(reset.status, 0) << reset.describe();
    ASSERT_TRUE(reset.hasChild());
    EXPECT_EQ(readText(ws + "/.configbak/marker"), "old area");
    EXPECT_FALSE(pathExists(cfg + "/marker"));
    EXPECT_EQ(readText(cfg + "/config.ini"), "fresh=1\n");
    EXPECT_TRUE(pathExists(cfg + "/rcpinstall.properties"));
    EXPECT_TRUE(pathExists(cfg + "/org.eclipse.update/platform.xml"));
    EXPECT_EQ(readText(cfg + "/args.properties"), "arg0=" + sb.launcher() + "\nargc=1\n");
    EXPECT_FALSE(pathExists(ws + "/.metadata/.plugins/org.x"));
    EXPECT_TRUE(pathExists(ws + "/.metadata/.plugins/org.y/state"));
    EXPECT_EQ(reset.child().argIndex("-resetconfig"), -1);
}

// A configuration area written by another installation is set aside for a
// fresh one, keeping its platform.xml beside it in the workspace.
TEST(UserAreas, AreaOfAnotherInstallationIsSetAside) {
    Sandbox sb;
    const std::string data = sb.path("data");
    sb.setupInstall("user", "rcp.data=" + data + "/\n");
    LaunchResult first = sb.run();
    ASSERT_EQ(first.status, 0) << first.describe();
    const std::string oldPlatformXml = readText(data + "/.config/org.eclipse.update/platform.xml");
    ASSERT_FALSE(oldPlatformXml.empty());

    sb.writeLauncherProperties("rcp.install.id=ID43\nrcp.base.location=${rcp.home}/base\n"
                               "jvm.location=${rcp.home}/jre/bin/java\ninstall.configuration=user\n"
                               "rcp.data=" + data + "/\n");
    LaunchResult r = sb.run();
    ASSERT_EQ(r.status, 0) << r.describe();
    EXPECT_EQ(r.workspace, data);
    EXPECT_EQ(readText(data + "/platform.xml.old"), oldPlatformXml);
    EXPECT_NE(readText(data + "/.configbak/rcpinstall.properties").find("rcp.install.id=ID42\n"), std::string::npos);
    EXPECT_NE(readText(data + "/.config/rcpinstall.properties").find("rcp.install.id=ID43\n"), std::string::npos);
    EXPECT_NE(r.child().argIndex("-Dcom.kel.rcp.install.id=ID43"), -1);
}

// A JVM named with "-vm" brings the jvm.properties three levels above it; a
// path too shallow for that stops the startup before the command line is
// built, so no child runs, though the user's files are in place.
TEST(UserAreas, VmOverrideAndItsJvmProperties) {
    struct Case {
        std::string vm;        // "@" stands for the sandbox root; "" = "-vm" without a value
        bool child;
        std::string jvmProps;  // where -Dfrom.jvm.props=1 is written, relative to the sandbox root
    };
    const std::vector<Case> cases = {
        {"java", false, ""},           {"bin/java", false, ""},
        {"/jre/bin/java", true, ""},   {"@/j/jre/bin/java", true, "j/jvm.properties"},
        {"k\\jre\\bin\\java", true, "k/jvm.properties"}, {"", true, ""},
    };
    for (const auto& c : cases) {
        Sandbox sb;
        std::string vm = !c.vm.empty() && c.vm[0] == '@' ? sb.root() + c.vm.substr(1) : c.vm;
        SCOPED_TRACE(vm);
        sb.setupInstall("user");
        if (!c.jvmProps.empty()) sb.writeFile(c.jvmProps, "-Dfrom.jvm.props=1\n");
        RunOptions o;
        o.args = {"-vm"};
        if (!vm.empty()) o.args.push_back(vm);
        o.expectChildren = c.child ? 1 : 0;
        LaunchResult r = sb.run(o);
        EXPECT_EQ(r.status, 0) << r.describe();
        EXPECT_EQ(r.hasChild(), c.child);
        EXPECT_TRUE(pathExists(sb.defaultConfig() + "/rcpinstall.properties"));
        EXPECT_EQ(pathExists(sb.defaultConfig() + "/org.eclipse.update"), c.child);
        if (!c.child) continue;
        EXPECT_EQ(r.child().argAfter("-vm"), vm.empty() ? sb.jvm() : vm);
        EXPECT_EQ(r.child().argIndex("-Dfrom.jvm.props=1") != -1, !c.jvmProps.empty());
    }
}

// A platform that has not finished its initial configuration is started
// with the "config.initial" arguments and the user's "-data" only.
TEST(UserAreas, InitialConfigurationLaunch) {
    struct Case {
        const char* name;
        std::string configuration;
        std::string installExtra;
        bool withData;
        bool initial;
    };
    const std::vector<Case> cases = {
        {"not yet configured", "user", "", true, true},
        {"not yet configured, default workspace", "user", "", false, true},
        {"configured", "user", "rcp.initial.done=true\n", true, false},
        {"lockdown never", "lockdown", "", true, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        Sandbox sb;
        sb.setupInstall(c.configuration,
                        "config.initial.1=-initialCompleteFlag\nconfig.initial.2=rcp.initial.done\n",
                        c.installExtra);
        const std::string data = sb.path("ws");
        std::vector<std::string> args = {"-foo"};
        if (c.withData) args.insert(args.end(), {"-data", data});
        args.insert(args.end(), {"-vmargs", "-Dx=1"});
        LaunchResult r = sb.run(args);
        ASSERT_EQ(r.status, 0) << r.describe();
        const auto& argv = r.child().argv;
        ASSERT_GT(argv.size(), 4u);
        EXPECT_EQ(r.workspace, c.withData ? data : sb.defaultWorkspace());
        using V = std::vector<std::string>;
        const V expected = c.initial ? V{"-initialCompleteFlag", "rcp.initial.done", "-data"} : V{"-foo", "-data", data};
        EXPECT_EQ(V(argv.begin() + 1, argv.begin() + 4), expected);
        // Neither the typed options nor the typed VM arguments on an initial launch.
        EXPECT_EQ(r.child().argIndex("-foo") == -1, c.initial);
        EXPECT_EQ(r.child().argIndex("-Dx=1") == -1, c.initial);
    }
}

}  // namespace
