#!/usr/bin/env bash
# Builds and runs every test: a normal build with warnings as errors, its
# end-to-end suite once more with the launcher under valgrind, the same suite
# under AddressSanitizer + UndefinedBehaviorSanitizer, short bounded fuzzing
# runs built with clang, on Linux a cross-build for macOS (the universal
# launcher, every test program, the archive), and last the demo, which
# installs the normal build and checks it on a real Equinox platform.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$(pwd)

scripts/install-deps.sh

jobs=$(nproc 2>/dev/null || echo 2)

echo "=== Normal build (-Wall -Wextra -Werror) ==="
# The benchmarks are compiled here too (a few seconds), so that they keep
# building; scripts/bench.sh runs them.
cmake -S "$root" -B "$root/build" -DRCP_WERROR=ON -DRCP_SANITIZE=OFF -DRCP_BENCHMARKS=ON >/dev/null
cmake --build "$root/build" -j"$jobs"
(cd "$root/build" && ctest --output-on-failure)

if [ "$(uname -s)" = Darwin ]; then
  echo "=== valgrind skipped on macOS ==="
else
  # The end-to-end suite again with every launcher under memcheck; the race
  # and kill tests run fewer rounds there (each launch takes a second).
  RCP_RACE_ROUNDS=1 RCP_KILL_ROUNDS=5 scripts/valgrind-e2e.sh "$root/build"
fi

echo "=== Sanitizer build (address, undefined) ==="
cmake -S "$root" -B "$root/build-asan" -DRCP_WERROR=ON -DRCP_SANITIZE=ON >/dev/null
cmake --build "$root/build-asan" -j"$jobs"
# LeakSanitizer does not run on macOS; asking for it there aborts every test.
asan_options=abort_on_error=1
[ "$(uname -s)" = Darwin ] || asan_options=detect_leaks=1:$asan_options
(cd "$root/build-asan" && \
  ASAN_OPTIONS=$asan_options UBSAN_OPTIONS=print_stacktrace=1:halt_on_error=1 \
  ctest --output-on-failure)

if [ "$(uname -s)" = Darwin ]; then
  # Apple's clang has no libFuzzer runtime.
  echo "=== Fuzzing skipped on macOS ==="
elif [ -f "$root/fuzz/CMakeLists.txt" ]; then
  echo "=== Fuzzing (clang, libFuzzer, bounded runs) ==="
  cmake -S "$root" -B "$root/build-fuzz" -DCMAKE_C_COMPILER=clang -DCMAKE_CXX_COMPILER=clang++ \
    -DRCP_FUZZ=ON >/dev/null
  cmake --build "$root/build-fuzz" -j"$jobs"
  (cd "$root/build-fuzz" && ctest -L fuzz --output-on-failure)
fi

if [ "$(uname -s)" = Linux ] && [ "$(uname -m)" = x86_64 ]; then
  # Compiles, links, merges and packs only: nothing here can run a macOS
  # program.
  echo "=== macOS cross-build (universal launcher, tests, archive) ==="
  scripts/check-macos.sh
else
  # On macOS the builds above are the real thing; the cross toolchain exists
  # for x86-64 Linux only.
  echo "=== macOS cross-build skipped ($(uname -s) $(uname -m)) ==="
fi

if [ "$(uname -s)" = Darwin ]; then
  # Homebrew has no Equinox.
  echo "=== Demo on a real platform skipped on macOS ==="
else
  # It reuses build/, whose cached options stay as configured above.
  echo "=== Demo on a real platform ==="
  BUILD_DIR="$root/build" scripts/demo.sh
fi
