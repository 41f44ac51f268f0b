// Launch overhead and peak memory of the launcher.
//
// Builds a throw-away installation of the built launcher whose platform is a
// compiled program that ends at once (tiny_child.c), then, in one run:
//   - first launch: each launch gets a home directory of its own, so the
//     launcher creates the workspace, configuration area and per-user files;
//   - steady state: one home directory, launched once untimed, then timed;
// and, interleaved with each launcher run, the same child started directly.
// The launcher runs with "-rcpLauncherWait", so its exit means that the child
// has ended too: the time of one launch is launcher + child.
//
// In the steady state a third process is timed as well: run_child.c, which
// only starts the child and waits for it. It is the least that any program
// between the user and the child costs here (one more exec and a fork).
//
// Reported per figure: median, 10th and 90th percentile wall time, the
// median CPU time of the process tree, the ratio launcher+child / child alone
// and the launcher's own overhead (difference of the medians). Then the peak
// resident size of a first and of a steady-state launch: ru_maxrss of the
// launcher (and of the child it waited for), read through run_child, since a
// process started by this much larger program would report this program's
// resident size (ru_maxrss survives exec).
//
//   launch_bench [--launches N] [--launcher PATH] [--child PATH] [--runner PATH] [--keep] [--check]
//
// --check makes the exit status 1 when a goal is missed (the figures are
// printed either way); a launch that fails is always exit status 2.
#include <fcntl.h>
#include <ftw.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

