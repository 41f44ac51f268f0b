// Shared by the fuzz targets. Each target reads and writes its files in the
// working directory, which ctest makes the target's own artifact directory.
#ifndef RCP_FUZZ_COMMON_H
#define RCP_FUZZ_COMMON_H

#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"
#include "test_util.h"

// A broken invariant is a finding: abort so that libFuzzer keeps the input.
#define FUZZ_CHECK(cond) \
    ((cond) ? (void)0 : (fprintf(stderr, "%s:%d: check failed: %s\n", __FILE__, __LINE__, #cond), abort()))

#endif  // RCP_FUZZ_COMMON_H
