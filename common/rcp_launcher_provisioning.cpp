// Deciding whether a launch must first run a provisioning pass (a new level of
// the provisioning manifest, a user's first launch, an installer's request)
// or an initial configuration of the platform, and running the former.
#include <algorithm>
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Length of "-initialCompleteFlag": a value only has to begin with it.
constexpr size_t INITIAL_COMPLETE_FLAG_LEN = 20;

}  // namespace

// A level never recorded is new, whatever the installation ships. An
// installation that ships no level has nothing new to provision: counting that
// as new would provision (and empty the shared classes) at every launch.
bool isNewProvisioningLevel(const wchar_t* previous, const wchar_t* current) {
    if (previous == nullptr) return true;
    if (current == nullptr) return false;
    return wcscmp(previous, current) != 0;
}

bool isInitialRequired(std::vector<String> rcpLauncherPropertiesArray, std::vector<String> rcpInstallPropertiesArray) {
    if (!installCfgTraits().initialLaunch) return false;

    std::vector<std::pair<const wchar_t*, const wchar_t*>> initial;
    forEachProperty(CONFIG_INITIAL_PREFIX, rcpLauncherPropertiesArray, [&](const wchar_t* key, const wchar_t* value) {
        initial.emplace_back(key, value);
        return true;
    });
    if (initial.empty()) return false;

    // The values numbered 1, 2, 3...; a gap is an error. A number matches as
    // a prefix, so "config.initial.1" also finds "config.initial.10".
    std::vector<const wchar_t*> values;
    for (size_t i = 1; i <= initial.size(); i++) {
        const wstring configStr = CONFIG_INITIAL_PREFIX + std::to_wstring(i);
        auto match = std::find_if(initial.begin(), initial.end(), [&](const auto& pair) {
            return wcsncmp(pair.first, configStr.c_str(), configStr.size()) == 0;
        });
        if (match == initial.end())
            fatalErrorExit("RLNCH0114E: Invalid config.initial arguments. %ls not found", configStr.c_str());
        values.push_back(match->second);
    }

    // "-initialCompleteFlag" is followed by the name of the installation
    // property that records a finished initial launch.
    auto flag = std::find_if(values.begin(), values.end(), [](const wchar_t* value) {
        return wcsncmp(value, INITIALCOMPLETEFLAG, INITIAL_COMPLETE_FLAG_LEN) == 0;
    });
    if (flag == values.end() || flag + 1 == values.end())
        fatalErrorExit("RLNCH0115E: Invalid config.initial arguments. -initialCompleteFlag not found");

    String completed = findProperty(*(flag + 1), rcpInstallPropertiesArray);
    return !(completed != nullptr && wcsncmp(completed, TRUE_VALUE, wcslen(TRUE_VALUE)) == 0);
}

void checkForProvisioning(const wstring& workspaceLocation, int argc, wchar_t** argv, const wstring& installDir,
                          std::vector<String>& rcpInstallPropertiesArray,
                          std::vector<String>& rcpLauncherPropertiesArray, const std::vector<wstring>& launchArgs) {
    String provisioning = findProperty(PROVISIONING, rcpLauncherPropertiesArray);
    if (provisioning == nullptr || wcscmp(provisioning, TRUE_VALUE) != 0) return;
    if (!installCfgTraits().provisions) return;

    String provisionedVersion = findProperty(PROV_MANIFEST_VERSION, rcpInstallPropertiesArray);
    String provisionVersion = findProperty(PROV_MANIFEST_VERSION, rcpLauncherPropertiesArray);
    if (provisionedVersion == nullptr || isNewProvisioningLevel(provisionedVersion, provisionVersion))
        userFirstLaunch = true;

    bool byInstaller = isISMPProvisioning(argc, argv);
    if (!userFirstLaunch && !byInstaller) return;

    SvcDebugOutA(
        "RLNCH0076I: Detected platform initial launch or user initial launch. Executing platform provisioning.");
    getUserCmdString(workspaceLocation, argc, argv, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray,
                     true, !byInstaller);

    if (installCfgTraits().provisionsServiceArea) {
        wstring serviceWorkspace = workspaceLocation;
        createMUServiceWkspc(serviceWorkspace, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray, argc,
                             argv);
    }

    doProvisioning(rcpLauncherPropertiesArray, rcpInstallPropertiesArray,
                   launchArgs.empty() ? L"" : launchArgs[0].c_str(), launchArgs);

    // The platform itself is started by the next launch.
    unlockLockFile();
    exitLauncher(0);
}
