// The child's command line and the start of the child: the launcher's own
// arguments become wide strings, startup fills the command line, and the
// child is started with fork/execv. The launcher never stays resident: it
// waits for the child only when asked to.
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

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

namespace {

// The narrow argument vector handed to execv.
char** buildNativeArgs(size_t& size) {
    size = launchArgs.size();
    char** cargs = new char*[size + 1];
    SvcDebugOutA("RLNCH0132I: ===== Begin Parameters =====");
    for (size_t i = 0; i < size; ++i) {
        std::string narrow;
        wstrtocs(narrow, launchArgs[i]);
        cargs[i] = new char[narrow.size() + 1];
        memcpy(cargs[i], narrow.c_str(), narrow.size() + 1);
        SvcDebugOutA("%s", cargs[i]);
    }
    cargs[size] = nullptr;
    SvcDebugOutA("RLNCH0133I: ===== End Parameters =====");
    return cargs;
}

}  // namespace

void launchEclipse(int argc, wchar_t** wargv) {
    size_t size = 0;
    char** cargs = buildNativeArgs(size);
    if (size == 0) {  // nothing to start: the command line was never built
        delete[] cargs;
        return;
    }

    pid_t childPid = fork();
    if (childPid == 0) {
        execv(cargs[0], cargs);
        // The program could not be started. The child ends quietly with
        // status 0; _exit keeps it from flushing the parent's streams a
        // second time.
        _exit(0);
    }

    // A failed fork has no process to record: writing -1 would make every
    // later launch believe a platform is running.
    if (childPid > 0) populateLockFile(static_cast<int>(childPid));
    unlockLockFile();

    bool wait =
        findOption(RCPLAUNCHERWAIT, argc, wargv) != -1 || haveLaunchOption("-console", cargs, static_cast<int>(size));
    if (wait && childPid > 0) {
        int status = 0;
        while (waitpid(childPid, &status, 0) == -1 && errno == EINTR) {
        }
    }
    for (size_t i = 0; i < size; ++i) delete[] cargs[i];
    delete[] cargs;
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
