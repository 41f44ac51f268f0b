// The per-user files of a configuration area: rcpinstall.properties,
// config.ini and platform.xml.
#include "logged_fixture.h"

using namespace rcptest;

namespace {

class UserFilesTest : public LoggedTest {
protected:
    void SetUp() override {
        LoggedTest::SetUp();
        makeDirs(tmp.sub("cfg"));
    }
    std::wstring cfg() const { return tmp.wsub("cfg"); }
    std::wstring core() const { return tmp.wsub("core"); }
    std::string userProps() const { return tmp.sub("cfg/rcpinstall.properties"); }
    std::wstring create(PropArray& launcher) { return createRCPInstallProps(L"/ws", cfg(), core(), L"/i", launcher.v()); }
};

const char* const BASE =
    "  first.macosx=0\n"
    "a.b.win32=2\\\n"
    "   more\\\n"
    "# comment inside a dropped property\n"
    "\n\n"
    "a.b.linux=3\n"
    "! kept comment\n"
    "-Dx.win32=y\n"
    "kept.macosx.value=v\\\n"
    "      x.win32=continues a kept property\n"
    "c.d.macosxfoo=50%%\n"
    "e.f.win32x=5";

TEST_F(UserFilesTest, UserPropertiesAreFilteredCompletedAndThenLeftAlone) {
    writeText(tmp.sub("core/rcpinstall.properties"), BASE);
    PropArray launcher{{L"rcp.install.id", L"77"},           {L"rcp.base.location", L"${rcp.home}\\b:1"},
                       {L"jvm.location", L"C:\\j\\vm"},       {L"install.configuration", L"serial.multiuser"},
                       {L"rcp.data", L"/d#1=x"},              {L"com.kel.rcp.core.bidi", L"on"},
                       {L"com.kel.rcp.core.locale", L"de 1%%"}};
    EXPECT_EQ(create(launcher), widen(userProps()));
    EXPECT_TRUE(userFirstLaunch);
    EXPECT_FALSE(pathExists(userProps() + ".new"));
    const std::string expected =
        "first=0\n! kept comment\n-Dx.win32=y\nkept.macosx.value=v\\\nx.win32=continues a kept property\n"
        "c.d=50%%\nrcp.install.id=77\nrcp.data=/d\\#1\\=x\nvm=C\\:/j/vm\nrcp.base.location=${rcp.home}/b\\:1\n"
        "install.configuration=serial.multiuser\ncom.kel.rcp.core.locale=de 1%\ncom.kel.rcp.core.bidi=on\n";
    EXPECT_EQ(readText(userProps()), expected);

    writeText(tmp.sub("core/rcpinstall.properties"), "changed=1\n");  // a later launch keeps the file
    userFirstLaunch = false;
    create(launcher);
    EXPECT_EQ(readText(userProps()), expected);
    EXPECT_FALSE(userFirstLaunch);
}

TEST_F(UserFilesTest, BaseChoiceOddBasesAndMissingValues) {
    PropArray launcher{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"},
                       {L"install.configuration", L"u"}};
    const std::string block = "rcp.install.id=1\nvm=/j\nrcp.base.location=/b\ninstall.configuration=u\n";
    const std::tuple<installCfg, std::string, std::string> cases[] = {
        {user, "k=v\n", "k=user\n" + block},     // the configuration's own base copy
        {service, "k=v\n", "k=v\n" + block},     // none for a service
        {service, "\nk=v\n", block},             // leading empty line: the copy stops, no hang
        {service, std::string(2030, 'z'), std::string(2024, 'z') + "\nzzzzzz\n" + block},
    };
    for (const auto& [config, base, expected] : cases) {
        eConfig = config;
        removeTree(userProps());
        writeText(tmp.sub("core/rcpinstall.properties"), base);
        writeText(tmp.sub("core/config/user/rcpinstall.properties"), "k=user\n");
        create(launcher);
        EXPECT_EQ(readText(userProps()), expected);
    }

    // a missing required value ends the launch and leaves the plain copy,
    // which the next launch keeps
    removeTree(userProps());
    PropArray incomplete{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"}};
    EXPECT_EXIT(create(incomplete), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties "
                       "file. : "));
    EXPECT_TRUE(pathExists(userProps() + ".new"));
    create(launcher);
    EXPECT_EQ(readText(userProps()), std::string(2030, 'z'));

    // a work file that cannot be made leaves no copy without the values
    removeTree(userProps());
    removeTree(userProps() + ".new");
    makeDirs(userProps() + ".new/x");
    create(launcher);
    EXPECT_FALSE(pathExists(userProps()));
}

TEST_F(UserFilesTest, ConfigIniIsCopiedOnceAndAMissingBaseEndsTheLaunch) {
    writeText(tmp.sub("core/config.ini"), "a=1\n\n  b\n");
    createConfigIni(cfg(), core());
    EXPECT_TRUE(userFirstLaunch);
    writeText(tmp.sub("core/config.ini"), "changed\n");
    createConfigIni(cfg(), core());
    EXPECT_EQ(readText(tmp.sub("cfg/config.ini")), "a=1\n\n  b\n");

    EXPECT_EXIT(createConfigIni(tmp.wsub("x"), tmp.wsub("y")), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0190E: Unable to open source file " + tmp.sub("y/config.ini")));
}

TEST_F(UserFilesTest, PlatformXml) {
    const std::string base =
        "<?xml?>\n  <config>\n\n    <site f=\"${jvm.feature.id}\"/>\n    <p id=\"${jvm.parent.feature.id}\"/>\n"
        "    <p>100%d</p>\n  </config>";
    const std::string copied = "<?xml?>\n<config>\n<feature>\n<feature>\n<p>100%d</p>\n</config>\n";
    struct Case {
        installCfg cfg;
        const wchar_t* policy;
        std::string baseText;  // "" = no base file
        int result;
        bool dir;
        const char* expected;  // nullptr = no platform.xml
    } const cases[] = {
        {user, nullptr, base, 0, true, copied.c_str()},
        {user, L"false", base, 0, true, nullptr},  // the directory, but no file
        {user, L"False", base, 0, true, copied.c_str()},
        {userpb, nullptr, base, 0, false, nullptr},
        {user, nullptr, "", -1, true, nullptr},
        {user, nullptr, "\n<a/>\n", 0, true, ""},  // leading empty line: the copy stops, no hang
    };
    for (const Case& c : cases) {
        eConfig = c.cfg;
        userFirstLaunch = false;
        TempDir area;
        removeTree(tmp.sub("core"));
        if (!c.baseText.empty()) writeText(tmp.sub("core/platform.xml"), c.baseText);
        PropArray props;
        if (c.policy) addProps(props, {{L"update.policy.managed", c.policy}});
        EXPECT_EQ(createPlatformXML(area.wpath(), core(), props.v()), c.result);
        EXPECT_EQ(isDir(area.sub("org.eclipse.update")), c.dir);
        EXPECT_EQ(userFirstLaunch, c.dir);
        EXPECT_EQ(readText(area.sub("org.eclipse.update/platform.xml")), c.expected ? c.expected : "");
        EXPECT_EQ(pathExists(area.sub("org.eclipse.update/platform.xml")), c.expected != nullptr);
    }

    eConfig = user;  // an existing file is kept byte for byte
    writeText(tmp.sub("cfg/org.eclipse.update/platform.xml"), "  mine\n\n");
    PropArray none;
    EXPECT_EQ(createPlatformXML(cfg(), core(), none.v()), 0);
    EXPECT_EQ(readText(tmp.sub("cfg/org.eclipse.update/platform.xml")), "  mine\n\n");

    writeText(tmp.sub("area2/org.eclipse.update"), "");  // a file where the directory belongs
    EXPECT_EXIT(createPlatformXML(tmp.wsub("area2"), core(), none.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0010E: Unable to create " + tmp.sub("area2/org.eclipse.update") + " directory."));
}

}  // namespace
