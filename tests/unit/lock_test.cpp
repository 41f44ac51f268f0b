// The platform lock file: what its content means, how ids are written over
// older ones, the exclusive lock between launchers, and the restart wait.
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <clocale>
#include <climits>
#include <cstdio>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::TempDir;
using rcptest::WArgs;
using rcptest::pathExists;
using rcptest::readText;
using rcptest::widen;
using rcptest::writeText;

namespace {

class LockTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        closeLock();
        setMainProcess(false);
        pid = 0;
        lockFilePath.clear();
    }
    void TearDown() override { closeLock(); }

    static void closeLock()
    {
        if (lockFILE != nullptr) {
            fclose(lockFILE);
            lockFILE = nullptr;
        }
    }

    // Points the lock at <ws>/.rcp.lock holding content, opened as the
    // launcher opens it.
    void useLockFile(const TempDir& ws, const std::string& content)
    {
        writeText(ws.sub(".rcp.lock"), content, 0600);
        lockFilePath = ws.wsub(".rcp.lock");
        createAndOpenLockFile();
        ASSERT_NE(lockFILE, nullptr);
    }
};

// A process id that was in use a moment ago and is free now.
long deadPid()
{
    pid_t child = fork();
    if (child == 0) {
        _exit(0);
    }
    waitpid(child, nullptr, 0);
    return child;
}

// A child that lives until killed; reaped by stopChild.
pid_t liveChild()
{
    pid_t child = fork();
    if (child == 0) {
        for (;;) {
            pause();
        }
    }
    return child;
}

void stopChild(pid_t child)
{
    kill(child, SIGKILL);
    waitpid(child, nullptr, 0);
}

bool contains(const std::string& text, const std::string& part)
{
    return text.find(part) != std::string::npos;
}

