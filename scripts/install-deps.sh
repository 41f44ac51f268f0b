#!/usr/bin/env bash
# Installs what the build, the tests and the demo need, when it is missing.
# Safe to run again. Package names given as arguments are installed as well.
#
# Debian and Ubuntu: apt-get (through sudo when not run as root), including
# for the demo a JVM and the Java compiler, Debian's Eclipse platform (the
# Equinox launcher and framework, the runtime's bundles and SWT for GTK with
# its native libraries), Xvfb for a display where there is none, and ps.
# macOS: Homebrew formulae; Eclipse has none, so scripts/test.sh does not run
# the demo there.
set -euo pipefail

if [ "$(uname -s)" = Darwin ]; then
  formulae="googletest google-benchmark $*"
  command -v cmake >/dev/null || formulae="cmake $formulae"
  missing=""
  for f in $formulae; do
    brew list --formula "$f" >/dev/null 2>&1 || missing="$missing $f"
  done
  if [ -n "$missing" ]; then
    echo "Installing:$missing"
    # shellcheck disable=SC2086 # one word per formula
    brew install $missing
  fi
  exit 0
fi

packages=(cmake make g++ clang libgtest-dev libgmock-dev libbenchmark-dev)
packages+=(default-jre-headless default-jdk-headless libequinox-launcher-java libeclipse-osgi-java)
packages+=(libequinox-common-java libeclipse-core-jobs-java libequinox-registry-java libosgi-compendium-java)
packages+=(libequinox-preferences-java libeclipse-core-contenttype-java libequinox-app-java libeclipse-core-runtime-java)
packages+=(libswt-gtk-4-java libswt-gtk-4-jni libswt-cairo-gtk-4-jni xvfb procps)
packages+=("$@")

SUDO=""
if [ "$(id -u)" -ne 0 ]; then SUDO="sudo"; fi
export DEBIAN_FRONTEND=noninteractive
updated=""

is_installed() {
  dpkg-query -W -f='${Status}' "$1" 2>/dev/null | grep -q "install ok installed"
}

install_missing() {
  local missing=() p
  for p in "$@"; do
    is_installed "$p" || missing+=("$p")
  done
  [ ${#missing[@]} -gt 0 ] || return 0
  echo "Installing: ${missing[*]}"
  if [ -z "$updated" ]; then
    $SUDO apt-get update -qq
    updated=yes
  fi
  $SUDO apt-get install -y -qq --no-install-recommends "${missing[@]}"
}

install_missing "${packages[@]}"

# The sanitizer and libFuzzer runtime of the clang that "clang" installed
# (clang-14 on Debian 12, newer on recent Ubuntu).
clang_major=$(dpkg-query -W -f='${Depends}' clang 2>/dev/null | sed -n 's/^clang-\([0-9][0-9]*\).*/\1/p')
install_missing "libclang-rt-${clang_major:-14}-dev"
