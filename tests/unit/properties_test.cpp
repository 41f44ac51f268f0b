// Properties files: the reader's grammar and selections, the writer's
// escaping, "${...}" placeholders (and the bounds on their expansion) and
// "-config NAME" extensions.
#include "unit_support.h"

// The pairs the reader makes of text.
static Pairs read(const std::string& text) {
    TempDir tmp;
    writeText(tmp.sub("p"), text);
    Props array;
    getProperties(W(tmp.sub("p")), array);
    Pairs pairs;
    for (size_t i = 0; i + 1 < array.size(); i += 2) pairs.emplace_back(array[i], array[i + 1]);
    return pairs;
}

TEST(PropertiesTest, Grammar) {
    resetState();
    const std::pair<std::string, Pairs> cases[] = {
        {"a = 1\nb:2\nc 3\nd==4\ne\t5\n", {{L"a", L"1"}, {L"b", L"2"}, {L"c", L"3"}, {L"d", L"4"}, {L"e", L"5"}}},
        {"-Xmx=512m\n-Xb/a:x\n-Xss512k\n", {{L"-Xmx", L"=512m"}, {L"-Xb/a", L":x"}, {L"-Xss512k", L""}}},
        {"-Xa=b\\\n=c\nf b=c\nt=a\\tb\n", {{L"-Xa", L"=b=c"}, {L"f", L"b=c"}, {L"t", L"atb"}}},
        {"p=c:\\\\d\nu=\\u0041\\u41xyz\\u00e9\\u-001\n", {{L"p", L"c:\\d"}, {L"u", L"AAz\u00e9\xffff"}}},
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

TEST(PropertiesTest, SelectionsGrowAndStopAtAnEmptyKey) {
    Props props;  // p.0=0 q.0=1 p.1=2 ... q.19=39, then an empty key that hides what follows
    for (int i = 0; i < 40; ++i) props.add({{(i % 2 ? L"q." : L"p.") + std::to_wstring(i / 2), std::to_wstring(i)}});
    props.add({{L"", L""}, {L"p.x", L"hidden"}});
    String* sel = findProperties(L"p.", props);
    size_t n = 0;
    while (sel[n][0] != 0) n += 2;
    EXPECT_EQ(n, 40u);
    EXPECT_EQ(std::wstring(sel[1]) + L" " + sel[39], L"0 38");
    free(sel);
}

TEST(PropertiesTest, WriterEscapes) {
    const std::tuple<std::wstring, std::wstring, std::wstring> cases[] = {  // text, as value, as key
        {L"=: a:b ", L"\\=\\: a\\:b ", L"\\=\\:\\ a\\:b\\ "}, {L"c:\\d #!", L"c\\:\\\\d \\#\\!", L"c\\:\\\\d\\ \\#\\!"},
        {std::wstring(L"\t\r\0~\x7f", 5), L"\\u0009\\u000d\\u0000~\\u007f", L"\\u0009\\u000d\\u0000~\\u007f"},
        {L"\u00e9\xd800\U0001F600", L"\\u00e9\\ud800\\uf600", L"\\u00e9\\ud800\\uf600"},  // the low 16 bits
    };
    for (const auto& [text, value, key] : cases) {
        std::wstring line = L"kept";  // appended to what is there
        convWcharTo8859_1(text, text, line);
        EXPECT_EQ(line, L"kept" + key + L"=" + value);
    }
}

TEST(PropertiesTest, Placeholders) {
    setenv("RCPT_PH", "${prop.b}", 1);
    Props props{{L"a", L"${prop.b}"}, {L"b", L"z"}, {L"p", L"${prop.p}"}, {L"e", L""},
                {L"d", L"$"},          {L"q", L"q${prop.q}"}, {L"b", L"second"}};
    const std::tuple<std::wstring, bool, std::wstring> user[] = {
        {L"${prop.a}|${prop.b}", true, L"z|z"}, {L"${env.RCPT_PH}${prop.e}", true, L"z"},
        {L"$ {x} $x{y}", true, L"$ {x} $x{y}"}, {L"${env.RCPT_UNSET}/x", false, L"${env.RCPT_UNSET}/x"},
        {L"${rcp.home}${ENV.RCPT_PH}", false, L"${rcp.home}${ENV.RCPT_PH}"},
        {L"${abc", false, L"${ab}"}, {L"x${", false, L"x${}"}, {L"${prop.d}{x}", false, L"${}{x}"},
        {L"${prop.b}${prop.missing}", false, L"z${prop.missing}"},          // left of a failure: expanded
        {L"${prop.a}${prop.missing}", false, L"${prop.b}${prop.missing}"},  // inserted after it: not
        {L"${prop.p}", false, L"${prop.p}"}, {L"${prop.q}", false, L"qqqqqqqqqqq${prop.q}"},  // the tenth round stops
    };
    // (the pair is made once the call has changed s)
    for (auto [s, ok, out] : user) EXPECT_EQ(std::make_pair(replaceUserPlaceholders(s, props), s), std::make_pair(ok, out));
    Props tree{{L"a8", L"x"}};  // values that multiply: a0 ... a7 each hold 60 copies of the next one
    for (int i = 0; i < 8; ++i) {
        std::wstring copies;
        for (int k = 0; k < 60; ++k) copies += L"${prop.a" + std::to_wstring(i + 1) + L"}";
        tree.add({{L"a" + std::to_wstring(i), copies}});
    }
    std::wstring runaway = L"${prop.a0}";
    EXPECT_FALSE(replaceUserPlaceholders(runaway, tree));
    EXPECT_LE(runaway.size(), 300000u);
    Props copies{{L"a0", std::wstring(100000, L'a')}};  // 4,000 copies of one large value
    for (int i = 1; i <= 4000; ++i) copies.add({{L"a" + std::to_wstring(i), L"${prop.a0}"}});
    // the expansion of a launch's installation properties is bounded as a whole, the quoted value cut
    expectFatal({{[&] { replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", copies); },
                  "RLNCH0088E: property substitution is invalid (" + std::string(256, 'a') + "...) : "}});
}

TEST(PropertiesTest, ConfigExtensions) {
    // "-config" after "-vmargs": the insertion point comes out two places early, but never before the program. An
    // empty entry keeps the numbering, a gap ends it; the command line's own "-vmargs" makes the extension's one go,
    // and of two "-vm" words the second goes.
    Props props{{L"config.x.1", L"-a"},  {L"config.x.2", L""},  {L"config.x.3", L"-vmargs"},
                {L"config.x.4", L"-vm"}, {L"config.x.5", L"-X"}, {L"config.x.7", L"after a gap"}};
    Strings argv{L"p", L"-vmargs", L"-vm", L"-config", L"x"}, newargs;
    int cargc = 0;
    wchar_t** cargv = nullptr;
    std::vector<wchar_t*> av(argv.size() + 1);  // closed by a null pointer
    for (size_t i = 0; i < argv.size(); i++) av[i] = &argv[i][0];
    EXPECT_TRUE(addConfigExtentionsToArg(&cargc, &cargv, 5, av.data(), props, newargs));
    EXPECT_EQ(Strings(cargv, cargv + cargc), (Strings{L"p", L"-a", L"-vmargs", L"-vm", L"-X"}));
    free(cargv);
}
