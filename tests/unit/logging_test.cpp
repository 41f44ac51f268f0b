// The log: queueing before the file is open, debug filtering, the error-line
// suffix, the fixed cuts, and the fatal exit.
#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstring>

#include "rcp_launcher.h"
#include "test_util.h"

using rcptest::readText;
using rcptest::TempDir;

namespace {

class LoggingTest : public ::testing::Test {
protected:
    void SetUp() override {
        setlocale(LC_CTYPE, "C.UTF-8");
        resetLoggingForTest();
    }
    void TearDown() override { resetLoggingForTest(); }
};

std::string suffix(int err) { return std::string(" : ") + strerror(err); }

TEST_F(LoggingTest, QueuesUntilTheLogOpensThenWritesTheBlockAndAnEmptyLine) {
    TempDir dir;
    rcptest::writeText(dir.sub("rcplauncher.log"), "old content of an earlier launch\n");
    SvcDebugOutA("first");
    errno = ENOENT;
    fatalErrorA("RLNCH0099E: bad (%ls)", L"x%sy", false);
    EXPECT_EQ(getLogQueue(), "first\nRLNCH0099E: bad (x%sy)" + suffix(ENOENT) + "\n");

    ASSERT_TRUE(enableLogging(dir.wpath()));
    EXPECT_EQ(getLogQueue(), "");
    SvcDebugOutA("after");
    // What an earlier launch left is gone; the queued block is followed
    // by one empty line; later lines go straight to the file.
    EXPECT_EQ(readText(dir.sub("rcplauncher.log")),
              "first\nRLNCH0099E: bad (x%sy)" + suffix(ENOENT) + "\n\nafter\n");
}

TEST_F(LoggingTest, DebugOffKeepsOnlyErrorLines) {
    setDebug(false);
    SvcDebugOutA("dropped");
    SvcDebugOutA("dropped %s", "too");
    SvcDebugOutA("dropped %d", 3);
    SvcDebugOutW(L"dropped %s", L"w");
    errno = 0;
    fatalErrorA("RLNCH0070E: kept", false);
    EXPECT_EQ(getLogQueue(), "RLNCH0070E: kept" + suffix(0) + "\n");
}

TEST_F(LoggingTest, FixedLimits) {
    // A debug format of 1000 characters or more is dropped, 999 is kept.
    SvcDebugOutA(std::string(1000, 'a').c_str());
    EXPECT_EQ(getLogQueue(), "");
    SvcDebugOutA(std::string(999, 'b').c_str());
    EXPECT_EQ(getLogQueue(), std::string(999, 'b') + "\n");
    resetLoggingForTest();

    // Formatted text longer than 4095 characters is cut there.
    std::string longArg(5000, 'c');
    SvcDebugOutA("%s", longArg.c_str());
    EXPECT_EQ(getLogQueue(), std::string(4095, 'c') + "\n");
    resetLoggingForTest();

    // An error line that fills the buffer has no room left for the suffix.
    fatalErrorA("%s", longArg.c_str(), false);
    EXPECT_EQ(getLogQueue(), std::string(4095, 'c') + "\n");
}

TEST_F(LoggingTest, WideAndListOutput) {
    SvcDebugOutW(L"RLNCH0032I: Prop Line = \"%s\"", L"k=v 100%");
    const wchar_t* values[] = {L"a", L"b"};
    SvcDebugOutW(L"list", 2, const_cast<wchar_t**>(values));
    // A percent sign inside a listed value is taken as a conversion: the
    // count first, then the text; anything beyond them stays as written.
    const wchar_t* percent[] = {L"%d|%s|%s"};
    SvcDebugOutW(L"p", 1, const_cast<wchar_t**>(percent));
    std::string q = getLogQueue();
    EXPECT_EQ(q.substr(0, q.find("p=")), "RLNCH0032I: Prop Line = \"k=v 100%\"\nlist=\"a, b, \"\n\n");
    EXPECT_EQ(q.substr(q.find("p=")), "p=\"1|p=\"%d|%s|%s, \"\n|%s, \"\n\n");
}

TEST_F(LoggingTest, LastErrorText) {
    errno = 2;
    std::string narrow;
    GetLastErrorMsg(narrow);
    EXPECT_EQ(narrow, std::string(" Failed with error 2: ") + strerror(2));
    errno = 2;
    std::wstring wide;
    GetLastErrorMsg(wide);
    EXPECT_EQ(rcptest::narrow(wide), narrow);
}

TEST_F(LoggingTest, OpeningAnImpossibleLogQueuesTheReasonAndGoesOn) {
    TempDir dir;
    EXPECT_FALSE(enableLogging(dir.wsub("missing/dir")));
    EXPECT_NE(getLogQueue().find("RLNCH0019E: Could not open " + dir.sub("missing/dir/rcplauncher.log") +
                                 " for writing! : "),
              std::string::npos);
}

TEST_F(LoggingTest, LogIsNotWrittenThroughAPlantedSymbolicLink) {
    TempDir dir;
    rcptest::writeText(dir.sub("victim"), "precious\n");
    ASSERT_EQ(symlink(dir.sub("victim").c_str(), dir.sub("rcplauncher.log").c_str()), 0);
    EXPECT_FALSE(enableLogging(dir.wpath()));
    EXPECT_EQ(readText(dir.sub("victim")), "precious\n");
}

TEST_F(LoggingTest, FatalExitWritesTheLineAndEndsWith255) {
    TempDir dir;
    EXPECT_EXIT(
        {
            enableLogging(dir.wpath());
            fatalErrorA("RLNCH0050E: rcp.base.location property is missing from %ls", L"/i/rcp/x", true);
        },
        ::testing::ExitedWithCode(255), "");
    std::string log = readText(dir.sub("rcplauncher.log"));
    EXPECT_NE(log.find("RLNCH0050E: rcp.base.location property is missing from /i/rcp/x : "), std::string::npos);

    EXPECT_EXIT(
        {
            enableLogging(dir.wpath());
            fatalErrorW(L"RLNCH0088E: 50%% done %s", true);
        },
        ::testing::ExitedWithCode(255), "");
    EXPECT_NE(readText(dir.sub("rcplauncher.log")).find("RLNCH0088E: 50% done %s : "), std::string::npos);
}

}  // namespace
