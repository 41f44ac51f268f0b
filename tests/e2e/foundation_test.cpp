// The launcher as a program: the version report, finding the installation
// from the executable's real location, and the fallback log of launches that
// end before their log directory is known.
#include <gtest/gtest.h>
#include <unistd.h>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

// The installation is found from where the executable really lies, so a
// launcher reached through links still uses its own installation.
TEST(Foundation, LinksToTheLauncherResolveToTheRealInstallation) {
    Sandbox sb;
    sb.setupInstall("user");
    makeDirs(sb.path("links"));
    ASSERT_EQ(symlink(sb.launcher().c_str(), sb.path("links/launcher").c_str()), 0);
    ASSERT_EQ(symlink(sb.inst().c_str(), sb.path("links/inst").c_str()), 0);
    // A decoy beside the link: a launcher that trusted argv[0] would read it.
    sb.writeFile("links/rcplauncher.properties", "rcp.install.id=WRONG\n");

    for (const std::string& program : {sb.path("links/launcher"), sb.path("links/inst/rcp/rcplauncher")}) {
        SCOPED_TRACE(program);
        RunOptions o;
        o.program = program;
        LaunchResult r = sb.run(o);
        ASSERT_EQ(r.status, 0) << r.describe();
        ASSERT_TRUE(r.hasChild());
        EXPECT_EQ(r.child().argv.at(0), sb.eclipse());
        EXPECT_NE(r.child().argIndex("-Drcp.home=" + sb.inst()), -1);
        EXPECT_EQ(r.workspace, sb.defaultWorkspace());
        // The startup record names the resolved program, not the link.
        EXPECT_EQ(splitLines(readText(sb.defaultConfig() + "/args.properties")).at(0), "arg0=" + sb.launcher());
        EXPECT_EQ(r.terminal, "");
    }
}

// Launches that end before their log directory is known leave their line in
// the fallback log and create nothing in the user's home:
// - "-version", whatever else is on the command line: the version line in
//   error form is all there is;
// - a launcher outside a directory named exactly "rcp" has an empty
//   installation directory without a message, so it looks for
//   /rcp/rcplauncher.properties (ignoring a valid installation beside it);
// - missing launcher properties or required keys.
// An install configuration the launcher does not know cannot be named to
// the platform, and a missing one cannot be written into the user's
// installation properties: those end in the user's log, without a child.
TEST(Foundation, EarlyFailuresEndWithTheirMessage) {
    struct Case {
        std::string dir;            // where the launcher lies ("" = inst/rcp)
        std::vector<std::string> args;
        std::string launcherProps;  // "" = the standard ones, "-" = no launcher properties file
        std::string message;        // "%P" stands for the launcher properties path
        bool inTmpLog;
        bool onlyLine;              // the log holds nothing else
    };
    const std::string version = "RLNCH0031I:   version = \"2006-06-27\"";
    const std::string noRcp = "RLNCH0014E: Unable to load /rcp/rcplauncher.properties file!";
    const std::string unknown = "RLNCH0025E: The platform rcp.install.id must be provided for this configuration!";
    const std::vector<Case> cases = {
        {"", {"-version"}, "", version, true, true},
        {"", {"-debug", "-version"}, "", version, true, true},
        {"", {"-data", "/nonexistent/ws", "-version", "-resetconfig"}, "", version, true, true},
        {"inst/bin", {}, "", noRcp, true, true},
        {"inst/RCP", {}, "", noRcp, true, true},
        {"inst/rcpx", {}, "", noRcp, true, true},
        {"inst/xrcp", {}, "", noRcp, true, true},
        {"", {"-debug"}, "-", "RLNCH0014E: Unable to load %P file!", true, false},
        {"", {"-debug"}, "rcp.install.id=ID42\njvm.location=/j\ninstall.configuration=user\n",
         "RLNCH0050E: rcp.base.location property is missing from %P", true, false},
        {"", {"-debug"}, "rcp.base.location=${rcp.home}/base\ninstall.configuration=user\n",
         "RLNCH0016E: rcp.install.id is required for this configuration!", true, false},
        {"", {"-debug"}, Sandbox::standardLauncherProperties("Lockdown"), unknown, false, false},
        {"", {"-debug"}, Sandbox::standardLauncherProperties("provisioning"), unknown, false, false},
        {"", {"-debug"}, Sandbox::standardLauncherProperties("user\t"), unknown, false, false},
        {"", {"-debug"}, Sandbox::standardLauncherProperties(""),
         "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file.", false,
         false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.dir + " " + ::testing::PrintToString(c.args) + " " + c.launcherProps);
        Sandbox sb;
        sb.setupInstall("user");
        RunOptions o;
        o.args = c.args;
        if (!c.dir.empty()) {
            o.program = sb.path(c.dir + "/rcplauncher");
            sb.installLauncher(o.program);
            sb.writeFile(c.dir + "/rcplauncher.properties", Sandbox::standardLauncherProperties("user"));
        }
        if (c.launcherProps == "-") unlink(sb.launcherProperties().c_str());
        else if (!c.launcherProps.empty()) sb.writeLauncherProperties(c.launcherProps);
        std::string message = c.message;
        size_t p = message.find("%P");
        if (p != std::string::npos) message.replace(p, 2, sb.launcherProperties());

        LaunchResult r = sb.run(o);
        EXPECT_EQ(r.status, 255);
        EXPECT_FALSE(r.hasChild());
        EXPECT_EQ(r.tmpLogWritten, c.inTmpLog);
        const std::string& log = c.inTmpLog ? r.tmpLog : r.log;
        std::vector<std::string> lines = logLines(log);
        ASSERT_FALSE(lines.empty()) << r.describe();
        // With "-debug" the queued debug lines come first; the fatal one ends it.
        EXPECT_TRUE(isErrorLine(lines.back(), message)) << r.describe();
        // The queue is written with one empty line after it.
        if (c.onlyLine) {
            EXPECT_EQ(log, lines.back() + "\n\n") << r.describe();
        }
        if (c.inTmpLog) {
            EXPECT_TRUE(listTree(sb.home()).empty());
        }
        EXPECT_EQ(r.terminal, "");
    }
}

}  // namespace
