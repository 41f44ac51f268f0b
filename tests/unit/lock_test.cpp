// The platform lock file, the one place that checks its format: what its
// content means for the launcher that takes the lock, and how ids are written
// over older ones.
#include <fcntl.h>

#include "unit_support.h"

// <dir>/.rcp.lock holding content, opened as a launch opens it (which closes
// the one opened before).
static std::string openLock(const TempDir& dir, const std::string& content) {
    writeText(dir.sub(".rcp.lock"), content, 0600);
    lockFilePath = W(dir.sub(".rcp.lock"));
    createAndOpenLockFile();
    return dir.sub(".rcp.lock");
}

TEST(LockTest, ContentDecidesMainOrSecondary) {
    TempDir ws;
    const std::string self = std::to_string(getpid()), blanks(10, ' '), none = "2147483647";  // above any pid_max
    const std::tuple<std::string, bool, bool> cases[] = {  // content, a platform runs, "no data"; 1 is another user's
        {"", false, true}, {std::string(14, ' '), false, true}, {" \n\t \n", false, true}, {"   " + self, true, false},
        {"+" + self, true, false}, {std::string(40, '0') + self, true, false}, {"1" + blanks, true, false},
        {"0" + blanks, false, false}, {"-1", false, false}, {"99999999999999999999999999", false, false},
        {none + blanks, false, false}};
    for (const auto& [content, running, noData] : cases) {
        resetLoggingForTest();  // debug output on
        setMainProcess(false);
        writeText(ws.sub(".sid"), "marker");  // the main launcher deletes it
        openLock(ws, content);
        lockLockFile(W(ws.sub(".sid")));
        EXPECT_EQ(isMainProcess(), !running) << content;
        EXPECT_EQ(pathExists(ws.sub(".sid")), running) << content;
        EXPECT_EQ(getLogQueue(), "RLNCH0090E: Existing platform lock file found - checking validity.\n" +
                                     std::string(noData ? "RLNCH0091E: No data in the platform lock file.\n" : ""));
    }
    // a program the launcher starts must not keep the lock once the launcher has ended
    EXPECT_NE(fcntl(fileno(lockFILE), F_GETFD) & FD_CLOEXEC, 0);
    expectFatal({{[&] { openLock(ws, "-x12"), checkLockFile(); }, "RLNCH0092E: Error reading platform lock file. : "},
                 {[&] { lockFilePath = W(ws.sub("no/.rcp.lock")), createAndOpenLockFile(); },
                  "RLNCH0199E: CreateLockFile failed. errno=2\nRLNCH0054E: Error locating platform lock file : "}});
}

TEST(LockTest, IdsAreWrittenOverOlderOnesWithoutStrayDigits) {
    TempDir ws;
    const std::string file = openLock(ws, ""), blanks(10, ' ');
    long readBack = 0;
    resetLoggingForTest();  // debug output on: a write that fails would say so
    setMainProcess(false);
    populateLockFile(1234567);  // a secondary launcher writes nothing
    EXPECT_EQ(readText(file), "");
    setMainProcess(true);
    for (int id : {1234567, 12345}) populateLockFile(id);
    EXPECT_EQ(readText(file), "12345  " + blanks);
    EXPECT_EQ(std::make_pair(readLockFilePid(&readBack), readBack), std::make_pair(1, 12345L));
    populateLockFile(42);  // reading and writing alternate on the one stream
    EXPECT_EQ(readText(file), "42     " + blanks);
    invalidateLockFile();
    EXPECT_EQ(readText(file), std::string(17, ' '));
    EXPECT_EQ(readLockFilePid(&readBack), EOF);
    openLock(ws, "77");  // a short file is blanked to 14 characters
    invalidateLockFile();
    EXPECT_EQ(readText(file) + getLogQueue(), std::string(14, ' '));  // and nothing logged
}
