// The startup record (args.properties), which lets the platform start the
// launcher again exactly as it was started.
#include <cwchar>
#include <string>

#include "rcp_launcher.h"

namespace {

// One escaped "key=value" line of the record.
void appendRecordLine(wstring& record, const wstring& key, const wstring& value) {
    convWcharTo8859_1(key, value, record);
    record += NEWLINE;
}

// Longest record worth comparing with before it is rewritten; a longer one
// is simply written again.
constexpr size_t RECORD_COMPARE_LIMIT = 64 * 1024;

}  // namespace

void writeStartupArgs(int argc, wchar_t** argv, const wstring& configLocation) {
    const wstring tfile = joinPath(configLocation, ARGS_PROPERTIES);

    // The platform adds these itself when it restarts the launcher; recording
    // them would make every later start a restart or a reset.
    const int restartIndex = findOption(RESTARTARG, argc, argv);
    const int resetIndex = findOption(RESETCONFIGARG, argc, argv);

    wstring record;
    int writeNum = 0;
    for (int i = 0; i < argc; i++) {
        if (i == restartIndex || i == resetIndex) continue;
        wstring value;
        if (i == 0) {
            // The path as typed may be relative or found through PATH; the
            // record must work from any directory.
            getLauncherPath(value);
        } else {
            value = argv[i];
        }
        appendRecordLine(record, ARG_KEY_PREFIX + std::to_wstring(writeNum++), value);
    }
    appendRecordLine(record, ARGC_KEY, std::to_wstring(writeNum));

    // Most launches are started the same way as the one before: a record that
    // already says this is left alone, which costs a read instead of a write.
    std::string recordBytes;
    wstrtocs(recordBytes, record);
    std::string existing;
    if (readSmallFile(tfile, existing, RECORD_COMPARE_LIMIT) && existing == recordBytes) return;

    // Otherwise the new record replaces the old one only once it is complete:
    // a failed write (a full disk) leaves the previous record as it was.
    const wstring work = tfile + WORK_FILE_SUFFIX;
    FILE* fp = createWorkFile(work);
    if (fp == nullptr) fatalErrorExit("RLNCH0019E: Could not open %ls for writing!", tfile.c_str());
    putWide(fp, record);
    if (!commitWorkFile(fp, work, tfile)) fatalErrorExit("RLNCH0020E: Error writing to %ls file.", tfile.c_str());
}
