// The multi-user service's own area inside the installation, and the
// assembly of the child's command line in the order that the configuration
// (or a provisioning launch) requires.
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// A new provisioning level invalidates the JVM's shared class cache. A failed
// clean-up is reported, as one error block with the list inside, but does not
// stop the launch.
void cleanSharedClasses(std::vector<String>& rcpInstallPropertiesArray,
                        std::vector<String>& rcpLauncherPropertiesArray) {
    if (!isNewProvisioningLevel(findProperty(PROV_MANIFEST_VERSION, rcpInstallPropertiesArray),
                                findProperty(PROV_MANIFEST_VERSION, rcpLauncherPropertiesArray)))
        return;
    String sharedClasses = findProperty(SHARECLASSES_PROPERTY, rcpInstallPropertiesArray);
    // An empty value names no directory: there is nothing to empty, and
    // nothing worth an error block either.
    if (sharedClasses == nullptr || sharedClasses[0] == L'\0') return;
    wstring errlist;
    if (!removeDirectoryContents(wstring(sharedClasses), errlist))
        fatalErrorA(
            "\nRLNCH0086E begin: Error removing shared classes directory\n%ls\n"
            "RLNCH0087E end: Unable to remove all files in the shared classes directory. Please correct the "
            "problems listed above",
            errlist.c_str(), false);
}

}  // namespace

void createMUServiceWkspc(wstring& workspaceLocation, const wstring& installDir,
                          std::vector<String>& rcpInstallPropertiesArray,
                          std::vector<String> rcpLauncherPropertiesArray, int argc, wchar_t** argv) {
    wstring userName;
    if (eConfig == multiuser_service) {
        userName = MUSERVICE_USER;
    } else if (getEnv(USER_IN_ENV, userName) == nullptr) {
        fatalErrorExit("RLNCH0006E: Couldn't find the user name!");
    }
    SvcDebugOutW(L"RLNCH0043I: UserName: %s", userName.c_str());

    // Only the superuser or the service itself may write into the installation.
    if (!userIsAdmin(userName.c_str()) && eConfig != multiuser_service) return;

    wstring baseLocation = requireBaseLocation(rcpLauncherPropertiesArray);
    replaceFirstRcpHome(baseLocation, installDir);
    workspaceLocation = installDir + MUSVC_WORKSPACE_LOC;
    wstring configLocation = installDir + MUSVC_CONFIG_LOC;
    ensureDirectory(workspaceLocation);
    ensureDirectory(configLocation);

    createConfigIni(configLocation, baseLocation);
    wstring propsFile =
        createRCPInstallProps(workspaceLocation, configLocation, baseLocation, installDir, rcpLauncherPropertiesArray);
    getProperties(propsFile, rcpInstallPropertiesArray);

    if (!isVmOverride(argc, argv)) {
        wstring jvmPropLocation;
        if (getJvmPropertyLocation(rcpInstallPropertiesArray, installDir, jvmPropLocation))
            getProperties(jvmPropLocation, rcpInstallPropertiesArray);
    }

    createPlatformXML(configLocation, baseLocation, rcpLauncherPropertiesArray);
}

