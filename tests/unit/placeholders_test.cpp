// "${...}" expansion: standard placeholders, user placeholders from the
// environment and the properties array, and the failure semantics.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cwchar>

#include "rcp_launcher.h"
#include "test_util.h"

namespace {

using rcptest::PropArray;
const size_t npos = std::wstring::npos;

class PlaceholdersTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetLoggingForTest();
        setDebug(false);
        setenv("RCPT_SET", "/home/u", 1);
        setenv("RCPT_EMPTY", "", 1);
        setenv("RCPT_PH", "${prop.b}", 1);
        unsetenv("RCPT_UNSET");
    }
    static size_t count(const std::string& text, const std::string& word) {
        size_t n = 0;
        for (size_t p = text.find(word); p != std::string::npos; p = text.find(word, p + 1)) ++n;
        return n;
    }
    rcptest::TempDir tmp;
};

TEST_F(PlaceholdersTest, StandardPlaceholders) {
    struct Case {
        std::wstring in, out;
    } cases[] = {
        {L"${rcp.home}/plugins", L"/opt/app/plugins"},
        {L"${rcp.home}:${rcp.home}", L"/opt/app:/opt/app"},
        {L"${workspace.location}/x;${rcp.data}", L"/ws/x;/ws"},
        {L"$rcp.home {rcp.home} ${rcp.home", L"$rcp.home {rcp.home} ${rcp.home"},
        {L"", L""},
    };
    for (const auto& c : cases) {
        std::wstring s = c.in;
        EXPECT_EQ(replaceStdPlaceholders(L"/ws", L"/opt/app", s), c.in != c.out);
        EXPECT_EQ(s, c.out);
    }
    // Paths that contain a placeholder themselves are inserted once.
    std::wstring s = L"${rcp.home}|${rcp.data}";
    EXPECT_TRUE(replaceStdPlaceholders(L"}${rcp.data", L"/d/${rcp.home}", s));
    EXPECT_EQ(s, L"/d/${rcp.home}|}${rcp.data");
}

TEST_F(PlaceholdersTest, FindLastPlaceholder) {
    struct Case {
        std::wstring text;
        size_t lastIndex;
        size_t index, numchars;
        std::wstring key;
    } cases[] = {
        {L"", 0, npos, 99, L"-"},
        {L"", npos, npos, 99, L"-"},
        {L"$", 0, npos, 99, L"-"},
        {L"x${", 0, npos, 99, L"-"},
        {L"${", 1, 0, 2, L""},
        {L"x${", 2, 1, 2, L""},
        {L"${", 0, 0, 1, L""},  // starts at the limit: ends there too
        {L"a${b}", 4, 1, 4, L"b"},
        {L"${abc", 4, 0, 5, L"ab"},
        {L"${a}${b}", 7, 4, 4, L"b"},
        {L"${a}${b}", 3, 0, 4, L"a"},
        {L"${a}x}", 2, 0, 3, L""},  // the brace lies beyond the limit
        {L"${a}", npos, 0, 4, L"a"},
        {L"${abc", 1000, 0, 5, L"ab"},
    };
    for (const auto& c : cases) {
        size_t numchars = 99;
        std::wstring key = L"-";
        EXPECT_EQ(findLastPlaceholder(c.text, c.lastIndex, numchars, key), c.index)
            << rcptest::narrow(c.text) << " @" << c.lastIndex;
        EXPECT_EQ(numchars, c.numchars) << rcptest::narrow(c.text);
        EXPECT_EQ(key, c.key) << rcptest::narrow(c.text);
    }
}

TEST_F(PlaceholdersTest, PlaceholderValues) {
    PropArray props{{L"a", L"1"}, {L"e", L""}, {L"a", L"2"}};
    struct Case {
        std::wstring key;
        bool resolved;
        std::wstring value;
    } cases[] = {
        {L"env.RCPT_SET", true, L"/home/u"}, {L"env.RCPT_EMPTY", true, L""},
        {L"env.RCPT_UNSET", false, L"${env.RCPT_UNSET}"}, {L"env.", false, L"${env.}"},
        {L"prop.a", true, L"1"},          {L"prop.e", true, L""},
        {L"prop.b", false, L"${prop.b}"}, {L"a", false, L"${a}"},
        {L"", false, L"${}"},             {L"ENV.RCPT_SET", false, L"${ENV.RCPT_SET}"},
    };
    for (const auto& c : cases) {
        std::wstring value = L"old";
        EXPECT_EQ(getPlaceholderValue(c.key, value, props.v()), c.resolved) << rcptest::narrow(c.key);
        EXPECT_EQ(value, c.value);
    }
}

