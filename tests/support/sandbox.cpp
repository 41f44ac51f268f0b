#include "sandbox.h"

#include <dirent.h>
#include <fcntl.h>
#include <grp.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>
#ifdef __linux__
#include <sys/prctl.h>
#endif

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <sstream>
#include <stdexcept>
#include <thread>

namespace rcptest {

const char* const kTmpLog = "/tmp/rcplauncher.log";

namespace {

using Clock = std::chrono::steady_clock;

void nap() { std::this_thread::sleep_for(std::chrono::milliseconds(10)); }

// Polls done() until it holds (true) or timeoutSeconds have passed (false).
template <class F>
bool pollUntil(int timeoutSeconds, F done) {
    const auto deadline = Clock::now() + std::chrono::seconds(timeoutSeconds);
    while (!done()) {
        if (Clock::now() > deadline) return false;
        nap();
    }
    return true;
}

// Reaps every finished child of this process that nobody waits for.
void reapOrphans() {
    while (waitpid(-1, nullptr, WNOHANG) > 0) continue;
}

// True once pid is gone: reaped by us, or no longer known to the system.
bool isGone(long pid) {
    pid_t r = waitpid(static_cast<pid_t>(pid), nullptr, WNOHANG);
    if (r == static_cast<pid_t>(pid)) return true;
    return r == -1 && errno == ECHILD && kill(static_cast<pid_t>(pid), 0) == -1 && errno == ESRCH;
}

void waitGone(long pid, int timeoutSeconds) {
    auto gone = [pid] { return isGone(pid); };
    if (pid <= 0 || pollUntil(timeoutSeconds, gone)) return;
    kill(static_cast<pid_t>(pid), SIGKILL);
    pollUntil(5, gone);
}

// The words of RCP_LAUNCHER_WRAPPER, or none.
std::vector<std::string> launcherWrapper() {
    const char* w = getenv("RCP_LAUNCHER_WRAPPER");
    std::istringstream in(w ? w : "");
    return {std::istream_iterator<std::string>(in), std::istream_iterator<std::string>()};
}

// A program name without a slash is looked up on the test's own PATH.
std::string findExecutable(const std::string& name) {
    if (name.find('/') != std::string::npos) return name;
    const char* p = getenv("PATH");
    std::istringstream path(std::string(p ? p : "/usr/bin:/bin") + ":");
    for (std::string dir; std::getline(path, dir, ':');) {
        std::string candidate = (dir.empty() ? "." : dir) + "/" + name;
        if (access(candidate.c_str(), X_OK) == 0) return candidate;
    }
    return name;
}

void copyExecutable(const std::string& from, const std::string& to) {
    std::string data = readText(from);
    if (data.empty()) throw std::runtime_error("cannot read " + from);
    writeText(to, data, 0755);
}

void listInto(const std::string& root, const std::string& rel, std::vector<std::string>& out) {
    DIR* d = opendir((root + "/" + rel).c_str());
    if (!d) return;
    while (dirent* e = readdir(d)) {
        std::string name = e->d_name;
        if (name == "." || name == "..") continue;
        std::string child = rel.empty() ? name : rel + "/" + name;
        bool dir = isDir(root + "/" + child);
        out.push_back(dir ? child + "/" : child);
        if (dir) listInto(root, child, out);
    }
    closedir(d);
}

// Parses the NUL-terminated fields stub_child.c writes; false when malformed.
bool parseChildRecord(const std::string& data, ChildRecord& out) {
    if (data.empty() || data.back() != '\0') return false;
    std::vector<std::string> f;
    for (size_t s = 0, e; s < data.size(); s = e + 1) {
        e = data.find('\0', s);
        f.push_back(data.substr(s, e - s));
    }
    size_t i = 0;
    // tag, then a count no larger than the fields left
    auto tagged = [&](const char* tag, long& n) {
        if (i + 2 > f.size() || f[i] != tag) return false;
        const std::string& v = f[i + 1];
        i += 2;
        char* end = nullptr;
        errno = 0;
        n = strtol(v.c_str(), &end, 10);
        return !v.empty() && errno == 0 && *end == '\0' && n >= 0;
    };
    long n = 0;
    if (!tagged("PID", out.pid) || !tagged("ARGV", n) || static_cast<size_t>(n) > f.size() - i) return false;
    out.argv.assign(f.begin() + static_cast<long>(i), f.begin() + static_cast<long>(i) + n);
    i += static_cast<size_t>(n);
    if (!tagged("ENV", n) || static_cast<size_t>(n) > f.size() - i) return false;
    for (; n > 0; n--, i++) {
        size_t eq = f[i].find('=');
        out.env[f[i].substr(0, eq)] = eq == std::string::npos ? "" : f[i].substr(eq + 1);
    }
    return i + 1 == f.size() && f[i] == "END";
}

}  // namespace

int ChildRecord::argIndex(const std::string& arg) const {
    auto it = std::find(argv.begin(), argv.end(), arg);
    return it == argv.end() ? -1 : static_cast<int>(it - argv.begin());
}

std::string ChildRecord::argAfter(const std::string& arg) const {
    int i = argIndex(arg);
    return i < 0 || static_cast<size_t>(i) + 1 >= argv.size() ? "" : argv[static_cast<size_t>(i) + 1];
}

const ChildRecord& LaunchResult::child() const {
    static const ChildRecord none;
    return children.empty() ? none : children.front();
}

std::string LaunchResult::describe() const {
    return "\n--- terminal ---\n" + terminal + "--- /tmp/rcplauncher.log ---\n" + tmpLog +
           "--- workspace log ---\n" + log;
}

FileState fileState(const std::string& path) {
    FileState s;
    struct stat st;
    if (stat(path.c_str(), &st) != 0) return s;
    s.present = true;
    s.bytes = readText(path);
#ifdef __APPLE__
    s.mtime = st.st_mtimespec;
#else
    s.mtime = st.st_mtim;
#endif
    return s;
}

std::vector<std::string> listTree(const std::string& root) {
    std::vector<std::string> out;
    listInto(root, "", out);
    std::sort(out.begin(), out.end());
    return out;
}

std::vector<std::string> splitLines(const std::string& text) {
    std::vector<std::string> out;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) out.push_back(line);
    return out;
}

