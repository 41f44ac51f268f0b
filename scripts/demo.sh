#!/usr/bin/env bash
# Builds the launcher, installs it with "cmake --install" into a demo
# installation in the build tree, adds a real platform to it and launches it:
# the Equinox launcher and framework from the system, and a small bundle
# compiled here that reports what the platform was started with. The
# installation's "service" configuration makes the launcher start the
# system's JVM with org.eclipse.core.launcher.Main; it waits for the platform
# ("-rcpLauncherWait"), then the script shows what happened.
#
#   scripts/demo.sh [launcher arguments...]
#
# Without arguments the launcher gets "-config verbose", which the demo's
# launcher properties turn into "-debug" (a detailed log, and the framework's
# own debug output) and a VM argument.
#
# Environment: BUILD_DIR (default <repo>/build), JOBS (default 2),
# RCP_EQUINOX_PLUGINS (an Eclipse plugins directory holding
# org.eclipse.equinox.launcher_*.jar and org.eclipse.osgi_*.jar; default
# /usr/lib/eclipse/plugins, from Debian's libequinox-launcher-java and
# libeclipse-osgi-java).
# The demo lives in $BUILD_DIR/demo: inst/ is the installation, home/ the home
# directory of the demo user. Each run starts from a fresh installation.
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd)
BUILD_DIR=${BUILD_DIR:-$ROOT/build}
JOBS=${JOBS:-2}
EQUINOX_PLUGINS=${RCP_EQUINOX_PLUGINS:-/usr/lib/eclipse/plugins}
DEMO_DIR=$BUILD_DIR/demo
INST=$DEMO_DIR/inst
DEMO_USER=demo
BUNDLE=com.kel.demo.report
# The service configuration keeps both areas inside the installation.
WORKSPACE=$INST/eclipse/.workspace
CONFIGURATION=$INST/eclipse/.config
REPORT=$CONFIGURATION/$BUNDLE/report.properties

say() { printf '\n=== %s ===\n' "$*"; }

# The newest <stem>_<version>.jar of the plugins directory, or nothing.
plugin_jar() {
    local jars=("$EQUINOX_PLUGINS/$1"_*.jar)
    [ -e "${jars[0]}" ] && printf '%s\n' "${jars[@]}" | sort -V | tail -n 1
    return 0
}

