// The exact command line and environment that the child receives, for every
// install configuration that a launch can be in (the multi-user service's
// own start included), and how the effective arguments ('-config NAME'
// extensions, "-debug", "-console", "-restart", "-rcpLauncherWait") shape the
// child and the launcher's own behaviour.
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

// Terminal output that the child's dynamic loader may write about a preload
// library that cannot be loaded: the launcher itself must write nothing.
std::string withoutLoaderWarnings(const std::string& terminal) {
    std::string kept;
    for (const std::string& line : splitLines(terminal))
        if (!line.empty() && line.find("from LD_PRELOAD cannot be preloaded") == std::string::npos) kept += line + "\n";
    return kept;
}

// Every input that the builders read, for each install configuration: the
// launcher's own options (passed on, held back or overriding a property),
// the properties behind each VM argument, system property and -X option, the
// jvm.properties beside an overriding JVM, and the environment keys. The
// child gets exactly this command line and environment.
TEST(CommandLine, EveryBuilderInputPerInstallConfiguration) {
    const std::string launcherExtra =
        "osgi.splashPath=platform:/base/plugins/splash\n"
        "product=launcher.product\n";
    const std::string installExtra =
        "product=install.product\n"
        "personality=pers.one\n"
        "plugincustomization=prop.ini\n"
        "vmfix.noconsole=-Dfix=${workspace.location}\\\\fix\n"
        "vmfix.noconsole.2=-Dfix.second=1\n"
        "vmarg.b=-Dvb=2\n"
        "vmarg.a=\n"
        "vmarg.0=-Dvzero=0\n"
        "-Dempty=\n"
        "-Xss=2m\n"
        "Xbootclasspath.prepend=${rcp.home}/pre.jar\n"
        "Xbootclasspath.append=/post.jar\n"
        "library.path.prepend=${rcp.home}/lib\n"
        "library.path.append=/opt/append/lib\n"
        "env.setXRCP_COUNTED=yes\n"
        "env.JAVA_HIGH_ZIPFDS=900\n"
        "library.preload=/nonexistent/libpre.so\n"
        "jvm.shareclasses.fullpath=\n";  // names no directory: nothing to empty, nothing to report
    for (const std::string configuration : {"user", "lockdown", "serial.multiuser", "multiuser", "userpb", "service"}) {
        SCOPED_TRACE("install.configuration=" + configuration);
        const bool isService = configuration == "service";
        Sandbox sb;
        sb.setupInstall(configuration, launcherExtra, installExtra);
        // An overriding JVM three levels below a jvm.properties of its own.
        const std::string jvm2 = sb.path("inst/jvm2/jre/bin/java");
        sb.installStub(jvm2);
        sb.writeFile("inst/jvm2/jvm.properties", "-Dfrom.jvm=1\nvmarg.z=-Dvz=1\n");

        RunOptions o;
        o.args = {"-consoleLog", "-plugincustomization", "cmd.ini", "-resetconfig", "-foo", "-vm", jvm2,
                  "-vmargs", "-Duser.vm=1"};
        o.env = {{"JAVA_HOME", "/opt/java"}, {"LD_LIBRARY_PATH", "/opt/inherited/lib"}};
        LaunchResult r = sb.run(o);
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u);

        const std::string ws = isService ? sb.inst() + "/eclipse/.workspace" : sb.defaultWorkspace();
        const std::string cfg = isService ? sb.inst() + "/eclipse/.config" : sb.defaultConfig();
        const std::vector<std::string> platform = {
            "-consoleLog", "-plugincustomization", "cmd.ini", "-foo", "-data", ws, "-configuration", cfg,
            "-application", "com.kel.demo.app", "-product", "launcher.product", "-personality", "pers.one"};
        const std::vector<std::string> vm = {
            "-Duser.vm=1", "-Dfix=" + ws + "/fix", "-Dvmarg.one=1", "-Dvb=2", "-Dvzero=0", "-Dvz=1",
            "-Drcp.home=" + sb.inst(), "-Drcp.data=" + ws, "-Dosgi.splashPath=platform:/base/plugins/splash",
            "-Dcom.kel.rcp.install.id=ID42", "-Drcp.install.config=" + configuration, "-Dbase.prop=one", "-Dempty=",
            "-Dfrom.jvm=1", "-Drcp.osgi.install.area=" + sb.inst() + (isService ? "/eclipse" : "/rcp/eclipse"),
            "-Xmx256m", "-Xss=2m", "-Xbootclasspath/p:" + sb.inst() + "/pre.jar", "-Xbootclasspath/a:/post.jar",
            "-cp", sb.inst() + "/lib/boot.jar"};
        std::vector<std::string> expected;
        auto append = [&](const std::vector<std::string>& v) { expected.insert(expected.end(), v.begin(), v.end()); };
        if (isService) {
            append({jvm2});
            append(vm);
            append({"org.eclipse.core.launcher.Main", "-nosplash"});
            append(platform);
        } else {
            append({sb.eclipse()});
            append(platform);
            append({"-vm", jvm2, "-startup", sb.base() + "/launcher.jar", "-vmargs"});
            append(vm);
        }
        append({"-XstartOnFirstThread"});
        EXPECT_EQ(r.child().argv, expected);

        std::map<std::string, std::string> env = r.launcherEnv;
        env.erase("JAVA_HOME");
        env["JAVA_HIGH_ZIPFDS"] = "900";
        env["RCP_DEMO"] = "hello world";
        env["RCP_COUNTED"] = "yes";  // "env.setX..." loses its first 8 characters, the X included
        env["LD_LIBRARY_PATH"] = sb.inst() + "/lib:/opt/inherited/lib:/opt/append/lib";
        env["LD_PRELOAD"] = "/nonexistent/libpre.so";
        EXPECT_EQ(r.child().env, env);
        EXPECT_EQ(withoutLoaderWarnings(r.terminal), "");
        EXPECT_EQ(logLines(r.log), std::vector<std::string>()) << r.log;
        EXPECT_EQ(readText(r.workspace + "/.rcp.lock"), std::to_string(r.child().pid) + std::string(10, ' '));
    }
}

