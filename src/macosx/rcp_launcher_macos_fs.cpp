// File-system services of the launcher: directory creation and removal, the
// copy of the launcher's own files, rename/delete, the existence tests, the
// line readers of the properties and template files, and the work files
// through which every file written for the user appears complete.
//
// Every wide path is converted to the locale's multibyte form right before the
// system call. Nothing here writes to the log except copyFile, whose failures
// end the launch; everything else answers through its 1/0 result and leaves
// errno as the failing call set it.
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

const mode_t DIRECTORY_MODE = 0775;
const mode_t FILE_MODE = 0666;

// Permission bits never given to what the launcher creates (setPrivateFiles).
mode_t privateMask = 022;

// Size of the scratch area that receives one scanned item (bytes).
const size_t READ_SCRATCH_SIZE = 204800;

// Bytes moved per read of a file copy.
const size_t COPY_BUFFER_BYTES = 8192;

// One line of the removal error list. errno is handed in explicitly because it
// has to be the value the failing call left, not whatever building the line
// might leave behind.
void appendError(std::string& errlist, const char* prefix, const std::string& path, int savedErrno) {
    std::string reason;
    errno = savedErrno;
    GetLastErrorMsg(reason);
    errlist += prefix;
    errlist += path;
    errlist += "  - ";
    errlist += reason;
    errlist += "\n";
}

std::string toNarrow(const wchar_t* path) {
    std::string out;
    wcstochar(out, path);
    return out;
}

// The line formats of the two readers; each converts one item of at most
// 2024 bytes, which the scratch area holds. A properties line begins after
// any white space (blank lines too); after a template line the "\n" swallows
// the line end and all white space that follows, so blank lines and
// indentation vanish.
const char PROPERTY_LINE_FORMAT[] = " %2024[^\n]\n";
const char TEMPLATE_LINE_FORMAT[] = "%2024[^\n]\n";

int readLine(FILE* in, const char* format, std::wstring& line) {
    // The properties reader calls this once per line; one scratch area serves
    // every call instead of a fresh 200 KB allocation each time.
    static char scratch[READ_SCRATCH_SIZE];
    line.clear();
    if (in == nullptr) {
        return EOF;
    }
    const int result = fscanf(in, format, scratch);
    if (result >= 1) {
        chartowstr(scratch, line);
    }
    return result;
}

// Copies in to out byte for byte; false when a write failed. readAll tells
// whether in was read to its end.
bool copyStream(FILE* in, FILE* out, bool& readAll) {
    char buffer[COPY_BUFFER_BYTES];
    size_t n;
    bool written = true;
    while (written && (n = fread(buffer, 1, sizeof buffer, in)) > 0) {
        written = fwrite(buffer, 1, n, out) == n;
    }
    readAll = feof(in) != 0;
    return written;
}

// Removes a work file that failed, leaving errno to tell why it failed.
void dropWorkFile(const std::wstring& workPath) {
    const int err = errno;
    deleteFile(workPath.c_str());
    errno = err;
}

// Closes and removes a work file whose content is not to be kept.
void discardWorkFile(FILE* fp, const std::wstring& workPath) {
    const int err = errno;
    fclose(fp);
    errno = err;
    dropWorkFile(workPath);
}

}  // namespace

void setPrivateFiles(bool privateToUser) { privateMask = privateToUser ? 022 : 0; }

int createDirectory(const wchar_t* dir) {
    std::string path = toNarrow(dir);
    return mkdir(path.c_str(), DIRECTORY_MODE & ~privateMask) == 0 ? 1 : 0;
}

int removeDirectoryContents(const std::string& dir, std::string& indent, std::string& errlist) {
    DIR* listing = opendir(dir.c_str());
    if (listing == nullptr) {
        appendError(errlist, "Error in ", dir, errno);
        return 0;
    }
    // Every name is read before anything is removed: on HFS+ a listing that
    // goes on while entries are removed may skip some, which would then stay
    // and fail their directory's removal. (The listing is also closed before
    // the recursion, so a deep tree does not hold a descriptor per level.)
    // errno tells the end of the listing from a listing error, so it is
    // cleared before every read.
    std::vector<std::string> names;
    errno = 0;
    for (struct dirent* entry; (entry = readdir(listing)) != nullptr; errno = 0) {
        if (std::strcmp(entry->d_name, ".") != 0 && std::strcmp(entry->d_name, "..") != 0) {
            names.emplace_back(entry->d_name);
        }
    }
    const int listingError = errno;
    closedir(listing);
    int result = 1;
    for (const std::string& name : names) {
        const std::string full = dir + "/" + name;
        struct stat st;
        if (stat(full.c_str(), &st) != 0) {
            appendError(errlist, "Can't stat ", full, errno);
            result = 0;
        } else if (S_ISDIR(st.st_mode)) {
            std::string deeper = indent + "  ";
            int sub = removeDirectoryContents(full, deeper, errlist);
            result = result && sub;
            if (rmdir(full.c_str()) != 0) {
                appendError(errlist, "Can't delete dir ", full, errno);
                result = 0;
            }
        } else if (unlink(full.c_str()) != 0) {
            appendError(errlist, "Can't delete file ", full, errno);
            result = 0;
        }
    }
    // The listing's own failure comes last, after the entries it did show.
    if (listingError != 0) {
        appendError(errlist, "readdir error ", "", listingError);
        result = 0;
    }
    return result;
}