void getUserCmdString(const wstring& workspaceLocation, int argc, wchar_t** argv, wstring installDir,
                      std::vector<String>& rcpInstallPropertiesArray, std::vector<String>& rcpLauncherPropertiesArray,
                      bool provisioning, bool bRelaunch) {
    replacePlaceholdersInRcpInstallProp(workspaceLocation, installDir, rcpInstallPropertiesArray);
    std::vector<wchar_t*> scratch(argc > 0 ? static_cast<size_t>(argc) : 0, nullptr);
    if (argc > 0) replacePlaceholdersInArgv(workspaceLocation, installDir, argv, scratch.data(), argc);

    cleanSharedClasses(rcpInstallPropertiesArray, rcpLauncherPropertiesArray);

    if (provisioning) {
        addBaseEclipseToCommandLine(rcpInstallPropertiesArray);
        addMainOptionsToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
        // Without an application to run, a provisioning child would just start
        // the platform's default application, so the option is left out.
        String provApp = findProperty(PROV_APP_PROPERTY, rcpInstallPropertiesArray);
        if (provApp != nullptr) {
            addArgToCommandLine(APPARG);
            addArgToCommandLine(provApp);
        }
        if (bRelaunch) addArgToCommandLine(USERPROVLAUNCHARG);
        addVmToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv);
        addStartupToCommandLine(rcpInstallPropertiesArray, argc, argv);
        addVmargsToCommandLine(workspaceLocation, rcpInstallPropertiesArray, argc, argv);
        addDashDToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
        addXargsToCommandLine(rcpInstallPropertiesArray);
        addClasspathToCommandLine(rcpInstallPropertiesArray);
    } else if (isServiceConfig()) {
        addVmToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv);
        addVmargsToCommandLine(workspaceLocation, rcpInstallPropertiesArray, argc, argv);
        addDashDToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
        addXargsToCommandLine(rcpInstallPropertiesArray);
        addClasspathToCommandLine(rcpInstallPropertiesArray);
        addMainClassToCommandLine();
        addMainOptionsToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
    } else {
        addBaseEclipseToCommandLine(rcpInstallPropertiesArray);
        addMainOptionsToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
        addVmToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv);
        addUseDaemonToCommandLine();
        addStartupToCommandLine(rcpInstallPropertiesArray, argc, argv);
        addVmargsToCommandLine(workspaceLocation, rcpInstallPropertiesArray, argc, argv);
        addDashDToCommandLine(rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc, argv, installDir);
        addXargsToCommandLine(rcpInstallPropertiesArray);
        addClasspathToCommandLine(rcpInstallPropertiesArray);
    }
    addEnvSetToCommandLine(rcpInstallPropertiesArray);
    addLibpathToCommandLine(rcpInstallPropertiesArray);
    addLdPreloadToCommandLine(rcpInstallPropertiesArray);
    addEnvJavaHighZipfds(rcpInstallPropertiesArray);
}

// The service start ("-initMUService"), in place of the ordinary startup:
//  - the service directory (two levels above the launcher's) holds the
//    launcher properties in "rcp/rcplauncher.properties"; the installation
//    directory (six levels above) is the one whose "eclipse/.muservice" area
//    is prepared and which "${rcp.home}" names;
//  - SetInstallConfiguration gets those launcher properties, as in the
//    ordinary startup: the installation properties are only made from them
//    later, and the configuration becomes multiuser_service whatever the file
//    says;
//  - the log opens in the service workspace's "logs" directory, where an
//    administrator finds what the start did, and the platform lock is taken
//    in that workspace, so that two service starts are serialised like two
//    launches of one user and launchEclipse records the child as always.
// No startup record, no provisioning check, no "-config" extensions and no
// reset: the service area is prepared, not a user's.
void startupMUService(int argc, wchar_t** argv) {
    wstring serviceDir;
    wstring installDir;
    getServiceInstallDir(serviceDir, installDir, argc, argv);

    wstring launcherPropsFile = serviceDir + RCP_LAUNCHER_PROPERTIES_FILE;
    std::vector<String> rcpLauncherPropertiesArray;
    std::vector<String> rcpInstallPropertiesArray;
    getProperties(launcherPropsFile, rcpLauncherPropertiesArray);
    SetInstallConfiguration(rcpLauncherPropertiesArray, true);
    getInstallID(launcherPropsFile, rcpLauncherPropertiesArray);

    wstring workspaceLocation = installDir + MUSVC_WORKSPACE_LOC;
    openWorkspace(workspaceLocation, argc, argv);

    createMUServiceWkspc(workspaceLocation, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc,
                         argv);
    getUserCmdString(workspaceLocation, argc, argv, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray,
                     false, false);

    freeProperties(rcpInstallPropertiesArray);
    freeProperties(rcpLauncherPropertiesArray);
}
