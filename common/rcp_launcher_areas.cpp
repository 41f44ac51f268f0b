// Where a launch keeps its data: the installation identifier, the workspace
// and the configuration area for every install configuration, and whether an
// existing configuration area was written by a different installation.
// Nothing here creates directories; the startup sequence does that.
#include <ctime>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Room for the decimal seconds of the new identifier.
constexpr size_t INSTALL_ID_CHARS = 100;

// A location given by the user or the administrator may end in a separator;
// exactly one is dropped so "/a/b/" and "/a/b" name the same workspace.
void removeOneTrailingSeparator(wstring& path) {
    if (!path.empty() && (path.back() == L'/' || path.back() == L'\\')) path.pop_back();
}

// A relative location (HOME=home, a relative "-data" or "rcp.data") is taken
// from the launcher's current directory before anything is created or opened
// in it: directories are made from the root (mkdirs) while files are opened
// from the current directory, so a relative path would name two places. An
// empty location stays as it is: the design builds the areas from the root
// then ("/KEL/RCP/..." for an empty or unset HOME).
void makeAbsolute(wstring& path) {
    if (path.empty() || path[0] == L'/' || path[0] == L'\\') return;
    wstring cwd;
    if (!getCurrentDirectory(cwd)) fatalErrorExit("RLNCH0010E: Unable to create %ls directory.", path.c_str());
    path = joinPath(cwd, path);
}

}  // namespace

unsigned long getTick() { return static_cast<unsigned long>(std::time(nullptr)); }

wchar_t* getTickString(wchar_t* wsticks, size_t size) {
    if (swprintf(wsticks, size, L"%lu", getTick()) < 0) wsticks[0] = 0;  // too small: empty, never unterminated
    return wsticks;
}

String getInstallID(wstring rcp_launcher_properties_file, std::vector<String>& rcpLauncherPropertiesArray) {
    String installID = findProperty(RCP_INSTALL_ID_PROPERTY, rcpLauncherPropertiesArray);
    if (installID != nullptr) return installID;

    if (eConfig != userpb) fatalErrorExit("RLNCH0016E: rcp.install.id is required for this configuration!");

    // A package-builder installation names itself on its first launch; the
    // array keeps its key/value pairing and owns both new strings.
    String key = copyString(RCP_INSTALL_ID_PROPERTY);
    String value = newString(INSTALL_ID_CHARS);
    getTickString(value, INSTALL_ID_CHARS + 1);
    rcpLauncherPropertiesArray.push_back(key);
    rcpLauncherPropertiesArray.push_back(value);
    installID = findProperty(RCP_INSTALL_ID_PROPERTY, rcpLauncherPropertiesArray);

    // Persist it so that every later launch finds the same identifier and so
    // the same default workspace. No line end is written first: a file whose
    // last line lacks one gets the entry joined to that line. The file is
    // replaced whole, like every file the launcher writes, so a full disk
    // cannot cut it; one this user may not write is refused (RLNCH0017E)
    // rather than replaced, whatever its directory allows.
    const wchar_t* file = rcp_launcher_properties_file.c_str();
    const int appended = appendToFile(file, wstring(RCP_INSTALL_ID_PROPERTY) + EQUALS_CHAR + installID + NEWLINE);
    if (appended < 0) fatalErrorExit("RLNCH0017E: Could not open %ls to append rcp.install.id!", file);
    if (appended == 0) fatalErrorExit("RLNCH0018E: Error while writing to %ls file.", file);
    return installID;
}

int getWorkspaceLocation(wstring& workspaceLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                         wchar_t** argv, wstring& installDir) {
    if (const wchar_t* inInstall = installCfgTraits().workspace) {
        workspaceLocation = joinPath(installDir, inInstall);
        return 1;
    }

    int given = 1;
    // "-data" as the last argument has no value and is ignored.
    if (const wchar_t* data = optionValue(DATAARG, argc, argv)) {
        workspaceLocation = data;
    } else if (String rcpData = findProperty(RCP_DATA_PROPERTY, rcpInstallPropertiesArray)) {
        workspaceLocation = rcpData;
        if (!replaceUserPlaceholders(workspaceLocation, rcpInstallPropertiesArray))
            fatalErrorExit("RLNCH0099E: rcp.data property is invalid (%ls)", workspaceLocation.c_str());
    } else {
        const wstring installID = requireInstallID(rcpInstallPropertiesArray);
        wstring userName;
        if (getEnv(USER_IN_ENV, userName) == nullptr) fatalErrorExit("RLNCH0006E: Couldn't find the user name!");
        wstring home;
        workspaceLocation = joinPath(joinPath(getUserHome(home), USER_WORKSPACE_MIDDLE + installID), userName);
        given = 0;
    }
    if (given) removeOneTrailingSeparator(workspaceLocation);
    makeAbsolute(workspaceLocation);
    return given;
}

int getConfigurationLocation(wstring& configLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                             wchar_t** argv, wstring& installDir) {
    // Always computed first, so a bad workspace setting fails here as well.
    wstring workspace;
    const int result = getWorkspaceLocation(workspace, rcpInstallPropertiesArray, argc, argv, installDir);
    const wchar_t* inInstall = installCfgTraits().configArea;
    configLocation = inInstall != nullptr ? joinPath(installDir, inInstall) : joinPath(workspace, CONFIG_SUBDIR);
    return result;
}

bool isOldRcpInstallId(const wstring& launcherInstallID, const wstring& configLocation) {
    const wstring propsPath = joinPath(configLocation, INSTALL_PROPS);
    if (!exists(propsPath.c_str())) return false;

    std::vector<String> props;
    getProperties(propsPath, props);
    String stored = findProperty(RCP_INSTALL_ID_PROPERTY, props);
    const wstring areaInstallID = stored != nullptr ? stored : L"";
    freeProperties(props);

    // An area that never recorded an identifier is not treated as foreign.
    if (areaInstallID.empty()) return false;
    return areaInstallID != launcherInstallID;
}
