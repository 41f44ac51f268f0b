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

#include <cctype>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "rcp_launcher.h"

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

// Reads the id the way fscanf("%ld") would: blanks skipped, then a number.
// Returns EOF when the file holds nothing but white space, 0 when the first
// non-blank is not a number, 1 with *pidOut set otherwise. A number too long
// for a long is clamped (and names no process).
int readLockFilePid(long* pidOut) {
    if (fseek(lockFILE, 0, SEEK_SET) != 0) {
        return EOF;
    }
    clearerr(lockFILE);
    int ch;
    while ((ch = fgetc(lockFILE)) != EOF && isspace(ch)) {
    }
    if (ch == EOF) {
        return EOF;
    }
    std::string number(1, static_cast<char>(ch));
    while (number.size() < 32 && (ch = fgetc(lockFILE)) != EOF && isdigit(ch)) {
        number += static_cast<char>(ch);
    }
    char* end = nullptr;
    const long value = strtol(number.c_str(), &end, 10);
    if (end == number.c_str()) {
        return 0;
    }
    *pidOut = value;
    return 1;
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
