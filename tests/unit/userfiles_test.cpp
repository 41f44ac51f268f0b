// The per-user files of a configuration area: rcpinstall.properties,
// config.ini and platform.xml.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::PropArray;
using rcptest::readText;
using rcptest::TempDir;
using rcptest::widen;
using rcptest::writeText;

namespace {

class UserFilesTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetLoggingForTest();
        rcptest::makeDirs(tmp.sub("log"));
        ASSERT_TRUE(enableLogging(tmp.wsub("log")));
        eConfig = undefined;
        userFirstLaunch = false;
        rcptest::makeDirs(tmp.sub("ws/.config"));
    }
    void TearDown() override { resetLoggingForTest(); }
    std::string log() const { return readText(tmp.sub("log/rcplauncher.log")); }
    std::wstring ws() const { return tmp.wsub("ws"); }
    std::wstring cfg() const { return tmp.wsub("ws/.config"); }
    std::wstring core() const { return tmp.wsub("core"); }
    std::string userProps() const { return tmp.sub("ws/.config/rcpinstall.properties"); }
    TempDir tmp;
};

const char* const BASE_PROPS =
    "  first.macosx=0\n"
    "a.b.macosx=1\n"
    "a.b.win32=2\\\n"
    "   more\\\n"
    "# comment inside a dropped property\n"
    "\n"
    "\n"
    "a.b.linux=3\n"
    "! kept comment\n"
    "-Dx.win32=y\n"
    "plain = value\n"
    "kept.macosx.value=v\\\n"
    "      x.win32=inside a kept property\n"
    "macosx=no dot\n"
    "c.d.macosxfoo=4\n"
    "e.f.win32x=5\n"
    "percent=50%%\n";

const char* const FILTERED_PROPS =
    "first=0\n"
    "a.b=1\n"
    "! kept comment\n"
    "-Dx.win32=y\n"
    "plain = value\n"
    "kept.macosx.value=v\\\n"
    "x.win32=inside a kept property\n"
    "macosx=no dot\n"
    "c.d=4\n"
    "percent=50%%\n";

