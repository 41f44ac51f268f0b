// The properties reader: grammar of a file, look-ups, and the line functions
// used when a per-user copy of the installation properties is rewritten.
#include <gtest/gtest.h>

#include <clocale>
#include <cstdlib>
#include <cwchar>
#include <utility>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;
using rcptest::PropArray;
using rcptest::TempDir;

class PropertiesTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        setDebug(false);
    }

    // Reads text as a properties file; the stored copies are compared as C
    // strings (that is what every caller sees).
    Pairs read(const std::string& text) {
        rcptest::writeText(tmp.sub("p.properties"), text);
        std::vector<String> array;
        getProperties(tmp.wsub("p.properties"), array);
        Pairs pairs;
        EXPECT_EQ(array.size() % 2, 0u);
        for (size_t i = 0; i + 1 < array.size(); i += 2) pairs.emplace_back(array[i], array[i + 1]);
        freeProperties(array);
        EXPECT_TRUE(array.empty());
        return pairs;
    }

    TempDir tmp;
};

TEST_F(PropertiesTest, GrammarOfAFile) {
    const std::string longValue(3000, 'a');
    struct Case {
        const char* what;
        std::string text;
        Pairs expected;
    } cases[] = {
        {"separators", "a = 1\nb:2\nc 3\nd==4\ne\t5\n", {{L"a", L"1"}, {L"b", L"2"}, {L"c", L"3"}, {L"d", L"4"}, {L"e", L"5"}}},
        {"separator inside value", "a b=c\n", {{L"a", L"b=c"}}},
        {"-X keeps separator", "-Xmx=512m\n-Xbootclasspath/a:x.jar\n-Xss512k\n",
         {{L"-Xmx", L"=512m"}, {L"-Xbootclasspath/a", L":x.jar"}, {L"-Xss512k", L""}}},
        {"-X applies to continuation", "-Xa=b\\\n=c\nk=v\n", {{L"-Xa", L"=b=c"}, {L"k", L"v"}}},
        {"doubled backslash", "p=c:\\\\dir\n", {{L"p", L"c:\\dir"}}},
        {"unicode escapes", "a=\\u0041\nb=\\u41xyz\nc=x\\u00e9\n", {{L"a", L"A"}, {L"b", L"Az"}, {L"c", L"x\u00e9"}}},
        {"no letter escapes", "a=a\\tb\\n\n", {{L"a", L"atbn"}}},
        {"NUL escape cuts value", "a=ab\\u0000cd\n", {{L"a", L"ab"}}},
        {"weak escape in key", "a\\=b=c\n", {{L"a", L"b=c"}}},
        {"weak escape in value", "k=x\\:y\\=z\nh=\\#x\n", {{L"k", L"x:y=z"}, {L"h", L"#x"}}},
        {"escaped blank ends key", "my\\ key=v\n", {{L"my", L"key=v"}}},
        {"comments", "#k=v\n!k=v\n", {{L"!k", L"v"}}},
        {"continuation", "x=a\\\n  b\n", {{L"x", L"ab"}}},
        {"comment inside continuation", "x=a\\\n#c\n  b\n", {{L"x", L"ab"}}},
        {"continued key", "ab\\\ncd=x\n", {{L"abcd", L"x"}}},
        {"even backslashes do not continue", "k=a\\\\\nj=b\n", {{L"k", L"a\\"}, {L"j", L"b"}}},
        {"continuation at end of file is dropped", "j=1\nk=a\\\n", {{L"j", L"1"}}},
        {"carriage return kept", "k=v\r\nj=w\n", {{L"k", L"v\r"}, {L"j", L"w"}}},
        {"blanks trimmed, tabs kept", "k=v  \nt=v\t\n", {{L"k", L"v"}, {L"t", L"v\t"}}},
        {"empty key and empty value", "=x\nlonely\n", {{L"", L"x"}, {L"lonely", L""}}},
        {"blank lines and indentation", "\n\n   k=v\n\n\t j = w", {{L"k", L"v"}, {L"j", L"w"}}},
        {"duplicates kept in order", "k=1\nk=2\n", {{L"k", L"1"}, {L"k", L"2"}}},
        {"overlong line splits", "k=" + longValue + "\n",
         {{L"k", std::wstring(2022, L'a')}, {std::wstring(978, L'a'), L""}}},
        {"UTF-8 text", "k=caf\xc3\xa9\n", {{L"k", L"caf\u00e9"}}},
        {"empty file", "", {}},
    };
    for (const Case& c : cases) EXPECT_EQ(read(c.text), c.expected) << c.what;
}

