// File-system layer: mkdirs, directory removal and its error list, the text
// copy and its fatal paths, the predicates, readFile and open_wfile.
#include <sys/stat.h>
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <functional>
#include <sstream>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::TempDir;
using rcptest::isDir;
using rcptest::makeDirs;
using rcptest::narrow;
using rcptest::pathExists;
using rcptest::readText;
using rcptest::widen;
using rcptest::writeText;

namespace {

class FsTest : public ::testing::Test {
protected:
    void SetUp() override
    {
        ASSERT_NE(setlocale(LC_CTYPE, "C.UTF-8"), nullptr);
        resetLoggingForTest();
        umask(022);
    }
};

std::string errorText(int err)
{
    return " Failed with error " + std::to_string(err) + ": " + strerror(err);
}

std::vector<std::string> sortedLines(const std::string& text)
{
    std::vector<std::string> lines;
    std::stringstream ss(text);
    std::string line;
    while (std::getline(ss, line)) {
        lines.push_back(line);
    }
    std::sort(lines.begin(), lines.end());
    return lines;
}

// Runs body in a child process that has given up root, so that permission
// bits mean something. body returns a report for the parent; the child's
// exit status 77 means the privileges could not be dropped.
struct ChildReport {
    bool ran = false;
    std::string text;
};

ChildReport runUnprivileged(const std::function<std::string()>& body)
{
    int fds[2];
    ChildReport report;
    if (pipe(fds) != 0) {
        return report;
    }
    pid_t child = fork();
    if (child == 0) {
        close(fds[0]);
        if (geteuid() == 0 && (setgid(65534) != 0 || setuid(65534) != 0)) {
            _exit(77);
        }
        std::string text = body();
        size_t off = 0;
        while (off < text.size()) {
            ssize_t n = write(fds[1], text.data() + off, text.size() - off);
            if (n <= 0) {
                break;
            }
            off += static_cast<size_t>(n);
        }
        _exit(0);
    }
    close(fds[1]);
    char buf[4096];
    ssize_t n;
    while ((n = read(fds[0], buf, sizeof(buf))) > 0) {
        report.text.append(buf, static_cast<size_t>(n));
    }
    close(fds[0]);
    int status = 0;
    waitpid(child, &status, 0);
    report.ran = WIFEXITED(status) && WEXITSTATUS(status) == 0;
    return report;
}

// A directory that the unprivileged child may use.
void openUp(const std::string& dir)
{
    chmod(dir.c_str(), 0777);
}

mode_t modeOf(const std::string& path)
{
    struct stat st;
    if (stat(path.c_str(), &st) != 0) {
        return 0;
    }
    return st.st_mode & 07777;
}

// ---------------------------------------------------------------- mkdirs

TEST_F(FsTest, MkdirsResultIsTheLastLevelsAndEveryLevelIsCreated)
{
    TempDir tmp;
    std::string base = tmp.path();
    std::string rel = base.substr(1);  // the same place without the leading "/"
    std::string backslashed = base;
    std::replace(backslashed.begin(), backslashed.end(), '/', '\\');
    makeDirs(base + "/exists");

    struct Case {
        const char* name;
        std::string path;
        int expected;
        std::string mustBeDir;
    } cases[] = {
        {"one missing final level", base + "/one", 1, base + "/one"},
        {"several missing levels", base + "/a/b/c", 1, base + "/a/b/c"},
        {"final level already there", base + "/exists", 0, base + "/exists"},
        {"intermediate level there, final new", base + "/exists/new", 1, base + "/exists/new"},
        {"relative path is taken from the root", rel + "/rel/x", 1, base + "/rel/x"},
        {"backslashes separate levels", backslashed + "\\bs\\y", 1, base + "/bs/y"},
        {"mixed and repeated separators", base + "//mix\\\\/z//", 1, base + "/mix/z"},
        {"a level through a regular file", base + "/file/sub", 0, ""},
        {"empty path: nothing to create", "", 1, ""},
        {"separators only", "/\\//", 1, ""},
    };
    writeText(base + "/file", "x");
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        EXPECT_EQ(mkdirs(widen(c.path).c_str()), c.expected);
        if (!c.mustBeDir.empty()) {
            EXPECT_TRUE(isDir(c.mustBeDir));
        }
    }
    EXPECT_FALSE(pathExists(base + "/file/sub"));
}

