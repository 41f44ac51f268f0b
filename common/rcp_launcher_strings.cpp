// Owned wide C strings, and paths joined from them. An allocation failure
// cannot be recovered from in a launcher, so it ends the launch through the
// fatal path.
#include <cstdlib>
#include <cwchar>

#include "rcp_launcher.h"

namespace {

// Room for len characters and the terminator, already a valid empty string.
String allocString(unsigned long len, const char* failureMessage) {
    String s = static_cast<String>(malloc((len + 1) * sizeof(wchar_t)));
    if (s == nullptr) fatalErrorExit(failureMessage);
    s[0] = 0;
    return s;
}

}  // namespace

String newString(unsigned long len) { return allocString(len, "RLNCH0004E: newString malloc failed!"); }

String mallocString(unsigned long len) { return allocString(len, "RLNCH0004E: mallocString malloc failed!"); }

String freeString(String s) {
    if (s != nullptr) free(s);
    return nullptr;
}

String initMemString(String str1, const wchar_t* str2) { return wcscat(str1, str2); }

wstring nativePath(wstring path) {
    convertToOsSeparator(path);
    return path;
}

wstring joinPath(const wstring& dir, const wstring& name) {
    if (name.empty()) return nativePath(dir);
    // One separator between the two, whichever side brings it: the join
    // itself never makes "//". An empty dir joins from the root ("/name").
    wstring path = dir;
    if (!path.empty() && (path.back() == L'/' || path.back() == L'\\')) path.pop_back();
    if (name[0] != L'/' && name[0] != L'\\') path += L'/';
    return nativePath(path + name);
}

String copyString(const wchar_t* text) {
    if (text == nullptr) text = L"";
    return initMemString(newString(wcslen(text) + 1), text);
}