TEST_F(PropertiesTest, LogsEveryLineAndPairWhenDebugging) {
    setDebug(true);
    read("k=v\n");
    const std::string& q = getLogQueue();
    EXPECT_NE(q.find("RLNCH0032I: Prop Line = \"k=v\"\n"), std::string::npos) << q;
    EXPECT_NE(q.find("RLNCH0023I:   attrib = \"k\"\n"), std::string::npos) << q;
    EXPECT_NE(q.find("RLNCH0024I:   value  = \"v\"\n"), std::string::npos) << q;
}

TEST_F(PropertiesTest, MissingFileIsFatal) {
    ASSERT_TRUE(enableLogging(tmp.wpath()));
    std::vector<String> array;
    EXPECT_EXIT(getProperties(tmp.wsub("absent.properties"), array), ::testing::ExitedWithCode(255), "");
    const std::string log = rcptest::readText(tmp.sub("rcplauncher.log"));
    EXPECT_NE(log.find("RLNCH0014E: Unable to load " + tmp.sub("absent.properties") + " file! : "), std::string::npos)
        << log;
}

TEST_F(PropertiesTest, LookUps) {
    PropArray props{{L"k", L"1"}, {L"vmarg.a", L"x"}, {L"k", L"2"}, {L"vmarg.b", L"y"}, {L"other", L"z"}};
    EXPECT_STREQ(findProperty(L"k", props.v()), L"1");  // first occurrence wins
    EXPECT_EQ(findProperty(L"K", props.v()), nullptr);
    EXPECT_EQ(findProperty(L"vmarg.", props.v()), nullptr);
    EXPECT_EQ(findProperty(L"k", {}), nullptr);

    String* sel = findProperties(L"vmarg.", props.v());
    EXPECT_STREQ(sel[0], L"vmarg.a");
    EXPECT_STREQ(sel[1], L"x");
    EXPECT_STREQ(sel[2], L"vmarg.b");
    EXPECT_STREQ(sel[3], L"y");
    ASSERT_NE(sel[4], nullptr);
    EXPECT_EQ(sel[4][0], 0);
    free(sel);

    String* none = findProperties(L"vmarg.", {});
    ASSERT_NE(none[0], nullptr);
    EXPECT_EQ(none[0][0], 0);
    free(none);
}

TEST_F(PropertiesTest, FindPropertiesGrowsAndStopsAtEmptyKey) {
    PropArray props;
    for (int i = 0; i < 40; ++i) {
        props.v().push_back(copyString((L"p." + std::to_wstring(i)).c_str()));
        props.v().push_back(copyString(std::to_wstring(i).c_str()));
    }
    String* all = findProperties(L"p.", props.v());
    for (int i = 0; i < 40; ++i) EXPECT_STREQ(all[2 * i + 1], std::to_wstring(i).c_str());
    EXPECT_EQ(all[80][0], 0);
    free(all);

    // An empty key hides everything after it from the selection (not from
    // findProperty).
    free(props.v()[20]);
    props.v()[20] = copyString(L"");
    String* cut = findProperties(L"", props.v());
    EXPECT_STREQ(cut[18], L"p.9");
    EXPECT_EQ(cut[20][0], 0);
    free(cut);
    EXPECT_STREQ(findProperty(L"p.39", props.v()), L"39");
}

