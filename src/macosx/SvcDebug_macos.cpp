// The launcher's only output channel: a log file chosen late in the startup.
// Until that file is open every line waits in an in-memory queue, so that a
// launch that dies early still leaves its whole story in /tmp/rcplauncher.log.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"

char tempOutBuffer[TEMP_OUT_BUFFER_SIZE];

namespace {

constexpr size_t LINE_BUFFER_SIZE = 4096;
constexpr size_t MAX_DEBUG_FORMAT = 1000;

bool debug = true;
FILE* logFILE = nullptr;
std::string logque;

void addcstr_to_logque(const char* str) { logque += str; }

void writeLine(const std::string& line) {
    if (logFILE != nullptr) {
        fflush(logFILE);
        fputs(line.c_str(), logFILE);
        fflush(logFILE);
    } else {
        addcstr_to_logque(line.c_str());
    }
}

// vsnprintf into the fixed line buffer; a format error yields an empty text
// rather than whatever the buffer held.
void formatInto(char* buf, size_t size, const char* fmt, va_list ap) {
    if (vsnprintf(buf, size, fmt, ap) < 0) buf[0] = '\0';
}

void output_doit(const char* fmt, va_list ap) {
    char buf[LINE_BUFFER_SIZE];
    formatInto(buf, sizeof buf, fmt, ap);
    std::string line(buf);
    line += '\n';
    writeLine(line);
}

void Output(const char* fmt, ...) __attribute__((format(printf, 1, 2)));
void Output(const char* fmt, ...) {
    va_list ap;
    va_start(ap, fmt);
    output_doit(fmt, ap);
    va_end(ap);
}

// One error line: the text, " : " and the system's text for savedErrno, cut
// at the line buffer's size (a text that fills it leaves no room for the
// suffix).
void writeErrorLine(int savedErrno, const char* text) {
    char buf[LINE_BUFFER_SIZE];
    snprintf(buf, sizeof buf, "%s : %s", text, strerror(savedErrno));
    writeLine(std::string(buf) + '\n');
}

// A text that is used as a format although it may carry data. The k-th
// conversion takes the k-th spare argument when its type fits; "%%" gives
// "%"; any other conversion (a mismatch, one beyond the arguments, "%n", a
// "*" width) is written as it stands instead of reading memory that was
// never passed.
struct SpareArg {
    bool isInt;
    int i;
    const char* s;
};

std::string formatWithSpareArgs(const std::string& fmt, std::initializer_list<SpareArg> spare) {
    std::string out;
    const SpareArg* next = spare.begin();
    size_t i = 0;
    while (i < fmt.size()) {
        if (fmt[i] != '%') {
            out += fmt[i++];
            continue;
        }
        size_t j = i + 1;
        while (j < fmt.size() && strchr("-+ #0123456789.", fmt[j]) != nullptr) ++j;
        if (j >= fmt.size()) {
            out += fmt.substr(i);
            break;
        }
        char conv = fmt[j];
        std::string spec = fmt.substr(i, j - i + 1);
        i = j + 1;
        if (conv == '%' && spec.size() == 2) {
            out += '%';
            continue;
        }
        const SpareArg* arg = next != spare.end() ? next++ : nullptr;
        char piece[LINE_BUFFER_SIZE];
        if (arg != nullptr && arg->isInt && strchr("diouxXc", conv) != nullptr) {
            snprintf(piece, sizeof piece, spec.c_str(), arg->i);
            out += piece;
        } else if (arg != nullptr && !arg->isInt && conv == 's') {
            snprintf(piece, sizeof piece, spec.c_str(), arg->s ? arg->s : "(null)");
            out += piece;
        } else {
            out += spec;
        }
    }
    return out;
}

SpareArg intArg(int v) { return SpareArg{true, v, nullptr}; }
SpareArg strArg(const char* v) { return SpareArg{false, 0, v}; }

// The error line for a message whose one argument is wide: the argument is
// converted here (so that any file name survives) and "%ls" becomes "%s".
std::string narrowFormatForWideArg(const char* msg) {
    std::string fmt(msg);
    size_t pos = fmt.find("%ls");
    if (pos != std::string::npos) fmt.replace(pos, 3, "%s");
    return fmt;
}

[[noreturn]] void exitSequence() {
    if (logFILE == nullptr) dumpLogToTempLocation();
    exit(-1);
}

// Opens the log without following a symbolic link at its name, so that a link
// planted at a fixed path (the /tmp fallback) is never written through, and
// without blocking, so that a FIFO planted there cannot hold the launch; only
// a regular file is kept. In the world-writable /tmp the file must also be
// the launching user's own: a file another user made there (and may read)
// gets none of this launch's lines.
// The old content is not truncated here but cut after the first write (see
// enableLogging): emptying a file that is then rewritten makes some file
// systems (ext4) free its blocks and force them to disk again on close,
// which costs more than the rest of a launch's file work.
FILE* openLogStream(const std::string& path, bool mustBeOwn) {
    int fd = openRegularFile(path.c_str(), O_RDWR | O_CREAT | O_NOFOLLOW, 0666);
    if (fd < 0) return nullptr;
    struct stat st;
    if (mustBeOwn && (fstat(fd, &st) != 0 || st.st_uid != geteuid())) {
        close(fd);
        errno = EPERM;
        return nullptr;
    }
    FILE* fp = fdopen(fd, "w+");
    if (fp == nullptr) {
        close(fd);
        return nullptr;
    }
    fwide(fp, -1);
    return fp;
}

// Cuts whatever an earlier launch left beyond the first bytes this launch
// wrote from the start of the file (written < 0: as far as the file position
// says); from then on the file holds exactly what this launch wrote. errno
// is kept: the next error line reports its own cause.
void cutAfter(FILE* fp, off_t written) {
    const int savedErrno = errno;
    const int fd = fileno(fp);
    if (written < 0) written = lseek(fd, 0, SEEK_CUR);
    struct stat st;
    if (written >= 0 && fstat(fd, &st) == 0 && S_ISREG(st.st_mode) && st.st_size > written &&
        ftruncate(fd, written) != 0) {
        // Nothing more can be done; the lines of this launch are in place.
    }
    errno = savedErrno;
}

}  // namespace

