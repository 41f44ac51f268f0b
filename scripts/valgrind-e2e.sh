#!/usr/bin/env bash
# Runs the end-to-end suite of a build with every launcher under valgrind's
# memcheck: any memory error or definite leak in the launcher fails the run.
#
#   scripts/valgrind-e2e.sh [build-dir] [ctest options...]
#
# build-dir defaults to build/ and must hold a normal (not sanitized) build
# with the tests. The suite's sandboxes put the launcher under the command in
# RCP_LAUNCHER_WRAPPER (tests/support/sandbox.h); the children it starts run
# without valgrind. Memcheck can only check the heap of a program whose
# allocator it can replace, so a statically linked launcher is first linked
# again, dynamically, from the build's own library (RCP_LAUNCHER_BINARY).
set -euo pipefail
cd "$(dirname "$0")/.."
root=$(pwd)
build=$(cd "${1:-$root/build}" && pwd)
shift || true

if ! command -v valgrind >/dev/null 2>&1; then
  scripts/install-deps.sh valgrind
fi
if [ ! -f "$build/CMakeCache.txt" ] || [ ! -x "$build/rcplauncher" ]; then
  echo "valgrind-e2e: $build is not a build of the launcher" >&2
  exit 2
fi
if grep -q '^RCP_SANITIZE:BOOL=ON' "$build/CMakeCache.txt"; then
  echo "valgrind-e2e: $build is a sanitizer build; valgrind needs a normal one" >&2
  exit 2
fi

work="$build/valgrind"
logs="$work/logs"
rm -rf "$work"
mkdir -p "$logs"
# Launchers that a test runs as another user write their logs here too.
chmod 1777 "$logs"

launcher="$build/rcplauncher"
if ! readelf -l "$launcher" 2>/dev/null | grep -q 'Requesting program interpreter'; then
  cxx=$(sed -n 's/^CMAKE_CXX_COMPILER:[A-Z]*=//p' "$build/CMakeCache.txt")
  library=$(find "$build" -maxdepth 1 -name 'librcplauncher_core.a' | head -n 1)
  if [ -z "$library" ]; then
    echo "valgrind-e2e: no librcplauncher_core.a in $build" >&2
    exit 2
  fi
  "${cxx:-c++}" -std=c++17 -g -O1 -I"$root/common" -I"$root/src/macosx" \
    "$root/src/macosx/rcp_launcher_main.cpp" "$library" -ldl -o "$work/rcplauncher"
  launcher="$work/rcplauncher"
fi

# Debian's "valgrind" is a shell script that adds to LD_LIBRARY_PATH and sets
# GLIBCXX_FORCE_NEW before it starts the real program; the launcher would
# pass those on to its child and the tests compare the child's environment.
valgrind=$(command -v valgrind.bin || command -v valgrind)

export RCP_LAUNCHER_BINARY="$launcher"
# --child-silent-after-fork: the launcher's forked child runs under valgrind
# only until its execv; a child whose execv fails ends at once with _exit and
# is no launcher run of its own.
# --vgdb=no: otherwise every run makes FIFOs and a file named after its pid
# in /tmp, which a killed run leaves behind; a later run as another user
# that gets the same pid cannot make its own and valgrind ends with status 1
# before the launcher starts.
export RCP_LAUNCHER_WRAPPER="$valgrind --tool=memcheck --vgdb=no --child-silent-after-fork=yes --quiet --error-exitcode=99 --leak-check=full \
--errors-for-leak-kinds=definite --show-leak-kinds=definite --track-origins=yes \
--suppressions=$root/scripts/valgrind.supp --log-file=$logs/launcher.%p.log"

echo "=== End-to-end suite with the launcher under valgrind ($launcher) ==="
status=0
(cd "$build" && ctest -R '^e2e\.' --output-on-failure "$@") || status=$?

# With --quiet a log holds something only when valgrind found a problem.
found=0
for log in "$logs"/launcher.*.log; do
  [ -s "$log" ] || continue
  found=$((found + 1))
  echo "--- $log ---"
  cat "$log"
done
runs=$(find "$logs" -name 'launcher.*.log' | wc -l)
echo "valgrind-e2e: $runs launcher runs checked, $found with findings"
if [ "$found" -ne 0 ] && [ "$status" -eq 0 ]; then status=1; fi
exit "$status"
