// The install configuration: how this installation is deployed (one user,
// shared read-only, locked down, a service...). Many later decisions test it.
#include <cwchar>

#include "rcp_launcher.h"

installCfg eConfig = undefined;
bool IS_LOCKDOWN = false;

bool isServiceConfig() { return eConfig == service || eConfig == multiuser_service; }

bool SetInstallConfiguration(const std::vector<String>& rcpInstallPropertiesArray, bool muservice) {
    IS_LOCKDOWN = false;
    const wchar_t* value = findProperty(CONFIGURATION_PROPERTY, rcpInstallPropertiesArray);
    if (value == nullptr) {
        // No line at all means a plain single-user installation; a value that
        // is there but unknown is deliberately not mapped to that default.
        SvcDebugOutA("RLNCH0041I: Missed install configuration in property file. Using default setting!");
        eConfig = user;
    } else if (wcscmp(value, SERVICE_CFG) == 0) {
        eConfig = service;
    } else if (wcscmp(value, USER_CFG) == 0) {
        eConfig = user;
    } else if (wcscmp(value, SERIAL_USER_CFG) == 0) {
        eConfig = serial_multiuser;
    } else if (wcscmp(value, LOCKDOWN_CFG) == 0) {
        eConfig = lockdown;
        IS_LOCKDOWN = true;
    } else if (wcscmp(value, USERPB_CFG) == 0) {
        eConfig = userpb;
    } else if (wcscmp(value, MULTIUSER_CFG) == 0) {
        eConfig = multiuser;
    } else {
        eConfig = undefined;
    }
    // The multi-user service runs as its own configuration whatever the
    // installation says; the lockdown flag stays as read.
    if (muservice) eConfig = multiuser_service;
    return true;
}
