// The platform-independent launcher logic: options, startup sequence, lock
// protocol, properties, placeholders, install configuration, command-line
// builders, workspace and configuration areas, provisioning.
//
// Shared shapes:
//  - String: an owned, zero-terminated wide C string (newString/freeString).
//  - A properties array is a std::vector<String> with keys at even and values
//    at odd positions, in file order; the first occurrence of a key wins.
//  - argc/argv are the launcher's own (or effective) arguments in wide form;
//    argv[0] is the program and is never matched as an option.
//  - Failures are not passed up: a condition the launch cannot survive calls
//    fatalErrorExit (status 255). The common logic reaches the operating
//    system only through rcp_launcher_os.h.
// Each section below names the source file that holds it.
#ifndef RCP_LAUNCHER_H
#define RCP_LAUNCHER_H

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "rcp_launcher_constants.h"
#include "rcp_launcher_os.h"

using std::wstring;

// ===================== Shared state ==========================================
enum installCfg {
    service = 1,
    lockdown = 2,
    user = 3,
    serial_multiuser = 4,
    undefined = 5,
    multiuser = 6,
    multiuser_service = 7,
    userpb = 8
};

extern installCfg eConfig;    // set by SetInstallConfiguration
extern bool IS_LOCKDOWN;      // true for the lockdown configuration
extern bool bWaitMode;        // setWaitMode
extern bool runningLock;      // this launcher is the main process
extern bool bRestart;         // "-restart" among the launcher's arguments
extern bool userFirstLaunch;  // this launch created a user's directories/files
extern long pid;              // process id last read from the lock file
extern wstring lockFilePath;  // <workspace>/.rcp.lock
extern FILE* lockFILE;        // the open lock file ("r+")

// ===================== Strings and paths (rcp_launcher_strings) ==============
String newString(unsigned long len);                     // len characters + terminator, empty
String freeString(String s);                             // frees, returns null
String initMemString(String str1, const wchar_t* str2);  // wcscat, returns str1
// A new String holding a copy of text.
String copyString(const wchar_t* text);
// dir + "/" + name (just dir when name is empty), in the platform's
// separators: the one way a path is put together from its parts. The join
// adds no second separator where dir ends or name begins with one, and an
// empty dir joins from the root: ("", "x") gives "/x".
wstring joinPath(const wstring& dir, const wstring& name);
// path in the platform's separators.
wstring nativePath(wstring path);

// ===================== Child command line and start (src/macosx/rcp_launcher_launch)
extern std::vector<wstring> launchArgs;
// Appends arg; while bRestart is set, "-debug" and "-console" are dropped.
void addArgToCommandLine(wstring arg, bool handleSpaces = false);
// Empties the command line and makes eclipseExePath its program (element 0).
void addPathToCommandLine(wstring eclipseExePath);
bool haveLaunchOption(const char* option, char** cargs, int argCount);
void setSemVersion(wchar_t* id);
// fork/execv the command line; the parent records the child in the lock file,
// unlocks, and waits when "-rcpLauncherWait" or a child "-console" asks so.
void launchEclipse(int argc, wchar_t** wargv);
// The whole of main after the locale: returns main's status.
int launcherMain(int argc, char** argv);

// ===================== Launcher options (rcp_launcher_options) ===============
int findOption(const wchar_t* opt, int argc, wchar_t** argv);  // index >= 1 or -1
// The argument after the first opt, or null when opt is absent or the last
// argument: an option without its value counts as absent.
const wchar_t* optionValue(const wchar_t* opt, int argc, wchar_t** argv);
bool isDebug(int argc, wchar_t** argv);
bool isRestart(int argc, wchar_t** argv);
bool isResetConfig(int argc, wchar_t** argv);
bool isVmOverride(int argc, wchar_t** argv);
bool isISMPProvisioning(int argc, wchar_t** argv);
bool isInitMUService(int argc, wchar_t** argv);
void doVersionCheck(int argc, wchar_t** argv);  // "-version": log, exit 255
void getCmdString(int argc, wchar_t** argv);
void setWaitMode();
bool isWaitMode();
void setMainProcess(bool val);
bool isMainProcess();
bool isLockdownConfig();

