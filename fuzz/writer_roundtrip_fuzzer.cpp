// Arbitrary arguments through the startup record (args.properties), which the
// writer escapes and the platform restarts the launcher from: each line is
// printable ASCII, and the properties reader gives back arg0 as the
// launcher's own path, every argument but the first "-restart" and the first
// "-resetconfig" as it was typed, and their count. As typed means for every
// character up to U+FFFF, up to what the reader's grammar takes away on
// purpose (readBack).
//
// Input: UTF-16LE code units; a U+0000 unit separates two arguments.
#include "fuzz_common.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    resetLoggingForTest();
    std::vector<std::wstring> args = {L"", L""}, expected;  // expected: key, value, ...
    getLauncherPath(args[0]);
    for (size_t i = 0; i + 1 < size && args.size() <= 64; i += 2) {
        if (data[i] == 0 && data[i + 1] == 0)
            args.emplace_back();
        else
            args.back() += static_cast<wchar_t>(data[i] | (data[i + 1] << 8));
    }
    std::vector<wchar_t*> argv;
    for (std::wstring& a : args) argv.push_back(&a[0]);
    const int argc = static_cast<int>(args.size());
    const int restart = findOption(L"-restart", argc, &argv[0]), reset = findOption(L"-resetconfig", argc, &argv[0]);
    bool linesFit = true;  // the reader cuts lines at 2024 bytes: only a record of shorter ones reads back unchanged
    for (int i = 0; i < argc; i++) {
        if (i == restart || i == reset) continue;
        const std::wstring key = L"arg" + std::to_wstring(expected.size() / 2), &value = args[static_cast<size_t>(i)];
        std::wstring line;
        convWcharTo8859_1(key, value, line);
        linesFit = linesFit && line.length() <= 2024;
        FUZZ_CHECK(std::all_of(line.begin(), line.end(), [](wchar_t c) { return c >= 0x20 && c <= 0x7e; }));
        expected.insert(expected.end(), {key, readBack(value)});
    }
    expected.insert(expected.end(), {L"argc", std::to_wstring(expected.size() / 2)});
    writeStartupArgs(argc, argv.data(), L".");
    std::vector<String> props;
    getProperties(L"args.properties", props);
    FUZZ_CHECK(!linesFit || std::vector<std::wstring>(props.begin(), props.end()) == expected);
    freeProperties(props);
    return 0;
}
