// The child's command line and the start of the child: the launcher's own
// arguments become wide strings, startup fills the command line, and the
// child is started with fork/execv. The launcher never stays resident: it
// waits for the child only when asked to.
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <clocale>
#include <cstring>
#include <vector>

#include "rcp_launcher.h"

std::vector<wstring> launchArgs;
bool bRestart = false;

void addArgToCommandLine(wstring arg, bool /*handleSpaces*/) {
    // A restarted platform must not come back interactive: the old one asked
    // for the restart, not the user at a console.
    if (bRestart && (arg == DEBUGARG || arg == CONSOLEARG)) return;
    launchArgs.push_back(arg);
}

void addPathToCommandLine(wstring eclipseExePath) {
    launchArgs.clear();
    launchArgs.push_back(eclipseExePath);
}

bool haveLaunchOption(const char* option, char** cargs, int argCount) {
    for (int i = 0; i < argCount; ++i) {
        if (cargs[i] != nullptr && strcmp(cargs[i], option) == 0) return true;
    }
    return false;
}

void setSemVersion(wchar_t* /*id*/) {}

long startChild(const std::vector<wstring>& args, const char* beginLine, const char* endLine, bool wait,
                void (*inParent)(long childPid)) {
    // The narrow argument vector handed to execv, logged as it goes.
    std::vector<std::string> narrow(args.size());
    std::vector<char*> cargs;
    SvcDebugOutA(beginLine);
    for (size_t i = 0; i < args.size(); ++i) {
        wstrtocs(narrow[i], args[i]);
        cargs.push_back(&narrow[i][0]);
        SvcDebugOutA("%s", cargs.back());
    }
    cargs.push_back(nullptr);
    SvcDebugOutA(endLine);
    if (args.empty()) return -1;  // nothing to start: the command line was never built

    const pid_t child = fork();
    if (child == 0) {
        execv(cargs[0], cargs.data());
        return 0;  // the program could not be started: the caller decides how this process ends
    }
    if (inParent != nullptr) inParent(child);
    while (wait && child > 0 && waitpid(child, nullptr, 0) == -1 && errno == EINTR) {
    }
    return child;
}

namespace {

// The parent's part of a launch, before any wait: the lock file names the
// child and is released for it. A failed fork has no process to record:
// writing -1 would make every later launch believe a platform is running.
void recordChild(long childPid) {
    if (childPid > 0) populateLockFile(static_cast<int>(childPid));
    unlockLockFile();
}

}  // namespace

void launchEclipse(int argc, wchar_t** wargv) {
    const bool wait = findOption(RCPLAUNCHERWAIT, argc, wargv) != -1 ||
                      std::find(launchArgs.begin(), launchArgs.end(), CONSOLEARG) != launchArgs.end();
    // A child whose program could not be started ends quietly with status 0;
    // _exit keeps it from flushing the parent's streams a second time.
    if (startChild(launchArgs, "RLNCH0132I: ===== Begin Parameters =====", "RLNCH0133I: ===== End Parameters =====",
                   wait, recordChild) == 0)
        _exit(0);
}

void doProvisioning(std::vector<String>& /*launcherPropsArray*/, std::vector<String>& /*installPropsArray*/,
                    const wchar_t* /*executable*/, const std::vector<std::wstring>& launchArgs) {
    // The launcher waits for the provisioning run; a child whose program
    // could not be started goes on like the parent: it releases the lock and
    // ends with status 0.
    startChild(launchArgs, "RLNCH0129I: ===== Begin Provisioning Parameters =====",
               "RLNCH0130I: ===== End Provisioning Parameters =====", true, nullptr);
}

int launcherMain(int argc, char** argv) {
    if (setlocale(LC_CTYPE, "") == nullptr) fatalErrorExit("RLNCH0182E: Set locale error!");

    std::vector<wchar_t*> wargv(static_cast<size_t>(argc) + 1, nullptr);
    for (int i = 0; i < argc; ++i) wargv[static_cast<size_t>(i)] = chartowcs(argv[i]);
    // Startup may put expanded copies in place of some entries; the copies
    // belong to the placeholder module, the originals are released here.
    const std::vector<wchar_t*> ownedArgs(wargv);

    if (haveLaunchOption("-restart", argv, argc)) bRestart = true;
    doVersionCheck(argc, wargv.data());
    setDebug(isDebug(argc, wargv.data()));

    // "-initMUService" starts the multi-user service from its own area
    // instead of a user's platform; the child is started the same way.
    if (isInitMUService(argc, wargv.data()))
        startupMUService(argc, wargv.data());
    else
        startup(argc, wargv.data(), launchArgs);

    // The JVM option that must come after everything startup put in.
    addArgToCommandLine(_JVMARG_XstartOnFirstThread, false);
    launchEclipse(argc, wargv.data());
    for (wchar_t* a : ownedArgs) freeString(a);
    return 0;
}
