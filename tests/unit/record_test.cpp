// Startup record, template file location and time stamps.
#include <unistd.h>

#include "logged_fixture.h"

using namespace rcptest;

namespace {

using RecordTest = LoggedTest;

TEST_F(RecordTest, RecordHoldsLauncherPathAndEscapedArgumentsWithoutFirstRestartAndReset) {
    std::wstring launcher;
    getLauncherPath(launcher);
    const std::pair<std::vector<std::wstring>, std::string> cases[] = {
        {{L"prog", L"-restart", L"-data", L"W"}, "arg1=-data\narg2=W\nargc=3\n"},
        {{L"rel/prog", L"-resetconfig", L"-restart", L"-restart", L"-resetconfig"},
         "arg1=-restart\narg2=-resetconfig\nargc=3\n"},
        {{L"prog", L"C:\\w s#1=a:b!\u00e9"}, "arg1=C\\:\\\\w s\\#1\\=a\\:b\\!\\u00e9\nargc=2\n"},
    };
    for (const auto& [argv, tail] : cases) {
        WArgs args(argv);
        writeStartupArgs(args.argc(), args.argv(), tmp.wpath());
        const std::string text = readText(tmp.sub("args.properties"));
        EXPECT_EQ(text.substr(text.find('\n') + 1), tail);
        std::vector<String> props;  // arg0 reads back as the launcher's own path
        getProperties(tmp.wsub("args.properties"), props);
        EXPECT_EQ(std::wstring(findProperty(L"arg0", props)), launcher);
        freeProperties(props);
    }

    WArgs args{L"prog"};
    EXPECT_EXIT(writeStartupArgs(1, args.argv(), tmp.wsub("missing")), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0019E: Could not open " + tmp.sub("missing/args.properties") + " for writing! : "));
    // a failed write (a full device) is reported, not taken as written
    makeDirs(tmp.sub("full"));
    ASSERT_EQ(symlink("/dev/full", tmp.sub("full/args.properties").c_str()), 0);
    EXPECT_EXIT(writeStartupArgs(1, args.argv(), tmp.wsub("full")), ::testing::ExitedWithCode(255), "");
    EXPECT_TRUE(logged("RLNCH0020E: Error writing to " + tmp.sub("full/args.properties") + " file."));
}

TEST_F(RecordTest, TemplateLocationFollowsTheInstallConfiguration) {
    const std::string core = tmp.sub("core");
    for (const char* sub : {"", "user", "pbuilder", "muservice"}) writeText(core + "/config/" + sub + "/t", "");
    const std::pair<installCfg, std::string> cases[] = {
        {service, "/config//t"},      {serial_multiuser, "/config//t"}, {user, "/config/user/t"},
        {multiuser, "/config/user/t"}, {lockdown, "/config/user/t"},      {userpb, "/config/pbuilder/t"},
        {multiuser_service, "/config/muservice/t"},
    };
    for (const auto& [cfg, expected] : cases) {
        eConfig = cfg;
        EXPECT_EQ(getCoreFileLocation(widen(core), L"t"), widen(core + expected)) << cfg;
    }
    // no template: the core's own copy, checked or not; backslashes become "/"
    EXPECT_EQ(getCoreFileLocation(widen(core), L"x"), widen(core + "/x"));
    EXPECT_EQ(getCoreFileLocation(widen(tmp.path() + "\\core"), L"t"), widen(core + "/config/muservice/t"));

    std::wstring logLocation;
    getLogLocation(logLocation, L"C:\\ws");
    EXPECT_EQ(logLocation, L"C:/ws/logs");
}

TEST_F(RecordTest, TickStringIsTheCurrentSecondAndNeverOverflows) {
    wchar_t buf[32];
    const unsigned long before = getTick();
    const unsigned long value = std::stoul(getTickString(buf, 32));
    EXPECT_TRUE(value >= before && value <= getTick());
    wchar_t small[4] = {L'a', L'b', L'c', L'd'};
    getTickString(small, 3);
    EXPECT_LT(wcsnlen(small, 3), 3u);
    EXPECT_EQ(small[3], L'd');
}

}  // namespace
