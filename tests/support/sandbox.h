// End-to-end sandbox: a throw-away installation of the built launcher with a
// stub child in place of the platform, a private home directory, and one way
// to run launchers there and collect what happened (exit status, the
// children's argument vectors and environments, the logs).
//
// Layout under the sandbox root (absolute, free of links):
//   inst/rcp/rcplauncher             copy of the built launcher
//   inst/rcp/rcplauncher.properties  launcher properties: launcherProps()
//   inst/base/                       rcpinstall.properties (kInstallProps),
//                                    config.ini, platform.xml
//   inst/base/macosx/x86/eclipse     stub child that user-like configurations start
//   inst/jre/bin/java                stub child that the service configuration starts
//   home1/, home2/, ...              HOME of the launcher (freshHome); USER is "tester"
//
// Every run fails the test when a launcher wrote to the terminal. The test
// process is a child subreaper (Linux), so children the launchers leave
// behind are reaped here: a zombie still answers kill(pid, 0) and would make
// the next launch believe a platform runs. (Elsewhere the system reaps them
// at once.)
//
// RCP_LAUNCHER_WRAPPER (blank-separated words, e.g. "valgrind -q") runs every
// launcher under that command; RCP_LAUNCHER_BINARY names the launcher program
// to install instead of the one built with the tests.
#ifndef RCP_SANDBOX_H
#define RCP_SANDBOX_H

#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <functional>
#include <iostream>
#include <map>
#include <string>
#include <vector>

#include "test_util.h"

namespace rcptest {

using V = std::vector<std::string>;
// The fixed log of launches that fail before their log directory is known.
inline const char* const kTmpLog = "/tmp/rcplauncher.log";
inline const int kNobody = 65534;
inline const std::string kInstallProps =
    "# installation properties of the sandbox\napplication=com.kel.demo.app\n-Dbase.prop=one\n-Xmx256m\n"
    "vmarg.1=-Dvmarg.one=1\ncp=${rcp.home}/lib/boot.jar\nenv.set.RCP_DEMO=hello world\n";
// Launcher properties with id ID42, base ${rcp.home}/base and JVM
// ${rcp.home}/jre/bin/java; "" leaves the configuration out.
inline std::string launcherProps(const std::string& configuration) {
    return "rcp.install.id=ID42\nrcp.base.location=${rcp.home}/base\njvm.location=${rcp.home}/jre/bin/java\n" +
           (configuration.empty() ? "" : "install.configuration=" + configuration + "\n");
}
// True, after saying so, when the test does not run as root: only root can
// run the launcher as another user or plant another user's files.
inline bool notRoot(const std::string& why) { return geteuid() && std::cout << "skipped, needs root: " << why << '\n'; }

// What lies at a path, as text: owner, kind, and a link's target or a regular
// file's bytes ("" when nothing is there). Nothing else is ever opened, so a
// FIFO or a device cannot block or read without end.
std::string entry(const std::string& path);
// Every entry below root by relative path (directories end in "/"). Of the
// launcher's log and lock file, which every launch rewrites, only the owner
// and the kind count.
using Tree = std::map<std::string, std::string>;
Tree snapshot(const std::string& root);
inline V names(const Tree& tree) { V out; for (const auto& e : tree) out.push_back(e.first); return out; }
// The last line that is not empty.
inline std::string lastLine(std::string log) {
    while (!log.empty() && log.back() == '\n') log.pop_back();
    return log.substr(log.rfind('\n') + 1);
}

struct Child {
    long pid = 0;
    std::vector<std::string> argv;
    std::map<std::string, std::string> env;
    // The launcher waited for it. Without a subreaper (macOS) a child that
    // ended by itself before it was looked at counts as waited for too.
    bool reapedByLauncher = false;
    // The index of arg (-1 when absent) and the argument after it ("" when none).
    int index(const std::string& arg) const {
        const auto at = std::find(argv.begin(), argv.end(), arg) - argv.begin();
        return at < static_cast<long>(argv.size()) ? static_cast<int>(at) : -1;
    }
    std::string after(const std::string& arg) const {
        return index(arg) >= 0 && index(arg) + 1u < argv.size() ? argv[index(arg) + 1u] : "";
    }
};

struct Launch {
    V args = {};                                  // after argv[0]
    std::map<std::string, std::string> env = {};  // added to or replacing the sandbox's
    std::string program = "";                     // "": the installed launcher
    int user = -1;                                // run as this uid and gid (root only)
    long killAfterUs = -1;                        // SIGKILL the launcher after this delay
    long fileSizeLimit = -1;                      // no file may grow beyond this (a write beyond it fails)
};

struct Result {
    int status = -1;              // of the first launcher: exit status or 128 + signal (killed after two minutes)
    std::vector<Child> children;  // every child that recorded, in no particular order
    std::string log;              // <the first child's -data, else the default workspace>/logs/rcplauncher.log
    std::string tmpLog;           // entry(kTmpLog) after the run
    const Child& child() const { return children.empty() ? none : children.front(); }
    std::string describe() const { return "\n--- fallback log ---\n" + tmpLog + "\n--- log ---\n" + log; }
    static inline const Child none{};
};

struct Sandbox {
    explicit Sandbox(const std::string& configuration = "user", const std::string& launcherExtra = "",
                     const std::string& installExtra = "");
    // (Re)writes the launcher properties, the base files and both stubs.
    void install(const std::string& configuration, const std::string& launcherExtra = "",
                 const std::string& installExtra = "") const;
    // Switches HOME (and so ws and cfg) to a new empty directory.
    void freshHome();
    std::string path(const std::string& rel) const { return root + "/" + rel; }
    // where: absolute or relative to the root.
    void write(const std::string& where, const std::string& text, int mode = 0644) const {
        writeText(where[0] == '/' ? where : path(where), text, mode);
    }
    void installLauncher(const std::string& where) const {
        const char* binary = getenv("RCP_LAUNCHER_BINARY");
        write(where, readText(binary ? binary : RCP_LAUNCHER_BINARY), 0755);
    }
    void installStub(const std::string& where) const { write(where, readText(RCP_STUB_CHILD), 0755); }
    // Starts the launchers together (each waits at a gate until the last is
    // forked), waits for them, for the record of the child of each one that
    // exited 0 and was not killed (and of any other child that recorded
    // meanwhile), and then ends and reaps every child.
    Result runMany(const std::vector<Launch>& launches);
    Result run(const Launch& launch = {}) { return runMany({launch}); }

    TempDir tmp, scratch;  // records and terminal output stay out of the root
    // The installation's paths (the launcher properties are props), the
    // home, its default workspace HOME/KEL/RCP/ID42/tester and that
    // workspace's configuration area.
    std::string root, inst, base, launcher, props, eclipse, jvm, home, ws, cfg;
    int homes = 0;
};

}  // namespace rcptest

#endif  // RCP_SANDBOX_H