TEST_F(FsTest, MkdirsRefusesPathsBeyondTheWorkBufferWithoutCreatingAnything)
{
    TempDir tmp;
    // Build paths of exactly 1023 and 1024 characters below the temp dir,
    // from components short enough for every file system.
    auto pathOfLength = [&](const std::string& top, size_t length) {
        std::string p = tmp.path() + "/" + top;
        while (p.size() + 1 < length) {
            size_t room = length - p.size() - 1;
            p += "/" + std::string(std::min<size_t>(room, 200), 'd');
        }
        p.resize(length, 'e');
        return p;
    };
    std::string fits = pathOfLength("fits", 1023);
    std::string tooLong = pathOfLength("long", 1024);
    std::string huge = pathOfLength("huge", 5000);
    ASSERT_EQ(fits.size(), 1023u);
    ASSERT_EQ(tooLong.size(), 1024u);

    EXPECT_EQ(mkdirs(widen(fits).c_str()), 1);
    EXPECT_TRUE(isDir(fits));
    EXPECT_EQ(mkdirs(widen(tooLong).c_str()), 0);
    EXPECT_EQ(mkdirs(widen(huge).c_str()), 0);
    EXPECT_FALSE(pathExists(tmp.sub("long")));
    EXPECT_FALSE(pathExists(tmp.sub("huge")));
}

TEST_F(FsTest, CreatedDirectoriesHaveMode0775LessTheMask)
{
    TempDir tmp;
    struct Case {
        mode_t mask;
        mode_t expected;
    } cases[] = {{0, 0775}, {022, 0755}, {077, 0700}};
    int n = 0;
    for (const auto& c : cases) {
        umask(c.mask);
        std::string one = tmp.sub("one" + std::to_string(n));
        std::string deep = tmp.sub("deep" + std::to_string(n) + "/x");
        ++n;
        EXPECT_EQ(createDirectory(widen(one).c_str()), 1);
        EXPECT_EQ(createDirectory(widen(one).c_str()), 0) << "an existing directory is not created again";
        EXPECT_EQ(mkdirs(widen(deep).c_str()), 1);
        EXPECT_EQ(modeOf(one), c.expected);
        EXPECT_EQ(modeOf(deep), c.expected);
    }
    umask(022);
    EXPECT_EQ(createDirectory(nullptr), 0);
}

// ---------------------------------------------------------------- removal

TEST_F(FsTest, RemovingContentsOfAnEmptyDirectoryKeepsItAndTheList)
{
    TempDir tmp;
    makeDirs(tmp.sub("empty"));
    std::wstring errlist = L"untouched";
    EXPECT_EQ(removeDirectoryContents(tmp.wsub("empty"), errlist), 1);
    EXPECT_TRUE(isDir(tmp.sub("empty")));
    EXPECT_EQ(errlist, L"untouched");
}

TEST_F(FsTest, RemovingAFullTreeLeavesOnlyWhatWasAsked)
{
    TempDir tmp;
    writeText(tmp.sub("top/a.txt"), "a");
    writeText(tmp.sub("top/.hidden"), "h");
    writeText(tmp.sub("top/sub/b.txt"), "b");
    writeText(tmp.sub("top/sub/deeper/c.txt"), "c");
    makeDirs(tmp.sub("top/emptysub"));
    ASSERT_EQ(symlink("a.txt", tmp.sub("top/filelink").c_str()), 0);

    std::wstring errlist = L"untouched";
    EXPECT_EQ(removeDirectoryContents(tmp.wsub("top"), errlist), 1);
    EXPECT_TRUE(isDir(tmp.sub("top")));
    EXPECT_TRUE(readText(tmp.sub("top")).empty());
    for (const char* gone : {"top/a.txt", "top/.hidden", "top/sub", "top/emptysub", "top/filelink"}) {
        EXPECT_FALSE(pathExists(tmp.sub(gone))) << gone;
    }
    EXPECT_EQ(errlist, L"untouched");

    writeText(tmp.sub("top/again/x"), "x");
    EXPECT_EQ(removeDirectoryAndContents(tmp.wsub("top"), errlist), 1);
    EXPECT_FALSE(pathExists(tmp.sub("top")));
    EXPECT_EQ(errlist, L"untouched");
}

