// What a launch leaves in the user's areas: the files of a first launch,
// their stability on later launches, resets, an area of another
// installation, and the launches decided during startup (a "-vm" override,
// an initial configuration run, provisioning).
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "sandbox.h"

using namespace rcptest;

// A first launch into an empty home creates exactly the user's areas and
// files; a second launch leaves every per-user file alone even though the
// installation's copies changed in between, and rewrites its log and startup
// record however long the earlier text was (without "-debug" the log is just
// the empty line that closes the empty queue). The base files begin with
// empty lines and hold bytes in two encodings, and the first launch has no
// LANG (as when the Finder starts it): the copies carry every byte
// unchanged. "-resetconfig" on a first launch resets nothing and is not
// recorded. Both launches reach the launcher through links, as an rcp
// directory of its own beside a decoy and through a linked installation:
// the installation is the one where the executable really lies, and the
// startup record names the resolved program.
TEST(UserAreas, FirstLaunchCreatesThePerUserFilesAndLaterLaunchesKeepThem) {
    Sandbox sb("user", "com.kel.rcp.core.locale=fr_FR\n",
               "os.value.macosx=mac\nos.value.win32=win\\\n    continued\nos.value.linux=tux\n\n"
               "# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\n");
    const std::string cfg = sb.cfg, longArg = "/a/long/argument/" + std::string(3000, 'x');
    sb.write(sb.base + "/rcpinstall.properties", "\n\n" + readText(sb.base + "/rcpinstall.properties"));
    sb.write(sb.base + "/platform.xml", "\n<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n  <site url=\"platform:/base/\" "
                                       "enabled=\"true\">\n    <feature id=\"${jvm.feature.id}\" version=\"1.0\"/>\n  </site>\n"
                                       "</config>\n<!-- caf\xe9 \xc3\xb6 -->\n");
    sb.write(sb.base + "/config.ini", "osgi.bundles=x\n# caf\xe9 \xc3\xb6\n");
    sb.write("links/rcp/rcplauncher.properties", "rcp.install.id=WRONG\n");
    ASSERT_EQ(symlink(sb.launcher.c_str(), sb.path("links/rcp/rcplauncher").c_str()), 0);
    ASSERT_EQ(symlink(sb.inst.c_str(), sb.path("links/inst").c_str()), 0);
    Result first = sb.run({{"-resetconfig", "-debug", "a b", longArg}, {{"LANG", ""}}, sb.path("links/rcp/rcplauncher")});
    ASSERT_EQ(first.status, 0) << first.describe();
    EXPECT_EQ(first.tmpLog, "");

    const std::string ws = "KEL/RCP/ID42/tester/";
    const V tree = {"KEL/", "KEL/RCP/", "KEL/RCP/ID42/", ws, ws + ".config/", ws + ".config/args.properties",
                    ws + ".config/config.ini", ws + ".config/org.eclipse.update/",
                    ws + ".config/org.eclipse.update/platform.xml", ws + ".config/rcpinstall.properties",
                    ws + ".rcp.lock", ws + "applications/", ws + "applications/eclipse/",
                    ws + "applications/eclipse/features/", ws + "applications/eclipse/plugins/", ws + "logs/",
                    ws + "logs/rcplauncher.log"};
    EXPECT_EQ(names(snapshot(sb.home)), tree);
    EXPECT_EQ(readText(cfg + "/args.properties"),
              "arg0=" + sb.launcher + "\narg1=-debug\narg2=a b\narg3=" + longArg + "\nargc=4\n");
    EXPECT_NE(first.log.find(longArg), std::string::npos) << "the debug log shows the child's arguments";
    EXPECT_EQ(readText(cfg + "/config.ini"), "osgi.bundles=x\n# caf\xe9 \xc3\xb6\n");
    EXPECT_EQ(readText(cfg + "/org.eclipse.update/platform.xml"),
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n<site url=\"platform:/base/\" enabled=\"true\">\n"
              "<feature>\n</site>\n</config>\n<!-- caf\xe9 \xc3\xb6 -->\n");
    EXPECT_EQ(readText(cfg + "/rcpinstall.properties"),
              kInstallProps + "os.value=mac\n# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\nrcp.install.id=ID42\n"
                              "vm=${rcp.home}/jre/bin/java\nrcp.base.location=${rcp.home}/base\n"
                              "install.configuration=user\ncom.kel.rcp.core.locale=fr_FR\n");

    Tree before = snapshot(cfg);
    for (const char* f : {"/config.ini", "/platform.xml", "/rcpinstall.properties"}) sb.write(sb.base + f, "changed=1\n");
    sb.write(sb.props, launcherProps("user") + "com.kel.rcp.core.bidi=true\n");
    Result second = sb.run({{"-x"}, {}, sb.path("links/inst/rcp/rcplauncher")});
    EXPECT_NE(second.child().index("-Drcp.home=" + sb.inst), -1) << second.describe();
    EXPECT_EQ(names(snapshot(sb.home)), tree);
    before["args.properties"] = "uid " + std::to_string(geteuid()) + " file\narg0=" + sb.launcher + "\narg1=-x\nargc=2\n";
    EXPECT_EQ(snapshot(cfg), before);
    EXPECT_EQ(second.log, "\n");
}

