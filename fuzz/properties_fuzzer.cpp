// Arbitrary bytes as a properties file: the reader must neither crash nor
// hang (nor read or write out of bounds), and every value it returns must
// survive the writer: escaped by the writer under a plain key and read again,
// it comes back the same (readBack), when every written line fits the
// reader's line limit and no character lies beyond U+FFFF. (Keys are not read back: the launcher writes only plain ones, and
// its reader, unlike the platform's, takes no escapes in a key.)
#include <clocale>
#include <fstream>

#include "fuzz_common.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    setlocale(LC_CTYPE, rcptest::utf8Locale());
    resetLoggingForTest();  // with debug output, which quotes every key and value
    std::ofstream("p.properties", std::ios::binary) << std::string(reinterpret_cast<const char*>(data), size);
    std::vector<String> props, again;
    getProperties(L"p.properties", props);
    std::vector<std::wstring> expected;  // k0, the first value as read back, k1, ...
    std::wstring written;
    bool comparable = true;
    for (size_t i = 1; i < props.size(); i += 2) {
        const std::wstring key = L"k" + std::to_wstring(i / 2), value = props[i];
        const size_t start = written.size();
        convWcharTo8859_1(key, value, written);
        // The writer keeps the low 16 bits of a character beyond U+FFFF.
        comparable = comparable && written.size() - start <= 2024 &&
                     std::all_of(value.begin(), value.end(), [](wchar_t c) { return c <= 0xffff; });
        written += L"\n";
        expected.insert(expected.end(), {key, readBack(value)});
    }
    std::ofstream("again.properties", std::ios::binary) << std::string(written.begin(), written.end());
    getProperties(L"again.properties", again);
    FUZZ_CHECK(!comparable || expected == std::vector<std::wstring>(again.begin(), again.end()));
    freeProperties(props);
    freeProperties(again);
    return 0;
}