// "-initMUService" from a launcher six levels below the installation, whose
// service directory two levels up holds the launcher properties: the JVM is
// started from the service's own area, which the start prepares, logs to and
// locks. A launcher in a shallower tree ends with RLNCH0048E.
TEST(CommandLine, MultiUserServiceStart) {
    Sandbox sb;
    sb.setupInstall("user");  // the installation's own launcher properties are not the service's
    const std::string svc = sb.inst() + "/p1/p2/p3/p4", ws = sb.inst() + "/eclipse/.muservice";
    sb.writeFile(svc + "/rcp/rcplauncher.properties", "rcp.install.id=SVC7\nrcp.base.location=${rcp.home}/base\n"
                                                      "jvm.location=${rcp.home}/jre/bin/java\ninstall.configuration=multiuser\n");
    RunOptions o;
    o.program = svc + "/p5/p6/rcplauncher";
    sb.installLauncher(o.program);
    o.args = {"-foo", "-initMUService", "-debug"};
    LaunchResult r = sb.run(o);
    ASSERT_EQ(r.status, 0) << r.describe();
    ASSERT_EQ(r.children.size(), 1u);
    const std::vector<std::string> argv = {
        sb.jvm(), "-Dvmarg.one=1", "-Drcp.home=" + sb.inst(), "-Drcp.data=" + ws, "-Dcom.kel.rcp.install.id=SVC7",
        "-Drcp.install.config=multiuser", "-Dbase.prop=one", "-Drcp.osgi.install.area=" + sb.inst() + "/eclipse",
        "-Xmx256m", "-cp", sb.base() + "/startup.jar", "org.eclipse.core.launcher.Main", "-nosplash", "-foo",
        "-initMUService", "-debug", "-data", ws, "-configuration", ws + "/.config", "-application", "com.kel.demo.app",
        "-XstartOnFirstThread"};
    EXPECT_EQ(r.child().argv, argv);
    EXPECT_EQ(listTree(ws), (std::vector<std::string>{".config/", ".config/config.ini", ".config/org.eclipse.update/",
                                                      ".config/org.eclipse.update/platform.xml", ".config/rcpinstall.properties",
                                                      ".rcp.lock", "logs/", "logs/rcplauncher.log"}));
    EXPECT_NE(readText(ws + "/.config/rcpinstall.properties").find("\nrcp.install.id=SVC7\nvm=${rcp.home}/jre/bin/java\n"),
              std::string::npos);
    EXPECT_EQ(readText(ws + "/.rcp.lock"), std::to_string(r.child().pid) + std::string(10, ' '));
    // The whole start is in the service's own log: its user, then the child's command line.
    std::string parameters = "RLNCH0132I: ===== Begin Parameters =====\n";
    for (const std::string& a : argv) parameters += a + "\n";
    const size_t logged = r.log.find(parameters + "RLNCH0133I: ===== End Parameters =====\n");
    EXPECT_NE(logged, std::string::npos) << r.log;
    EXPECT_LT(r.log.find("RLNCH0043I: UserName: muservice\n"), logged);
    EXPECT_EQ(r.terminal, "");

    // A launcher in the sandbox root, fewer than six levels below "/": too shallow.
    o.program = sb.path("rcplauncher");
    sb.installLauncher(o.program);
    r = sb.run(o);
    EXPECT_EQ(r.status, 255);
    EXPECT_FALSE(r.hasChild());
    const std::vector<std::string> tmpLog = logLines(r.tmpLog);
    EXPECT_TRUE(!tmpLog.empty() && isErrorLine(tmpLog.back(), "RLNCH0048E: Unable to locate the directory containing " +
                                                                  o.program)) << r.describe();
}

