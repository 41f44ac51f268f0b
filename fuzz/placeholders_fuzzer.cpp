// Arbitrary text through placeholder expansion, against a small properties
// array that holds self-references, chains, multiplying values and
// unresolvable keys. The text may hold any character, NUL included.
//
// Input: one flags byte, then the text; a 0x01 byte starts the installation
// directory, a second one the workspace.
#include <cstdint>
#include <cstdlib>
#include <cwchar>

#include "fuzz_common.h"

namespace {

const size_t npos = std::wstring::npos;

std::vector<String> makeArray() {
    std::vector<std::pair<std::wstring, std::wstring>> pairs = {
        {L"a", L"${prop.b}"},      {L"b", L"z"},
        {L"p", L"${prop.p}"},      {L"q", L"q${prop.q}"},
        {L"e", L""},               {L"d", L"$"},
        {L"w", L"${prop.missing}"}, {L"s", L"${rcp.home}"},
        {L"env", L"${env.RCP_FUZZ_PH}"},
    };
    std::wstring fan;
    for (int i = 0; i < 20; ++i) fan += L"${prop.f1}";
    pairs.push_back({L"f0", fan});
    for (wchar_t& c : fan) if (c == L'1') c = L'2';
    pairs.push_back({L"f1", fan});
    pairs.push_back({L"f2", L"xy"});
    std::vector<String> v;
    for (const auto& p : pairs) {
        v.push_back(copyString(p.first.c_str()));
        v.push_back(copyString(p.second.c_str()));
    }
    return v;
}

wchar_t decode(uint8_t b) {
    static const wchar_t high[] = {L'\0', L'\u00e9', L'\u4e2d', L'\U0001F600', L'\\', L'\t', L'\r', L'\n'};
    return b < 0x80 ? static_cast<wchar_t>(b) : high[b & 7];
}

void checkFind(const std::wstring& text, size_t lastIndex) {
    size_t numchars = 12345;
    std::wstring key = L"untouched";
    size_t at = findLastPlaceholder(text, lastIndex, numchars, key);
    if (at == npos) {
        FUZZ_CHECK(numchars == 12345 && key == L"untouched");
        return;
    }
    FUZZ_CHECK(!text.empty());
    FUZZ_CHECK(at <= lastIndex && at < text.length());
    FUZZ_CHECK(text.compare(at, 2, L"${") == 0);
    FUZZ_CHECK(numchars >= 1 && at + numchars <= text.length());
    FUZZ_CHECK(key.length() == (numchars > 2 ? numchars - 3 : 0));
}

}  // namespace

// Lives for the whole run (held through a pointer, so it is never reported as
// a leak at exit).
static std::vector<String>* props = nullptr;

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    props = new std::vector<String>(makeArray());
    setenv("RCP_FUZZ_SET", "/home/fuzz", 1);
    setenv("RCP_FUZZ_EMPTY", "", 1);
    setenv("RCP_FUZZ_PH", "${prop.a}${env.RCP_FUZZ_SET}", 1);
    unsetenv("RCP_FUZZ_UNSET");
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) return 0;
    const uint8_t flags = data[0];
    // Debug output makes every expansion step write a line; keep it to
    // small inputs so that the queue of one iteration stays small.
    rcpfuzz::resetLog((flags & 1) && size < 512);

    std::wstring parts[3];
    int part = 0;
    for (size_t i = 1; i < size; ++i) {
        if (data[i] == 0x01 && part < 2) {
            ++part;
            continue;
        }
        parts[part] += decode(data[i]);
    }
    const std::wstring& text = parts[0];
    const std::wstring& installDir = parts[1];
    const std::wstring& workspace = parts[2];

    // Index arithmetic at every edge.
    const size_t len = text.length();
    for (size_t idx : {size_t(0), size_t(1), len - 1, len, len + 1, npos, size_t(flags) % (len + 1)}) checkFind(text, idx);

    std::wstring value;
    getPlaceholderValue(text, value, *props);

    std::wstring user = text;
    const bool resolved = replaceUserPlaceholders(user, *props);
    if (text.find(L"${") == npos) FUZZ_CHECK(resolved && user == text);

    std::wstring std1 = text;
    const bool stdChanged = replaceStdPlaceholders(workspace, installDir, std1);
    FUZZ_CHECK(stdChanged || std1 == text);

    // Both kinds together equal the two passes one after the other; only call
    // it where the user pass succeeds (a failure there ends the launch).
    std::wstring both = std1;
    if (replaceUserPlaceholders(both, *props)) {
        std::wstring all = text;
        const bool modified = replaceAllPlaceholders(workspace, installDir, all, *props);
        FUZZ_CHECK(all == both);
        FUZZ_CHECK(modified == (stdChanged || both != std1));
    }

    // The text's words as an argument vector.
    std::vector<std::wstring> words;
    size_t from = 0;
    while (from <= len && words.size() < 16) {
        size_t blank = text.find(L' ', from);
        if (blank == npos) blank = len;
        words.push_back(text.substr(from, blank - from));
        from = blank + 1;
    }
    std::vector<wchar_t*> argv, cargv(words.size(), nullptr);
    for (std::wstring& w : words) argv.push_back(&w[0]);
    replacePlaceholdersInArgv(workspace, installDir, argv.data(), cargv.data(), static_cast<int>(argv.size()));
    for (size_t i = 0; i < argv.size(); ++i) {
        FUZZ_CHECK(cargv[i] != nullptr);
        if (argv[i] != &words[i][0]) {
            // changed (the result may be empty when a path was)
            FUZZ_CHECK(cargv[i] == argv[i]);
        } else {
            FUZZ_CHECK(cargv[i][0] == 0);
        }
    }

    releaseExpandedArgs();
    rcpfuzz::resetLog(false);
    return 0;
}
