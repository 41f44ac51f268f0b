// The launcher's own options: one search primitive over its arguments, the
// predicates built on it, and the process-wide flags they steer.
#include <cwchar>

#include "rcp_launcher.h"

bool bWaitMode = false;
bool runningLock = false;

int findOption(const wchar_t* opt, int argc, wchar_t** argv) {
    for (int i = 1; i < argc; ++i) {
        if (wcscmp(argv[i], opt) == 0) return i;
    }
    return -1;
}

const wchar_t* optionValue(const wchar_t* opt, int argc, wchar_t** argv) {
    const int i = findOption(opt, argc, argv);
    return i != -1 && i + 1 < argc ? argv[i + 1] : nullptr;
}

bool isDebug(int argc, wchar_t** argv) {
    // A restarted launcher never writes debug output.
    if (findOption(RESTARTARG, argc, argv) != -1) return false;
    return findOption(DEBUGARG, argc, argv) != -1;
}

bool isRestart(int argc, wchar_t** argv) { return findOption(RESTARTARG, argc, argv) != -1; }

bool isResetConfig(int argc, wchar_t** argv) { return findOption(RESETCONFIGARG, argc, argv) != -1; }

bool isVmOverride(int argc, wchar_t** argv) { return findOption(VMARG, argc, argv) != -1; }

bool isISMPProvisioning(int argc, wchar_t** argv) {
    return findOption(RCPLAUNCHERWAIT, argc, argv) != -1 && findOption(PROVMANIFESTARG, argc, argv) != -1;
}

bool isInitMUService(int argc, wchar_t** argv) { return findOption(INITMUSERVICEARG, argc, argv) != -1; }

void doVersionCheck(int argc, wchar_t** argv) {
    if (findOption(VERSIONARG, argc, argv) != -1) fatalErrorExit("RLNCH0031I:   version = \"%ls\"", BUILDDATE);
}

void getCmdString(int /*argc*/, wchar_t** /*argv*/) {}

void setWaitMode() { bWaitMode = true; }

bool isWaitMode() { return bWaitMode; }

void setMainProcess(bool val) { runningLock = val; }

bool isMainProcess() { return runningLock; }

bool isLockdownConfig() { return IS_LOCKDOWN; }
