// Arbitrary bytes as a properties file: the reader must neither crash nor
// hang, and the array it builds must answer look-ups consistently.
#include <clocale>
#include <cstdint>
#include <cstring>
#include <cwchar>
#include <unordered_map>

#include "fuzz_common.h"

namespace {

void checkLineFunctions(const std::wstring& line) {
    isComment(line);
    isContinuationLine(line);

    std::wstring value = line;
    FilterValue(value);
    FUZZ_CHECK(value.length() <= line.length());

    std::wstring key = line;
    FilterProp(key);
    FUZZ_CHECK(key.length() <= line.length());

    std::wstring filtered = line;
    if (!processFilterKey(filtered)) FUZZ_CHECK(filtered.length() <= line.length());
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
    setlocale(LC_CTYPE, "C.UTF-8");
    return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    rcpfuzz::resetLog(false);
    rcpfuzz::writeScratch(data, size);

    std::vector<String> props;
    std::wstring path;
    chartowstr(rcpfuzz::scratchFile().c_str(), path);
    getProperties(path, props);
    FUZZ_CHECK(props.size() % 2 == 0);
    for (String s : props) FUZZ_CHECK(s != nullptr);

    // The first occurrence of every key wins.
    std::unordered_map<std::wstring, String> firstValue;
    for (size_t i = 0; i < props.size(); i += 2) {
        firstValue.emplace(props[i], props[i + 1]);
        FUZZ_CHECK(findProperty(props[i], props) == firstValue[props[i]]);
    }

    // The selection runs in file order up to the first empty key.
    String* all = findProperties(L"", props);
    size_t n = 0;
    while (all[n][0] != 0) {
        FUZZ_CHECK(n < props.size());
        FUZZ_CHECK(all[n] == props[n]);
        FUZZ_CHECK(all[n + 1] == props[n + 1]);
        n += 2;
    }
    FUZZ_CHECK(n == props.size() || props[n][0] == 0);
    free(all);

    if (!props.empty() && props[0][0] != 0) {
        std::wstring prefix(props[0], wcslen(props[0]) > 3 ? 3 : wcslen(props[0]));
        String* some = findProperties(prefix.c_str(), props);
        for (size_t k = 0; some[k][0] != 0; k += 2) FUZZ_CHECK(wcsncmp(some[k], prefix.c_str(), prefix.length()) == 0);
        free(some);
    }
    freeProperties(props);

    // The line functions see the raw lines when a per-user copy is rewritten.
    std::string text(reinterpret_cast<const char*>(data), size);
    size_t start = 0;
    while (start <= text.size()) {
        size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        std::wstring line;
        chartowstr(text.substr(start, end - start).c_str(), line);
        checkLineFunctions(line);
        start = end + 1;
    }
    return 0;
}
