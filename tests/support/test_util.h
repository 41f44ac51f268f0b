// Small helpers shared by the unit tests: a throw-away directory, whole-file
// reads and writes, and wide argument vectors.
#ifndef RCP_TEST_UTIL_H
#define RCP_TEST_UTIL_H

#include <string>
#include <vector>

namespace rcptest {

// A fresh directory under $TMPDIR (or /tmp), removed with everything in it
// when the object goes out of scope.
class TempDir {
public:
    TempDir();
    ~TempDir();
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;
    const std::string& path() const { return path_; }
    std::wstring wpath() const;
    // path() + "/" + rel
    std::string sub(const std::string& rel) const;
    std::wstring wsub(const std::string& rel) const;

private:
    std::string path_;
};

// Writes text to path (creating parent directories), mode 0644 unless given.
void writeText(const std::string& path, const std::string& text, int mode = 0644);
// The whole file, or "" when it cannot be read.
std::string readText(const std::string& path);
bool pathExists(const std::string& path);
bool isDir(const std::string& path);
void makeDirs(const std::string& path);
void removeTree(const std::string& path);
std::wstring widen(const std::string& s);    // ASCII/UTF-8 test text to wide
std::string narrow(const std::wstring& s);

// Owns a wide argument vector for functions that take (argc, wchar_t** argv).
class WArgs {
public:
    WArgs(std::initializer_list<std::wstring> args);
    explicit WArgs(const std::vector<std::wstring>& args);
    int argc() const { return static_cast<int>(ptrs_.size()) - 1; }
    wchar_t** argv() { return ptrs_.data(); }

private:
    void build();
    std::vector<std::wstring> args_;
    std::vector<std::vector<wchar_t>> storage_;
    std::vector<wchar_t*> ptrs_;  // closed by a null pointer
};

// Builds a properties array (owned Strings) from key/value pairs; freed by
// the destructor.
class PropArray {
public:
    PropArray() = default;
    PropArray(std::initializer_list<std::pair<std::wstring, std::wstring>> pairs);
    ~PropArray();
    PropArray(const PropArray&) = delete;
    PropArray& operator=(const PropArray&) = delete;
    std::vector<wchar_t*>& v() { return v_; }

private:
    std::vector<wchar_t*> v_;
};

}  // namespace rcptest

#endif  // RCP_TEST_UTIL_H
