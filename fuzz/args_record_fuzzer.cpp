// The startup record (args.properties) written for arbitrary arguments and
// read back with the properties reader: the platform restarts the launcher
// from it, so every argument must come back as it was typed, up to what the
// reader's grammar takes away on purpose (separators and blanks before a
// value, blanks after it), for every character up to U+FFFF.
//
// Input: UTF-16LE code units; a U+0000 unit separates two arguments (an
// argument cannot hold one).
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "fuzz_common.h"

namespace {

const size_t MAX_ARGS = 64;

// A directory of this process in /tmp for the record, removed at exit.
const std::string& scratchDir() {
    static const std::string dir = [] {
        std::string d = "/tmp/rcp_fuzz_args_" + std::to_string(getpid());
        mkdir(d.c_str(), 0700);
        atexit([] {
            std::string d2 = "/tmp/rcp_fuzz_args_" + std::to_string(getpid());
            unlink((d2 + "/args.properties").c_str());
            rmdir(d2.c_str());
        });
        return d;
    }();
    return dir;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    rcpfuzz::resetLog(false);

    std::vector<std::wstring> args = {L"rcplauncher"};
    std::wstring current;
    for (size_t i = 0; i + 1 < size && args.size() < MAX_ARGS; i += 2) {
        const wchar_t c = static_cast<wchar_t>(data[i] | (data[i + 1] << 8));
        if (c == 0) {
            args.push_back(current);
            current.clear();
        } else {
            current += c;
        }
    }
    if (args.size() < MAX_ARGS) args.push_back(current);
    std::vector<wchar_t*> argv;
    for (auto& a : args) argv.push_back(&a[0]);
    argv.push_back(nullptr);
    const int argc = static_cast<int>(args.size());

    std::wstring configLocation;
    chartowstr(scratchDir().c_str(), configLocation);
    writeStartupArgs(argc, argv.data(), configLocation);

    // What the record must hold: arg0 the launcher's own path, then the
    // arguments without the first "-restart" and the first "-resetconfig",
    // then argc.
    const int restart = findOption(L"-restart", argc, argv.data());
    const int reset = findOption(L"-resetconfig", argc, argv.data());
    std::wstring launcherPath;
    getLauncherPath(launcherPath);
    std::vector<std::wstring> expected;
    bool linesFit = true;
    int n = 0;
    for (int i = 0; i < argc; i++) {
        if (i == restart || i == reset) continue;
        std::wstring key = L"arg" + std::to_wstring(n++);
        std::wstring value = i == 0 ? launcherPath : args[static_cast<size_t>(i)];
        std::wstring line;
        convWcharTo8859_1(key, value, line);
        if (line.length() > rcpfuzz::MAX_LINE) linesFit = false;
        expected.push_back(key);
        expected.push_back(i == 0 ? value : rcpfuzz::expectedReadBack(value));
    }
    expected.push_back(L"argc");
    expected.push_back(std::to_wstring(n));

    std::vector<String> props;
    getProperties(configLocation + L"/args.properties", props);
    FUZZ_CHECK(props.size() % 2 == 0);
    if (linesFit) {
        FUZZ_CHECK(props.size() == expected.size());
        for (size_t k = 0; k < props.size(); k++) FUZZ_CHECK(expected[k] == props[k]);
    }
    freeProperties(props);
    return 0;
}
