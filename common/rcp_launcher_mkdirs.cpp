// Creating a whole directory path, one level at a time.
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
