// Arbitrary bytes as a properties file: the reader must neither crash nor
// hang (nor read or write out of bounds), and builds key/value pairs.
#include <clocale>
#include <fstream>

#include "fuzz_common.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    setlocale(LC_CTYPE, rcptest::utf8Locale());
    resetLoggingForTest();  // with debug output, which quotes every key and value
    std::ofstream("p.properties", std::ios::binary) << std::string(reinterpret_cast<const char*>(data), size);
    std::vector<String> props;
    getProperties(L"p.properties", props);
    FUZZ_CHECK(props.size() % 2 == 0);
    freeProperties(props);
    return 0;
}
