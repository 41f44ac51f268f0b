// Keeps the administrators' message catalogue (docs/messages.md) and the
// launcher's sources in step: every message identifier the launcher can write
// has exactly one heading, every catalogued one exists, and the texts the
// code writes are quoted as they stand.
#include <gtest/gtest.h>

#include <map>
#include <regex>

#include "test_util.h"

using rcptest::readText;

TEST(DocsTest, MessageCatalogueMatchesTheCode) {
    const std::filesystem::path root = RCP_SOURCE_DIR;
    const std::string docs = readText(root / "docs" / "messages.md"), id = "(RLNCH[0-9]{4}[A-Z])";
    // A text: a literal that opens with the identifier (or "\n" and it), up to its end or first escape.
    const std::regex anyId(id), heading("\n#+ " + id), text("\"(?:\\\\n)?(RLNCH[0-9]{4}[A-Z][^\"\\\\\\n]*)");
    using Matches = std::sregex_iterator;
    std::map<std::string, int> headings, used;
    for (Matches m(docs.begin(), docs.end(), heading), end; m != end; ++m) headings[m->str(1)]++;
    for (const char* dir : {"common", "src"})
        for (const auto& file : std::filesystem::recursive_directory_iterator(root / dir)) {
            const std::string s = readText(file.path());
            for (Matches m(s.begin(), s.end(), anyId), end; m != end; ++m) used[m->str(1)]++;
            for (Matches m(s.begin(), s.end(), text), end; m != end; ++m)
                EXPECT_NE(docs.find(m->str(1)), std::string::npos) << "not quoted: " << m->str(1);
        }
    ASSERT_GT(used.size(), 40u);  // a scan that finds nothing must not pass
    for (Matches m(docs.begin(), docs.end(), anyId), end; m != end; ++m)
        EXPECT_TRUE(used.count(m->str(1))) << m->str(1) << " is catalogued but not in the code";
    for (const auto& [i, count] : used) EXPECT_EQ(headings[i], 1) << i << " needs exactly one heading";
}
