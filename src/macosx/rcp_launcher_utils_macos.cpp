// Conversions between the launcher's wide strings and the locale's multibyte
// encoding, and the environment look-ups.
//
// The conversions never fail: a byte that is not valid in the locale's
// encoding becomes U+DC00 + byte on the way in and that byte again on the way
// out, so a file name or argument in any encoding reaches the system exactly
// as it arrived.
#include <fcntl.h>
#include <langinfo.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <cwchar>

#include "rcp_launcher.h"

namespace {

constexpr wchar_t ESCAPE_LOW = 0xDC80;
constexpr wchar_t ESCAPE_HIGH = 0xDCFF;

// In UTF-8 every byte below 0x80 is the character of the same code and never
// part of a longer sequence, and the encoding has no shift state: such bytes
// need no trip through mbrtowc/wcrtomb, which costs more than the rest of
// reading a properties line. Other encodings take the general path.
bool localeIsUtf8() {
    const char* codeset = nl_langinfo(CODESET);
    return codeset != nullptr && strcmp(codeset, "UTF-8") == 0;
}

// Decodes into out, whose storage is reused (a line reader calls this once
// per line).
void decodeMultibyte(const char* cs, std::wstring& out) {
    out.clear();
    if (cs == nullptr) return;
    size_t len = strlen(cs);
    out.reserve(len);
    const bool utf8 = localeIsUtf8();
    mbstate_t state;
    memset(&state, 0, sizeof state);
    size_t i = 0;
    while (i < len) {
        if (utf8 && static_cast<unsigned char>(cs[i]) < 0x80) {
            size_t end = i + 1;
            while (end < len && static_cast<unsigned char>(cs[end]) < 0x80) ++end;
            const size_t at = out.size();
            out.resize(at + (end - i));
            for (size_t k = i; k < end; ++k) out[at + (k - i)] = static_cast<wchar_t>(cs[k]);
            i = end;
            continue;
        }
        wchar_t wc = 0;
        size_t n = mbrtowc(&wc, cs + i, len - i, &state);
        if (n == static_cast<size_t>(-1) || n == static_cast<size_t>(-2) || n == 0) {
            // Invalid or truncated sequence: keep the byte itself.
            out += static_cast<wchar_t>(0xDC00 + static_cast<unsigned char>(cs[i]));
            memset(&state, 0, sizeof state);
            ++i;
            continue;
        }
        out += wc;
        i += n;
    }
}

// Returns false when some character had no multibyte form ('?' written).
bool encodeMultibyte(const wchar_t* wcs, std::string& out) {
    out.clear();
    if (wcs == nullptr) return true;
    bool ok = true;
    const bool utf8 = localeIsUtf8();
    mbstate_t state;
    memset(&state, 0, sizeof state);
    char buf[MB_LEN_MAX];
    for (const wchar_t* p = wcs; *p != 0; ++p) {
        if (utf8 && *p > 0 && *p < 0x80) {
            const wchar_t* end = p + 1;
            while (*end > 0 && *end < 0x80) ++end;
            const size_t at = out.size();
            out.resize(at + static_cast<size_t>(end - p));
            for (const wchar_t* q = p; q < end; ++q) out[at + static_cast<size_t>(q - p)] = static_cast<char>(*q);
            p = end - 1;  // the loop steps onto end
            continue;
        }
        if (*p >= ESCAPE_LOW && *p <= ESCAPE_HIGH) {
            out += static_cast<char>(*p - 0xDC00);
            continue;
        }
        size_t n = wcrtomb(buf, *p, &state);
        if (n == static_cast<size_t>(-1)) {
            out += '?';
            ok = false;
            memset(&state, 0, sizeof state);
            continue;
        }
        out.append(buf, n);
    }
    return ok;
}

void replaceEveryChar(std::wstring& in, wchar_t from, wchar_t to) {
    for (size_t pos = in.find(from); pos != std::wstring::npos; pos = in.find(from, pos)) in[pos] = to;
}

}  // namespace

String chartowcs(const char* cs) {
    std::wstring wide;
    decodeMultibyte(cs, wide);
    return copyString(wide.c_str());
}

const wchar_t* chartowstr(const char* cs, std::wstring& wstr) {
    decodeMultibyte(cs, wstr);
    return wstr.c_str();
}

int wstrtocs(std::string& str, const std::wstring& wstr) {
    bool ok = encodeMultibyte(wstr.c_str(), str);
    return ok ? static_cast<int>(str.size()) : -1;
}

void wcstochar(std::string& str, const wchar_t* wcs) { encodeMultibyte(wcs, str); }

void convertBS2S(std::wstring& in) { replaceEveryChar(in, L'\\', L'/'); }

void convertToOsSeparator(std::wstring& in) { convertBS2S(in); }

void convertS2BS(std::wstring& in) { replaceEveryChar(in, L'/', BS_CHAR[0]); }

void open_file(FILE*& inX, const wchar_t* file, const wchar_t* mode) {
    inX = nullptr;
    std::string nfile, nmode;
    wcstochar(nfile, file);
    wcstochar(nmode, mode);
    const int flags = nmode == "r" ? O_RDONLY : nmode == "r+" ? O_RDWR : -1;
    if (flags == -1) {
        errno = EINVAL;
        return;
    }
    const int fd = openRegularFile(nfile.c_str(), flags);
    if (fd < 0) return;
    inX = fdopen(fd, nmode.c_str());
    if (inX == nullptr) {
        const int err = errno;
        close(fd);
        errno = err;
        return;
    }
    fwide(inX, -1);
}

const wchar_t* getEnv(const wchar_t* var, std::wstring& value) {
    std::string name;
    wstrtocs(name, var ? var : L"");
    const char* v = getenv(name.c_str());
    if (v != nullptr) return chartowstr(v, value);
    value.clear();
    SvcDebugOutW(L"RLNCH0081I:  Environmental variable '%s' is not set\n", var);
    return nullptr;
}

bool userIsAdmin(const wchar_t* /*user*/) { return getuid() == 0; }

std::wstring formatWithoutArgs(const std::wstring& fmt) {
    std::wstring out;
    out.reserve(fmt.size());
    for (size_t i = 0; i < fmt.size(); ++i) {
        if (fmt[i] == L'%' && i + 1 < fmt.size() && fmt[i + 1] == L'%') ++i;
        out += fmt[i];
    }
    return out;
}
