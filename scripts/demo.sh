#!/usr/bin/env bash
# Builds the launcher, installs it with "cmake --install" into a demo
# installation in the build tree, adds a real platform to it and launches it:
# the Equinox launcher and framework from the system, and a small bundle
# compiled here that reports what the platform was started with. The
# installation's "service" configuration makes the launcher start the
# system's JVM with org.eclipse.core.launcher.Main; it waits for the platform
# ("-rcpLauncherWait"), then the script shows what happened. A second launch
# with "-resetconfig" sets the platform's configuration area aside and starts
# it afresh. The script ends with its checks of what it showed, one line
# each, and exits non-zero when one of them fails.
#
#   scripts/demo.sh [launcher arguments...]
#
# Without arguments the launcher gets "-config verbose", which the demo's
# launcher properties turn into "-debug" (a detailed log, and the framework's
# own debug output) and a VM argument. Other arguments go to the launcher
# instead; the demo then launches once and checks only the installed tree and
# that the platform ran in the configuration area the launcher computed, since
# the exact command line depends on them.
#
# Environment: BUILD_DIR (default <repo>/build), JOBS (default 2),
# RCP_EQUINOX_PLUGINS (an Eclipse plugins directory holding
# org.eclipse.equinox.launcher_*.jar and org.eclipse.osgi_*.jar; default
# /usr/lib/eclipse/plugins, from Debian's libequinox-launcher-java and
# libeclipse-osgi-java).
# The demo lives in $BUILD_DIR/demo: inst/ is the installation, installed/ the
# tree as "cmake --install" laid it out, home/ the home directory of the demo
# user, launch-<n>.* what each launch printed and logged, its configuration
# area and its exit status. Each run starts from a fresh installation.
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd -P)
BUILD_DIR=${BUILD_DIR:-$ROOT/build}
mkdir -p "$BUILD_DIR"
# The launcher finds its installation from its resolved path, so the expected
# paths must be resolved too.
BUILD_DIR=$(cd "$BUILD_DIR" && pwd -P)
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

