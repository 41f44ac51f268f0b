// The child's environment. The child inherits the launcher's own environment,
// so these functions change the launcher's environment just before the fork:
// "env.set" variables, the library path, the preloaded library (through a
// space-free link under /tmp when its path has blanks) and the JVM's zip
// descriptor limit.
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Characters of "env.set." dropped from a key to get the variable's name.
constexpr size_t ENV_SET_NAME_OFFSET = 8;

// True when linkPath is a symbolic link that this user owns and that points to
// target. Only such a link may be handed to the dynamic loader: a link or a
// file planted in /tmp by another user could be swapped for anything.
bool isOwnLinkTo(const std::string& linkPath, const std::string& target) {
    struct stat st;
    if (lstat(linkPath.c_str(), &st) != 0) return false;
    if (!S_ISLNK(st.st_mode) || st.st_uid != geteuid()) return false;
    std::string current;
    return readLink(linkPath.c_str(), current) && current == target;
}

void logPreloadVariable() {
    wstring value;
    SvcDebugOutW(L"setPreload():getenv LD_PRELOAD=%s", getEnv(LD_PRELOAD_ENV_VAR, value) ? value.c_str() : L"(null)");
}

}  // namespace

bool setEnv(const wchar_t* key, const wchar_t* var, bool overwrite) {
    std::string keyA;
    std::string varA;
    wstrtocs(keyA, key);
    wstrtocs(varA, var);
    return setenv(keyA.c_str(), varA.c_str(), overwrite ? 1 : 0) != 0;
}

bool unsetEnv(const wchar_t* key) {
    std::string keyA;
    wstrtocs(keyA, key);
    unsetenv(keyA.c_str());
    return true;
}

void addEnvSetToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    forEachProperty(ENV_SET_PREFIX, rcpInstallPropertiesArray, [](const wchar_t* key, const wchar_t* value) {
        // The name is whatever follows the first 8 characters ("env.set."),
        // counted, not searched: "env.setNAME" sets "AME". The bare key
        // "env.set" has no name at all.
        if (wcslen(key) >= ENV_SET_NAME_OFFSET) setEnv(key + ENV_SET_NAME_OFFSET, value, true);
        return true;
    });
}

void addLibpathToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    // Empty pieces are left out: an empty element of the library path means
    // the current directory, which the child must not search by accident.
    String append = findProperty(LIBRARY_PATH_APPEND, rcpInstallPropertiesArray);
    String prepend = findProperty(LIBRARY_PATH_PREPEND, rcpInstallPropertiesArray);
    wstring current;
    const wchar_t* inherited = getEnv(LIBRARY_PATH_ENV_VAR, current);

    wstring libpath;
    bool needSep = false;
    bool bModified = false;
    if (prepend != nullptr && prepend[0] != L'\0') {
        libpath += prepend;
        needSep = true;
        bModified = true;
    }
    if (inherited != nullptr && inherited[0] != L'\0') {
        if (needSep) libpath += PATH_SEPARATOR;
        libpath += inherited;
        needSep = true;
    }
    if (append != nullptr && append[0] != L'\0') {
        if (needSep) libpath += PATH_SEPARATOR;
        libpath += append;
        bModified = true;
    }
    if (bModified) setEnv(LIBRARY_PATH_ENV_VAR, libpath.c_str(), true);
}

void addLdPreloadToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    String ldPreload = findProperty(LD_PRELOAD, rcpInstallPropertiesArray);
    if (ldPreload == nullptr) return;
    setPreload(ldPreload, requireInstallID(rcpInstallPropertiesArray));
}

void setPreload(const wchar_t* ldPreload, const wchar_t* IDString) {
    std::string ldPreloadA;
    wstrtocs(ldPreloadA, ldPreload);

    if (wcschr(ldPreload, L' ') == nullptr) {
        setEnv(LD_PRELOAD_ENV_VAR, ldPreload, true);
        SvcDebugOutA("setPreload():setting LD_PRELOAD=%s", ldPreloadA.c_str());
        return;
    }

    // The preload variable is split at blanks, so a path with blanks is
    // reached through a link of our own under /tmp.
    SvcDebugOutA("setPreload():found property: library.preload=%s", ldPreloadA.c_str());
    if (existsA(ldPreloadA.c_str()) != 1) {
        logPreloadVariable();
        return;
    }

    const wchar_t* preloadName = wcsrchr(ldPreload, L'/');
    if (preloadName == nullptr) fatalErrorExit("RLNCH0189E: Couldn't find filename for library.preload property");
    SvcDebugOutW(L"setPreload():library name = %s", ++preloadName);

    wstring userName;
    if (getEnv(USER_IN_ENV, userName) == nullptr) fatalErrorExit("RLNCH0006E: Couldn't find the user name!");

    const wstring link = joinPath(TEMP_DIR, wstring(TEMP_PREFIX) + L"." + userName + L"." +
                                                (IDString != nullptr ? IDString : L"") + L"." + preloadName);
    std::string linkPath;
    wstrtocs(linkPath, link);
    SvcDebugOutA("setPreload():linkPath=%s", linkPath.c_str());

    // Decide on what is really there (lstat, no link followed). Only our own
    // symbolic link is ever removed; anything else is left alone.
    struct stat st;
    if (lstat(linkPath.c_str(), &st) == 0) {
        SvcDebugOutA("setPreload(): link path already exists.");
        std::string target;
        if (S_ISLNK(st.st_mode) && readLink(linkPath.c_str(), target)) {
            SvcDebugOutA("setPreload(): existing link is to: %s", target.c_str());
            if (target != ldPreloadA && st.st_uid == geteuid()) {
                SvcDebugOutA("setPreload(): removing existing link ...");
                unlink(linkPath.c_str());
            }
        }
    }

    if (lstat(linkPath.c_str(), &st) != 0 && errno == ENOENT) {
        SvcDebugOutA("setPreload(): creating new link ...");
        // symlink() never writes through an existing entry: if someone got
        // there first it fails, and the check below refuses the path.
        symlink(ldPreloadA.c_str(), linkPath.c_str());
        SvcDebugOutA("setPreload(): symlink() result = %d", 0);
    }

    if (isOwnLinkTo(linkPath, ldPreloadA)) {
        setEnv(LD_PRELOAD_ENV_VAR, link.c_str(), true);
        SvcDebugOutA("setPreload():setting LD_PRELOAD=%s", linkPath.c_str());
    } else {
        SvcDebugOutA("setPreload(): link path is not our link to the library; LD_PRELOAD not set.");
    }
    logPreloadVariable();
}

void addEnvJavaHighZipfds(std::vector<String>& rcpInstallPropertiesArray) {
    String value = findProperty(ENV_JAVA_HIGH_ZIPFDS, rcpInstallPropertiesArray);
    setEnv(ENV_JAVA_HIGH_ZIPFDS_ENV_VAR, value != nullptr ? value : JAVA_HIGH_ZIPFDS_DEFAULT, true);
}
