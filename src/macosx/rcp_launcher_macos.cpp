// Where the launcher is installed, found from its own executable, and the
// session-ending routines that this platform keeps for the common code.
//
// The operating system is asked for the executable's path; the command line's
// program name is never trusted, since a desktop shortcut or a relative call
// may name the launcher in any way.
#if defined(__APPLE__)
#include <mach-o/dyld.h>
#endif
#include <dirent.h>
#include <dlfcn.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// readsymln accepts targets shorter than this, the first buffer of readLink.
const size_t LINK_LIMIT = 1024;
// The longest executable path or link target accepted from the system.
const size_t EXE_PATH_LIMIT = 65536;

// The record written to the session command file; both fields are
// NUL-terminated and zero-filled behind the text.
struct PostSessionCommand {
    char command[256];
    char parameter[256];
};

// Why the executable's path could not be resolved (realpath's errno), 0 when
// it could. The messages that end a launch for want of that path report this
// cause: the checks made since on the empty path would leave an unrelated
// errno (ENOENT), and macOS's realpath refuses paths of 1,024 bytes or more.
int unresolvedPathError = 0;

// The line's system text names the same cause as its number.
[[noreturn]] void executablePathFailed(int err) {
    snprintf(tempOutBuffer, sizeof(tempOutBuffer), "RLNCH0184E: Getting executable path failed! errno = %d", err);
    errno = err;
    fatalErrorExit(tempOutBuffer);
}

// The raw path of the running executable as the system reports it.
std::string systemExecutablePath() {
#if defined(__APPLE__)
    // It fails only when the buffer is too small, and sets no errno: the
    // cause reported is then the launcher's own, a path too long.
    // 1024 bytes of path plus the terminator at first.
    std::vector<char> buffer(1025, '\0');
    uint32_t size = static_cast<uint32_t>(buffer.size());
    if (_NSGetExecutablePath(buffer.data(), &size) != 0) {
        // The buffer was too small; size now holds what is needed.
        if (size == 0 || size > EXE_PATH_LIMIT) {
            executablePathFailed(ENAMETOOLONG);
        }
        buffer.assign(static_cast<size_t>(size) + 1, '\0');
        size = static_cast<uint32_t>(buffer.size());
        if (_NSGetExecutablePath(buffer.data(), &size) != 0) {
            executablePathFailed(ENAMETOOLONG);
        }
    }
    buffer.back() = '\0';
    return std::string(buffer.data());
#else
    std::string path;
    if (!readLink("/proc/self/exe", path)) {
        executablePathFailed(errno);
    }
    return path;
#endif
}

// Cuts s at its last '/', dropping the separator and what follows. Returns
// false (s unchanged) when there is no '/'.
bool cutAtLastSlash(std::wstring& s) {
    size_t p = s.rfind(L'/');
    if (p == std::wstring::npos) {
        return false;
    }
    s.erase(p);
    return true;
}

// A /proc entry name that reads as a process id of at least 1.
bool isProcessNumber(const char* name) {
    if (name == nullptr || *name == '\0') {
        return false;
    }
    char* end = nullptr;
    errno = 0;
    long value = strtol(name, &end, 10);
    return errno == 0 && end != name && *end == '\0' && value >= 1;
}

}  // namespace

void read_executable_path(std::string& path) {
    // The launcher's own file does not move while it runs, and resolving it
    // costs a readlink per path component: one successful answer serves the
    // whole run.
    static std::string resolvedPath;
    if (resolvedPath.empty()) {
        std::string raw = systemExecutablePath();
        char* resolved = realpath(raw.c_str(), nullptr);
        unresolvedPathError = resolved == nullptr ? errno : 0;
        if (resolved != nullptr) {
            resolvedPath = resolved;
            free(resolved);
        }
    }
    path = resolvedPath;
    SvcDebugOutA(path.c_str());
}

bool readLink(const char* path, std::string& target) {
    // readlink does not terminate and silently cuts a long target, so the
    // buffer grows until the answer fits with room to spare.
    std::vector<char> buffer(LINK_LIMIT);
    for (;;) {
        ssize_t n = readlink(path, buffer.data(), buffer.size());
        if (n < 0) {
            return false;
        }
        if (static_cast<size_t>(n) < buffer.size()) {
            target.assign(buffer.data(), static_cast<size_t>(n));
            return true;
        }
        if (buffer.size() >= EXE_PATH_LIMIT) {
            errno = ENAMETOOLONG;
            return false;
        }
        buffer.resize(buffer.size() * 4);
    }
}

void readsymln(std::string& target, const char* link) {
    errno = EINVAL;
    if (link == nullptr || !readLink(link, target) || target.size() >= LINK_LIMIT) {
        snprintf(tempOutBuffer, sizeof(tempOutBuffer), "RLNCH0184E: Getting command path failed! errno = %d", errno);
        fatalErrorExit(tempOutBuffer);
    }
}

// cmd must be null or a String of this program (newString/chartowcs): it is
// released and replaced by a new String holding the launcher's directory.
// arg, the program name from the command line, is deliberately not used.
void findCommand(wchar_t*& cmd, wchar_t* arg) {
    (void)arg;
    std::string path;
    read_executable_path(path);
    std::wstring dir;
    chartowstr(path.c_str(), dir);
    cutAtLastSlash(dir);
    freeString(cmd);
    cmd = copyString(dir.c_str());
}

