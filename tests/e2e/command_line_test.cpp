// The exact command line and environment that the child receives, for every
// install configuration that a launch can be in, and how the launcher
// properties ('-config NAME' extensions) change the effective arguments.
#include <gtest/gtest.h>
#include <unistd.h>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

// Extra base installation properties used by every case here: a library
// path to prepend (the child's LD_LIBRARY_PATH then starts with it).
const char* const kLibPath = "library.path.prepend=${rcp.home}/lib\n";

struct Expect {
    std::string configuration;              // the -Drcp.install.config word
    std::vector<std::string> passThrough;   // launcher arguments handed to the platform
    std::vector<std::string> userVmargs;    // launcher arguments after "-vmargs"
};

// The child command line of the sandbox installation, as the builders put it
// together for a user-like configuration (the Eclipse executable is started
// and told the JVM) or a service one (the JVM is started directly).
std::vector<std::string> expectedArgs(const Sandbox& sb, const Expect& e) {
    bool isService = e.configuration == "service";
    std::string ws = isService ? sb.inst() + "/eclipse/.workspace" : sb.defaultWorkspace();
    std::string cfg = isService ? sb.inst() + "/eclipse/.config" : sb.defaultConfig();
    // The service workspace creates <inst>/eclipse, which then is the
    // OSGi install area; otherwise the fallback below rcp is named.
    std::string installArea = isService ? sb.inst() + "/eclipse" : sb.inst() + "/rcp/eclipse";

    std::vector<std::string> platform = e.passThrough;
    for (const std::string& a : {std::string("-data"), ws, std::string("-configuration"), cfg,
                                 std::string("-application"), std::string("com.kel.demo.app")})
        platform.push_back(a);

    std::vector<std::string> vm = e.userVmargs;
    for (const std::string& a :
         {std::string("-Dvmarg.one=1"), "-Drcp.home=" + sb.inst(), "-Drcp.data=" + ws,
          std::string("-Dcom.kel.rcp.install.id=ID42"), "-Drcp.install.config=" + e.configuration,
          std::string("-Dbase.prop=one"), "-Drcp.osgi.install.area=" + installArea, std::string("-Xmx256m"),
          std::string("-cp"), sb.inst() + "/lib/boot.jar"})
        vm.push_back(a);

    std::vector<std::string> args;
    auto append = [&](const std::vector<std::string>& v) { args.insert(args.end(), v.begin(), v.end()); };
    if (isService) {
        args.push_back(sb.jvm());
        append(vm);
        args.push_back("org.eclipse.core.launcher.Main");
        args.push_back("-nosplash");
        append(platform);
    } else {
        args.push_back(sb.eclipse());
        append(platform);
        append({"-vm", sb.jvm(), "-startup", sb.base() + "/launcher.jar", "-vmargs"});
        append(vm);
    }
    args.push_back("-XstartOnFirstThread");
    return args;
}

// The launcher's environment as the child must see it: JAVA_HOME removed,
// the variables of the installation properties added.
std::map<std::string, std::string> expectedEnv(const Sandbox& sb, const LaunchResult& r) {
    std::map<std::string, std::string> env = r.launcherEnv;
    env.erase("JAVA_HOME");
    env["JAVA_HIGH_ZIPFDS"] = "500";
    env["RCP_DEMO"] = "hello world";
    env["LD_LIBRARY_PATH"] = sb.inst() + "/lib:/opt/inherited/lib";
    return env;
}

RunOptions userRun(const std::vector<std::string>& args) {
    RunOptions o;
    o.args = args;
    o.env = {{"JAVA_HOME", "/opt/java"}, {"LD_LIBRARY_PATH", "/opt/inherited/lib"}};
    return o;
}

// One launch per install configuration; the child gets exactly this command
// line and environment, and the lock file names it.
TEST(CommandLine, EveryInstallConfiguration) {
    struct Case {
        std::string property;  // value of install.configuration; "" = no such key
        std::string word;      // what -Drcp.install.config says
    };
    const std::vector<Case> cases = {
        {"user", "user"},       {"lockdown", "lockdown"},
        {"serial.multiuser", "serial.multiuser"},       {"multiuser", "multiuser"},
        {"userpb", "userpb"},   {"service", "service"},
    };
    const std::vector<std::string> args = {"-foo", "a b", "-vmargs", "-Duser.vm=1"};
    for (const auto& c : cases) {
        SCOPED_TRACE("install.configuration=" + c.property);
        Sandbox sb;
        sb.setupInstall(c.property, "", kLibPath);
        LaunchResult r = sb.run(userRun(args));
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_EQ(r.children.size(), 1u);
        EXPECT_EQ(r.child().argv, expectedArgs(sb, {c.word, {"-foo", "a b"}, {"-Duser.vm=1"}}));
        EXPECT_EQ(r.child().env, expectedEnv(sb, r));
        EXPECT_EQ(readText(r.workspace + "/.rcp.lock"), std::to_string(r.child().pid) + std::string(10, ' '));
        EXPECT_EQ(r.terminal, "");
    }
}

