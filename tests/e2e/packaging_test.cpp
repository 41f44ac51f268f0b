// The installation tree that "cmake --install" lays out (and the TGZ package
// holds): the launcher in rcp/ beside the sample launcher properties, and the
// sample base location. The tree as installed must launch: its launcher finds
// the installation from its own place and starts the platform of the sample's
// service configuration.
#include <gtest/gtest.h>

#include <sys/stat.h>

#include "platform_tools.h"
#include "sandbox.h"
#include "test_util.h"

using namespace rcptest;

namespace {

std::string buildDir() {
    std::string binary = RCP_LAUNCHER_BINARY;
    return binary.substr(0, binary.rfind('/'));
}

int modeOf(const std::string& path) {
    struct stat st;
    return stat(path.c_str(), &st) == 0 ? static_cast<int>(st.st_mode & 07777) : -1;
}

TEST(Packaging, InstalledTreeIsACompleteInstallation) {
    std::string cmake = findOnPath("cmake");
    ASSERT_FALSE(cmake.empty()) << "cmake is not on PATH";
    Sandbox sb;
    const std::string prefix = sb.path("prefix");

    ProgramResult install = runProgram({cmake, "--install", buildDir(), "--prefix", prefix}, 120);
    ASSERT_FALSE(install.timedOut);
    ASSERT_EQ(install.status, 0) << install.output;

    const std::vector<std::string> samples = {
        "base/config.ini", "base/platform.xml", "base/rcpinstall.properties",
        "eclipse/plugins/README.txt", "rcp/rcplauncher.properties",
    };
    EXPECT_EQ(listTree(prefix), (std::vector<std::string>{
                                    "base/", "base/config.ini", "base/platform.xml", "base/rcpinstall.properties",
                                    "eclipse/", "eclipse/plugins/", "eclipse/plugins/README.txt", "rcp/",
                                    "rcp/rcplauncher", "rcp/rcplauncher.properties"}));
    for (const auto& rel : samples) {
        SCOPED_TRACE(rel);
        std::string source = std::string(RCP_SOURCE_DIR) + "/demo/inst/" + rel;
        EXPECT_FALSE(readText(source).empty());
        EXPECT_EQ(readText(prefix + "/" + rel), readText(source));
        EXPECT_EQ(modeOf(prefix + "/" + rel) & 0444, 0444);
    }
    EXPECT_TRUE(readText(prefix + "/rcp/rcplauncher") == readText(RCP_LAUNCHER_BINARY));
    EXPECT_EQ(modeOf(prefix + "/rcp/rcplauncher") & 0555, 0555);

    // The package is an archive of the same tree.
    std::string cpackConfig = readText(buildDir() + "/CPackConfig.cmake");
    EXPECT_NE(cpackConfig.find("set(CPACK_GENERATOR \"TGZ\")"), std::string::npos);

    // Launch the tree as installed, with a stand-in JVM given on the command
    // line: the sample's service configuration starts it with the Equinox
    // launcher on the class path and the platform options after its class.
    sb.installStub(sb.jvm());
    RunOptions o;
    o.program = prefix + "/rcp/rcplauncher";
    o.args = {"-vm", sb.jvm()};
    LaunchResult r = sb.run(o);
    ASSERT_EQ(r.status, 0) << r.describe();
    ASSERT_TRUE(r.hasChild()) << r.describe();
    const std::string ws = prefix + "/eclipse/.workspace";
    const std::string cfg = prefix + "/eclipse/.config";
    EXPECT_EQ(r.child().argv,
              (std::vector<std::string>{
                  sb.jvm(), "-Ddemo.workspace=" + ws, "-Dfile.encoding=UTF-8", "-Drcp.home=" + prefix,
                  "-Drcp.data=" + ws, "-Dcom.kel.rcp.install.id=DEMO1", "-Drcp.install.config=service",
                  "-Ddemo.greeting=hello", "-Drcp.osgi.install.area=" + prefix + "/eclipse", "-Xmx256m", "-cp",
                  prefix + "/eclipse/plugins/org.eclipse.equinox.launcher.jar", "org.eclipse.core.launcher.Main",
                  "-nosplash", "-data", ws, "-configuration", cfg, "-application", "com.kel.demo.application",
                  "-product", "com.kel.demo.product", "-XstartOnFirstThread"}));
    ASSERT_TRUE(r.child().hasEnv("RCP_DEMO_GREETING"));
    EXPECT_EQ(r.child().env.find("RCP_DEMO_GREETING")->second, "Hello from rcpinstall.properties");
    EXPECT_EQ(readText(cfg + "/config.ini"), readText(prefix + "/base/config.ini"));
    EXPECT_TRUE(pathExists(cfg + "/org.eclipse.update/platform.xml"));
    EXPECT_EQ(r.terminal, "");
}

}  // namespace