// ===================== Startup sequence (rcp_launcher_startup) ===============
void startup(int argc, wchar_t** argv, const std::vector<wstring>& launchArgs);
// <workspace>/logs.
void getLogLocation(wstring& logLocation, const wstring& workspaceLocation);
// The workspace and its log directory ensured, the log opened there (else
// the queue goes to /tmp/rcplauncher.log and the launch ends with 255), and
// the platform lock taken in the workspace.
void openWorkspace(const wstring& workspaceLocation, int argc, wchar_t** argv);

// ===================== Platform lock file, protocol (rcp_launcher_lock) ======
void locateLockFile(int argc, wchar_t** argv, const wstring& workspace);
void getLockFilePath(wstring& path);
bool checkLockFile();

// ===================== Properties reader (rcp_launcher_properties) ===========
void getProperties(const wstring& propFilePath, std::vector<String>& propArray);
String findProperty(const wchar_t* name, const std::vector<String>& propArray);
// Borrowed key/value pointers, closed by an entry pointing to "". free() it.
String* findProperties(const wchar_t* prefix, const std::vector<String>& propArray);
// Calls fn(key, value) for every pair whose key begins with prefix, in file
// order, while fn returns true: the one walk over a findProperties result.
template <typename Fn>
void forEachProperty(const wchar_t* prefix, const std::vector<String>& props, Fn fn) {
    String* found = findProperties(prefix, props);
    for (size_t i = 0; found[i][0] != L'\0'; i += 2)
        if (!fn(found[i], found[i + 1])) break;
    free(found);
}
// Removes the second occurrence of str (only that one element), if any.
void removeDuplicates(std::vector<wstring>& args, const wchar_t* str);
void FilterProp(wstring& key);
void FilterValue(wstring& value);
void trimString(wstring& s);
bool isComment(const wstring& line);
bool isContinuationLine(const wstring& line);
bool processFilterKey(wstring& line);  // true: the line belongs to another platform
// Frees every entry (each is its own allocation) and empties the array.
void freeProperties(std::vector<String>& propArray);

// ===================== Properties writer (rcp_launcher_properties_writer) ====
size_t convWcharTo8859_1_Key(const wstring& key, wstring& out);
size_t convWcharTo8859_1_Value(const wstring& value, wstring& out);
void convWcharTo8859_1(const wstring& key, const wstring& value, wstring& out);
void addHexDigits(wstring& out, unsigned int code);
FILE* open_prop_file(FILE*& fp, const char* path, const char* mode);

// ===================== Placeholders (rcp_launcher_placeholders) ==============
bool replaceStdPlaceholders(const wstring& workspaceLocation, const wstring& installDir, wstring& placeholderString);
size_t findLastPlaceholder(const wstring& prop_contents, size_t prop_lastIndex, size_t& ph_numchars, wstring& ph_key);
bool getPlaceholderValue(const wstring& key, wstring& value, const std::vector<String>& propArray);
bool replaceUserPlaceholders(wstring& prop_contents, const std::vector<String>& propArray);
bool replaceAllPlaceholders(const wstring& workspaceLocation, const wstring& installDir, wstring& placeholderString,
                            std::vector<String>& rcpInstallPropertiesArray);
void replacePlaceholdersInRcpInstallProp(wstring workspaceLocation, wstring installDir,
                                         std::vector<String>& rcpInstallPropertiesArray);
// Changed entries of argv (and cargv) point to expanded copies that live until
// the process ends.
void replacePlaceholdersInArgv(wstring workspaceLocation, wstring installDir, wchar_t** argv, wchar_t** cargv,
                               int argc);
// Only the first "${rcp.home}": the base location's later ones are left to
// the platform.
void replaceFirstRcpHome(wstring& text, const wstring& installDir);

