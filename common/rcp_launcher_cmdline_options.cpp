// The platform's own options: the launcher's arguments that are meant for the
// platform, the computed workspace and configuration locations, and the
// application, plug-in customization, product and personality, taken from the
// command line or else from the properties.
#include <vector>

#include "rcp_launcher.h"

namespace {

void addOptionFromProperty(const wchar_t* option, String value) {
    if (value == nullptr) return;
    addArgToCommandLine(option);
    addArgToCommandLine(value);
}

}  // namespace

void addMainOptionsToCommandLine(std::vector<String>& rcpInstallPropertiesArray,
                                 std::vector<String>& rcpLauncherPropertiesArray, int argc, wchar_t** argv,
                                 wstring& installDir) {
    int dataIdx = findOption(DATAARG, argc, argv);
    int configIdx = findOption(CONFIGARG, argc, argv);
    int plugincustIdx = findOption(PLUGINCUSTARG, argc, argv);
    int applicationIdx = findOption(APPARG, argc, argv);
    int restartIdx = findOption(RESTARTARG, argc, argv);
    int productIdx = findOption(PRODUCTARG, argc, argv);
    int personalityIdx = findOption(PERSONALITYARG, argc, argv);
    int resetconfigIdx = findOption(RESETCONFIGARG, argc, argv);

    if (isServiceConfig()) addArgToCommandLine(NOSPLASHARG);

    int vmIdx = findOption(VMARG, argc, argv);
    int vmargsIdx = findOption(VMARGS, argc, argv);
    if (vmargsIdx == -1) vmargsIdx = argc;

    // Options are recognised by index: only the first "-data" etc. is held
    // back, a later one is an ordinary argument. A value is consumed even when
    // it lies beyond "-vmargs".
    for (int i = 1; i < vmargsIdx; i++) {
        if (i == dataIdx) {
            i++;  // written below with the computed location
        } else if (i == configIdx) {
            i++;  // likewise
            configIdx = -1;
        } else if (i == plugincustIdx || i == applicationIdx || i == productIdx || i == personalityIdx) {
            addArgToCommandLine(argv[i]);
            if (i + 1 < argc) addArgToCommandLine(argv[i + 1]);
            i++;
        } else if (i == vmIdx) {
            i++;  // the JVM is the launcher's business, not the platform's
        } else if (i == restartIdx || i == resetconfigIdx) {
            // the launcher's own orders
        } else {
            addArgToCommandLine(argv[i]);
        }
    }

    requireInstallID(rcpInstallPropertiesArray);

    wstring location;
    getWorkspaceLocation(location, rcpInstallPropertiesArray, argc, argv, installDir);
    addArgToCommandLine(DATAARG);
    addArgToCommandLine(location);

    location.clear();
    getConfigurationLocation(location, rcpInstallPropertiesArray, argc, argv, installDir);
    addArgToCommandLine(CONFIGARG);
    addArgToCommandLine(location);

    if (applicationIdx == -1)
        addOptionFromProperty(APPARG, findProperty(APPLICATION_PROPERTY, rcpInstallPropertiesArray));
    if (plugincustIdx == -1)
        addOptionFromProperty(PLUGINCUSTARG, findProperty(PLUGINCUST_PROPERTY, rcpInstallPropertiesArray));
    if (productIdx == -1) {
        // The launcher's product beats the installation's.
        String ProductString = findProperty(PRODUCT_PROPERTY, rcpLauncherPropertiesArray);
        if (ProductString == nullptr) ProductString = findProperty(PRODUCT_PROPERTY, rcpInstallPropertiesArray);
        addOptionFromProperty(PRODUCTARG, ProductString);
    }
    if (personalityIdx == -1)
        addOptionFromProperty(PERSONALITYARG, findProperty(PERSONALITY_PROPERTY, rcpInstallPropertiesArray));
}