void setDebug(bool val) { debug = val; }
bool getDebug() { return debug; }

namespace {

bool openLog(const std::wstring& logLocation, bool mustBeOwn) {
    const std::wstring path = joinPath(logLocation, RCP_LOG_FILE);
    std::string npath;
    wstrtocs(npath, path);
    FILE* fp = openLogStream(npath, mustBeOwn);
    if (fp == nullptr) {
        fatalErrorA("RLNCH0019E: Could not open %ls for writing!", path.c_str(), false);
        return false;
    }
    logFILE = fp;
    const int printed = fprintf(logFILE, "%s\n", logque.c_str());
    const bool flushed = fflush(logFILE) == 0;
    cutAfter(logFILE, printed >= 0 && flushed ? printed : -1);
    logque.clear();
    return true;
}

}  // namespace

bool enableLogging(const std::wstring& logLocation) { return openLog(logLocation, false); }

bool dumpLogToTempLocation() { return openLog(TEMP_DIR, true); }

void SvcDebugOutA(const char* fString) {
    if (!debug || strlen(fString) >= MAX_DEBUG_FORMAT) return;
    Output("%s", fString);
}

void SvcDebugOutA(const char* fString, const char* str) {
    if (!debug || strlen(fString) >= MAX_DEBUG_FORMAT) return;
    std::string text = formatWithSpareArgs(fString, {strArg(str)});
    Output("%s", text.c_str());
}

void SvcDebugOutA(const char* fString, int status) {
    if (!debug || strlen(fString) >= MAX_DEBUG_FORMAT) return;
    std::string text = formatWithSpareArgs(fString, {intArg(status)});
    Output("%s", text.c_str());
}