namespace {

// Goals, on the reference machine (2 cores, Debian 12).
const double GOAL_STEADY_RATIO = 2.5;
const double GOAL_OVERHEAD_MS = 2.0;
const double GOAL_PEAK_RSS_MIB = 4.0;

const int WARMUP_RUNS = 5;
const int MEMORY_RUNS = 20;
const char* const INSTALL_ID = "BENCH1";
const char* const BENCH_USER = "bench";

struct Options {
    int launches = 300;
    std::string launcher = RCP_LAUNCHER_BINARY;
    std::string child = RCP_TINY_CHILD;
    std::string runner = RCP_RUN_CHILD;
    bool keep = false;
    bool check = false;
};

// One process run: wall time, CPU time of the process and the children it
// waited for.
struct Sample {
    double wallMs = 0;
    double cpuMs = 0;
};

struct Series {
    std::vector<Sample> samples;
    void add(const Sample& s) { samples.push_back(s); }
};

[[noreturn]] void die(const std::string& what) {
    fprintf(stderr, "launch_bench: %s\n", what.c_str());
    exit(2);
}

double nowMs() {
    struct timespec ts;
    clock_gettime(CLOCK_MONOTONIC, &ts);
    return static_cast<double>(ts.tv_sec) * 1e3 + static_cast<double>(ts.tv_nsec) / 1e6;
}

double tvMs(const struct timeval& tv) {
    return static_cast<double>(tv.tv_sec) * 1e3 + static_cast<double>(tv.tv_usec) / 1e3;
}

// q in [0, 1]; linear interpolation between the nearest ranks.
double quantile(std::vector<double> v, double q) {
    if (v.empty()) return 0;
    std::sort(v.begin(), v.end());
    double pos = q * static_cast<double>(v.size() - 1);
    size_t lo = static_cast<size_t>(pos);
    size_t hi = std::min(lo + 1, v.size() - 1);
    double frac = pos - static_cast<double>(lo);
    return v[lo] + (v[hi] - v[lo]) * frac;
}

std::vector<double> wall(const Series& s) {
    std::vector<double> v;
    for (const Sample& x : s.samples) v.push_back(x.wallMs);
    return v;
}

std::vector<double> cpu(const Series& s) {
    std::vector<double> v;
    for (const Sample& x : s.samples) v.push_back(x.cpuMs);
    return v;
}

void writeFile(const std::string& path, const std::string& text, mode_t mode = 0644) {
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << text;
    out.close();
    if (!out) die("cannot write " + path);
    if (chmod(path.c_str(), mode) != 0) die("cannot chmod " + path);
}

std::string readFile(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    std::ostringstream ss;
    ss << in.rdbuf();
    return ss.str();
}

void makeDirs(const std::string& path) {
    std::string partial;
    size_t pos = 0;
    while (pos != std::string::npos) {
        pos = path.find('/', pos + 1);
        partial = path.substr(0, pos);
        if (!partial.empty() && mkdir(partial.c_str(), 0755) != 0 && errno != EEXIST)
            die("cannot create " + partial + ": " + strerror(errno));
    }
}

void copyExecutable(const std::string& from, const std::string& to) {
    std::string bytes = readFile(from);
    if (bytes.empty()) die("cannot read " + from);
    writeFile(to, bytes, 0755);
}

int removeEntry(const char* path, const struct stat*, int, struct FTW*) { return remove(path); }

void removeTree(const std::string& path) { nftw(path.c_str(), removeEntry, 16, FTW_DEPTH | FTW_PHYS); }

bool pathExists(const std::string& path) {
    struct stat st;
    return stat(path.c_str(), &st) == 0;
}

// A typical installation: user configuration, the platform is the tiny child.
class Installation {
public:
    explicit Installation(const Options& opt) {
        const char* t = getenv("TMPDIR");
        std::string tmpl = std::string(t && *t ? t : "/tmp") + "/rcpbench.XXXXXX";
        std::vector<char> buf(tmpl.begin(), tmpl.end());
        buf.push_back('\0');
        if (mkdtemp(buf.data()) == nullptr) die("mkdtemp failed");
        char real[PATH_MAX];
        if (realpath(buf.data(), real) == nullptr) die("realpath failed");
        root_ = real;

        makeDirs(root_ + "/inst/rcp");
        makeDirs(root_ + "/inst/base/macosx/x86");
        makeDirs(root_ + "/inst/jre/bin");
        makeDirs(root_ + "/homes");
        copyExecutable(opt.launcher, launcher());
        copyExecutable(opt.child, root_ + "/inst/base/macosx/x86/eclipse");
        copyExecutable(opt.child, root_ + "/inst/jre/bin/java");
        copyExecutable(opt.child, child());
        copyExecutable(opt.runner, runner());

        writeFile(root_ + "/inst/rcp/rcplauncher.properties",
                  "# launcher properties of the benchmark installation\n"
                  "rcp.install.id=" + std::string(INSTALL_ID) + "\n"
                  "rcp.base.location=${rcp.home}/base\n"
                  "jvm.location=${rcp.home}/jre/bin/java\n"
                  "install.configuration=user\n"
                  "product=com.kel.bench.product\n"
                  "config.verbose.1=-debug\n"
                  "config.verbose.2=-vmargs\n"
                  "config.verbose.3=-Dbench.verbose=true\n");
        writeFile(root_ + "/inst/base/rcpinstall.properties",
                  "# installation properties of the benchmark installation\n"
                  "application=com.kel.bench.application\n"
                  "-Dbench.greeting=hello\n"
                  "-Xmx256m\n"
                  "vmarg.1=-Dfile.encoding=UTF-8\n"
                  "vmarg.2=-Dosgi.requiredJavaVersion=11\n"
                  "vmfix.noconsole=-Dosgi.instance.area=${workspace.location}\n"
                  "env.set.RCP_BENCH_GREETING=Hello from rcpinstall.properties\n"
                  "library.path.append=${rcp.home}/lib\n"
                  "cp=${rcp.home}/base/startup.jar\n"
                  "bench.platform.macosx=kept without its suffix\n"
                  "bench.platform.win32=dropped\n"
                  "bench.home=${env.HOME}\n"
                  "bench.copy=${prop.application}\n");
        writeFile(root_ + "/inst/base/config.ini",
                  "osgi.bundles=org.eclipse.equinox.common@2:start,org.eclipse.core.runtime@start\n"
                  "eclipse.product=com.kel.bench.product\n"
                  "osgi.configuration.cascaded=false\n");
        writeFile(root_ + "/inst/base/platform.xml",
                  "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n"
                  "<config>\n"
                  "  <site url=\"platform:/base/\" enabled=\"true\">\n"
                  "    <feature id=\"${jvm.feature.id}\" version=\"1.0\"/>\n"
                  "  </site>\n"
                  "</config>\n");
        terminal_ = root_ + "/terminal.out";
        writeFile(terminal_, "");
    }

    ~Installation() {
        if (!keep_) removeTree(root_);
    }

