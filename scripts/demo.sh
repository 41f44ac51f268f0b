#!/usr/bin/env bash
# Builds the launcher, installs it into a copy of the demo installation in the
# build tree and runs it there with a private home directory; then shows what
# the child was started with and what the launcher logged.
#
#   scripts/demo.sh [launcher arguments...]
#
# Without arguments the launcher gets "-config verbose", which the demo's
# launcher properties turn into "-debug" (a detailed log) and a VM argument.
#
# Environment: BUILD_DIR (default <repo>/build), JOBS (default 2).
# The demo lives in $BUILD_DIR/demo: inst/ is the installation, home/ the home
# directory of the demo user. Each run starts from a fresh copy.
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd)
BUILD_DIR=${BUILD_DIR:-$ROOT/build}
JOBS=${JOBS:-2}
DEMO_DIR=$BUILD_DIR/demo
DEMO_USER=demo
INSTALL_ID=DEMO1

say() { printf '\n=== %s ===\n' "$*"; }

# Debian packages needed to configure and build (the build directory is the
# one the tests use too, so the test framework must be there as well).
ensure_packages() {
    local missing=()
    command -v cmake >/dev/null || missing+=(cmake)
    command -v g++ >/dev/null || missing+=(g++)
    command -v make >/dev/null || missing+=(make)
    [ -e /usr/include/gtest/gtest.h ] || missing+=(libgtest-dev)
    [ ${#missing[@]} -eq 0 ] && return 0

    say "Installing ${missing[*]}"
    local sudo=()
    if [ "$(id -u)" -ne 0 ]; then
        if command -v sudo >/dev/null; then
            sudo=(sudo)
        else
            echo "Please install: ${missing[*]}" >&2
            exit 1
        fi
    fi
    "${sudo[@]}" apt-get update
    DEBIAN_FRONTEND=noninteractive "${sudo[@]}" apt-get install -y "${missing[@]}"
}

build_launcher() {
    say "Building the launcher in $BUILD_DIR"
    cmake -S "$ROOT" -B "$BUILD_DIR" >/dev/null
    cmake --build "$BUILD_DIR" --target rcplauncher -j "$JOBS"
}

# A fresh copy of demo/inst with the built launcher in its rcp directory,
# beside rcplauncher.properties.
prepare_installation() {
    rm -rf "$DEMO_DIR"
    mkdir -p "$DEMO_DIR/home"
    cp -a "$ROOT/demo/inst" "$DEMO_DIR/inst"
    cp "$BUILD_DIR/rcplauncher" "$DEMO_DIR/inst/rcp/rcplauncher"
    chmod 0755 "$DEMO_DIR/inst/rcp/rcplauncher"
}

# Runs the launcher with a clean environment. "-rcpLauncherWait" keeps the
# launcher until the child has ended, so the child's output comes first.
run_launcher() {
    say "Running $DEMO_DIR/inst/rcp/rcplauncher -rcpLauncherWait $*"
    set +e
    env -i HOME="$DEMO_DIR/home" USER="$DEMO_USER" PATH=/usr/bin:/bin LANG=C.UTF-8 \
        JAVA_HOME=/opt/removed-by-the-launcher \
        "$DEMO_DIR/inst/rcp/rcplauncher" -rcpLauncherWait "$@"
    LAUNCHER_STATUS=$?
    set -e
    echo "launcher exit status: $LAUNCHER_STATUS"
}

show_results() {
    local workspace=$DEMO_DIR/home/KEL/RCP/$INSTALL_ID/$DEMO_USER
    if [ -f "$workspace/logs/rcplauncher.log" ]; then
        say "Launcher log: $workspace/logs/rcplauncher.log"
        cat "$workspace/logs/rcplauncher.log"
        say "Files of the user's areas"
        (cd "$DEMO_DIR/home" && find . -mindepth 1 | sort)
        say "Per-user rcpinstall.properties"
        cat "$workspace/.config/rcpinstall.properties"
    elif [ -f /tmp/rcplauncher.log ]; then
        say "Launcher log (the launch ended before the workspace was known): /tmp/rcplauncher.log"
        cat /tmp/rcplauncher.log
    fi
}

[ $# -eq 0 ] && set -- -config verbose

ensure_packages
build_launcher
prepare_installation
run_launcher "$@"
show_results
exit "$LAUNCHER_STATUS"