std::vector<std::string> logLines(const std::string& log) {
    std::vector<std::string> out = splitLines(log);
    out.erase(std::remove(out.begin(), out.end(), std::string()), out.end());
    return out;
}

bool isErrorLine(const std::string& line, const std::string& message) {
    const std::string prefix = message + " : ";
    if (line.compare(0, prefix.size(), prefix) != 0) return false;
    for (int e = 0; e < 256; e++)
        if (line.substr(prefix.size()) == strerror(e)) return true;
    return false;
}

// ---------------------------------------------------------------------------

Sandbox::Sandbox() {
#ifdef __linux__
    prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
#endif
    char real[PATH_MAX];
    if (!realpath(tmp_.path().c_str(), real)) throw std::runtime_error("realpath failed");
    root_ = real;
    makeDirs(home());
    installLauncher(launcher());
}

Sandbox::~Sandbox() {
    killChildren();
    reapOrphans();
}

void Sandbox::writeFile(const std::string& where, const std::string& text, int mode) const {
    writeText(!where.empty() && where[0] == '/' ? where : path(where), text, mode);
}

void Sandbox::installStub(const std::string& where) const { copyExecutable(RCP_STUB_CHILD, where); }

void Sandbox::installLauncher(const std::string& where) const {
    // A launcher given in the environment (e.g. one that valgrind can fully
    // instrument) replaces the one built with the tests.
    const char* binary = getenv("RCP_LAUNCHER_BINARY");
    copyExecutable(binary && *binary ? binary : RCP_LAUNCHER_BINARY, where);
}

std::string Sandbox::standardLauncherProperties(const std::string& configuration) {
    return "rcp.install.id=" + std::string(kInstallId) +
           "\nrcp.base.location=${rcp.home}/base\njvm.location=${rcp.home}/jre/bin/java\n" +
           (configuration.empty() ? "" : "install.configuration=" + configuration + "\n");
}

