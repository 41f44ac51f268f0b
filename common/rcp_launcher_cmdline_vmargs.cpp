// Command-line builders for what the JVM itself reads: the "-vmargs"
// separator, the user's own VM arguments, the fixed and configured system
// properties, the -X options and the boot class path additions.
#include <cstdlib>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

void setArgProperty(wstring& prop, const wchar_t* key, const wchar_t* value) {
    prop = key != nullptr ? key : L"";
    prop += EQUALS_CHAR;
    prop += value != nullptr ? value : L"";
}

void addVmargsToCommandLine(const wstring& workspaceLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                            wchar_t** argv) {
    // The Eclipse executable hands everything after "-vmargs" to the JVM; a
    // directly started JVM needs no separator.
    if (!isServiceConfig()) addArgToCommandLine(VMARGS);

    // The user's own VM arguments come before every configured one.
    int vmargsIdx = findOption(VMARGS, argc, argv);
    if (vmargsIdx != -1) {
        for (int i = vmargsIdx + 1; i < argc; i++) {
            addArgToCommandLine(argv[i]);
        }
    }

    // Without a console the JVM gets its console fix; a restart never keeps
    // the console, so it gets the fix as well.
    int consoleIdx = findOption(CONSOLEARG, argc, argv);
    int restartIdx = findOption(RESTARTARG, argc, argv);
    if (restartIdx != -1 || consoleIdx == -1) {
        forEachProperty(VMFIXARG_PROPERTY, rcpInstallPropertiesArray, [&](const wchar_t*, const wchar_t* value) {
            wstring vmfix(value);
            size_t pos = vmfix.find(WORKSPACELOCATION_REPLACE);
            if (pos != wstring::npos) vmfix.replace(pos, wcslen(WORKSPACELOCATION_REPLACE), workspaceLocation);
            addArgToCommandLine(nativePath(vmfix));
            return false;  // the first entry only
        });
    }

    // In file order: the text after "vmarg." is a name, not a sort key.
    forEachProperty(VMARG_PROPERTY, rcpInstallPropertiesArray, [](const wchar_t*, const wchar_t* value) {
        if (value[0] != L'\0') addArgToCommandLine(value);
        return true;
    });
}

void addDashDToCommandLine(std::vector<String>& rcpInstallPropertiesArray,
                           std::vector<String>& rcpLauncherPropertiesArray, int argc, wchar_t** argv,
                           wstring& installDir) {
    wstring commandArg;

    setArgProperty(commandArg, D_RCP_HOME, installDir.c_str());
    addArgToCommandLine(commandArg);

    wstring workspace;
    getWorkspaceLocation(workspace, rcpInstallPropertiesArray, argc, argv, installDir);
    setArgProperty(commandArg, D_RCP_DATA, workspace.c_str());
    addArgToCommandLine(commandArg);

    String splashPath = findProperty(OSGI_SPLASH_PATH, rcpLauncherPropertiesArray);
    if (splashPath != nullptr) {
        setArgProperty(commandArg, (wstring(SYSPROP_PREFIX) + OSGI_SPLASH_PATH).c_str(), splashPath);
        addArgToCommandLine(commandArg);
    }

    setArgProperty(commandArg, D_RCP_INSTALL_ID_PROP, requireInstallID(rcpInstallPropertiesArray));
    addArgToCommandLine(commandArg);

    const wchar_t* configName = installCfgTraits().name;
    if (configName == nullptr)
        fatalErrorExit("RLNCH0025E: The platform rcp.install.id must be provided for this configuration!");
    setArgProperty(commandArg, D_CONFIG, configName);
    addArgToCommandLine(commandArg);

    // Every "-D" entry, even with an empty value (the JVM then sees "key=").
    forEachProperty(SYSPROP_PREFIX, rcpInstallPropertiesArray, [&](const wchar_t* key, const wchar_t* value) {
        setArgProperty(commandArg, key, value);
        addArgToCommandLine(commandArg);
        SvcDebugOutW(L"RLNCH0075I: commandArg  = \"%s\"", commandArg.c_str());
        return true;
    });

    wstring installArea = joinPath(installDir, INSTALL_AREA_DIR);
    if (!exists(installArea.c_str())) installArea = joinPath(installDir, INSTALL_AREA_FALLBACK_DIR);
    setArgProperty(commandArg, D_OSGI_INSTALL_AREA, installArea.c_str());
    addArgToCommandLine(commandArg);
}

void addXargsToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    // The reader splits "-Xmx=512m" at the "=" and keeps it in the value, so
    // joining key and value gives the option text back.
    forEachProperty(XARG_PREFIX, rcpInstallPropertiesArray, [](const wchar_t* key, const wchar_t* value) {
        addArgToCommandLine(wstring(key) + value);
        return true;
    });

    String prepend = findProperty(XBOOTCLASSPATH_PREPEND, rcpInstallPropertiesArray);
    if (prepend != nullptr) addArgToCommandLine(wstring(XBOOTCLASSPATH_P) + prepend);
    String append = findProperty(XBOOTCLASSPATH_APPEND, rcpInstallPropertiesArray);
    if (append != nullptr) addArgToCommandLine(wstring(XBOOTCLASSPATH_A) + append);
}
