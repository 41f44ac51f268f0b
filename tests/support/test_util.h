// Small helpers shared by the unit and the end-to-end tests and the fuzz
// targets: a throw-away directory, whole-file reads and writes, and a UTF-8
// locale.
#ifndef RCP_TEST_UTIL_H
#define RCP_TEST_UTIL_H

#include <sys/stat.h>
#include <unistd.h>

#include <clocale>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

namespace rcptest {

// Links are not followed.
inline std::filesystem::file_status entryStatus(const std::string& path) {
    std::error_code ignored;
    return std::filesystem::symlink_status(path, ignored);
}
inline bool pathExists(const std::string& path) { return std::filesystem::exists(entryStatus(path)); }
inline bool isDir(const std::string& path) { return std::filesystem::is_directory(entryStatus(path)); }

// Every missing level.
inline void makeDirs(const std::string& path) {
    std::error_code ignored;
    std::filesystem::create_directories(path, ignored);
}

// A file, or a directory with everything below it: read-only directories are
// opened up first, and remove_all also reaches paths longer than PATH_MAX.
inline void removeTree(const std::string& path) {
    std::error_code ec;
    if (isDir(path) && chmod(path.c_str(), 0700) == 0)
        for (std::filesystem::recursive_directory_iterator it(path, ec), end; it != end; it.increment(ec))
            if (isDir(it->path())) chmod(it->path().c_str(), 0700);
    std::filesystem::remove_all(path, ec);
}

// The name of a UTF-8 locale this machine has, for the tests' LANG and
// LC_CTYPE: C.UTF-8 (glibc, recent macOS), else en_US.UTF-8 (macOS 13 and
// earlier have no C.UTF-8).
inline const char* utf8Locale() {
    static const char* const name = [] {
        const std::string previous = setlocale(LC_CTYPE, nullptr);
        const char* found = setlocale(LC_CTYPE, "C.UTF-8") ? "C.UTF-8" : "en_US.UTF-8";
        setlocale(LC_CTYPE, previous.c_str());
        return found;
    }();
    return name;
}

// Writes text to path (creating parent directories), mode 0644 unless given.
inline void writeText(const std::string& path, const std::string& text, int mode = 0644) {
    const size_t slash = path.rfind('/');
    if (slash != std::string::npos && slash > 0) makeDirs(path.substr(0, slash));
    unlink(path.c_str());
    std::ofstream out(path, std::ios::binary);
    if (!(out << text << std::flush)) throw std::runtime_error("cannot write " + path);
    chmod(path.c_str(), static_cast<mode_t>(mode));
}

// The whole file, or "" when it cannot be read.
inline std::string readText(const std::string& path) {
    std::ostringstream text;
    text << std::ifstream(path, std::ios::binary).rdbuf();
    return text.str();
}

// A fresh directory under $TMPDIR (or /tmp), removed with everything in it
// when the object goes out of scope.
class TempDir {
public:
    TempDir() {
        const char* base = getenv("TMPDIR");
        path_ = std::string(base && *base ? base : "/tmp") + "/rcptest.XXXXXX";
        if (!mkdtemp(&path_[0])) throw std::runtime_error("mkdtemp failed");
    }
    ~TempDir() { removeTree(path_); }
    TempDir(const TempDir&) = delete;
    const std::string& path() const { return path_; }
    std::string sub(const std::string& rel) const { return path_ + "/" + rel; }

private:
    std::string path_;
};

}  // namespace rcptest

#endif  // RCP_TEST_UTIL_H
