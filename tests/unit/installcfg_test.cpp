// The install configuration read from "install.configuration".
#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

TEST(InstallCfgTest, ValueToConfiguration) {
    struct Case {
        const char* file;
        installCfg cfg;
        bool lockdown;
    } cases[] = {
        {"a=b\n", user, false},  // missing: the default, with a message
        {"install.configuration=service\n", service, false},
        {"install.configuration=user\n", user, false},
        {"install.configuration=serial.multiuser\n", serial_multiuser, false},
        {"install.configuration=lockdown\n", lockdown, true},
        {"install.configuration=userpb\n", userpb, false},
        {"install.configuration=multiuser\n", multiuser, false},
        {"install.configuration=Lockdown\n", undefined, false},
        {"install.configuration=\n", undefined, false},
        {"install.configuration = user  \n", user, false},
        {"install.configuration=user\t\n", undefined, false},
        {"install.configuration=service\ninstall.configuration=user\n", service, false},
    };
    rcptest::TempDir tmp;
    for (const Case& c : cases) {
        rcptest::writeText(tmp.sub("p"), c.file);
        std::vector<String> props;
        getProperties(tmp.wsub("p"), props);
        for (bool muservice : {false, true}) {
            resetLoggingForTest();
            IS_LOCKDOWN = !c.lockdown;
            EXPECT_TRUE(SetInstallConfiguration(props, muservice));
            EXPECT_EQ(eConfig, muservice ? multiuser_service : c.cfg) << c.file;
            EXPECT_EQ(isLockdownConfig(), c.lockdown) << c.file;
            EXPECT_EQ(getLogQueue().find("RLNCH0041I: Missed install configuration in property file. Using default "
                                         "setting!\n") != std::string::npos,
                      c.file[0] == 'a');
        }
        freeProperties(props);
    }
}

}  // namespace
