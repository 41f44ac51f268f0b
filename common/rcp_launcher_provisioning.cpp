// Deciding whether a launch must first run a provisioning pass (a new level of
// the provisioning manifest, a user's first launch, an installer's request)
// or an initial configuration of the platform, and running the former.
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

bool isInitialRequired(std::vector<String> rcpLauncherPropertiesArray,
                       std::vector<String> rcpInstallPropertiesArray) {
    if (eConfig != user && eConfig != userpb && eConfig != multiuser) return false;

    String* config_initial = findProperties(CONFIG_INITIAL_PREFIX, rcpLauncherPropertiesArray);
    if (config_initial == nullptr) return false;
    size_t size = 0;
    while (config_initial[size] != nullptr && config_initial[size][0] != L'\0') size += 2;
    if (size == 0) {
        free(config_initial);
        return false;
    }

    // The numbered entries in order 1, 2, 3...; a gap is an error. A number
    // matches as a prefix, so "config.initial.1" also finds "config.initial.10".
    std::vector<const wchar_t*> config_vector;
    for (size_t i = 1; i <= size / 2; i++) {
        wstring configStr = CONFIG_INITIAL_PREFIX + std::to_wstring(i);
        bool found = false;
        for (size_t j = 0; j < size; j += 2) {
            if (wcsncmp(config_initial[j], configStr.c_str(), configStr.size()) == 0) {
                config_vector.push_back(config_initial[j]);
                config_vector.push_back(config_initial[j + 1] != nullptr ? config_initial[j + 1] : L"");
                found = true;
                break;
            }
        }
        if (!found) {
            free(config_initial);
            fatalErrorA("RLNCH0114E: Invalid config.initial arguments. %ls not found", configStr.c_str(), true);
            return false;
        }
    }
    free(config_initial);

    // "-initialCompleteFlag" is followed by the name of the installation
    // property that records a finished initial launch.
    size_t flagPos = config_vector.size();
    for (size_t v = 1; v < config_vector.size(); v += 2) {
        if (wcsncmp(config_vector[v], INITIALCOMPLETEFLAG, INITIAL_COMPLETE_FLAG_LEN) == 0) {
            flagPos = v;
            break;
        }
    }
    if (flagPos + 2 >= config_vector.size()) {
        fatalErrorA("RLNCH0115E: Invalid config.initial arguments. -initialCompleteFlag not found", true);
        return false;
    }
    const wchar_t* key_name = config_vector[flagPos + 2];

    String completed = findProperty(key_name, rcpInstallPropertiesArray);
    return !(completed != nullptr && wcsncmp(completed, TRUE_VALUE, wcslen(TRUE_VALUE)) == 0);
}

void checkForProvisioning(const wstring& workspaceLocation, int argc, wchar_t** argv, const wstring& installDir,
                          std::vector<String>& rcpInstallPropertiesArray,
                          std::vector<String>& rcpLauncherPropertiesArray, const std::vector<wstring>& launchArgs) {
    String provisioning = findProperty(PROVISIONING, rcpLauncherPropertiesArray);
    if (provisioning == nullptr || wcscmp(provisioning, TRUE_VALUE) != 0) return;
    if (eConfig != user && eConfig != multiuser && eConfig != lockdown) return;

    String provisionedVersion = findProperty(PROV_MANIFEST_VERSION, rcpInstallPropertiesArray);
    String provisionVersion = findProperty(PROV_MANIFEST_VERSION, rcpLauncherPropertiesArray);
    if (provisionedVersion == nullptr || isNewProvisioningLevel(provisionedVersion, provisionVersion))
        userFirstLaunch = true;

    bool byInstaller = isISMPProvisioning(argc, argv);
    if (!userFirstLaunch && !byInstaller) return;

    SvcDebugOutA(
        "RLNCH0076I: Detected platform initial launch or user initial launch. Executing platform provisioning.");
    getUserCmdString(workspaceLocation, argc, argv, installDir, rcpInstallPropertiesArray,
                     rcpLauncherPropertiesArray, true, !byInstaller);

    if (eConfig == multiuser || eConfig == lockdown) {
        wstring serviceWorkspace = workspaceLocation;
        createMUServiceWkspc(serviceWorkspace, installDir, rcpInstallPropertiesArray, rcpLauncherPropertiesArray,
                             argc, argv);
    }

    doProvisioning(rcpLauncherPropertiesArray, rcpInstallPropertiesArray,
                   launchArgs.empty() ? L"" : launchArgs[0].c_str(), launchArgs);

    // The platform itself is started by the next launch.
    unlockLockFile();
    exit(0);
}