std::string Sandbox::standardInstallProperties() {
    return "# installation properties of the sandbox\n"
           "application=com.kel.demo.app\n"
           "-Dbase.prop=one\n"
           "-Xmx256m\n"
           "vmarg.1=-Dvmarg.one=1\n"
           "cp=${rcp.home}/lib/boot.jar\n"
           "env.set.RCP_DEMO=hello world\n";
}

std::string Sandbox::standardPlatformXml() {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
           "<config>\n"
           "  <site url=\"platform:/base/\" enabled=\"true\">\n"
           "    <feature id=\"${jvm.feature.id}\" version=\"1.0\"/>\n"
           "  </site>\n"
           "</config>\n";
}

std::string Sandbox::standardConfigIni() {
    return "osgi.bundles=org.eclipse.core.runtime@start\neclipse.product=com.kel.demo.product\n";
}

void Sandbox::setupInstall(const std::string& configuration, const std::string& extraLauncherProps,
                           const std::string& extraInstallProps) const {
    writeLauncherProperties(standardLauncherProperties(configuration) + extraLauncherProps);
    writeBase("rcpinstall.properties", standardInstallProperties() + extraInstallProps);
    writeBase("config.ini", standardConfigIni());
    writeBase("platform.xml", standardPlatformXml());
    installStub(eclipse());
    installStub(jvm());
}

std::map<std::string, std::string> Sandbox::environmentFor(const RunOptions& opts) const {
    std::map<std::string, std::string> env = opts.env;
    env.insert({{"HOME", home()}, {"USER", kUser}, {"PATH", "/usr/bin:/bin"}, {"LANG", "C.UTF-8"},
                {"RCP_STUB_RECORD", path("record")}});
    // Sanitizer settings of the test run apply to the launcher as well.
    for (const char* name : {"ASAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"})
        if (getenv(name) && !opts.env.count(name)) env[name] = getenv(name);
    return env;
}

std::vector<ChildRecord> Sandbox::collectChildren(int expected, int timeoutSeconds) const {
    std::vector<ChildRecord> records;
    const auto deadline = Clock::now() + std::chrono::seconds(timeoutSeconds);
    for (int i = 0;; i++) {
        const std::string name = record(i);
        // Records are linked into place complete, so existence is enough.
        while (i < expected && !pathExists(name) && Clock::now() < deadline) nap();
        if (!pathExists(name)) return records;
        ChildRecord r;
        if (!parseChildRecord(readText(name), r)) throw std::runtime_error("malformed child record " + name);
        // valgrind removes its own preload library from the environment of
        // the programs its client starts, leaving LD_PRELOAD set but empty;
        // for the loader that is the same as not set.
        if (!launcherWrapper().empty() && r.env.count("LD_PRELOAD") && r.env["LD_PRELOAD"].empty())
            r.env.erase("LD_PRELOAD");
        records.push_back(r);
    }
}

void Sandbox::beginRuns() const {
    for (int i = 0; i < 1000; i++)
        if (unlink(record(i).c_str()) != 0 && i > 0) break;
    // A fallback log we may not remove is emptied instead, so that a run's
    // own can still be told from an older one.
    if (unlink(kTmpLog) != 0 && errno != ENOENT && truncate(kTmpLog, 0) != 0) {
    }
    unlink(terminalFile().c_str());
    reapOrphans();
}

std::vector<pid_t> Sandbox::startTogether(const std::vector<RunOptions>& runs) const {
    int gate[2];
    if (pipe(gate) != 0) throw std::runtime_error("pipe failed");
    fcntl(gate[0], F_SETFD, FD_CLOEXEC);
    fcntl(gate[1], F_SETFD, FD_CLOEXEC);
    std::vector<pid_t> pids;
    for (const auto& opts : runs) pids.push_back(spawn(opts, gate[0], gate[1]));
    // End of file on the gate releases every launcher at once.
    close(gate[1]);
    close(gate[0]);
    return pids;
}

