#!/usr/bin/env bash
# Builds the launcher and its benchmarks (optimised RelWithDebInfo build, no
# sanitizers) and runs them:
#   - bench/launch_bench: launch overhead (first and steady-state launches,
#     against the child started directly) and the peak resident size;
#   - bench/properties_bench: lines per second of the properties reader and
#     values per second of placeholder expansion (Google Benchmark).
# docs/performance.md explains the method and keeps the latest figures.
#
#   scripts/bench.sh [launch_bench options, e.g. --launches 500 --check]
#
# Environment: BUILD_DIR (default <repo>/build-bench), JOBS (default 2),
# RCP_BENCH_REALTIME=0 to run without real-time priority (see below).
set -euo pipefail
cd "$(dirname "$0")/.."
root=$(pwd)
build=${BUILD_DIR:-$root/build-bench}
jobs=${JOBS:-2}

scripts/install-deps.sh

echo "=== Building in $build ==="
cmake -S "$root" -B "$build" -DCMAKE_BUILD_TYPE=RelWithDebInfo -DRCP_BENCHMARKS=ON \
  -DRCP_SANITIZE=OFF -DRCP_FUZZ=OFF >/dev/null
cmake --build "$build" --target rcplauncher launch_bench properties_bench -j"$jobs"

# Other work on the machine (builds on a shared machine) delays every process
# start by whole scheduler slices and swamps what is measured. As root (or with
# CAP_SYS_NICE) the benchmarks run under the real-time FIFO policy, which keeps
# that load out of the way; otherwise they run normally and the figures are
# only as good as the machine is quiet.
run=()
if [ "${RCP_BENCH_REALTIME:-1}" != 0 ] && command -v chrt >/dev/null && chrt -f 10 true 2>/dev/null; then
  run=(chrt -f 10)
  echo "(running under real-time priority: ${run[*]})"
else
  echo "(running at normal priority; background load shows in the figures)"
fi

echo
echo "=== Launch overhead and memory ==="
${run[@]+"${run[@]}"} "$build/bench/launch_bench" "$@"

echo
echo "=== Properties reader and placeholders ==="
LANG=C.UTF-8 LC_ALL= ${run[@]+"${run[@]}"} "$build/bench/properties_bench" \
  --benchmark_repetitions=5 --benchmark_display_aggregates_only=true
