// "${...}" expansion: standard placeholders, user placeholders from the
// environment and the properties array, and the failure semantics.
#include <gtest/gtest.h>

#include <cstdlib>

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
    std::string log() { return rcptest::readText(tmp.sub("rcplauncher.log")); }
    rcptest::TempDir tmp;
};

TEST_F(PlaceholdersTest, StandardPlaceholders) {
    struct Case {
        std::wstring in, out;
    } cases[] = {
        {L"${rcp.home}/p:${rcp.home}", L"/opt/p:/opt"},
        {L"${workspace.location}/x;${rcp.data}", L"/ws/x;/ws"},
        {L"$rcp.home {rcp.home} ${rcp.home", L"$rcp.home {rcp.home} ${rcp.home"},
    };
    for (const auto& c : cases) {
        std::wstring s = c.in;
        EXPECT_EQ(replaceStdPlaceholders(L"/ws", L"/opt", s), c.in != c.out);
        EXPECT_EQ(s, c.out);
    }
    std::wstring s = L"${rcp.home}|${rcp.data}";  // paths holding placeholders are inserted once
    EXPECT_TRUE(replaceStdPlaceholders(L"}${rcp.data", L"/d/${rcp.home}", s));
    EXPECT_EQ(s, L"/d/${rcp.home}|}${rcp.data");
}

TEST_F(PlaceholdersTest, FindLastPlaceholderAtTheEdges) {
    struct Case {
        std::wstring text;
        size_t lastIndex, index, numchars;
        std::wstring key;
    } cases[] = {
        {L"", 0, npos, 99, L"-"},   {L"", npos, npos, 99, L"-"},   {L"$", 0, npos, 99, L"-"},
        {L"x${", 0, npos, 99, L"-"}, {L"x${", 2, 1, 2, L""},        {L"${", 0, 0, 1, L""},
        {L"a${b}", 4, 1, 4, L"b"},  {L"${abc", 4, 0, 5, L"ab"},    {L"${abc", npos, 0, 5, L"ab"},
        {L"${a}${b}", 7, 4, 4, L"b"}, {L"${a}${b}", 3, 0, 4, L"a"}, {L"${a}x}", 2, 0, 3, L""},
    };
    for (const auto& c : cases) {
        size_t numchars = 99;
        std::wstring key = L"-";
        EXPECT_EQ(findLastPlaceholder(c.text, c.lastIndex, numchars, key), c.index) << rcptest::narrow(c.text);
        EXPECT_EQ(numchars, c.numchars) << rcptest::narrow(c.text);
        EXPECT_EQ(key, c.key) << rcptest::narrow(c.text);
    }
}

TEST_F(PlaceholdersTest, UserPlaceholders) {
    PropArray props{{L"a", L"${prop.b}"}, {L"b", L"z"}, {L"p", L"${prop.p}"}, {L"e", L""},
                    {L"d", L"$"},          {L"q", L"q${prop.q}"}, {L"b", L"second"}};
    struct Case {
        std::wstring in;
        bool ok;
        std::wstring out;
    } cases[] = {
        {L"${prop.a}|${prop.b}", true, L"z|z"},
        {L"${env.RCPT_SET}/x${env.RCPT_EMPTY}", true, L"/home/u/x"},
        {L"${env.RCPT_PH}${prop.e}", true, L"z"},
        {L"$ {x} $x{y}", true, L"$ {x} $x{y}"},
        {L"", true, L""},
        {L"${env.RCPT_UNSET}/x", false, L"${env.RCPT_UNSET}/x"},
        {L"${rcp.home}${ENV.RCPT_SET}", false, L"${rcp.home}${ENV.RCPT_SET}"},
        {L"${abc", false, L"${ab}"},
        {L"x${", false, L"x${}"},
        {L"${prop.d}{x}", false, L"${}{x}"},
        {L"${prop.b}${prop.missing}", false, L"z${prop.missing}"},          // left of a failure: expanded
        {L"${prop.a}${prop.missing}", false, L"${prop.b}${prop.missing}"},  // inserted after it: not
        {L"${prop.p}", false, L"${prop.p}"},                                // self-references stop on
        {L"${prop.q}", false, L"qqqqqqqqqqq${prop.q}"},                     // the tenth repetition
    };
    for (const auto& c : cases) {
        std::wstring s = c.in;
        EXPECT_EQ(replaceUserPlaceholders(s, props.v()), c.ok) << rcptest::narrow(c.in);
        EXPECT_EQ(s, c.out) << rcptest::narrow(c.in);
    }
}