TEST_F(FsTest, RemovingAMissingDirectoryGivesOneErrorInLineReplacingTheList)
{
    TempDir tmp;
    std::string missing = tmp.sub("missing");
    std::string expected = "Error in " + missing + "  - " + errorText(ENOENT) + "\n";

    std::wstring errlist = L"old content\n";
    EXPECT_EQ(removeDirectoryContents(widen(missing), errlist), 0);
    EXPECT_EQ(narrow(errlist), expected);

    errlist = L"old content\n";
    EXPECT_EQ(removeDirectoryAndContents(widen(missing), errlist), 0);
    EXPECT_EQ(narrow(errlist), expected);

    std::string indent, narrowList = "kept\n";
    EXPECT_EQ(removeDirectoryContents(missing, indent, narrowList), 0);
    EXPECT_EQ(narrowList, "kept\n" + expected) << "the narrow remover appends";
    EXPECT_EQ(indent, "");
}

TEST_F(FsTest, LinksAreFollowedIntoTheirTargetAndStayBehind)
{
    TempDir tmp;
    writeText(tmp.sub("target/t1"), "1");
    writeText(tmp.sub("target/sub/t2"), "2");
    writeText(tmp.sub("top/plain"), "p");
    ASSERT_EQ(symlink(tmp.sub("target").c_str(), tmp.sub("top/dirlink").c_str()), 0);
    ASSERT_EQ(symlink(tmp.sub("nowhere").c_str(), tmp.sub("top/dangling").c_str()), 0);

    std::wstring errlist;
    EXPECT_EQ(removeDirectoryAndContents(tmp.wsub("top"), errlist), 0);
    std::vector<std::string> expected = {
        "Can't delete dir " + tmp.sub("top/dirlink") + "  - " + errorText(ENOTDIR),
        "Can't stat " + tmp.sub("top/dangling") + "  - " + errorText(ENOENT),
    };
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(sortedLines(narrow(errlist)), expected);
    // The target's contents went, the target itself and both links stayed;
    // the top directory is kept because its contents could not all go.
    EXPECT_TRUE(isDir(tmp.sub("target")));
    EXPECT_FALSE(pathExists(tmp.sub("target/t1")));
    EXPECT_FALSE(pathExists(tmp.sub("target/sub")));
    EXPECT_TRUE(pathExists(tmp.sub("top/dirlink")));
    EXPECT_TRUE(pathExists(tmp.sub("top/dangling")));
    EXPECT_FALSE(pathExists(tmp.sub("top/plain")));
    EXPECT_TRUE(isDir(tmp.sub("top")));
}

