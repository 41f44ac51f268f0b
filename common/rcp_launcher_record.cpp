// The startup record (args.properties), which lets the platform start the
// launcher again exactly as it was started, and a few small locations and
// values the other modules need: the log directory of a workspace, the path
// of a per-configuration template file and the time stamp used for new
// installation identifiers.
#include <sys/stat.h>
#include <sys/time.h>
#include <unistd.h>

#include <cwchar>
#include <string>

#include "rcp_launcher.h"

namespace {

// Template files live below <core>/config/<sub-folder>; the sub-folder
// depends on the install configuration.
const wchar_t* coreSubFolder() {
    switch (eConfig) {
        case multiuser_service:
            return CORE_SUBDIR_MUSERVICE;
        case user:
        case multiuser:
        case lockdown:
            return CORE_SUBDIR_USER;
        case userpb:
            return CORE_SUBDIR_PBUILDER;
        default:
            return L"";
    }
}

// One escaped "key=value" line of the record; a failed write ends the launch
// (false is returned only should the fatal path ever come back).
bool writeRecordLine(FILE* fp, const wstring& key, const wstring& value, const wstring& tfile) {
    wstring line;
    convWcharTo8859_1(key, value, line);
    if (fwprintf(fp, L"%ls\n", line.c_str()) < 0) {
        fclose(fp);
        fatalErrorA("RLNCH0020E: Error writing to %ls file.", tfile.c_str(), true);
        return false;
    }
    return true;
}

}  // namespace

void writeStartupArgs(int argc, wchar_t** argv, const wstring& configLocation) {
    wstring tfile = configLocation + L"/" + ARGS_PROPERTIES;
    convertToOsSeparator(tfile);

    // An existing record is written over and cut to the new length at the
    // end rather than emptied first: emptying a file that is then rewritten
    // makes some file systems (ext4) free its blocks and force the new ones to
    // disk on close, which is most of what writing the record would cost.
    FILE* fp = nullptr;
    open_wfile(fp, tfile.c_str(), L"r+");
    if (fp == nullptr) open_wfile(fp, tfile.c_str(), L"w+");
    if (fp == nullptr) {
        fatalErrorA("RLNCH0019E: Could not open %ls for writing!", tfile.c_str(), true);
        return;
    }

    // The platform adds these itself when it restarts the launcher; recording
    // them would make every later start a restart or a reset.
    const int restartIndex = findOption(RESTARTARG, argc, argv);
    const int resetIndex = findOption(RESETCONFIGARG, argc, argv);

    int writeNum = 0;
    for (int i = 0; i < argc; i++) {
        if (i == restartIndex || i == resetIndex) continue;
        wstring key = ARG_KEY_PREFIX + std::to_wstring(writeNum);
        writeNum++;
        wstring value;
        if (i == 0) {
            // The path as typed may be relative or found through PATH; the
            // record must work from any directory.
            getLauncherPath(value);
        } else if (argv[i] != nullptr) {
            value = argv[i];
        }
        if (!writeRecordLine(fp, key, value, tfile)) return;
    }
    if (!writeRecordLine(fp, ARGC_KEY, std::to_wstring(writeNum), tfile)) return;

    // A full disk shows up only when the buffer is flushed.
    bool written = fflush(fp) == 0;
    if (written) {
        // Only a regular file longer than the new record has anything to cut.
        const off_t length = lseek(fileno(fp), 0, SEEK_CUR);
        struct stat st;
        if (length >= 0 && fstat(fileno(fp), &st) == 0 && S_ISREG(st.st_mode) && st.st_size > length)
            written = ftruncate(fileno(fp), length) == 0;
    }
    if (fclose(fp) != 0 || !written) fatalErrorA("RLNCH0020E: Error writing to %ls file.", tfile.c_str(), true);
}

void getLogLocation(wstring& logLocation, const wstring& workspaceLocation) {
    logLocation = workspaceLocation + L"/" + LOG_DIR;
    convertToOsSeparator(logLocation);
}

wstring getCoreFileLocation(const wstring& coreLocation, const wchar_t* filename) {
    const wstring name = filename != nullptr ? filename : L"";
    // An empty sub-folder deliberately leaves "config//name": the path is
    // still valid and matches what existing installations expect.
    wstring candidate = coreLocation + L"/" + CORE_CONFIG_DIR + L"/" + coreSubFolder() + L"/" + name;
    convertToOsSeparator(candidate);
    if (exists(candidate.c_str())) return candidate;

    wstring fallback = coreLocation + L"/" + name;
    convertToOsSeparator(fallback);
    return fallback;
}

unsigned long getTick() {
    struct timeval tv {};
    gettimeofday(&tv, nullptr);
    return static_cast<unsigned long>(tv.tv_sec);
}

wchar_t* getTickString(wchar_t* wsticks, size_t size) {
    if (wsticks == nullptr || size == 0) return wsticks;
    if (swprintf(wsticks, size, L"%lu", getTick()) < 0) wsticks[0] = 0;  // too small: empty, never unterminated
    return wsticks;
}
