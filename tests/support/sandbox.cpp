#include "sandbox.h"

#include <fcntl.h>
#include <grp.h>
#include <sys/resource.h>
#ifdef __linux__
#include <sys/prctl.h>
#endif

#include <filesystem>
#include <iterator>
#include <sstream>

namespace rcptest {

namespace fs = std::filesystem;

std::string entry(const std::string& path) {
    struct stat st;
    if (lstat(path.c_str(), &st) != 0) return "";
    const std::string owner = "uid " + std::to_string(st.st_uid);
    if (S_ISLNK(st.st_mode)) return owner + " link -> " + fs::read_symlink(path).string();
    // A large file (a copy of the launcher) is known by its size.
    if (S_ISREG(st.st_mode) && st.st_size > (1 << 20)) return owner + " file of " + std::to_string(st.st_size) + " B";
    if (S_ISREG(st.st_mode)) return owner + " file\n" + readText(path);
    return owner + (S_ISDIR(st.st_mode) ? " dir" : " special");
}

Tree snapshot(const std::string& root) {
    Tree tree;
    std::error_code error;
    for (fs::recursive_directory_iterator it(root, error), end; it != end; it.increment(error)) {
        const std::string path = it->path().string(), name = it->path().filename().string(), e = entry(path);
        tree[path.substr(root.size() + 1) + (isDir(path) ? "/" : "")] =
            name == "rcplauncher.log" || name == ".rcp.lock" ? e.substr(0, e.find('\n')) : e;
    }
    return tree;
}

Sandbox::Sandbox(const std::string& configuration, const std::string& launcherExtra, const std::string& installExtra)
    : root(fs::canonical(tmp.path()).string()), inst(root + "/inst"), base(inst + "/base"),
      launcher(inst + "/rcp/rcplauncher"), props(launcher + ".properties"), eclipse(base + "/macosx/x86/eclipse"),
      jvm(inst + "/jre/bin/java") {
#ifdef __linux__
    prctl(PR_SET_CHILD_SUBREAPER, 1, 0, 0, 0);
#endif
    // Launchers run as another user must reach their program and record their children.
    chmod(root.c_str(), 0755);
    chmod(scratch.path().c_str(), 01777);
    unlink(kTmpLog);
    installLauncher(launcher);
    install(configuration, launcherExtra, installExtra);
    freshHome();
}

void Sandbox::install(const std::string& configuration, const std::string& launcherExtra,
                      const std::string& installExtra) const {
    write(props, launcherProps(configuration) + launcherExtra);
    write(base + "/rcpinstall.properties", kInstallProps + installExtra);
    write(base + "/config.ini", "osgi.bundles=org.eclipse.core.runtime@start\n");
    write(base + "/platform.xml", "<config>\n  <site url=\"platform:/base/\" enabled=\"true\"/>\n</config>\n");
    installStub(eclipse);
    installStub(jvm);
}

void Sandbox::freshHome() {
    makeDirs(home = path("home" + std::to_string(++homes)));
    cfg = (ws = home + "/KEL/RCP/ID42/tester") + "/.config";
}

namespace {

// Polls done() every 5 ms until it holds (true) or `seconds` have passed (false).
template <class F>
bool poll(int seconds, F done) {
    for (int i = 0; i < seconds * 200; i++, usleep(5000))
        if (done()) return true;
    return false;
}

// The records in dir, one file per child named by its process id.
std::vector<Child> records(const std::string& dir) {
    std::vector<Child> out;
    for (const auto& file : fs::directory_iterator(dir)) {
        if (file.path().has_extension()) continue;  // still being written
        std::istringstream in(readText(file.path().string()));
        Child c;
        c.pid = std::stol(file.path().filename().string());
        std::string f;
        for (long n = std::getline(in, f, '\0') ? std::stol(f) : 0; n > 0 && std::getline(in, f, '\0'); n--)
            c.argv.push_back(f);
        while (std::getline(in, f, '\0')) c.env[f.substr(0, f.find('='))] = f.substr(f.find('=') + 1);
        out.push_back(c);
    }
    return out;
}

}  // namespace

Result Sandbox::runMany(const std::vector<Launch>& launches) {
    const std::string recordDir = scratch.sub("records"), terminal = scratch.sub("terminal");
    removeTree(recordDir);
    makeDirs(recordDir);
    chmod(recordDir.c_str(), 0777);
    unlink(terminal.c_str());
    int gate[2];
    if (pipe(gate) != 0) throw std::runtime_error("pipe failed");
    std::vector<pid_t> pids;
    for (const Launch& l : launches) {
        // env -i: exactly this environment (the sanitizer settings of the
        // test run apply to the launcher as well; the launch's own settings
        // come last and win), and a wrapper without a slash is found on the
        // sandbox's PATH.
        V args = {"/usr/bin/env", "-i", "HOME=" + home, "USER=tester", "PATH=/usr/bin:/bin",
                  "LANG=" + std::string(utf8Locale()), "RCP_STUB_RECORD=" + recordDir};
        for (const std::string name : {"ASAN_OPTIONS", "UBSAN_OPTIONS", "LSAN_OPTIONS"})
            if (getenv(name.c_str())) args.push_back(name + "=" + getenv(name.c_str()));
        for (const auto& kv : l.env) args.push_back(kv.first + "=" + kv.second);
        std::istringstream wrapper(getenv("RCP_LAUNCHER_WRAPPER") ? getenv("RCP_LAUNCHER_WRAPPER") : "");
        args.insert(args.end(), std::istream_iterator<std::string>(wrapper), {});
        args.push_back(l.program.empty() ? launcher : l.program);
        args.insert(args.end(), l.args.begin(), l.args.end());
        std::vector<char*> argv;
        for (std::string& a : args) argv.push_back(&a[0]);
        argv.push_back(nullptr);
        if ((pids.emplace_back(fork())) != 0) continue;
        close(gate[1]);
        const struct rlimit limit = {static_cast<rlim_t>(l.fileSizeLimit), static_cast<rlim_t>(l.fileSizeLimit)};
        if (l.fileSizeLimit >= 0 && (signal(SIGXFSZ, SIG_IGN) == SIG_ERR || setrlimit(RLIMIT_FSIZE, &limit) != 0))
            _exit(126);
        char c;
        while (read(gate[0], &c, 1) < 0 && errno == EINTR) continue;
        const int out = open(terminal.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
        if (out < 0 || dup2(out, 1) < 0 || dup2(out, 2) < 0 || close(gate[0]) != 0 || chdir(root.c_str()) != 0 ||
            (l.user >= 0 && (setgroups(0, nullptr) != 0 || setgid(l.user) != 0 || setuid(l.user) != 0)))
            _exit(126);
        execv(argv[0], argv.data());
        _exit(127);
    }
    close(gate[0]);
    close(gate[1]);  // end of file on the gate releases every launcher at once

    Result res;
    size_t expected = 0;
    for (size_t i = 0; i < launches.size(); i++) {
        const Launch& l = launches[i];
        if (l.killAfterUs >= 0 && usleep(static_cast<useconds_t>(l.killAfterUs)) == 0) kill(pids[i], SIGKILL);
        int st = 0;
        if (!poll(120, [&] { return waitpid(pids[i], &st, WNOHANG) == pids[i]; }) && kill(pids[i], SIGKILL) == 0)
            waitpid(pids[i], &st, 0);
        const int status = WIFEXITED(st) ? WEXITSTATUS(st) : 128 + WTERMSIG(st);
        res.status = i == 0 ? status : res.status;
        expected += l.killAfterUs < 0 && status == 0;
    }
    // A child records first thing; the last ones may still be starting.
    poll(15, [&] { return records(recordDir).size() >= expected; });
    res.children = records(recordDir);
    // Every launcher has ended: a child still there, running or a zombie left
    // to this process (the subreaper), was not waited for; it ends now.
    for (Child& c : res.children) c.reapedByLauncher = kill(static_cast<pid_t>(c.pid), SIGKILL) != 0;
    // Children of killed launchers, recorded or not, must be gone too.
    if (!poll(15, [] { return waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD; }))
        ADD_FAILURE() << "children left running";
    // The child's loader may complain about a preload library that cannot
    // be loaded; LeakSanitizer's helper, which stops a program at its exit
    // for the leak check, reports that it could not read a stopped thread's
    // registers when that program is killed meanwhile (a launcher or child
    // killed here) and now and then without a kill; and AddressSanitizer
    // warns that it cannot name the program for its stack traces when the
    // program's path is longer than the system allows. The launcher itself
    // writes nothing to the terminal.
    std::istringstream out(readText(terminal));
    for (std::string line; std::getline(out, line);)
        if (line.find("from LD_PRELOAD cannot be preloaded") == std::string::npos &&
            line.find("==Unable to get registers from thread ") == std::string::npos &&
            line.find("==WARNING: reading executable name failed") == std::string::npos)
            ADD_FAILURE() << "output: " << line;
    res.tmpLog = entry(kTmpLog);
    unlink(kTmpLog);
    const std::string data = res.child().after("-data");
    res.log = readText((data.empty() ? ws : data) + "/logs/rcplauncher.log");
    return res;
}

}  // namespace rcptest