void SvcDebugOutW(const wchar_t* fString, const wchar_t* arg) {
    if (!debug) return;
    std::string fmt, narg;
    wcstochar(fmt, fString);
    wcstochar(narg, arg ? arg : L"");
    if (fmt.size() >= MAX_DEBUG_FORMAT) return;
    std::string text = formatWithSpareArgs(fmt, {strArg(narg.c_str())});
    Output("%s", text.c_str());
}

void SvcDebugOutW(const wchar_t* preString, int arg_cnt, wchar_t** sargs) {
    if (!debug) return;
    std::wstring assembled(preString ? preString : L"");
    assembled += L"=\"";
    for (int i = 0; i < arg_cnt && sargs != nullptr; ++i) {
        assembled += sargs[i] ? sargs[i] : L"";
        assembled += L", ";
    }
    assembled += L"\"\n";
    std::string fmt;
    wcstochar(fmt, assembled.c_str());
    if (fmt.size() >= MAX_DEBUG_FORMAT) return;
    // The assembled text is the format, with the count and the text as spare
    // arguments; the line format adds its own newline after it.
    std::string text = formatWithSpareArgs(fmt, {intArg(arg_cnt), strArg(fmt.c_str())});
    Output("%s", text.c_str());
}

void SvcDebugLastError(const wchar_t* lpszFunction) { SvcDebugOutW(lpszFunction, L""); }

void SvcDebugLastError(const wchar_t* lpszFunction, const wchar_t* subname) { SvcDebugOutW(lpszFunction, subname); }

void GetLastErrorMsg(std::string& errorString) {
    int err = errno;
    errorString = " Failed with error " + std::to_string(err) + ": " + strerror(err);
}

void GetLastErrorMsg(std::wstring& werrorString) {
    std::string narrow;
    GetLastErrorMsg(narrow);
    chartowstr(narrow.c_str(), werrorString);
}

void fatalError(const char* fmt, ...) {
    int savedErrno = errno;
    char buf[LINE_BUFFER_SIZE];
    va_list ap;
    va_start(ap, fmt);
    formatInto(buf, sizeof buf, fmt, ap);
    va_end(ap);
    writeErrorLine(savedErrno, buf);
}

namespace {

// One error line of an already formatted text, with the system text of the
// errno that held when the caller was entered; then, if asked, the end.
void reportError(int savedErrno, const std::string& text, bool bExit) {
    writeErrorLine(savedErrno, text.c_str());
    if (bExit) exitSequence();
}

}  // namespace

void fatalErrorA(const char* msg, bool bExit) {
    const int savedErrno = errno;
    reportError(savedErrno, formatWithSpareArgs(msg ? msg : "", {}), bExit);
}

void fatalErrorA(const char* msg, const char* arg, bool bExit) {
    const int savedErrno = errno;
    reportError(savedErrno, formatWithSpareArgs(msg ? msg : "", {strArg(arg)}), bExit);
}

void fatalErrorA(const char* msg, const wchar_t* arg, bool bExit) {
    const int savedErrno = errno;
    std::string narg;
    wcstochar(narg, arg ? arg : L"");
    reportError(savedErrno, formatWithSpareArgs(narrowFormatForWideArg(msg ? msg : ""), {strArg(narg.c_str())}), bExit);
}

void fatalErrorW(const wchar_t* mgs, bool bExit) {
    const int savedErrno = errno;
    std::string fmt;
    wcstochar(fmt, mgs ? mgs : L"");
    reportError(savedErrno, formatWithSpareArgs(fmt, {}), bExit);
}

void fatalErrorExit(const char* msg) {
    fatalErrorA(msg, false);
    exitSequence();
}

void fatalErrorExit(const char* msg, const wchar_t* arg) {
    fatalErrorA(msg, arg, false);
    exitSequence();
}

void exitLauncher(int status) { exit(status); }

const std::string& getLogQueue() { return logque; }

void resetLoggingForTest() {
    if (logFILE != nullptr) fclose(logFILE);
    logFILE = nullptr;
    logque.clear();
    debug = true;
}
