// Startup record, log directory, template file location and time stamps.
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::readText;
using rcptest::TempDir;
using rcptest::WArgs;
using rcptest::widen;
using rcptest::writeText;

namespace {

class RecordTest : public ::testing::Test {
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

TEST_F(RecordTest, RecordHoldsLauncherPathAndArgumentsWithoutRestartAndReset) {
    std::wstring launcher;
    getLauncherPath(launcher);
    ASSERT_FALSE(launcher.empty());

    struct Case {
        std::vector<std::wstring> args;
        std::vector<std::wstring> recorded;  // arg1, arg2, ... as the reader gives them back
        std::string rawTail;                 // the record's text after the arg0 line
    };
    const Case cases[] = {
        {{L"prog", L"-restart", L"-data", L"W"}, {L"-data", L"W"}, "arg1=-data\narg2=W\nargc=3\n"},
        // only the first occurrence of each is left out
        {{L"prog", L"-restart", L"-x", L"-restart", L"-resetconfig", L"-resetconfig"},
         {L"-x", L"-restart", L"-resetconfig"},
         "arg1=-x\narg2=-restart\narg3=-resetconfig\nargc=4\n"},
        {{L"prog"}, {}, "argc=1\n"},
        // escaped so that the reader gives the text back
        {{L"relative/prog", L"-data", L"C:\\w s#1=a:b!"}, {L"-data", L"C:\\w s#1=a:b!"},
         "arg1=-data\narg2=C\\:\\\\w s\\#1\\=a\\:b\\!\nargc=3\n"},
        {{L"prog", L"caf\u00e9\t"}, {L"caf\u00e9\t"}, "arg1=caf\\u00e9\\u0009\nargc=2\n"},
    };
    for (const Case& c : cases) {
        SCOPED_TRACE(rcptest::narrow(c.args.back()));
        WArgs args(c.args);
        writeStartupArgs(args.argc(), args.argv(), tmp.wpath());
        const std::string text = readText(tmp.sub("args.properties"));
        ASSERT_EQ(text.rfind("arg0=", 0), 0u) << text;
        EXPECT_EQ(text.substr(text.find('\n') + 1), c.rawTail);

        std::vector<String> props;
        getProperties(tmp.wsub("args.properties"), props);
        ASSERT_NE(findProperty(L"arg0", props), nullptr);
        EXPECT_EQ(std::wstring(findProperty(L"arg0", props)), launcher);
        for (size_t i = 0; i < c.recorded.size(); i++) {
            String v = findProperty((L"arg" + std::to_wstring(i + 1)).c_str(), props);
            ASSERT_NE(v, nullptr);
            EXPECT_EQ(std::wstring(v), c.recorded[i]);
        }
        freeProperties(props);
    }
}

TEST_F(RecordTest, RecordReplacesAnOlderOneAndWritesNothingElse) {
    writeText(tmp.sub("cfg/args.properties"), std::string(500, 'x') + "\n");
    WArgs args{L"prog", L"-a"};
    writeStartupArgs(args.argc(), args.argv(), tmp.wsub("cfg"));
    const std::string text = readText(tmp.sub("cfg/args.properties"));
    EXPECT_EQ(text.find('x'), std::string::npos);
    EXPECT_NE(text.find("arg1=-a\nargc=2\n"), std::string::npos);
    EXPECT_EQ(log().find("RLNCH"), std::string::npos);
}

TEST_F(RecordTest, RecordThatCannotBeWrittenEndsTheLaunch) {
    WArgs args{L"prog", L"-a"};
    EXPECT_EXIT(writeStartupArgs(args.argc(), args.argv(), tmp.wsub("missing/dir")),
                ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0019E: Could not open " + tmp.sub("missing/dir/args.properties") + " for writing! : "),
              std::string::npos)
        << log();

    // A record whose writes fail (a full device) is reported, not taken as written.
    rcptest::makeDirs(tmp.sub("full"));
    ASSERT_EQ(symlink("/dev/full", tmp.sub("full/args.properties").c_str()), 0);
    EXPECT_EXIT(writeStartupArgs(args.argc(), args.argv(), tmp.wsub("full")), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0020E: Error writing to " + tmp.sub("full/args.properties") + " file."),
              std::string::npos)
        << log();
}

TEST_F(RecordTest, TemplateLocationFollowsTheInstallConfiguration) {
    const std::string core = tmp.sub("core");
    writeText(core + "/config//t.txt", "");  // the service flavour: no sub-folder
    writeText(core + "/config/user/t.txt", "");
    writeText(core + "/config/pbuilder/t.txt", "");
    writeText(core + "/config/muservice/t.txt", "");

    struct Case {
        installCfg cfg;
        const char* name;
        std::string expected;
    };
    const Case cases[] = {
        {service, "t.txt", core + "/config//t.txt"},
        {undefined, "t.txt", core + "/config//t.txt"},
        {serial_multiuser, "t.txt", core + "/config//t.txt"},
        {user, "t.txt", core + "/config/user/t.txt"},
        {multiuser, "t.txt", core + "/config/user/t.txt"},
        {lockdown, "t.txt", core + "/config/user/t.txt"},
        {userpb, "t.txt", core + "/config/pbuilder/t.txt"},
        {multiuser_service, "t.txt", core + "/config/muservice/t.txt"},
        // no template for the configuration: the core copy, even when missing
        {user, "other.txt", core + "/other.txt"},
    };
    for (const Case& c : cases) {
        eConfig = c.cfg;
        SCOPED_TRACE(c.cfg);
        EXPECT_EQ(getCoreFileLocation(widen(core), widen(c.name).c_str()), widen(c.expected));
    }
    // backslashes of a property value become separators
    eConfig = user;
    EXPECT_EQ(getCoreFileLocation(widen(tmp.path() + "\\core"), L"t.txt"), widen(core + "/config/user/t.txt"));
}

TEST_F(RecordTest, LogDirectoryAndTimeStamps) {
    std::wstring logLocation = L"stale";
    getLogLocation(logLocation, L"C:\\ws\\a");
    EXPECT_EQ(logLocation, L"C:/ws/a/logs");

    wchar_t buf[32];
    const unsigned long before = getTick();
    EXPECT_EQ(getTickString(buf, 32), buf);
    const unsigned long after = getTick();
    const unsigned long value = std::stoul(buf);
    EXPECT_TRUE(value >= before && value <= after) << value;

    // a buffer too small never holds an unterminated or overflowing text
    wchar_t small[4] = {L'a', L'b', L'c', L'd'};
    getTickString(small, 3);
    EXPECT_LT(wcsnlen(small, 4), 3u);
    EXPECT_EQ(small[3], L'd');
}

}  // namespace
