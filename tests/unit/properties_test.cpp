// The properties reader: the grammar of a file, look-ups, and the line
// functions used when a per-user copy of the installation properties is
// rewritten.
#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;

class PropertiesTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        setDebug(false);
    }
    Pairs read(const std::string& text) {
        rcptest::writeText(tmp.sub("p.properties"), text);
        std::vector<String> array;
        getProperties(tmp.wsub("p.properties"), array);
        Pairs pairs;
        for (size_t i = 0; i + 1 < array.size(); i += 2) pairs.emplace_back(array[i], array[i + 1]);
        EXPECT_EQ(array.size(), 2 * pairs.size());
        freeProperties(array);
        return pairs;
    }
    rcptest::TempDir tmp;
};

TEST_F(PropertiesTest, GrammarOfAFile) {
    struct Case {
        std::string text;
        Pairs expected;
    } cases[] = {
        {"a = 1\nb:2\nc 3\nd==4\ne\t5\nf b=c\n", {{L"a", L"1"}, {L"b", L"2"}, {L"c", L"3"}, {L"d", L"4"}, {L"e", L"5"}, {L"f", L"b=c"}}},
        {"-Xmx=512m\n-Xbootclasspath/a:x\n-Xss512k\n", {{L"-Xmx", L"=512m"}, {L"-Xbootclasspath/a", L":x"}, {L"-Xss512k", L""}}},
        {"-Xa=b\\\n=c\nk=v\n", {{L"-Xa", L"=b=c"}, {L"k", L"v"}}},
        {"p=c:\\\\dir\nu=\\u0041\\u41xyz\\u00e9\nt=a\\tb\n", {{L"p", L"c:\\dir"}, {L"u", L"AAz\u00e9"}, {L"t", L"atb"}}},
        {"n=ab\\u0000cd\nk\\=b=c\nv=x\\:y\\=z\nh=\\#x\nmy\\ key=v\n", {{L"n", L"ab"}, {L"k", L"b=c"}, {L"v", L"x:y=z"}, {L"h", L"#x"}, {L"my", L"key=v"}}},
        {"#k=v\n!k=v\nx=a\\\n#c\n  b\nab\\\ncd=x\n", {{L"!k", L"v"}, {L"x", L"ab"}, {L"abcd", L"x"}}},
        {"k=a\\\\\nj=1\nc=a\\\n", {{L"k", L"a\\"}, {L"j", L"1"}}},  // a continuation at the end is lost
        {"k=v\r\nb=v  \nt=v\t\n=x\nlonely\n\n\t j = w", {{L"k", L"v\r"}, {L"b", L"v"}, {L"t", L"v\t"}, {L"", L"x"}, {L"lonely", L""}, {L"j", L"w"}}},
        {"k=1\nk=2\nk=caf\xc3\xa9\n", {{L"k", L"1"}, {L"k", L"2"}, {L"k", L"caf\u00e9"}}},
        {"k=" + std::string(3000, 'a') + "\n", {{L"k", std::wstring(2022, L'a')}, {std::wstring(978, L'a'), L""}}},
        {"", {}},
    };
    for (const Case& c : cases) EXPECT_EQ(read(c.text), c.expected) << c.text;
}

TEST_F(PropertiesTest, MissingFileIsFatal) {
    ASSERT_TRUE(enableLogging(tmp.wpath()));
    std::vector<String> array;
    EXPECT_EXIT(getProperties(tmp.wsub("absent"), array), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(rcptest::readText(tmp.sub("rcplauncher.log")).find("RLNCH0014E: Unable to load " + tmp.sub("absent") + " file! : "),
              std::string::npos);
}

TEST_F(PropertiesTest, LookUps) {
    rcptest::PropArray props;
    for (int i = 0; i < 40; ++i) {
        props.v().push_back(copyString((std::wstring(i % 2 ? L"p." : L"q.") + std::to_wstring(i / 2)).c_str()));
        props.v().push_back(copyString(std::to_wstring(i).c_str()));
    }
    props.v().push_back(copyString(L"p.0"));
    props.v().push_back(copyString(L"last"));
    EXPECT_STREQ(findProperty(L"p.0", props.v()), L"1");  // the first occurrence wins
    EXPECT_EQ(findProperty(L"p.", props.v()), nullptr);

    String* sel = findProperties(L"p.", props.v());  // grows past its first 10 entries
    for (int i = 0; i < 20; ++i) EXPECT_STREQ(sel[2 * i + 1], std::to_wstring(2 * i + 1).c_str());
    EXPECT_STREQ(sel[40], L"p.0");
    EXPECT_EQ(sel[42][0], 0);
    free(sel);

    props.v()[20][0] = 0;  // an empty key hides every later pair from the selection
    sel = findProperties(L"", props.v());
    EXPECT_STREQ(sel[18], L"p.4");
    EXPECT_EQ(sel[20][0], 0);
    free(sel);
}

TEST_F(PropertiesTest, LineFunctions) {
    struct Filter {
        std::wstring in, out;
    } filters[] = {{L"  a\\\\b  ", L"a\\b"}, {L"\\u005c\\u005cu0041", L"\\\\u0041"}, {L"\\u12", L"\x12"},
                   {L"\\u", std::wstring(1, 0)}, {L"\\u-001", L"\xffff"},         {L"\\x\\", L"x"},
                   {L"\\ x", L"x"},              {L"   ", L"   "},                 {L"\ta\t", L"\ta\t"}};
    for (const auto& c : filters) {
        std::wstring s = c.in;
        FilterValue(s);
        EXPECT_EQ(s, c.out) << rcptest::narrow(c.in);
    }
    struct Line {
        std::wstring line;
        bool comment, continued;
    } lines[] = {{L"", false, false},       {L"#x", true, false},      {L"!x\\", true, true},
                 {L"a\\\\", false, false},  {L"a\\\\\\", false, true}, {L"\\", false, false},
                 {L"\\\\", false, true}};
    for (const auto& c : lines) {
        EXPECT_EQ(isComment(c.line), c.comment) << rcptest::narrow(c.line);
        EXPECT_EQ(isContinuationLine(c.line), c.continued) << rcptest::narrow(c.line);
    }
    struct Platform {
        std::wstring in;
        bool drop;
        std::wstring out;
    } platforms[] = {{L"  a.b.macosx=1", false, L"a.b=1"}, {L"a.macosxfoo:1", false, L"a:1"},
                     {L"a.b.linux=1", true, L"a.b.linux=1"}, {L".win32 x", true, L".win32 x"},
                     {L" -Da.linux=1", false, L"-Da.linux=1"}, {L"a=b.linux", false, L"a=b.linux"},
                     {L"a.mac=1", false, L"a.mac=1"},        {L"=x.linux", false, L"=x.linux"},
                     {L"", false, L""}};
    for (const auto& c : platforms) {
        std::wstring line = c.in;
        EXPECT_EQ(processFilterKey(line), c.drop) << rcptest::narrow(c.in);
        EXPECT_EQ(line, c.out);
    }
}

}  // namespace
