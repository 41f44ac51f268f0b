// Helpers shared by the fuzz targets.
#ifndef RCP_FUZZ_COMMON_H
#define RCP_FUZZ_COMMON_H

#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"

// A broken invariant is a finding: abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond)                                                      \
    do {                                                                      \
        if (!(cond)) {                                                        \
            fprintf(stderr, "%s:%d: check failed: %s\n", __FILE__, __LINE__, #cond); \
            abort();                                                          \
        }                                                                     \
    } while (0)

namespace rcpfuzz {

// A file of this process in /tmp, removed at exit.
inline const std::string& scratchFile() {
    static const std::string path = [] {
        std::string p = "/tmp/rcp_fuzz_" + std::to_string(getpid()) + ".properties";
        atexit([] { unlink(("/tmp/rcp_fuzz_" + std::to_string(getpid()) + ".properties").c_str()); });
        return p;
    }();
    return path;
}

inline void writeScratch(const void* data, size_t size) {
    FILE* fp = fopen(scratchFile().c_str(), "wb");
    FUZZ_CHECK(fp != nullptr);
    if (size > 0) FUZZ_CHECK(fwrite(data, 1, size, fp) == size);
    FUZZ_CHECK(fclose(fp) == 0);
}

// Each iteration starts with an empty log queue, so nothing grows from one
// input to the next.
inline void resetLog(bool debug) {
    resetLoggingForTest();
    setDebug(debug);
}

// One line of the reader is at most 2024 bytes; a longer written line is
// split by design, so only shorter ones must read back unchanged.
const size_t MAX_LINE = 2024;

// What the reader gives back for a value the writer escaped: leading
// separators and surrounding blanks are not part of a value, and the stored
// copy ends at a NUL.
inline std::wstring expectedReadBack(std::wstring v) {
    size_t lead = 0;
    while (lead < v.length() && (v[lead] == L' ' || v[lead] == L'=' || v[lead] == L':')) ++lead;
    v.erase(0, lead);
    size_t end = v.length();
    while (end > 0 && v[end - 1] == L' ') --end;
    v.erase(end);
    return std::wstring(v.c_str());
}

}  // namespace rcpfuzz

#endif  // RCP_FUZZ_COMMON_H
