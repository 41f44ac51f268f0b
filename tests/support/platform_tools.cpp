#include "platform_tools.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <thread>

#include "sandbox.h"
#include "test_util.h"

namespace rcptest {

const char* const kEquinoxLauncherInInstall = "eclipse/plugins/org.eclipse.equinox.launcher.jar";

namespace {

// The last "<stem>_<version>.jar" of a plugins directory in name order
// (good enough for one installed version), or "".
std::string pluginJar(const std::string& dir, const std::string& stem) {
    std::string found;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d)) {
            std::string n = e->d_name;
            if (n.size() > stem.size() + 5 && n.compare(0, stem.size() + 1, stem + "_") == 0 &&
                n.compare(n.size() - 4, 4, ".jar") == 0 && n > found)
                found = n;
        }
        closedir(d);
    }
    return found.empty() ? "" : dir + "/" + found;
}

void copyFile(const std::string& from, const std::string& to) {
    std::string data = readText(from);
    if (data.empty()) throw std::runtime_error("cannot read " + from);
    writeText(to, data);
}

}  // namespace

std::string findOnPath(const std::string& name) {
    const char* path = getenv("PATH");
    std::stringstream dirs(path ? path : "/usr/bin:/bin");
    for (std::string dir; std::getline(dirs, dir, ':');) {
        struct stat st;
        std::string candidate = (dir.empty() ? "." : dir) + "/" + name;
        if (stat(candidate.c_str(), &st) == 0 && S_ISREG(st.st_mode) && access(candidate.c_str(), X_OK) == 0)
            return candidate;
    }
    return "";
}

ProgramResult runProgram(const std::vector<std::string>& argv, int timeoutSeconds) {
    ProgramResult res;
    TempDir tmp;
    const std::string outName = tmp.sub("output");
    std::vector<std::string> store = argv;
    std::vector<char*> args;
    for (auto& a : store) args.push_back(&a[0]);
    args.push_back(nullptr);

    pid_t pid = fork();
    if (pid < 0) return res;
    if (pid == 0) {
        // A process group of its own, so that a timeout ends its helpers too.
        setpgid(0, 0);
        int out = open(outName.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
        int in = open("/dev/null", O_RDONLY);
        if (out < 0 || in < 0 || dup2(in, 0) < 0 || dup2(out, 1) < 0 || dup2(out, 2) < 0) _exit(126);
        execvp(args[0], args.data());
        _exit(127);
    }
    setpgid(pid, pid);
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(timeoutSeconds);
    int status = 0;
    pid_t r;
    while ((r = waitpid(pid, &status, WNOHANG)) == 0 || (r < 0 && errno == EINTR)) {
        if (std::chrono::steady_clock::now() > deadline) {
            kill(-pid, SIGKILL);
            waitpid(pid, &status, 0);
            res.timedOut = true;
            break;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
    if (r < 0 && !res.timedOut) return res;
    if (WIFEXITED(status)) res.status = WEXITSTATUS(status);
    else if (WIFSIGNALED(status)) res.status = 128 + WTERMSIG(status);
    res.output = readText(outName);
    return res;
}

EquinoxJars findEquinox() {
    const char* env = getenv("RCP_EQUINOX_PLUGINS");
    std::string dir = env && *env ? env : "/usr/lib/eclipse/plugins";
    return {pluginJar(dir, "org.eclipse.equinox.launcher"), pluginJar(dir, "org.eclipse.osgi")};
}

void installEquinox(const EquinoxJars& jars, const std::string& installDir) {
    copyFile(jars.launcher, installDir + "/" + kEquinoxLauncherInInstall);
    copyFile(jars.framework, installDir + "/eclipse/plugins/" + jars.framework.substr(jars.framework.rfind('/') + 1));
}

bool buildDemoBundle(const std::string& javac, const EquinoxJars& jars, const std::string& installDir,
                     std::string& log) {
    const std::string source = std::string(RCP_SOURCE_DIR) + "/demo/bundle";
    const std::string dest = installDir + "/eclipse/plugins/com.kel.demo.report_1.0.0";
    makeDirs(dest);
    std::vector<std::string> cmd = {javac, "--release", "11", "-nowarn", "-encoding", "UTF-8",
                                    "-cp", jars.framework, "-d", dest};
    for (const auto& rel : listTree(source + "/src"))
        if (rel.size() > 5 && rel.compare(rel.size() - 5, 5, ".java") == 0) cmd.push_back(source + "/src/" + rel);
    ProgramResult r = runProgram(cmd, 120);
    log = r.output;
    if (r.status != 0) return false;
    copyFile(source + "/META-INF/MANIFEST.MF", dest + "/META-INF/MANIFEST.MF");
    return true;
}

std::map<std::string, std::string> parseReport(const std::string& text) {
    std::map<std::string, std::string> out;
    for (const auto& line : splitLines(text)) {
        size_t eq = line.find('=');
        if (eq != std::string::npos) out.emplace(line.substr(0, eq), line.substr(eq + 1));
    }
    return out;
}

std::vector<std::string> reportList(const std::map<std::string, std::string>& report, const std::string& prefix) {
    std::vector<std::string> out;
    for (size_t i = 0;; i++) {
        auto it = report.find(prefix + std::to_string(i));
        if (it == report.end()) return out;
        out.push_back(it->second);
    }
}

}  // namespace rcptest
