// The platform lock protocol: one lock file per workspace serialises the
// launchers of that workspace and records the process id of the platform
// that the main launcher started. The file itself is handled by the OS layer
// (createAndOpenLockFile and friends); this part decides what its content
// means.
#include <cstdio>
#include <string>

#include "rcp_launcher.h"

long pid = 0;
wstring lockFilePath;
FILE* lockFILE = nullptr;

namespace {

// A restarted launcher gives the previous platform this many seconds to end
// before it declares the recorded process id stale.
const int RESTART_WAIT_SECONDS = 20;

}  // namespace

void getLockFilePath(wstring& path) { path = lockFilePath; }

// True when the lock file names a process that still exists. A file that
// does not start with a number (after blanks) cannot be trusted either way,
// so the launch stops rather than start a second platform on the workspace.
bool checkLockFile() {
    if (!exists(lockFilePath.c_str())) {
        return false;
    }
    SvcDebugOutA("RLNCH0090E: Existing platform lock file found - checking validity.");
    int result = readLockFilePid(&pid);
    if (result == EOF) {
        SvcDebugOutA("RLNCH0091E: No data in the platform lock file.");
        return false;
    }
    if (result == 1) {
        return isProcessAlive(pid);
    }
    fatalErrorExit("RLNCH0092E: Error reading platform lock file.");
}

void locateLockFile(int argc, wchar_t** argv, const wstring& workspace) {
    lockFilePath = joinPath(workspace, RCP_LOCK_FILE);
    createAndOpenLockFile();

    if (isRestart(argc, argv)) {
        // The platform that asked for the restart is on its way down; give it
        // time to end before its recorded id is declared stale.
        int counter = 1;
        bool invalidated = false;
        sysSleep(1);
        while (checkLockFile()) {
            if (invalidated) {
                // Blanking the file did not take (e.g. a write error): stop
                // waiting instead of spinning; the lock decides the rest.
                break;
            }
            sysSleep(1);
            counter++;
            if (counter >= RESTART_WAIT_SECONDS) {
                SvcDebugOutA(
                    "RLNCH0013E: Existing platform has not shutdown within allotted time. Invalidating the "
                    "lockfile for new launch.");
                invalidateLockFile();
                invalidated = true;
            }
        }
    }

    lockLockFile(joinPath(workspace, SID_FILE));
}
