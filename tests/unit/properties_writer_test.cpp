// Escaping of keys and values on writing, and reading them back.
#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

TEST(PropertiesWriterTest, Escaping) {
    struct Case {
        std::wstring in, value, key;
    } cases[] = {
        {L"a=b:c", L"a\\=b\\:c", L"a\\=b\\:c"},
        {L"my #!", L"my \\#\\!", L"my\\ \\#\\!"},
        {L"c:\\d", L"c\\:\\\\d", L"c\\:\\\\d"},
        {std::wstring(L"\t\r\0~\x7f", 5), L"\\u0009\\u000d\\u0000~\\u007f", L"\\u0009\\u000d\\u0000~\\u007f"},
        {L"\u00e9\u4e2d\U0001F600", L"\\u00e9\\u4e2d\\uf600", L"\\u00e9\\u4e2d\\uf600"},  // low 16 bits only
    };
    for (const auto& c : cases) {
        std::wstring value = L"kept", key = L"kept", line;
        EXPECT_EQ(convWcharTo8859_1_Value(c.in, value), c.in.length());
        EXPECT_EQ(convWcharTo8859_1_Key(c.in, key), c.in.length());
        EXPECT_EQ(value, L"kept" + c.value);
        EXPECT_EQ(key, L"kept" + c.key);
        convWcharTo8859_1(c.in, c.in, line);
        EXPECT_EQ(line, c.key + L"=" + c.value);
    }
    for (auto [code, digits] : std::initializer_list<std::pair<unsigned, const wchar_t*>>{
             {0x10000u, L"0000"}, {0x1234567u, L"4567"}, {0xffffffffu, L"ffff"}}) {
        std::wstring out;
        addHexDigits(out, code);
        EXPECT_EQ(out, digits);
    }
}

TEST(PropertiesWriterTest, EscapedValuesReadBack) {
    struct Case {
        std::wstring written, read;
    } cases[] = {
        {L"\\\\srv\\share\\", L"\\\\srv\\share\\"},
        {L"#!=:\\u0041\t\u00e9\u4e2d\r\n", L"#!=:\\u0041\t\u00e9\u4e2d\r\n"},
        {L"\xd800\xffff", L"\xd800\xffff"},
        // what the grammar takes away: separators before the value, blanks
        // after it, everything from a NUL on
        {L"=: x  ", L"x"},
        {std::wstring(L"a\0b", 3), L"a"},
    };
    rcptest::TempDir tmp;
    std::string text;
    for (size_t i = 0; i < std::size(cases); ++i) {
        std::wstring line;
        convWcharTo8859_1(L"k" + std::to_wstring(i), cases[i].written, line);
        text += rcptest::narrow(line) + "\n";
    }
    rcptest::writeText(tmp.sub("w"), text);
    std::vector<String> array;
    getProperties(tmp.wsub("w"), array);
    ASSERT_EQ(array.size(), 2 * std::size(cases));
    for (size_t i = 0; i < std::size(cases); ++i) EXPECT_EQ(std::wstring(array[2 * i + 1]), cases[i].read) << i;
    freeProperties(array);
}

}  // namespace