TEST_F(FsTest, AnUndeletableFileKeepsItsParentsAndIsListedWithThem)
{
    TempDir tmp;
    openUp(tmp.path());
    std::string top = tmp.sub("top");
    ChildReport report = runUnprivileged([&]() {
        setlocale(LC_CTYPE, "C.UTF-8");
        umask(022);
        std::string s;
        makeDirs(top + "/a/b");
        makeDirs(top + "/other");
        writeText(top + "/a/b/locked", "l");
        writeText(top + "/a/free", "f");
        writeText(top + "/other/x", "x");
        writeText(top + "/y", "y");
        chmod((top + "/a/b").c_str(), 0555);  // its entries cannot be unlinked
        std::wstring errlist = L"previous";
        int result = removeDirectoryAndContents(widen(top), errlist);
        chmod((top + "/a/b").c_str(), 0755);
        return std::to_string(result) + "\n" + narrow(errlist);
    });
    if (!report.ran) {
        GTEST_SKIP() << "could not run without privileges";
    }
    size_t nl = report.text.find('\n');
    ASSERT_NE(nl, std::string::npos);
    EXPECT_EQ(report.text.substr(0, nl), "0");
    std::vector<std::string> expected = {
        "Can't delete file " + top + "/a/b/locked  - " + errorText(EACCES),
        "Can't delete dir " + top + "/a/b  - " + errorText(ENOTEMPTY),
        "Can't delete dir " + top + "/a  - " + errorText(ENOTEMPTY),
    };
    std::sort(expected.begin(), expected.end());
    EXPECT_EQ(sortedLines(report.text.substr(nl + 1)), expected);
    EXPECT_TRUE(pathExists(top + "/a/b/locked"));
    EXPECT_FALSE(pathExists(top + "/a/free"));
    EXPECT_FALSE(pathExists(top + "/other"));
    EXPECT_FALSE(pathExists(top + "/y"));
    EXPECT_TRUE(isDir(top));
}

TEST_F(FsTest, AnUnreadableSubdirectoryIsReportedAndTheRestGoes)
{
    TempDir tmp;
    openUp(tmp.path());
    std::string top = tmp.sub("top");
    ChildReport report = runUnprivileged([&]() {
        makeDirs(top + "/closed");
        writeText(top + "/closed/inside", "i");
        writeText(top + "/z", "z");
        chmod((top + "/closed").c_str(), 0);
        std::string indent, list;
        int result = removeDirectoryContents(top, indent, list);
        chmod((top + "/closed").c_str(), 0755);
        return std::to_string(result) + "\n" + list;
    });
    if (!report.ran) {
        GTEST_SKIP() << "could not run without privileges";
    }
    std::string expected = "0\n";
    std::vector<std::string> lines = {
        "Error in " + top + "/closed  - " + errorText(EACCES),
        "Can't delete dir " + top + "/closed  - " + errorText(ENOTEMPTY),
    };
    EXPECT_EQ(report.text, expected + lines[0] + "\n" + lines[1] + "\n");
    EXPECT_TRUE(pathExists(top + "/closed/inside"));
    EXPECT_FALSE(pathExists(top + "/z"));
}

// ---------------------------------------------------------------- copyFile

TEST_F(FsTest, CopyFileReproducesTextFilesExactly)
{
    TempDir tmp;
    std::string longLine(2500, 'L');
    longLine[999] = 'x';
    longLine[1000] = 'y';
    struct Case {
        const char* name;
        std::string content;
    } cases[] = {
        {"empty file", ""},
        {"lines of text", "key=value\nother=2\n\n#comment\n"},
        {"line longer than one read", longLine + "\nshort\n" + longLine},
        {"exactly 1000 characters then a line end", std::string(1000, 'k') + "\n"},
        {"multibyte characters", "gr\xc3\xbc\xc3\x9f=\xe2\x82\xac \xe6\x97\xa5\xe6\x9c\xac\n"},
        {"no final line end", "a=b"},
    };
    int n = 0;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::string src = tmp.sub("src" + std::to_string(n));
        std::string dst = tmp.sub("dst" + std::to_string(n));
        ++n;
        writeText(src, c.content);
        writeText(dst, std::string(5000, 'o'));  // an older, longer file is replaced
        EXPECT_EQ(copyFile(widen(src).c_str(), widen(dst).c_str()), 1);
        EXPECT_EQ(readText(dst), c.content);
        EXPECT_EQ(readText(src), c.content);
    }
}

struct CopyFailure {
    const char* name;
    std::string source;
    std::string destination;
    std::string logged;
};

