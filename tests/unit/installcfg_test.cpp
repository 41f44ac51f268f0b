// The install configuration read from "install.configuration".
#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

TEST(InstallCfgTest, ValueToConfiguration) {
    struct Case {
        const char* file;  // properties file text
        installCfg cfg;
        bool lockdown;
        bool defaulted;  // the 0041I line is written
    } cases[] = {
        {"a=b\n", user, false, true},
        {"install.configuration=service\n", service, false, false},
        {"install.configuration=user\n", user, false, false},
        {"install.configuration=serial.multiuser\n", serial_multiuser, false, false},
        {"install.configuration=lockdown\n", lockdown, true, false},
        {"install.configuration=userpb\n", userpb, false, false},
        {"install.configuration=multiuser\n", multiuser, false, false},
        {"install.configuration=Lockdown\n", undefined, false, false},
        {"install.configuration=provisioning\n", undefined, false, false},
        {"install.configuration=\n", undefined, false, false},
        {"install.configuration = user  \n", user, false, false},
        {"install.configuration=user\t\n", undefined, false, false},
        {"install.configuration=service\ninstall.configuration=user\n", service, false, false},
    };
    rcptest::TempDir tmp;
    for (const Case& c : cases) {
        for (bool muservice : {false, true}) {
            rcptest::writeText(tmp.sub("p"), c.file);
            std::vector<String> props;
            getProperties(tmp.wsub("p"), props);
            resetLoggingForTest();
            eConfig = undefined;
            IS_LOCKDOWN = !c.lockdown;  // must be overwritten
            EXPECT_TRUE(SetInstallConfiguration(props, muservice));
            EXPECT_EQ(eConfig, muservice ? multiuser_service : c.cfg) << c.file;
            EXPECT_EQ(IS_LOCKDOWN, c.lockdown) << c.file;
            EXPECT_EQ(isLockdownConfig(), c.lockdown);
            EXPECT_EQ(getLogQueue().find("RLNCH0041I: Missed install configuration in property file. Using default "
                                         "setting!\n") != std::string::npos,
                      c.defaulted)
                << c.file;
            freeProperties(props);
        }
    }
}

}  // namespace
