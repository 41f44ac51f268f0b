#include "test_util.h"

#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <stdexcept>

#include "rcp_launcher.h"

namespace rcptest {

TempDir::TempDir() {
    const char* base = getenv("TMPDIR");
    std::string tmpl = std::string(base && *base ? base : "/tmp") + "/rcptest.XXXXXX";
    if (!mkdtemp(&tmpl[0])) throw std::runtime_error("mkdtemp failed");
    path_ = tmpl;
}

TempDir::~TempDir() { removeTree(path_); }

std::wstring TempDir::wpath() const { return widen(path_); }
std::string TempDir::sub(const std::string& rel) const { return path_ + "/" + rel; }
std::wstring TempDir::wsub(const std::string& rel) const { return widen(sub(rel)); }

void makeDirs(const std::string& path) {
    for (size_t slash = path.find('/', 1); slash != std::string::npos; slash = path.find('/', slash + 1))
        mkdir(path.substr(0, slash).c_str(), 0755);
    mkdir(path.c_str(), 0755);
}

void writeText(const std::string& path, const std::string& text, int mode) {
    size_t slash = path.rfind('/');
    if (slash != std::string::npos && slash > 0) makeDirs(path.substr(0, slash));
    unlink(path.c_str());
    std::ofstream out(path, std::ios::binary);
    if (!(out << text) || !out.flush()) throw std::runtime_error("cannot write " + path);
    out.close();
    chmod(path.c_str(), static_cast<mode_t>(mode));
}

std::string readText(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    if (!in) return "";
    std::ostringstream ss;
    ss << in.rdbuf();
    return ss.str();
}

bool pathExists(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0;
}
bool isDir(const std::string& path) {
    struct stat st;
    return lstat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

void removeTree(const std::string& path) {
    struct stat st;
    if (lstat(path.c_str(), &st) != 0) return;
    if (S_ISDIR(st.st_mode)) {
        chmod(path.c_str(), 0700);
        if (DIR* d = opendir(path.c_str())) {
            while (dirent* e = readdir(d)) {
                if (!strcmp(e->d_name, ".") || !strcmp(e->d_name, "..")) continue;
                removeTree(path + "/" + e->d_name);
            }
            closedir(d);
        }
        rmdir(path.c_str());
    } else {
        unlink(path.c_str());
    }
}

std::wstring widen(const std::string& s) {
    std::wstring out;
    chartowstr(s.c_str(), out);
    return out;
}

std::string narrow(const std::wstring& s) {
    std::string out;
    wstrtocs(out, s);
    return out;
}

WArgs::WArgs(std::initializer_list<std::wstring> args) : args_(args) { build(); }
WArgs::WArgs(const std::vector<std::wstring>& args) : args_(args) { build(); }

void WArgs::build() {
    storage_.clear();
    ptrs_.clear();
    for (const auto& a : args_) storage_.emplace_back(a.c_str(), a.c_str() + a.size() + 1);
    for (auto& s : storage_) ptrs_.push_back(s.data());
    ptrs_.push_back(nullptr);
}

PropArray::PropArray(std::initializer_list<std::pair<std::wstring, std::wstring>> pairs) {
    for (const auto& p : pairs) {
        v_.push_back(copyString(p.first.c_str()));
        v_.push_back(copyString(p.second.c_str()));
    }
}

PropArray::~PropArray() {
    for (wchar_t* s : v_) free(s);
}

}  // namespace rcptest
