// The JVM, the Eclipse executable and its start-up jar, the class path and the
// hand-over to a running platform on the child's command line.
#include <gtest/gtest.h>

#include <cstdlib>

#include "cmd_test_support.h"

using cmdtest::Args;
using rcptest::PropArray;
using rcptest::TempDir;
using rcptest::WArgs;

namespace {

TEST(CmdlineJvmTest, VmOptionBeatsPropertyAndJavaHomeIsAlwaysDropped) {
    struct Case {
        installCfg cfg;
        Args args;
        Args expected;  // after an earlier builder put "/eclipse" first
    };
    const Case cases[] = {
        {user, {L"l"}, {L"/eclipse", L"-vm", L"/B/java"}},
        {user, {L"l", L"-vm", L"/A/java", L"-vm", L"/C/java"}, {L"/eclipse", L"-vm", L"/A/java"}},
        {lockdown, {L"l", L"-vm"}, {L"/eclipse", L"-vm", L"/B/java"}},  // no value: as if absent
        {service, {L"l", L"-vm", L"/A/java"}, {L"/A/java"}},            // the JVM is the program
        {multiuser_service, {L"l"}, {L"/B/java"}},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        launchArgs = {L"/eclipse"};
        setenv("JAVA_HOME", "/other/jvm", 1);
        PropArray install{{L"vm", L"/B/java"}}, launcher;
        WArgs args(c.args);
        addVmToCommandLine(install.v(), launcher.v(), args.argc(), args.argv());
        EXPECT_EQ(launchArgs, c.expected) << rcptest::narrow(c.args.back());
        EXPECT_EQ(getenv("JAVA_HOME"), nullptr);
    }

    TempDir dir;
    PropArray install{{L"vmx", L"/B/java"}}, launcher{{L"vm", L"/wrong/file"}};
    WArgs args{L"l", L"-vm"};
    EXPECT_FATAL_IN(dir, addVmToCommandLine(install.v(), launcher.v(), args.argc(), args.argv()),
                    "RLNCH0002E: vm string must be specified!");
}

TEST(CmdlineJvmTest, EclipseExecutableStartupJarClassPathAndDaemon) {
    TempDir dir;
    rcptest::writeText(dir.sub("base/macosx/x86/eclipse"), "", 0755);
    const std::wstring base = dir.wsub("base");
    PropArray install{{L"rcp.base.location", base}, {L"cp", L"/a/b.jar"}};

    cmdtest::resetCommandState(user, false);
    pid = 4242;
    launchArgs = {L"stale"};
    WArgs args{L"l", L"-perfJar", L"/p/one.jar", L"-perfJar", L"/p/two.jar"};
    addBaseEclipseToCommandLine(install.v());
    addUseDaemonToCommandLine();
    addStartupToCommandLine(install.v(), args.argc(), args.argv());
    addClasspathToCommandLine(install.v());
    addMainClassToCommandLine();
    EXPECT_EQ(launchArgs, (Args{base + L"/macosx/x86/eclipse", L"-useDaemon", L"4242", L"-startup", L"/p/one.jar",
                                L"-cp", L"/a/b.jar", L"org.eclipse.core.launcher.Main"}));

    // The main launcher hands nothing over; "-perfJar" without a value is
    // ignored; the multi-user service always boots from the base startup.jar.
    cmdtest::resetCommandState(multiuser_service, true);
    WArgs noJar{L"l", L"-perfJar"};
    addUseDaemonToCommandLine();
    addStartupToCommandLine(install.v(), noJar.argc(), noJar.argv());
    addClasspathToCommandLine(install.v());
    EXPECT_EQ(launchArgs, (Args{L"-startup", base + L"/launcher.jar", L"-cp", base + L"/startup.jar"}));

    cmdtest::resetCommandState(service);
    PropArray noCp{{L"rcp.base.location", base}};
    addClasspathToCommandLine(noCp.v());
    EXPECT_TRUE(launchArgs.empty());

    rcptest::writeText(dir.sub("plain/macosx/x86/eclipse"), "", 0644);
    PropArray notExecutable{{L"rcp.base.location", dir.wsub("plain")}};
    EXPECT_FATAL_IN(dir, addBaseEclipseToCommandLine(notExecutable.v()),
                    "RLNCH0007E: " + dir.sub("plain") + "/macosx/x86/eclipse is not executable or does not exist.");
    PropArray noBase;
    EXPECT_FATAL_IN(dir, addBaseEclipseToCommandLine(noBase.v()), "RLNCH0011E: Unable to determine RCP Base");
}

TEST(CmdlineJvmTest, ExecutableNameSwaps) {
    TempDir dir;
    rcptest::writeText(dir.sub("bin/java"), "", 0755);
    std::wstring vm = dir.wsub("bin/javaw");
    EXPECT_TRUE(isJavaw(vm, L"javaw", L"java"));
    EXPECT_EQ(vm, dir.wsub("bin/java"));
    EXPECT_FALSE(isJavaw(vm, L"javaw", L"java"));  // no longer ends with the name
    EXPECT_FALSE(replaceJavaExecutableName(vm, L"java", L"jexec"));  // no such file: unchanged
    EXPECT_EQ(vm, dir.wsub("bin/java"));
    EXPECT_FATAL_IN(dir, isJavaw(vm, L"java", L"javaz"),
                    "RLNCH0003E: Specified vm (" + dir.sub("bin/javaz") + ") does not exist!");
}

}  // namespace
