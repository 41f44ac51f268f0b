// The file side of the platform lock: creating and opening the lock file,
// the exclusive flock, and reading and writing the recorded process id.
//
// The content is the platform's process id in decimal followed by ten blanks,
// always written from the start of the file and never truncated: the blanks
// cover the tail of a longer id left by an earlier launch.
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "rcp_launcher.h"

namespace {

// How much of the lock file's beginning is read for the process id.
const size_t LOCK_TEXT_LIMIT = 4096;

}  // namespace

void createAndOpenLockFile() {
    std::string path;
    wcstochar(path, lockFilePath.c_str());
    if (lockFILE != nullptr) {
        // A second call in one process must not leave the first stream (and
        // any lock on it) behind.
        fclose(lockFILE);
        lockFILE = nullptr;
    }
    // The workspace may be shared with other users, so the lock file is
    // never reached through a link (whatever the link points to would be
    // created or overwritten) and must be a regular file. The descriptor is
    // close-on-exec: the flock belongs to the open file description, and a
    // JVM that inherited it would hold the lock for its whole life if this
    // launcher died before unlocking.
    const int fd = openRegularFile(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW, 0600);
    if (fd < 0) {
        const int err = errno;
        SvcDebugOutA("RLNCH0199E: CreateLockFile failed. errno=%d", err);
        errno = err;  // the fatal line below reports why
    } else {
        lockFILE = fdopen(fd, "r+");
        if (lockFILE == nullptr) {
            close(fd);
        }
    }
    if (lockFILE == nullptr) fatalErrorExit("RLNCH0054E: Error locating platform lock file");
    fwide(lockFILE, -1);
}

void lockLockFile(const std::wstring& sidFilePath) {
    // Blocks while another launcher of this workspace holds the lock, that is
    // until it has started its child.
    while (flock(fileno(lockFILE), LOCK_EX) != 0) {
        if (errno == EINTR) {
            continue;
        }
        fatalError("RLNCH0053E: Error locking platform lock file. errno=%d", errno);
        // Keep trying, but without flooding the log.
        sysSleep(1);
    }
    if (!checkLockFile()) {
        setMainProcess(true);
        exists(sidFilePath.c_str());
        deleteFile(sidFilePath.c_str());
    }
}

void populateLockFile(int childPid) {
    if (!isMainProcess()) {
        return;
    }
    const bool written =
        fseek(lockFILE, 0, SEEK_SET) == 0 && fprintf(lockFILE, "%ld          ", static_cast<long>(childPid)) >= 0;
    if (fflush(lockFILE) != 0 || !written) {
        SvcDebugOutA("RLNCH0051E: Unable to write to platform lock file");
    }
}

void invalidateLockFile() {
    const bool written = fseek(lockFILE, 0, SEEK_SET) == 0 && fprintf(lockFILE, "%s", "              ") >= 0;
    if (fflush(lockFILE) != 0 || !written) {
        SvcDebugOutA("RLNCH0052E: Unable to invalidate platform lock file");
    }
}

void unlockLockFile() {
    if (flock(fileno(lockFILE), LOCK_UN) != 0) {
        fatalError("RLNCH0070E: Error unlocking platform lock file. errno=%d", errno);
    }
}

int readLockFilePid(long* pidOut) {
    // Read as fscanf("%ld") reads it: white space, a sign, digits (leading
    // zeros and all), a number too long for a long clamped, which names no
    // process. Only the file's beginning is looked at: the launcher writes an
    // id and ten blanks, and a planted file of any size must not stall it.
    char text[LOCK_TEXT_LIMIT + 1];
    const size_t n = fseek(lockFILE, 0, SEEK_SET) == 0 ? fread(text, 1, LOCK_TEXT_LIMIT, lockFILE) : 0;
    text[n] = '\0';
    char* end = nullptr;
    const long value = strtol(text, &end, 10);
    if (end != text) {
        *pidOut = value;
        return 1;
    }
    return strspn(text, " \t\n\v\f\r") == n ? EOF : 0;  // nothing but white space, or no number
}

// Only a missing process (ESRCH) counts as dead; a process of another user
// (EPERM) is alive. Ids that cannot name a single process - zero and negative
// values address process groups, larger ones do not fit a pid_t - are
// treated as dead rather than tested, since kill would answer for other
// processes.
bool isProcessAlive(long processId) {
    if (processId <= 0 || processId > static_cast<long>(INT_MAX)) {
        return false;
    }
    if (kill(static_cast<pid_t>(processId), 0) == 0) {
        return true;
    }
    return errno != ESRCH;
}