# What the build, the platform and the demo bundle need: installed with
# apt-get when missing.
ensure_packages() {
    local missing=()
    command -v cmake >/dev/null || missing+=(cmake)
    command -v g++ >/dev/null || missing+=(g++)
    command -v make >/dev/null || missing+=(make)
    # The build directory is the one the tests use too.
    [ -e /usr/include/gtest/gtest.h ] || [ -e /usr/local/include/gtest/gtest.h ] ||
        [ -e /opt/homebrew/include/gtest/gtest.h ] || missing+=(libgtest-dev)
    command -v java >/dev/null || missing+=(default-jre-headless)
    command -v javac >/dev/null || missing+=(default-jdk-headless)
    [ -n "$(plugin_jar org.eclipse.equinox.launcher)" ] || missing+=(libequinox-launcher-java)
    [ -n "$(plugin_jar org.eclipse.osgi)" ] || missing+=(libeclipse-osgi-java)
    [ ${#missing[@]} -eq 0 ] && return 0

    if ! command -v apt-get >/dev/null; then
        echo "Please install: ${missing[*]} (or set RCP_EQUINOX_PLUGINS to an Eclipse plugins directory)" >&2
        exit 1
    fi
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
    DEBIAN_FRONTEND=noninteractive "${sudo[@]}" apt-get install -y --no-install-recommends "${missing[@]}"
}

build_launcher() {
    say "Building the launcher in $BUILD_DIR"
    cmake -S "$ROOT" -B "$BUILD_DIR" >/dev/null
    cmake --build "$BUILD_DIR" --target rcplauncher -j "$JOBS"
}

# Replaces the value of key in a properties file.
set_property() {
    local file=$1 key=$2 value=$3
    awk -v key="$key" -v value="$value" \
        'index($0, key "=") == 1 { print key "=" value; next } { print }' "$file" >"$file.tmp"
    mv "$file.tmp" "$file"
}

# The packaged installation tree, completed into a runnable platform.
prepare_installation() {
    say "Installing into $INST (cmake --install)"
    rm -rf "$DEMO_DIR"
    mkdir -p "$DEMO_DIR/home"
    cmake --install "$BUILD_DIR" --prefix "$INST"

    local java launcher framework
    java=$(command -v java)
    launcher=$(plugin_jar org.eclipse.equinox.launcher)
    framework=$(plugin_jar org.eclipse.osgi)
    say "Adding the platform: JVM $java, Equinox from $EQUINOX_PLUGINS, bundle $BUNDLE"
    set_property "$INST/rcp/rcplauncher.properties" jvm.location "$java"
    # Copies, not links: the Equinox launcher takes the directory of its
    # resolved jar as the install area and looks for the framework there.
    cp -L "$launcher" "$INST/eclipse/plugins/org.eclipse.equinox.launcher.jar"
    cp -L "$framework" "$INST/eclipse/plugins/$(basename "$framework")"

    local bundle_dir=$INST/eclipse/plugins/${BUNDLE}_1.0.0
    mkdir -p "$bundle_dir/META-INF"
    cp "$ROOT/demo/bundle/META-INF/MANIFEST.MF" "$bundle_dir/META-INF/"
    find "$ROOT/demo/bundle/src" -name '*.java' -print0 |
        xargs -0 javac --release 11 -nowarn -encoding UTF-8 -cp "$framework" -d "$bundle_dir"
    printf 'osgi.bundles=%s@start\n' "$BUNDLE" >>"$INST/base/config.ini"
    (cd "$INST" && find . -path ./eclipse/plugins/"$BUNDLE"_1.0.0/com -prune -o -print | sort)
}

# Runs the launcher with a clean environment; JAVA_HOME is set only to show
# that the platform does not get it. "-rcpLauncherWait" keeps the launcher
# until the platform has ended, so the platform's output comes first.
run_launcher() {
    local limit=()
    command -v timeout >/dev/null && limit=(timeout 300)
    say "Running $INST/rcp/rcplauncher -rcpLauncherWait $*"
    set +e
    ${limit[@]+"${limit[@]}"} env -i HOME="$DEMO_DIR/home" USER="$DEMO_USER" PATH=/usr/bin:/bin LANG=C.UTF-8 \
        JAVA_HOME=/opt/removed-by-the-launcher \
        "$INST/rcp/rcplauncher" -rcpLauncherWait "$@"
    LAUNCHER_STATUS=$?
    set -e
    echo "launcher exit status: $LAUNCHER_STATUS"
}

show_results() {
    if [ -f "$WORKSPACE/logs/rcplauncher.log" ]; then
        say "Launcher log: $WORKSPACE/logs/rcplauncher.log"
        cat "$WORKSPACE/logs/rcplauncher.log"
        echo
    elif [ -f /tmp/rcplauncher.log ]; then
        say "Launcher log (the launch ended before the workspace was known): /tmp/rcplauncher.log"
        cat /tmp/rcplauncher.log
        echo
    fi
    [ -d "$CONFIGURATION" ] || return 0
    say "Configuration area $CONFIGURATION (the framework's files: org.eclipse.osgi/)"
    (cd "$CONFIGURATION" && find . -mindepth 1 | sort)
    if [ -f "$REPORT" ]; then
        # The bundle printed its whole report above; here is the command line
        # from it, as the JVM process itself saw it (argv[0] is the JVM).
        say "The platform's command line, reported from inside the JVM ($REPORT)"
        sed -n 's/^jvm\.location=/    /p' "$INST/rcp/rcplauncher.properties"
        sed -n 's/^jvm\.arg\.[0-9]*=/    /p' "$REPORT"
    fi
}

# The proof that the platform ran where the launcher said: the framework's
# own configuration area is the one the launcher computed.
check_platform() {
    say "Check"
    local expected="property.osgi.configuration.area=file:$CONFIGURATION/"
    if [ -f "$REPORT" ] && grep -qxF "$expected" "$REPORT" &&
        [ -f "$CONFIGURATION/org.eclipse.osgi/framework.info.1" ]; then
        echo "The OSGi framework ran in the configuration area the launcher computed: $CONFIGURATION"
        return 0
    fi
    echo "The platform did not report from $CONFIGURATION (see the output above)"
    return 1
}

[ $# -eq 0 ] && set -- -config verbose

ensure_packages
build_launcher
prepare_installation
run_launcher "$@"
show_results
if [ "$LAUNCHER_STATUS" -ne 0 ]; then
    exit "$LAUNCHER_STATUS"
fi
check_platform