// Only "-resetconfig" typed on the command line of a later launch resets:
// the configuration area goes to its backup, the listed plug-in state
// directories go, and the files come back from the installation's copies.
TEST(UserAreas, ResetComesOnlyFromTheTypedCommandLine) {
    Sandbox sb("user", "config.rs.1=-resetconfig\n", "resetDir.a=org.x\n");
    const std::string ws = sb.ws, cfg = sb.cfg;
    ASSERT_EQ(sb.run({{"-resetconfig"}}).status, 0);
    sb.write(cfg + "/marker", "old area");
    sb.write(ws + "/.metadata/.plugins/org.x/state", "x");
    sb.write(ws + "/.metadata/.plugins/org.y/state", "y");
    // "-resetconfig" coming from the launcher properties is not a request.
    ASSERT_EQ(sb.run({{"-config", "rs"}}).status, 0);
    EXPECT_TRUE(pathExists(cfg + "/marker") && pathExists(ws + "/.metadata/.plugins/org.x/state"));

    sb.write(sb.base + "/config.ini", "fresh=1\n");
    Result reset = sb.run({{"-resetconfig"}});
    EXPECT_EQ(reset.child().index("-resetconfig"), -1);
    EXPECT_EQ(readText(ws + "/.configbak/marker"), "old area");
    EXPECT_EQ(names(snapshot(cfg)), (V{"args.properties", "config.ini", "org.eclipse.update/",
                                       "org.eclipse.update/platform.xml", "rcpinstall.properties"}));
    EXPECT_EQ(readText(cfg + "/config.ini"), "fresh=1\n");
    EXPECT_EQ(readText(cfg + "/args.properties"), "arg0=" + sb.launcher + "\nargc=1\n");
    EXPECT_FALSE(pathExists(ws + "/.metadata/.plugins/org.x"));
    EXPECT_TRUE(pathExists(ws + "/.metadata/.plugins/org.y/state"));
}

// A configuration area written by another installation is set aside for a
// fresh one, keeping its platform.xml beside it in the workspace.
TEST(UserAreas, AreaOfAnotherInstallationIsSetAside) {
    Sandbox sb;
    const std::string data = sb.path("data");
    sb.install("user", "rcp.data=" + data + "/\n");
    ASSERT_EQ(sb.run().status, 0);
    const std::string oldPlatformXml = readText(data + "/.config/org.eclipse.update/platform.xml");
    sb.write(sb.props, "rcp.install.id=ID43\nrcp.base.location=${rcp.home}/base\n"
                         "jvm.location=${rcp.home}/jre/bin/java\ninstall.configuration=user\nrcp.data=" + data + "/\n");
    Result r = sb.run();
    EXPECT_EQ(r.child().after("-data"), data);
    EXPECT_NE(r.child().index("-Dcom.kel.rcp.install.id=ID43"), -1);
    EXPECT_EQ(readText(data + "/platform.xml.old"), oldPlatformXml);
    EXPECT_NE(readText(data + "/.configbak/rcpinstall.properties").find("rcp.install.id=ID42\n"), std::string::npos);
    EXPECT_NE(readText(data + "/.config/rcpinstall.properties").find("rcp.install.id=ID43\n"), std::string::npos);
}