// ===================== Install configuration (rcp_launcher_installcfg) =======
// Sets eConfig (and IS_LOCKDOWN) from "install.configuration", and with it
// the modes of the files the launcher creates from then on.
bool SetInstallConfiguration(const std::vector<String>& rcpInstallPropertiesArray, bool muservice);
// What an install configuration means to the launcher: the one table that
// every decision depending on the configuration reads.
struct InstallCfgTraits {
    const wchar_t* name;           // its "install.configuration" word and -Drcp.install.config (null: none)
    const wchar_t* coreSubFolder;  // its templates' folder below <core>/config
    const wchar_t* workspace;      // its workspace below the installation directory; null: the user's
                                   // own (-data, rcp.data or the home directory)
    const wchar_t* configArea;     // its configuration area there; null: "<workspace>/.config"
    bool service;                  // the JVM itself is the child, with class path and main class
    bool initialLaunch;            // it may need an initial launch ("config.initial.N")
    bool provisions;               // it provisions a new level or a user's first launch
    bool provisionsServiceArea;    // provisioning also prepares the multi-user service's area
};
// The row of eConfig.
const InstallCfgTraits& installCfgTraits();
// The areas of eConfig belong to one user (all but the service
// configurations), so no one else may write what the launcher creates there.
bool areasOfOneUser();
// service or multiuser_service: the JVM itself is the child, with the class
// path and main class on its command line, instead of the Eclipse executable.
bool isServiceConfig();

// ===================== The command line in its order (rcp_launcher_cmdline) ==
// The builders below, called in the order of a provisioning launch, a
// service configuration or any other configuration, after the placeholders
// are expanded; the child's environment last.
void getUserCmdString(const wstring& workspaceLocation, int argc, wchar_t** argv, wstring installDir,
                      std::vector<String>& rcpInstallPropertiesArray, std::vector<String>& rcpLauncherPropertiesArray,
                      bool provisioning, bool bRelaunch);

// ===================== JVM, class path, launcher class (rcp_launcher_cmdline_jvm)
void addVmToCommandLine(std::vector<String>& rcpInstallPropertiesArray, std::vector<String>& rcpLauncherPropertiesArray,
                        int argc, wchar_t** argv);
bool getJvmPropertyLocation(std::vector<String>& rcpInstallPropertiesArray, const wstring& installDir,
                            wstring& jvmPropLocation);
bool isJavaw(wstring& vmString, const wchar_t* javawDEF, const wchar_t* javaDEF);
bool replaceJavaExecutableName(wstring& vmString, const wchar_t* origName, const wchar_t* replacementName);

void addBaseEclipseToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
void addStartupToCommandLine(std::vector<String> propArray, int argc, wchar_t** argv);
void addClasspathToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
void addMainClassToCommandLine();
void addUseDaemonToCommandLine();
// "rcp.base.location" of props; RLNCH0011E when it is missing.
wstring requireBaseLocation(const std::vector<String>& props);
// "rcp.install.id" of props; RLNCH0005E when it is missing.
String requireInstallID(const std::vector<String>& props);

// ===================== VM arguments and system properties (rcp_launcher_cmdline_vmargs)
void setArgProperty(wstring& prop, const wchar_t* key, const wchar_t* value);
void addVmargsToCommandLine(const wstring& workspaceLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                            wchar_t** argv);
void addDashDToCommandLine(std::vector<String>& rcpInstallPropertiesArray,
                           std::vector<String>& rcpLauncherPropertiesArray, int argc, wchar_t** argv,
                           wstring& installDir);
void addXargsToCommandLine(std::vector<String>& rcpInstallPropertiesArray);

// ===================== Platform options (rcp_launcher_cmdline_options) =======
void addMainOptionsToCommandLine(std::vector<String>& rcpInstallPropertiesArray,
                                 std::vector<String>& rcpLauncherPropertiesArray, int argc, wchar_t** argv,
                                 wstring& installDir);

// ===================== Startup record (rcp_launcher_record) ==================
void writeStartupArgs(int argc, wchar_t** argv, const wstring& configLocation);

