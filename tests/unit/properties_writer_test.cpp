// Escaping of keys and values on writing, and reading them back.
#include <gtest/gtest.h>

#include <clocale>
#include <cstdio>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

class PropertiesWriterTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        setDebug(false);
    }
    rcptest::TempDir tmp;
};

TEST_F(PropertiesWriterTest, Escaping) {
    struct Case {
        std::wstring in, value, key;
    } cases[] = {
        {L"a=b:c", L"a\\=b\\:c", L"a\\=b\\:c"},
        {L"my key", L"my key", L"my\\ key"},
        {L"#!", L"\\#\\!", L"\\#\\!"},
        {L"c:\\dir", L"c\\:\\\\dir", L"c\\:\\\\dir"},
        {L"tab\there", L"tab\\u0009here", L"tab\\u0009here"},
        {L"\r\n", L"\\u000d\\u000a", L"\\u000d\\u000a"},
        {L"caf\u00e9 \u4e2d", L"caf\\u00e9 \\u4e2d", L"caf\\u00e9\\ \\u4e2d"},
        {L"~\x7f", L"~\\u007f", L"~\\u007f"},
        {L"\U0001F600", L"\\uf600", L"\\uf600"},  // only the low 16 bits
        {std::wstring(1, L'\0'), L"\\u0000", L"\\u0000"},
        {L"", L"", L""},
    };
    for (const auto& c : cases) {
        std::wstring value = L"keep:", key = L"keep:";
        EXPECT_EQ(convWcharTo8859_1_Value(c.in, value), c.in.length());
        EXPECT_EQ(convWcharTo8859_1_Key(c.in, key), c.in.length());
        EXPECT_EQ(value, L"keep:" + c.value) << rcptest::narrow(c.in);
        EXPECT_EQ(key, L"keep:" + c.key) << rcptest::narrow(c.in);
        std::wstring line;
        convWcharTo8859_1(c.in, c.in, line);
        EXPECT_EQ(line, c.key + L"=" + c.value);
    }
}

TEST_F(PropertiesWriterTest, HexDigitsAreTheLastFourOfAnyCode) {
    struct Case {
        unsigned int code;
        const wchar_t* digits;
    } cases[] = {{0, L"0000"},           {0x41, L"0041"},          {0xabcd, L"abcd"},
                 {0x10000, L"0000"},     {0x1f600, L"f600"},       {0xffffff, L"ffff"},
                 {0x1234567, L"4567"},   {0xffffffffu, L"ffff"}};
    for (const auto& c : cases) {
        std::wstring out = L"x";
        addHexDigits(out, c.code);
        EXPECT_EQ(out, std::wstring(L"x") + c.digits) << c.code;
    }
}

TEST_F(PropertiesWriterTest, EscapedValuesReadBack) {
    struct Case {
        std::wstring written, read;
    } cases[] = {
        {L"a=b:c", L"a=b:c"},
        {L"\\\\server\\share\\", L"\\\\server\\share\\"},
        {L"#!=:\\u0041", L"#!=:\\u0041"},
        {L"\ttab and \u00e9\u4e2d\r\n", L"\ttab and \u00e9\u4e2d\r\n"},
        {L"\xd800\xdfff\xffff", L"\xd800\xdfff\xffff"},
        {L"-Xmx=1", L"-Xmx=1"},
        // What the reader's grammar takes away: separators before the value,
        // blanks around it, everything after a NUL.
        {L"=:= x", L"x"},
        {L"x  ", L"x"},
        {std::wstring(L"a\0b", 3), L"a"},
    };
    std::string text;
    for (size_t i = 0; i < std::size(cases); ++i) {
        std::wstring line;
        convWcharTo8859_1(L"k" + std::to_wstring(i), cases[i].written, line);
        text += rcptest::narrow(line) + "\n";
    }
    rcptest::writeText(tmp.sub("w.properties"), text);
    std::vector<String> array;
    getProperties(tmp.wsub("w.properties"), array);
    ASSERT_EQ(array.size(), 2 * std::size(cases));
    for (size_t i = 0; i < std::size(cases); ++i)
        EXPECT_EQ(std::wstring(array[2 * i + 1]), cases[i].read) << i;
    freeProperties(array);
}

TEST_F(PropertiesWriterTest, OpenPropFile) {
    FILE* fp = reinterpret_cast<FILE*>(1);
    EXPECT_EQ(open_prop_file(fp, tmp.sub("missing/x").c_str(), "r"), nullptr);
    EXPECT_EQ(fp, nullptr);
    EXPECT_NE(open_prop_file(fp, tmp.sub("x").c_str(), "w"), nullptr);
    ASSERT_NE(fp, nullptr);
    fclose(fp);
}

}  // namespace
