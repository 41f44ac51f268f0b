// The operating-system layer of the launcher. Every call into the operating
// system (files, processes, environment, locale) goes through a function
// declared here; the platform directory (src/macosx) implements them and the
// common logic never calls the system directly.
//
// Conventions: paths arrive as wide strings and are converted to the locale's
// multibyte encoding just before the system call. Predicates and actions
// return 1 for success / true and 0 for failure / false; errno is left as the
// failing call set it. Nothing here writes to the log or ends the process
// unless its comment says so.
#ifndef RCP_LAUNCHER_OS_H
#define RCP_LAUNCHER_OS_H

#include <cstdio>
#include <string>
#include <vector>

typedef wchar_t* String;

// ===================== Logging and fatal errors (SvcDebug_macos) =============
// Lines are queued in memory until enableLogging opens the log file; debug
// output starts switched on so nothing logged before the options are read is
// lost. Every line is cut at 4095 bytes. Error lines always carry " : " +
// strerror(errno at entry).

// Debug output on or off (error lines are written either way).
void setDebug(bool val);
bool getDebug();
// Opens <logLocation>/rcplauncher.log ("w+") and writes the queue into it,
// followed by one empty line. On failure queues RLNCH0019E and returns false.
bool enableLogging(const std::wstring& logLocation);
// enableLogging("/tmp"), but only into a regular file of the launching user:
// never through a link, into a FIFO or into another user's file.
bool dumpLogToTempLocation();

// Debug output: written only while debug output is on; a format of 1000
// characters or more is dropped silently. A format that carries data never
// reads arguments that were not passed: a conversion without its argument is
// written as it stands.
void SvcDebugOutA(const char* fString);                         // written as data ("%s")
void SvcDebugOutA(const char* fString, const char* str);        // format + one string
void SvcDebugOutA(const char* fString, int status);             // format + one integer
void SvcDebugOutW(const wchar_t* fString, const wchar_t* arg);  // narrow "%s" format
// preString="v1, v2, ... " as one line; the assembled text is used as a format
// with the count and the text as spare arguments.
void SvcDebugOutW(const wchar_t* preString, int arg_cnt, wchar_t** sargs);
// SvcDebugOutW(lpszFunction, subname), "" without a subname.
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

// Room for len characters and the terminator (RLNCH0004E when there is none).
String mallocString(unsigned long len);
String chartowcs(const char* cs);  // caller frees (freeString); null gives ""
// Decodes cs into wstr (reusing its storage) and returns wstr's text.
const wchar_t* chartowstr(const char* cs, std::wstring& wstr);
// Returns the byte count, or -1 when a character had no multibyte form (it is
// written as '?').
int wstrtocs(std::string& str, const std::wstring& wstr);
void wcstochar(std::string& str, const wchar_t* wcs);  // as wstrtocs; null gives ""
// Every "\" made "/", and the reverse; convertToOsSeparator is the former.
void convertBS2S(std::wstring& in);
void convertToOsSeparator(std::wstring& in);
void convertS2BS(std::wstring& in);
// Opens an existing file for reading ("r") or update ("r+"); the stream is
// byte-oriented. Only a regular file is opened (a link to one is fine), and
// the open never blocks: a FIFO or a device planted where a properties file
// belongs gets null, like a missing file, instead of stalling the launch or
// feeding it without end. Null on failure, errno set (EISDIR for a directory).
void open_file(FILE*& inX, const wchar_t* file, const wchar_t* mode);
// Null (and RLNCH0081I) when unset; the value's text (possibly "") when set.
const wchar_t* getEnv(const wchar_t* var, std::wstring& value);
// Whether the launcher runs as the superuser; user is not looked at.
bool userIsAdmin(const wchar_t* user);
// Expands a wide printf-style text that is used as a format without
// arguments: "%%" gives "%", any other conversion is written as it stands.
std::wstring formatWithoutArgs(const std::wstring& fmt);

// ===================== Child environment (rcp_launcher_macos_env) ============
// The child inherits the launcher's environment: these change it before the
// child is started.

