// The multi-user service: its own area inside the installation, and the
// service start ("-initMUService") that prepares it and has the service's
// command line built.
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

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
    workspaceLocation = joinPath(installDir, MUSVC_WORKSPACE_LOC);
    wstring configLocation = joinPath(installDir, MUSVC_CONFIG_LOC);
    // The service's area is shared, also when a multi-user installation's
    // provisioning prepares it: its files follow the umask.
    setPrivateFiles(false);
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
    // Back to the rule of this launch's own areas.
    setPrivateFiles(areasOfOneUser());
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

    wstring launcherPropsFile = joinPath(serviceDir, RCP_LAUNCHER_PROPERTIES_FILE);
    std::vector<String> rcpLauncherPropertiesArray;
    std::vector<String> rcpInstallPropertiesArray;
    getProperties(launcherPropsFile, rcpLauncherPropertiesArray);
    SetInstallConfiguration(rcpLauncherPropertiesArray, true);
    getInstallID(launcherPropsFile, rcpLauncherPropertiesArray);

    wstring workspaceLocation = joinPath(installDir, MUSVC_WORKSPACE_LOC);
    openWorkspace(workspaceLocation, argc, argv);

    createMUServiceWkspc(workspaceLocation, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc,
                         argv);
    getUserCmdString(workspaceLocation, argc, argv, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray,
                     false, false);

    freeProperties(rcpInstallPropertiesArray);
    freeProperties(rcpLauncherPropertiesArray);
}