TEST_F(FsTest, CopyFileFailuresEndTheLaunchWithTheirMessage)
{
    TempDir tmp;
    writeText(tmp.sub("good"), "text\n");
    writeText(tmp.sub("big"), std::string(20000, 'b'));
    writeText(tmp.sub("badbytes"), "ok\n\xff\xfe broken\n");
    std::vector<CopyFailure> cases = {
        {"source missing", tmp.sub("nosuch"), tmp.sub("out1"),
         "RLNCH0190E: Unable to open source file " + tmp.sub("nosuch") + " to be copied"},
        {"destination directory missing", tmp.sub("good"), tmp.sub("nodir/out"),
         "RLNCH0191E: Unable to open destination file " + tmp.sub("nodir/out") + " to be copied to"},
        {"write fails at once", tmp.sub("big"), "/dev/full", "RLNCH0192E: Encountered error copying file contents"},
        {"write fails at the final flush", tmp.sub("good"), "/dev/full",
         "RLNCH0192E: Encountered error copying file contents"},
        {"input not valid in the locale", tmp.sub("badbytes"), tmp.sub("out4"),
         "RLNCH0193E: Did not encounter EOF while copying file contents"},
    };
    int n = 0;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::string logDir = tmp.sub("log" + std::to_string(n++));
        makeDirs(logDir);
        std::wstring wlog = widen(logDir), wsrc = widen(c.source), wdst = widen(c.destination);
        EXPECT_EXIT(
            {
                enableLogging(wlog);
                copyFile(wsrc.c_str(), wdst.c_str());
            },
            ::testing::ExitedWithCode(255), "");
        std::string log = readText(logDir + "/rcplauncher.log");
        EXPECT_NE(log.find(c.logged + " : "), std::string::npos) << log;
    }
    // The part written before the bad bytes is left behind.
    EXPECT_EQ(readText(tmp.sub("out4")), "ok\n");
}

// ---------------------------------------------------------------- predicates

TEST_F(FsTest, PredicatesAnswerForEveryKindOfPath)
{
    TempDir tmp;
    writeText(tmp.sub("file"), "f", 0644);
    writeText(tmp.sub("exec"), "#!/bin/sh\n", 0700);
    writeText(tmp.sub("groupexec"), "g", 0654);
    writeText(tmp.sub("unreadable"), "u", 0);
    makeDirs(tmp.sub("dir"));
    symlink(tmp.sub("dir").c_str(), tmp.sub("dirlink").c_str());
    symlink(tmp.sub("exec").c_str(), tmp.sub("execlink").c_str());
    symlink(tmp.sub("gone").c_str(), tmp.sub("dangling").c_str());

    struct Case {
        const char* rel;
        int exists, isDirectory, isExecutable;
    } cases[] = {
        {"file", 1, 0, 0},          {"exec", 1, 0, 1},     {"groupexec", 1, 0, 0},
        {"dir", 1, 1, 1},           {"dirlink", 1, 0, 1},  {"execlink", 1, 0, 1},
        {"dangling", 0, 0, 0},      {"missing", 0, 0, 0},  {"file/below", 0, 0, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.rel);
        std::wstring w = tmp.wsub(c.rel);
        EXPECT_EQ(exists(w.c_str()), c.exists);
        EXPECT_EQ(existsA(tmp.sub(c.rel).c_str()), c.exists);
        EXPECT_EQ(isDirectory(w.c_str()), c.isDirectory);
        EXPECT_EQ(isExecutable(w.c_str()), c.isExecutable);
    }
    EXPECT_EQ(exists(nullptr), 0);
    EXPECT_EQ(existsA(nullptr), 0);
    EXPECT_EQ(isDirectory(nullptr), 0);
    EXPECT_EQ(isExecutable(nullptr), 0);
    EXPECT_EQ(exists(L""), 0);

    // A file without read permission is absent for anybody but root.
    std::string unreadable = tmp.sub("unreadable");
    openUp(tmp.path());
    ChildReport report = runUnprivileged([&]() {
        return std::to_string(exists(widen(unreadable).c_str())) + std::to_string(existsA(unreadable.c_str()));
    });
    if (report.ran) {
        EXPECT_EQ(report.text, "00");
    }
}