wchar_t* getRCPDirectory(int argc, wchar_t** argv) {
    wchar_t* dir = newString(1024);
    findCommand(dir, argc > 0 ? argv[0] : nullptr);
    if (isDirectory(dir)) {
        return dir;
    }
    // For the caller's message: why the path is unknown, else why it is no directory.
    const int err = unresolvedPathError != 0 ? unresolvedPathError : errno;
    freeString(dir);
    errno = err;
    return nullptr;
}

void getInstallDir(std::wstring& installDir, int argc, wchar_t** argv) {
    wchar_t* dir = getRCPDirectory(argc, argv);
    if (dir == nullptr) {
        installDir.clear();
        fatalErrorExit("RLNCH0049E: Unable to locate the platform's installation directory");
    }
    std::wstring candidate(dir);
    freeString(dir);
    size_t p = candidate.rfind(L'/');
    if (p != std::wstring::npos && candidate.compare(p + 1, std::wstring::npos, L"rcp") == 0) {
        candidate.erase(p);
        if (isDirectory(candidate.c_str())) {
            installDir = candidate;
            return;
        }
    }
    // Not laid out as <install>/rcp/<launcher>: an empty installation path,
    // which makes every later path relative to the root.
    installDir.clear();
}

void getLauncherPath(std::wstring& path) {
    std::string narrowPath;
    read_executable_path(narrowPath);
    chartowstr(narrowPath.c_str(), path);
}

void getServiceInstallDir(std::wstring& serviceDir, std::wstring& installDir, int argc, wchar_t** argv) {
    wchar_t* found = nullptr;
    findCommand(found, argc > 0 ? argv[0] : nullptr);
    std::wstring cmd(found != nullptr ? found : L"");
    freeString(found);
    // The service directory is two levels and the installation six levels
    // above the launcher's directory.
    for (int pass = 0; pass <= 5; ++pass) {
        cutAtLastSlash(cmd);
        if (pass == 1 && isDirectory(cmd.c_str())) {
            serviceDir = cmd;
        }
        if (pass == 5 && isDirectory(cmd.c_str())) {
            installDir = cmd;
            return;
        }
    }
    const wchar_t* program = argc > 0 ? argv[0] : L"";
    if (unresolvedPathError != 0) errno = unresolvedPathError;
    fatalErrorExit("RLNCH0048E: Unable to locate the directory containing %ls", program);
}

const wchar_t* getOS() { return L"macosx"; }

int shutdown() {
    FILE* fp = fopen(CMD_FILE, "w");
    if (fp == nullptr) {
        return 0;
    }
    PostSessionCommand record;
    memset(&record, 0, sizeof(record));
    snprintf(record.command, sizeof(record.command), "%s", "shutdown");
    snprintf(record.parameter, sizeof(record.parameter), "%s", "1");
    fwrite(&record, sizeof(record), 1, fp);
    fclose(fp);
    return logoff();
}

int logoff() {
    void* handle = dlopen("./lockdown.so", RTLD_LAZY);
    if (handle == nullptr) {
        if (system("killall gnome-session") == -1) {
            // Nothing more can be done to end the session.
        }
        exit(1);
    }
    dlerror();
    void* symbol = dlsym(handle, "logoff");
    if (dlerror() != nullptr || symbol == nullptr) {
        dlclose(handle);
        if (system("killall gnome-session") == -1) {
            // Nothing more can be done to end the session.
        }
        exit(1);
    }
    int (*sessionLogoff)() = reinterpret_cast<int (*)()>(symbol);
    int result = sessionLogoff();
    dlclose(handle);
    return result;
}

int findRCP() {
    static const char SUFFIX[] = "/eclipse";
    const size_t suffixLength = sizeof(SUFFIX) - 1;
    for (int attempt = 0; attempt < MAX_RETRIES; ++attempt) {
        DIR* proc = opendir("/proc");
        if (proc != nullptr) {
            struct dirent* entry;
            while ((entry = readdir(proc)) != nullptr) {
                if (!isProcessNumber(entry->d_name)) {
                    continue;
                }
                char cmdlinePath[PATH_MAX];
                int n = snprintf(cmdlinePath, sizeof(cmdlinePath), "/proc/%s/cmdline", entry->d_name);
                if (n < 0 || static_cast<size_t>(n) >= sizeof(cmdlinePath)) {
                    continue;
                }
                FILE* fp = fopen(cmdlinePath, "r");
                if (fp == nullptr) {
                    continue;
                }
                char line[1025];
                line[0] = '\0';
                char* got = fgets(line, sizeof(line), fp);
                fclose(fp);
                if (got == nullptr) {
                    continue;
                }
                // The command line is NUL-separated: the text is the program.
                size_t length = strlen(line);
                if (length > suffixLength && strcmp(line + length - suffixLength, SUFFIX) == 0) {
                    int found = static_cast<int>(strtol(entry->d_name, nullptr, 10));
                    closedir(proc);
                    return found;
                }
            }
            closedir(proc);
        }
        sleep(1);
    }
    return 0;
}
