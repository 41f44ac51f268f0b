// The launcher starting a real platform: a service installation whose JVM is
// the system's java and whose class path is Debian's Equinox launcher, with
// the Equinox framework beside it. The launcher waits for the platform
// ("-rcpLauncherWait"); the framework, configured by the config.ini that the
// launcher copied, starts without an application and stops again. What it
// leaves in the configuration area, and what the demo bundle reports from
// inside the platform, show where it ran and what it was given.
#include <gtest/gtest.h>

#include <signal.h>
#include <sys/wait.h>

#include <cstdlib>

#include "platform_tools.h"
#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

const char* const kBeginParameters = "RLNCH0132I: ===== Begin Parameters =====";
const char* const kEndParameters = "RLNCH0133I: ===== End Parameters =====";

class RealPlatform : public ::testing::Test {
protected:
    void SetUp() override {
        java_ = findOnPath("java");
        jars_ = findEquinox();
        if (java_.empty()) GTEST_SKIP() << "no java on PATH (install default-jre-headless)";
        if (!jars_.found())
            GTEST_SKIP() << "no Equinox launcher and framework jars in $RCP_EQUINOX_PLUGINS or "
                            "/usr/lib/eclipse/plugins (install libequinox-launcher-java and libeclipse-osgi-java)";
    }

    std::string workspace() const { return sb_.inst() + "/eclipse/.workspace"; }
    std::string configuration() const { return sb_.inst() + "/eclipse/.config"; }
    std::string launcherJar() const { return sb_.inst() + "/" + kEquinoxLauncherInInstall; }

    // The service installation: launcher properties naming the system JVM,
    // installation properties with the Equinox launcher as class path, a
    // config.ini that runs the framework without an application.
    void layOut(const std::string& extraConfigIni) {
        sb_.writeLauncherProperties("rcp.install.id=ID42\nrcp.base.location=${rcp.home}/base\njvm.location=" + java_ +
                                    "\ninstall.configuration=service\n");
        sb_.writeBase("rcpinstall.properties",
                      "cp=${rcp.home}/" + std::string(kEquinoxLauncherInInstall) +
                          "\napplication=com.kel.demo.app\n-Ddemo.base=one\n-Xmx128m\n"
                          "vmarg.1=-Ddemo.vmarg=${rcp.home}\nenv.set.RCP_DEMO=hello world\n");
        sb_.writeBase("config.ini", "eclipse.ignoreApp=true\nosgi.noShutdown=false\n" + extraConfigIni);
        sb_.writeBase("platform.xml", Sandbox::standardPlatformXml());
        installEquinox(jars_, sb_.inst());
    }

    LaunchResult launch(const std::vector<std::string>& args) {
        RunOptions o;
        o.args = args;
        o.expectChildren = 0;  // the JVM records nothing; the launcher waits for it
        o.timeoutSeconds = 120;
        o.env = {{"JAVA_HOME", "/opt/removed-by-the-launcher"}};
        LaunchResult r = sb_.run(o);
        if (r.timedOut) killPlatform();
        r.workspace = workspace();
        r.log = readText(workspace() + "/logs/rcplauncher.log");
        return r;
    }

    // The service order: JVM arguments, the Equinox launcher class, then the
    // platform options, and "-XstartOnFirstThread" last, for the platform.
    std::vector<std::string> expectedCommandLine(const std::vector<std::string>& typed,
                                                 const std::vector<std::string>& typedVmargs) const {
        std::vector<std::string> v = {java_};
        v.insert(v.end(), typedVmargs.begin(), typedVmargs.end());
        for (const std::string& a :
             {"-Ddemo.vmarg=" + sb_.inst(), "-Drcp.home=" + sb_.inst(), "-Drcp.data=" + workspace(),
              std::string("-Dcom.kel.rcp.install.id=ID42"), std::string("-Drcp.install.config=service"),
              std::string("-Ddemo.base=one"), "-Drcp.osgi.install.area=" + sb_.inst() + "/eclipse",
              std::string("-Xmx128m"), std::string("-cp"), launcherJar(),
              std::string("org.eclipse.core.launcher.Main"), std::string("-nosplash")})
            v.push_back(a);
        v.insert(v.end(), typed.begin(), typed.end());
        for (const std::string& a : {std::string("-data"), workspace(), std::string("-configuration"),
                                     configuration(), std::string("-application"), std::string("com.kel.demo.app"),
                                     std::string("-XstartOnFirstThread")})
            v.push_back(a);
        return v;
    }

    // After a launch that timed out: the platform the lock names must not
    // outlive the test. The killed launcher's child was handed to this process
    // (the sandbox makes it the subreaper), which tells it from a stranger
    // that may have reused an old number.
    void killPlatform() {
        long pid = std::atol(readText(workspace() + "/.rcp.lock").c_str());
        if (pid <= 0) return;
        int status;
        pid_t p = static_cast<pid_t>(pid);
        if (waitpid(p, &status, WNOHANG) == 0) {
            kill(p, SIGKILL);
            waitpid(p, &status, 0);
        }
    }

    Sandbox sb_;
    std::string java_;
    EquinoxJars jars_;
};

