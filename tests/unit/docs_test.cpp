// Keeps the administrators' message catalogue (docs/messages.md) and the
// launcher's sources in step: every message identifier the launcher can write
// has exactly one entry, every entry belongs to a message that exists, and the
// texts quoted in the catalogue are the texts the launcher writes.
#include <gtest/gtest.h>

#include <cctype>
#include <filesystem>
#include <fstream>
#include <map>
#include <set>
#include <sstream>

namespace {

std::string slurp(const std::filesystem::path& p) {
    std::ostringstream out;
    out << std::ifstream(p, std::ios::binary).rdbuf();
    return out.str();
}

// Each "RLNCH", four digits and an upper-case letter, by offset.
std::map<size_t, std::string> findIds(const std::string& s) {
    std::map<size_t, std::string> found;
    for (size_t i = s.find("RLNCH"); i != std::string::npos && i + 10 <= s.size(); i = s.find("RLNCH", i + 1)) {
        bool id = std::isupper(static_cast<unsigned char>(s[i + 9]));
        for (size_t k = i + 5; k < i + 9; k++) id = id && std::isdigit(static_cast<unsigned char>(s[k]));
        if (id) found[i] = s.substr(i, 10);
    }
    return found;
}

TEST(DocsTest, MessageCatalogueMatchesTheCode) {
    const std::filesystem::path root = RCP_SOURCE_DIR;
    const std::string catalogue = slurp(root / "docs" / "messages.md");
    std::map<std::string, std::string> used;  // identifier -> a file that writes it
    std::set<std::string> texts;              // message texts as they stand in string literals
    for (const char* dir : {"common", "src"})
        for (const auto& entry : std::filesystem::recursive_directory_iterator(root / dir)) {
            const std::string source = entry.is_regular_file() ? slurp(entry.path()) : "";
            for (const auto& [i, id] : findIds(source)) {
                used.emplace(id, entry.path().filename().string());
                // A literal opens with the identifier (or "\n" and it) and the
                // text runs to its end or first escape; comments yield nothing.
                if ((i >= 1 && source[i - 1] == '"') || (i >= 3 && source.compare(i - 3, 3, "\"\\n") == 0))
                    texts.insert(source.substr(i, source.find_first_of("\"\\\n", i) - i));
            }
        }
    ASSERT_GT(used.size(), 40u);  // a scan that finds nothing must not pass
    std::map<std::string, int> headings;
    std::istringstream lines(catalogue);
    for (std::string line; std::getline(lines, line);)
        for (const auto& [i, id] : findIds(line)) {
            EXPECT_TRUE(used.count(id)) << id << " is catalogued but occurs nowhere in the code";
            headings[id] += line[0] == '#';
        }
    for (const auto& [id, file] : used) EXPECT_EQ(headings[id], 1) << id << " (" << file << ") needs exactly one heading";
    for (const std::string& text : texts) EXPECT_NE(catalogue.find(text), std::string::npos) << "not quoted: " << text;
}

}  // namespace