// setenv; note the result: true on failure.
bool setEnv(const wchar_t* key, const wchar_t* var, bool overwrite);
bool unsetEnv(const wchar_t* key);  // always true
// Every "env.set.NAME" key sets NAME (the first 8 characters of the key are
// dropped, whatever they are).
void addEnvSetToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
// LD_LIBRARY_PATH = "library.path.prepend", the inherited value,
// "library.path.append", empty pieces left out; unchanged without either key.
void addLibpathToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
// setPreload for "library.preload" (RLNCH0005E without "rcp.install.id").
void addLdPreloadToCommandLine(std::vector<String>& rcpInstallPropertiesArray);
// JAVA_HIGH_ZIPFDS = "env.JAVA_HIGH_ZIPFDS", else 500.
void addEnvJavaHighZipfds(std::vector<String>& rcpInstallPropertiesArray);
// LD_PRELOAD = ldPreload; a path with a blank, which the variable cannot
// hold, is given as the link /tmp/kel.rcp.<USER>.<IDString>.<library name>,
// made (or kept) only as this user's own link to the library: anything else
// found there is left alone and LD_PRELOAD is not set. A library that is not
// there sets nothing.
void setPreload(const wchar_t* ldPreload, const wchar_t* IDString);

// ===================== File system (rcp_launcher_macos_fs) ===================
// From now on, directories and files that the launcher creates get no group
// or other write permission when privateToUser (the umask may take away
// more, never add), else what the umask leaves of 0775 and 0666. The lock
// file is 0600 either way. Starts true; the umask is never changed, so the
// child inherits it as it was.
void setPrivateFiles(bool privateToUser);
// open(2) for the layer's own use: close-on-exec, never blocking, and only a
// regular file is kept (else -1 with errno EISDIR for a directory, EINVAL for
// any other kind of file). flags add the access mode, O_CREAT, O_NOFOLLOW...;
// a created file gets mode as setPrivateFiles allows.
int openRegularFile(const char* path, int flags, int mode = 0);
// One mkdir, mode 0775 as setPrivateFiles allows; an existing directory gives 0.
int createDirectory(const wchar_t* dir);
// Remove everything below dir (dir itself stays), or the tree with dir, going
// on past failures. Links to directories are followed. The error list gets one
// line per failure; the wide forms replace the caller's list only when they
// fail and leave it alone on success.
int removeDirectoryContents(const std::string& dir, std::string& indent, std::string& errlist);
int removeDirectoryContents(const std::wstring& dir, std::wstring& errlist);
int removeDirectoryAndContents(const std::wstring& dir, std::wstring& errlist);
// A byte-for-byte copy (whatever the text's encoding) that appears under
// newFile only complete: written as a work file and renamed into place.
// Every failure is fatal (RLNCH0190E-RLNCH0193E), with the work file removed;
// a directory as the source is one that cannot be read to its end
// (RLNCH0193E), as the destination one that cannot be opened (RLNCH0191E).
int copyFile(const wchar_t* origFile, const wchar_t* newFile);
// Appends text to the regular file path the way every file is written: the
// old content and text go to a work file that replaces path once complete,
// with path's mode (and its owner, where the system allows). -1 when path
// cannot be opened for writing (a read-only file is refused, not replaced)
// or no work file can be made beside it; 0 when the copy could not be
// written or put in place (path unchanged); 1 when done.
int appendToFile(const std::wstring& path, const std::wstring& text);
// One rename; nothing else is tried when it fails (no copy across file systems).
int moveFile(const wchar_t* origFile, const wchar_t* newFile);
// One unlink.
int deleteFile(const wchar_t* file);
// The path can be opened for reading (never blocking on a FIFO): a readable
// directory exists, a file without read permission does not. Null gives 0.
int exists(const wchar_t* file);
int existsA(const char* file);
// lstat: a link to a directory is not a directory. Null gives 0.
int isDirectory(const wchar_t* file);
// stat (a link is followed) and the owner's execute bit only, whoever the
// user is. Null gives 0.
int isExecutable(const wchar_t* file);
// The next line of a properties file: white space (blank lines too) is
// skipped first, then at most 2024 bytes up to the line end are read (a
// longer line goes on as the next one). Returns 1, or EOF at the end.
int readPropertyLine(FILE* in, std::wstring& line);
// The next line of a template (platform.xml, rcpinstall.properties): at most
// 2024 bytes up to the line end, after which the line end and all white space
// that follows are skipped, so blank lines and indentation vanish (also
// before the first line). Returns 1, or EOF at the end.
int readTemplateLine(FILE* in, std::wstring& line);

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
// The process's current directory; false (errno set) when it has none.
bool getCurrentDirectory(std::wstring& dir);
// $HOME, or "" when unset; returns envHome's text.
const wchar_t* getUserHome(std::wstring& envHome);
// Sleeps the whole number of seconds, also when a signal comes in between.
void sysSleep(int seconds);

