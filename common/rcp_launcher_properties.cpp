// Reading Java-style properties files into a properties array, and look-ups
// on such arrays.
//
// The grammar is close to java.util.Properties but differs on purpose:
//  - duplicate keys are kept in file order and the FIRST occurrence wins;
//  - every leading separator ("=", ":", blank, tab) before a value is skipped;
//  - a logical line that begins with "-X" keeps its separators in the value,
//    so that key + value give back the JVM option text exactly;
//  - "\=" and "\:" only drop the backslash (they do not protect a separator
//    inside a key), "\t", "\n" etc. are not translated, a "\u" escape with
//    fewer than four hex digits still consumes six characters;
//  - "#" starts a comment, which does not interrupt a continued value;
//  - a carriage return before the line end stays in the value;
//  - lines are read in pieces of at most 2024 bytes, so an overlong line
//    becomes several pairs.
// Administrators' existing files rely on each of these points.
#include <cstdlib>
#include <cwchar>

#include "rcp_launcher.h"

namespace {

// Closes every array returned by findProperties.
wchar_t emptyEntry[1] = {0};

bool isBlank(wchar_t c) { return c == L' '; }

// The value of a "\u" escape: the (at most) four characters after "\u" read
// as a hexadecimal number. A sign in front of the digits would make the
// unsigned conversion wrap; only the low 16 bits can be meant.
wchar_t unicodeEscapeValue(const wstring& s, size_t digitsStart) {
    wchar_t digits[5];
    size_t n = 0;
    while (n < 4 && digitsStart + n < s.length()) {
        digits[n] = s[digitsStart + n];
        ++n;
    }
    digits[n] = 0;
    unsigned long code = wcstoul(digits, nullptr, 16);
    return static_cast<wchar_t>(code & 0xFFFFUL);
}

}  // namespace

void trimString(wstring& s) {
    size_t first = 0;
    while (first < s.length() && isBlank(s[first])) ++first;
    if (first == s.length()) return;  // empty or blanks only: unchanged
    size_t last = s.length() - 1;
    while (isBlank(s[last])) --last;
    // In place, so that trimming does not allocate.
    s.erase(last + 1);
    s.erase(0, first);
}

void FilterProp(wstring& key) { trimString(key); }

void FilterValue(wstring& value) {
    if (value.find(L'\\') != wstring::npos) {
        // One left-to-right pass; every escape shrinks the text, so the result
        // is compacted in place. A character produced by an escape is never
        // looked at again.
        size_t w = 0;
        size_t r = 0;
        const size_t len = value.length();
        while (r < len) {
            wchar_t c = value[r];
            if (c != L'\\') {
                value[w++] = c;
                ++r;
                continue;
            }
            if (r + 1 < len && value[r + 1] == L'\\') {
                value[w++] = L'\\';
                r += 2;
            } else if (r + 1 < len && value[r + 1] == L'u') {
                value[w++] = unicodeEscapeValue(value, r + 2);
                r += 6;  // "\uXXXX", even when fewer digits were there
            } else {
                ++r;  // any other escape: the backslash goes, the character stays
            }
        }
        value.resize(w);
    }
    trimString(value);
}

bool isComment(const wstring& line) { return !line.empty() && (line[0] == L'#' || line[0] == L'!'); }

bool isContinuationLine(const wstring& line) {
    size_t count = 0;
    // The first character is never counted, so a lone backslash does not
    // continue the line.
    for (size_t i = line.length(); i > 1 && line[i - 1] == L'\\'; --i) ++count;
    return (count % 2) == 1;
}

bool processFilterKey(wstring& line) {
    size_t lead = 0;
    while (lead < line.length() && isBlank(line[lead])) ++lead;
    line.erase(0, lead);

    if (line.compare(0, 2, L"-D") == 0) return false;

    size_t keyEnd = line.find_first_of(L" :=");
    if (keyEnd == wstring::npos) keyEnd = line.length();
    size_t dot = line.rfind(L'.', keyEnd == 0 ? 0 : keyEnd - 1);
    if (keyEnd == 0 || dot == wstring::npos) return false;

    const wchar_t* suffix = line.c_str() + dot + 1;
    size_t suffixLen = keyEnd - dot - 1;
    static const wchar_t* const platforms[] = {L"win32", L"linux", L"macosx"};
    bool namesPlatform = false;
    for (const wchar_t* p : platforms) {
        size_t plen = wcslen(p);
        if (suffixLen >= plen && wcsncmp(suffix, p, plen) == 0) namesPlatform = true;
    }
    if (!namesPlatform) return false;

    const wchar_t* os = getOS();
    size_t osLen = os ? wcslen(os) : 0;
    if (os != nullptr && suffixLen >= osLen && wcsncmp(suffix, os, osLen) == 0) {
        line.erase(dot, keyEnd - dot);  // "a.b.macosx=1" -> "a.b=1"
        return false;
    }
    return true;  // another platform's line
}