# The packages come from scripts/install-deps.sh (apt-get on Debian and
# Ubuntu, Homebrew on macOS). Homebrew has no Equinox, and other systems may
# lack more, so what the demo needs is checked afterwards.
ensure_requirements() {
    "$ROOT/scripts/install-deps.sh" || echo "scripts/install-deps.sh failed; checking what the demo needs" >&2
    local missing=()
    command -v cmake >/dev/null || missing+=("cmake")
    command -v java >/dev/null || missing+=("a JVM: java on PATH")
    command -v javac >/dev/null || missing+=("a Java compiler: javac on PATH")
    [ -n "$(plugin_jar org.eclipse.equinox.launcher)" ] ||
        missing+=("the Equinox launcher: $EQUINOX_PLUGINS/org.eclipse.equinox.launcher_<version>.jar")
    [ -n "$(plugin_jar org.eclipse.osgi)" ] ||
        missing+=("the Equinox framework: $EQUINOX_PLUGINS/org.eclipse.osgi_<version>.jar")
    [ ${#missing[@]} -eq 0 ] && return 0
    {
        echo "The demo cannot run; missing:"
        printf '  %s\n' "${missing[@]}"
        echo "Debian and Ubuntu package Equinox as libequinox-launcher-java and libeclipse-osgi-java;"
        echo "elsewhere set RCP_EQUINOX_PLUGINS to an Eclipse plugins directory holding both jars."
    } >&2
    exit 1
}

build_launcher() {
    say "Building the launcher in $BUILD_DIR"
    # An existing build directory keeps its cached options.
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
    # Kept as installed for the checks; the platform is added to inst/ only.
    cp -a "$INST" "$DEMO_DIR/installed"

    local launcher
    JAVA=$(command -v java)
    launcher=$(plugin_jar org.eclipse.equinox.launcher)
    FRAMEWORK=$(plugin_jar org.eclipse.osgi)
    say "Adding the platform: JVM $JAVA, Equinox from $EQUINOX_PLUGINS, bundle $BUNDLE"
    set_property "$INST/rcp/rcplauncher.properties" jvm.location "$JAVA"
    # Copies, not links: the Equinox launcher takes the directory of its
    # resolved jar as the install area and looks for the framework there.
    cp -L "$launcher" "$INST/eclipse/plugins/org.eclipse.equinox.launcher.jar"
    cp -L "$FRAMEWORK" "$INST/eclipse/plugins/$(basename "$FRAMEWORK")"

    local bundle_dir=$INST/eclipse/plugins/${BUNDLE}_1.0.0
    mkdir -p "$bundle_dir/META-INF"
    cp "$ROOT/demo/bundle/META-INF/MANIFEST.MF" "$bundle_dir/META-INF/"
    find "$ROOT/demo/bundle/src" -name '*.java' -print0 |
        xargs -0 javac --release 11 -nowarn -encoding UTF-8 -cp "$FRAMEWORK" -d "$bundle_dir"
    printf 'osgi.bundles=%s@start\n' "$BUNDLE" >>"$INST/base/config.ini"
    (cd "$INST" && find . -path ./eclipse/plugins/"$BUNDLE"_1.0.0/com -prune -o -print | sort)
}

# Launch <n>: runs the launcher with a clean environment; JAVA_HOME is set
# only to show that the platform does not get it. "-rcpLauncherWait" keeps
# the launcher until the platform has ended. The platform's output goes to
# launch-<n>.out and is shown afterwards; the launcher's log, the
# configuration area and whether the platform process named by the lock was
# still running are kept as launch-<n>.* as well, since the next launch
# replaces them.
run_launcher() {
    local n=$1 limit=()
    shift
    command -v timeout >/dev/null && limit=(timeout 300)
    say "Launch $n: $INST/rcp/rcplauncher -rcpLauncherWait $*"
    local status=0
    ${limit[@]+"${limit[@]}"} env -i HOME="$DEMO_DIR/home" USER="$DEMO_USER" PATH=/usr/bin:/bin LANG=C.UTF-8 \
        JAVA_HOME=/opt/removed-by-the-launcher \
        "$INST/rcp/rcplauncher" -rcpLauncherWait "$@" >"$DEMO_DIR/launch-$n.out" 2>&1 || status=$?
    # Right after the launcher's end: whether the platform is still running.
    local pid=""
    # The lock holds the process id padded with blanks, without a newline.
    [ -f "$WORKSPACE/.rcp.lock" ] && pid=$(tr -d ' ' <"$WORKSPACE/.rcp.lock")
    if [ -n "$pid" ] && kill -0 "$pid" 2>/dev/null; then
        echo "$pid running" >"$DEMO_DIR/launch-$n.platform"
    else
        echo "${pid:-none} ended" >"$DEMO_DIR/launch-$n.platform"
    fi
    echo "$status" >"$DEMO_DIR/launch-$n.status"
    cp "$WORKSPACE/logs/rcplauncher.log" "$DEMO_DIR/launch-$n.log" 2>/dev/null || : >"$DEMO_DIR/launch-$n.log"
    mkdir -p "$DEMO_DIR/launch-$n.config"
    [ -d "$CONFIGURATION" ] && cp -a "$CONFIGURATION/." "$DEMO_DIR/launch-$n.config"
    cat "$DEMO_DIR/launch-$n.out"
    echo "launcher exit status: $status"
}

# The report of launch <n>, from the copy of its configuration area.
report_of() { echo "$DEMO_DIR/launch-$1.config/$BUNDLE/report.properties"; }

show_results() {
    if [ -s "$DEMO_DIR/launch-1.log" ]; then
        say "Launcher log: $WORKSPACE/logs/rcplauncher.log"
        cat "$DEMO_DIR/launch-1.log"
        echo
    elif [ -f /tmp/rcplauncher.log ]; then
        say "Launcher log (the launch ended before the workspace was known): /tmp/rcplauncher.log"
        cat /tmp/rcplauncher.log
        echo
    fi
    [ -d "$CONFIGURATION" ] || return 0
    say "Configuration area $CONFIGURATION (the framework's files: org.eclipse.osgi/)"
    (cd "$CONFIGURATION" && find . -mindepth 1 | sort)
    if [ -s "$(report_of 1)" ]; then
        # The bundle printed its whole report above; here is the command line
        # from it, as the JVM process itself saw it (argv[0] is the JVM).
        say "The platform's command line, reported from inside the JVM ($REPORT)"
        sed -n 's/^jvm\.location=/    /p' "$INST/rcp/rcplauncher.properties"
        sed -n 's/^jvm\.arg\.[0-9]*=/    /p' "$(report_of 1)"
    fi
}

# ---------------------------------------------------------------- checks

FAILED=0

pass() { echo "ok: $1"; }
fail() {
    echo "FAILED: $1"
    FAILED=$((FAILED + 1))
}

# check_same NAME EXPECTED ACTUAL: exact comparison; a failure shows both, as
# a diff when they span several lines.
check_same() {
    if [ "$2" = "$3" ]; then
        pass "$1"
    elif [[ "$2$3" != *$'\n'* ]]; then
        fail "$1: expected '$2', got '$3'"
    else
        fail "$1"
        diff --label expected --label actual -u <(printf '%s\n' "$2") <(printf '%s\n' "$3") | sed 's/^/    /' || true
    fi
}

# check_that NAME COMMAND...: the command succeeds.
check_that() {
    local name=$1
    shift
    if "$@" >/dev/null 2>&1; then pass "$name"; else fail "$name (failed: $*)"; fi
}

# The report's lines whose names start with prefix, in the report's order.
report_lines() { grep -F "$1" "$2" | grep "^$1" || true; }
# The values of prefix0, prefix1, ... one a line.
report_list() { sed -n "s/^$1[0-9]*=//p" "$2"; }
report_value() { sed -n "s/^$1=//p" "$2"; }
# The line after the line that is exactly label.
line_after() { awk -v label="$1" 'found { print; exit } $0 == label { found = 1 }' "$2"; }
no_files_named() { [ -z "$(find "$1" -name "$2")" ]; }
# Each entry of a tree: "dir/", or "file mode" with the mode as ls shows it.
tree_listing() {
    (cd "$1" && find . -mindepth 1 | LC_ALL=C sort | while read -r path; do
        if [ -d "$path" ]; then
            echo "${path#./}/"
        else
            # shellcheck disable=SC2012 # the names are known; find has no portable mode output
            echo "${path#./} $(ls -ld "$path" | cut -c 1-10)"
        fi
    done)
}

# What cmake --install laid out: the launcher beside the sample installation,
# with the modes cmake gives programs and files.
check_installed_tree() {
    local dir=$DEMO_DIR/installed
    check_same "cmake --install lays out the launcher and the sample installation" \
        "base/
base/config.ini -rw-r--r--
base/platform.xml -rw-r--r--
base/rcpinstall.properties -rw-r--r--
eclipse/
eclipse/plugins/
eclipse/plugins/README.txt -rw-r--r--
rcp/
rcp/rcplauncher -rwxr-xr-x
rcp/rcplauncher.properties -rw-r--r--" \
        "$(tree_listing "$dir")"
    check_that "the installed sample files are those of demo/inst" \
        diff -r -x rcplauncher "$ROOT/demo/inst" "$dir"
    check_that "the installed launcher is the one built" cmp "$BUILD_DIR/rcplauncher" "$dir/rcp/rcplauncher"
}

# What every launch must show, whatever its arguments: the framework ran and
# kept its state in the configuration area the launcher computed and prepared
# (as the area was when the launch ended).
check_platform_ran() {
    local n=$1 area=$DEMO_DIR/launch-$1.config
    check_same "launch $n: the launcher exited with status 0" 0 "$(cat "$DEMO_DIR/launch-$n.status")"
    check_that "launch $n: the framework keeps its state in the configuration area's org.eclipse.osgi/" \
        test -f "$area/org.eclipse.osgi/framework.info.1" -a -d "$area/org.eclipse.osgi/.manager"
    check_same "launch $n: the bundle reports the configuration area the launcher computed" \
        "property.osgi.configuration.area=file:$CONFIGURATION/" \
        "$(report_lines property.osgi.configuration.area= "$(report_of "$n")")"
    check_that "launch $n: the framework read the base config.ini, copied into the configuration area" \
        cmp "$INST/base/config.ini" "$area/config.ini"
    check_that "launch $n: the configuration area has the update-site record" \
        test -f "$area/org.eclipse.update/platform.xml"
    # Equinox writes what went wrong to <time>.log in the configuration area.
    check_that "launch $n: the framework logged no failure (no *.log in the configuration area)" \
        no_files_named "$area" '*.log'
    local pid
    pid=$(report_value process.pid "$(report_of "$n")")
    check_same "launch $n: the platform lock names the platform process, which ended before the launcher" \
        "${pid:-<no pid reported>} ended" "$(cat "$DEMO_DIR/launch-$n.platform")"
}

# The default launch ("-config verbose") in full: the command line the
# launcher logged, and what the platform received, as the bundle reports it.
check_first_launch() {
    local out=$DEMO_DIR/launch-1.out report
    local command_line
    report=$(report_of 1)
    command_line=$(printf '%s\n' "$JAVA" \
        -Ddemo.verbose=true "-Ddemo.workspace=$WORKSPACE" -Dfile.encoding=UTF-8 \
        "-Drcp.home=$INST" "-Drcp.data=$WORKSPACE" -Dcom.kel.rcp.install.id=DEMO1 -Drcp.install.config=service \
        -Ddemo.greeting=hello "-Drcp.osgi.install.area=$INST/eclipse" -Xmx256m \
        -cp "$INST/eclipse/plugins/org.eclipse.equinox.launcher.jar" org.eclipse.core.launcher.Main -nosplash \
        -rcpLauncherWait -debug -data "$WORKSPACE" -configuration "$CONFIGURATION" \
        -application com.kel.demo.application -product com.kel.demo.product -XstartOnFirstThread)

    check_same "the launcher logged the platform's exact command line" \
        "RLNCH0132I: ===== Begin Parameters =====
$command_line
RLNCH0133I: ===== End Parameters =====" \
        "$(sed -n '/^RLNCH0132I: /,/^RLNCH0133I: /p' "$DEMO_DIR/launch-1.log")"
    # argv[0] is the JVM's resolved executable; the rest is the launcher's.
    check_same "the JVM's own argument vector is that command line" \
        "$(tail -n +2 <<<"$command_line")" "$(report_list jvm.arg. "$report")"
    # "-debug" reached the framework, which names the areas it uses.
    check_same "the framework (with -debug) names the configuration area the launcher computed" \
        "    file:$CONFIGURATION/" "$(line_after 'Configuration location:' "$out")"
    check_same "the framework (with -debug) was found in the installation's plugins" \
        "    file:$INST/eclipse/plugins/$(basename "$FRAMEWORK")" "$(line_after 'Framework located:' "$out")"
    check_same "the platform's system properties and areas" \
        "property.rcp.home=$INST
property.rcp.data=$WORKSPACE
property.com.kel.rcp.install.id=DEMO1
property.rcp.install.config=service
property.rcp.osgi.install.area=$INST/eclipse
property.osgi.install.area=file:$INST/eclipse/
property.osgi.configuration.area=file:$CONFIGURATION/
property.osgi.instance.area=file:$WORKSPACE/
property.demo.greeting=hello
property.demo.verbose=true
property.demo.workspace=$WORKSPACE" \
        "$(report_lines property. "$report")"
    # The framework takes -debug, -data, -configuration and -nosplash; the
    # rest, "-XstartOnFirstThread" last, is left for the application.
    check_same "the application's arguments, -XstartOnFirstThread last" \
        "-rcpLauncherWait
-application
com.kel.demo.application
-product
com.kel.demo.product
-XstartOnFirstThread" \
        "$(report_list application.arg. "$report")"
    check_same "the platform's environment: no JAVA_HOME, the launcher's JAVA_HIGH_ZIPFDS, library path and env.set value" \
        "env.JAVA_HIGH_ZIPFDS=500
env.LD_LIBRARY_PATH=$INST/lib
env.RCP_DEMO_GREETING=Hello from rcpinstall.properties" \
        "$(report_lines env. "$report")"
}

# "-resetconfig": the first platform's area set aside whole, and a new
# platform (checked like the first) in a new area.
check_reset() {
    local first second
    first=$(report_value process.pid "$(report_of 1)")
    second=$(report_value process.pid "$(report_of 2)")
    check_that "-resetconfig set the first configuration area aside, unchanged, as ${CONFIGURATION}bak" \
        diff -r "$DEMO_DIR/launch-1.config" "${CONFIGURATION}bak"
    check_that "launch 2 ran a new platform (process ${second:-?}; the first was ${first:-?})" \
        test -n "$second" -a "$second" != "$first"
}

DEFAULT_LAUNCH=""
if [ $# -eq 0 ]; then
    DEFAULT_LAUNCH=yes
    set -- -config verbose
fi

ensure_requirements
build_launcher
prepare_installation
run_launcher 1 "$@"
show_results
if [ -n "$DEFAULT_LAUNCH" ]; then
    run_launcher 2 -resetconfig
    say "After the reset: ${CONFIGURATION}bak and a new $CONFIGURATION"
    (cd "$INST/eclipse" && find .configbak .config -maxdepth 1 | sort)
fi

say "Checks"
check_installed_tree
check_platform_ran 1
if [ -n "$DEFAULT_LAUNCH" ]; then
    check_first_launch
    check_platform_ran 2
    check_reset
fi
if [ "$FAILED" -ne 0 ]; then
    echo "$FAILED check(s) failed"
    exit 1
fi
echo "All checks passed"