// ===================== Workspace and configuration (rcp_launcher_areas) ======
unsigned long getTick();
wchar_t* getTickString(wchar_t* wsticks, size_t size);
String getInstallID(wstring rcp_launcher_properties_file, std::vector<String>& rcpLauncherPropertiesArray);
int getWorkspaceLocation(wstring& workspaceLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                         wchar_t** argv, wstring& installDir);
int getConfigurationLocation(wstring& configLocation, std::vector<String>& rcpInstallPropertiesArray, int argc,
                             wchar_t** argv, wstring& installDir);
bool isOldRcpInstallId(const wstring& launcherInstallID, const wstring& configLocation);

// ===================== Per-user files (rcp_launcher_userfiles) ===============
// The configuration's own template below <core>/config/<sub-folder>, else
// the one in <core>.
wstring getCoreFileLocation(const wstring& coreLocation, const wchar_t* filename);
wstring createRCPInstallProps(const wstring& workspaceLocation, const wstring& configLocation,
                              const wstring& baseLocation, const wstring& installDir, std::vector<String> propsArray);
int fixUserRCPInstallProperties(const wstring& workspaceLocation, wstring& propPath, wstring& newPropPath,
                                const wstring& installDir, std::vector<String>& propsArray);
void createConfigIni(const wstring& configLocation, const wstring& baseLocation);
int createPlatformXML(const wstring& configLocation, const wstring& baseLocation,
                      std::vector<String> rcpLauncherPropertiesArray);

// ===================== Reset and reusable workspace (rcp_launcher_reset) =====
void handleCopy(const wstring& dstdir, const wstring& dstname, const wstring& srcdir, const wstring& srcname,
                bool bSrcMustExist, bool bRemoveSrc);
void handleFileMove(const wstring& dstdir, const wstring& dstname, const wstring& srcdir, const wstring& srcname,
                    bool bSrcMustExist);
void handleDirMove(const wstring& dstdir, const wstring& srcdir, bool bSrcMustExist);
void resetMetaDataDirs(const wstring& workspaceLocation, const wstring& configLocation, const wstring& coreLocation);
void resetWorkspace(const wstring& workspaceLocation, const wstring& configLocation, const wstring& coreLocation);
void createReusableWorkspace(const wstring& workspaceLocation, const wstring& configLocation);

// ===================== Directories (rcp_launcher_mkdirs) ======================
int mkdirs(const wchar_t* path);
// isDirectory, else set userFirstLaunch and mkdirs; RLNCH0010E when that
// fails. The one way a directory is made: a directory that another launcher
// made meanwhile counts as made.
void ensureDirectory(const wstring& dir);

// ===================== "-config" extensions (rcp_launcher_extensions) ========
// The effective arguments: "-config NAME" replaced by the config.NAME.N values.
bool addConfigExtentionsToArg(int* cargc, wchar_t*** cargv, int argc, wchar_t** argv,
                              std::vector<String> rcpLauncherPropertiesArray, std::vector<wstring>& newargs);

// ===================== Provisioning and initial launch (rcp_launcher_provisioning)
bool isNewProvisioningLevel(const wchar_t* previous, const wchar_t* current);
bool isInitialRequired(std::vector<String> rcpLauncherPropertiesArray, std::vector<String> rcpInstallPropertiesArray);
void checkForProvisioning(const wstring& workspaceLocation, int argc, wchar_t** argv, const wstring& installDir,
                          std::vector<String>& rcpInstallPropertiesArray,
                          std::vector<String>& rcpLauncherPropertiesArray, const std::vector<wstring>& launchArgs);

// ===================== Multi-user service (rcp_launcher_muservice) ===========
void createMUServiceWkspc(wstring& workspaceLocation, const wstring& installDir,
                          std::vector<String>& rcpInstallPropertiesArray,
                          std::vector<String> rcpLauncherPropertiesArray, int argc, wchar_t** argv);
// "-initMUService": the service's own area, log and lock, then its command line.
void startupMUService(int argc, wchar_t** argv);

#endif  // RCP_LAUNCHER_H