TEST_F(UserFilesTest, UserPropertiesAreFilteredCompletedAndThenLeftAlone) {
    writeText(tmp.sub("core/rcpinstall.properties"), BASE_PROPS);
    PropArray launcher{{L"rcp.install.id", L"77"},
                       {L"rcp.base.location", L"${rcp.home}\\b:1"},
                       {L"jvm.location", L"C:\\j\\vm"},
                       {L"install.configuration", L"serial.multiuser"},
                       {L"rcp.data", L"/d#1=x"},
                       {L"com.kel.rcp.core.bidi", L"on"},
                       {L"com.kel.rcp.core.locale", L"de_DE 100%%"}};

    const std::wstring path = createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", launcher.v());
    EXPECT_EQ(path, widen(userProps()));
    EXPECT_TRUE(userFirstLaunch);
    EXPECT_FALSE(rcptest::pathExists(userProps() + ".new"));
    EXPECT_EQ(readText(userProps()), std::string(FILTERED_PROPS) +
                                         "rcp.install.id=77\n"
                                         "rcp.data=/d\\#1\\=x\n"
                                         "vm=C\\:/j/vm\n"
                                         "rcp.base.location=${rcp.home}/b\\:1\n"
                                         "install.configuration=serial.multiuser\n"
                                         "com.kel.rcp.core.locale=de_DE 100%\n"
                                         "com.kel.rcp.core.bidi=on\n");

    // the escaped values read back as the launcher computed them
    std::vector<String> props;
    getProperties(path, props);
    EXPECT_STREQ(findProperty(L"vm", props), L"C:/j/vm");
    EXPECT_STREQ(findProperty(L"rcp.data", props), L"/d#1=x");
    EXPECT_STREQ(findProperty(L"a.b", props), L"1");
    freeProperties(props);

    // a later launch keeps the file whatever the base and the values say now
    const std::string before = readText(userProps());
    writeText(tmp.sub("core/rcpinstall.properties"), "changed=1\n");
    PropArray changed{{L"install.configuration", L"user"}};
    userFirstLaunch = false;
    EXPECT_EQ(createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", changed.v()), widen(userProps()));
    EXPECT_EQ(readText(userProps()), before);
    EXPECT_FALSE(userFirstLaunch);
}

TEST_F(UserFilesTest, BaseCopyFollowsTheConfigurationAndOddBasesStillWork) {
    PropArray launcher{{L"rcp.install.id", L"1"},
                       {L"rcp.base.location", L"/b"},
                       {L"jvm.location", L"/j"},
                       {L"install.configuration", L"user"}};
    const std::string block = "rcp.install.id=1\nvm=/j\nrcp.base.location=/b\ninstall.configuration=user\n";
    struct Case {
        const char* what;
        installCfg cfg;
        std::string base;  // written to core/rcpinstall.properties
        std::string user;  // written to core/config/user/rcpinstall.properties ("" = none)
        std::string expected;
    };
    const Case cases[] = {
        {"user template preferred", user, "k=core\n", "k=user\n", "k=user\n" + block},
        {"no template for service", service, "k=core\n", "k=user\n", "k=core\n" + block},
        {"empty base", user, "", "", block},
        {"no final line end", user, "k=v", "", "k=v\n" + block},
        // a leading empty line stops the copy instead of hanging the launch
        {"leading empty line", user, "\nk=v\n", "", block},
        {"line longer than the scan", user, std::string(2030, 'z') + "\n", "",
         std::string(2024, 'z') + "\n" + std::string(6, 'z') + "\n" + block},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        eConfig = c.cfg;
        rcptest::removeTree(tmp.sub("core"));
        rcptest::removeTree(userProps());
        writeText(tmp.sub("core/rcpinstall.properties"), c.base);
        if (!c.user.empty()) writeText(tmp.sub("core/config/user/rcpinstall.properties"), c.user);
        createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", launcher.v());
        EXPECT_EQ(readText(userProps()), c.expected);
    }
}

TEST_F(UserFilesTest, MissingRequiredValueEndsTheLaunchAndLeavesThePlainCopy) {
    writeText(tmp.sub("core/rcpinstall.properties"), "a.b.win32=1\nk=v\n");
    const std::vector<std::wstring> required = {L"rcp.install.id", L"jvm.location", L"rcp.base.location",
                                                L"install.configuration"};
    for (const std::wstring& omitted : required) {
        SCOPED_TRACE(rcptest::narrow(omitted));
        rcptest::removeTree(userProps());
        rcptest::removeTree(userProps() + ".new");
        PropArray launcher;
        for (const std::wstring& key : required) {
            if (key == omitted) continue;
            launcher.v().push_back(copyString(key.c_str()));
            launcher.v().push_back(copyString(L"x"));
        }
        EXPECT_EXIT(createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", launcher.v()),
                    ::testing::ExitedWithCode(255), "");
        EXPECT_EQ(readText(userProps()), "a.b.win32=1\nk=v\n");
        EXPECT_TRUE(rcptest::pathExists(userProps() + ".new"));
    }
    EXPECT_NE(log().find("RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties "
                         "file. : "),
              std::string::npos)
        << log();

    // the next launch keeps that copy as it is
    PropArray complete{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"},
                       {L"install.configuration", L"user"}};
    createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", complete.v());
    EXPECT_EQ(readText(userProps()), "a.b.win32=1\nk=v\n");
}

TEST_F(UserFilesTest, WorkFileThatCannotBeCreatedLeavesNoHalfMadeCopy) {
    writeText(tmp.sub("core/rcpinstall.properties"), "k=v\n");
    rcptest::makeDirs(userProps() + ".new/blocker");  // a directory where the work file goes
    PropArray launcher{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"},
                       {L"install.configuration", L"user"}};
    createRCPInstallProps(ws(), cfg(), core(), L"/opt/i", launcher.v());
    EXPECT_FALSE(rcptest::pathExists(userProps()));
    EXPECT_TRUE(rcptest::isDir(userProps() + ".new/blocker"));

    std::wstring in = widen(userProps()), out = widen(tmp.sub("other.new"));
    EXPECT_EQ(fixUserRCPInstallProperties(ws(), in, out, L"/opt/i", launcher.v()), -1);
    EXPECT_NE(log().find("RLNCH0074E: Unable to open user specific rcpinstall.properties"), std::string::npos);
}

TEST_F(UserFilesTest, ConfigIniIsCopiedOnceAndAMissingBaseEndsTheLaunch) {
    writeText(tmp.sub("core/config.ini"), "osgi.x=1\n\n  indented\n");
    createConfigIni(cfg(), core());
    EXPECT_EQ(readText(tmp.sub("ws/.config/config.ini")), "osgi.x=1\n\n  indented\n");
    EXPECT_TRUE(userFirstLaunch);

    userFirstLaunch = false;
    writeText(tmp.sub("core/config.ini"), "changed\n");
    createConfigIni(cfg(), core());
    EXPECT_EQ(readText(tmp.sub("ws/.config/config.ini")), "osgi.x=1\n\n  indented\n");
    EXPECT_FALSE(userFirstLaunch);

    EXPECT_EXIT(createConfigIni(tmp.wsub("other"), tmp.wsub("nocore")), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0190E: Unable to open source file " + tmp.sub("nocore/config.ini")),
              std::string::npos)
        << log();
}

TEST_F(UserFilesTest, PlatformXml) {
    const std::string base =
        "<?xml version=\"1.0\"?>\n"
        "  <config>\n"
        "\n"
        "    <site url=\"x\" feature=\"${jvm.feature.id}\"/>\n"
        "    <parent id=\"${jvm.parent.feature.id}\"/>\n"
        "    <both a=\"${jvm.feature.id}${jvm.parent.feature.id}\"/>\n"
        "    <p>100%d</p>\n"
        "  </config>";
    const std::string copied =
        "<?xml version=\"1.0\"?>\n<config>\n<feature>\n<feature>\n<feature>\n<p>100%d</p>\n</config>\n";
    struct Case {
        const char* what;
        installCfg cfg;
        std::vector<std::pair<std::wstring, std::wstring>> props;
        std::string baseText;  // "" = no base file
        int result;
        bool dir;
        const char* expected;  // nullptr = no platform.xml
    };
    const Case cases[] = {
        {"copied with feature lines replaced", user, {}, base, 0, true, copied.c_str()},
        {"managed policy false: directory only", user, {{L"update.policy.managed", L"false"}}, base, 0, true,
         nullptr},
        {"policy in capitals is not false", user, {{L"update.policy.managed", L"False"}}, base, 0, true,
         copied.c_str()},
        {"first policy entry decides", user,
         {{L"update.policy.managed", L"true"}, {L"update.policy.managed", L"false"}}, base, 0, true,
         copied.c_str()},
        {"package builder: nothing", userpb, {}, base, 0, false, nullptr},
        {"missing base", user, {}, "", -1, true, nullptr},
        {"leading empty line stops the copy", user, {}, "\n<a/>\n", 0, true, ""},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        eConfig = c.cfg;
        userFirstLaunch = false;
        TempDir area;
        rcptest::removeTree(tmp.sub("core"));
        if (!c.baseText.empty()) writeText(tmp.sub("core/platform.xml"), c.baseText);
        PropArray props;
        for (const auto& p : c.props) {
            props.v().push_back(copyString(p.first.c_str()));
            props.v().push_back(copyString(p.second.c_str()));
        }
        EXPECT_EQ(createPlatformXML(area.wpath(), core(), props.v()), c.result);
        EXPECT_EQ(rcptest::isDir(area.sub("org.eclipse.update")), c.dir);
        EXPECT_EQ(userFirstLaunch, c.dir);
        EXPECT_EQ(rcptest::pathExists(area.sub("org.eclipse.update/platform.xml")), c.expected != nullptr);
        if (c.expected) {
            EXPECT_EQ(readText(area.sub("org.eclipse.update/platform.xml")), c.expected);
        }
    }
}

TEST_F(UserFilesTest, ExistingPlatformXmlIsKeptAndAnExistingDirectoryGetsOne) {
    eConfig = multiuser;
    writeText(tmp.sub("core/config/user/platform.xml"), "<user/>\n");
    writeText(tmp.sub("core/platform.xml"), "<core/>\n");
    PropArray none;

    rcptest::makeDirs(tmp.sub("ws/.config/org.eclipse.update"));
    EXPECT_EQ(createPlatformXML(cfg(), core(), none.v()), 0);
    EXPECT_EQ(readText(tmp.sub("ws/.config/org.eclipse.update/platform.xml")), "<user/>\n");
    EXPECT_TRUE(userFirstLaunch);

    userFirstLaunch = false;
    writeText(tmp.sub("ws/.config/org.eclipse.update/platform.xml"), "  mine\n\n");
    EXPECT_EQ(createPlatformXML(cfg(), core(), none.v()), 0);
    EXPECT_EQ(readText(tmp.sub("ws/.config/org.eclipse.update/platform.xml")), "  mine\n\n");
    EXPECT_FALSE(userFirstLaunch);

    // an update "directory" that is a file cannot be created
    writeText(tmp.sub("area2/org.eclipse.update"), "");
    EXPECT_EXIT(createPlatformXML(tmp.wsub("area2"), core(), none.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0010E: Unable to create " + tmp.sub("area2/org.eclipse.update") + " directory."),
              std::string::npos)
        << log();
}

}  // namespace