    void keep() { keep_ = true; }
    const std::string& root() const { return root_; }
    std::string launcher() const { return root_ + "/inst/rcp/rcplauncher"; }
    std::string child() const { return root_ + "/tiny_child"; }
    std::string runner() const { return root_ + "/run_child"; }
    std::string runnerOutput() const { return root_ + "/run_child.out"; }
    const std::string& terminal() const { return terminal_; }
    std::string workspace(const std::string& home) const {
        return home + "/KEL/RCP/" + INSTALL_ID + "/" + BENCH_USER;
    }

    // Starts program with args in the sandbox environment (HOME = home) and
    // waits for it. Its output, which should be none, goes to terminal().
    Sample run(const std::string& program, const std::vector<std::string>& args, const std::string& home,
               int& status) const {
        std::vector<std::string> argStore = {program};
        argStore.insert(argStore.end(), args.begin(), args.end());
        std::vector<std::string> envStore = {"HOME=" + home, "USER=" + std::string(BENCH_USER),
                                             "PATH=/usr/bin:/bin", "LANG=C.UTF-8"};
        std::vector<char*> argv, envp;
        for (std::string& a : argStore) argv.push_back(&a[0]);
        argv.push_back(nullptr);
        for (std::string& e : envStore) envp.push_back(&e[0]);
        envp.push_back(nullptr);

        posix_spawn_file_actions_t actions;
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_addopen(&actions, 1, terminal_.c_str(), O_WRONLY | O_APPEND, 0);
        posix_spawn_file_actions_adddup2(&actions, 1, 2);

        Sample s;
        const double start = nowMs();
        pid_t pid = -1;
        int rc = posix_spawn(&pid, program.c_str(), &actions, nullptr, argv.data(), envp.data());
        if (rc != 0) die("cannot start " + program + ": " + strerror(rc));
        struct rusage ru;
        int wstatus = 0;
        while (wait4(pid, &wstatus, 0, &ru) == -1) {
            if (errno != EINTR) die("wait4 failed");
        }
        s.wallMs = nowMs() - start;
        posix_spawn_file_actions_destroy(&actions);

        s.cpuMs = tvMs(ru.ru_utime) + tvMs(ru.ru_stime);
        status = WIFEXITED(wstatus) ? WEXITSTATUS(wstatus) : 128 + WTERMSIG(wstatus);
        return s;
    }

private:
    std::string root_;
    std::string terminal_;
    bool keep_ = false;
};

const std::vector<std::string> LAUNCHER_ARGS = {"-rcpLauncherWait"};

Sample launchOnce(const Installation& inst, const std::string& home) {
    int status = -1;
    Sample s = inst.run(inst.launcher(), LAUNCHER_ARGS, home, status);
    if (status != 0) {
        std::string log = readFile(inst.workspace(home) + "/logs/rcplauncher.log");
        die("the launcher ended with status " + std::to_string(status) + "; its log:\n" + log +
            readFile("/tmp/rcplauncher.log"));
    }
    return s;
}

Sample childOnce(const Installation& inst, const std::string& home) {
    int status = -1;
    Sample s = inst.run(inst.child(), {}, home, status);
    if (status != 0) die("the child alone ended with status " + std::to_string(status));
    return s;
}

// The child started by run_child, which does nothing else.
Sample emptyLauncherOnce(const Installation& inst, const std::string& home) {
    int status = -1;
    Sample s = inst.run(inst.runner(), {"-", inst.child()}, home, status);
    if (status != 0) die("run_child ended with status " + std::to_string(status));
    return s;
}

// Peak resident size (KiB) of program run through run_child.
long peakRssKiB(const Installation& inst, const std::vector<std::string>& program, const std::string& home) {
    std::vector<std::string> args = {inst.runnerOutput()};
    args.insert(args.end(), program.begin(), program.end());
    int status = -1;
    inst.run(inst.runner(), args, home, status);
    int code = -1;
    long rss = -1, cpuUs = -1;
    FILE* in = fopen(inst.runnerOutput().c_str(), "r");
    int fields = in ? fscanf(in, "%d %ld %ld", &code, &rss, &cpuUs) : 0;
    if (in) fclose(in);
    unlink(inst.runnerOutput().c_str());
    if (status != 0 || fields != 3 || code != 0) die("the memory run of " + program[0] + " failed");
    return rss;
}

// What a complete launch leaves: the per-user files, and the child's process
// id in the platform lock file (written only once the child was started).
void checkLaunchHappened(const Installation& inst, const std::string& home) {
    const std::string ws = inst.workspace(home);
    for (const char* rel : {"/.config/rcpinstall.properties", "/.config/config.ini", "/.config/args.properties",
                            "/logs/rcplauncher.log"}) {
        if (!pathExists(ws + rel)) die("the launch left no " + ws + rel);
    }
    std::string pid = readFile(ws + "/.rcp.lock");
    if (pid.empty() || strtol(pid.c_str(), nullptr, 10) <= 0)
        die("the platform lock file holds no process id: the child was not started");
}

struct Figure {
    Series child;
    Series launch;
    Series empty;  // run_child + child (steady state only)
};

// First launches: a fresh home directory each time, removed afterwards.
Figure measureFirstLaunch(const Installation& inst, int n) {
    Figure f;
    const std::string homes = inst.root() + "/homes";
    for (int i = -WARMUP_RUNS; i < n; ++i) {
        const std::string home = homes + "/first" + std::to_string(i + WARMUP_RUNS);
        makeDirs(home);
        Sample c = childOnce(inst, home);
        Sample l = launchOnce(inst, home);
        if (i == -WARMUP_RUNS) checkLaunchHappened(inst, home);
        if (i >= 0) {
            f.child.add(c);
            f.launch.add(l);
        }
        removeTree(home);
    }
    return f;
}

// Second and later launches of one user.
Figure measureSteadyState(const Installation& inst, int n) {
    Figure f;
    const std::string home = inst.root() + "/homes/steady";
    makeDirs(home);
    launchOnce(inst, home);  // the first launch of this user
    for (int i = -WARMUP_RUNS; i < n; ++i) {
        Sample c = childOnce(inst, home);
        Sample e = emptyLauncherOnce(inst, home);
        Sample l = launchOnce(inst, home);
        if (i >= 0) {
            f.child.add(c);
            f.empty.add(e);
            f.launch.add(l);
        }
    }
    checkLaunchHappened(inst, home);
    return f;
}

struct Memory {
    std::vector<double> first, steady, child;  // MiB
};

Memory measureMemory(const Installation& inst, int n) {
    Memory m;
    const std::vector<std::string> launcher = {inst.launcher(), "-rcpLauncherWait"};
    for (int i = 0; i < n; ++i) {
        const std::string home = inst.root() + "/homes/memory" + std::to_string(i);
        makeDirs(home);
        m.first.push_back(static_cast<double>(peakRssKiB(inst, launcher, home)) / 1024.0);
        m.steady.push_back(static_cast<double>(peakRssKiB(inst, launcher, home)) / 1024.0);
        m.child.push_back(static_cast<double>(peakRssKiB(inst, {inst.child()}, home)) / 1024.0);
        removeTree(home);
    }
    return m;
}

struct Summary {
    double childMs, launchMs, ratio, overheadMs, childCpuMs, launchCpuMs;
};

Summary report(const char* title, const Figure& f) {
    Summary s;
    s.childMs = quantile(wall(f.child), 0.5);
    s.launchMs = quantile(wall(f.launch), 0.5);
    s.ratio = s.launchMs / s.childMs;
    s.overheadMs = s.launchMs - s.childMs;
    s.childCpuMs = quantile(cpu(f.child), 0.5);
    s.launchCpuMs = quantile(cpu(f.launch), 0.5);
    printf("%s (%zu launches each)\n", title, f.launch.samples.size());
    printf("  %-22s %9s %9s %9s %11s\n", "", "median", "p10", "p90", "median CPU");
    printf("  %-22s %9.3f %9.3f %9.3f %11.3f  ms\n", "child alone", s.childMs, quantile(wall(f.child), 0.1),
           quantile(wall(f.child), 0.9), s.childCpuMs);
    if (!f.empty.samples.empty()) {
        const double emptyMs = quantile(wall(f.empty), 0.5);
        printf("  %-22s %9.3f %9.3f %9.3f %11.3f  ms  (ratio %.2f)\n", "run_child + child", emptyMs,
               quantile(wall(f.empty), 0.1), quantile(wall(f.empty), 0.9), quantile(cpu(f.empty), 0.5),
               emptyMs / s.childMs);
    }
    printf("  %-22s %9.3f %9.3f %9.3f %11.3f  ms\n", "launcher + child", s.launchMs,
           quantile(wall(f.launch), 0.1), quantile(wall(f.launch), 0.9), s.launchCpuMs);
    printf("  %-22s %9.3f ms (median CPU %.3f ms)\n", "launcher overhead", s.overheadMs,
           s.launchCpuMs - s.childCpuMs);
    printf("  %-22s %9.2f\n\n", "ratio", s.ratio);
    return s;
}

Options parseOptions(int argc, char** argv) {
    Options o;
    for (int i = 1; i < argc; ++i) {
        std::string a = argv[i];
        auto value = [&]() -> std::string {
            if (i + 1 >= argc) die("missing value after " + a);
            return argv[++i];
        };
        if (a == "--launches") {
            o.launches = atoi(value().c_str());
            if (o.launches < 1) die("--launches needs a positive number");
        } else if (a == "--launcher") {
            o.launcher = value();
        } else if (a == "--child") {
            o.child = value();
        } else if (a == "--runner") {
            o.runner = value();
        } else if (a == "--keep") {
            o.keep = true;
        } else if (a == "--check") {
            o.check = true;
        } else {
            die("unknown option " + a +
                "\nusage: launch_bench [--launches N] [--launcher PATH] [--child PATH] [--runner PATH] [--keep] "
                "[--check]");
        }
    }
    return o;
}

}  // namespace