TEST_F(PropertiesTest, RemoveDuplicatesTakesOnlyTheSecondOccurrence) {
    struct Case {
        const wchar_t* word;
        std::vector<std::wstring> in;
        std::vector<std::wstring> out;
    } cases[] = {
        {L"-data", {L"p", L"-data", L"a", L"-data", L"b", L"-data", L"c"}, {L"p", L"-data", L"a", L"b", L"-data", L"c"}},
        {L"-data", {L"p", L"-data", L"a"}, {L"p", L"-data", L"a"}},
        {L"-data", {L"-data=x", L"-data=x"}, {L"-data=x", L"-data=x"}},
        {L"-nl", {L"-nl", L"-NL", L"-nl"}, {L"-nl", L"-NL"}},
        {L"-nl", {}, {}},
    };
    for (const auto& c : cases) {
        std::vector<std::wstring> w = c.in;
        removeDuplicates(w, c.word);
        EXPECT_EQ(w, c.out);

        std::vector<String> s;
        for (const auto& x : c.in) s.push_back(copyString(x.c_str()));
        std::vector<String> kept = s;
        removeDuplicates(s, c.word);
        ASSERT_EQ(s.size(), c.out.size());
        for (size_t i = 0; i < s.size(); ++i) EXPECT_EQ(std::wstring(s[i]), c.out[i]);
        for (String x : kept) free(x);  // the removed entry was not freed
    }
}

TEST_F(PropertiesTest, LineFunctions) {
    struct TrimCase {
        std::wstring in, out;
    } trims[] = {{L"", L""}, {L"   ", L"   "}, {L"  a b  ", L"a b"}, {L"\ta\t", L"\ta\t"}, {L" \t ", L"\t"}};
    for (const auto& c : trims) {
        std::wstring s = c.in;
        trimString(s);
        EXPECT_EQ(s, c.out) << '"' << rcptest::narrow(c.in) << '"';
        s = c.in;
        FilterProp(s);
        EXPECT_EQ(s, c.out);
    }

    struct FilterCase {
        std::wstring in, out;
    } filters[] = {
        {L"a\\\\b", L"a\\b"},
        {L"\\u005c\\u005c", L"\\\\"},     // produced backslashes are not escapes again
        {L"\\u005cu0041", L"\\u0041"},
        {L"\\u12", L"\x12"},
        {L"\\u", std::wstring(1, L'\0')},
        {L"\\u-001", L"\xffff"},
        {L"\\", L""},
        {L"\\x\\", L"x"},
        {L"\\ x ", L"x"},
        {L"  a\\tb  ", L"atb"},
    };
    for (const auto& c : filters) {
        std::wstring s = c.in;
        FilterValue(s);
        EXPECT_EQ(s, c.out) << rcptest::narrow(c.in);
    }

    struct LineCase {
        std::wstring line;
        bool comment, continued;
    } lines[] = {
        {L"", false, false},         {L"#x", true, false},         {L"!x", true, false},
        {L" #x", false, false},      {L"a\\", false, true},        {L"a\\\\", false, false},
        {L"a\\\\\\", false, true},   {L"\\", false, false},        {L"\\\\", false, true},
        {L"#\\", true, true},
    };
    for (const auto& c : lines) {
        EXPECT_EQ(isComment(c.line), c.comment) << rcptest::narrow(c.line);
        EXPECT_EQ(isContinuationLine(c.line), c.continued) << rcptest::narrow(c.line);
    }
}

TEST_F(PropertiesTest, PlatformFilter) {
    struct Case {
        std::wstring in;
        bool drop;
        std::wstring out;
    } cases[] = {
        {L"  a.b.macosx=1", false, L"a.b=1"},
        {L"a.macosxfoo:1", false, L"a:1"},
        {L"a.b.macosx", false, L"a.b"},
        {L"a.b.linux=1", true, L"a.b.linux=1"},
        {L"a.win32 x", true, L"a.win32 x"},
        {L".linux=x", true, L".linux=x"},
        {L"-Da.linux=1", false, L"-Da.linux=1"},
        {L"  -Da.linux=1", false, L"-Da.linux=1"},
        {L"a=b.linux", false, L"a=b.linux"},
        {L"a.b.mac=1", false, L"a.b.mac=1"},
        {L"a.b.=1", false, L"a.b.=1"},
        {L"nodot", false, L"nodot"},
        {L"=x.linux", false, L"=x.linux"},
        {L"", false, L""},
    };
    for (const auto& c : cases) {
        std::wstring line = c.in;
        EXPECT_EQ(processFilterKey(line), c.drop) << rcptest::narrow(c.in);
        EXPECT_EQ(line, c.out);
    }
}

}  // namespace
