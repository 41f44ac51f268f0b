// The platform lock file: what its content means, how ids are written over
// older ones, and the lock that makes one launcher the main one.
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "unit_support.h"

namespace {

class LockTest : public ::testing::Test {
protected:
    void SetUp() override { resetState(undefined, false); }
    void TearDown() override { closeLock(); }
    static void closeLock() {
        if (lockFILE != nullptr) fclose(lockFILE);
        lockFILE = nullptr;
    }
    // <ws>/.rcp.lock holding content, opened as the launcher opens it.
    void useLockFile(const std::string& content) {
        closeLock();
        writeText(file, content, 0600);
        lockFilePath = widen(file);
        createAndOpenLockFile();
        ASSERT_NE(lockFILE, nullptr);
    }
    TempDir ws;
    const std::string file = ws.sub(".rcp.lock"), blanks = std::string(10, ' ');
};

long endedProcess() {
    pid_t child = fork();
    if (child == 0) _exit(0);
    waitpid(child, nullptr, 0);
    return child;
}

TEST_F(LockTest, ContentDecidesWhetherAPlatformIsRunning) {
    const long dead = endedProcess();
    const std::tuple<std::string, bool, bool> cases[] = {  // content, running, "no data" line
        {"", false, true}, {std::string(14, ' '), false, true}, {" \n\t \n", false, true},
        {std::to_string(dead) + blanks, false, false}, {"   " + std::to_string(getpid()), true, false},
        {"+" + std::to_string(getpid()), true, false}, {"1" + blanks, true, false},  // another user's process is alive
        {"0" + blanks, false, false}, {"-1", false, false}, {"99999999999999999999999999", false, false}};
    for (const auto& [content, running, noData] : cases) {
        resetLoggingForTest();
        useLockFile(content);
        EXPECT_EQ(checkLockFile(), running) << content;
        const std::string& log = getLogQueue();
        EXPECT_NE(log.find("RLNCH0090E: Existing platform lock file found - checking validity.\n"), std::string::npos);
        EXPECT_EQ(log.find("RLNCH0091E: No data in the platform lock file.\n") != std::string::npos, noData);
    }
    useLockFile(std::to_string(dead) + blanks);
    checkLockFile();
    EXPECT_EQ(pid, dead);  // the id read is kept for a secondary launch
    std::vector<Fatal> fatal;
    for (const char* content : {"abc", "pid=5", "-x12", "\n\n#12"})
        fatal.push_back({[this, content] { useLockFile(content); checkLockFile(); },
                         "RLNCH0092E: Error reading platform lock file. : "});
    WArgs args{L"rcplauncher"};
    for (const char* message : {"RLNCH0199E: CreateLockFile failed. errno=2\n", "RLNCH0054E: Error locating platform lock file : "})
        fatal.push_back({[&] { locateLockFile(1, args.argv(), ws.wsub("no/such")); }, message});
    expectFatal(fatal);
}

TEST_F(LockTest, IdsAreWrittenOverOlderOnesWithoutStrayDigits) {
    useLockFile("");
    setMainProcess(true);
    populateLockFile(1234567);
    EXPECT_EQ(readText(file), "1234567" + blanks);
    populateLockFile(12345);
    EXPECT_EQ(readText(file), "12345  " + blanks);
    long readBack = 0;
    EXPECT_EQ(readLockFilePid(&readBack), 1);
    EXPECT_EQ(readBack, 12345);
    populateLockFile(42);  // reading and writing alternate on the one stream
    EXPECT_EQ(readText(file), "42     " + blanks);
    invalidateLockFile();
    EXPECT_EQ(readText(file), std::string(17, ' '));
    EXPECT_EQ(readLockFilePid(&readBack), EOF);
    useLockFile("77");  // a short file is blanked to 14 characters
    invalidateLockFile();
    EXPECT_EQ(readText(file), std::string(14, ' '));
}

TEST_F(LockTest, LockingDecidesMainOrSecondary) {
    writeText(ws.sub(".sid"), "marker");  // a secondary launcher keeps the marker
    useLockFile(std::to_string(getpid()));
    lockLockFile(ws.wsub(".sid"));
    EXPECT_TRUE(!isMainProcess() && pathExists(ws.sub(".sid")));
    unlockLockFile();
    closeLock();
    writeText(ws.sub("sub/.sid"), "m");
    WArgs args{L"rcplauncher"};
    locateLockFile(args.argc(), args.argv(), ws.wpath() + L"\\sub");  // creates the file, main deletes the marker
    EXPECT_EQ(lockFilePath, ws.wsub("sub/.rcp.lock"));
    EXPECT_TRUE(isMainProcess() && pathExists(ws.sub("sub/.rcp.lock")) && !pathExists(ws.sub("sub/.sid")));
    // a program the launcher starts must not keep the lock once the launcher has ended
    EXPECT_NE(fcntl(fileno(lockFILE), F_GETFD) & FD_CLOEXEC, 0);
    unlockLockFile();
}

}  // namespace
