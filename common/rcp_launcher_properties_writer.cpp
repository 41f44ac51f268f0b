// Escaping of keys and values written into properties files, so that the
// file holds printable ASCII only and the reader gives back the same value.
#include <cstdio>

#include "rcp_launcher.h"

namespace {

// Appends one character in its escaped form; blanks are escaped only in keys
// (a blank ends a key in the reader).
void appendEscaped(wstring& out, wchar_t c, bool escapeBlank) {
    switch (c) {
        case L'#':
        case L'!':
        case L'=':
        case L':':
            out += L'\\';
            out += c;
            return;
        case L'\\':
            out += L"\\\\";
            return;
        case L' ':
            if (escapeBlank) out += L'\\';
            out += c;
            return;
        default:
            break;
    }
    // wchar_t is signed here: compare on the unsigned code.
    const unsigned int code = static_cast<unsigned int>(c);
    if (code >= 0x20 && code <= 0x7E) {
        out += c;
    } else {
        out += L"\\u";
        addHexDigits(out, code);
    }
}

}  // namespace

void addHexDigits(wstring& out, unsigned int code) {
    // The last four digits of "%04x": codes above U+FFFF keep their low 16
    // bits, there is no surrogate-pair form.
    static const wchar_t hexDigits[] = L"0123456789abcdef";
    for (int shift = 12; shift >= 0; shift -= 4) out += hexDigits[(code >> shift) & 0xFU];
}

size_t convWcharTo8859_1_Key(const wstring& key, wstring& out) {
    out.reserve(out.length() + key.length());
    for (wchar_t c : key) appendEscaped(out, c, true);
    return key.length();
}

size_t convWcharTo8859_1_Value(const wstring& value, wstring& out) {
    out.reserve(out.length() + value.length());
    for (wchar_t c : value) appendEscaped(out, c, false);
    return value.length();
}

void convWcharTo8859_1(const wstring& key, const wstring& value, wstring& out) {
    convWcharTo8859_1_Key(key, out);
    out += EQUALS_CHAR;
    convWcharTo8859_1_Value(value, out);
}

FILE* open_prop_file(FILE*& fp, const char* path, const char* mode) {
    fp = (path != nullptr && mode != nullptr) ? fopen(path, mode) : nullptr;
    return fp;
}