TEST_F(FsTest, MoveAndDeleteReportOnlyThroughTheirResult)
{
    TempDir tmp;
    writeText(tmp.sub("a"), "A");
    EXPECT_EQ(moveFile(tmp.wsub("a").c_str(), tmp.wsub("b").c_str()), 1);
    EXPECT_FALSE(pathExists(tmp.sub("a")));
    EXPECT_EQ(readText(tmp.sub("b")), "A");
    EXPECT_EQ(moveFile(tmp.wsub("a").c_str(), tmp.wsub("c").c_str()), 0);
    EXPECT_EQ(moveFile(tmp.wsub("b").c_str(), tmp.wsub("nodir/c").c_str()), 0);
    EXPECT_EQ(readText(tmp.sub("b")), "A");

    EXPECT_EQ(deleteFile(tmp.wsub("b").c_str()), 1);
    EXPECT_FALSE(pathExists(tmp.sub("b")));
    EXPECT_EQ(deleteFile(tmp.wsub("b").c_str()), 0);
    makeDirs(tmp.sub("d"));
    EXPECT_EQ(deleteFile(tmp.wsub("d").c_str()), 0);
    EXPECT_TRUE(isDir(tmp.sub("d")));
    EXPECT_TRUE(getLogQueue().empty()) << "these operations write nothing to the log";
}

TEST_F(FsTest, MoveAcrossFileSystemsFailsAndLeavesBothPaths)
{
    TempDir tmp;
    struct stat a, b;
    if (stat(tmp.path().c_str(), &a) != 0 || stat("/dev/shm", &b) != 0 || a.st_dev == b.st_dev) {
        GTEST_SKIP() << "no second file system at hand";
    }
    std::string other = "/dev/shm/rcp_fs_test_" + std::to_string(getpid());
    writeText(tmp.sub("src"), "S");
    writeText(other, "O");
    EXPECT_EQ(moveFile(tmp.wsub("src").c_str(), widen(other).c_str()), 0);
    EXPECT_EQ(readText(tmp.sub("src")), "S");
    EXPECT_EQ(readText(other), "O");
    unlink(other.c_str());
}

// ---------------------------------------------------------------- readFile

std::vector<std::pair<int, std::string>> readAll(FILE* fp, const wchar_t* format)
{
    std::vector<std::pair<int, std::string>> items;
    std::wstring line = L"stale";
    for (int guard = 0; guard < 100; ++guard) {
        int r = readFile(fp, format, line);
        items.emplace_back(r, narrow(line));
        if (r != 1) {
            break;
        }
    }
    return items;
}

TEST_F(FsTest, ReadFileDeliversOneBoundedItemPerCall)
{
    TempDir tmp;
    std::string longLine(3000, 'q');
    struct Case {
        const char* name;
        std::string content;
        const wchar_t* format;
        std::vector<std::pair<int, std::string>> expected;
    } cases[] = {
        {"lines, blank lines skipped", "a=1\n\n  b=2\nc\xc3\xa9=3", L" %2024[^\n]\n",
         {{1, "a=1"}, {1, "b=2"}, {1, "c\xc3\xa9=3"}, {-1, ""}}},
        {"leading blanks kept on the first line only", "  x\n  y\n", L"%2024[^\n]\n",
         {{1, "  x"}, {1, "y"}, {-1, ""}}},
        {"a line longer than the width is split", longLine + "\nz\n", L" %2024[^\n]\n",
         {{1, std::string(2024, 'q')}, {1, std::string(976, 'q')}, {1, "z"}, {-1, ""}}},
        {"empty file", "", L" %2024[^\n]\n", {{-1, ""}}},
        {"nothing matches: empty item, not stale text", "abc", L"x%5s", {{0, ""}}},
    };
    int n = 0;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        std::string path = tmp.sub("in" + std::to_string(n++));
        writeText(path, c.content);
        FILE* fp = fopen(path.c_str(), "r");
        ASSERT_NE(fp, nullptr);
        EXPECT_EQ(readAll(fp, c.format), c.expected);
        fclose(fp);
    }
}

