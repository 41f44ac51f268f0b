// Making directories: a whole path one level at a time (mkdirs), and the
// one way the launcher makes a directory it needs (ensureDirectory).
#include <cerrno>
#include <cwchar>
#include <string>

#include "rcp_launcher.h"

namespace {

// The work buffer holds 1024 wide characters including the terminator; longer
// paths are refused rather than cut, so a truncated path is never created.
const size_t MKDIRS_BUFFER_CHARS = 1024;

bool isSeparator(wchar_t ch) { return ch == L'/' || ch == L'\\'; }

}  // namespace

// Both "/" and "\" separate levels, and the path is always taken from the
// root: "a/b" creates /a and /a/b. Only the last level's createDirectory
// result is returned, so an already existing final directory gives 0 and
// callers that need the directory test for it with isDirectory. A path with
// no levels at all gives 1.
int mkdirs(const wchar_t* path) {
    size_t length = wcsnlen(path, MKDIRS_BUFFER_CHARS);
    if (length >= MKDIRS_BUFFER_CHARS) {
        return 0;
    }
    int result = 1;
    std::wstring accumulated = L"/";
    size_t i = 0;
    while (i < length) {
        while (i < length && isSeparator(path[i])) {
            ++i;
        }
        if (i >= length) {
            break;
        }
        size_t start = i;
        while (i < length && !isSeparator(path[i])) {
            ++i;
        }
        accumulated.append(path + start, i - start);
        result = createDirectory(accumulated.c_str());
        accumulated += L"/";
    }
    return result;
}

void ensureDirectory(const wstring& dir) {
    if (isDirectory(dir.c_str())) return;
    userFirstLaunch = true;
    if (mkdirs(dir.c_str())) return;
    // The workspace and log directories come before the platform lock, so
    // another launcher of the same user may have created the directory
    // between the test above and mkdirs (whose last mkdir then fails with
    // EEXIST). What counts is that the directory is there now.
    const int mkdirsErrno = errno;
    if (isDirectory(dir.c_str())) return;
    errno = mkdirsErrno;  // the error line reports why mkdirs failed
    fatalErrorExit("RLNCH0010E: Unable to create %ls directory.", dir.c_str());
}
