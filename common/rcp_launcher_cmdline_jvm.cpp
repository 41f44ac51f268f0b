// Command-line builders for the program the child runs: the JVM (directly in
// the service configurations, through "-vm" otherwise), the Eclipse executable
// of the base plug-in, its start-up jar, the class path, the main class and the
// hand-over to an already running platform.
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Shared by isJavaw and replaceJavaExecutableName: the path with its trailing
// executable name swapped, or false when the path does not end with that name.
bool swapExecutableName(const wstring& vmString, const wchar_t* from, const wchar_t* to, wstring& swapped) {
    size_t fromLen = wcslen(from);
    if (vmString.size() < fromLen) return false;
    size_t chgPos = vmString.size() - fromLen;
    if (vmString.compare(chgPos, fromLen, from) != 0) return false;
    swapped = vmString;
    swapped.replace(chgPos, fromLen, to);
    return true;
}

}  // namespace

// The base plug-in directory; every caller needs it, so its absence is fatal.
wstring requireBaseLocation(const std::vector<String>& props) {
    String baseLoc = findProperty(RCP_BASE_LOC_PROPERTY, props);
    if (baseLoc == nullptr)
        fatalErrorExit("RLNCH0011E: Unable to determine RCP Base Plugin location. If the problem persists, reinstall.");
    return wstring(baseLoc);
}

String requireInstallID(const std::vector<String>& props) {
    String installID = findProperty(RCP_INSTALL_ID_PROPERTY, props);
    if (installID == nullptr) fatalErrorExit("RLNCH0005E: Couldn't find the rcp.install.id property!");
    return installID;
}

void addVmToCommandLine(std::vector<String>& rcpInstallPropertiesArray,
                        std::vector<String>& /*rcpLauncherPropertiesArray*/, int argc, wchar_t** argv) {
    // "-console" and "-consoleLog" change nothing here on this platform.
    if (findOption(RCPLAUNCHERWAIT, argc, argv) != -1) setWaitMode();

    // The user's "-vm" beats the installation's "vm" property. A "-vm" with
    // nothing after it names no JVM and is treated as absent.
    wstring vmString;
    if (const wchar_t* vmOverride = optionValue(VMARG, argc, argv)) {
        vmString = vmOverride;
    } else {
        String vm = findProperty(VM, rcpInstallPropertiesArray);
        if (vm == nullptr) fatalErrorExit("RLNCH0002E: vm string must be specified!");
        vmString = vm;
    }

    // The child must never inherit a JAVA_HOME pointing at some other JVM.
    unsetEnv(JAVA_HOME_KEY);

    if (isServiceConfig()) {
        addPathToCommandLine(vmString);
    } else {
        addArgToCommandLine(VMARG);
        addArgToCommandLine(vmString);
    }
}

// jvm.properties beside the installation's own JVM is not used on this
// platform: only an overriding "-vm" brings one in (see startup).
bool getJvmPropertyLocation(std::vector<String>& /*rcpInstallPropertiesArray*/, const wstring& /*installDir*/,
                            wstring& /*jvmPropLocation*/) {
    return false;
}

bool isJavaw(wstring& vmString, const wchar_t* javawDEF, const wchar_t* javaDEF) {
    wstring swapped;
    if (!swapExecutableName(vmString, javawDEF, javaDEF, swapped)) return false;
    if (exists(swapped.c_str())) {
        vmString = swapped;
        return true;
    }
    fatalErrorExit("RLNCH0003E: Specified vm (%ls) does not exist!", swapped.c_str());
}

bool replaceJavaExecutableName(wstring& vmString, const wchar_t* origName, const wchar_t* replacementName) {
    wstring swapped;
    if (!swapExecutableName(vmString, origName, replacementName, swapped)) return false;
    if (!exists(swapped.c_str())) return false;
    vmString = swapped;
    return true;
}

void addBaseEclipseToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    wstring baseLocEclipse = joinPath(requireBaseLocation(rcpInstallPropertiesArray), BASE_ECLIPSE_PATH);
    if (isExecutable(baseLocEclipse.c_str()) != 1)
        fatalErrorExit("RLNCH0007E: %ls is not executable or does not exist.", baseLocEclipse.c_str());
    addPathToCommandLine(baseLocEclipse);
}

void addStartupToCommandLine(std::vector<String> propArray, int argc, wchar_t** argv) {
    addArgToCommandLine(STARTUPARG);
    // A "-perfJar" without a value is ignored: the default jar is used.
    const wchar_t* perfJar = optionValue(PERFJARARG, argc, argv);
    addArgToCommandLine(perfJar ? wstring(perfJar) : joinPath(requireBaseLocation(propArray), LAUNCHER_JAR));
}

void addClasspathToCommandLine(std::vector<String>& rcpInstallPropertiesArray) {
    if (eConfig == multiuser_service) {
        // The service always boots from the base plug-in's own startup.jar.
        addArgToCommandLine(CPARG);
        addArgToCommandLine(joinPath(requireBaseLocation(rcpInstallPropertiesArray), STARTUP_JAR));
        return;
    }
    String cp = findProperty(CLASSPATH, rcpInstallPropertiesArray);
    if (cp == nullptr) return;
    addArgToCommandLine(CPARG);
    addArgToCommandLine(cp);
}

void addMainClassToCommandLine() { addArgToCommandLine(MAIN_CLASS); }

void addUseDaemonToCommandLine() {
    // Only a secondary launcher hands its request to the running platform.
    if (isMainProcess()) return;
    wchar_t pidString[100];
    swprintf(pidString, sizeof(pidString) / sizeof(pidString[0]), L"%ld", pid);
    addArgToCommandLine(USEDAEMON);
    addArgToCommandLine(pidString);
}
