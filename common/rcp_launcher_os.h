// The operating-system layer of the launcher. Every call into the operating
// system (files, processes, environment, locale) goes through a function
// declared here; the platform directory (src/macosx) implements them and the
// common logic never calls the system directly.
//
// Conventions: paths arrive as wide strings and are converted to the locale's
// multibyte encoding just before the system call. Predicates and actions
// return 1 for success / true and 0 for failure / false; errno is left as the
// failing call set it.
#ifndef RCP_LAUNCHER_OS_H
#define RCP_LAUNCHER_OS_H

#include <cstdio>
#include <string>
#include <vector>

typedef wchar_t* String;

// ===================== Logging and fatal errors (SvcDebug_macos) =============
// Lines are queued in memory until enableLogging opens the log file; debug
// output starts switched on so nothing logged before the options are read is
// lost. Error lines always carry " : " + strerror(errno at entry).

void setDebug(bool val);
bool getDebug();
// Opens <logLocation>/rcplauncher.log ("w+") and writes the queue into it,
// followed by one empty line. On failure queues RLNCH0019E and returns false.
bool enableLogging(const std::wstring& logLocation);
// enableLogging("/tmp").
bool dumpLogToTempLocation();

// Debug output: written only while debug output is on; a format of 1000
// characters or more is dropped silently.
void SvcDebugOutA(const char* fString);                         // written as data ("%s")
void SvcDebugOutA(const char* fString, const char* str);        // format + one string
void SvcDebugOutA(const char* fString, int status);             // format + one integer
void SvcDebugOutW(const wchar_t* fString, const wchar_t* arg);  // narrow "%s" format
// preString="v1, v2, ... " as one line; the assembled text is used as a format
// with the count and the text as spare arguments.
void SvcDebugOutW(const wchar_t* preString, int arg_cnt, wchar_t** sargs);
void SvcDebugLastError(const wchar_t* lpszFunction);
void SvcDebugLastError(const wchar_t* lpszFunction, const wchar_t* subname);
// " Failed with error <errno>: <strerror(errno)>".
void GetLastErrorMsg(std::string& errorString);
void GetLastErrorMsg(std::wstring& werrorString);

// Error output: always written. With bExit the queue is flushed to
// /tmp/rcplauncher.log when no log is open, and the process exits with 255.
void fatalError(const char* fmt, ...) __attribute__((format(printf, 1, 2)));
void fatalErrorA(const char* msg, bool bExit);
void fatalErrorA(const char* msg, const char* arg, bool bExit);
void fatalErrorA(const char* msg, const wchar_t* arg, bool bExit);  // arg for "%ls"
void fatalErrorW(const wchar_t* mgs, bool bExit);
// The end of a launch that cannot go on: fatalErrorA with the exit flag, the
// one way the launcher's own code ends on an error (status 255).
[[noreturn]] void fatalErrorExit(const char* msg);
[[noreturn]] void fatalErrorExit(const char* msg, const wchar_t* arg);  // arg for "%ls"
// Ends the process with status (after a provisioning child, or a log that
// could not be opened anywhere).
[[noreturn]] void exitLauncher(int status);

// Scratch buffer for callers that pre-format a message carrying a number.
inline constexpr size_t TEMP_OUT_BUFFER_SIZE = 1024;
extern char tempOutBuffer[TEMP_OUT_BUFFER_SIZE];

// ===================== String and environment utilities (rcp_launcher_utils_macos)
// Conversions never fail on bad input: a byte that is not valid in the
// locale's encoding maps to U+DC00+byte and back, so any file name round-trips.
String mallocString(unsigned long len);
String chartowcs(const char* cs);  // caller frees (freeString)
const wchar_t* chartowstr(const char* cs, std::wstring& wstr);
// Returns the byte count, or -1 when a character had no multibyte form (it is
// written as '?').
int wstrtocs(std::string& str, const std::wstring& wstr);
void wcstochar(std::string& str, const wchar_t* wcs);
void convertBS2S(std::wstring& in);
void convertToOsSeparator(std::wstring& in);
void convertS2BS(std::wstring& in);
// Opens an existing file for reading ("r") or update ("r+"); the stream is
// byte-oriented. Only a regular file is opened (a link to one is fine), and
// the open never blocks: a FIFO or a device planted where a properties file
// belongs gets null, like a missing file, instead of stalling the launch or
// feeding it without end. Null on failure, errno set.
void open_file(FILE*& inX, const wchar_t* file, const wchar_t* mode);
// Null (and RLNCH0081I) when unset; the value's text (possibly "") when set.
const wchar_t* getEnv(const wchar_t* var, std::wstring& value);
bool userIsAdmin(const wchar_t* user);
// Expands a wide printf-style text that is used as a format without
// arguments: "%%" gives "%", any other conversion is written as it stands.
std::wstring formatWithoutArgs(const std::wstring& fmt);

