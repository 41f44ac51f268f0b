// The exact command line and environment that the child receives, for every
// install configuration that a launch can be in, the multi-user service's
// own start included.

#include "sandbox.h"

using namespace rcptest;

// Every input that the builders read, for each install configuration: the
// launcher's own options (passed on, held back or overriding a property;
// "${rcp.home}" and "${rcp.data}" in them expanded; "-perfJar" the start-up jar),
// the properties behind each VM argument, system property and -X option, the
// jvm.properties beside an overriding JVM, the environment keys, and a
// '-config NAME' extension of the launcher properties (its platform options
// after the typed ones, its VM options after the typed VM arguments), and a
// HOME relative to the launcher's directory and ending in "/". The child gets
// exactly this command line (no path holds "//") and environment, and
// nothing is logged. (jvm.shareclasses.fullpath names no directory: nothing
// to empty, nothing to report.) Under umask 000 the areas of one user are
// writable by the user alone (the lock file readable by the user alone), the
// shared areas of a service installation as the umask leaves them.
TEST(CommandLine, EveryBuilderInputPerInstallConfiguration) {
    for (const std::string configuration : {"user", "lockdown", "serial.multiuser", "multiuser", "userpb", "service"}) {
        SCOPED_TRACE("install.configuration=" + configuration);
        const bool service = configuration == "service";
        const std::string splash = "platform:/base/plugins/splash";
        Sandbox sb(configuration, "osgi.splashPath=" + splash + "\nproduct=launcher.product\n"
                                  "config.x.1=-fromconfig\nconfig.x.2=-vmargs\nconfig.x.3=-Dfromconfig=1\n",
                   "product=install.product\npersonality=pers.one\nplugincustomization=prop.ini\n"
                   "vmfix.noconsole=-Dfix=${workspace.location}\\\\fix\nvmfix.noconsole.2=-Dfix.second=1\n"
                   "vmarg.b=-Dvb=2\nvmarg.a=\nvmarg.0=-Dvzero=0\n-Dempty=\n-Xss=2m\nXbootclasspath.append=/post.jar\n"
                   "Xbootclasspath.prepend=${rcp.home}/pre.jar\nlibrary.path.prepend=${rcp.home}/lib\n"
                   "library.path.append=/opt/append/lib\nenv.setXRCP_COUNTED=yes\nenv.JAVA_HIGH_ZIPFDS=900\n"
                   "library.preload=/nonexistent/libpre.so\njvm.shareclasses.fullpath=\n");
        // An overriding JVM three levels below a jvm.properties of its own.
        const std::string jvm2 = sb.path("inst/jvm2/jre/bin/java"), inst = sb.inst;
        sb.installStub(jvm2);
        sb.write("inst/jvm2/jvm.properties", "-Dfrom.jvm=1\nvmarg.z=-Dvz=1\n");
        const std::string home = sb.home.substr(sb.root.size() + 1) + "/";
        const mode_t umaskBefore = umask(0);
        Result r = sb.run({{"-consoleLog", "-plugincustomization", "${rcp.home}/cmd.ini", "-resetconfig", "-foo", "-config",
                            "x", "-perfJar", "${rcp.data}/perf.jar", "-vm", jvm2, "-vmargs", "-Duser.vm=1"},
                           {{"JAVA_HOME", "/opt/java"}, {"LD_LIBRARY_PATH", "/opt/inherited/lib"}, {"HOME", home}}});
        umask(umaskBefore);
        ASSERT_EQ(r.children.size(), 1u) << r.describe();
        const std::string areas = service ? inst + "/eclipse" : sb.home;
        for (const auto& [rel, e] : snapshot(areas)) {
            struct stat st;
            ASSERT_EQ(lstat((areas + "/" + rel).c_str(), &st), 0);
            const unsigned mode = (S_ISDIR(st.st_mode) ? 0775u : 0666u) & (service ? 0777u : 0755u);
            EXPECT_EQ(st.st_mode & 0777u, rel.find(".rcp.lock") != std::string::npos ? 0600u : mode) << rel;
        }

        const std::string ws = service ? inst + "/eclipse/.workspace" : sb.ws, area = service ? "" : "/rcp";
        const V platform = {"-consoleLog", "-plugincustomization", inst + "/cmd.ini", "-foo", "-perfJar", ws + "/perf.jar",
                            "-fromconfig", "-data", ws,
                            "-configuration", service ? inst + "/eclipse/.config" : sb.cfg, "-application",
                            "com.kel.demo.app", "-product", "launcher.product", "-personality", "pers.one"};
        const V vm = {"-Duser.vm=1", "-Dfromconfig=1", "-Dfix=" + ws + "/fix", "-Dvmarg.one=1", "-Dvb=2", "-Dvzero=0",
                      "-Dvz=1", "-Drcp.home=" + inst, "-Drcp.data=" + ws, "-Dosgi.splashPath=" + splash,
                      "-Dcom.kel.rcp.install.id=ID42", "-Drcp.install.config=" + configuration, "-Dbase.prop=one",
                      "-Dempty=", "-Dfrom.jvm=1", "-Drcp.osgi.install.area=" + inst + area + "/eclipse",
                      "-Xmx256m", "-Xss=2m", "-Xbootclasspath/p:" + inst + "/pre.jar", "-Xbootclasspath/a:/post.jar",
                      "-cp", inst + "/lib/boot.jar"};
        V expected = {service ? jvm2 : sb.eclipse};
        for (const V& part : service ? std::vector<V>{vm, {"org.eclipse.core.launcher.Main", "-nosplash"}, platform}
                                     : std::vector<V>{platform, {"-vm", jvm2, "-startup", ws + "/perf.jar",
                                                                 "-vmargs"}, vm})
            expected.insert(expected.end(), part.begin(), part.end());
        expected.push_back("-XstartOnFirstThread");
        EXPECT_EQ(r.child().argv, expected);

        // "env.setX..." loses its first 8 characters, the X included; JAVA_HOME goes.
        std::map<std::string, std::string> env = r.child().env;
        for (const char* harness : {"RCP_STUB_RECORD", "ASAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"})
            env.erase(harness);
        EXPECT_EQ(env, (std::map<std::string, std::string>{
                           {"HOME", home}, {"USER", "tester"}, {"PATH", "/usr/bin:/bin"}, {"LANG", utf8Locale()},
                           {"JAVA_HIGH_ZIPFDS", "900"}, {"RCP_DEMO", "hello world"}, {"RCP_COUNTED", "yes"},
                           {"LD_LIBRARY_PATH", inst + "/lib:/opt/inherited/lib:/opt/append/lib"},
                           {"LD_PRELOAD", "/nonexistent/libpre.so"}}));
        EXPECT_EQ(lastLine(r.log), "") << r.log;
    }
}

