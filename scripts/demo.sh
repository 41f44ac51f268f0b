#!/usr/bin/env bash
# Builds the launcher, installs it with "cmake --install" into a demo
# installation in the build tree, turns that into a real Eclipse platform and
# launches it: the Equinox launcher, framework and runtime and SWT from the
# system, and a small application bundle compiled here. The installation's
# "service" configuration makes the launcher start the system's JVM with
# org.eclipse.core.launcher.Main; the platform's application container runs
# the demo application named by "-application", under the product named by
# "-product". The application reports what the platform was started with,
# opens a window (on the display, or on a virtual one, Xvfb, when there is
# none) and keeps a picture of it.
#
# The first launch ("-config verbose -console -demoRestart") asks for a
# restart the way the platform does: the application starts the launcher
# recorded in args.properties again, with "-restart", and ends; the new
# launcher waits for it to end before it starts the next platform. A third
# launch with "-resetconfig" sets the configuration area aside and starts
# afresh. The script ends with its checks of what it showed, one line each,
# and exits non-zero when one of them fails.
#
#   scripts/demo.sh [launcher arguments...]
#
# Without arguments the launches above run; "-config verbose" is turned by the
# demo's launcher properties into "-debug" (a detailed log, and the
# framework's own debug output) and a VM argument. Other arguments go to the
# launcher instead; the demo then launches once (and follows a restart, if
# the arguments ask for one) and checks only the installed tree and what
# every launch must show, since the exact command line depends on them.
#
# Environment: BUILD_DIR (default <repo>/build), JOBS (default 2),
# RCP_EQUINOX_PLUGINS (the plugins directory of an Eclipse platform, holding
# org.eclipse.equinox.launcher_*.jar, org.eclipse.osgi_*.jar, the runtime's
# bundles and SWT; default /usr/lib/eclipse/plugins, where Debian's packages
# put the Equinox bundles; Debian's SWT and OSGi preferences API come from
# /usr/share/java), DISPLAY (the X display for the window; without one the
# demo starts Xvfb).
# The demo lives in $BUILD_DIR/demo: inst/ is the installation, installed/ the
# tree as "cmake --install" laid it out, home/ the home directory of the demo
# user, launch-<n>.* what each launch printed and logged, its configuration
# area, the picture of its window and its exit status. Each run starts from a
# fresh installation.
set -euo pipefail

ROOT=$(cd "$(dirname "$0")/.." && pwd -P)
BUILD_DIR=${BUILD_DIR:-$ROOT/build}
mkdir -p "$BUILD_DIR"
# The launcher finds its installation from its resolved path, so the expected
# paths must be resolved too.
BUILD_DIR=$(cd "$BUILD_DIR" && pwd -P)
JOBS=${JOBS:-2}
EQUINOX_PLUGINS=${RCP_EQUINOX_PLUGINS:-/usr/lib/eclipse/plugins}
# Debian keeps SWT and the OSGi compendium with its Java libraries.
DEBIAN_JAVA=/usr/share/java
DEMO_DIR=$BUILD_DIR/demo
INST=$DEMO_DIR/inst
DEMO_USER=demo
BUNDLE=com.kel.demo.report
# The service configuration keeps both areas inside the installation.
WORKSPACE=$INST/eclipse/.workspace
CONFIGURATION=$INST/eclipse/.config
# Bounds, in seconds: one launch, and the wait for a restarted launcher.
LAUNCH_TIMEOUT=120
RESTART_TIMEOUT=60

# The platform's bundles besides the Equinox launcher and framework, as
# osgi.bundles of base/config.ini names them, each with its Debian package.
PLATFORM_BUNDLES=(
    org.eclipse.equinox.common:libequinox-common-java
    org.eclipse.core.jobs:libeclipse-core-jobs-java
    org.eclipse.equinox.registry:libequinox-registry-java
    org.osgi.service.prefs:libosgi-compendium-java
    org.eclipse.equinox.preferences:libequinox-preferences-java
    org.eclipse.core.contenttype:libeclipse-core-contenttype-java
    org.eclipse.equinox.app:libequinox-app-java
    org.eclipse.core.runtime:libeclipse-core-runtime-java
    org.eclipse.swt:libswt-gtk-4-java
)

say() { printf '\n=== %s ===\n' "$*"; }

