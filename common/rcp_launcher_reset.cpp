// Setting a configuration area aside: on "-resetconfig", or when the area was
// written by another installation, the area is moved to one backup beside it
// ("<area>bak"), a fresh one is begun and the update manager's registry is
// carried over. The files the fresh area needs are made again later in the
// same launch. Every failure here ends the launch.
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Removes a whole tree; what could not be removed is listed in the one fatal
// message, whose "%ls" receives the list.
void removeTreeOrFail(const wstring& dir, const char* message) {
    wstring errlist;
    if (!removeDirectoryAndContents(dir, errlist)) fatalErrorExit(message, errlist.c_str());
}

wstring updateDirOf(const wstring& configLocation) { return joinPath(configLocation, UPDATE_DIR); }

// "<area>bak", beside the area (a trailing separator would put it inside).
wstring backupOf(const wstring& configLocation) {
    wstring area = nativePath(configLocation);
    while (area.size() > 1 && area.back() == L'/') area.pop_back();
    return area + BACKUP_SUFFIX;
}

// A "resetDir." value names a directory below the workspace's plug-in state;
// a ".." component would reach outside it, up to the user's whole home
// directory, so such a value is refused.
bool leavesPluginsDir(const wstring& value) {
    size_t start = 0;
    while (start <= value.size()) {
        size_t end = value.find_first_of(L"/\\", start);
        if (end == wstring::npos) end = value.size();
        if (value.compare(start, end - start, L"..") == 0) return true;
        start = end + 1;
    }
    return false;
}

// Moves the area to its backup, begins a new one with its update directory
// and brings the registry back into it.
void replaceArea(const wstring& workspaceLocation, const wstring& configLocation) {
    const wstring area = nativePath(configLocation);
    const wstring updateDir = updateDirOf(configLocation);
    handleDirMove(backupOf(configLocation), area, true);
    ensureDirectory(updateDir);
    handleFileMove(updateDir, REGISTRY_FILE, workspaceLocation, REGISTRY_SAVED, false);
}

}  // namespace

void handleCopy(const wstring& dstdir, const wstring& dstname, const wstring& srcdir, const wstring& srcname,
                bool bSrcMustExist, bool bRemoveSrc) {
    const wstring dst = joinPath(dstdir, dstname);
    const wstring src = joinPath(srcdir, srcname);

    if (!exists(src.c_str())) {
        if (!bSrcMustExist) {
            SvcDebugOutW(L"RLNCH0110I: '%s' not found", src.c_str());
            return;
        }
        fatalErrorExit("RLNCH0109E: Unable to locate '%ls' for copying", src.c_str());
    }

    if (exists(dst.c_str())) {
        if (!isDirectory(dst.c_str())) {
            if (!deleteFile(dst.c_str()))
                fatalErrorExit("RLNCH0111E: Can't delete old copy of file '%ls'", dst.c_str());
        } else {
            removeTreeOrFail(dst,
                             "\nRLNCH0083E begin: Error removing old directory\n%ls\n"
                             "RLNCH0084E end: Unable to remove all files in the old directory. Please correct the "
                             "problems listed above");
        }
    }

    if (bRemoveSrc) {
        if (!moveFile(src.c_str(), dst.c_str())) fatalErrorExit("RLNCH0112E: Can't move file/dir  '%ls'", src.c_str());
    } else {
        if (!copyFile(src.c_str(), dst.c_str())) fatalErrorExit("RLNCH0113E: Can't copy file  '%ls'", src.c_str());
    }
}

void handleFileMove(const wstring& dstdir, const wstring& dstname, const wstring& srcdir, const wstring& srcname,
                    bool bSrcMustExist) {
    handleCopy(dstdir, dstname, srcdir, srcname, bSrcMustExist, true);
}

void handleDirMove(const wstring& dstdir, const wstring& srcdir, bool bSrcMustExist) {
    handleCopy(dstdir, L"", srcdir, L"", bSrcMustExist, true);
}

void resetMetaDataDirs(const wstring& workspaceLocation, const wstring& configLocation, const wstring& coreLocation) {
    // The user's copy decides; an area that lost it falls back to the base.
    wstring propsPath = joinPath(configLocation, INSTALL_PROPS);
    if (!exists(propsPath.c_str())) {
        propsPath = getCoreFileLocation(coreLocation, INSTALL_PROPS);
        if (!exists(propsPath.c_str())) fatalErrorExit("RLNCH0106E: Unable to locate %ls file.", propsPath.c_str());
    }

    std::vector<String> props;
    getProperties(propsPath, props);

    // Written with a trailing "/", as the design names it: an empty
    // "resetDir." value removes "<workspace>/.metadata/.plugins/" itself.
    const wstring pluginsDir = joinPath(joinPath(workspaceLocation, METADATA_DIR), PLUGINS_DIR) + L"/";

    // Collected first, so that the file's strings are released before a
    // removal can end the launch.
    std::vector<wstring> values;
    forEachProperty(RESET_DIR_PREFIX, props, [&](const wchar_t*, const wchar_t* value) {
        values.emplace_back(value);
        return true;
    });
    freeProperties(props);

    for (const wstring& value : values) {
        if (leavesPluginsDir(value)) continue;  // passed over like a directory that is not there
        // An empty value names the plug-in state directory itself.
        const wstring dir = joinPath(pluginsDir, value);
        if (!exists(dir.c_str())) continue;
        removeTreeOrFail(dir,
                         "\nRLNCH0107E begin: Error removing metadata plugin directory\n%ls\n"
                         "RLNCH0108E end: Unable to remove all files in the metadata plugin directory. Please correct "
                         "the problems listed above");
    }
}

void resetWorkspace(const wstring& workspaceLocation, const wstring& configLocation, const wstring& coreLocation) {
    handleCopy(workspaceLocation, REGISTRY_SAVED, updateDirOf(configLocation), REGISTRY_FILE, false, false);
    resetMetaDataDirs(workspaceLocation, configLocation, coreLocation);
    replaceArea(workspaceLocation, configLocation);
}

void createReusableWorkspace(const wstring& workspaceLocation, const wstring& configLocation) {
    // The area must have come from an installation that kept a platform.xml.
    handleCopy(workspaceLocation, PLATFORM_XML_SAVED, updateDirOf(configLocation), PLATFORM_XML, true, false);
    handleCopy(workspaceLocation, REGISTRY_SAVED, updateDirOf(configLocation), REGISTRY_FILE, false, false);
    replaceArea(workspaceLocation, configLocation);
}