// ===================== Installation discovery (rcp_launcher_macos) ===========
// The launcher's own executable, links resolved, as the system reports it
// (never the command line's program name); "" when it cannot be resolved.
// RLNCH0184E (fatal) when the system does not tell.
void read_executable_path(std::string& path);
// The target of a symbolic link, whatever its length; false (errno set) when
// it cannot be read.
bool readLink(const char* path, std::string& target);
// readLink, where a failure or a target of 1024 bytes or more is fatal.
void readsymln(std::string& target, const char* link);
// cmd (null or a String, released) becomes a new String: the directory of the
// launcher's executable. arg, the program name, is not used.
void findCommand(wchar_t*& cmd, wchar_t* arg);
// That directory when it is one, else null; the caller frees it.
wchar_t* getRCPDirectory(int argc, wchar_t** argv);
// The directory above the launcher's directory when that is named exactly
// "rcp", else "" (the installation's paths are then taken from the root);
// RLNCH0049E (fatal) when the launcher's directory cannot be found.
void getInstallDir(std::wstring& installDir, int argc, wchar_t** argv);
// The launcher's executable as a wide path.
void getLauncherPath(std::wstring& path);
// For "-initMUService": the directories two (service) and six (installation)
// levels above the launcher's; RLNCH0048E (fatal) when the tree is shallower.
void getServiceInstallDir(std::wstring& serviceDir, std::wstring& installDir, int argc, wchar_t** argv);
// This platform's suffix in properties keys: "macosx".
const wchar_t* getOS();
// The session-ending routines, kept for the common code; no launch calls them.
int shutdown();
int logoff();
int findRCP();

// ===================== Platform lock file, file side (rcp_launcher_macos_lock)
// Creates lockFilePath when needed (0600, never through a link, close-on-exec)
// and opens it "r+" for the process's life; RLNCH0054E (fatal) when it cannot.
void createAndOpenLockFile();
// Takes the exclusive flock (blocking; retrying after RLNCH0053E) and decides
// main (no live platform recorded: the marker file goes) or secondary.
void lockLockFile(const std::wstring& sidFilePath);
// The main launcher writes "<pid>" and ten blanks from the file's start; a
// secondary one writes nothing. RLNCH0051E (debug) when the write fails.
void populateLockFile(int pid);
// Fourteen blanks from the file's start; RLNCH0052E (debug) when that fails.
void invalidateLockFile();
// Releases the flock; RLNCH0070E (logged, not fatal) when that fails.
void unlockLockFile();
// The process id at the start of the open lock file, read as fscanf("%ld")
// reads it (white space, a sign, digits; a number too long is clamped) from
// its first 4 KiB: 1 with *pidOut set, EOF when there is nothing but white
// space, 0 when something else comes first.
int readLockFilePid(long* pidOut);
// kill(pid, 0): false only when the process does not exist (ESRCH), and for
// ids that cannot name one process (zero, negative, beyond a pid_t).
bool isProcessAlive(long pid);

// ===================== Starting a child (rcp_launcher_launch) ================
// The one way a child is started: args (element 0 the program, used as it is,
// no PATH search) are logged as debug output between beginLine and endLine,
// then fork and execv. In the parent inParent (when given) runs with the
// child's id (-1 when fork failed) and then, with wait, the launcher waits
// for the child (its status is not looked at); the child's id is returned. A
// child whose execv failed returns 0 and its caller decides how it ends.
// Empty args start nothing (-1).
long startChild(const std::vector<std::wstring>& args, const char* beginLine, const char* endLine, bool wait,
                void (*inParent)(long childPid));
// The provisioning child started from launchArgs and waited for; one whose
// program could not be started returns, like the parent. The other arguments
// are not used.
void doProvisioning(std::vector<String>& launcherPropsArray, std::vector<String>& installPropsArray,
                    const wchar_t* executable, const std::vector<std::wstring>& launchArgs);

#endif  // RCP_LAUNCHER_OS_H