namespace {

// The wide removers: the narrow one's list replaces the caller's only on
// failure. With the top, dir itself goes too once everything below it has.
int removeTree(const std::wstring& dir, std::wstring& errlist, bool withTop) {
    const std::string narrowDir = toNarrow(dir.c_str());
    std::string indent;
    std::string narrowList;
    int result = removeDirectoryContents(narrowDir, indent, narrowList);
    if (withTop && result && rmdir(narrowDir.c_str()) != 0) {
        appendError(narrowList, "Can't delete dir ", narrowDir, errno);
        result = 0;
    }
    if (!result) chartowstr(narrowList.c_str(), errlist);
    return result;
}

}  // namespace

int removeDirectoryContents(const std::wstring& dir, std::wstring& errlist) { return removeTree(dir, errlist, false); }

int removeDirectoryAndContents(const std::wstring& dir, std::wstring& errlist) {
    return removeTree(dir, errlist, true);
}

int copyFile(const wchar_t* origFile, const wchar_t* newFile) {
    static const char DESTINATION_FAILED[] = "RLNCH0191E: Unable to open destination file %ls to be copied to";
    const wchar_t* origText = origFile != nullptr ? origFile : L"";
    const wchar_t* newText = newFile != nullptr ? newFile : L"";
    FILE* in = nullptr;
    open_file(in, origText, L"r");
    // A directory is there but is no file: as a source that cannot be read
    // to its end it ends with RLNCH0193E below. Whatever else cannot be
    // opened (a FIFO or a device among them) ends here.
    const int openErrno = errno;
    if (in == nullptr && openErrno != EISDIR)
        fatalErrorExit("RLNCH0190E: Unable to open source file %ls to be copied", origText);
    // Bytes, not text: a copy must never fail because the file is not in
    // the locale's encoding (a launch from the Finder has no LANG at all).
    const std::wstring work = std::wstring(newText) + WORK_FILE_SUFFIX;
    FILE* out = newFile != nullptr ? createWorkFile(work) : nullptr;
    if (out == nullptr) {
        if (in != nullptr) fclose(in);
        fatalErrorExit(DESTINATION_FAILED, newText);
    }
    bool readAll = false;
    const bool written = in == nullptr || copyStream(in, out, readAll);
    if (in != nullptr) {
        fclose(in);
    } else {
        errno = openErrno;
    }
    if (written && !readAll) {
        discardWorkFile(out, work);
        fatalErrorExit("RLNCH0193E: Did not encounter EOF while copying file contents");
    }
    // A write error, or one that only the final flush and close report (a
    // full disk), leaves no file behind. A directory in the destination's
    // place refuses the rename: a destination that cannot be opened.
    if (!commitWorkFile(out, work, newText)) {
        fatalErrorExit(errno == EISDIR ? DESTINATION_FAILED : "RLNCH0192E: Encountered error copying file contents",
                       newText);
    }
    return 1;
}

int appendToFile(const std::wstring& path, const std::wstring& text) {
    FILE* in = nullptr;
    open_file(in, path.c_str(), L"r+");  // for writing, so a read-only file is refused rather than replaced
    if (in == nullptr) {
        return -1;
    }
    const std::wstring work = path + WORK_FILE_SUFFIX;
    FILE* out = createWorkFile(work);
    struct stat st;
    bool readAll = false;
    bool ok = out != nullptr && fstat(fileno(in), &st) == 0;
    if (ok && fchown(fileno(out), st.st_uid, st.st_gid) != 0) {
        // Only root may give a file away: the copy is then the user's own.
    }
    ok = ok && fchmod(fileno(out), st.st_mode & 07777) == 0 && copyStream(in, out, readAll) && readAll &&
         putWide(out, text);
    fclose(in);
    if (out == nullptr) {
        return -1;
    }
    if (!ok) {
        discardWorkFile(out, work);
        return 0;
    }
    return commitWorkFile(out, work, path);
}

int moveFile(const wchar_t* origFile, const wchar_t* newFile) {
    std::string from = toNarrow(origFile);
    std::string to = toNarrow(newFile);
    return rename(from.c_str(), to.c_str()) == 0 ? 1 : 0;
}

int deleteFile(const wchar_t* file) {
    std::string path = toNarrow(file);
    return unlink(path.c_str()) == 0 ? 1 : 0;
}

