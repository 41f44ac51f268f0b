// The startup sequence: everything between the reading of the launcher's
// arguments and the start of the child. It reads the launcher properties,
// works out and creates the user's directories, opens the log, takes the
// platform lock, prepares the per-user files, reads the installation and JVM
// properties and has the child command line built into launchArgs.
//
// Two argument vectors are in play and the difference matters:
//  - argc/argv: the launcher's own arguments, as the user typed them;
//  - cargc/cargv: the effective arguments, i.e. the own ones with a
//    "-config NAME" replaced by the config.NAME.N launcher properties.
// Reset, the startup record and the initial-launch rebuild look at what the
// user typed; everything that locates or builds looks at the effective ones.
#include <cerrno>
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

// Set by every step that had to create a user's directory or file in this
// launch; it only ever goes from false to true.
bool userFirstLaunch = false;

void getLogLocation(wstring& logLocation, const wstring& workspaceLocation) {
    logLocation = joinPath(workspaceLocation, LOG_DIR);
}

void openWorkspace(const wstring& workspaceLocation, int argc, wchar_t** argv) {
    ensureDirectory(workspaceLocation);
    wstring logLocation;
    getLogLocation(logLocation, workspaceLocation);
    ensureDirectory(logLocation);
    if (!enableLogging(logLocation)) {
        dumpLogToTempLocation();  // RLNCH0019E and what came before it
        exitLauncher(255);
    }
    locateLockFile(argc, argv, workspaceLocation);
}

