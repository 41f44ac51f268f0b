// End-to-end sandbox: a throw-away installation of the built launcher with a
// stub child in place of the platform, a private home directory, and a way to
// run the launcher there and collect what happened (exit status, the child's
// argument vector and environment, the logs).
//
// Layout under the sandbox root (all paths absolute and free of links):
//   inst/rcp/rcplauncher             copy of the built launcher (0755)
//   inst/rcp/rcplauncher.properties  launcher properties (writeLauncherProperties)
//   inst/base/...                    base location: rcpinstall.properties,
//                                    config.ini, platform.xml
//   inst/base/macosx/x86/eclipse     stub child: the program user-like
//                                    configurations start
//   inst/jre/bin/java                stub child: the "JVM" that the service
//                                    configuration starts directly
//   home/                            HOME of the launcher; USER is "tester"
//   record, record.1, ...            what each child recorded (stub_child.c)
//
// The test process becomes a subreaper (Linux) so that children the launcher
// leaves behind are reparented to it and reaped here: a zombie still answers
// kill(pid, 0), which would make the next launch believe a platform runs.
//
// When the environment variable RCP_LAUNCHER_WRAPPER is set (blank-separated
// words, e.g. "valgrind -q --error-exitcode=99"), every launcher runs under
// that command: the wrapper is executed with the launcher's path and
// arguments appended (found on the test's PATH unless it holds a slash).
// RCP_LAUNCHER_BINARY, when set, names the launcher program that sandboxes
// install instead of the one built with the tests.
#ifndef RCP_SANDBOX_H
#define RCP_SANDBOX_H

#include <sys/types.h>

#include <ctime>
#include <map>
#include <string>
#include <tuple>
#include <vector>

#include "test_util.h"

namespace rcptest {

// The fixed log of launches that fail before their log directory is known.
extern const char* const kTmpLog;

// What one stub child recorded.
struct ChildRecord {
    long pid = 0;
    std::vector<std::string> argv;
    std::map<std::string, std::string> env;

    // Index of the first argument equal to arg, or -1.
    int argIndex(const std::string& arg) const;
    // The argument after the first one equal to arg, or "" when there is none.
    std::string argAfter(const std::string& arg) const;
    bool hasEnv(const std::string& name) const { return env.count(name) != 0; }
};

struct RunOptions {
    std::vector<std::string> args;               // the launcher's arguments after argv[0]
    std::map<std::string, std::string> env;      // added to / replacing the sandbox environment
    std::string program;                         // what to execute; default: the installed launcher
    int expectChildren = -1;                     // -1: one when the launcher exits 0, else none
    bool keepChildren = false;                   // leave the children running (RCP_STUB_SLEEP)
    int timeoutSeconds = 60;                     // for the launcher itself
    // Run the launcher as this user and group instead of the test's own
    // (needs root; -1: unchanged). The sandbox root is then opened to every
    // user so that the launcher and its children can reach it.
    int uid = -1;
    int gid = -1;
};

struct LaunchResult {
    int status = -1;          // exit status; 128 + signal when killed; -1 on timeout
    bool timedOut = false;
    std::vector<ChildRecord> children;  // in the order they started
    std::string tmpLog;       // /tmp/rcplauncher.log after the run ("" when absent)
    bool tmpLogWritten = false;
    std::string workspace;    // the child's "-data" value, else the default workspace
    std::string log;          // <workspace>/logs/rcplauncher.log
    std::string terminal;     // everything written to stdout and stderr
    std::map<std::string, std::string> launcherEnv;  // the environment the launcher got

    bool hasChild() const { return !children.empty(); }
    // The first child's record; an empty record when there was none.
    const ChildRecord& child() const;
    // Everything a failing check should show: terminal output and both logs.
    std::string describe() const;
};

// A file's bytes and modification time, to prove that a launch left it alone.
struct FileState {
    bool present = false;
    std::string bytes;
    struct timespec mtime = {0, 0};
    bool operator==(const FileState& o) const {
        return std::tie(present, bytes, mtime.tv_sec, mtime.tv_nsec) ==
               std::tie(o.present, o.bytes, o.mtime.tv_sec, o.mtime.tv_nsec);
    }
};
FileState fileState(const std::string& path);

// Every path below root, relative, sorted; directories end in "/".
std::vector<std::string> listTree(const std::string& root);

// The lines of a text without their line ends; empty lines are kept.
std::vector<std::string> splitLines(const std::string& text);
// The lines of a log that are not empty.
std::vector<std::string> logLines(const std::string& log);
// True when line is message + " : " + the system's text for some errno value:
// the form of every error line of the launcher's log.
bool isErrorLine(const std::string& line, const std::string& message);

class Sandbox {
public:
    static constexpr const char* kInstallId = "ID42";
    static constexpr const char* kUser = "tester";