int main(int argc, char** argv) {
    Options opt = parseOptions(argc, argv);
    Installation inst(opt);
    if (opt.keep) inst.keep();

    printf("rcplauncher launch benchmark\n");
    printf("  launcher  %s\n  child     %s\n  sandbox   %s%s\n\n", opt.launcher.c_str(), opt.child.c_str(),
           inst.root().c_str(), opt.keep ? " (kept)" : "");
    fflush(stdout);

    Figure first = measureFirstLaunch(inst, opt.launches);
    Figure steady = measureSteadyState(inst, opt.launches);

    Summary f = report("First launch (fresh home directory)", first);
    Summary s = report("Steady-state launch (second and later)", steady);

    Memory mem = measureMemory(inst, MEMORY_RUNS);
    const double peak = std::max(quantile(mem.first, 1.0), quantile(mem.steady, 1.0));
    printf("Peak resident size of one launch (ru_maxrss, %d launches each)\n", MEMORY_RUNS);
    printf("  %-22s %6.2f MiB (median %.2f MiB)\n", "first launch", quantile(mem.first, 1.0),
           quantile(mem.first, 0.5));
    printf("  %-22s %6.2f MiB (median %.2f MiB)\n", "steady state", quantile(mem.steady, 1.0),
           quantile(mem.steady, 0.5));
    printf("  %-22s %6.2f MiB\n\n", "child alone", quantile(mem.child, 1.0));

    std::string terminal = readFile(inst.terminal());
    bool quiet = terminal.empty();
    bool ratioOk = s.ratio <= GOAL_STEADY_RATIO;
    bool overheadOk = s.overheadMs < GOAL_OVERHEAD_MS;
    bool rssOk = peak < GOAL_PEAK_RSS_MIB;
    printf("Goals\n");
    printf("  steady-state ratio <= %.1f         %s (%.2f)\n", GOAL_STEADY_RATIO, ratioOk ? "met" : "MISSED", s.ratio);
    printf("  steady-state overhead < %.1f ms    %s (%.3f ms)\n", GOAL_OVERHEAD_MS, overheadOk ? "met" : "MISSED",
           s.overheadMs);
    printf("  peak resident size < %.0f MiB      %s (%.2f MiB)\n", GOAL_PEAK_RSS_MIB, rssOk ? "met" : "MISSED", peak);
    printf("  first-launch overhead              %.3f ms (ratio %.2f)\n", f.overheadMs, f.ratio);
    printf("  nothing written to the terminal    %s\n", quiet ? "yes" : "NO");
    if (!quiet) printf("---- terminal output ----\n%s\n", terminal.c_str());
    if (!quiet) return 2;
    return (opt.check && !(ratioOk && overheadOk && rssOk)) ? 1 : 0;
}
