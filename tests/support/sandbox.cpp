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
#include <cctype>
#include <cerrno>
#include <chrono>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <stdexcept>
#include <thread>

#include "test_util.h"

namespace rcptest {

const char* const kTmpLog = "/tmp/rcplauncher.log";

namespace {

using Clock = std::chrono::steady_clock;

void nap() { std::this_thread::sleep_for(std::chrono::milliseconds(10)); }

// Reaps every finished child of this process that nobody waits for.
void reapOrphans() {
    int status;
    while (waitpid(-1, &status, WNOHANG) > 0) {
    }
}

void becomeSubreaper() {
#ifdef __linux__
    static bool done = false;
    if (!done) {
        prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
        done = true;
    }
#endif
}

// True once pid is gone: reaped by us, or no longer known to the system.
bool isGone(long pid) {
    int status;
    pid_t r = waitpid(static_cast<pid_t>(pid), &status, WNOHANG);
    if (r == static_cast<pid_t>(pid)) return true;
    if (r == -1 && errno == ECHILD) return kill(static_cast<pid_t>(pid), 0) == -1 && errno == ESRCH;
    return false;
}

void waitGone(long pid, int timeoutSeconds) {
    if (pid <= 0) return;
    auto deadline = Clock::now() + std::chrono::seconds(timeoutSeconds);
    while (!isGone(pid)) {
        if (Clock::now() > deadline) {
            kill(static_cast<pid_t>(pid), SIGKILL);
            deadline = Clock::now() + std::chrono::seconds(5);
            while (!isGone(pid) && Clock::now() < deadline) nap();
            return;
        }
        nap();
    }
}

// The words of RCP_LAUNCHER_WRAPPER, or none.
std::vector<std::string> launcherWrapper() {
    std::vector<std::string> words;
    const char* w = getenv("RCP_LAUNCHER_WRAPPER");
    std::string text = w ? w : "";
    size_t i = 0;
    while (i < text.size()) {
        while (i < text.size() && isspace(static_cast<unsigned char>(text[i]))) i++;
        size_t start = i;
        while (i < text.size() && !isspace(static_cast<unsigned char>(text[i]))) i++;
        if (i > start) words.push_back(text.substr(start, i - start));
    }
    return words;
}

// A program name without a slash is looked up on the test's own PATH.
std::string findExecutable(const std::string& name) {
    if (name.find('/') != std::string::npos) return name;
    const char* p = getenv("PATH");
    std::string path = p ? p : "/usr/bin:/bin";
    size_t start = 0;
    while (start <= path.size()) {
        size_t end = path.find(':', start);
        if (end == std::string::npos) end = path.size();
        std::string candidate = (end > start ? path.substr(start, end - start) : ".") + "/" + name;
        if (access(candidate.c_str(), X_OK) == 0) return candidate;
        start = end + 1;
    }
    return name;
}

void copyExecutable(const std::string& from, const std::string& to) {
    std::string data = readText(from);
    if (data.empty()) throw std::runtime_error("cannot read " + from);
    writeText(to, data, 0755);
}

// Removes /tmp/rcplauncher.log so that a run's fallback log can be told from
// an older one; a file we may not remove is emptied instead.
void resetTmpLog() {
    if (unlink(kTmpLog) != 0 && errno != ENOENT) {
        int fd = open(kTmpLog, O_WRONLY | O_TRUNC);
        if (fd >= 0) close(fd);
    }
}

std::string recordName(const std::string& base, int i) {
    return i == 0 ? base : base + "." + std::to_string(i);
}

void listInto(const std::string& root, const std::string& rel, std::vector<std::string>& out) {
    DIR* d = opendir((root + "/" + rel).c_str());
    if (!d) return;
    while (dirent* e = readdir(d)) {
        std::string name = e->d_name;
        if (name == "." || name == "..") continue;
        std::string child = rel.empty() ? name : rel + "/" + name;
        if (isDir(root + "/" + child)) {
            out.push_back(child + "/");
            listInto(root, child, out);
        } else {
            out.push_back(child);
        }
    }
    closedir(d);
}

}  // namespace

int ChildRecord::argIndex(const std::string& arg) const {
    for (size_t i = 0; i < argv.size(); i++)
        if (argv[i] == arg) return static_cast<int>(i);
    return -1;
}

std::string ChildRecord::argAfter(const std::string& arg) const {
    int i = argIndex(arg);
    if (i < 0 || static_cast<size_t>(i) + 1 >= argv.size()) return "";
    return argv[static_cast<size_t>(i) + 1];
}

bool parseChildRecord(const std::string& data, ChildRecord& out) {
    std::vector<std::string> fields;
    size_t start = 0;
    while (start < data.size()) {
        size_t end = data.find('\0', start);
        if (end == std::string::npos) return false;  // a field without its terminator
        fields.push_back(data.substr(start, end - start));
        start = end + 1;
    }
    size_t i = 0;
    auto next = [&](std::string& f) {
        if (i >= fields.size()) return false;
        f = fields[i++];
        return true;
    };
    auto number = [&](long& n) {
        std::string f;
        if (!next(f) || f.empty()) return false;
        char* end = nullptr;
        errno = 0;
        n = strtol(f.c_str(), &end, 10);
        return errno == 0 && *end == '\0' && n >= 0;
    };
    std::string tag;
    long count = 0;
    ChildRecord r;
    if (!next(tag) || tag != "PID" || !number(r.pid)) return false;
    if (!next(tag) || tag != "ARGV" || !number(count)) return false;
    for (long k = 0; k < count; k++) {
        std::string a;
        if (!next(a)) return false;
        r.argv.push_back(a);
    }
    if (!next(tag) || tag != "ENV" || !number(count)) return false;
    for (long k = 0; k < count; k++) {
        std::string e;
        if (!next(e)) return false;
        size_t eq = e.find('=');
        if (eq == std::string::npos) r.env[e] = "";
        else r.env[e.substr(0, eq)] = e.substr(eq + 1);
    }
    if (!next(tag) || tag != "END" || i != fields.size()) return false;
    out = r;
    return true;
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
    size_t start = 0;
    while (start < text.size()) {
        size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        out.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return out;
}

std::vector<std::string> logLines(const std::string& log) {
    std::vector<std::string> out;
    for (auto& l : splitLines(log))
        if (!l.empty()) out.push_back(l);
    return out;
}

bool isErrorLine(const std::string& line, const std::string& message) {
    std::string prefix = message + " : ";
    if (line.compare(0, prefix.size(), prefix) != 0) return false;
    std::string suffix = line.substr(prefix.size());
    for (int e = 0; e < 256; e++)
        if (suffix == strerror(e)) return true;
    return false;
}

// ---------------------------------------------------------------------------

Sandbox::Sandbox() {
    becomeSubreaper();
    const char* t = getenv("TMPDIR");
    std::string tmpl = std::string(t && *t ? t : "/tmp") + "/rcpe2e.XXXXXX";
    std::vector<char> buf(tmpl.begin(), tmpl.end());
    buf.push_back('\0');
    if (!mkdtemp(buf.data())) throw std::runtime_error("mkdtemp failed");
    tempDir_ = buf.data();
    char real[PATH_MAX];
    if (!realpath(tempDir_.c_str(), real)) throw std::runtime_error("realpath failed");
    root_ = real;
    makeDirs(home());
    installLauncher(launcher());
}

Sandbox::~Sandbox() {
    killChildren();
    reapOrphans();
    removeTree(tempDir_);
}

std::string Sandbox::defaultWorkspace(const std::string& installId) const {
    return home() + "/KEL/RCP/" + installId + "/" + kUser;
}

void Sandbox::writeFile(const std::string& where, const std::string& text, int mode) const {
    writeText(!where.empty() && where[0] == '/' ? where : path(where), text, mode);
}

void Sandbox::writeLauncherProperties(const std::string& text) const { writeFile(launcherProperties(), text); }

void Sandbox::writeBase(const std::string& rel, const std::string& text) const { writeFile(base() + "/" + rel, text); }

void Sandbox::installStub(const std::string& where) const { copyExecutable(RCP_STUB_CHILD, where); }

void Sandbox::installLauncher(const std::string& where) const {
    // A launcher given in the environment (e.g. one that valgrind can fully
    // instrument) replaces the one built with the tests.
    const char* binary = getenv("RCP_LAUNCHER_BINARY");
    copyExecutable(binary && *binary ? binary : RCP_LAUNCHER_BINARY, where);
}

std::string Sandbox::standardLauncherProperties(const std::string& configuration) {
    std::string text =
        "rcp.install.id=" + std::string(kInstallId) + "\n"
        "rcp.base.location=${rcp.home}/base\n"
        "jvm.location=${rcp.home}/jre/bin/java\n";
    if (!configuration.empty()) text += "install.configuration=" + configuration + "\n";
    return text;
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
    return "osgi.bundles=org.eclipse.core.runtime@start\n"
           "eclipse.product=com.kel.demo.product\n";
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
    std::map<std::string, std::string> env = {
        {"HOME", home()},
        {"USER", kUser},
        {"PATH", "/usr/bin:/bin"},
        {"LANG", "C.UTF-8"},
        {"RCP_STUB_RECORD", path("record")},
    };
    // Sanitizer settings of the test run apply to the launcher as well.
    for (const char* name : {"ASAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"})
        if (const char* v = getenv(name)) env[name] = v;
    for (const auto& kv : opts.env) env[kv.first] = kv.second;
    for (const auto& name : opts.unset) env.erase(name);
    return env;
}

void Sandbox::clearRecords() const {
    for (int i = 0; i < 1000; i++)
        if (unlink(recordName(path("record"), i).c_str()) != 0 && i > 0) break;
}

std::vector<ChildRecord> Sandbox::collectRecords(int expected, int timeoutSeconds) const {
    std::vector<ChildRecord> records;
    auto deadline = Clock::now() + std::chrono::seconds(timeoutSeconds);
    for (int i = 0;; i++) {
        std::string name = recordName(path("record"), i);
        // Records are linked into place complete, so existence is enough.
        while (i < expected && !pathExists(name) && Clock::now() < deadline) nap();
        if (!pathExists(name)) break;
        ChildRecord r;
        if (!parseChildRecord(readText(name), r)) throw std::runtime_error("malformed child record " + name);
        // valgrind removes its own preload library from the environment of
        // the programs its client starts, leaving LD_PRELOAD set but empty;
        // for the loader that is the same as not set.
        auto preload = r.env.find("LD_PRELOAD");
        if (!launcherWrapper().empty() && preload != r.env.end() && preload->second.empty()) r.env.erase(preload);
        records.push_back(r);
    }
    return records;
}

void Sandbox::beginRuns() const {
    clearRecords();
    resetTmpLog();
    unlink(terminalFile().c_str());
    reapOrphans();
}

pid_t Sandbox::start(const RunOptions& opts) const { return spawn(opts, -1); }

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
    const std::string program = opts.program.empty() ? launcher() : opts.program;
    if (opts.uid >= 0 || opts.gid >= 0) {
        // The launcher of another user must reach its program and the stub
        // children their record files.
        if (chmod(root_.c_str(), 01777) != 0) throw std::runtime_error("cannot open the sandbox to other users");
    }

    std::vector<std::string> argStore = launcherWrapper();
    argStore.push_back(program);
    argStore.insert(argStore.end(), opts.args.begin(), opts.args.end());
    const std::string executable = findExecutable(argStore.front());
    std::vector<std::string> envStore;
    for (const auto& kv : environmentFor(opts)) envStore.push_back(kv.first + "=" + kv.second);
    std::vector<char*> argv, envp;
    for (auto& a : argStore) argv.push_back(&a[0]);
    argv.push_back(nullptr);
    for (auto& e : envStore) envp.push_back(&e[0]);
    envp.push_back(nullptr);
    const std::string terminal = terminalFile();

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
    auto deadline = Clock::now() + std::chrono::seconds(timeoutSeconds);
    int status = 0;
    for (;;) {
        pid_t r = waitpid(pid, &status, WNOHANG);
        if (r == pid) break;
        if (r < 0 && errno != EINTR) return -1;
        if (Clock::now() > deadline) {
            kill(pid, SIGKILL);
            waitpid(pid, &status, 0);
            return -1;
        }
        nap();
    }
    if (WIFEXITED(status)) return WEXITSTATUS(status);
    if (WIFSIGNALED(status)) return 128 + WTERMSIG(status);
    return -1;
}

void Sandbox::releaseChildren(const std::vector<ChildRecord>& children, bool keep) {
    for (const auto& c : children) {
        if (keep) kept_.push_back(c.pid);
        else waitGone(c.pid, 15);
    }
    reapOrphans();
}

std::string Sandbox::terminalOutput() const { return readText(terminalFile()); }

LaunchResult Sandbox::run(const RunOptions& opts) {
    LaunchResult res;
    res.launcherEnv = environmentFor(opts);

    beginRuns();
    pid_t pid = start(opts);
    res.status = waitFor(pid, opts.timeoutSeconds);
    res.timedOut = res.status == -1;

    int expected = opts.expectChildren >= 0 ? opts.expectChildren : (res.status == 0 ? 1 : 0);
    res.children = collectRecords(expected, 15);
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