// An install configuration the launcher does not know cannot be named to the
// platform, and one that is missing cannot be written into the user's
// installation properties: either launch ends in its own log, without a child.
TEST(CommandLine, UnknownOrMissingInstallConfigurationEndsTheLaunch) {
    struct Case {
        std::string property;  // "" = no such key
        std::string message;
    };
    const std::string unknown = "RLNCH0025E: The platform rcp.install.id must be provided for this configuration!";
    const std::vector<Case> cases = {
        {"Lockdown", unknown},
        {"provisioning", unknown},
        {"user\t", unknown},
        {"", "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file."},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE("install.configuration=" + c.property);
        Sandbox sb;
        sb.setupInstall(c.property);
        LaunchResult r = sb.run(userRun({}));
        EXPECT_EQ(r.status, 255);
        EXPECT_FALSE(r.hasChild());
        std::vector<std::string> lines = logLines(r.log);
        ASSERT_FALSE(lines.empty());
        EXPECT_TRUE(isErrorLine(lines.back(), c.message)) << r.describe();
        EXPECT_EQ(r.terminal, "");
    }
}

// '-config NAME' takes arguments from the launcher properties: platform
// options land before the command line's own "-vmargs", VM options after
// the command line's VM arguments.
TEST(CommandLine, ConfigExtensionsFromLauncherProperties) {
    struct Case {
        const char* name;
        std::vector<std::string> args;
        std::vector<std::string> passThrough;
        std::vector<std::string> userVmargs;
    };
    const std::vector<Case> cases = {
        {"extensions around the own -vmargs",
         {"-config", "x", "-bar", "-vmargs", "-Dv=1"},
         {"-bar", "-foo"},
         {"-Dv=1", "-Xmx1g"}},
        {"no own -vmargs: all appended in order", {"-bar", "-config", "x"}, {"-bar", "-foo"}, {"-Xmx1g"}},
        {"unknown name adds nothing", {"-config", "nothing", "-bar"}, {"-bar"}, {}},
    };
    const std::string props = "config.x.1=-foo\nconfig.x.2=-vmargs\nconfig.x.3=-Xmx1g\n";
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        Sandbox sb;
        sb.setupInstall("user", props, kLibPath);
        LaunchResult r = sb.run(userRun(c.args));
        ASSERT_EQ(r.status, 0) << r.describe();
        EXPECT_EQ(r.child().argv, expectedArgs(sb, {"user", c.passThrough, c.userVmargs}));
    }
}

// Debug output is decided on the effective arguments: "-debug" may come from
// the launcher properties; "-restart" switches it off and keeps "-debug" away
// from the child.
TEST(CommandLine, DebugOutputFromTheEffectiveArguments) {
    struct Case {
        std::vector<std::string> args;
        bool debug;
    };
    const std::vector<Case> cases = {
        {{}, false},
        {{"-config", "dbg"}, true},
        {{"-debug"}, true},
        {{"-restart", "-config", "dbg"}, false},
    };
    Sandbox sb;
    sb.setupInstall("user", "config.dbg.1=-debug\n");
    for (const auto& c : cases) {
        SCOPED_TRACE(::testing::PrintToString(c.args));
        LaunchResult r = sb.run(c.args);
        ASSERT_EQ(r.status, 0) << r.describe();
        bool logged = r.log.find("RLNCH0132I: ===== Begin Parameters =====") != std::string::npos;
        EXPECT_EQ(logged, c.debug) << r.describe();
        EXPECT_EQ(r.child().argIndex("-debug") != -1, c.debug);
        EXPECT_EQ(r.terminal, "");
    }
}

}  // namespace

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
        "library.preload=/nonexistent/libpre.so\n";
    for (const std::string configuration : {"user", "lockdown", "serial.multiuser", "multiuser", "userpb", "service"}) {
        SCOPED_TRACE("install.configuration=" + configuration);
        const bool isService = configuration == "service";
        Sandbox sb;
        sb.setupInstall(configuration, launcherExtra, installExtra);
        // An overriding JVM three levels below a jvm.properties of its own.
        const std::string jvm2 = sb.path("inst/jvm2/jre/bin/java");
        sb.installStub(jvm2);
        sb.writeFile("inst/jvm2/jvm.properties", "-Dfrom.jvm=1\nvmarg.z=-Dvz=1\n");

        RunOptions o = userRun({"-consoleLog", "-plugincustomization", "cmd.ini", "-resetconfig", "-foo", "-vm", jvm2,
                                "-vmargs", "-Duser.vm=1"});
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
    }
}