pid_t Sandbox::spawn(const RunOptions& opts, int gateRead, int gateWrite) const {
    // The launcher of another user must reach its program and the stub
    // children their record files.
    if ((opts.uid >= 0 || opts.gid >= 0) && chmod(root_.c_str(), 01777) != 0)
        throw std::runtime_error("cannot open the sandbox to other users");
    std::vector<std::string> argStore = launcherWrapper(), envStore;
    argStore.push_back(opts.program.empty() ? launcher() : opts.program);
    argStore.insert(argStore.end(), opts.args.begin(), opts.args.end());
    const std::string executable = findExecutable(argStore.front()), terminal = terminalFile();
    for (const auto& kv : environmentFor(opts)) envStore.push_back(kv.first + "=" + kv.second);
    std::vector<char*> argv, envp;
    for (auto& a : argStore) argv.push_back(&a[0]);
    for (auto& e : envStore) envp.push_back(&e[0]);
    argv.push_back(nullptr);
    envp.push_back(nullptr);

    pid_t pid = fork();
    if (pid < 0) throw std::runtime_error("fork failed");
    if (pid == 0) {
        if (gateRead >= 0) {
            close(gateWrite);
            char c;
            while (read(gateRead, &c, 1) < 0 && errno == EINTR) {
            }
        }
        int out = open(terminal.c_str(), O_WRONLY | O_CREAT | O_APPEND, 0644);
        int in = open("/dev/null", O_RDONLY);
        if (out < 0 || in < 0 || chdir(root_.c_str()) != 0) _exit(126);
        dup2(in, 0);
        dup2(out, 1);
        dup2(out, 2);
        if (opts.gid >= 0 && (setgroups(0, nullptr) != 0 || setgid(static_cast<gid_t>(opts.gid)) != 0)) _exit(126);
        if (opts.uid >= 0 && setuid(static_cast<uid_t>(opts.uid)) != 0) _exit(126);
        execve(executable.c_str(), argv.data(), envp.data());
        _exit(127);
    }
    return pid;
}

int Sandbox::waitFor(pid_t pid, int timeoutSeconds) const {
    int status = 0;
    pid_t r = 0;
    if (!pollUntil(timeoutSeconds, [&] {
            r = waitpid(pid, &status, WNOHANG);
            return r == pid || (r < 0 && errno != EINTR);
        })) {
        kill(pid, SIGKILL);
        waitpid(pid, &status, 0);
        return -1;
    }
    if (r == pid && WIFEXITED(status)) return WEXITSTATUS(status);
    if (r == pid && WIFSIGNALED(status)) return 128 + WTERMSIG(status);
    return -1;
}

void Sandbox::releaseChildren(const std::vector<ChildRecord>& children, bool keep) {
    for (const auto& c : children) {
        if (keep) kept_.push_back(c.pid);
        else waitGone(c.pid, 15);
    }
    reapOrphans();
}

LaunchResult Sandbox::run(const RunOptions& opts) {
    LaunchResult res;
    res.launcherEnv = environmentFor(opts);
    beginRuns();
    res.status = waitFor(start(opts), opts.timeoutSeconds);
    res.timedOut = res.status == -1;
    res.children = collectChildren(opts.expectChildren >= 0 ? opts.expectChildren : res.status == 0, 15);
    releaseChildren(res.children, opts.keepChildren);
    res.tmpLogWritten = pathExists(kTmpLog);
    res.tmpLog = readText(kTmpLog);
    res.terminal = terminalOutput();
    std::string data = res.child().argAfter("-data");
    res.workspace = data.empty() ? defaultWorkspace() : data;
    res.log = readText(res.workspace + "/logs/rcplauncher.log");
    return res;
}

void Sandbox::killChildren() {
    for (long p : kept_) {
        kill(static_cast<pid_t>(p), SIGKILL);
        waitGone(p, 5);
    }
    kept_.clear();
}

}  // namespace rcptest
