// What a launch leaves in the user's areas: the files of a first launch,
// their stability on later launches, resets, an area of another
// installation, and the launches decided during startup (an initial
// configuration run, provisioning).
#include <optional>

#include "sandbox.h"

using namespace rcptest;

// The life of a workspace. A first launch into an empty home creates
// exactly the user's areas and files. The base files begin with empty lines
// and hold bytes in two encodings, and the first launch has no LANG (as when
// the Finder starts it): the copies carry every byte unchanged.
// "-resetconfig" on a first launch resets nothing and is not recorded. It
// reaches the launcher through a link in an rcp directory of its own beside
// a decoy, a later one through a linked installation: the installation is
// the one where the executable really lies, and the startup record names the
// resolved program.
//
// A later launch leaves every per-user file alone even though the
// installation's copies changed in between, and rewrites its log and startup
// record however long the earlier text was (without "-debug" the log is just
// the empty line that closes the empty queue); a "-resetconfig" that comes
// from the launcher properties is no request to reset, and with "-console"
// the launcher stays until its platform ends. Only one typed on the
// command line resets: the configuration area goes to its backup, the
// listed plug-in state directories go, and the files come back from the
// installation's copies. A configuration area written by another
// installation is set aside for a fresh one, keeping its platform.xml beside
// it in the workspace. A launcher told to wait ("-rcpLauncherWait") stays
// until its platform ends and exits 0 whatever the platform's status. A JVM
// named with "-vm" brings the jvm.properties three levels above it, also
// when named with backslashes. A package-builder installation without an
// identifier makes one on its first launch, saves it in its launcher
// properties and launches with it from then on.
TEST(UserAreas, LifeOfAWorkspace) {
    std::optional<::testing::ScopedTrace> step;  // a failure names the step it happened in
    step.emplace(__FILE__, __LINE__, "a first launch, through a link, without LANG");
    Sandbox sb("user", "com.kel.rcp.core.locale=fr_FR\ncom.kel.rcp.core.bidi=true\nconfig.rs.1=-resetconfig\n",
               "os.value.macosx=mac\nos.value.win32=win\\\n    continued\nos.value.linux=tux\nresetDir.b=../../../outside\nresetDir.a=org.x\n\n"
               "# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\n");
    const std::string ws = sb.ws, cfg = sb.cfg, longArg = "/a/long/argument/" + std::string(3000, 'x');
    sb.write(sb.base + "/rcpinstall.properties", "\n\n" + readText(sb.base + "/rcpinstall.properties"));
    sb.write(sb.base + "/platform.xml",
             "\n<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n  <site url=\"platform:/base/\" enabled=\"true\">"
             "\n    <feature id=\"${jvm.feature.id}\" version=\"1.0\"/>\n    <feature id=\"${jvm.parent.feature.id}\"/>"
             "\n  </site>\n</config>\n"
             "<!-- caf\xe9 \xc3\xb6 -->\n");
    sb.write(sb.base + "/config.ini", "osgi.bundles=x\n# caf\xe9 \xc3\xb6\n");
    sb.write("links/rcp/rcplauncher.properties", "rcp.install.id=WRONG\n");
    ASSERT_EQ(symlink(sb.launcher.c_str(), sb.path("links/rcp/rcplauncher").c_str()), 0);
    ASSERT_EQ(symlink(sb.inst.c_str(), sb.path("links/inst").c_str()), 0);
    Result r = sb.run({{"-resetconfig", "-debug", "a b", longArg}, {{"LANG", ""}}, sb.path("links/rcp/rcplauncher")});
    ASSERT_EQ(r.status, 0) << r.describe();
    const std::string w = "KEL/RCP/ID42/tester/";
    V tree = {"KEL/", "KEL/RCP/", "KEL/RCP/ID42/", w};
    for (const char* p : {".config/", ".config/args.properties", ".config/config.ini", ".config/org.eclipse.update/",
                          ".config/org.eclipse.update/platform.xml", ".config/rcpinstall.properties", ".rcp.lock",
                          "applications/", "applications/eclipse/", "applications/eclipse/features/",
                          "applications/eclipse/plugins/", "logs/", "logs/rcplauncher.log"})
        tree.push_back(w + p);
    EXPECT_EQ(names(snapshot(sb.home)), tree);
    EXPECT_EQ(readText(cfg + "/args.properties"),
              "arg0=" + sb.launcher + "\narg1=-debug\narg2=a b\narg3=" + longArg + "\nargc=4\n");
    EXPECT_EQ(readText(cfg + "/config.ini"), "osgi.bundles=x\n# caf\xe9 \xc3\xb6\n");
    EXPECT_EQ(readText(cfg + "/org.eclipse.update/platform.xml"),
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n<site url=\"platform:/base/\" enabled=\"true\">\n"
              "<feature>\n<feature>\n</site>\n</config>\n<!-- caf\xe9 \xc3\xb6 -->\n");
    EXPECT_EQ(readText(cfg + "/rcpinstall.properties"),
              kInstallProps + "os.value=mac\nresetDir.b=../../../outside\nresetDir.a=org.x\n# trailing comment, Gr\xc3\xbc\xc3\x9f Gott, caf\xe9\n"
                              "rcp.install.id=ID42\nvm=${rcp.home}/jre/bin/java\nrcp.base.location=${rcp.home}/base\n"
                              "install.configuration=user\ncom.kel.rcp.core.locale=fr_FR\ncom.kel.rcp.core.bidi=true\n");

    step.emplace(__FILE__, __LINE__, "a later launch keeps every file; -resetconfig from the properties; -console");
    sb.write(cfg + "/marker", "old area");
    sb.write(ws + "/.metadata/.plugins/org.x/state", "x");
    sb.write(ws + "/.metadata/.plugins/org.y/state", "y");
    sb.write(ws + "/../outside/state", "beside the workspace");  // a resetDir value with ".." is ignored
    Tree before = snapshot(ws);
    for (const char* f : {"/config.ini", "/platform.xml", "/rcpinstall.properties"}) sb.write(sb.base + f, "new=1\n");
    sb.write(sb.props, launcherProps("user") + "config.rs.1=-resetconfig\ncom.kel.rcp.core.bidi=true\n");
    r = sb.run({{"-config", "rs", "-console"}, {}, sb.path("links/inst/rcp/rcplauncher")});
    EXPECT_NE(r.child().index("-Drcp.home=" + sb.inst), -1) << r.describe();
    EXPECT_TRUE(r.child().reapedByLauncher);
    before[".config/args.properties"] = "uid " + std::to_string(geteuid()) + " file\narg0=" + sb.launcher +
                                        "\narg1=-config\narg2=rs\narg3=-console\nargc=4\n";
    EXPECT_EQ(snapshot(ws), before);
    EXPECT_EQ(r.log, "\n");

    step.emplace(__FILE__, __LINE__, "a typed -resetconfig, -rcpLauncherWait");
    sb.write(sb.base + "/config.ini", "fresh=1\n");
    r = sb.run({{"-resetconfig", "-rcpLauncherWait", "-vm"}, {{"RCP_STUB_SLEEP", "1"}, {"RCP_STUB_EXIT", "7"}}});
    EXPECT_EQ(r.status, 0) << r.describe();
    EXPECT_TRUE(r.child().reapedByLauncher);
    EXPECT_EQ(r.child().index("-resetconfig"), -1);
    EXPECT_EQ(r.child().after("-vm"), sb.jvm);  // "-vm" without a value is no override
    EXPECT_EQ(readText(ws + "/.configbak/marker"), "old area");
    EXPECT_EQ(names(snapshot(cfg)), (V{"args.properties", "config.ini", "org.eclipse.update/",
                                       "org.eclipse.update/platform.xml", "rcpinstall.properties"}));
    EXPECT_EQ(readText(cfg + "/config.ini"), "fresh=1\n");
    EXPECT_FALSE(pathExists(ws + "/.metadata/.plugins/org.x"));
    for (const std::string kept : {"/.metadata/.plugins/org.y/state", "/../outside/state"})
        EXPECT_TRUE(pathExists(ws + kept)) << kept;

    step.emplace(__FILE__, __LINE__, "another installation's area, a relative rcp.data, -vm with backslashes");
    const std::string platformXml = readText(cfg + "/org.eclipse.update/platform.xml");
    // A relative rcp.data (made of a placeholder, one trailing separator
    // dropped) is taken from the launcher's current directory.
    sb.write(sb.props, "rcp.install.id=ID43\nrcp.base.location=${rcp.home}/base\n"
                       "jvm.location=${rcp.home}/jre/bin/java\ninstall.configuration=user\nrcp.data=${env.WS}\\\\\n");
    sb.write("k/jvm.properties", "-Dk=1\n");
    r = sb.run({{"-vm", "k\\jre\\bin\\java"}, {{"WS", ws.substr(sb.root.size() + 1)}}});
    EXPECT_EQ(r.child().after("-data") + " " + r.child().after("-vm"), ws + " k\\jre\\bin\\java");
    for (const char* arg : {"-Dcom.kel.rcp.install.id=ID43", "-Dk=1"}) EXPECT_NE(r.child().index(arg), -1) << arg;
    EXPECT_EQ(readText(ws + "/platform.xml.old"), platformXml);
    EXPECT_NE(readText(ws + "/.configbak/rcpinstall.properties").find("rcp.install.id=ID42\n"), std::string::npos);
    EXPECT_NE(readText(cfg + "/rcpinstall.properties").find("rcp.install.id=ID43\n"), std::string::npos);

    step.emplace(__FILE__, __LINE__, "a package-builder installation names itself");
    const std::string pb = "rcp.base.location=${rcp.home}/base\njvm.location=/j\ninstall.configuration=userpb\n";
    sb.write(sb.props, pb);
    const std::string named = sb.run().child().after("-data");  // <home>/KEL/RCP/<the new identifier>/tester
    const std::string saved = pb + "rcp.install.id=" + named.substr(sb.home.size() + 9, named.size() - sb.home.size() - 16);
    EXPECT_EQ(readText(sb.props), saved + "\n");
    EXPECT_EQ(sb.run().child().after("-data"), named);
    EXPECT_EQ(readText(sb.props), saved + "\n");
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
        SCOPED_TRACE(std::string(configuration) + " " + installExtra + " -data " + std::to_string(withData));
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
// installation. The shared classes go entry by entry also where a directory
// listing skips entries while they are being removed (HFS+).
TEST(UserAreas, ProvisioningSequence) {
    for (const std::string row : {"user", "multiuser", "lockdown", "user on HFS+"}) {
        SCOPED_TRACE(row);
        const std::string configuration = row.substr(0, row.find(' '));
        Sandbox sb;
        // The last row's first launch lists directories the way HFS+ may: an
        // entry removed makes the listing skip the next one.
        Launch first{{"-foo", "-debug"}, {{"RCP_STUB_SLEEP", "1"}}};
#ifdef __linux__
        if (row != configuration) first.env["LD_PRELOAD"] = RCP_READDIR_PRELOAD;
        if (row != configuration) sb.write(sb.launcher, readText(RCP_DYNAMIC_LAUNCHER), 0755);
#else
        if (row != configuration) GTEST_SKIP() << "HFS+ listings are played with LD_PRELOAD, which needs Linux";
#endif
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
                   "com.kel.provision", "-userProvLaunch", "-vm", sb.jvm, "-startup", sb.base + "/launcher.jar",
                   "-vmargs", "-Dvmarg.one=1", "-Drcp.home=" + sb.inst, "-Drcp.data=" + sb.ws,
                   "-Dcom.kel.rcp.install.id=ID42", "-Drcp.install.config=" + configuration, "-Dbase.prop=one",
                   "-Drcp.osgi.install.area=" + sb.inst + area, "-Xmx256m", "-cp", sb.inst + "/lib/boot.jar"})
                if (userLaunch || a != "-userProvLaunch") args.push_back(a);
            return args;
        };
        auto platform = [](const Result& r) { return r.child().index("-XstartOnFirstThread") > 0; };

        // A user's first launch provisions; the level recorded by nobody yet
        // is new, so the shared classes go too. What cannot be removed (a
        // dangling link) is listed in one error block, and the launch goes on.
        for (const char* f : {"/cache.bin", "/a/1", "/a/2", "/a/b/3"}) sb.write(shared + f, "x");
        ASSERT_EQ(symlink(sb.path("no-such-target").c_str(), (shared + "/dangling").c_str()), 0);
        Result r = sb.run(first);
        EXPECT_TRUE(r.child().reapedByLauncher) << r.describe();
        EXPECT_EQ(r.child().argv, provisioning({"-foo", "-debug"}, true, "/rcp/eclipse"));
        EXPECT_EQ(names(snapshot(shared)), V{"dangling"});
        EXPECT_NE(r.log.find("\nRLNCH0086E begin: Error removing shared classes directory\nCan't stat " + shared +
                             "/dangling  -  Failed with error 2: " + strerror(ENOENT) +
                             "\n\nRLNCH0087E end: Unable to remove all files in the shared classes directory. "),
                  std::string::npos) << r.log;
        EXPECT_EQ(pathExists(sb.inst + "/eclipse/.muservice/.config/org.eclipse.update/platform.xml"), serviceArea);
        EXPECT_NE(r.log.find("RLNCH0129I: ===== Begin Provisioning Parameters ====="), std::string::npos);

        // The provisioned level recorded in the user's properties, and the
        // installation ships no level or the same one: nothing new, so the
        // platform itself starts, and the shared classes stay. (A launcher
        // told to wait is no installer's request without "-provManifest".)
        sb.write(userProps, readText(userProps) + "provisioning.manifest.version=2\n");
        sb.write(shared + "/cache.bin", "x");
        for (const std::string shipped : {"", "provisioning.manifest.version=2\n"}) {
            sb.write(sb.props, launcherProps(configuration) + "provisioning=true\n" + shipped);
            EXPECT_TRUE(platform(sb.run({{"-rcpLauncherWait"}}))) << shipped;
        }
        // But a launch that had to copy platform.xml again counts as a first
        // launch, also when the copy fails (larger than a file may grow).
        // Under a managed update policy the platform writes its own: no copy.
        const std::string xml = sb.cfg + "/org.eclipse.update/platform.xml";
        unlink(xml.c_str());
        sb.write(sb.base + "/platform.xml", std::string(9000, 'x') + "\n");
        Launch limited{{"-foo"}};
        limited.fileSizeLimit = 4096;
        EXPECT_FALSE(platform(sb.run(limited)));
        sb.write(sb.props, launcherProps(configuration) + "provisioning=true\nupdate.policy.managed=false\n");
        EXPECT_TRUE(platform(sb.run({{"-foo"}})));
        EXPECT_FALSE(pathExists(xml));
        // The installer asks: provisioning at the same level, without
        // "-userProvLaunch", its options passed on to the platform.
        const V installer = {"-rcpLauncherWait", "-provManifest", "m.xml"};
        r = sb.run({installer});
        EXPECT_EQ(r.child().argv, provisioning(installer, false, serviceArea ? "/eclipse" : "/rcp/eclipse"));
        EXPECT_TRUE(pathExists(shared + "/cache.bin"));

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