// The console options and a restart: "-console" keeps the console fix away
// from the JVM and reaches the platform; a restart brings the fix back and
// keeps "-console" and "-debug" away from the child. Without any library path
// key the inherited LD_LIBRARY_PATH reaches the child unchanged, and with the
// preload library behind a path with a blank the child is given a link of
// its own under /tmp.
TEST(CommandLine, ConsoleRestartAndPreloadLink) {
    Sandbox sb;
    const std::string lib = sb.path("my libs/libpre." + std::to_string(getpid()) + ".so");
    sb.writeFile(lib, "");
    const std::string link = "/tmp/kel.rcp.tester.ID42.libpre." + std::to_string(getpid()) + ".so";
    unlink(link.c_str());
    // The link outlives the launcher by design; this test removes it however
    // it ends.
    struct Unlink {
        const std::string& path;
        ~Unlink() { unlink(path.c_str()); }
    } removeLink{link};
    sb.setupInstall("user", "", "vmfix.noconsole=-Dfix=1\nlibrary.preload=" + lib + "\n");
    struct Case {
        std::vector<std::string> args;
        bool fix;
        std::vector<std::string> passed;  // launcher arguments the platform gets
    };
    const std::vector<Case> cases = {
        {{"-console", "-debug"}, false, {"-console", "-debug"}},
        {{"-console", "-debug", "-restart"}, true, {}},
        {{"-consoleLog"}, true, {"-consoleLog"}},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(::testing::PrintToString(c.args));
        RunOptions o;
        o.args = c.args;
        o.env = {{"LD_LIBRARY_PATH", "/opt/inherited/lib"}};
        LaunchResult r = sb.run(o);
        ASSERT_EQ(r.status, 0) << r.describe();
        const ChildRecord& child = r.child();
        std::vector<std::string> expected = {sb.eclipse()};
        expected.insert(expected.end(), c.passed.begin(), c.passed.end());
        const std::string ws = sb.defaultWorkspace();
        for (const std::string& a : {std::string("-data"), ws, std::string("-configuration"), sb.defaultConfig(),
                                     std::string("-application"), std::string("com.kel.demo.app"),
                                     std::string("-vm"), sb.jvm(), std::string("-startup"),
                                     sb.base() + "/launcher.jar", std::string("-vmargs")})
            expected.push_back(a);
        if (c.fix) expected.push_back("-Dfix=1");
        for (const std::string& a :
             {std::string("-Dvmarg.one=1"), "-Drcp.home=" + sb.inst(), "-Drcp.data=" + ws,
              std::string("-Dcom.kel.rcp.install.id=ID42"), std::string("-Drcp.install.config=user"),
              std::string("-Dbase.prop=one"), "-Drcp.osgi.install.area=" + sb.inst() + "/rcp/eclipse",
              std::string("-Xmx256m"), std::string("-cp"), sb.inst() + "/lib/boot.jar",
              std::string("-XstartOnFirstThread")})
            expected.push_back(a);
        EXPECT_EQ(child.argv, expected);
        auto env = [&](const char* name) { return child.hasEnv(name) ? child.env.at(name) : "<unset>"; };
        EXPECT_EQ(env("LD_LIBRARY_PATH"), "/opt/inherited/lib");
        EXPECT_EQ(env("LD_PRELOAD"), link);
        char target[4096];
        ssize_t n = readlink(link.c_str(), target, sizeof target);
        EXPECT_EQ(n < 0 ? "<no link>" : std::string(target, static_cast<size_t>(n)), lib);
        EXPECT_EQ(withoutLoaderWarnings(r.terminal), "");
    }
}

}  // namespace
