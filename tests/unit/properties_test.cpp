// Properties files: the reader's grammar and look-ups, the line functions of
// the per-user copy, the writer's escaping, "${...}" placeholders, the install
// configuration and "-config NAME" extensions.
#include <cstdlib>

#include "unit_support.h"

namespace {

using Pairs = std::vector<std::pair<std::wstring, std::wstring>>;

class PropertiesTest : public ::testing::Test {
protected:
    void SetUp() override {
        resetState();
        setenv("RCPT_SET", "/home/u", 1);
        setenv("RCPT_EMPTY", "", 1);
        setenv("RCPT_PH", "${prop.b}", 1);
        unsetenv("RCPT_UNSET");
    }
    Pairs read(const std::string& text) {
        writeText(tmp.sub("p"), text);
        std::vector<String> array;
        getProperties(tmp.wsub("p"), array);
        Pairs pairs;
        for (size_t i = 0; i + 1 < array.size(); i += 2) pairs.emplace_back(array[i], array[i + 1]);
        freeProperties(array);
        return pairs;
    }
    TempDir tmp;
};

TEST_F(PropertiesTest, Grammar) {
    const std::pair<std::string, Pairs> cases[] = {
        {"a = 1\nb:2\nc 3\nd==4\ne\t5\nf b=c\n",
         {{L"a", L"1"}, {L"b", L"2"}, {L"c", L"3"}, {L"d", L"4"}, {L"e", L"5"}, {L"f", L"b=c"}}},
        {"-Xmx=512m\n-Xbootclasspath/a:x\n-Xss512k\n", {{L"-Xmx", L"=512m"}, {L"-Xbootclasspath/a", L":x"}, {L"-Xss512k", L""}}},
        {"-Xa=b\\\n=c\nk=v\n", {{L"-Xa", L"=b=c"}, {L"k", L"v"}}},
        {"p=c:\\\\dir\nu=\\u0041\\u41xyz\\u00e9\nt=a\\tb\n", {{L"p", L"c:\\dir"}, {L"u", L"AAz\u00e9"}, {L"t", L"atb"}}},
        {"n=ab\\u0000cd\nk\\=b=c\nv=x\\:y\\=z\nh=\\#x\nmy\\ key=v\n",
         {{L"n", L"ab"}, {L"k", L"b=c"}, {L"v", L"x:y=z"}, {L"h", L"#x"}, {L"my", L"key=v"}}},
        {"#k=v\n!k=v\nx=a\\\n#c\n  b\nab\\\ncd=x\n", {{L"!k", L"v"}, {L"x", L"ab"}, {L"abcd", L"x"}}},
        {"k=a\\\\\nj=1\nc=a\\\n", {{L"k", L"a\\"}, {L"j", L"1"}}},  // a continuation at the end is lost
        {"k=v\r\nb=v  \nt=v\t\n=x\nlonely\n\n\t j = w",
         {{L"k", L"v\r"}, {L"b", L"v"}, {L"t", L"v\t"}, {L"", L"x"}, {L"lonely", L""}, {L"j", L"w"}}},
        {"k=1\nk=2\nk=caf\xc3\xa9\n", {{L"k", L"1"}, {L"k", L"2"}, {L"k", L"caf\u00e9"}}},
        {"k=" + std::string(3000, 'a') + "\n", {{L"k", std::wstring(2022, L'a')}, {std::wstring(978, L'a'), L""}}},
    };
    for (const auto& [text, expected] : cases) EXPECT_EQ(read(text), expected) << text;
}

TEST_F(PropertiesTest, LookUps) {
    PropArray props;  // q.0=0 p.0=1 q.1=2 ... p.19=39 p.0=last
    for (int i = 0; i < 40; ++i) addProps(props, {{(i % 2 ? L"p." : L"q.") + std::to_wstring(i / 2), std::to_wstring(i)}});
    addProps(props, {{L"p.0", L"last"}});
    EXPECT_STREQ(findProperty(L"p.0", props.v()), L"1");  // the first occurrence wins
    EXPECT_EQ(findProperty(L"p.", props.v()), nullptr);
    String* sel = findProperties(L"p.", props.v());  // grows past its first entries
    for (int i = 0; i < 20; ++i) EXPECT_STREQ(sel[2 * i + 1], std::to_wstring(2 * i + 1).c_str());
    EXPECT_EQ(std::wstring(sel[40]) + sel[42], L"p.0");
    free(sel);
    props.v()[20][0] = 0;  // an empty key hides every later pair from the selection
    sel = findProperties(L"", props.v());
    EXPECT_EQ(std::wstring(sel[18]) + sel[20], L"p.4");
    free(sel);
}

TEST_F(PropertiesTest, ValueFilterAndPlatformKeys) {
    const std::pair<std::wstring, std::wstring> filters[] = {
        {L"  a\\\\b  ", L"a\\b"}, {L"\\u005c\\u005cu0041", L"\\\\u0041"}, {L"\\u12", L"\x12"}, {L"\\u", std::wstring(1, 0)},
        {L"\\u-001", L"\xffff"},  {L"\\x\\", L"x"},  {L"   ", L"   "},  {L"\ta\t", L"\ta\t"}};
    for (auto [in, out] : filters) {
        FilterValue(in);
        EXPECT_EQ(in, out);
    }
    const std::tuple<std::wstring, bool, std::wstring> platforms[] = {
        {L"  a.b.macosx=1", false, L"a.b=1"}, {L"a.macosxfoo:1", false, L"a:1"},  {L"a.b.linux=1", true, L"a.b.linux=1"},
        {L".win32 x", true, L".win32 x"},     {L" -Da.linux=1", false, L"-Da.linux=1"}, {L"a=b.linux", false, L"a=b.linux"},
        {L"a.mac=1", false, L"a.mac=1"},      {L"=x.linux", false, L"=x.linux"}};
    for (auto [line, drop, out] : platforms) {
        EXPECT_EQ(processFilterKey(line), drop) << narrow(out);
        EXPECT_EQ(line, out);
    }
}

TEST_F(PropertiesTest, WriterEscapesAndReadsBack) {
    const std::tuple<std::wstring, std::wstring, std::wstring> cases[] = {  // text, as value, as key
        {L"a=b:c", L"a\\=b\\:c", L"a\\=b\\:c"}, {L"my #!", L"my \\#\\!", L"my\\ \\#\\!"}, {L"c:\\d", L"c\\:\\\\d", L"c\\:\\\\d"},
        {std::wstring(L"\t\r\0~\x7f", 5), L"\\u0009\\u000d\\u0000~\\u007f", L"\\u0009\\u000d\\u0000~\\u007f"},
        {L"\u00e9\u4e2d\U0001F600", L"\\u00e9\\u4e2d\\uf600", L"\\u00e9\\u4e2d\\uf600"},  // low 16 bits only
    };
    for (const auto& [in, value, key] : cases) {
        std::wstring v = L"kept", k = L"kept", line;  // appended to what is there
        EXPECT_TRUE(convWcharTo8859_1_Value(in, v) == in.length() && convWcharTo8859_1_Key(in, k) == in.length());
        EXPECT_EQ(v + k, L"kept" + value + L"kept" + key);
        convWcharTo8859_1(in, in, line);
        EXPECT_EQ(line, key + L"=" + value);
    }
    std::wstring hex = L"u";
    addHexDigits(hex, 0x1234567u);  // the low 16 bits, appended
    EXPECT_EQ(hex, L"u4567");
    // What the grammar takes away: separators before the value, blanks after it, everything from a NUL on.
    const std::pair<std::wstring, std::wstring> back[] = {
        {L"\\\\s\\", L"\\\\s\\"}, {L"#!=:\\u0041\t\u00e9\r\n", L"#!=:\\u0041\t\u00e9\r\n"},
        {L"\xd800\xffff", L"\xd800\xffff"}, {L"=: x  ", L"x"}, {std::wstring(L"a\0b", 3), L"a"}};
    for (const auto& [written, expected] : back) {
        std::wstring line;
        convWcharTo8859_1(L"k", written, line);
        EXPECT_EQ(read(narrow(line) + "\n"), (Pairs{{L"k", expected}})) << narrow(line);
    }
}

TEST_F(PropertiesTest, Placeholders) {
    const std::pair<std::wstring, std::wstring> standard[] = {
        {L"${rcp.home}/p:${rcp.home}", L"/opt/p:/opt"}, {L"${workspace.location}/x;${rcp.data}", L"/ws/x;/ws"},
        {L"$rcp.home {rcp.home} ${rcp.home", L"$rcp.home {rcp.home} ${rcp.home"}};
    for (const auto& [in, out] : standard) {
        std::wstring s = in;
        EXPECT_EQ(replaceStdPlaceholders(L"/ws", L"/opt", s), in != out);
        EXPECT_EQ(s, out);
    }
    std::wstring once = L"${rcp.home}|${rcp.data}";  // paths holding placeholders are inserted once
    EXPECT_TRUE(replaceStdPlaceholders(L"}${rcp.data", L"/d/${rcp.home}", once));
    EXPECT_EQ(once, L"/d/${rcp.home}|}${rcp.data");

    PropArray props{{L"a", L"${prop.b}"}, {L"b", L"z"}, {L"p", L"${prop.p}"}, {L"e", L""},
                    {L"d", L"$"},          {L"q", L"q${prop.q}"}, {L"b", L"second"}};
    const std::tuple<std::wstring, bool, std::wstring> user[] = {
        {L"${prop.a}|${prop.b}", true, L"z|z"}, {L"${env.RCPT_SET}/x${env.RCPT_EMPTY}", true, L"/home/u/x"},
        {L"${env.RCPT_PH}${prop.e}", true, L"z"}, {L"$ {x} $x{y}", true, L"$ {x} $x{y}"},
        {L"${env.RCPT_UNSET}/x", false, L"${env.RCPT_UNSET}/x"}, {L"${rcp.home}${ENV.RCPT_SET}", false, L"${rcp.home}${ENV.RCPT_SET}"},
        {L"${abc", false, L"${ab}"}, {L"x${", false, L"x${}"}, {L"${prop.d}{x}", false, L"${}{x}"},
        {L"${prop.b}${prop.missing}", false, L"z${prop.missing}"},          // left of a failure: expanded
        {L"${prop.a}${prop.missing}", false, L"${prop.b}${prop.missing}"},  // inserted after it: not
        {L"${prop.p}", false, L"${prop.p}"}, {L"${prop.q}", false, L"qqqqqqqqqqq${prop.q}"},  // loops stop on the tenth round
    };
    for (auto [s, ok, out] : user) {
        EXPECT_EQ(replaceUserPlaceholders(s, props.v()), ok) << narrow(out);
        EXPECT_EQ(s, out);
    }
    for (int fan : {2, 60}) {  // values that multiply stay bounded
        PropArray tree{{L"a8", L"x"}};
        for (int i = 0; i < 8; ++i) {
            std::wstring next;
            for (int k = 0; k < fan; ++k) next += L"${prop.a" + std::to_wstring(i + 1) + L"}";
            addProps(tree, {{L"a" + std::to_wstring(i), next}});
        }
        std::wstring s = L"${prop.a0}";
        EXPECT_EQ(replaceUserPlaceholders(s, tree.v()), fan == 2);
        EXPECT_EQ(s.size() == 256, fan == 2);
        EXPECT_LE(s.size(), 300000u);
    }
}

TEST_F(PropertiesTest, PlaceholdersInTheInstallationPropertiesAndTheArguments) {
    PropArray props{{L"home", L"${rcp.home}"}, {L"${prop.home}", L"${prop.home}/lib"},
                    {L"ws", L"${rcp.data}|${workspace.location}"}, {L"later", L"${prop.last}"},
                    {L"last", L"x${prop.home}"}, {L"none", L""}};
    String untouched = props.v()[11];
    replacePlaceholdersInRcpInstallProp(L"C:\\ws", L"\\opt", props.v());  // in array order
    const Strings expected = {L"home", L"/opt",  L"${prop.home}", L"/opt/lib", L"ws",   L"C:/ws|C:/ws",
                              L"later", L"x/opt", L"last",        L"x/opt",    L"none", L""};
    EXPECT_EQ(Strings(props.v().begin(), props.v().end()), expected);
    EXPECT_EQ(props.v()[11], untouched);

    WArgs args{L"prog", L"${rcp.data}/x", L"${env.HOME}", L"${rcp.home}"};
    std::vector<wchar_t*> original(args.argv(), args.argv() + 4), cargv(4, nullptr);
    replacePlaceholdersInArgv(L"\\ws", L"/opt\\app", args.argv(), cargv.data(), 4);
    EXPECT_EQ(Strings(args.argv(), args.argv() + 4), (Strings{L"prog", L"/ws/x", L"${env.HOME}", L"/opt/app"}));
    for (int i = 0; i < 4; ++i) {  // changed entries are marked in cargv, the others hold ""
        EXPECT_EQ(args.argv()[i] != original[i], i % 2 == 1);
        EXPECT_TRUE(i % 2 ? cargv[i] == args.argv()[i] : cargv[i][0] == 0) << i;
    }

    PropArray b{{L"b", L"z"}}, late{{L"a", L"${prop.b}"}, {L"b", L"${rcp.home}"}}, copies{{L"a0", std::wstring(100000, L'a')}};
    for (int i = 1; i <= 4000; ++i) addProps(copies, {{L"a" + std::to_wstring(i), L"${prop.a0}"}});
    std::wstring s = L"${prop.b}-${env.RCPT_UNSET}";
    std::vector<String> none;
    expectFatal({
        {[&] { getProperties(tmp.wsub("absent"), none); }, "RLNCH0014E: Unable to load " + tmp.sub("absent") + " file! : "},
        {[&] { replaceAllPlaceholders(L"/ws", L"/opt", s, b.v()); },
         "RLNCH0088E: property substitution is invalid (z-${env.RCPT_UNSET}) : "},
        // a standard placeholder that arrives through a later key is a user key
        {[&] { replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", late.v()); }, "invalid (${rcp.home})"},
        // many copies of one large value: the whole launch's expansion is bounded, the line cut
        {[&] { replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", copies.v()); },
         "RLNCH0088E: property substitution is invalid (" + std::string(256, 'a') + "...) : "},
    });
}

TEST_F(PropertiesTest, InstallConfiguration) {
    const std::tuple<const char*, installCfg, bool> cases[] = {  // a missing key: the default, with a message
        {"a=b\n", user, false}, {"install.configuration=lockdown\n", lockdown, true},
        {"install.configuration=\n", undefined, false}, {"install.configuration = user  \n", user, false},
        {"install.configuration=user\t\n", undefined, false}, {"install.configuration=Lockdown\n", undefined, false},
        {"install.configuration=service\ninstall.configuration=user\n", service, false}};
    for (const auto& [file, cfg, isLockdown] : cases) {
        PropArray props;
        addProps(props, read(file));
        for (bool muservice : {false, true}) {
            resetLoggingForTest();
            IS_LOCKDOWN = !isLockdown;
            EXPECT_TRUE(SetInstallConfiguration(props.v(), muservice));
            EXPECT_EQ(eConfig, muservice ? multiuser_service : cfg) << file;
            EXPECT_EQ(isLockdownConfig(), isLockdown) << file;
            EXPECT_EQ(getLogQueue().find("RLNCH0041I: Missed install configuration") != std::string::npos, file[0] == 'a');
        }
    }
}

TEST_F(PropertiesTest, ConfigExtensions) {
    const std::tuple<Strings, Strings, Strings> cases[] = {  // argv, config.x.1, .2, ..., result
        {{L"a", L"-config", L"x", L"b", L"-vmargs", L"v"}, {L"-foo", L"-vmargs", L"-Xmx1g"},
         {L"a", L"b", L"-foo", L"-vmargs", L"v", L"-Xmx1g"}},
        {{L"p", L"-config", L"x", L"-vmargs", L"v"}, {L"-a", L"", L"-b"}, {L"p", L"-a", L"-b", L"-vmargs", L"v"}},
        {{L"p", L"-config", L"x", L"b"}, {L"-foo", L"-vmargs", L"-X"}, {L"p", L"b", L"-foo", L"-vmargs", L"-X"}},
        // "-config" after "-vmargs": the insertion point is two places early, never before the program
        {{L"p", L"a", L"b", L"-vmargs", L"v", L"-config", L"x"}, {L"-foo"}, {L"p", L"-foo", L"a", L"b", L"-vmargs", L"v"}},
        {{L"p", L"a", L"-vmargs", L"-config", L"x"}, {L"-foo"}, {L"p", L"-foo", L"a", L"-vmargs"}},
        {{L"p", L"-vmargs", L"-config", L"x"}, {L"-foo", L"-bar"}, {L"p", L"-foo", L"-bar", L"-vmargs"}},
        // the command line's own "-vmargs" makes the extension's one go
        {{L"p", L"-vmargs", L"v", L"-config", L"x"}, {L"-vmargs", L"-Xmx1g"}, {L"p", L"-vmargs", L"v", L"-Xmx1g"}},
        // a second option word goes, its value stays; "-personality" is removed twice
        {{L"p", L"-data", L"d1", L"-config", L"x"}, {L"-data", L"d2", L"-nl", L"de"}, {L"p", L"-data", L"d1", L"d2", L"-nl", L"de"}},
        {{L"p", L"-personality", L"1", L"-config", L"x"}, {L"-personality", L"2", L"-personality", L"3", L"-vm", L"-vm", L"-vm"},
         {L"p", L"-personality", L"1", L"2", L"3", L"-vm", L"-vm"}},
        {{L"p", L"-config", L"none", L"-debug"}, {}, {L"p", L"-debug"}},
    };
    for (const auto& [argv, values, expected] : cases) {
        WArgs args(argv);
        PropArray props{{L"config.x.10", L"-ten"}, {L"config.y.1", L"-y"}};
        for (size_t j = 0; j < values.size(); ++j) addProps(props, {{L"config.x." + std::to_wstring(j + 1), values[j]}});
        addProps(props, {{L"config.x." + std::to_wstring(values.size() + 2), L"-gap"}});  // a gap ends the list
        int cargc = -1;
        wchar_t** cargv = nullptr;
        Strings newargs{L"stale"};
        ASSERT_TRUE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), props.v(), newargs));
        EXPECT_EQ(newargs, expected);
        ASSERT_EQ(cargc, static_cast<int>(newargs.size()));
        for (int i = 0; i < cargc; ++i) EXPECT_EQ(cargv[i], newargs[i].c_str());
        free(cargv);
    }
    for (const Strings& argv : {Strings{L"p"}, Strings{L"p", L"x", L"-config"}, Strings{L"-config", L"x"}}) {
        WArgs args(argv);  // nothing to merge: everything left as it was
        int cargc = 7;
        wchar_t** cargv = nullptr;
        Strings newargs{L"kept"};
        EXPECT_FALSE(addConfigExtentionsToArg(&cargc, &cargv, args.argc(), args.argv(), {}, newargs));
        EXPECT_TRUE(cargc == 7 && cargv == nullptr && newargs == Strings{L"kept"});
    }
}

}  // namespace
