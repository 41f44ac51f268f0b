// The log's rules: what is queued before the log opens, what is dropped or
// cut, the error suffix, and the block written when the log opens.
#include "unit_support.h"

TEST(CoreTest, LogQueuesUntilItOpensThenWritesTheBlockAndAnEmptyLine) {
    TempDir dir;
    resetLoggingForTest();  // an empty queue, debug output on
    SvcDebugOutA("first");
    SvcDebugOutA(std::string(1000, 'a').c_str());  // a format of 1000 characters or more is dropped
    SvcDebugOutA(std::string(999, 'b').c_str());
    SvcDebugOutA("%s", std::string(5000, 'c').c_str());        // cut at 4095 characters
    fatalErrorA("%s", std::string(5000, 'd').c_str(), false);  // no room left for the error suffix
    errno = ENOENT;
    fatalErrorA("RLNCH0099E: bad (%ls)", L"x%sy", false);
    const std::string queued = "first\n" + std::string(999, 'b') + "\n" + std::string(4095, 'c') + "\n" +
                               std::string(4095, 'd') + "\nRLNCH0099E: bad (x%sy) : " + strerror(ENOENT) + "\n";
    EXPECT_EQ(getLogQueue(), queued);
    ASSERT_TRUE(enableLogging(W(dir.path())));
    SvcDebugOutA("after");
    EXPECT_EQ(getLogQueue() + readText(dir.sub("rcplauncher.log")), queued + "\nafter\n");
}
