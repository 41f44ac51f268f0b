// Whether a launch must provision or run its initial configuration first,
// and the provisioning run itself.
#include <gtest/gtest.h>
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cstdlib>

#include "cmd_test_support.h"
#include "sandbox.h"

using rcptest::PropArray;
using rcptest::TempDir;
using rcptest::WArgs;

namespace {

void addPair(PropArray& props, const wchar_t* key, const wchar_t* value) {
    if (value == nullptr) return;
    props.v().push_back(copyString(key));
    props.v().push_back(copyString(value));
}

TEST(ProvisioningTest, InitialLaunchIsRequiredUntilItsCompletionIsRecorded) {
    struct Case {
        installCfg cfg;
        const wchar_t* completed;  // the completion property, null: absent
        bool expected;
    };
    const Case cases[] = {
        {user, nullptr, true},     {user, L"true", false},      {userpb, L"trueish", false},
        {multiuser, L"TRUE", true}, {service, nullptr, false},  {lockdown, nullptr, false},
        {multiuser_service, nullptr, false},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        // Out of file order: the numbers decide. The flag only has to begin a value.
        PropArray launcher{{L"config.initial.3", L"init.done"}, {L"config.initial.1", L"-first"},
                           {L"config.initial.2", L"-initialCompleteFlagX"}};
        PropArray install;
        addPair(install, L"init.done", c.completed);
        EXPECT_EQ(isInitialRequired(launcher.v(), install.v()), c.expected) << c.cfg;
    }
    cmdtest::resetCommandState(user);
    PropArray none{{L"config.initialx", L"-a"}}, install;
    EXPECT_FALSE(isInitialRequired(none.v(), install.v()));

    TempDir dir;
    PropArray gap{{L"config.initial.1", L"-initialCompleteFlag"}, {L"config.initial.2", L"k"},
                  {L"config.initial.4", L"x"}};
    EXPECT_FATAL_IN(dir, isInitialRequired(gap.v(), install.v()),
                    "RLNCH0114E: Invalid config.initial arguments. config.initial.3 not found");
    PropArray flagLast{{L"config.initial.1", L"-a"}, {L"config.initial.2", L"-initialCompleteFlag"}};
    EXPECT_FATAL_IN(dir, isInitialRequired(flagLast.v(), install.v()),
                    "RLNCH0115E: Invalid config.initial arguments. -initialCompleteFlag not found");
}

TEST(ProvisioningTest, NoProvisioningWhenNotEnabledOrNothingChanged) {
    EXPECT_TRUE(isNewProvisioningLevel(nullptr, L"1"));
    EXPECT_TRUE(isNewProvisioningLevel(L"1", nullptr));
    EXPECT_TRUE(isNewProvisioningLevel(L"1.0", L"1.1"));
    EXPECT_FALSE(isNewProvisioningLevel(L"1.0", L"1.0"));
    struct Case {
        installCfg cfg;
        const wchar_t* enabled;       // "provisioning" in the launcher properties
        const wchar_t* installLevel;  // level last provisioned
        bool firstLaunch;             // userFirstLaunch before the call
    };
    const Case cases[] = {
        {user, nullptr, nullptr, true},     {user, L"TRUE", nullptr, true},
        {service, L"true", nullptr, true},  {userpb, L"true", nullptr, true},
        {multiuser, L"true", L"5", false},  // same level, installer not asking
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        userFirstLaunch = c.firstLaunch;
        PropArray launcher{{L"provisioning.manifest.version", L"5"}}, install{{L"rcp.install.id", L"ID"}};
        addPair(launcher, L"provisioning", c.enabled);
        addPair(install, L"provisioning.manifest.version", c.installLevel);
        WArgs args{L"l", L"-rcpLauncherWait"};
        checkForProvisioning(L"/ws", args.argc(), args.argv(), L"/inst", install.v(), launcher.v(), launchArgs);
        EXPECT_TRUE(launchArgs.empty()) << c.cfg;
        EXPECT_EQ(userFirstLaunch, c.firstLaunch) << c.cfg;
    }
}

// A provisioning run in a death-test child. The provisioning child is the stub
// standing in for the Eclipse executable; it records its argv and environment.
TEST(ProvisioningTest, ProvisioningRunsItsChildReleasesTheLockAndEnds) {
    TempDir dir;
    const std::string inst = dir.sub("inst"), base = inst + "/base", record = dir.sub("record");
    rcptest::writeText(base + "/macosx/x86/eclipse", rcptest::readText(RCP_STUB_CHILD), 0755);
    rcptest::writeText(base + "/rcpinstall.properties", "application=x\n");
    rcptest::writeText(base + "/config.ini", "osgi.bundles=x\n");
    rcptest::writeText(base + "/platform.xml", "<config/>\n");
    setenv("USER", "cmdtester", 1);
    setenv("RCP_STUB_RECORD", record.c_str(), 1);
    struct Case {
        installCfg cfg;
        std::vector<std::wstring> args;
        const wchar_t* installLevel;
        bool relaunch;  // not asked for by the installer
    };
    const Case cases[] = {
        {user, {L"l", L"-data", L"/ws", L"-x"}, L"6", true},
        {lockdown, {L"l", L"-rcpLauncherWait", L"-data", L"/ws", L"-provManifest", L"m"}, L"7", false},
        {multiuser, {L"l", L"-data", L"/ws"}, nullptr, true},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg);
        unlink(record.c_str());
        lockFILE = fopen(dir.sub(".rcp.lock").c_str(), "w+");
        ASSERT_NE(lockFILE, nullptr);
        ASSERT_EQ(flock(fileno(lockFILE), LOCK_EX), 0);
        PropArray launcher{{L"provisioning", L"true"}, {L"provisioning.manifest.version", L"7"},
                           {L"rcp.install.id", L"ID"}, {L"rcp.base.location", L"${rcp.home}/base"},
                           {L"jvm.location", L"/jvm/java"}, {L"install.configuration", L"multiuser"}};
        PropArray install{{L"rcp.base.location", rcptest::widen(base)}, {L"rcp.install.id", L"ID"},
                          {L"vm", L"/jvm/java"}, {L"provisioning.application", L"com.kel.provision"},
                          {L"cp", L"${rcp.home}/boot.jar"}};
        addPair(install, L"provisioning.manifest.version", c.installLevel);
        WArgs args(c.args);
        std::wstring winst = rcptest::widen(inst);
        EXPECT_EXIT(
            {
                enableLogging(dir.wpath());
                checkForProvisioning(L"/ws", args.argc(), args.argv(), winst, install.v(), launcher.v(), launchArgs);
                exit(3);  // must not come back
            },
            ::testing::ExitedWithCode(0), "");

        rcptest::ChildRecord child;
        ASSERT_TRUE(rcptest::parseChildRecord(rcptest::readText(record), child)) << cmdtest::logIn(dir);
        std::vector<std::string> expected{base + "/macosx/x86/eclipse"};
        for (size_t i = 1; i < c.args.size(); i++)
            if (c.args[i - 1] != L"-data" && c.args[i] != L"-data") expected.push_back(rcptest::narrow(c.args[i]));
        for (const char* a : {"-data", "/ws", "-configuration", "/ws/.config", "-application", "com.kel.provision"})
            expected.push_back(a);
        if (c.relaunch) expected.push_back("-userProvLaunch");
        const std::string config = c.cfg == user ? "user" : c.cfg == lockdown ? "lockdown" : "multiuser";
        for (const std::string& a : {std::string("-vm"), std::string("/jvm/java"), std::string("-startup"),
                                     base + "/launcher.jar", std::string("-vmargs"), "-Drcp.home=" + inst,
                                     std::string("-Drcp.data=/ws"), std::string("-Dcom.kel.rcp.install.id=ID"),
                                     "-Drcp.install.config=" + config,
                                     "-Drcp.osgi.install.area=" + inst + "/rcp/eclipse", std::string("-cp"),
                                     inst + "/boot.jar"})
            expected.push_back(a);
        EXPECT_EQ(child.argv, expected) << config;
        EXPECT_EQ(child.env["JAVA_HIGH_ZIPFDS"], "500") << config;

        // The run released the platform lock.
        int fd = open(dir.sub(".rcp.lock").c_str(), O_RDWR);
        EXPECT_EQ(flock(fd, LOCK_EX | LOCK_NB), 0) << config;
        close(fd);
        fclose(lockFILE);
        lockFILE = nullptr;

        // Only the multi-user configurations prepare the service's area (as
        // the superuser); the installer's lockdown run does as well.
        bool area = geteuid() == 0 && c.cfg != user;
        EXPECT_EQ(rcptest::pathExists(inst + "/eclipse/.muservice/.config/org.eclipse.update/platform.xml"), area)
            << config;
        rcptest::removeTree(inst + "/eclipse");
    }
    unsetenv("RCP_STUB_RECORD");
}

}  // namespace
