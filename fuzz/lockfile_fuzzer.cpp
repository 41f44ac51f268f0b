// Arbitrary bytes as the platform lock file. Anyone who can write the
// workspace can put anything there, and a crashed launcher can leave a half
// written id. The reader must take exactly what fscanf("%ld") would take
// (blanks, an optional sign, digits; out-of-range values clamped) without
// ever reading past the file, and a process id written by the launcher
// over any old content must read back as written.
#include <climits>
#include <cstdint>
#include <cstring>
#include <string>

#include "fuzz_common.h"

namespace {

// What the lock file means, worked out independently of the reader with
// strtol on the bytes: EOF (only white space), 0 (no number first), or 1.
int expectedRead(const std::string& bytes, long& value) {
    size_t i = 0;
    while (i < bytes.size() && isspace(static_cast<unsigned char>(bytes[i]))) ++i;
    if (i == bytes.size()) return EOF;
    size_t digit = i;
    if (bytes[digit] == '+' || bytes[digit] == '-') ++digit;
    if (digit == bytes.size() || !isdigit(static_cast<unsigned char>(bytes[digit]))) return 0;
    // The number ends at the first non-digit, which a NUL byte is as well.
    std::string number = bytes.substr(i, std::string::npos);
    number = number.c_str();
    value = strtol(number.c_str(), nullptr, 10);
    return 1;
}

std::string fileBytes() {
    std::string bytes;
    FILE* fp = fopen(rcpfuzz::scratchFile().c_str(), "rb");
    FUZZ_CHECK(fp != nullptr);
    char buf[4096];
    size_t n;
    while ((n = fread(buf, 1, sizeof buf, fp)) > 0) bytes.append(buf, n);
    fclose(fp);
    return bytes;
}

// The reader agrees with the meaning of whatever the file holds now.
void checkRead() {
    const std::string bytes = fileBytes();
    long expected = 0;
    const int want = expectedRead(bytes, expected);
    long pid = -12345;
    const int got = readLockFilePid(&pid);
    FUZZ_CHECK(got == want);
    if (got == 1) FUZZ_CHECK(pid == expected);
    if (got != 1) FUZZ_CHECK(pid == -12345);  // nothing stored without a number
    // Ids that cannot name one process are never reported alive (kill would
    // answer for a whole process group or for nothing).
    if (got == 1 && (pid <= 0 || pid > INT_MAX)) FUZZ_CHECK(!isProcessAlive(pid));
    // A file without a number is fatal for checkLockFile; the others answer.
    if (got == EOF) FUZZ_CHECK(!checkLockFile());
    if (got == 1) checkLockFile();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    rcpfuzz::resetLog(false);
    rcpfuzz::writeScratch(data, size);
    chartowstr(rcpfuzz::scratchFile().c_str(), lockFilePath);
    createAndOpenLockFile();
    FUZZ_CHECK(lockFILE != nullptr);
    checkRead();

    // The main launcher records its child over whatever was there: the id
    // and ten blanks from the start, the rest of the old content untouched,
    // and the id reads back exactly.
    const int childPid = static_cast<int>(1 + (size * 2654435761u + (size ? data[0] : 0)) % 4194303u);
    const std::string written = std::to_string(childPid) + std::string(10, ' ');
    setMainProcess(true);
    populateLockFile(childPid);
    std::string bytes = fileBytes();
    FUZZ_CHECK(bytes.size() == (size > written.size() ? size : written.size()));
    FUZZ_CHECK(bytes.compare(0, written.size(), written) == 0);
    if (size > written.size())
        FUZZ_CHECK(bytes.compare(written.size(), std::string::npos, reinterpret_cast<const char*>(data) + written.size(),
                                 size - written.size()) == 0);
    long pid = 0;
    FUZZ_CHECK(readLockFilePid(&pid) == 1 && pid == childPid);

    // A secondary launcher writes nothing.
    setMainProcess(false);
    populateLockFile(childPid + 1);
    FUZZ_CHECK(fileBytes() == bytes);

    // Blanking the id leaves a file that is read consistently, whatever
    // followed the id.
    invalidateLockFile();
    bytes = fileBytes();
    FUZZ_CHECK(bytes.compare(0, 14, std::string(14, ' ')) == 0);
    checkRead();
    return 0;
}
