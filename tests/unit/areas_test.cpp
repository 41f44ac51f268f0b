// Installation identifier, workspace and configuration locations, and the
// test for a configuration area left by another installation.
#include <cstdlib>

#include "logged_fixture.h"

using namespace rcptest;

namespace {

using AreasTest = LoggedTest;
using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;

TEST_F(AreasTest, LocationsForEveryConfigurationAndSource) {
    setenv("USER", "ann", 1);
    setenv("HOME", "/Users/ann", 1);
    setenv("RCP_AREAS_DIR", "/srv/d", 1);
    const Pairs id = {{L"rcp.install.id", L"77"}};
    const Pairs dataAndId = {{L"rcp.install.id", L"77"}, {L"rcp.data", L"/p/d/"}};
    const std::wstring home = L"/Users/ann/KEL/RCP/77/ann";
    struct Case {
        installCfg cfg;
        std::vector<std::wstring> args;
        Pairs props;
        std::wstring workspace, config;
        int result;
    } const cases[] = {
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
    for (const Case& c : cases) {
        eConfig = c.cfg;
        PropArray props;
        addProps(props, c.props);
        WArgs args(c.args);
        std::wstring installDir = L"/i", workspace, config;
        EXPECT_EQ(getWorkspaceLocation(workspace, props.v(), args.argc(), args.argv(), installDir), c.result);
        EXPECT_EQ(getConfigurationLocation(config, props.v(), args.argc(), args.argv(), installDir), c.result);
        EXPECT_EQ(workspace, c.workspace);
        EXPECT_EQ(config, c.config);
    }
}

TEST_F(AreasTest, MissingOrInvalidSettingsEndTheLaunch) {
    setenv("USER", "ann", 1);
    unsetenv("RCP_AREAS_UNSET");
    const std::pair<Pairs, std::string> cases[] = {
        {{{L"rcp.base.location", L"/b"}}, "RLNCH0005E: Couldn't find the rcp.install.id property! : "},
        {{{L"rcp.data", L"/x/${env.RCP_AREAS_UNSET}/${prop.k}"}, {L"k", L"v"}},
         "RLNCH0099E: rcp.data property is invalid (/x/${env.RCP_AREAS_UNSET}/v) : "},
        {{{L"rcp.install.id", L"1"}}, "RLNCH0006E: Couldn't find the user name! : "},  // last: USER unset
    };
    eConfig = user;
    for (const auto& [pairs, message] : cases) {
        if (message.find("0006E") != std::string::npos) unsetenv("USER");
        PropArray props;
        addProps(props, pairs);
        WArgs args{L"x"};
        std::wstring installDir, location;
        EXPECT_EXIT(getConfigurationLocation(location, props.v(), 1, args.argv(), installDir),
                    ::testing::ExitedWithCode(255), "");
        EXPECT_TRUE(logged(message)) << log();
    }
    PropArray props{{L"a", L"b"}};  // only a package builder may do without an identifier
    EXPECT_EXIT(getInstallID(tmp.wsub("rcplauncher.properties"), props.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0016E: rcp.install.id is required for this configuration! : "));
    EXPECT_FALSE(pathExists(tmp.sub("rcplauncher.properties")));
}

TEST_F(AreasTest, PackageBuilderCreatesItsIdentifierOnceAndKeepsIt) {
    eConfig = userpb;
    const std::string file = tmp.sub("rcplauncher.properties");
    writeText(file, "a=1\n");
    std::vector<String> props;
    getProperties(widen(file), props);
    const unsigned long before = getTick();
    const std::string id = narrow(getInstallID(widen(file), props));
    EXPECT_TRUE(std::stoul(id) >= before && std::stoul(id) <= getTick());
    EXPECT_EQ(props.size(), 4u);
    EXPECT_EQ(readText(file), "a=1\nrcp.install.id=" + id + "\n");
    freeProperties(props);

    getProperties(widen(file), props);  // the next launch
    EXPECT_EQ(narrow(getInstallID(widen(file), props)), id);
    EXPECT_EQ(readText(file), "a=1\nrcp.install.id=" + id + "\n");
    freeProperties(props);

    writeText(file, "a=b");  // no final line end: the entry joins the last line
    PropArray none;
    const std::string joined = narrow(getInstallID(widen(file), none.v()));
    EXPECT_EQ(readText(file), "a=brcp.install.id=" + joined + "\n");

    const std::pair<std::string, std::string> failures[] = {
        {tmp.sub("no/file"), "RLNCH0017E: Could not open " + tmp.sub("no/file") + " to append rcp.install.id! : "},
        {"/dev/full", "RLNCH0018E: Error while writing to /dev/full file. : "},
    };
    for (const auto& [path, message] : failures) {
        PropArray empty;
        EXPECT_EXIT(getInstallID(widen(path), empty.v()), ::testing::ExitedWithCode(255), "");
        EXPECT_TRUE(logged(message)) << log();
    }
}

TEST_F(AreasTest, AreaOfAnotherInstallation) {
    const std::tuple<const char*, std::wstring, bool> cases[] = {
        {nullptr, L"1", false},
        {"a=b\n", L"1", false},
        {"rcp.install.id=\n", L"1", false},
        {"rcp.install.id=1\nrcp.install.id=2\n", L"1", false},
        {"rcp.install.id=abc\n", L"ABC", true},
        {"rcp.install.id=1\n", L"", true},
    };
    for (const auto& [content, launcherId, old] : cases) {
        TempDir area;
        if (content) writeText(area.sub("rcpinstall.properties"), content);
        EXPECT_EQ(isOldRcpInstallId(launcherId, area.wpath()), old) << (content ? content : "none");
    }
}

}  // namespace
