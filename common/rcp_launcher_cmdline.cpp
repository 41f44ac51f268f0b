// The child's command line, put together: the placeholders expanded, and
// the builders called in the order that the configuration (or a
// provisioning launch) requires. What each builder adds is in the
// rcp_launcher_cmdline_* sources.
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
