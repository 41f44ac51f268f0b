// Shared by the fuzz targets. Each target reads and writes its files in the
// working directory, which ctest makes the target's own artifact directory.
#ifndef RCP_FUZZ_COMMON_H
#define RCP_FUZZ_COMMON_H

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"
#include "test_util.h"

// A broken invariant is a finding: abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond) \
    ((cond) ? (void)0 : (fprintf(stderr, "%s:%d: check failed: %s\n", __FILE__, __LINE__, #cond), abort()))

// A value as the reader gives it back once the writer has escaped it: the
// grammar takes away, on purpose, separators and blanks before a value and
// blanks after it.
inline std::wstring readBack(const std::wstring& value) {
    const size_t first = std::min(value.find_first_not_of(L" =:"), value.length());
    return value.substr(first, value.find_last_not_of(L' ') + 1 - first);
}

#endif  // RCP_FUZZ_COMMON_H
