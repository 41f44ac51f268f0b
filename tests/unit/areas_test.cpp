// The user's areas: workspace and configuration locations, the startup
// record, the per-user files and their base copies, and the reset.
#include <unistd.h>

#include <cstdlib>

#include "unit_support.h"

namespace {

using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;

class AreasTest : public ::testing::Test {
protected:
    void SetUp() override { resetState(); }
    TempDir tmp;
};

TEST_F(AreasTest, Locations) {
    setenv("USER", "ann", 1);
    setenv("HOME", "/Users/ann", 1);
    setenv("RCP_AREAS_DIR", "/srv/d", 1);
    unsetenv("RCP_AREAS_UNSET");
    const Pairs id = {{L"rcp.install.id", L"77"}}, dataAndId = {{L"rcp.install.id", L"77"}, {L"rcp.data", L"/p/d/"}};
    const std::wstring home = L"/Users/ann/KEL/RCP/77/ann";
    const std::tuple<installCfg, Strings, Pairs, std::wstring, std::wstring, int> cases[] = {
        {service, {L"x", L"-data", L"/a"}, dataAndId, L"/i/eclipse/.workspace", L"/i/eclipse/.config", 1},
        {multiuser_service, {L"x"}, dataAndId, L"/i/eclipse/.muservice", L"/i/eclipse/.muservice/.config", 1},
        {user, {L"x", L"-data", L"/a/b/"}, dataAndId, L"/a/b", L"/a/b/.config", 1},
        {lockdown, {L"x", L"-data", L"/a/b//"}, id, L"/a/b/", L"/a/b//.config", 1},
        {multiuser, {L"x", L"-data", L"C:\\w\\", L"-data", L"/b"}, id, L"C:\\w", L"C:\\w/.config", 1},
        {undefined, {L"x", L"-data", L""}, id, L"", L"/.config", 1},
        {userpb, {L"x", L"-data"}, dataAndId, L"/p/d", L"/p/d/.config", 1},  // no value: ignored
        {user, {L"-data", L"/a"}, id, home, home + L"/.config", 0},          // the program is no option
        {serial_multiuser, {L"x"}, {{L"rcp.data", L"${env.RCP_AREAS_DIR}/${prop.s}\\"}, {L"s", L"w"}}, L"/srv/d/w",
         L"/srv/d/w/.config", 1},
    };
    for (const auto& [cfg, argv, pairs, workspace, config, result] : cases) {
        eConfig = cfg;
        PropArray props;
        addProps(props, pairs);
        WArgs args(argv);
        std::wstring installDir = L"/i", ws, cf;
        EXPECT_EQ(getWorkspaceLocation(ws, props.v(), args.argc(), args.argv(), installDir), result);
        EXPECT_EQ(getConfigurationLocation(cf, props.v(), args.argc(), args.argv(), installDir), result);
        EXPECT_EQ(ws + L"|" + cf, workspace + L"|" + config);
    }
    PropArray bad{{L"rcp.install.id", L"1"}, {L"rcp.data", L"/x/${env.RCP_AREAS_UNSET}/${prop.k}"}, {L"k", L"v"}}, none;
    WArgs args{L"x"};
    std::wstring installDir, location;
    expectFatal({{[&] { getWorkspaceLocation(location, bad.v(), 1, args.argv(), installDir); },
                  "RLNCH0099E: rcp.data property is invalid (/x/${env.RCP_AREAS_UNSET}/v) : "},
                 {[&] { eConfig = userpb; getInstallID(L"/dev/full", none.v()); },
                  "RLNCH0018E: Error while writing to /dev/full file. : "}});
}

TEST_F(AreasTest, StartupRecordAndBaseCopies) {
    std::wstring launcher;
    getLauncherPath(launcher);
    const std::pair<Strings, std::string> records[] = {
        {{L"prog", L"-restart", L"-data", L"W"}, "arg1=-data\narg2=W\nargc=3\n"},
        {{L"a/prog", L"-resetconfig", L"-restart", L"-restart", L"-resetconfig"}, "arg1=-restart\narg2=-resetconfig\nargc=3\n"},
        {{L"prog", L"C:\\w s#1=a:b!\u00e9"}, "arg1=C\\:\\\\w s\\#1\\=a\\:b\\!\\u00e9\nargc=2\n"}};
    for (const auto& [argv, tail] : records) {
        WArgs args(argv);
        writeStartupArgs(args.argc(), args.argv(), tmp.wpath());
        const std::string text = readText(tmp.sub("args.properties"));
        EXPECT_EQ(text.substr(text.find('\n') + 1), tail);
        std::vector<String> props;  // arg0 reads back as the launcher's own path
        getProperties(tmp.wsub("args.properties"), props);
        EXPECT_EQ(std::wstring(findProperty(L"arg0", props)), launcher);
        freeProperties(props);
    }
    // the base copies a configuration takes its per-user files from; without one, the core's own
    for (const char* sub : {"", "user", "pbuilder", "muservice"}) writeText(tmp.sub("core/config/") + sub + "/t", "");
    const std::pair<installCfg, std::string> copies[] = {{service, "config//t"}, {serial_multiuser, "config//t"},
        {lockdown, "config/user/t"}, {userpb, "config/pbuilder/t"}, {multiuser_service, "config/muservice/t"}};
    for (const auto& [cfg, copy] : copies) {
        eConfig = cfg;
        EXPECT_EQ(getCoreFileLocation(tmp.wsub("core"), L"t") + getCoreFileLocation(tmp.wsub("core"), L"x"),
                  tmp.wsub("core/" + copy) + tmp.wsub("core/x")) << cfg;
    }
}

TEST_F(AreasTest, UserPropertiesAreFilteredAndCompleted) {
    writeText(tmp.sub("core/rcpinstall.properties"),
              "  first.macosx=0\na.b.win32=2\\\n   more\\\n# comment inside a dropped property\n\n\na.b.linux=3\n"
              "! kept comment\n-Dx.win32=y\nkept.macosx.value=v\\\n      x.win32=continues a kept property\n"
              "c.d.macosxfoo=50%%\ne.f.win32x=5");
    writeText(tmp.sub("core/config/user/rcpinstall.properties"), "k=user\n");
    const std::string props = tmp.sub("cfg/rcpinstall.properties");
    makeDirs(tmp.sub("cfg"));
    PropArray launcher{{L"rcp.install.id", L"77"},   {L"rcp.base.location", L"${rcp.home}\\b:1"}, {L"jvm.location", L"C:\\j\\vm"},
                       {L"rcp.data", L"/d#1=x"},    {L"install.configuration", L"serial.multiuser"},
                       {L"com.kel.rcp.core.bidi", L"on"}, {L"com.kel.rcp.core.locale", L"de 1%%"}};
    auto create = [&](PropArray& l) { return createRCPInstallProps(L"/ws", tmp.wsub("cfg"), tmp.wsub("core"), L"/i", l.v()); };
    EXPECT_EQ(create(launcher), widen(props));
    EXPECT_TRUE(userFirstLaunch);
    EXPECT_EQ(readText(props),
              "first=0\n! kept comment\n-Dx.win32=y\nkept.macosx.value=v\\\nx.win32=continues a kept property\n"
              "c.d=50%%\nrcp.install.id=77\nrcp.data=/d\\#1\\=x\nvm=C\\:/j/vm\nrcp.base.location=${rcp.home}/b\\:1\n"
              "install.configuration=serial.multiuser\ncom.kel.rcp.core.locale=de 1%\ncom.kel.rcp.core.bidi=on\n");

    PropArray plain{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"},
                    {L"install.configuration", L"u"}};
    const std::string block = "rcp.install.id=1\nvm=/j\nrcp.base.location=/b\ninstall.configuration=u\n";
    const std::tuple<installCfg, std::string, std::string> cases[] = {
        {user, "k=v\n", "k=user\n" + block},  // the configuration's own base copy
        {service, "k=v\n", "k=v\n" + block},  // none for a service
        {service, "\n\n  k=v\n", "k=v\n" + block},  // leading empty lines are skipped like other blank lines
        {service, std::string(2030, 'z'), std::string(2024, 'z') + "\nzzzzzz\n" + block}};
    for (const auto& [config, base, result] : cases) {
        eConfig = config;
        unlink(props.c_str());
        writeText(tmp.sub("core/rcpinstall.properties"), base);
        create(plain);
        EXPECT_EQ(readText(props), result);
    }
    // a missing value ends the launch; the plain copy stays as the administrator's evidence
    unlink(props.c_str());
    writeText(tmp.sub("core/rcpinstall.properties"), "changed=1\n");
    PropArray incomplete{{L"rcp.install.id", L"1"}, {L"rcp.base.location", L"/b"}, {L"jvm.location", L"/j"}};
    expectFatal({{[&] { create(incomplete); },
                  "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file. : "}});
    EXPECT_EQ(readText(props), "changed=1\n");
}

TEST_F(AreasTest, PlatformXml) {
    const std::string base = "<?xml?>\n  <config>\n\n    <s f=\"${jvm.feature.id}\"/>\n    <p id=\"${jvm.parent.feature.id}\"/>\n"
                             "    <p>100%d</p>\n  </config>";
    const char* copied = "<?xml?>\n<config>\n<feature>\n<feature>\n<p>100%d</p>\n</config>\n";
    // configuration, update.policy.managed, base file, result, directory made, platform.xml
    const std::tuple<installCfg, const wchar_t*, std::string, int, bool, const char*> cases[] = {
        {user, nullptr, base, 0, true, copied}, {user, L"false", base, 0, true, nullptr}, {user, L"False", base, 0, true, copied},
        {userpb, nullptr, base, 0, false, nullptr}, {user, nullptr, "", -1, true, nullptr},
        {user, nullptr, "\n<a/>\n", 0, true, "<a/>\n"}};  // a leading empty line is skipped
    for (const auto& [cfg, policy, text, result, dir, expected] : cases) {
        eConfig = cfg;
        userFirstLaunch = false;
        TempDir area;
        removeTree(tmp.sub("core"));
        if (!text.empty()) writeText(tmp.sub("core/platform.xml"), text);
        PropArray props;
        if (policy) addProps(props, {{L"update.policy.managed", policy}});
        EXPECT_EQ(createPlatformXML(area.wpath(), tmp.wsub("core"), props.v()), result);
        EXPECT_TRUE(isDir(area.sub("org.eclipse.update")) == dir && userFirstLaunch == dir);
        EXPECT_EQ(pathExists(area.sub("org.eclipse.update/platform.xml")), expected != nullptr);
        EXPECT_EQ(readText(area.sub("org.eclipse.update/platform.xml")), expected ? expected : "");
    }
}

TEST_F(AreasTest, ResetKeepsTheRegistryAndStaysInsideThePluginState) {
    const std::wstring ws = tmp.wsub("ws"), cfg = tmp.wsub("ws/.config"), core = tmp.wsub("core");
    auto file = [&](const std::string& rel) { return tmp.sub("ws/" + rel); };
    writeText(file(".config/rcpinstall.properties"), "resetDir.a=org.x\nresetDir.b = org.y\nresetDir.d=../../../out\n");
    writeText(file(".config/org.eclipse.update/platform.xml"), "<old/>\n");
    writeText(file(".config/org.eclipse.update/registry"), "reg\n");
    for (const char* p : {"org.x", "org.y", "org.z"}) writeText(file(".metadata/.plugins/") + p + "/s", p);
    writeText(tmp.sub("out/keep"), "mine");
    writeText(file(".configbak/stale"), "older backup");
    resetWorkspace(ws, cfg, core);
    EXPECT_FALSE(pathExists(file(".metadata/.plugins/org.x")) || pathExists(file(".metadata/.plugins/org.y")));
    EXPECT_TRUE(pathExists(file(".metadata/.plugins/org.z")) && pathExists(tmp.sub("out/keep")));
    EXPECT_EQ(readText(file(".config/org.eclipse.update/registry")), "reg\n");  // the only file left
    EXPECT_FALSE(pathExists(file(".config/rcpinstall.properties")) || pathExists(file(".config/org.eclipse.update/platform.xml")));
    EXPECT_TRUE(pathExists(file(".configbak/rcpinstall.properties")) && !pathExists(file(".configbak/stale")));

    // The list now comes from the base copy, where an empty value means the
    // whole directory; a registry saved by a reset that stopped half-way comes back.
    writeText(tmp.sub("core/config/user/rcpinstall.properties"), "resetDir.all=\n");
    eConfig = user;
    removeTree(file(".config/org.eclipse.update/registry"));
    writeText(file("registry.old"), "saved\n");
    resetWorkspace(ws, cfg, core);
    EXPECT_FALSE(pathExists(file(".metadata/.plugins")) || pathExists(file("registry.old")));
    EXPECT_EQ(readText(file(".config/org.eclipse.update/registry")), "saved\n");

    writeText(file(".config/rcpinstall.properties"), "resetDir.a=org.x\n");
    makeDirs(file(".metadata/.plugins/org.x"));  // a link inside is emptied but cannot be removed
    ASSERT_EQ(symlink(tmp.sub("out").c_str(), file(".metadata/.plugins/org.x/link").c_str()), 0);
    makeDirs(tmp.sub("fresh/.config"));
    expectFatal({{[&] { resetMetaDataDirs(ws, cfg, core); },
                  "\nRLNCH0107E begin: Error removing metadata plugin directory\nCan't delete dir " +
                      file(".metadata/.plugins/org.x") + "/link  -  Failed with error 20: Not a directory\n\nRLNCH0108E end: "
                      "Unable to remove all files in the metadata plugin directory. Please correct the problems listed above : "},
                 {[&] { resetMetaDataDirs(tmp.wsub("fresh"), tmp.wsub("fresh/.config"), tmp.wsub("none")); },
                  "RLNCH0106E: Unable to locate " + tmp.sub("none") + "/rcpinstall.properties file. : "},
                 {[&] { createReusableWorkspace(tmp.wsub("fresh"), tmp.wsub("fresh/.config")); },
                  "RLNCH0109E: Unable to locate '" + tmp.sub("fresh/.config/org.eclipse.update/platform.xml") + "' for copying : "}});
}

}  // namespace