// "-initMUService" from a launcher six levels below the installation, whose
// service directory two levels up holds the launcher properties: the JVM is
// started from the service's own area, which the start prepares, logs to and
// locks; the log shows the service's user, then the child's command line.
// (A launcher in a shallower tree is among the fault cases.)
TEST(CommandLine, MultiUserServiceStart) {
    Sandbox sb;  // the installation's own launcher properties are not the service's
    const std::string svc = sb.inst + "/p1/p2/p3/p4", ws = sb.inst + "/eclipse/.muservice";
    sb.write(svc + "/rcp/rcplauncher.properties",
             "rcp.install.id=SVC7\nrcp.base.location=${rcp.home}/base\njvm.location=${rcp.home}/jre/bin/java\n"
             "install.configuration=multiuser\n");
    sb.installLauncher(svc + "/p5/p6/rcplauncher");
    Result r = sb.run({{"-foo", "-initMUService", "-debug"}, {}, svc + "/p5/p6/rcplauncher"});
    EXPECT_EQ(r.child().argv,
              (V{sb.jvm, "-Dvmarg.one=1", "-Drcp.home=" + sb.inst, "-Drcp.data=" + ws, "-Dcom.kel.rcp.install.id=SVC7",
                 "-Drcp.install.config=multiuser", "-Dbase.prop=one", "-Drcp.osgi.install.area=" + sb.inst + "/eclipse",
                 "-Xmx256m", "-cp", sb.base + "/startup.jar", "org.eclipse.core.launcher.Main", "-nosplash", "-foo",
                 "-initMUService", "-debug", "-data", ws, "-configuration", ws + "/.config", "-application",
                 "com.kel.demo.app", "-XstartOnFirstThread"}))
        << r.describe();
    EXPECT_EQ(names(snapshot(ws)), (V{".config/", ".config/config.ini", ".config/org.eclipse.update/",
                                      ".config/org.eclipse.update/platform.xml", ".config/rcpinstall.properties",
                                      ".rcp.lock", "logs/", "logs/rcplauncher.log"}));
    EXPECT_LT(r.log.find("RLNCH0043I: UserName: muservice\n"),
              r.log.find("RLNCH0132I: ===== Begin Parameters =====\n" + sb.jvm + "\n-Dvmarg.one=1\n"));
}
