// The install configuration: how this installation is deployed (one user,
// shared read-only, locked down, a service...). Many later decisions test it,
// each through the one table of what a configuration means.
#include <cwchar>

#include "rcp_launcher.h"

installCfg eConfig = undefined;
bool IS_LOCKDOWN = false;

namespace {

// One row per value of installCfg, in the order of the values (service = 1).
const InstallCfgTraits TRAITS[] = {
    // name, template sub-folder, workspace, configuration area, service, initial, provisions, service area
    {SERVICE_CFG, L"", WORKSPACE_LOC, CONFIG_LOC, true, false, false, false},
    {LOCKDOWN_CFG, CORE_SUBDIR_USER, nullptr, nullptr, false, false, true, true},
    {USER_CFG, CORE_SUBDIR_USER, nullptr, nullptr, false, true, true, false},
    {SERIAL_USER_CFG, L"", nullptr, nullptr, false, false, false, false},
    {nullptr, L"", nullptr, nullptr, false, false, false, false},  // undefined
    {MULTIUSER_CFG, CORE_SUBDIR_USER, nullptr, nullptr, false, true, true, true},
    // The service of a multi-user installation is named "multiuser" to the
    // platform; the word in the properties still means multiuser, the row
    // above, which is met first.
    {MULTIUSER_CFG, CORE_SUBDIR_MUSERVICE, MUSVC_WORKSPACE_LOC, MUSVC_CONFIG_LOC, true, false, false, false},
    {USERPB_CFG, CORE_SUBDIR_PBUILDER, nullptr, nullptr, false, true, false, false},
};
static_assert(sizeof(TRAITS) / sizeof(TRAITS[0]) == userpb - service + 1, "one row per install configuration");

}  // namespace

const InstallCfgTraits& installCfgTraits() { return TRAITS[eConfig - service]; }

bool isServiceConfig() { return installCfgTraits().service; }

bool areasOfOneUser() { return installCfgTraits().workspace == nullptr; }

bool SetInstallConfiguration(const std::vector<String>& rcpInstallPropertiesArray, bool muservice) {
    const wchar_t* value = findProperty(CONFIGURATION_PROPERTY, rcpInstallPropertiesArray);
    if (value == nullptr) {
        // No line at all means a plain single-user installation; a value that
        // is there but unknown is deliberately not mapped to that default.
        SvcDebugOutA("RLNCH0041I: Missed install configuration in property file. Using default setting!");
        eConfig = user;
    } else {
        eConfig = undefined;  // exact, case-sensitive words only
        for (int c = service; c <= userpb && eConfig == undefined; c++)
            if (TRAITS[c - service].name != nullptr && wcscmp(value, TRAITS[c - service].name) == 0)
                eConfig = static_cast<installCfg>(c);
    }
    IS_LOCKDOWN = eConfig == lockdown;
    // The multi-user service runs as its own configuration whatever the
    // installation says; the lockdown flag stays as read.
    if (muservice) eConfig = multiuser_service;
    // Areas of one user are never writable by others; the shared areas of
    // the service configurations follow the umask.
    setPrivateFiles(areasOfOneUser());
    return true;
}
