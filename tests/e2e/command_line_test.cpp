// The exact command line and environment that the child receives, for every
// install configuration that a launch can be in, and how the launcher
// properties ('-config NAME' extensions) change the effective arguments.
#include <gtest/gtest.h>

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
