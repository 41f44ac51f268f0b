// The launcher as a program: the version report, finding the installation
// from the executable's real location, and the fallback log of launches that
// end before their log directory is known.
#include <gtest/gtest.h>
#include <unistd.h>

#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

// "-version" ends the run before anything else happens, whatever else is on
// the command line: one error-form line in the fallback log, status 255.
TEST(Foundation, VersionWritesOnlyTheVersionLine) {
    const std::vector<std::vector<std::string>> commandLines = {
        {"-version"},
        {"-debug", "-version"},
        {"-data", "/nonexistent/ws", "-version", "-resetconfig"},
    };
    Sandbox sb;
    sb.setupInstall("user");
    for (const auto& args : commandLines) {
        SCOPED_TRACE(args.size());
        LaunchResult r = sb.run(args);
        EXPECT_EQ(r.status, 255);
        EXPECT_FALSE(r.hasChild());
        EXPECT_EQ(r.terminal, "");
        std::vector<std::string> lines = splitLines(r.tmpLog);
        // The queue is written with one empty line after it.
        ASSERT_EQ(lines.size(), 2u) << r.describe();
        EXPECT_TRUE(isErrorLine(lines[0], "RLNCH0031I:   version = \"2006-06-27\"")) << lines[0];
        EXPECT_EQ(lines[1], "");
        EXPECT_TRUE(listTree(sb.home()).empty()) << "nothing may be created";
    }
}

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

// Outside a directory named exactly "rcp" the installation directory is empty
// without a message, so the launcher looks for /rcp/rcplauncher.properties.
TEST(Foundation, LauncherOutsideAnRcpDirectoryHasNoInstallation) {
    Sandbox sb;
    sb.setupInstall("user");
    for (const std::string dir : {"inst/bin", "inst/RCP", "inst/rcpx", "inst/xrcp"}) {
        SCOPED_TRACE(dir);
        std::string program = sb.path(dir + "/rcplauncher");
        sb.installLauncher(program);
        // A valid installation beside it must not be used.
        sb.writeFile(dir + "/rcplauncher.properties", Sandbox::standardLauncherProperties("user"));
        RunOptions o;
        o.program = program;
        LaunchResult r = sb.run(o);
        EXPECT_EQ(r.status, 255);
        EXPECT_FALSE(r.hasChild());
        std::vector<std::string> lines = logLines(r.tmpLog);
        ASSERT_EQ(lines.size(), 1u) << r.describe();
        EXPECT_TRUE(isErrorLine(lines[0], "RLNCH0014E: Unable to load /rcp/rcplauncher.properties file!")) << lines[0];
        EXPECT_TRUE(listTree(sb.home()).empty());
        EXPECT_EQ(r.terminal, "");
    }
}

// Failures before the log directory is known leave their line in the
// fallback log and create nothing in the user's home. An install
// configuration the launcher does not know cannot be named to the platform,
// and a missing one cannot be written into the user's installation
// properties: those end in the user's log, without a child.
TEST(Foundation, EarlyFailuresEndWithTheirMessage) {
    struct Case {
        std::string launcherProps;  // "-" = no launcher properties file
        std::string message;        // "%P" stands for the launcher properties path
        bool inTmpLog;
    };
    const std::string unknown = "RLNCH0025E: The platform rcp.install.id must be provided for this configuration!";
    const std::vector<Case> cases = {
        {"-", "RLNCH0014E: Unable to load %P file!", true},
        {"rcp.install.id=ID42\njvm.location=/j\ninstall.configuration=user\n",
         "RLNCH0050E: rcp.base.location property is missing from %P", true},
        {"rcp.base.location=${rcp.home}/base\ninstall.configuration=user\n",
         "RLNCH0016E: rcp.install.id is required for this configuration!", true},
        {Sandbox::standardLauncherProperties("Lockdown"), unknown, false},
        {Sandbox::standardLauncherProperties("provisioning"), unknown, false},
        {Sandbox::standardLauncherProperties("user\t"), unknown, false},
        {Sandbox::standardLauncherProperties(""),
         "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file.", false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.launcherProps);
        Sandbox sb;
        sb.setupInstall("user");
        if (c.launcherProps == "-") unlink(sb.launcherProperties().c_str());
        else sb.writeLauncherProperties(c.launcherProps);
        std::string message = c.message;
        size_t p = message.find("%P");
        if (p != std::string::npos) message.replace(p, 2, sb.launcherProperties());

        LaunchResult r = sb.run({"-debug"});
        EXPECT_EQ(r.status, 255);
        EXPECT_FALSE(r.hasChild());
        EXPECT_EQ(r.tmpLogWritten, c.inTmpLog);
        std::vector<std::string> lines = logLines(c.inTmpLog ? r.tmpLog : r.log);
        ASSERT_FALSE(lines.empty()) << r.describe();
        // With "-debug" the queued debug lines come first; the fatal one ends it.
        EXPECT_TRUE(isErrorLine(lines.back(), message)) << r.describe();
        if (c.inTmpLog) {
            EXPECT_TRUE(listTree(sb.home()).empty());
        }
        EXPECT_EQ(r.terminal, "");
    }
}

}  // namespace