    Sandbox();
    ~Sandbox();
    Sandbox(const Sandbox&) = delete;
    Sandbox& operator=(const Sandbox&) = delete;

    const std::string& root() const { return root_; }
    std::string path(const std::string& rel) const { return root_ + "/" + rel; }
    std::string inst() const { return path("inst"); }
    std::string launcher() const { return path("inst/rcp/rcplauncher"); }
    std::string launcherProperties() const { return path("inst/rcp/rcplauncher.properties"); }
    std::string base() const { return path("inst/base"); }
    std::string eclipse() const { return base() + "/macosx/x86/eclipse"; }
    std::string jvm() const { return path("inst/jre/bin/java"); }
    std::string home() const { return path("home"); }
    // HOME/KEL/RCP/<id>/tester and its configuration area.
    std::string defaultWorkspace(const std::string& installId = kInstallId) const {
        return home() + "/KEL/RCP/" + installId + "/" + kUser;
    }
    std::string defaultConfig(const std::string& installId = kInstallId) const {
        return defaultWorkspace(installId) + "/.config";
    }

    // Writes a file (absolute path, or relative to the sandbox root).
    void writeFile(const std::string& where, const std::string& text, int mode = 0644) const;
    void writeLauncherProperties(const std::string& text) const { writeFile(launcherProperties(), text); }
    void writeBase(const std::string& rel, const std::string& text) const { writeFile(base() + "/" + rel, text); }
    // Copies the stub child to an absolute path, mode 0755.
    void installStub(const std::string& where) const;
    // Copies the built launcher to an absolute path, mode 0755.
    void installLauncher(const std::string& where) const;

    // A complete installation for one install configuration ("" leaves the
    // key out): launcher properties (id ID42, base ${rcp.home}/base, JVM
    // ${rcp.home}/jre/bin/java), the base files and both stub children. The
    // extra texts are appended to the launcher properties and to the base
    // rcpinstall.properties.
    void setupInstall(const std::string& configuration, const std::string& extraLauncherProps = "",
                      const std::string& extraInstallProps = "") const;
    static std::string standardLauncherProperties(const std::string& configuration);
    static std::string standardInstallProperties();
    static std::string standardPlatformXml();
    static std::string standardConfigIni();

    // Runs the launcher and waits for it, then for the records of the
    // children it started, then (unless keepChildren) for those children.
    LaunchResult run(const RunOptions& opts);
    LaunchResult run() { return run(RunOptions()); }
    LaunchResult run(const std::vector<std::string>& args) {
        RunOptions o;
        o.args = args;
        return run(o);
    }

    // Ends the children left running by keepChildren runs.
    void killChildren();

    // Lower-level pieces of run(), for launches that overlap or are cut
    // short. A batch starts with beginRuns() (no records, no fallback log, no
    // terminal output), then any number of start() calls; each started
    // launcher is waited for with waitFor(); collectChildren() gathers the
    // records of every child started since beginRuns().
    void beginRuns() const;
    // Starts the launcher as run() would, without waiting; its terminal
    // output is appended to the batch's.
    pid_t start(const RunOptions& opts) const { return spawn(opts, -1); }
    // Starts one launcher per element that all begin at the same moment:
    // each waits at a gate until the last one is forked.
    std::vector<pid_t> startTogether(const std::vector<RunOptions>& runs) const;
    // The launcher's exit status as in LaunchResult::status; a launcher
    // still running after timeoutSeconds is killed and gives -1.
    int waitFor(pid_t launcher, int timeoutSeconds = 60) const;
    // Waits until at least `expected` records are there (at most
    // timeoutSeconds), then returns all of them in the order they started.
    std::vector<ChildRecord> collectChildren(int expected, int timeoutSeconds = 15) const;
    // Waits for the recorded children to end, or, with keep, leaves them to
    // killChildren() (and the destructor).
    void releaseChildren(const std::vector<ChildRecord>& children, bool keep);
    // Everything the launchers of the batch wrote to the terminal.
    std::string terminalOutput() const { return readText(terminalFile()); }

private:
    std::map<std::string, std::string> environmentFor(const RunOptions& opts) const;
    std::string terminalFile() const { return root_ + "/terminal.out"; }
    std::string record(int i) const { return path("record") + (i ? "." + std::to_string(i) : ""); }
    pid_t spawn(const RunOptions& opts, int gateRead, int gateWrite = -1) const;

    TempDir tmp_;
    std::string root_;
    std::vector<long> kept_;
};

}  // namespace rcptest

#endif  // RCP_SANDBOX_H