// The arguments from first (exclusive; "" = the program) up to last.
std::vector<std::string> between(const ChildRecord& c, const std::string& first, const std::string& last) {
    const int from = first.empty() ? 0 : c.argIndex(first), to = c.argIndex(last);
    if (from < 0 || to <= from) return {"<missing " + first + " or " + last + ">"};
    return std::vector<std::string>(c.argv.begin() + from + 1, c.argv.begin() + to);
}

// The effective arguments are the typed ones plus the '-config NAME'
// extensions of the launcher properties (platform options before the typed
// "-vmargs", VM options after the typed VM arguments). On them depend: debug
// output ("-debug", even from the properties; never on a restart), the
// console fix (left out with "-console" unless restarting), and whether the
// launcher stays until its platform ends ("-rcpLauncherWait" or "-console",
// not on a restart); a launcher that waited exits 0 whatever the platform's
// status. Without library path keys the inherited LD_LIBRARY_PATH reaches
// the child unchanged.
TEST(CommandLine, EffectiveArguments) {
    using V = std::vector<std::string>;
    struct Case {
        V args, platform, vm;  // vm: the VM arguments before the configured ones
        bool debug, waits;
    };
    const std::vector<Case> cases = {
        {{"-config", "x", "-bar", "-vmargs", "-Dv=1"}, {"-bar", "-foo"}, {"-Dv=1", "-Xmx1g", "-Dfix=1"}, false, false},
        {{"-bar", "-config", "x"}, {"-bar", "-foo"}, {"-Xmx1g", "-Dfix=1"}, false, false},
        {{"-config", "nothing", "-bar"}, {"-bar"}, {"-Dfix=1"}, false, false},
        {{"-config", "dbg"}, {"-debug"}, {"-Dfix=1"}, true, false},
        {{"-debug"}, {"-debug"}, {"-Dfix=1"}, true, false},
        {{"-restart", "-config", "dbg"}, {}, {"-Dfix=1"}, false, false},
        {{"-console", "-debug"}, {"-console", "-debug"}, {}, true, true},
        {{"-config", "con"}, {"-console"}, {}, false, true},
        {{"-rcpLauncherWait"}, {"-rcpLauncherWait"}, {"-Dfix=1"}, false, true},
        {{"-restart", "-console", "-debug"}, {}, {"-Dfix=1"}, false, false},
        {{"-restart", "-rcpLauncherWait"}, {"-rcpLauncherWait"}, {"-Dfix=1"}, false, true},
        {{"-consoleLog"}, {"-consoleLog"}, {"-Dfix=1"}, false, false},
    };
    Sandbox sb;
    sb.setupInstall("user",
                    "config.x.1=-foo\nconfig.x.2=-vmargs\nconfig.x.3=-Xmx1g\n"
                    "config.dbg.1=-debug\nconfig.con.1=-console\n",
                    "vmfix.noconsole=-Dfix=1\n");
    for (const Case& c : cases) {
        SCOPED_TRACE(::testing::PrintToString(c.args));
        RunOptions o;
        o.args = c.args;
        o.env = {{"RCP_STUB_SLEEP", "3"}, {"RCP_STUB_EXIT", "7"}, {"LD_LIBRARY_PATH", "/opt/inherited/lib"}};
        o.keepChildren = true;
        const auto start = std::chrono::steady_clock::now();
        LaunchResult r = sb.run(o);
        const auto seconds =
            std::chrono::duration_cast<std::chrono::seconds>(std::chrono::steady_clock::now() - start).count();
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u);
        const ChildRecord& child = r.child();
        EXPECT_EQ(child.argv.at(0), sb.eclipse());
        EXPECT_EQ(between(child, "", "-data"), c.platform);
        EXPECT_EQ(between(child, "-vmargs", "-Dvmarg.one=1"), c.vm);
        EXPECT_EQ(child.argv.back(), "-XstartOnFirstThread");
        EXPECT_EQ(child.env.at("LD_LIBRARY_PATH"), "/opt/inherited/lib");
        EXPECT_EQ(r.log.find("RLNCH0132I: ===== Begin Parameters =====") != std::string::npos, c.debug) << r.log;
        // A launcher that waited has also reaped its platform.
        EXPECT_EQ(kill(static_cast<pid_t>(child.pid), 0) == -1 && errno == ESRCH, c.waits);
        EXPECT_EQ(seconds >= 3, c.waits) << seconds << " s";
        EXPECT_EQ(r.terminal, "");
        sb.killChildren();
    }
}

}  // namespace