// The framework reads the copied config.ini from the configuration area the
// launcher computed, keeps its own state there, and ends; the launcher
// logged exactly the command line that started it. The demo bundle (when a
// Java compiler is there to build it) reports from inside the platform what
// the launcher computed: the system properties, the areas, the JVM's exact
// argument vector, the program arguments left for the application (among
// them "-XstartOnFirstThread"), and the managed environment. A reset then
// sets the framework's state aside and the next platform starts afresh.
TEST_F(RealPlatform, PlatformRunsWithWhatTheLauncherComputed) {
    const std::string javac = findOnPath("javac");
    layOut(javac.empty() ? "" : "osgi.bundles=com.kel.demo.report@start\n");
    std::string compilerLog;
    if (!javac.empty()) {
        ASSERT_TRUE(buildDemoBundle(javac, jars_, sb_.inst(), compilerLog)) << compilerLog;
    }

    const std::vector<std::string> typed = {"-rcpLauncherWait", "-debug", "-foo", "a b"};
    const std::vector<std::string> typedVmargs = {"-Ddemo.typed=yes"};
    std::vector<std::string> args = typed;
    args.push_back("-vmargs");
    args.insert(args.end(), typedVmargs.begin(), typedVmargs.end());
    LaunchResult r = launch(args);
    ASSERT_FALSE(r.timedOut) << r.describe();
    ASSERT_EQ(r.status, 0) << r.describe();
    const std::vector<std::string> cmd = expectedCommandLine(typed, typedVmargs);
    // With "-debug" the launcher logs the command line, one argument a line.
    std::string logged = kBeginParameters + std::string("\n");
    for (const auto& a : cmd) logged += a + "\n";
    EXPECT_NE(r.log.find(logged + kEndParameters + "\n"), std::string::npos) << r.log;

    // "-debug" reached the platform as well: Equinox names the areas it uses.
    EXPECT_NE(r.terminal.find("Configuration location:\n    file:" + configuration() + "/\n"), std::string::npos)
        << r.terminal;
    EXPECT_NE(r.terminal.find("Framework located:\n    file:" + sb_.inst() + "/eclipse/plugins/"), std::string::npos)
        << r.terminal;

    // The framework's own files, in the area the launcher prepared.
    EXPECT_TRUE(pathExists(configuration() + "/org.eclipse.osgi/framework.info.1")) << r.terminal;
    EXPECT_TRUE(isDir(configuration() + "/org.eclipse.osgi/.manager"));
    EXPECT_EQ(readText(configuration() + "/config.ini"), readText(sb_.base() + "/config.ini"));
    // Equinox reports failures in a <time>.log of the configuration area.
    for (const auto& f : listTree(configuration()))
        EXPECT_FALSE(f.size() > 4 && f.compare(f.size() - 4, 4, ".log") == 0) << readText(configuration() + "/" + f);

    // The lock names the platform process, which has ended.
    const long firstPid = std::atol(readText(workspace() + "/.rcp.lock").c_str());
    EXPECT_GT(firstPid, 0);
    EXPECT_NE(kill(static_cast<pid_t>(firstPid), 0), 0);

    if (javac.empty()) {
        std::cout << "demo bundle report not checked: no javac on PATH (install default-jdk-headless)\n";
    } else {
        const std::string text = readText(configuration() + "/com.kel.demo.report/report.properties");
        ASSERT_FALSE(text.empty()) << r.describe();
        // The launcher waited: the bundle's output reached the terminal in full.
        EXPECT_NE(r.terminal.find(text), std::string::npos) << r.terminal;
        std::map<std::string, std::string> report = parseReport(text);
        const std::map<std::string, std::string> expected = {
            {"property.osgi.install.area", "file:" + sb_.inst() + "/eclipse/"},
            {"property.osgi.configuration.area", "file:" + configuration() + "/"},
            {"property.osgi.instance.area", "file:" + workspace() + "/"},
            {"property.demo.typed", "yes"},
            {"env.RCP_DEMO", "hello world"},
            {"env.JAVA_HIGH_ZIPFDS", "500"},
        };
        // The -D arguments themselves are in the JVM's argument vector below;
        // these are what the framework and the JVM made of them.
        for (const auto& kv : expected) EXPECT_EQ(report[kv.first], kv.second) << kv.first << "\n" << text;
        EXPECT_EQ(report.count("env.JAVA_HOME"), 0u) << text;
        // argv[0] is the JVM's resolved executable; every argument after it
        // is what the launcher assembled.
        EXPECT_EQ(reportList(report, "jvm.arg."), std::vector<std::string>(cmd.begin() + 1, cmd.end())) << text;
        // The framework takes -debug, -data, -configuration and -nosplash;
        // the rest, "-XstartOnFirstThread" last, is left for the application.
        EXPECT_EQ(reportList(report, "application.arg."),
                  (std::vector<std::string>{"-rcpLauncherWait", "-foo", "a b", "-application", "com.kel.demo.app",
                                            "-XstartOnFirstThread"}))
            << text;
    }

    LaunchResult again = launch({"-rcpLauncherWait", "-resetconfig"});
    ASSERT_FALSE(again.timedOut) << again.describe();
    ASSERT_EQ(again.status, 0) << again.describe();
    EXPECT_TRUE(pathExists(configuration() + "bak/org.eclipse.osgi/framework.info.1"));
    EXPECT_TRUE(pathExists(configuration() + "/org.eclipse.osgi/framework.info.1")) << again.terminal;
    const long secondPid = std::atol(readText(workspace() + "/.rcp.lock").c_str());
    EXPECT_GT(secondPid, 0);
    EXPECT_NE(secondPid, firstPid);
}

}  // namespace
