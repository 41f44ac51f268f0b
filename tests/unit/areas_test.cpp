// Installation identifier, workspace and configuration locations, and the
// test for a configuration area left by another installation.
#include <gtest/gtest.h>

#include <cstdlib>
#include <optional>
#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::PropArray;
using rcptest::readText;
using rcptest::TempDir;
using rcptest::WArgs;
using rcptest::widen;
using rcptest::writeText;

namespace {

// Sets or unsets an environment variable for the life of the object.
class EnvGuard {
public:
    EnvGuard(const char* name, std::optional<std::string> value) : name_(name) {
        if (const char* old = getenv(name)) old_ = old;
        if (value) setenv(name, value->c_str(), 1);
        else unsetenv(name);
    }
    ~EnvGuard() {
        if (old_) setenv(name_.c_str(), old_->c_str(), 1);
        else unsetenv(name_.c_str());
    }

private:
    std::string name_;
    std::optional<std::string> old_;
};

class AreasTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetLoggingForTest();
        rcptest::makeDirs(tmp.sub("log"));
        ASSERT_TRUE(enableLogging(tmp.wsub("log")));
        eConfig = undefined;
    }
    void TearDown() override { resetLoggingForTest(); }
    std::string log() const { return readText(tmp.sub("log/rcplauncher.log")); }
    TempDir tmp;
};

TEST_F(AreasTest, LocationsForEveryConfigurationAndSource) {
    EnvGuard userEnv("USER", std::string("ann"));
    EnvGuard homeEnv("HOME", std::string("/Users/ann"));
    EnvGuard extra("RCP_AREAS_TEST_DIR", std::string("/srv/d"));

    struct Case {
        const char* what;
        installCfg cfg;
        std::vector<std::wstring> args;
        std::vector<std::pair<std::wstring, std::wstring>> props;
        std::wstring workspace;
        std::wstring config;
        int result;
    };
    const std::vector<std::pair<std::wstring, std::wstring>> idOnly = {{L"rcp.install.id", L"77"}};
    const std::vector<std::pair<std::wstring, std::wstring>> dataAndId = {{L"rcp.install.id", L"77"},
                                                                          {L"rcp.data", L"/p/d/"}};
    const Case cases[] = {
        {"service ignores -data and rcp.data", service, {L"x", L"-data", L"/a"}, dataAndId,
         L"/opt/i/eclipse/.workspace", L"/opt/i/eclipse/.config", 1},
        {"multi-user service", multiuser_service, {L"x", L"-data", L"/a"}, dataAndId, L"/opt/i/eclipse/.muservice",
         L"/opt/i/eclipse/.muservice/.config", 1},
        {"-data wins, one separator removed", user, {L"x", L"-data", L"/a/b/"}, dataAndId, L"/a/b", L"/a/b/.config",
         1},
        {"only one of two separators removed", lockdown, {L"x", L"-data", L"/a/b//"}, idOnly, L"/a/b/",
         L"/a/b//.config", 1},
        {"backslash removed, value otherwise as given", multiuser, {L"x", L"-data", L"C:\\w\\"}, idOnly, L"C:\\w",
         L"C:\\w/.config", 1},
        {"first -data wins, no expansion", serial_multiuser, {L"x", L"-data", L"${env.USER}", L"-data", L"/b"},
         idOnly, L"${env.USER}", L"${env.USER}/.config", 1},
        {"empty -data value", undefined, {L"x", L"-data", L""}, idOnly, L"", L"/.config", 1},
        {"-data as last argument ignored", userpb, {L"x", L"-data"}, dataAndId, L"/p/d", L"/p/d/.config", 1},
        {"program name is no option", user, {L"-data", L"/a"}, idOnly, L"/Users/ann/KEL/RCP/77/ann",
         L"/Users/ann/KEL/RCP/77/ann/.config", 0},
        {"rcp.data expanded, id not needed", user, {L"x"},
         {{L"rcp.data", L"${env.RCP_AREAS_TEST_DIR}/${prop.sub}\\"}, {L"sub", L"w"}}, L"/srv/d/w",
         L"/srv/d/w/.config", 1},
        {"per-user default", user, {L"x", L"-other"}, idOnly, L"/Users/ann/KEL/RCP/77/ann",
         L"/Users/ann/KEL/RCP/77/ann/.config", 0},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        eConfig = c.cfg;
        PropArray props;
        for (const auto& p : c.props) {
            props.v().push_back(copyString(p.first.c_str()));
            props.v().push_back(copyString(p.second.c_str()));
        }
        WArgs args(c.args);
        std::wstring installDir = L"/opt/i";
        std::wstring workspace = L"stale", config = L"stale";
        EXPECT_EQ(getWorkspaceLocation(workspace, props.v(), args.argc(), args.argv(), installDir), c.result);
        EXPECT_EQ(getConfigurationLocation(config, props.v(), args.argc(), args.argv(), installDir), c.result);
        EXPECT_EQ(workspace, c.workspace);
        EXPECT_EQ(config, c.config);
    }

    // without HOME the tree hangs below the root directory
    EnvGuard noHome("HOME", std::nullopt);
    eConfig = user;
    PropArray props{{L"rcp.install.id", L"9"}};
    WArgs args{L"x"};
    std::wstring installDir, workspace;
    getWorkspaceLocation(workspace, props.v(), args.argc(), args.argv(), installDir);
    EXPECT_EQ(workspace, L"/KEL/RCP/9/ann");
}

