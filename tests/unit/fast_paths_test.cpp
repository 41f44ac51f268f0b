// The shortcuts a launch takes for speed must give exactly what the general
// paths give: files rewritten in place are cut to their new content, the
// ASCII shortcut of the conversions agrees with the locale's conversion, and
// the line reader's remembered format follows every change of format.
#include <gtest/gtest.h>

#include <clocale>
#include <cstdio>
#include <string>

#include "rcp_launcher.h"
#include "test_util.h"

using namespace rcptest;

namespace {

class FastPathsTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        setDebug(true);
    }
    void TearDown() override {
        resetLoggingForTest();
        setlocale(LC_CTYPE, "C.UTF-8");
    }
    TempDir tmp;
};

// A launch writes its log and startup record over the previous launch's
// files. Whatever the earlier files held beyond the new text must go, and
// what is written later still lands after the new text.
TEST_F(FastPathsTest, RewrittenFilesHoldOnlyTheNewText) {
    const std::string longOld(10000, 'o');
    const std::string log = tmp.sub("rcplauncher.log");
    for (const std::string& old : {longOld + "\n", std::string("x\n"), std::string()}) {
        SCOPED_TRACE(old.size());
        resetLoggingForTest();
        writeText(log, old);
        SvcDebugOutA("queued");
        ASSERT_TRUE(enableLogging(tmp.wpath()));
        SvcDebugOutA("later");
        EXPECT_EQ(readText(log), "queued\n\nlater\n");
    }
    // Nothing queued (the usual launch without -debug): one empty line.
    resetLoggingForTest();
    writeText(log, longOld);
    ASSERT_TRUE(enableLogging(tmp.wpath()));
    EXPECT_EQ(readText(log), "\n");

    const std::string record = tmp.sub("args.properties");
    const std::string launcher = [] {
        std::wstring w;
        getLauncherPath(w);
        return narrow(w);
    }();
    WArgs many{L"prog", L"-data", L"/a/very/long/workspace/path/" + std::wstring(500, L'w'), L"-debug"};
    WArgs few{L"prog", L"-x"};
    writeStartupArgs(many.argc(), many.argv(), tmp.wpath());
    ASSERT_GT(readText(record).size(), 500u);
    writeStartupArgs(few.argc(), few.argv(), tmp.wpath());
    EXPECT_EQ(readText(record), "arg0=" + launcher + "\narg1=-x\nargc=2\n");
    writeStartupArgs(many.argc(), many.argv(), tmp.wpath());
    EXPECT_EQ(readText(record), "arg0=" + launcher + "\narg1=-data\narg2=/a/very/long/workspace/path/" +
                                    std::string(500, 'w') + "\narg3=-debug\nargc=4\n");
}

// The conversions copy runs of ASCII directly in a UTF-8 locale; texts that
// mix such runs with multibyte characters and invalid bytes on either side
// must convert as in any other locale, and back to the same bytes.
TEST_F(FastPathsTest, AsciiRunsConvertLikeTheLocale) {
    const struct {
        std::string narrow;
        std::wstring wide;
    } cases[] = {
        {"\xc3\xa9tude du caf\xc3\xa9 au lait", L"\u00e9tude du caf\u00e9 au lait"},
        {"\xe2\x82\xac" "5 and \xf0\x9f\x98\x80!", L"\u20ac" L"5 and \U0001F600!"},
        {"ab\xff" "cd\xc3" "ef\x80", L"ab\xdcff" L"cd\xdcc3" L"ef\xdc80"},
        {std::string(3000, 'a') + "\xc3\xa9" + std::string(3000, 'b'),
         std::wstring(3000, L'a') + L"\u00e9" + std::wstring(3000, L'b')},
        {"\x7f\x01 ~", L"\x7f\x01 ~"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.narrow.substr(0, 40));
        std::wstring w = L"previous content that must not survive";
        chartowstr(c.narrow.c_str(), w);
        EXPECT_EQ(w, c.wide);
        std::string back = "previous";
        EXPECT_EQ(wstrtocs(back, c.wide), static_cast<int>(c.narrow.size()));
        EXPECT_EQ(back, c.narrow);
    }
    // Outside UTF-8 the general path still decides every byte.
    setlocale(LC_CTYPE, "C");
    std::wstring w;
    chartowstr("plain \xe9", w);
    EXPECT_EQ(w.substr(0, 6), L"plain ");
    std::string back;
    wstrtocs(back, w);
    EXPECT_EQ(back, "plain \xe9");
}

// readFile remembers the last format it checked; a different format, an
// unusable one and the first one again must each be honoured.
TEST_F(FastPathsTest, LineReaderFollowsEveryChangeOfFormat) {
    writeText(tmp.sub("items.txt"), "alpha beta\n  gamma delta\nrest of it\n");
    FILE* fp = fopen(tmp.sub("items.txt").c_str(), "r");
    ASSERT_NE(fp, nullptr);
    std::wstring item;
    EXPECT_EQ(readFile(fp, L"%s", item), 1);
    EXPECT_EQ(item, L"alpha");
    EXPECT_EQ(readFile(fp, L"%3c", item), 1);
    EXPECT_EQ(item, L" be");
    EXPECT_EQ(readFile(fp, L"%d", item), EOF);  // refused, nothing read
    EXPECT_EQ(item, L"");
    EXPECT_EQ(readFile(fp, L" %2024[^\n]\n", item), 1);
    EXPECT_EQ(item, L"ta");
    EXPECT_EQ(readFile(fp, L"%s", item), 1);
    EXPECT_EQ(item, L"gamma");
    EXPECT_EQ(readFile(fp, L" %2024[^\n]\n", item), 1);
    EXPECT_EQ(item, L"delta");
    EXPECT_EQ(readFile(fp, L" %2024[^\n]\n", item), 1);
    EXPECT_EQ(item, L"rest of it");
    EXPECT_EQ(readFile(fp, L" %2024[^\n]\n", item), EOF);
    fclose(fp);
}

}  // namespace