# The newest <name>_<version>.jar (or directory) of the plugins directory, or
# nothing.
plugin_path() {
    local found=("$EQUINOX_PLUGINS/$1"_*)
    [ -e "${found[0]}" ] && printf '%s\n' "${found[@]}" | sort -V | tail -n 1
    return 0
}

# Where a platform bundle comes from: the plugins directory, else Debian's
# Java libraries. Debian has SWT as a bundle there, and the OSGi preferences
# API only inside the OSGi compendium, which prepare_installation turns into
# the bundle that org.eclipse.equinox.preferences requires.
bundle_source() {
    local found
    found=$(plugin_path "$1")
    if [ -z "$found" ]; then
        case $1 in
            org.eclipse.swt) found=$DEBIAN_JAVA/org.eclipse.swt.jar ;;
            org.osgi.service.prefs) found=$DEBIAN_JAVA/osgi.cmpn.jar ;;
        esac
        [ -e "$found" ] || found=""
    fi
    printf '%s' "$found"
}

is_macos() { [ "$(uname -s)" = Darwin ]; }

# The packages come from scripts/install-deps.sh (apt-get on Debian and
# Ubuntu, Homebrew on macOS). Homebrew has no Eclipse, and other systems may
# lack more, so what the demo needs is checked afterwards.
ensure_requirements() {
    "$ROOT/scripts/install-deps.sh" || echo "scripts/install-deps.sh failed; checking what the demo needs" >&2
    local missing=() tool entry
    for tool in cmake java javac jar ps; do
        command -v "$tool" >/dev/null || missing+=("$tool on PATH (cmake; a JDK for java, javac and jar; procps for ps)")
    done
    [ -n "$(plugin_path org.eclipse.equinox.launcher)" ] ||
        missing+=("the Equinox launcher: $EQUINOX_PLUGINS/org.eclipse.equinox.launcher_<version>.jar (libequinox-launcher-java)")
    [ -n "$(plugin_path org.eclipse.osgi)" ] ||
        missing+=("the Equinox framework: $EQUINOX_PLUGINS/org.eclipse.osgi_<version>.jar (libeclipse-osgi-java)")
    for entry in "${PLATFORM_BUNDLES[@]}"; do
        [ -n "$(bundle_source "${entry%%:*}")" ] ||
            missing+=("the bundle ${entry%%:*}: $EQUINOX_PLUGINS/${entry%%:*}_<version>.jar (${entry#*:})")
    done
    if ! is_macos && [ -z "${DISPLAY:-}" ] && ! command -v Xvfb >/dev/null; then
        missing+=("a display for the window: DISPLAY, or Xvfb on PATH (xvfb)")
    fi
    [ ${#missing[@]} -eq 0 ] && return 0
    {
        echo "The demo cannot run; missing:"
        printf '  %s\n' "${missing[@]}"
        echo "Debian and Ubuntu have them in the packages named; elsewhere set RCP_EQUINOX_PLUGINS"
        echo "to the plugins directory of an Eclipse platform (with its SWT)."
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

# The value of a header of a jar's manifest.
manifest_header() {
    local tmp
    tmp=$(mktemp -d)
    (cd "$tmp" && jar xf "$1" META-INF/MANIFEST.MF)
    tr -d '\r' <"$tmp/META-INF/MANIFEST.MF" | sed -n "s/^$2: *//p"
    rm -rf "$tmp"
}

# Debian's OSGi compendium has the preferences API but is no bundle: the
# classes of org.osgi.service.prefs, with a manifest of their own, become the
# bundle org.osgi.service.prefs 1.1.1 (the API's version since OSGi R4.2).
wrap_preferences_api() {
    local compendium=$1 out=$2 tmp
    tmp=$(mktemp -d)
    (cd "$tmp" && jar xf "$compendium" org/osgi/service/prefs &&
        printf '%s\n' "Bundle-ManifestVersion: 2" "Bundle-SymbolicName: org.osgi.service.prefs" \
            "Bundle-Version: 1.1.1" 'Export-Package: org.osgi.service.prefs;version="1.1.1"' >manifest &&
        jar cfm "$out" manifest org)
    rm -rf "$tmp"
}

# Copies a platform bundle into the installation's plugins directory, as
# <name>_<version>.jar, the form the framework looks for.
add_bundle() {
    local name=$1 source plugins=$INST/eclipse/plugins
    source=$(bundle_source "$name")
    case $source in
        "$EQUINOX_PLUGINS"/*) cp -RL "$source" "$plugins/" ;;
        */osgi.cmpn.jar) wrap_preferences_api "$source" "$plugins/${name}_1.1.1.jar" ;;
        *) cp -L "$source" "$plugins/${name}_$(manifest_header "$source" Bundle-Version).jar" ;;
    esac
}

# The packaged installation tree, completed into a runnable platform.
prepare_installation() {
    say "Installing into $INST (cmake --install)"
    rm -rf "$DEMO_DIR"
    mkdir -p "$DEMO_DIR/home"
    cmake --install "$BUILD_DIR" --prefix "$INST"
    # Kept as installed for the checks; the platform is added to inst/ only.
    cp -a "$INST" "$DEMO_DIR/installed"

    local plugins=$INST/eclipse/plugins entry fragment
    JAVA=$(command -v java)
    FRAMEWORK=$(plugin_path org.eclipse.osgi)
    say "Adding the platform: JVM $JAVA, Eclipse from $EQUINOX_PLUGINS, bundle $BUNDLE"
    set_property "$INST/rcp/rcplauncher.properties" jvm.location "$JAVA"
    # Copies, not links: the Equinox launcher takes the directory of its
    # resolved jar as the install area and looks for the framework there.
    cp -L "$(plugin_path org.eclipse.equinox.launcher)" "$plugins/org.eclipse.equinox.launcher.jar"
    cp -L "$FRAMEWORK" "$plugins/"
    for entry in "${PLATFORM_BUNDLES[@]}"; do
        add_bundle "${entry%%:*}"
    done
    # An Eclipse platform's SWT has its native code in a fragment of its own
    # (org.eclipse.swt.<toolkit>.<system>.<architecture>), which the
    # framework installs only when osgi.bundles names it; Debian's SWT loads
    # the system's libraries instead.
    for fragment in "$EQUINOX_PLUGINS"/org.eclipse.swt.*_*; do
        [ -e "$fragment" ] || continue
        cp -RL "$fragment" "$plugins/"
        fragment=$(basename "$fragment")
        set_property "$INST/base/config.ini" osgi.bundles \
            "$(sed -n 's/^osgi\.bundles=//p' "$INST/base/config.ini"),${fragment%%_*}"
    done

    # On macOS SWT runs only on the process's first thread, which the JVM
    # gives to Java's main thread with this option (see rcpinstall.properties).
    FIRST_THREAD=()
    if is_macos; then
        FIRST_THREAD=(-XstartOnFirstThread)
        awk '{ print } /^vmarg\.1=/ { print "vmarg.2=-XstartOnFirstThread" }' \
            "$INST/base/rcpinstall.properties" >"$INST/base/rcpinstall.properties.tmp"
        mv "$INST/base/rcpinstall.properties.tmp" "$INST/base/rcpinstall.properties"
    fi

    # The demo application, compiled against the platform's bundles.
    local bundle_dir=$plugins/${BUNDLE}_1.0.0 classpath
    mkdir -p "$bundle_dir/META-INF"
    cp "$ROOT/demo/bundle/META-INF/MANIFEST.MF" "$bundle_dir/META-INF/"
    cp "$ROOT/demo/bundle/plugin.xml" "$bundle_dir/"
    classpath=$(find "$plugins" -maxdepth 1 -name '*.jar' | sort | tr '\n' ':')
    find "$ROOT/demo/bundle/src" -name '*.java' -print0 |
        xargs -0 javac --release 11 -Xlint:all -Werror -encoding UTF-8 -cp "$classpath" -d "$bundle_dir"
    (cd "$INST" && find . -path ./eclipse/plugins/"$BUNDLE"_1.0.0/com -prune -o -print | sort)
}

# SWT needs an X display on Linux: the user's, or a virtual one (Xvfb) for as
# long as the demo runs. PLATFORM_DISPLAY is what the platform gets of it.
PLATFORM_DISPLAY=()
XVFB_PID=""
start_display() {
    is_macos && return 0
    if [ -n "${DISPLAY:-}" ]; then
        say "Display: $DISPLAY"
        PLATFORM_DISPLAY=("DISPLAY=$DISPLAY")
        # The launches get another home directory, so the user's X
        # authority goes with them.
        local authority=${XAUTHORITY:-${HOME:-/nonexistent}/.Xauthority}
        [ -f "$authority" ] && PLATFORM_DISPLAY+=("XAUTHORITY=$authority")
        return 0
    fi
    # Xvfb picks a free display number itself and writes it to descriptor 3
    # once it accepts connections.
    Xvfb -displayfd 3 -screen 0 1280x800x24 -nolisten tcp 3>"$DEMO_DIR/xvfb.display" >"$DEMO_DIR/xvfb.log" 2>&1 &
    XVFB_PID=$!
    trap stop_display EXIT
    local tenths=0
    while ! grep -q '[0-9]' "$DEMO_DIR/xvfb.display" 2>/dev/null; do
        if [ $tenths -ge 100 ] || ! kill -0 "$XVFB_PID" 2>/dev/null; then
            echo "Xvfb did not start:" >&2
            cat "$DEMO_DIR/xvfb.log" >&2
            exit 1
        fi
        sleep 0.1
        tenths=$((tenths + 1))
    done
    PLATFORM_DISPLAY=("DISPLAY=:$(tr -dc 0-9 <"$DEMO_DIR/xvfb.display")")
    say "Display: ${PLATFORM_DISPLAY[0]#DISPLAY=} (Xvfb, process $XVFB_PID)"
}
stop_display() {
    [ -n "$XVFB_PID" ] && kill "$XVFB_PID" 2>/dev/null
    return 0
}

# A process that runs, as opposed to one that has ended (a zombie, which
# nobody may have reaped yet, has ended).
is_running() {
    local stat
    stat=$(ps -o stat= -p "$1" 2>/dev/null) || return 1
    [[ $stat != Z* ]]
}

# The platform process of launch <n>, as it printed it; its report, in the
# copy of the configuration area taken when that launch had ended.
platform_pid() { sed -n 's/^process\.pid=//p' "$DEMO_DIR/launch-$1.out" | head -n 1; }
report_of() { echo "$DEMO_DIR/launch-$1.config/$BUNDLE/$(platform_pid "$1")/report.properties"; }

LAUNCHES=0

# Launch <n>: runs the launcher with a clean environment; JAVA_HOME is set
# only to show that the platform does not get it. "-rcpLauncherWait" keeps
# the launcher until the platform has ended, and nothing waits on standard
# input. The platform's output goes to launch-<n>.out and is shown
# afterwards, with the launcher's exit status.
run_launcher() {
    local limit=()
    LAUNCHES=$((LAUNCHES + 1))
    command -v timeout >/dev/null && limit=(timeout "$LAUNCH_TIMEOUT")
    say "Launch $LAUNCHES: $INST/rcp/rcplauncher -rcpLauncherWait $*"
    local status=0
    ${limit[@]+"${limit[@]}"} env -i HOME="$DEMO_DIR/home" USER="$DEMO_USER" PATH=/usr/bin:/bin LANG=C.UTF-8 \
        JAVA_HOME=/opt/removed-by-the-launcher ${PLATFORM_DISPLAY[@]+"${PLATFORM_DISPLAY[@]}"} \
        "$INST/rcp/rcplauncher" -rcpLauncherWait "$@" </dev/null >"$DEMO_DIR/launch-$LAUNCHES.out" 2>&1 || status=$?
    echo "$status" >"$DEMO_DIR/launch-$LAUNCHES.status"
    launch_ended
    cat "$DEMO_DIR/launch-$LAUNCHES.out"
    echo "launcher exit status: $status"
    follow_restarts
}

# A platform that asked for a restart started the launcher itself, so the
# demo cannot wait for it: it watches the process until it has ended. Its
# output (the next platform's) is in the requesting platform's directory.
follow_restarts() {
    local first=$LAUNCHES report launcher tenths
    while true; do
        report=$CONFIGURATION/$BUNDLE/$(platform_pid "$LAUNCHES")/report.properties
        launcher=$(report_value restart.launcher.pid "$report")
        [ -n "$launcher" ] || break
        LAUNCHES=$((LAUNCHES + 1))
        say "Launch $LAUNCHES: the platform restarted: $(report_list restart.command. "$report" | paste -s -d ' ' -)"
        tenths=0
        while is_running "$launcher" && [ $tenths -lt $((RESTART_TIMEOUT * 10)) ]; do
            sleep 0.1
            tenths=$((tenths + 1))
        done
        launch_ended
        cp "$CONFIGURATION/$BUNDLE/$(platform_pid $((LAUNCHES - 1)))/restart.out" "$DEMO_DIR/launch-$LAUNCHES.out" ||
            : >"$DEMO_DIR/launch-$LAUNCHES.out"
        cat "$DEMO_DIR/launch-$LAUNCHES.out"
        if is_running "$launcher"; then
            echo "the restarted launcher (process $launcher) still runs after $RESTART_TIMEOUT s"
        else
            echo "the restarted launcher (process $launcher) has ended"
        fi
    done
    # The configuration area as the last of these platforms left it; theirs
    # share it (each platform keeps its files in a directory of its own).
    local n dir
    for ((n = first; n <= LAUNCHES; n++)); do
        mkdir -p "$DEMO_DIR/launch-$n.config"
        if [ -d "$CONFIGURATION" ]; then cp -a "$CONFIGURATION/." "$DEMO_DIR/launch-$n.config"; fi
        dir=$(dirname "$(report_of "$n")")
        cp "$dir/window.png" "$DEMO_DIR/launch-$n.png" 2>/dev/null || true
        # The next launch rewrites the launcher's log, a restarted one even
        # while this platform runs: the platform kept a copy.
        if [ -f "$dir/rcplauncher.log" ]; then cp "$dir/rcplauncher.log" "$DEMO_DIR/launch-$n.log"; fi
    done
}

# Right after a launcher's end: the processes then running (to show that
# the platform had ended), the platform lock, and the launcher's log.
launch_ended() {
    local n=$LAUNCHES
    ps -A -o pid=,stat= >"$DEMO_DIR/launch-$n.ps"
    cp "$WORKSPACE/.rcp.lock" "$DEMO_DIR/launch-$n.lock" 2>/dev/null || : >"$DEMO_DIR/launch-$n.lock"
    cp "$WORKSPACE/logs/rcplauncher.log" "$DEMO_DIR/launch-$n.log" 2>/dev/null || : >"$DEMO_DIR/launch-$n.log"
}

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
        # The platform printed its whole report above; here is the command
        # line from it, as the JVM process itself saw it (argv[0] is the JVM).
        say "The platform's command line, reported from inside the JVM ($(report_of 1))"
        sed -n 's/^jvm\.location=/    /p' "$INST/rcp/rcplauncher.properties"
        sed -n 's/^jvm\.arg\.[0-9]*=/    /p' "$(report_of 1)"
    fi
    local n
    say "The windows, as the platforms drew them"
    for ((n = 1; n <= LAUNCHES; n++)); do
        [ -f "$DEMO_DIR/launch-$n.png" ] && echo "$DEMO_DIR/launch-$n.png"
    done
    return 0
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
report_lines() { grep -F "$1" "$2" 2>/dev/null | grep "^$1" || true; }
# The values of prefix0, prefix1, ... one a line.
report_list() { sed -n "s/^$1[0-9]*=//p" "$2" 2>/dev/null || true; }
report_value() { sed -n "s/^$1=//p" "$2" 2>/dev/null || true; }
# The line after the line that is exactly label.
line_after() { awk -v label="$1" 'found { print; exit } $0 == label { found = 1 }' "$2"; }
# The messages of the framework's logs in a configuration area, but the one
# about the console bundle that "-console" asks for.
logged_failures() {
    find "$1" -maxdepth 1 -name '*.log' -exec cat {} + | grep '^!MESSAGE' |
        grep -vx '!MESSAGE Could not find bundle: org.eclipse.equinox.console' || true
}
# A process (given) that a "ps -A -o pid=,stat=" listing (taken) does not show.
not_listed() { [ -n "$1" ] && [ -s "$2" ] && ! awk -v pid="$1" '$1 == pid { found = 1 } END { exit !found }' "$2"; }
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

# What every launch must show, whatever its arguments: the framework ran in
# the configuration area the launcher prepared, the application the launcher
# named ran in the workspace it computed, drew its window and returned, and
# the platform had ended when its launcher did. A launch that the platform
# started (a restart) has no exit status here.
check_platform_ran() {
    local n=$1 area=$DEMO_DIR/launch-$1.config report pid
    report=$(report_of "$n")
    pid=$(platform_pid "$n")
    [ -f "$DEMO_DIR/launch-$n.status" ] &&
        check_same "launch $n: the launcher exited with status 0" 0 "$(cat "$DEMO_DIR/launch-$n.status")"
    check_that "launch $n: the framework keeps its state in the configuration area's org.eclipse.osgi/" \
        test -f "$area/org.eclipse.osgi/framework.info.1" -a -d "$area/org.eclipse.osgi/.manager"
    check_that "launch $n: the framework read the base config.ini, copied into the configuration area" \
        cmp "$INST/base/config.ini" "$area/config.ini"
    check_that "launch $n: the configuration area has the update-site record" \
        test -f "$area/org.eclipse.update/platform.xml"
    # Equinox writes what went wrong to <time>.log in the configuration area;
    # "-console" there makes it look for a console bundle, which this
    # platform does not have (see config.ini).
    check_same "launch $n: the framework logged no failure (in *.log of the configuration area), apart from the console bundle" \
        "" "$(logged_failures "$area")"
    check_same "launch $n: the application container ran the demo application of the product, in the launcher's workspace and configuration area" \
        "product.id=com.kel.demo.product
product.name=rcplauncher demo
product.application=com.kel.demo.application
location.instance=file:$WORKSPACE/
location.configuration=file:$CONFIGURATION/
location.install=file:$INST/eclipse/" \
        "$(report_lines product. "$report"; report_lines location. "$report")"
    local width height facts
    width=$(report_value window.width "$report")
    height=$(report_value window.height "$report")
    facts=$(sed -n "${n}p" "$DEMO_DIR/images")
    check_same "launch $n: the window, titled with the product name, is pictured in launch-$n.png: its size (${width:-?}x${height:-?}), more than one colour" \
        "window.title=rcplauncher demo
$width $height more than one colour" \
        "$(report_lines window.title= "$report"; awk '{ print $1, $2, ($3 > 1 ? "more than one colour" : $3 " colour(s)") }' <<<"$facts")"
    check_same "launch $n: the application's exit value became the JVM's" \
        "process.exit.code=0" "$(report_lines process.exit.code= "$report")"
    check_same "launch $n: the platform lock named the platform (process ${pid:-?}) while it ran" \
        "lock.pid=${pid:-<no pid reported>}" "$(report_lines lock.pid= "$report")"
    check_that "launch $n: the platform had ended when its launcher did" not_listed "$pid" "$DEMO_DIR/launch-$n.ps"
}

# The first default launch in full: the command line the launcher logged, and
# what the platform received, as the application reports it.
check_first_launch() {
    local out=$DEMO_DIR/launch-1.out report
    local command_line
    report=$(report_of 1)
    command_line=$(printf '%s\n' "$JAVA" \
        -Ddemo.verbose=true -Dfile.encoding=UTF-8 ${FIRST_THREAD[@]+"${FIRST_THREAD[@]}"} \
        "-Drcp.home=$INST" "-Drcp.data=$WORKSPACE" -Dcom.kel.rcp.install.id=DEMO1 -Drcp.install.config=service \
        -Ddemo.greeting=hello "-Drcp.osgi.install.area=$INST/eclipse" -Xmx256m \
        -cp "$INST/eclipse/plugins/org.eclipse.equinox.launcher.jar" org.eclipse.core.launcher.Main -nosplash \
        -rcpLauncherWait -console -demoRestart -debug -data "$WORKSPACE" -configuration "$CONFIGURATION" \
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
property.demo.verbose=true" \
        "$(report_lines property. "$report")"
    # The framework takes -console, -debug, -data, -configuration and
    # -nosplash, the runtime -application and -product; the rest,
    # "-XstartOnFirstThread" last, is left for the application.
    check_same "the application's arguments, -XstartOnFirstThread last" \
        "-rcpLauncherWait
-demoRestart
-XstartOnFirstThread" \
        "$(report_list application.arg. "$report")"
    check_same "the platform's environment: no JAVA_HOME, the launcher's JAVA_HIGH_ZIPFDS, library path and env.set value" \
        "env.JAVA_HIGH_ZIPFDS=500
env.LD_LIBRARY_PATH=$INST/lib
env.RCP_DEMO_GREETING=Hello from rcpinstall.properties" \
        "$(report_lines env. "$report")"
}

# The restart of platform 1 into platform 2, as the platform asks for one.
check_restart() {
    local first second launcher requested ended started
    first=$(report_of 1)
    second=$(report_of 2)
    launcher=$(report_value restart.launcher.pid "$first")
    check_same "platform 1 started the launcher recorded in args.properties again, with -restart" \
        "$INST/rcp/rcplauncher
-rcpLauncherWait
-config
verbose
-console
-demoRestart
-restart" \
        "$(report_list restart.command. "$first")"
    check_same "platform 2 was started by that launcher (process ${launcher:-?}) for platform 1" \
        "process.parent.pid=${launcher:-<none reported>}
restart.requested.by=$(platform_pid 1)" \
        "$(report_lines process.parent.pid= "$second"; report_lines restart.requested.by= "$second")"
    # Times in milliseconds, from the platforms' reports: the restart
    # requested, platform 1's JVM exiting, platform 2's JVM started.
    requested=$(report_value restart.requested "$first")
    ended=$(report_value process.exiting "$first")
    started=$(report_value process.started "$second")
    check_that "launcher 2 waited for platform 1 to end (+$((${ended:-0} - ${requested:-0})) ms) before it started platform 2 (+$((${started:-0} - ${requested:-0})) ms)" \
        test "${requested:-0}" -gt 0 -a "${requested:-0}" -lt "${ended:-0}" -a "${ended:-0}" -lt "${started:-0}"
    check_same "the platform lock names platform 2 in the end" \
        "$(platform_pid 2)" "$(tr -d ' ' <"$DEMO_DIR/launch-2.lock")"
    # Without "-console" (or with "-restart") the launcher adds the JVM
    # argument of vmfix.noconsole, after those of "-vmargs".
    check_same "-debug and -console did not reach platform 2: its command line is platform 1's without them, with vmfix.noconsole's argument" \
        "$(report_list jvm.arg. "$first" | grep -vx -e -debug -e -console |
            awk -v fix="-Ddemo.workspace=$WORKSPACE" '{ print } $0 == "-Ddemo.verbose=true" { print fix }')" \
        "$(report_list jvm.arg. "$second")"
}

# "-resetconfig" after the restart: the area the two platforms left set
# aside whole, and a new platform (checked like the others) in a new area.
check_reset() {
    check_that "-resetconfig set the configuration area aside, unchanged, as ${CONFIGURATION}bak" \
        diff -r "$DEMO_DIR/launch-2.config" "${CONFIGURATION}bak"
    check_that "launch 3 ran a new platform (process $(platform_pid 3); the one before was $(platform_pid 2))" \
        test -n "$(platform_pid 3)" -a "$(platform_pid 3)" != "$(platform_pid 2)"
}

DEFAULT_LAUNCH=""
if [ $# -eq 0 ]; then
    DEFAULT_LAUNCH=yes
    set -- -config verbose -console -demoRestart
fi

ensure_requirements
build_launcher
prepare_installation
start_display
run_launcher "$@"
show_results
if [ -n "$DEFAULT_LAUNCH" ]; then
    run_launcher -resetconfig
    say "After the reset: ${CONFIGURATION}bak and a new $CONFIGURATION"
    (cd "$INST/eclipse" && find .configbak .config -maxdepth 1 | sort)
fi

say "Checks"
# Width, height and colours of each launch's picture, one line per launch.
images=()
for ((n = 1; n <= LAUNCHES; n++)); do images+=("$DEMO_DIR/launch-$n.png"); done
java -Djava.awt.headless=true "$ROOT/demo/tools/ImageFacts.java" "${images[@]}" >"$DEMO_DIR/images"
check_installed_tree
for ((n = 1; n <= LAUNCHES; n++)); do
    check_platform_ran "$n"
done
if [ -n "$DEFAULT_LAUNCH" ]; then
    check_first_launch
    check_restart
    check_reset
fi
if [ "$FAILED" -ne 0 ]; then
    echo "$FAILED check(s) failed"
    exit 1
fi
echo "All checks passed"