TEST_F(PlaceholdersTest, MultiplyingValuesAreBounded) {
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
        std::wstring s = L"${prop.a0}";
        EXPECT_EQ(replaceUserPlaceholders(s, tree.v()), fan == 2);
        EXPECT_EQ(s.size() == 256, fan == 2);
        EXPECT_LE(s.size(), 300000u);
    }
}

TEST_F(PlaceholdersTest, FailureEndsTheLaunch) {
    PropArray props{{L"b", L"z"}};
    std::wstring s = L"${rcp.home}/${prop.b}";
    EXPECT_TRUE(replaceAllPlaceholders(L"/ws", L"/opt", s, props.v()));
    EXPECT_EQ(s, L"/opt/z");
    ASSERT_TRUE(enableLogging(tmp.wpath()));
    s = L"${prop.b}-${env.RCPT_UNSET}";
    EXPECT_EXIT(replaceAllPlaceholders(L"/ws", L"/opt", s, props.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("RLNCH0088E: property substitution is invalid (z-${env.RCPT_UNSET}) : "), npos) << log();
    // a standard placeholder that arrives through a later key is a user key
    PropArray late{{L"a", L"${prop.b}"}, {L"b", L"${rcp.home}"}};
    EXPECT_EXIT(replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", late.v()), ::testing::ExitedWithCode(255), "");
    EXPECT_NE(log().find("invalid (${rcp.home})"), npos) << log();
}

TEST_F(PlaceholdersTest, InstallationPropertiesExpandInArrayOrder) {
    PropArray props{{L"home", L"${rcp.home}"}, {L"${prop.home}", L"${prop.home}/lib"},
                    {L"ws", L"${rcp.data}|${workspace.location}"}, {L"later", L"${prop.last}"},
                    {L"last", L"x${prop.home}"}, {L"none", L""}};
    String untouched = props.v()[11];
    replacePlaceholdersInRcpInstallProp(L"C:\\ws", L"\\opt", props.v());
    const wchar_t* expected[] = {L"home", L"/opt",        L"${prop.home}", L"/opt/lib", L"ws",   L"C:/ws|C:/ws",
                                 L"later", L"x/opt", L"last",         L"x/opt",    L"none", L""};
    for (size_t i = 0; i < props.v().size(); ++i) EXPECT_STREQ(props.v()[i], expected[i]) << i;
    EXPECT_EQ(props.v()[11], untouched);
}

TEST_F(PlaceholdersTest, ArgumentVectorMarksChangedEntries) {
    rcptest::WArgs args{L"prog", L"${rcp.data}/x", L"${env.HOME}", L"${rcp.home}"};
    wchar_t** argv = args.argv();
    std::vector<wchar_t*> original(argv, argv + 4), cargv(4, nullptr);
    replacePlaceholdersInArgv(L"\\ws", L"/opt\\app", argv, cargv.data(), 4);
    const wchar_t* expected[] = {L"prog", L"/ws/x", L"${env.HOME}", L"/opt/app"};
    for (int i = 0; i < 4; ++i) {
        EXPECT_STREQ(argv[i], expected[i]);
        const bool changed = i % 2 == 1;
        EXPECT_EQ(argv[i] != original[i], changed);
        EXPECT_EQ(cargv[i] == argv[i], changed);
        if (!changed) {
            EXPECT_EQ(cargv[i][0], 0) << i;
        }
    }
    // The expanded copies belong to the placeholder module for the whole run.
}

}  // namespace
