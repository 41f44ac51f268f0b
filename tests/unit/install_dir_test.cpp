// Installation discovery: the executable's own path, the launcher directory,
// the install and service layouts, and the fatal answers for bad layouts.
//
// The layouts are tested for real: this test program copies itself into a
// sandbox layout (…/rcp/launcher and others) and runs the copy, which answers
// from the probe environment below instead of running tests.
#include <dirent.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <climits>
#include <clocale>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <string>
#include <thread>

#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::TempDir;
using rcptest::WArgs;
using rcptest::narrow;
using rcptest::readText;
using rcptest::widen;
using rcptest::writeText;

namespace {

const char* PROBE_MODE = "RCP_INSTALL_PROBE";
const char* PROBE_OUT = "RCP_INSTALL_PROBE_OUT";
const char* PROBE_LOG = "RCP_INSTALL_PROBE_LOG";
const char* PROBE_ARGV0 = "probe-argv0";

void writeAnswer(const std::string& text)
{
    const char* out = getenv(PROBE_OUT);
    if (out != nullptr) {
        writeText(out, text);
    }
}

// In a copy started by the layout tests: answer one question and end before
// any test runs.
class ProbeEnvironment : public ::testing::Environment {
public:
    void SetUp() override
    {
        const char* mode = getenv(PROBE_MODE);
        if (mode == nullptr) {
            return;
        }
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
        const char* logDir = getenv(PROBE_LOG);
        if (logDir != nullptr) {
            enableLogging(widen(logDir));
        }
        std::string m = mode;
        WArgs args{widen(PROBE_ARGV0)};
        if (m == "install" || m == "deleted") {
            if (m == "deleted") {
                std::string self;
                read_executable_path(self);
                unlink(self.c_str());
                rmdir(self.substr(0, self.rfind('/')).c_str());
            }
            std::wstring installDir = L"unchanged";
            getInstallDir(installDir, args.argc(), args.argv());
            writeAnswer(narrow(installDir));
        } else if (m == "service") {
            std::wstring serviceDir = L"(none)", installDir = L"(none)";
            getServiceInstallDir(serviceDir, installDir, args.argc(), args.argv());
            writeAnswer(narrow(serviceDir) + "\n" + narrow(installDir));
        }
        _exit(0);
    }
};

const ::testing::Environment* const probe = ::testing::AddGlobalTestEnvironment(new ProbeEnvironment);

std::string realPath(const std::string& p)
{
    char* r = realpath(p.c_str(), nullptr);
    std::string out = r ? r : "";
    free(r);
    return out;
}

std::string selfPath()
{
    return realPath("/proc/self/exe");
}

void copySelfTo(const std::string& target)
{
    writeText(target, readText(selfPath()), 0755);
}

struct ProbeResult {
    int exitCode = -1;
    std::string answer;
    std::string log;
};

// Runs the program at path (through the name it is called by) in probe mode.
ProbeResult runProbe(const std::string& path, const std::string& mode, const TempDir& tmp)
{
    std::string out = tmp.sub("answer");
    std::string logDir = tmp.sub("probe-log");
    rcptest::makeDirs(logDir);
    unlink(out.c_str());
    unlink((logDir + "/rcplauncher.log").c_str());
    pid_t child = fork();
    if (child == 0) {
        setenv(PROBE_MODE, mode.c_str(), 1);
        setenv(PROBE_OUT, out.c_str(), 1);
        setenv(PROBE_LOG, logDir.c_str(), 1);
        if (freopen("/dev/null", "w", stdout) == nullptr || freopen("/dev/null", "w", stderr) == nullptr) {
            _exit(126);
        }
        // One cheap test is selected so that the environment set-up runs.
        execl(path.c_str(), path.c_str(), "--gtest_filter=InstallDir.OperatingSystemNameIsMacosx",
              static_cast<char*>(nullptr));
        _exit(127);
    }
    int status = 0;
    waitpid(child, &status, 0);
    ProbeResult r;
    if (WIFEXITED(status)) {
        r.exitCode = WEXITSTATUS(status);
    }
    r.answer = readText(out);
    r.log = readText(logDir + "/rcplauncher.log");
    return r;
}

size_t depthOf(const std::string& path)
{
    size_t n = 0;
    for (char c : path) {
        n += c == '/';
    }
    return n;
}

TEST(InstallDir, OperatingSystemNameIsMacosx)
{
    EXPECT_STREQ(getOS(), L"macosx");
}

TEST(InstallDir, ExecutablePathIsTheResolvedFileOfThisProcess)
{
    std::string path;
    read_executable_path(path);
    ASSERT_FALSE(path.empty());
    EXPECT_EQ(path[0], '/');
    EXPECT_EQ(realPath(path), path) << "no symbolic link or relative part is left";
    struct stat mine, reported;
    ASSERT_EQ(stat("/proc/self/exe", &mine), 0);
    ASSERT_EQ(stat(path.c_str(), &reported), 0);
    EXPECT_EQ(mine.st_ino, reported.st_ino);
    EXPECT_EQ(mine.st_dev, reported.st_dev);

    std::wstring launcher;
    getLauncherPath(launcher);
    EXPECT_EQ(narrow(launcher), path);

    std::string dir = path.substr(0, path.rfind('/'));
    WArgs args{L"/somewhere/else/entirely"};
    wchar_t* rcpDir = getRCPDirectory(args.argc(), args.argv());
    ASSERT_NE(rcpDir, nullptr);
    EXPECT_EQ(narrow(rcpDir), dir) << "the command line's program name is not used";
    freeString(rcpDir);

    // findCommand replaces whatever buffer the caller held.
    wchar_t* cmd = newString(3);
    findCommand(cmd, nullptr);
    EXPECT_EQ(narrow(cmd), dir);
    findCommand(cmd, args.argv()[0]);
    EXPECT_EQ(narrow(cmd), dir);
    freeString(cmd);
    cmd = nullptr;
    findCommand(cmd, nullptr);
    ASSERT_NE(cmd, nullptr);
    EXPECT_EQ(narrow(cmd), dir);
    freeString(cmd);
}

TEST(InstallDir, LayoutsDecideTheInstallationDirectory)
{
    TempDir tmp;
    std::string base = realPath(tmp.path());
    copySelfTo(base + "/opt/x/rcp/launcher");
    copySelfTo(base + "/opt/y/bin/launcher");
    copySelfTo(base + "/opt/z/Rcp/launcher");
    copySelfTo(base + "/opt/w/myrcp/launcher");
    rcptest::makeDirs(base + "/links");
    ASSERT_EQ(symlink((base + "/opt/x/rcp/launcher").c_str(), (base + "/links/launcher").c_str()), 0);

    struct Case {
        const char* name;
        std::string run;
        std::string installDir;
    } cases[] = {
        {"launcher in rcp below the installation", base + "/opt/x/rcp/launcher", base + "/opt/x"},
        {"launcher in another directory", base + "/opt/y/bin/launcher", ""},
        {"the name rcp is matched exactly", base + "/opt/z/Rcp/launcher", ""},
        {"only the whole last component counts", base + "/opt/w/myrcp/launcher", ""},
        {"started through a link to the launcher", base + "/links/launcher", base + "/opt/x"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        ProbeResult r = runProbe(c.run, "install", tmp);
        EXPECT_EQ(r.exitCode, 0);
        EXPECT_EQ(r.answer, c.installDir);
        EXPECT_EQ(r.log.find("RLNCH"), std::string::npos) << "no message, not even for an empty result: " << r.log;
    }
}

TEST(InstallDir, ALauncherWhoseDirectoryVanishedEndsTheLaunch)
{
    TempDir tmp;
    std::string base = realPath(tmp.path());
    copySelfTo(base + "/gone/rcp/launcher");
    ProbeResult r = runProbe(base + "/gone/rcp/launcher", "deleted", tmp);
    EXPECT_EQ(r.exitCode, 255);
    EXPECT_EQ(r.answer, "");
    EXPECT_NE(r.log.find("RLNCH0049E: Unable to locate the platform's installation directory : "), std::string::npos)
        << r.log;
}

TEST(InstallDir, ServiceLayoutLiesTwoAndSixLevelsUp)
{
    TempDir tmp;
    std::string base = realPath(tmp.path());
    std::string deep = base + "/i/s2/s3/s4/svc/s6/bin/launcher";
    copySelfTo(deep);
    ProbeResult r = runProbe(deep, "service", tmp);
    EXPECT_EQ(r.exitCode, 0);
    // Launcher directory bin; two levels up: s4/svc; six levels up: i.
    EXPECT_EQ(r.answer, base + "/i/s2/s3/s4/svc\n" + base + "/i");

    if (depthOf(base) + 1 > 6) {
        GTEST_SKIP() << "temporary directory too deep for the short layout";
    }
    std::string shallow = base + "/short/launcher";
    copySelfTo(shallow);
    r = runProbe(shallow, "service", tmp);
    EXPECT_EQ(r.exitCode, 255);
    EXPECT_NE(r.log.find(std::string("RLNCH0048E: Unable to locate the directory containing ") + PROBE_ARGV0 + " : "),
              std::string::npos)
        << r.log;
}

TEST(InstallDir, SymbolicLinkTargetsAreReadWithinTheirBuffer)
{
    TempDir tmp;
    std::string fits(1023, 'f'), tooLong(1024, 't');
    struct Case {
        const char* name;
        std::string target;
    } good[] = {{"short", "target"}, {"absolute", "/opt/x/rcp"}, {"1023 bytes", fits}};
    int n = 0;
    for (const auto& c : good) {
        SCOPED_TRACE(c.name);
        std::string link = tmp.sub("link" + std::to_string(n++));
        ASSERT_EQ(symlink(c.target.c_str(), link.c_str()), 0);
        std::string target = "stale";
        readsymln(target, link.c_str());
        EXPECT_EQ(target, c.target);
    }

    std::string longLink = tmp.sub("longlink");
    ASSERT_EQ(symlink(tooLong.c_str(), longLink.c_str()), 0);
    writeText(tmp.sub("regular"), "r");
    struct Bad {
        const char* name;
        std::string link;
        std::string message;
    } bad[] = {
        {"target of 1024 bytes", longLink, "RLNCH0184E: Getting command path failed! errno = "},
        {"missing link", tmp.sub("missing"), "RLNCH0184E: Getting command path failed! errno = 2 : "},
        {"not a link", tmp.sub("regular"), "RLNCH0184E: Getting command path failed! errno = 22 : "},
    };
    n = 0;
    for (const auto& c : bad) {
        SCOPED_TRACE(c.name);
        std::string logDir = tmp.sub("log" + std::to_string(n++));
        rcptest::makeDirs(logDir);
        std::wstring wlog = widen(logDir);
        EXPECT_EXIT(
            {
                enableLogging(wlog);
                std::string target;
                readsymln(target, c.link.c_str());
            },
            ::testing::ExitedWithCode(255), "");
        std::string log = readText(logDir + "/rcplauncher.log");
        EXPECT_NE(log.find(c.message), std::string::npos) << log;
    }
}

TEST(InstallDir, RunningPlatformIsFoundByItsProgramName)
{
    if (access("/proc/self/cmdline", R_OK) != 0) {
        GTEST_SKIP() << "no /proc on this system";
    }
    pid_t platform = fork();
    if (platform == 0) {
        execl("/bin/sleep", "/opt/app/eclipse", "30", static_cast<char*>(nullptr));
        _exit(127);
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
    int found = findRCP();
    std::string cmdline = readText("/proc/" + std::to_string(found) + "/cmdline");
    kill(platform, SIGKILL);
    waitpid(platform, nullptr, 0);
    // Other platforms (stub children of tests running beside this one) may be
    // found first; whichever it is, its program name must end in /eclipse.
    std::string program = cmdline.substr(0, cmdline.find('\0'));
    ASSERT_GT(found, 0);
    ASSERT_GE(program.size(), 8u);
    EXPECT_EQ(program.substr(program.size() - 8), "/eclipse");
}

}  // namespace