TEST_F(AreasTest, MissingOrInvalidSettingsEndTheLaunch) {
    EnvGuard userEnv("USER", std::string("ann"));
    EnvGuard unset("RCP_AREAS_TEST_UNSET", std::nullopt);
    struct Case {
        const char* what;
        std::vector<std::pair<std::wstring, std::wstring>> props;
        bool haveUser;
        bool configuration;  // through getConfigurationLocation
        std::string message;
    };
    const Case cases[] = {
        {"no id for the default", {{L"rcp.base.location", L"/b"}}, true, false,
         "RLNCH0005E: Couldn't find the rcp.install.id property! : "},
        {"no user name", {{L"rcp.install.id", L"1"}}, false, true, "RLNCH0006E: Couldn't find the user name! : "},
        {"unresolvable rcp.data", {{L"rcp.data", L"/x/${env.RCP_AREAS_TEST_UNSET}/${prop.k}"}, {L"k", L"v"}}, true,
         true, "RLNCH0099E: rcp.data property is invalid (/x/${env.RCP_AREAS_TEST_UNSET}/v) : "},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.what);
        eConfig = user;
        EnvGuard maybeUser("USER", c.haveUser ? std::optional<std::string>("ann") : std::nullopt);
        PropArray props;
        for (const auto& p : c.props) {
            props.v().push_back(copyString(p.first.c_str()));
            props.v().push_back(copyString(p.second.c_str()));
        }
        WArgs args{L"x"};
        std::wstring installDir, location;
        if (c.configuration) {
            EXPECT_EXIT(getConfigurationLocation(location, props.v(), args.argc(), args.argv(), installDir),
                        ::testing::ExitedWithCode(255), "");
        } else {
            EXPECT_EXIT(getWorkspaceLocation(location, props.v(), args.argc(), args.argv(), installDir),
                        ::testing::ExitedWithCode(255), "");
        }
        EXPECT_NE(log().find(c.message), std::string::npos) << log();
    }

    // every configuration but userpb needs an identifier
    for (installCfg cfg : {service, user, multiuser, lockdown, multiuser_service}) {
        eConfig = cfg;
        PropArray props{{L"a", L"b"}};
        EXPECT_EXIT(getInstallID(tmp.wsub("rcplauncher.properties"), props.v()), ::testing::ExitedWithCode(255), "");
        EXPECT_FALSE(rcptest::pathExists(tmp.sub("rcplauncher.properties")));
    }
    EXPECT_NE(log().find("RLNCH0016E: rcp.install.id is required for this configuration! : "), std::string::npos);
}

TEST_F(AreasTest, PackageBuilderCreatesItsIdentifierOnceAndKeepsIt) {
    eConfig = userpb;
    const std::string file = tmp.sub("rcp/rcplauncher.properties");
    writeText(file, "rcp.base.location=${rcp.home}/b\n");

    std::vector<String> props;
    getProperties(widen(file), props);
    const unsigned long before = getTick();
    String id = getInstallID(widen(file), props);
    ASSERT_NE(id, nullptr);
    const std::string idText = rcptest::narrow(id);
    const unsigned long value = std::stoul(idText);
    EXPECT_TRUE(value >= before && value <= getTick());
    EXPECT_EQ(props.size(), 4u);  // key and value appended, pairing kept
    EXPECT_EQ(readText(file), "rcp.base.location=${rcp.home}/b\nrcp.install.id=" + idText + "\n");
    freeProperties(props);

    // the next launch reads the identifier and leaves the file alone
    getProperties(widen(file), props);
    String again = getInstallID(widen(file), props);
    ASSERT_NE(again, nullptr);
    EXPECT_EQ(rcptest::narrow(again), idText);
    EXPECT_EQ(readText(file), "rcp.base.location=${rcp.home}/b\nrcp.install.id=" + idText + "\n");
    freeProperties(props);

    // a last line without a line end gets the entry joined to it
    writeText(file, "a=b");
    getProperties(widen(file), props);
    id = getInstallID(widen(file), props);
    EXPECT_EQ(readText(file), "a=brcp.install.id=" + rcptest::narrow(id) + "\n");
    freeProperties(props);
}

TEST_F(AreasTest, PackageBuilderIdentifierThatCannotBeStoredEndsTheLaunch) {
    eConfig = userpb;
    struct Case {
        std::string file;
        std::string message;
    };
    const Case cases[] = {
        {tmp.sub("missing/rcplauncher.properties"),
         "RLNCH0017E: Could not open " + tmp.sub("missing/rcplauncher.properties") + " to append rcp.install.id! : "},
        {"/dev/full", "RLNCH0018E: Error while writing to /dev/full file. : "},
    };
    for (const Case& c : cases) {
        PropArray props{{L"x", L"y"}};
        EXPECT_EXIT(getInstallID(widen(c.file), props.v()), ::testing::ExitedWithCode(255), "");
        EXPECT_NE(log().find(c.message), std::string::npos) << log();
    }
}

TEST_F(AreasTest, AreaOfAnotherInstallation) {
    struct Case {
        const char* content;  // nullptr: no rcpinstall.properties
        std::wstring launcherId;
        bool old;
    };
    const Case cases[] = {
        {nullptr, L"1", false},
        {"a=b\n", L"1", false},
        {"rcp.install.id=\n", L"1", false},
        {"rcp.install.id=1\n", L"1", false},
        {"rcp.install.id=1\nrcp.install.id=2\n", L"1", false},  // first occurrence wins
        {"rcp.install.id=old\n", L"new", true},
        {"rcp.install.id=abc\n", L"ABC", true},
        {"rcp.install.id=1\n", L"", true},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(c.content ? c.content : "(none)");
        TempDir area;
        if (c.content) writeText(area.sub("rcpinstall.properties"), c.content);
        EXPECT_EQ(isOldRcpInstallId(c.launcherId, area.wpath()), c.old);
    }
}

}  // namespace