TEST_F(LockTest, ContentDecidesWhetherAPlatformIsRunning)
{
    TempDir ws;
    pid_t alive = liveChild();
    long dead = deadPid();
    struct Case {
        const char* name;
        std::string content;
        bool running;
        bool noDataLine;
    } cases[] = {
        {"new, empty file", "", false, true},
        {"invalidated: 14 blanks", std::string(14, ' '), false, true},
        {"only white space and line ends", " \n\t \n", false, true},
        {"a process that has ended", std::to_string(dead) + std::string(10, ' '), false, false},
        {"a live child", std::to_string(alive) + std::string(10, ' '), true, false},
        {"this very process, after blanks", "   " + std::to_string(getpid()), true, false},
        {"signed live id", "+" + std::to_string(alive), true, false},
        {"id of another user's process (init)", "1          ", true, false},
        {"zero names no single process", "0          ", false, false},
        {"negative id", "-1", false, false},
        {"beyond any process id", "99999999999999999999999999", false, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        resetLoggingForTest();
        useLockFile(ws, c.content);
        EXPECT_EQ(checkLockFile(), c.running);
        const std::string& log = getLogQueue();
        EXPECT_TRUE(contains(log, "RLNCH0090E: Existing platform lock file found - checking validity.\n"));
        EXPECT_EQ(contains(log, "RLNCH0091E: No data in the platform lock file.\n"), c.noDataLine);
        closeLock();
    }
    stopChild(alive);

    // The id that was read is kept for the secondary launch.
    useLockFile(ws, std::to_string(dead) + "          ");
    checkLockFile();
    EXPECT_EQ(pid, dead);
    closeLock();

    // Without a file nothing is read and nothing logged.
    resetLoggingForTest();
    lockFilePath = ws.wsub("absent/.rcp.lock");
    EXPECT_FALSE(checkLockFile());
    EXPECT_EQ(getLogQueue(), "");
}

TEST_F(LockTest, ProcessesOfOtherUsersCountAsAlive)
{
    // As root kill(pid, 0) always succeeds; the EPERM answer only shows
    // without privileges, so ask from a child that dropped them.
    pid_t child = fork();
    if (child == 0) {
        if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0)) {
            _exit(77);
        }
        errno = 0;
        bool permDenied = kill(1, 0) != 0 && errno == EPERM;
        if (!permDenied) {
            _exit(78);
        }
        _exit(isProcessAlive(1) ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    ASSERT_TRUE(WIFEXITED(status));
    if (WEXITSTATUS(status) == 77 || WEXITSTATUS(status) == 78) {
        GTEST_SKIP() << "no process of another user to test against";
    }
    EXPECT_EQ(WEXITSTATUS(status), 0);
    EXPECT_FALSE(isProcessAlive(deadPid()));
    EXPECT_TRUE(isProcessAlive(getpid()));
}

TEST_F(LockTest, ContentThatIsNotANumberEndsTheLaunch)
{
    TempDir ws;
    const char* contents[] = {"abc", "pid=5", "-x12", "\n\n#12"};
    int n = 0;
    for (const char* content : contents) {
        SCOPED_TRACE(content);
        std::string logDir = ws.sub("log" + std::to_string(n++));
        rcptest::makeDirs(logDir);
        useLockFile(ws, content);
        std::wstring wlog = widen(logDir);
        EXPECT_EXIT(
            {
                enableLogging(wlog);
                checkLockFile();
            },
            ::testing::ExitedWithCode(255), "");
        EXPECT_TRUE(contains(readText(logDir + "/rcplauncher.log"), "RLNCH0092E: Error reading platform lock file. : "));
        closeLock();
    }
}

TEST_F(LockTest, IdsAreWrittenOverOlderOnesWithoutStrayDigits)
{
    TempDir ws;
    std::string file = ws.sub(".rcp.lock");
    useLockFile(ws, "");

    setMainProcess(true);
    populateLockFile(1234567);
    EXPECT_EQ(readText(file), "1234567          ");
    populateLockFile(12345);
    EXPECT_EQ(readText(file), "12345" + std::string(12, ' '));
    long readBack = 0;
    EXPECT_EQ(readLockFilePid(&readBack), 1);
    EXPECT_EQ(readBack, 12345);
    // Reading and writing alternate on the one stream.
    populateLockFile(42);
    EXPECT_EQ(readLockFilePid(&readBack), 1);
    EXPECT_EQ(readBack, 42);
    EXPECT_EQ(readText(file), "42" + std::string(15, ' '));

    invalidateLockFile();
    EXPECT_EQ(readText(file), std::string(17, ' '));
    EXPECT_EQ(readLockFilePid(&readBack), EOF);

    // A secondary launcher never records its child.
    setMainProcess(false);
    populateLockFile(999);
    EXPECT_EQ(readText(file), std::string(17, ' '));

    // A short file is blanked to 14 characters.
    closeLock();
    useLockFile(ws, "77");
    invalidateLockFile();
    EXPECT_EQ(readText(file), std::string(14, ' '));
    resetLoggingForTest();
    EXPECT_FALSE(checkLockFile());
}

TEST_F(LockTest, LockingDecidesMainOrSecondaryAndClearsTheMarker)
{
    TempDir ws;
    pid_t alive = liveChild();
    struct Case {
        const char* name;
        std::string content;
        bool main;
    } cases[] = {
        {"empty file", "", true},
        {"stale id", std::to_string(deadPid()) + "          ", true},
        {"running platform", std::to_string(alive) + "          ", false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        setMainProcess(false);
        writeText(ws.sub(".sid"), "marker");
        useLockFile(ws, c.content);
        lockLockFile(ws.wsub(".sid"));
        EXPECT_EQ(isMainProcess(), c.main);
        EXPECT_EQ(pathExists(ws.sub(".sid")), !c.main) << "only a main process deletes the marker";
        unlockLockFile();
        closeLock();
    }
    stopChild(alive);
}

// Whether another process could take the lock right now.
bool otherProcessCanLock(const std::string& file)
{
    pid_t child = fork();
    if (child == 0) {
        int fd = open(file.c_str(), O_RDWR);
        if (fd < 0) {
            _exit(2);
        }
        _exit(flock(fd, LOCK_EX | LOCK_NB) == 0 ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

TEST_F(LockTest, TheLockExcludesOtherLaunchersUntilReleased)
{
    TempDir ws;
    std::string file = ws.sub(".rcp.lock");
    useLockFile(ws, "");
    EXPECT_TRUE(otherProcessCanLock(file));
    lockLockFile(ws.wsub(".sid"));
    EXPECT_FALSE(otherProcessCanLock(file));
    unlockLockFile();
    EXPECT_TRUE(otherProcessCanLock(file));
}

TEST_F(LockTest, AStartedProgramDoesNotKeepTheLock)
{
    TempDir ws;
    std::string file = ws.sub(".rcp.lock");
    writeText(file, "");
    int ready[2];
    ASSERT_EQ(pipe(ready), 0);
    // A launcher that takes the lock, starts a long-running program and dies
    // without unlocking: its lock must go with it, not live on in the program.
    pid_t launcher = fork();
    if (launcher == 0) {
        close(ready[0]);
        lockFilePath = widen(file);
        createAndOpenLockFile();
        lockLockFile(widen(ws.sub(".sid")));
        pid_t program = fork();
        if (program == 0) {
            execl("/bin/sleep", "sleep", "30", static_cast<char*>(nullptr));
            _exit(127);
        }
        std::string id = std::to_string(program) + "\n";
        if (write(ready[1], id.data(), id.size()) < 0) {
            _exit(3);
        }
        _exit(0);
    }
    close(ready[1]);
    char buf[32] = {0};
    ssize_t got = read(ready[0], buf, sizeof(buf) - 1);
    close(ready[0]);
    waitpid(launcher, nullptr, 0);
    ASSERT_GT(got, 0);
    pid_t program = static_cast<pid_t>(atol(buf));
    ASSERT_GT(program, 0);
    std::this_thread::sleep_for(std::chrono::milliseconds(200));  // let exec happen
    EXPECT_EQ(kill(program, 0), 0) << "the started program is still running";
    EXPECT_TRUE(otherProcessCanLock(file));
    kill(program, SIGKILL);
}

TEST_F(LockTest, LocateCreatesTheFileAndMakesTheFirstLauncherMain)
{
    TempDir ws;
    writeText(ws.sub(".sid"), "m");
    WArgs args{L"rcplauncher", L"-data", ws.wpath()};
    locateLockFile(args.argc(), args.argv(), ws.wpath());
    EXPECT_EQ(lockFilePath, ws.wsub(".rcp.lock"));
    std::wstring copy;
    getLockFilePath(copy);
    EXPECT_EQ(copy, lockFilePath);
    ASSERT_NE(lockFILE, nullptr);
    EXPECT_TRUE(pathExists(ws.sub(".rcp.lock")));
    EXPECT_TRUE(isMainProcess());
    EXPECT_FALSE(pathExists(ws.sub(".sid")));
    EXPECT_FALSE(otherProcessCanLock(ws.sub(".rcp.lock")));
    EXPECT_NE(fcntl(fileno(lockFILE), F_GETFD) & FD_CLOEXEC, 0);
    unlockLockFile();

    // Backslashes in the workspace path are turned into separators.
    closeLock();
    std::wstring backslashed = ws.wpath() + L"\\sub";
    rcptest::makeDirs(ws.sub("sub"));
    locateLockFile(args.argc(), args.argv(), backslashed);
    EXPECT_EQ(lockFilePath, ws.wsub("sub/.rcp.lock"));
    EXPECT_TRUE(pathExists(ws.sub("sub/.rcp.lock")));
    unlockLockFile();
}

TEST_F(LockTest, ALockFileThatCannotBeOpenedEndsTheLaunch)
{
    TempDir ws;
    std::wstring wlog = ws.wpath();
    std::wstring missing = ws.wsub("no/such/workspace");
    WArgs args{L"rcplauncher"};
    EXPECT_EXIT(
        {
            enableLogging(wlog);
            locateLockFile(args.argc(), args.argv(), missing);
        },
        ::testing::ExitedWithCode(255), "");
    std::string log = readText(ws.sub("rcplauncher.log"));
    EXPECT_TRUE(contains(log, "RLNCH0199E: CreateLockFile failed. errno=2\n")) << log;
    EXPECT_TRUE(contains(log, "RLNCH0054E: Error locating platform lock file : ")) << log;
}

double secondsToLocate(WArgs& args, const TempDir& ws)
{
    auto start = std::chrono::steady_clock::now();
    locateLockFile(args.argc(), args.argv(), ws.wpath());
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

TEST_F(LockTest, RestartWaitsForTheOldPlatformToEnd)
{
    TempDir ws;
    WArgs args{L"rcplauncher", L"-restart"};

    // Old platform ends after about two seconds: the wait stops then.
    pid_t ending = fork();
    if (ending == 0) {
        sleep(2);
        _exit(0);
    }
    std::thread reaper([ending]() { waitpid(ending, nullptr, 0); });
    writeText(ws.sub(".rcp.lock"), std::to_string(ending) + "          ");
    double waited = secondsToLocate(args, ws);
    reaper.join();
    EXPECT_GE(waited, 2.0);
    EXPECT_LT(waited, 8.0);
    EXPECT_TRUE(isMainProcess());
    EXPECT_FALSE(contains(getLogQueue(), "RLNCH0013E"));
    unlockLockFile();
    closeLock();

    // Nothing recorded: one second and no more.
    resetLoggingForTest();
    setMainProcess(false);
    writeText(ws.sub(".rcp.lock"), "");
    waited = secondsToLocate(args, ws);
    EXPECT_GE(waited, 1.0);
    EXPECT_LT(waited, 3.0);
    EXPECT_TRUE(isMainProcess());
    unlockLockFile();
    closeLock();
}

TEST_F(LockTest, RestartDeclaresAPlatformThatKeepsRunningStale)
{
    TempDir ws;
    WArgs args{L"rcplauncher", L"-restart"};
    pid_t stuck = liveChild();
    writeText(ws.sub(".rcp.lock"), std::to_string(stuck) + "          ");
    double waited = secondsToLocate(args, ws);
    stopChild(stuck);
    EXPECT_GE(waited, 19.0);
    EXPECT_LT(waited, 26.0);
    EXPECT_TRUE(contains(getLogQueue(),
                         "RLNCH0013E: Existing platform has not shutdown within allotted time. Invalidating the "
                         "lockfile for new launch.\n"));
    size_t recorded = std::to_string(stuck).size() + 10;
    EXPECT_EQ(readText(ws.sub(".rcp.lock")), std::string(std::max<size_t>(recorded, 14), ' '));
    EXPECT_TRUE(isMainProcess());
    unlockLockFile();
}

}  // namespace