// ===================== Child environment (rcp_launcher_macos_env) ============
bool setEnv(const wchar_t* key, const wchar_t* var, bool overwrite);  // true on failure
bool unsetEnv(const wchar_t* key);
void addEnvSetToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
void addLibpathToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
void addLdPreloadToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
void addEnvJavaHighZipfds(std::vector<String>& rcpInstallPropertiesArray);
void setPreload(const wchar_t* ldPreload, const wchar_t* IDString);

// ===================== File system (rcp_launcher_macos_fs) ===================
// open(2) for the layer's own use: close-on-exec, never blocking, and only a
// regular file is kept (else -1 with errno EISDIR for a directory, EINVAL for
// any other kind of file). flags add the access mode, O_CREAT, O_NOFOLLOW...
int openRegularFile(const char* path, int flags, int mode = 0);
int createDirectory(const wchar_t* dir);  // one mkdir, mode 0775
int removeDirectoryContents(const std::string& dir, std::string& indent, std::string& errlist);
int removeDirectoryContents(const std::wstring& dir, std::wstring& errlist);
int removeDirectoryAndContents(const std::wstring& dir, std::wstring& errlist);
// A byte-for-byte copy (whatever the text's encoding) that appears under
// newFile only complete: written as a work file and renamed into place.
// Every failure is fatal (RLNCH0190E-RLNCH0193E), with the work file removed.
int copyFile(const wchar_t* origFile, const wchar_t* newFile);
int moveFile(const wchar_t* origFile, const wchar_t* newFile);
int deleteFile(const wchar_t* file);
// The path can be opened for reading (never blocking on a FIFO).
int exists(const wchar_t* file);
int existsA(const char* file);
int isDirectory(const wchar_t* file);
int isExecutable(const wchar_t* file);
// One fscanf with the given wide format (one %[...] conversion) into a reused
// scratch area; the item is converted into inputLineX. Returns fscanf's result.
int readFile(FILE* inX, const wchar_t* mode, std::wstring& inputLineX);
void open_wfile(FILE*& inX, const wchar_t* file, const wchar_t* mode);

// Files written for the user appear only complete. A work file is created
// afresh (a work file left by a killed launch is removed first, and the
// exclusive create never follows a link planted at the name); it is
// byte-oriented and written with putWide. finishWorkFile closes it and
// answers whether every write, the flush and the close succeeded, removing
// the work file when not; commitWorkFile then renames it into place (the
// work file is removed when that fails too). Both return 1 for success.
FILE* createWorkFile(const std::wstring& workPath);
int finishWorkFile(FILE* fp, const std::wstring& workPath);
int commitWorkFile(FILE* fp, const std::wstring& workPath, const std::wstring& finalPath);
// Writes text in the locale's encoding, bytes that came in undecodable
// going out unchanged. False once the stream has had a write error.
bool putWide(FILE* fp, const std::wstring& text);
// The whole content of a regular file, when it is at most limit bytes.
bool readSmallFile(const std::wstring& path, std::string& bytes, size_t limit);
const wchar_t* getUserHome(std::wstring& envHome);
void sysSleep(int seconds);

// ===================== Installation discovery (rcp_launcher_macos) ===========
void read_executable_path(std::string& path);
// The target of a symbolic link, whatever its length; false (errno set) when
// it cannot be read.
bool readLink(const char* path, std::string& target);
// readLink, where a failure or a target of 1024 bytes or more is fatal.
void readsymln(std::string& target, const char* link);
void findCommand(wchar_t*& cmd, wchar_t* arg);
wchar_t* getRCPDirectory(int argc, wchar_t** argv);
void getInstallDir(std::wstring& installDir, int argc, wchar_t** argv);
void getLauncherPath(std::wstring& path);
void getServiceInstallDir(std::wstring& serviceDir, std::wstring& installDir, int argc, wchar_t** argv);
const wchar_t* getOS();
int shutdown();
int logoff();
int findRCP();

// ===================== Platform lock file, file side (rcp_launcher_macos_lock)
// Creates the lock file when needed and opens it "r+" for the process's life.
void createAndOpenLockFile();
// Takes the exclusive flock (retrying) and decides main or secondary.
void lockLockFile(const std::wstring& sidFilePath);
void populateLockFile(int pid);
void invalidateLockFile();
void unlockLockFile();
// fseek to 0 and fscanf("%ld") on the open lock file; returns fscanf's result.
int readLockFilePid(long* pidOut);
// kill(pid, 0): false only when the process does not exist (ESRCH).
bool isProcessAlive(long pid);

// ===================== Provisioning child (rcp_launcher_macos_prov) ==========
void doProvisioning(std::vector<String>& launcherPropsArray, std::vector<String>& installPropsArray,
                    const wchar_t* executable, const std::vector<std::wstring>& launchArgs);

#endif  // RCP_LAUNCHER_OS_H
