// A value escaped for a properties file reads back as written, up to what
// the reader's grammar takes away on purpose: separators and blanks before
// the value, blanks after it, and everything from a NUL on.
//
// Input: UTF-16LE code units (every character up to U+FFFF).
#include <cstdint>
#include <cstring>
#include <cwchar>

#include "fuzz_common.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    rcpfuzz::resetLog(false);

    const std::wstring key = (size % 2) ? L"a.b.c" : L"k";
    std::wstring value;
    std::wstring line;
    convWcharTo8859_1(key, L"", line);
    const size_t prefix = line.length();
    for (size_t i = 0; i + 1 < size; i += 2) {
        const wchar_t c = static_cast<wchar_t>(data[i] | (data[i + 1] << 8));
        std::wstring escaped;
        convWcharTo8859_1_Value(std::wstring(1, c), escaped);
        if (line.length() + escaped.length() > rcpfuzz::MAX_LINE) break;
        line += escaped;
        value += c;
    }
    {
        // Escaping the whole value gives the same text as piece by piece.
        std::wstring whole;
        FUZZ_CHECK(convWcharTo8859_1_Value(value, whole) == value.length());
        FUZZ_CHECK(prefix + whole.length() == line.length() && line.compare(prefix, std::wstring::npos, whole) == 0);
    }

    std::string text;
    for (wchar_t c : line) {
        FUZZ_CHECK(c >= 0x20 && c <= 0x7e);  // printable ASCII only
        text += static_cast<char>(c);
    }
    text += "\nnext=1\n";
    rcpfuzz::writeScratch(text.data(), text.size());

    std::vector<String> props;
    std::wstring path;
    chartowstr(rcpfuzz::scratchFile().c_str(), path);
    getProperties(path, props);
    FUZZ_CHECK(props.size() == 4);
    FUZZ_CHECK(key == props[0]);
    FUZZ_CHECK(rcpfuzz::expectedReadBack(value) == props[1]);
    FUZZ_CHECK(wcscmp(props[2], L"next") == 0 && wcscmp(props[3], L"1") == 0);
    freeProperties(props);
    return 0;
}