TEST_F(PlaceholdersTest, UserPlaceholders) {
    PropArray props{{L"a", L"${prop.b}"}, {L"b", L"z"},          {L"p", L"${prop.p}"},
                    {L"e", L""},          {L"d", L"$"},          {L"q", L"q${prop.q}"},
                    {L"w", L"${prop.missing}"}};
    struct Case {
        std::wstring in;
        bool ok;
        std::wstring out;
    } cases[] = {
        {L"${prop.a}", true, L"z"},
        {L"x${prop.b}y${prop.b}", true, L"xzyz"},
        {L"${env.RCPT_SET}/x", true, L"/home/u/x"},
        {L"${env.RCPT_PH}", true, L"z"},
        {L"${prop.e}", true, L""},
        {L"${prop.e}${prop.b}", true, L"z"},
        {L"$ {x} $x{y}", true, L"$ {x} $x{y}"},
        {L"", true, L""},
        {L"${prop.missing}", false, L"${prop.missing}"},
        {L"${env.RCPT_UNSET}/x", false, L"${env.RCPT_UNSET}/x"},
        {L"${rcp.home}", false, L"${rcp.home}"},
        {L"${abc", false, L"${ab}"},
        {L"${", false, L"${}"},
        {L"x${", false, L"x${}"},
        {L"${prop.d}{x}", false, L"${}{x}"},
        // placeholders left of a failure are still expanded ...
        {L"${prop.b}${prop.missing}", false, L"z${prop.missing}"},
        // ... but not those inside text inserted after it
        {L"${prop.a}${prop.missing}", false, L"${prop.b}${prop.missing}"},
        {L"${prop.w}", false, L"${prop.missing}"},
        // self-references stop on the tenth repetition
        {L"${prop.p}", false, L"${prop.p}"},
        {L"${prop.q}", false, L"qqqqqqqqqqq${prop.q}"},
    };
    for (const auto& c : cases) {
        std::wstring s = c.in;
        EXPECT_EQ(replaceUserPlaceholders(s, props.v()), c.ok) << rcptest::narrow(c.in);
        EXPECT_EQ(s, c.out) << rcptest::narrow(c.in);
    }
}

TEST_F(PlaceholdersTest, ExpansionIsLoggedAndBounded) {
    setDebug(true);
    PropArray props{{L"p", L"${prop.p}"}, {L"b", L"z"}};
    std::wstring s = L"${prop.p}";
    EXPECT_FALSE(replaceUserPlaceholders(s, props.v()));
    EXPECT_EQ(count(getLogQueue(), "RLNCH0071I: Modified prop_contents ${prop.p} => ${prop.p}\n"), 11u);
    resetLoggingForTest();
    setDebug(true);
    s = L"a${prop.b}";
    EXPECT_TRUE(replaceUserPlaceholders(s, props.v()));
    EXPECT_NE(getLogQueue().find("RLNCH0071I: Modified prop_contents a${prop.b} => az\n"), std::string::npos);
    setDebug(false);

    // Values that multiply at every level would otherwise grow without bound.
    for (int fan : {2, 60}) {
        PropArray tree;
        for (int i = 0; i < 8; ++i) {
            std::wstring next;
            for (int k = 0; k < fan; ++k) next += L"${prop.a" + std::to_wstring(i + 1) + L"}";
            tree.v().push_back(copyString((L"a" + std::to_wstring(i)).c_str()));
            tree.v().push_back(copyString(next.c_str()));
        }
        tree.v().push_back(copyString(L"a8"));
        tree.v().push_back(copyString(L"x"));
        s = L"${prop.a0}";
        EXPECT_EQ(replaceUserPlaceholders(s, tree.v()), fan == 2);
        if (fan == 2) {
            EXPECT_EQ(s, std::wstring(256, L'x'));
        }
        EXPECT_LE(s.size(), 300000u);
    }
}