void getProperties(const wstring& propFilePath, std::vector<String>& propArray) {
    FILE* fp = nullptr;
    open_file(fp, propFilePath.c_str(), L"r");
    if (fp == nullptr) fatalErrorExit("RLNCH0014E: Unable to load %ls file!", propFilePath.c_str());
    fseek(fp, 0, SEEK_SET);

    // Reused for every line: reading stays linear in the file's size.
    wstring line;
    wstring attributeq;
    wstring valueq;
    bool endAttributeFound = false;
    bool skipWhiteSpace = true;
    bool valueContinuedOnNextLine = false;
    bool xArgFound = false;

    while (!feof(fp)) {
        const bool continuing = valueContinuedOnNextLine;
        if (!continuing) {
            valueContinuedOnNextLine = false;
            endAttributeFound = false;
        }
        skipWhiteSpace = true;

        // -1 is the end of the file. Nothing else is expected from this reader;
        // a read that converted nothing cannot make progress either.
        if (readPropertyLine(fp, line) != 1) break;

        SvcDebugOutW(L"RLNCH0032I: Prop Line = \"%s\"", line.c_str());
        if (!line.empty() && line[0] == L'#') continue;  // keeps a continuation going

        if (!continuing && line.length() > 1) xArgFound = (line[0] == L'-' && line[1] == L'X');

        const size_t len = line.length();
        for (size_t i = 0; i < len; ++i) {
            const wchar_t c = line[i];
            const wchar_t n = (i + 1 < len) ? line[i + 1] : 0;
            if (c == L'\\' && i + 1 == len) {
                valueContinuedOnNextLine = true;
            } else if (c == L'\\' && (n == L':' || n == L'#' || n == L' ' || n == L'=')) {
                // Weak escape: only the backslash goes.
            } else if (c == L'\n') {
                // dropped
            } else if ((c == L'=' || c == L':' || c == L' ' || c == L'\t') && skipWhiteSpace) {
                endAttributeFound = true;
                if (xArgFound) valueq += c;
            } else if (!endAttributeFound) {
                attributeq += c;
            } else {
                if (c == L'\\' && n == L'\\') {
                    // Kept doubled so that FilterValue reads one literal backslash.
                    valueq += L'\\';
                    ++i;
                }
                valueq += c;
                skipWhiteSpace = false;
                valueContinuedOnNextLine = false;
            }
        }

        if (valueContinuedOnNextLine) continue;

        FilterProp(attributeq);
        String key = copyString(attributeq.c_str());
        SvcDebugOutW(L"RLNCH0023I:   attrib = \"%s\"", key);
        propArray.push_back(key);
        attributeq.clear();

        FilterValue(valueq);
        // A NUL from "\u0000" cuts the stored copy there.
        String value = copyString(valueq.c_str());
        SvcDebugOutW(L"RLNCH0024I:   value  = \"%s\"", value);
        propArray.push_back(value);
        valueq.clear();
    }
    fclose(fp);
}

String findProperty(const wchar_t* name, const std::vector<String>& propArray) {
    for (size_t i = 0; i + 1 < propArray.size(); i += 2) {
        if (propArray[i] != nullptr && wcscmp(propArray[i], name) == 0) return propArray[i + 1];
    }
    return nullptr;
}

String* findProperties(const wchar_t* prefix, const std::vector<String>& propArray) {
    size_t capacity = 10;
    String* result = static_cast<String*>(malloc((capacity + 1) * sizeof(String)));
    if (result == nullptr) fatalErrorExit("RLNCH0046E: findProperties malloc for property strings failed!");
    const size_t prefixLen = prefix ? wcslen(prefix) : 0;
    size_t count = 0;
    for (size_t i = 0; i + 1 < propArray.size(); i += 2) {
        const String key = propArray[i];
        // An empty key ends the selection (it hides every later pair here).
        if (key == nullptr || key[0] == 0) break;
        if (prefixLen != 0 && wcsncmp(key, prefix, prefixLen) != 0) continue;
        if (count + 2 > capacity) {
            capacity *= 2;
            String* grown = static_cast<String*>(realloc(result, (capacity + 1) * sizeof(String)));
            if (grown == nullptr) {
                free(result);
                fatalErrorExit("RLNCH0046E: findProperties malloc for property strings failed!");
            }
            result = grown;
        }
        result[count++] = key;
        result[count++] = propArray[i + 1];
    }
    result[count] = emptyEntry;
    return result;
}

void removeDuplicates(std::vector<wstring>& args, const wchar_t* str) {
    bool seen = false;
    for (size_t i = 0; i < args.size(); ++i) {
        if (wcscmp(args[i].c_str(), str) != 0) continue;
        if (seen) {
            args.erase(args.begin() + static_cast<std::ptrdiff_t>(i));
            return;
        }
        seen = true;
    }
}

void freeProperties(std::vector<String>& propArray) {
    // Every entry, empty ones included, is its own allocation.
    for (String& s : propArray) s = freeString(s);
    propArray.clear();
}
