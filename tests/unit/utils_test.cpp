// Conversions, separators, environment look-ups and owned strings.
#include <gtest/gtest.h>
#include <unistd.h>

#include <clocale>
#include <cstdlib>
#include <cwchar>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

class UtilsTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
    }
};

TEST_F(UtilsTest, ConversionsRoundTripAnyBytes) {
    struct Case {
        const char* narrow;
        std::wstring wide;
    } cases[] = {
        {"", L""},
        {"/opt/app/rcp", L"/opt/app/rcp"},
        {"caf\xc3\xa9", L"caf\u00e9"},
        // Not valid UTF-8: each stray byte is kept and comes back unchanged.
        {"a\xff" "b\xc3", L"a\xdcff" L"b\xdcc3"},
    };
    for (const auto& c : cases) {
        std::wstring w;
        chartowstr(c.narrow, w);
        EXPECT_EQ(w, c.wide) << c.narrow;
        String s = chartowcs(c.narrow);
        EXPECT_EQ(std::wstring(s), c.wide);
        freeString(s);
        std::string back;
        EXPECT_EQ(wstrtocs(back, w), static_cast<int>(strlen(c.narrow)));
        EXPECT_EQ(back, c.narrow);
        std::string back2;
        wcstochar(back2, w.c_str());
        EXPECT_EQ(back2, c.narrow);
    }
}

TEST_F(UtilsTest, CharacterWithoutMultibyteFormIsReported) {
    setlocale(LC_CTYPE, "C");
    std::string out;
    EXPECT_EQ(wstrtocs(out, L"x\u00e9y"), -1);
    EXPECT_EQ(out.size(), 3u);
    EXPECT_EQ(out[0], 'x');
    EXPECT_EQ(out[2], 'y');
    setlocale(LC_CTYPE, "C.UTF-8");
}

TEST_F(UtilsTest, OwnedStrings) {
    String empty = newString(0);
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty[0], L'\0');
    EXPECT_EQ(freeString(empty), nullptr);
    EXPECT_EQ(freeString(nullptr), nullptr);
    String s = initMemString(newString(5), L"hello");
    EXPECT_STREQ(s, L"hello");
    freeString(s);
}

TEST_F(UtilsTest, Separators) {
    struct {
        std::wstring in, slashes, backslashes;
    } cases[] = {
        {L"c:\\a\\\\b", L"c:/a//b", L"c:\\a\\\\b"},
        {L"/x/y", L"/x/y", L"\\x\\y"},
        {L"", L"", L""},
    };
    for (auto& c : cases) {
        std::wstring s = c.in;
        convertToOsSeparator(s);
        EXPECT_EQ(s, c.slashes);
        convertS2BS(s);
        EXPECT_EQ(s, c.backslashes);
    }
}

TEST_F(UtilsTest, EnvironmentLookUp) {
    std::wstring value = L"stale";
    unsetenv("RCP_TEST_UNSET");
    EXPECT_EQ(getEnv(L"RCP_TEST_UNSET", value), nullptr);
    EXPECT_EQ(value, L"");
    EXPECT_EQ(getLogQueue(), "RLNCH0081I:  Environmental variable 'RCP_TEST_UNSET' is not set\n\n");

    resetLoggingForTest();
    setenv("RCP_TEST_EMPTY", "", 1);
    const wchar_t* r = getEnv(L"RCP_TEST_EMPTY", value);
    ASSERT_NE(r, nullptr);
    EXPECT_STREQ(r, L"");
    EXPECT_EQ(getLogQueue(), "");

    setenv("RCP_TEST_SET", "v a\xc3\xa9", 1);
    EXPECT_STREQ(getEnv(L"RCP_TEST_SET", value), L"v a\u00e9");
}

TEST_F(UtilsTest, AdminIgnoresTheName) {
    EXPECT_EQ(userIsAdmin(L"root"), getuid() == 0);
    EXPECT_EQ(userIsAdmin(L"nobody"), getuid() == 0);
}

TEST_F(UtilsTest, FormatWithoutArguments) {
    EXPECT_EQ(formatWithoutArgs(L"a=50%%\n"), L"a=50%\n");
    EXPECT_EQ(formatWithoutArgs(L"x=%s%d%n%"), L"x=%s%d%n%");
}

TEST_F(UtilsTest, OpenFileIsByteOriented) {
    rcptest::TempDir dir;
    rcptest::writeText(dir.sub("f"), "abc\n");
    FILE* fp = nullptr;
    open_file(fp, dir.wsub("f").c_str(), L"r");
    ASSERT_NE(fp, nullptr);
    EXPECT_LT(fwide(fp, 0), 0);
    fclose(fp);
    open_file(fp, dir.wsub("missing").c_str(), L"r");
    EXPECT_EQ(fp, nullptr);
}

}  // namespace