int existsA(const char* file) {
    if (file == nullptr) {
        return 0;
    }
    // Without O_NONBLOCK a FIFO would hold the launch until a writer came.
    int fd = open(file, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd < 0) {
        return 0;
    }
    close(fd);
    return 1;
}

int exists(const wchar_t* file) {
    if (file == nullptr) {
        return 0;
    }
    std::string path = toNarrow(file);
    return existsA(path.c_str());
}

int isDirectory(const wchar_t* file) {
    if (file == nullptr) {
        return 0;
    }
    std::string path = toNarrow(file);
    struct stat st;
    if (lstat(path.c_str(), &st) != 0) {
        return 0;
    }
    return S_ISDIR(st.st_mode) ? 1 : 0;
}

int isExecutable(const wchar_t* file) {
    if (file == nullptr) {
        return 0;
    }
    std::string path = toNarrow(file);
    struct stat st;
    if (stat(path.c_str(), &st) != 0) {
        return 0;
    }
    return (st.st_mode & 0100) != 0 ? 1 : 0;
}

int readPropertyLine(FILE* in, std::wstring& line) { return readLine(in, PROPERTY_LINE_FORMAT, line); }

int readTemplateLine(FILE* in, std::wstring& line) {
    // The format meets a line end only at the very start of a file: such
    // leading empty lines are skipped like every other blank line (with the
    // indentation after them).
    const int result = readLine(in, TEMPLATE_LINE_FORMAT, line);
    return result == 0 ? readPropertyLine(in, line) : result;
}

int openRegularFile(const char* path, int flags, int mode) {
    int fd = open(path, flags | O_NONBLOCK | O_CLOEXEC, static_cast<mode_t>(mode) & ~privateMask);
    if (fd < 0) {
        return -1;
    }
    struct stat st;
    int err = 0;
    if (fstat(fd, &st) != 0) {
        err = errno;
    } else if (!S_ISREG(st.st_mode)) {
        err = S_ISDIR(st.st_mode) ? EISDIR : EINVAL;
    }
    if (err != 0) {
        close(fd);
        errno = err;
        return -1;
    }
    return fd;
}

FILE* createWorkFile(const std::wstring& workPath) {
    std::string path = toNarrow(workPath.c_str());
    unlink(path.c_str());
    int fd = openRegularFile(path.c_str(), O_WRONLY | O_CREAT | O_EXCL, FILE_MODE);
    if (fd < 0) {
        return nullptr;
    }
    FILE* fp = fdopen(fd, "w");
    if (fp == nullptr) {
        const int err = errno;
        close(fd);
        unlink(path.c_str());
        errno = err;
        return nullptr;
    }
    fwide(fp, -1);
    return fp;
}

int finishWorkFile(FILE* fp, const std::wstring& workPath) {
    // The error flag stays set after a failed write; the flush and the close
    // report what the buffer still held.
    bool ok = ferror(fp) == 0;
    ok = fflush(fp) == 0 && ok;
    ok = fclose(fp) == 0 && ok;
    if (!ok) {
        dropWorkFile(workPath);
    }
    return ok ? 1 : 0;
}

int commitWorkFile(FILE* fp, const std::wstring& workPath, const std::wstring& finalPath) {
    if (!finishWorkFile(fp, workPath)) {
        return 0;
    }
    if (!moveFile(workPath.c_str(), finalPath.c_str())) {
        dropWorkFile(workPath);
        return 0;
    }
    return 1;
}

bool putWide(FILE* fp, const std::wstring& text) {
    std::string bytes;
    wstrtocs(bytes, text);
    return fwrite(bytes.data(), 1, bytes.size(), fp) == bytes.size() && ferror(fp) == 0;
}

bool readSmallFile(const std::wstring& path, std::string& bytes, size_t limit) {
    std::string narrowPath = toNarrow(path.c_str());
    int fd = openRegularFile(narrowPath.c_str(), O_RDONLY);
    if (fd < 0) {
        return false;
    }
    bytes.assign(limit + 1, '\0');
    size_t got = 0;
    ssize_t n;
    while (got < bytes.size() && (n = read(fd, &bytes[got], bytes.size() - got)) > 0) {
        got += static_cast<size_t>(n);
    }
    close(fd);
    bytes.resize(got);
    return got <= limit;
}

bool getCurrentDirectory(std::wstring& dir) {
    char* cwd = getcwd(nullptr, 0);
    if (cwd == nullptr) {
        return false;
    }
    chartowstr(cwd, dir);
    free(cwd);
    return true;
}

const wchar_t* getUserHome(std::wstring& envHome) {
    if (getEnv(USER_HOME, envHome) == nullptr) {
        envHome.clear();
    }
    return envHome.c_str();
}

void sysSleep(int seconds) {
    if (seconds <= 0) {
        return;
    }
    // sleep returns early when a signal arrives; finish the remaining time.
    unsigned int left = static_cast<unsigned int>(seconds);
    while (left > 0) {
        left = sleep(left);
    }
}