// A JVM named with "-vm" brings the jvm.properties three levels above it; a
// path too shallow for that stops the startup before the command line is
// built, so no child runs, though the user's files are in place.
TEST(UserAreas, VmOverrideAndItsJvmProperties) {
    // "-vm" value ("@" the sandbox root, "" none), a child starts, jvm.properties giving -Dfrom.jvm.props=1
    const std::tuple<std::string, bool, std::string> cases[] = {
        {"java", false, ""}, {"bin/java", false, ""}, {"/jre/bin/java", true, ""}, {"", true, ""},
        {"@/j/jre/bin/java", true, "j/jvm.properties"}, {"k\\jre\\bin\\java", true, "k/jvm.properties"}};
    Sandbox sb;
    for (const auto& [value, child, jvmProps] : cases) {
        const std::string vm = value.find('@') == 0 ? sb.root + value.substr(1) : value;
        SCOPED_TRACE(vm);
        sb.freshHome();
        if (!jvmProps.empty()) sb.write(jvmProps, "-Dfrom.jvm.props=1\n");
        Launch launch(vm.empty() ? V{"-vm"} : V{"-vm", vm});
        launch.children = child;
        Result r = sb.run(launch);
        EXPECT_EQ(r.status, 0) << r.describe();
        EXPECT_EQ(r.child().after("-vm"), !child ? "" : vm.empty() ? sb.jvm : vm);
        EXPECT_EQ(r.child().index("-Dfrom.jvm.props=1") != -1, !jvmProps.empty());
        EXPECT_TRUE(pathExists(sb.cfg + "/rcpinstall.properties"));
        EXPECT_EQ(pathExists(sb.cfg + "/org.eclipse.update"), child);
    }
}

// A platform that has not finished its initial configuration is started
// with the "config.initial" arguments and the user's "-data" only: neither
// the typed options nor the typed VM arguments.
TEST(UserAreas, InitialConfigurationLaunch) {
    // configuration, installation properties, "-data" typed, an initial launch
    const std::tuple<const char*, const char*, bool, bool> cases[] = {
        {"user", "", true, true}, {"user", "", false, true}, {"user", "rcp.initial.done=true\n", true, false},
        {"lockdown", "", true, false}};
    Sandbox sb;
    for (const auto& [configuration, installExtra, withData, initial] : cases) {
        SCOPED_TRACE(std::string(configuration) + " " + installExtra + (withData ? " -data" : ""));
        sb.install(configuration, "config.initial.1=-initialCompleteFlag\nconfig.initial.2=rcp.initial.done\n",
                   installExtra);
        sb.freshHome();
        const std::string data = withData ? sb.home + "/ws" : sb.ws;
        Result r = sb.run({withData ? V{"-foo", "-data", data, "-vmargs", "-Dx=1"} : V{"-foo", "-vmargs", "-Dx=1"}});
        const V& argv = r.child().argv;
        ASSERT_GT(argv.size(), 4u) << r.describe();
        const V expected = initial ? V{"-initialCompleteFlag", "rcp.initial.done", "-data", data}
                                   : V{"-foo", "-data", data, "-configuration"};
        EXPECT_EQ(V(argv.begin() + 1, argv.begin() + 5), expected);
        EXPECT_EQ(r.child().index("-foo") == -1, initial);
        EXPECT_EQ(r.child().index("-Dx=1") == -1, initial);
    }
}

