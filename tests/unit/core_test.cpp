// The log's rules and the text conversions.
#include <cerrno>
#include <cstring>

#include "unit_support.h"

namespace {

TEST(CoreTest, LogQueuesUntilItOpensThenWritesTheBlockAndAnEmptyLine) {
    resetState();
    TempDir dir;
    writeText(dir.sub("rcplauncher.log"), std::string(10000, 'o') + "\n");  // an earlier launch's longer log
    SvcDebugOutA("dropped without -debug");
    SvcDebugOutW(L"dropped %ls", L"too");
    setDebug(true);
    SvcDebugOutA("first");
    SvcDebugOutA(std::string(1000, 'a').c_str());  // a format of 1000 characters or more is dropped
    SvcDebugOutA(std::string(999, 'b').c_str());
    SvcDebugOutA("%s", std::string(5000, 'c').c_str());        // cut at 4095 characters
    fatalErrorA("%s", std::string(5000, 'd').c_str(), false);  // no room left for the error suffix
    errno = ENOENT;
    fatalErrorA("RLNCH0099E: bad (%ls)", L"x%sy", false);
    const std::string queued = "first\n" + std::string(999, 'b') + "\n" + std::string(4095, 'c') + "\n" +
                               std::string(4095, 'd') + "\nRLNCH0099E: bad (x%sy) : " + strerror(ENOENT) + "\n";
    EXPECT_EQ(getLogQueue(), queued);
    ASSERT_TRUE(enableLogging(dir.wpath()));
    EXPECT_EQ(getLogQueue(), "");
    SvcDebugOutA("after");
    EXPECT_EQ(readText(dir.sub("rcplauncher.log")), queued + "\nafter\n");

    resetLoggingForTest();  // nothing queued: the empty line alone
    ASSERT_TRUE(enableLogging(dir.wpath()));
    EXPECT_EQ(readText(dir.sub("rcplauncher.log")), "\n");
    resetLoggingForTest();
}

TEST(CoreTest, ConversionsRoundTripAnyBytes) {
    resetState();
    const std::pair<std::string, std::wstring> cases[] = {
        {"", L""},
        {"\xc3\xa9tude du caf\xc3\xa9", L"\u00e9tude du caf\u00e9"},
        {"\xe2\x82\xac" "5 \xf0\x9f\x98\x80!\x7f\x01", L"\u20ac" L"5 \U0001F600!\x7f\x01"},
        {"ab\xff" "cd\xc3" "ef\x80", L"ab\xdcff" L"cd\xdcc3" L"ef\xdc80"},  // each invalid byte is kept
        {std::string(3000, 'a') + "\xc3\xa9" + std::string(3000, 'b'),
         std::wstring(3000, L'a') + L"\u00e9" + std::wstring(3000, L'b')},
    };
    for (const auto& [bytes, wide] : cases) {
        std::wstring w = L"previous content";
        chartowstr(bytes.c_str(), w);
        EXPECT_EQ(w, wide);
        std::string back = "previous";
        EXPECT_EQ(wstrtocs(back, wide), static_cast<int>(bytes.size()));
        EXPECT_EQ(back, bytes);
    }
    setlocale(LC_CTYPE, "C");  // outside UTF-8 the locale decides every byte
    std::wstring w;
    std::string back;
    chartowstr("plain \xe9", w);
    wstrtocs(back, w);
    EXPECT_EQ(back, "plain \xe9");
    EXPECT_EQ(wstrtocs(back, L"x\u00e9y"), -1);  // no multibyte form
    EXPECT_TRUE(back.size() == 3 && back[0] == 'x' && back[2] == 'y');
    setlocale(LC_CTYPE, "C.UTF-8");
    EXPECT_EQ(formatWithoutArgs(L"a=50%%\n") + formatWithoutArgs(L"x=%s%d%n%"), L"a=50%\nx=%s%d%n%");
}

}  // namespace