TEST_F(FsTest, ReadFileNeverWritesBeyondItsScratchArea)
{
    TempDir tmp;
    // A single 300,000-byte word and formats that could overflow a fixed
    // buffer: an unbounded %s is bounded, unusable formats end the reading.
    writeText(tmp.sub("word"), std::string(300000, 'w') + " tail");
    struct Case {
        const wchar_t* format;
        std::vector<size_t> itemLengths;
        bool endsAtEof;  // else it may also end on a failed match
    } cases[] = {
        {L"%s", {204799, 95201, 4}, true},
        {L"%999999s", {}, true},
        {L"%s %s", {}, true},
        {L"%d", {}, true},
        {L"%ls", {}, true},
        {L"%[abc", {}, true},
        {L"%", {}, true},
        {L"%*s %3c", {3}, false},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(narrow(c.format));
        FILE* fp = fopen(tmp.sub("word").c_str(), "r");
        ASSERT_NE(fp, nullptr);
        std::wstring item;
        std::vector<size_t> lengths;
        int r;
        int guard = 0;
        while ((r = readFile(fp, c.format, item)) == 1 && ++guard < 10) {
            lengths.push_back(item.size());
        }
        if (c.endsAtEof) {
            EXPECT_EQ(r, EOF);
        } else {
            EXPECT_LE(r, 0);
        }
        EXPECT_EQ(lengths, c.itemLengths);
        fclose(fp);
    }
    std::wstring item = L"x";
    EXPECT_EQ(readFile(nullptr, L"%s", item), EOF);
    EXPECT_EQ(item, L"");
}

// ---------------------------------------------------------------- streams, home, sleep

TEST_F(FsTest, OpenWfileGivesAWideStreamOrNothing)
{
    TempDir tmp;
    FILE* fp = nullptr;
    open_wfile(fp, tmp.wsub("out.txt").c_str(), L"w");
    ASSERT_NE(fp, nullptr);
    EXPECT_GT(fwide(fp, 0), 0);
    EXPECT_GE(fputws(L"k=\u00e9\u20ac\n", fp), 0);
    fclose(fp);
    EXPECT_EQ(readText(tmp.sub("out.txt")), "k=\xc3\xa9\xe2\x82\xac\n");

    open_wfile(fp, tmp.wsub("out.txt").c_str(), L"a+");
    ASSERT_NE(fp, nullptr);
    fputws(L"more\n", fp);
    fclose(fp);
    EXPECT_EQ(readText(tmp.sub("out.txt")), "k=\xc3\xa9\xe2\x82\xac\nmore\n");

    fp = stdin;
    open_wfile(fp, tmp.wsub("nodir/out.txt").c_str(), L"w");
    EXPECT_EQ(fp, nullptr);
    fp = stdin;
    open_wfile(fp, tmp.wsub("missing").c_str(), L"r");
    EXPECT_EQ(fp, nullptr);
}

TEST_F(FsTest, UserHomeComesFromTheEnvironment)
{
    const char* saved = getenv("HOME");
    std::string savedHome = saved ? saved : "";
    std::wstring home = L"old";

    setenv("HOME", "/home/some \xc3\xa9 user", 1);
    EXPECT_EQ(narrow(getUserHome(home)), "/home/some \xc3\xa9 user");
    EXPECT_EQ(narrow(home), "/home/some \xc3\xa9 user");

    unsetenv("HOME");
    home = L"old";
    const wchar_t* result = getUserHome(home);
    ASSERT_NE(result, nullptr);
    EXPECT_EQ(std::wstring(result), L"");
    EXPECT_EQ(home, L"");

    if (saved) {
        setenv("HOME", savedHome.c_str(), 1);
    }
}

TEST_F(FsTest, SysSleepWaitsTheGivenSecondsAndNeverForNegativeOnes)
{
    auto timed = [](int seconds) {
        auto start = std::chrono::steady_clock::now();
        sysSleep(seconds);
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    };
    EXPECT_LT(timed(0), 0.5);
    EXPECT_LT(timed(-5), 0.5);
    double one = timed(1);
    EXPECT_GE(one, 0.99);
    EXPECT_LT(one, 3.0);
}

}  // namespace