// Provisioning: a user's first launch, a new manifest level and the
// installer's request each run the provisioning child in its own
// command-line order, wait for it and exit without starting the platform; an
// unchanged level (or none shipped) starts the platform as usual, and so
// does a launcher that finds a platform running. A multi-user installation
// provisioned by the superuser gets the service's own area in the
// installation.
TEST(UserAreas, ProvisioningSequence) {
    for (const std::string configuration : {"user", "multiuser", "lockdown"}) {
        SCOPED_TRACE(configuration);
        Sandbox sb;
        const std::string shared = sb.path("shared"), userProps = sb.cfg + "/rcpinstall.properties";
        sb.install(configuration, "provisioning=true\nprovisioning.manifest.version=2\n",
                   "provisioning.application=com.kel.provision\njvm.shareclasses.fullpath=" + shared + "\n");
        const bool serviceArea = geteuid() == 0 && configuration != "user";
        // The provisioning child's command line: the platform options, the
        // provisioning application (and "-userProvLaunch" unless the
        // installer asked), the JVM, the start-up jar and the JVM's own
        // arguments. No "-useDaemon" and no "-XstartOnFirstThread": the
        // launcher ends inside its startup sequence.
        auto provisioning = [&](V args, bool userLaunch, const std::string& area) {
            args.insert(args.begin(), sb.eclipse);
            for (const std::string& a :
                 V{"-data", sb.ws, "-configuration", sb.cfg, "-application", "com.kel.demo.app", "-application",
                   "com.kel.provision", "-userProvLaunch", "-vm", sb.jvm, "-startup", sb.base + "/launcher.jar", "-vmargs",
                   "-Dvmarg.one=1", "-Drcp.home=" + sb.inst, "-Drcp.data=" + sb.ws, "-Dcom.kel.rcp.install.id=ID42",
                   "-Drcp.install.config=" + configuration, "-Dbase.prop=one", "-Drcp.osgi.install.area=" + sb.inst + area,
                   "-Xmx256m", "-cp", sb.inst + "/lib/boot.jar"})
                if (userLaunch || a != "-userProvLaunch") args.push_back(a);
            return args;
        };
        auto platform = [](const Result& r) { return r.children.size() == 1 && r.child().argv.back() == "-XstartOnFirstThread"; };

        // A user's first launch provisions; the level recorded by nobody yet
        // is new, so the shared classes go too.
        sb.write(shared + "/cache.bin", "x");
        Result r = sb.run({{"-foo", "-debug"}, {{"RCP_STUB_SLEEP", "1"}}});
        EXPECT_TRUE(r.child().reapedByLauncher) << r.describe();
        EXPECT_EQ(r.child().argv, provisioning({"-foo", "-debug"}, true, "/rcp/eclipse"));
        EXPECT_TRUE(isDir(shared) && !pathExists(shared + "/cache.bin"));
        EXPECT_EQ(pathExists(sb.inst + "/eclipse/.muservice/.config/org.eclipse.update/platform.xml"), serviceArea);
        EXPECT_NE(r.log.find("RLNCH0129I: ===== Begin Provisioning Parameters ====="), std::string::npos);

        // The provisioned level recorded in the user's properties, and the
        // installation ships no level or the same one: nothing new, so the
        // platform itself starts, and the shared classes stay.
        sb.write(userProps, readText(userProps) + "provisioning.manifest.version=2\n");
        sb.write(shared + "/cache.bin", "x");
        for (const std::string shipped : {"", "provisioning.manifest.version=2\n"}) {
            sb.write(sb.props, launcherProps(configuration) + "provisioning=true\n" + shipped);
            EXPECT_TRUE(platform(sb.run({{"-foo"}}))) << shipped;
        }
        // The installer asks: provisioning at the same level, without
        // "-userProvLaunch", its options passed on to the platform.
        const V installer = {"-rcpLauncherWait", "-provManifest", "m.xml"};
        r = sb.run({installer});
        EXPECT_EQ(r.child().argv, provisioning(installer, false, serviceArea ? "/eclipse" : "/rcp/eclipse"));
        EXPECT_TRUE(pathExists(shared + "/cache.bin"));

        // Only "true" exactly enables provisioning, whatever the level says;
        // a new level still clears the shared classes of the normal launch.
        // What cannot be removed (a dangling link cannot even be examined) is
        // listed inside one error block, and the launch goes on.
        sb.write(sb.props, launcherProps(configuration) + "provisioning=TRUE\nprovisioning.manifest.version=3\n");
        ASSERT_EQ(symlink("/nonexistent", (shared + "/dangling").c_str()), 0);
        r = sb.run({installer});
        EXPECT_TRUE(platform(r) && !pathExists(shared + "/cache.bin")) << r.describe();
        EXPECT_NE(r.log.find("\nRLNCH0086E begin: Error removing shared classes directory\nCan't stat " + shared +
                             "/dangling  -  Failed with error 2: " + strerror(ENOENT) +
                             "\n\nRLNCH0087E end: Unable to remove all files in the shared classes directory. "),
                  std::string::npos) << r.log;

        // Only the main launcher provisions: one that finds a platform
        // running (this test process stands for it) starts a normal child
        // handed to it, even at a new level, and leaves the startup record
        // alone. The hand-over follows the JVM: "-vm <jvm> -useDaemon <pid>".
        sb.write(sb.props, launcherProps(configuration) + "provisioning=true\nprovisioning.manifest.version=4\n");
        sb.write(sb.ws + "/.rcp.lock", std::to_string(getpid()));
        const std::string record = readText(sb.cfg + "/args.properties");
        r = sb.run();
        EXPECT_TRUE(platform(r)) << r.describe();
        EXPECT_EQ(r.child().after(sb.jvm), "-useDaemon");
        EXPECT_EQ(r.child().after("-useDaemon"), std::to_string(getpid()));
        EXPECT_EQ(readText(sb.cfg + "/args.properties"), record);
    }
}