TEST_F(PlaceholdersTest, AllPlaceholdersAndFatalFailure) {
    PropArray props{{L"b", L"z"}};
    std::wstring s = L"${rcp.home}/${prop.b}";
    EXPECT_TRUE(replaceAllPlaceholders(L"/ws", L"/opt", s, props.v()));
    EXPECT_EQ(s, L"/opt/z");
    s = L"plain";
    EXPECT_FALSE(replaceAllPlaceholders(L"/ws", L"/opt", s, props.v()));

    ASSERT_TRUE(enableLogging(tmp.wpath()));
    s = L"${prop.b}-${env.RCPT_UNSET}";
    EXPECT_EXIT(replaceAllPlaceholders(L"/ws", L"/opt", s, props.v()), ::testing::ExitedWithCode(255), "");
    const std::string log = rcptest::readText(tmp.sub("rcplauncher.log"));
    EXPECT_NE(log.find("RLNCH0088E: property substitution is invalid (z-${env.RCPT_UNSET}) : "), std::string::npos)
        << log;
}

TEST_F(PlaceholdersTest, InstallationPropertiesExpandInArrayOrder) {
    PropArray props{{L"home", L"${rcp.home}"},
                    {L"${prop.home}", L"${prop.home}/lib"},
                    {L"ws", L"${rcp.data}|${workspace.location}"},
                    {L"later", L"${prop.last}"},
                    {L"last", L"x${prop.home}"},
                    {L"none", L""}};
    String untouched = props.v()[11];
    replacePlaceholdersInRcpInstallProp(L"C:\\ws", L"\\opt\\app", props.v());
    const wchar_t* expected[] = {L"home",  L"/opt/app",          L"${prop.home}", L"/opt/app/lib",
                                 L"ws",    L"C:/ws|C:/ws",       L"later",        L"x/opt/app",
                                 L"last",  L"x/opt/app",         L"none",         L""};
    for (size_t i = 0; i < props.v().size(); ++i) EXPECT_STREQ(props.v()[i], expected[i]) << i;
    EXPECT_EQ(props.v()[11], untouched);  // unchanged values keep their string

    std::vector<String> empty;
    replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", empty);
    EXPECT_TRUE(empty.empty());

    // A standard placeholder reaching the user pass through a later key fails.
    PropArray late{{L"a", L"${prop.b}"}, {L"b", L"${rcp.home}"}};
    ASSERT_TRUE(enableLogging(tmp.wpath()));
    EXPECT_EXIT(replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", late.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(rcptest::readText(tmp.sub("rcplauncher.log")).find("(${rcp.home})"), std::string::npos);
}

TEST_F(PlaceholdersTest, ArgumentVectorMarksChangedEntries) {
    rcptest::WArgs args{L"prog", L"-data", L"${rcp.data}/x", L"${env.HOME}", L"${rcp.home}"};
    wchar_t** argv = args.argv();
    wchar_t* original[5];
    for (int i = 0; i < 5; ++i) original[i] = argv[i];
    wchar_t* cargv[5] = {};
    replacePlaceholdersInArgv(L"\\ws", L"/opt\\app", argv, cargv, 5);
    const wchar_t* expected[] = {L"prog", L"-data", L"/ws/x", L"${env.HOME}", L"/opt/app"};
    for (int i = 0; i < 5; ++i) {
        EXPECT_STREQ(argv[i], expected[i]);
        ASSERT_NE(cargv[i], nullptr);
        const bool changed = i == 2 || i == 4;
        if (changed) {
            EXPECT_EQ(cargv[i], argv[i]);
            EXPECT_NE(argv[i], original[i]);
        } else {
            EXPECT_EQ(cargv[i][0], 0) << i;
            EXPECT_EQ(argv[i], original[i]);
        }
    }
    free(argv[2]);
    free(argv[4]);
}

}  // namespace
