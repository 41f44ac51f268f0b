// Arbitrary text through placeholder expansion, against a properties array
// that holds self-references, chains, a value that doubles at every step and
// unresolvable keys: a text without placeholders stays as it is, and both
// kinds together equal the two passes one after the other, wherever the user
// pass succeeds (a failure there ends the launch).
//
// Input: one flags byte, then the text (bytes as characters, NUL included); a
// 0x01 byte starts the installation directory, a second one the workspace.
#include "fuzz_common.h"

// For the whole run; held through a pointer, so never reported as a leak.
static std::vector<String>* props = new std::vector<String>;

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    for (const wchar_t* s : {L"a", L"${prop.b}", L"b", L"${env.HOME}", L"p", L"${prop.p}", L"q", L"q${prop.q}", L"e",
                             L"", L"d", L"$", L"f", L"${prop.f}${prop.f}${rcp.home}"})
        props->push_back(copyString(s));
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    resetLoggingForTest();  // debug output writes a line per step: only for small inputs
    setDebug(size > 0 && size < 512 && (data[0] & 1));
    std::wstring parts[3];  // the text, the installation directory, the workspace
    for (size_t i = 1, part = 0; i < size; ++i) {
        if (data[i] == 0x01 && part < 2)
            ++part;
        else
            parts[part] += static_cast<wchar_t>(data[i]);
    }
    const std::wstring &text = parts[0], &home = parts[1], &ws = parts[2];
    std::wstring user = text, std1 = text, all = text;
    FUZZ_CHECK((replaceUserPlaceholders(user, *props) && user == text) || text.find(L"${") != std::wstring::npos);
    const bool stdChanged = replaceStdPlaceholders(ws, home, std1);
    std::wstring both = std1;
    FUZZ_CHECK(stdChanged || std1 == text);
    if (replaceUserPlaceholders(both, *props))
        FUZZ_CHECK(replaceAllPlaceholders(ws, home, all, *props) == (both != std1 || stdChanged) && all == both);
    return 0;
}