namespace {

// What lives through one run of the sequence.
struct Startup {
    int argc = 0;  // the launcher's own arguments
    wchar_t** argv = nullptr;
    int cargc = 0;  // the effective arguments
    wchar_t** cargv = nullptr;
    bool bFree = false;                 // cargv was allocated by addConfigExtentionsToArg
    std::vector<wstring> newargs;       // owns the strings cargv points to
    std::vector<wstring> initialArgs;   // the initial launch's own arguments
    std::vector<wchar_t*> initialArgv;  // ... as a vector of pointers
    std::vector<String> rcpLauncherPropertiesArray;
    std::vector<String> rcpInstallPropertiesArray;
    wstring installDir;
    wstring rcp_launcher_properties_file;
    wstring installID;
    wstring coreLocation;
    wstring workspaceLocation;
    wstring configLocation;
};

void releaseEffectiveArgs(Startup& s) {
    if (s.bFree) free(s.cargv);  // malloc'ed by addConfigExtentionsToArg
    s.bFree = false;
    s.cargv = nullptr;
    s.cargc = 0;
}

// Installation directory, launcher properties, effective arguments, and
// debug output decided again on those.
void readLauncherProperties(Startup& s) {
    // Empty for a launcher outside a directory named "rcp": its paths are
    // then taken from the root ("/rcp/rcplauncher.properties").
    getInstallDir(s.installDir, s.argc, s.argv);
    s.rcp_launcher_properties_file = joinPath(s.installDir, RCP_LAUNCHER_PROPERTIES_FILE);
    getProperties(s.rcp_launcher_properties_file, s.rcpLauncherPropertiesArray);

    s.cargc = s.argc;
    s.cargv = s.argv;
    s.bFree = addConfigExtentionsToArg(&s.cargc, &s.cargv, s.argc, s.argv, s.rcpLauncherPropertiesArray, s.newargs);
    // "-debug" may come from the launcher properties as well.
    setDebug(isDebug(s.cargc, s.cargv));
}

// Install configuration, installation identifier, base location.
void readInstallationIdentity(Startup& s) {
    SetInstallConfiguration(s.rcpLauncherPropertiesArray, false);
    const wchar_t* id = getInstallID(s.rcp_launcher_properties_file, s.rcpLauncherPropertiesArray);
    s.installID = id ? id : L"";

    const wchar_t* base = findProperty(RCP_BASE_LOC_PROPERTY, s.rcpLauncherPropertiesArray);
    if (!base)
        fatalErrorExit("RLNCH0050E: rcp.base.location property is missing from %ls",
                       s.rcp_launcher_properties_file.c_str());
    s.coreLocation = base;
    // Only the first occurrence: later ones are the installer's business.
    replaceFirstRcpHome(s.coreLocation, s.installDir);
}

// Workspace, log, platform lock, configuration area, in this order.
void prepareUserAreas(Startup& s) {
    getWorkspaceLocation(s.workspaceLocation, s.rcpLauncherPropertiesArray, s.cargc, s.cargv, s.installDir);
    openWorkspace(s.workspaceLocation, s.cargc, s.cargv);
    getConfigurationLocation(s.configLocation, s.rcpLauncherPropertiesArray, s.cargc, s.cargv, s.installDir);
    ensureDirectory(s.configLocation);
}

// An area left by another installation is set aside; otherwise a
// reset happens only when the user typed "-resetconfig" (not when the
// launcher properties add it). A first launch has nothing to reset.
void reuseOrResetAreas(Startup& s) {
    if (userFirstLaunch) return;
    if (isOldRcpInstallId(s.installID, s.configLocation))
        createReusableWorkspace(s.workspaceLocation, s.configLocation);
    else if (isResetConfig(s.argc, s.argv))
        resetWorkspace(s.workspaceLocation, s.configLocation, s.coreLocation);
}

// The user's own update site, and the installation's shared
// extension marker copied into it when the installation has one.
void prepareUserSite(Startup& s) {
    const wstring siteLocation = joinPath(s.workspaceLocation, SITE_LOC);
    for (const wchar_t* child : {SITE_FEATURES_DIR, SITE_PLUGINS_DIR}) ensureDirectory(joinPath(siteLocation, child));

    const wstring extLocation = joinPath(s.installDir, SHARED_EXTENSION_LOC);
    if (exists(extLocation.c_str()))
        copyFile(extLocation.c_str(), joinPath(siteLocation, ECLIPSE_EXTENSION_FILE).c_str());
}

// The startup record (main process only, with the arguments
// as typed), config.ini, and the user's installation properties, read back.
void prepareUserFiles(Startup& s) {
    if (isMainProcess()) writeStartupArgs(s.argc, s.argv, s.configLocation);
    createConfigIni(s.configLocation, s.coreLocation);
    wstring propsFile = createRCPInstallProps(s.workspaceLocation, s.configLocation, s.coreLocation, s.installDir,
                                              s.rcpLauncherPropertiesArray);
    getProperties(propsFile, s.rcpInstallPropertiesArray);
}

// The jvm.properties of a JVM named with "-vm": the file three directory
// levels above the program (A/jre/bin/java gives A/jvm.properties). Empty when
// the path has fewer than three slashes. A slash at position 0 makes the next
// search start from npos, i.e. from the end again: "/bin/java" gives
// "/bin/jvm.properties".
wstring jvmPropertiesBeside(wstring vmString) {
    convertBS2S(vmString);
    size_t slash = wstring::npos;
    for (int i = 0; i < 3; i++) {
        slash = vmString.rfind(L'/', i == 0 ? wstring::npos : slash - 1);
        if (slash == wstring::npos) return wstring();
    }
    return joinPath(vmString.substr(0, slash), JVM_PROPERTIES);
}

// JVM properties appended to the installation properties. Returns
// false when a "-vm" value is too shallow to hold a jvm.properties: the launch
// then goes on without building a command line.
bool readJvmProperties(Startup& s) {
    const wchar_t* vm = optionValue(VMARG, s.cargc, s.cargv);
    if (vm == nullptr) {
        wstring jvmPropLocation;
        if (getJvmPropertyLocation(s.rcpInstallPropertiesArray, s.installDir, jvmPropLocation))
            getProperties(jvmPropLocation, s.rcpInstallPropertiesArray);
        return true;
    }
    wstring jvmPropLocation = jvmPropertiesBeside(vm);
    if (jvmPropLocation.empty()) return false;
    if (exists(jvmPropLocation.c_str())) getProperties(jvmPropLocation, s.rcpInstallPropertiesArray);
    return true;
}

// A platform that still needs its initial configuration is started
// with "-config initial" (and the user's "-data" pair, if any) instead of the
// user's arguments.
void switchToInitialLaunch(Startup& s) {
    releaseEffectiveArgs(s);
    s.newargs.clear();

    s.initialArgs = {s.argc > 0 && s.argv[0] ? s.argv[0] : L"", CONFIGOPTARG, L"initial"};
    for (int i = 1; i < s.argc; i++) {
        if (wcsncmp(s.argv[i], DATAARG, 5) == 0) {
            s.initialArgs.push_back(s.argv[i]);
            if (i + 1 < s.argc) s.initialArgs.push_back(s.argv[i + 1]);
            break;
        }
    }
    s.initialArgv.clear();
    for (wstring& a : s.initialArgs) s.initialArgv.push_back(&a[0]);
    s.initialArgv.push_back(nullptr);

    int new_argc = static_cast<int>(s.initialArgs.size());
    s.cargc = new_argc;
    s.cargv = s.initialArgv.data();
    s.bFree = addConfigExtentionsToArg(&s.cargc, &s.cargv, new_argc, s.initialArgv.data(), s.rcpLauncherPropertiesArray,
                                       s.newargs);
}

// The properties arrays and the effective argument vector.
void release(Startup& s) {
    freeProperties(s.rcpInstallPropertiesArray);
    freeProperties(s.rcpLauncherPropertiesArray);
    releaseEffectiveArgs(s);
}

}  // namespace

void startup(int argc, wchar_t** argv, const std::vector<wstring>& launchArgs) {
    Startup s;
    s.argc = argc;
    s.argv = argv;

    readLauncherProperties(s);
    readInstallationIdentity(s);
    prepareUserAreas(s);
    reuseOrResetAreas(s);
    prepareUserSite(s);
    prepareUserFiles(s);
    if (!readJvmProperties(s)) {
        release(s);
        return;
    }
    createPlatformXML(s.configLocation, s.coreLocation, s.rcpLauncherPropertiesArray);
    if (isMainProcess())
        checkForProvisioning(s.workspaceLocation, s.cargc, s.cargv, s.installDir, s.rcpInstallPropertiesArray,
                             s.rcpLauncherPropertiesArray, launchArgs);
    if (isInitialRequired(s.rcpLauncherPropertiesArray, s.rcpInstallPropertiesArray)) switchToInitialLaunch(s);
    getUserCmdString(s.workspaceLocation, s.cargc, s.cargv, s.installDir, s.rcpInstallPropertiesArray,
                     s.rcpLauncherPropertiesArray, false, false);
    release(s);
}
