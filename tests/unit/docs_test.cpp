// Keeps the administrators' message catalogue (docs/messages.md) and the
// launcher's sources in step: every message identifier the launcher can write
// has an entry, every entry belongs to a message that exists, and the texts
// quoted in the catalogue are the texts the launcher writes.
#include <gtest/gtest.h>

#include <cctype>
#include <filesystem>
#include <fstream>
#include <map>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace fs = std::filesystem;

namespace {

const fs::path kRoot = RCP_SOURCE_DIR;
const fs::path kCatalogue = kRoot / "docs" / "messages.md";

std::string slurp(const fs::path& p) {
    std::ifstream in(p, std::ios::binary);
    std::ostringstream out;
    out << in.rdbuf();
    return out.str();
}

// "RLNCH", four digits and an upper-case letter starting at offset i.
bool isIdAt(const std::string& s, size_t i) {
    if (s.compare(i, 5, "RLNCH") != 0 || i + 10 > s.size()) return false;
    for (size_t k = i + 5; k < i + 9; k++)
        if (!std::isdigit(static_cast<unsigned char>(s[k]))) return false;
    return std::isupper(static_cast<unsigned char>(s[i + 9])) != 0;
}

struct Occurrence {
    std::string id;
    size_t offset;
};

std::vector<Occurrence> findIds(const std::string& text) {
    std::vector<Occurrence> found;
    for (size_t i = text.find("RLNCH"); i != std::string::npos; i = text.find("RLNCH", i + 1))
        if (isIdAt(text, i)) found.push_back({text.substr(i, 10), i});
    return found;
}

// A message text as it stands in a C++ string literal: the identifier must
// open the literal (right after the quote, or after a leading "\n" escape),
// and the text runs to the literal's end or its first escape sequence, so a
// literal split over several lines yields a prefix of the whole text. An
// identifier mentioned in a comment yields nothing.
std::string literalTextAt(const std::string& source, size_t i) {
    bool opensLiteral = (i >= 1 && source[i - 1] == '"') ||
                        (i >= 3 && source.compare(i - 3, 3, "\"\\n") == 0);
    if (!opensLiteral) return {};
    size_t end = source.find_first_of("\"\\\n", i);
    return source.substr(i, end == std::string::npos ? std::string::npos : end - i);
}

struct SourceScan {
    std::map<std::string, std::string> firstFile;  // identifier -> file that uses it
    std::map<std::string, std::set<std::string>> texts;  // identifier -> literal texts
    size_t files = 0;
};

SourceScan scanSources() {
    SourceScan scan;
    for (const char* dir : {"common", "src"}) {
        for (const auto& entry : fs::recursive_directory_iterator(kRoot / dir)) {
            if (!entry.is_regular_file()) continue;
            scan.files++;
            std::string source = slurp(entry.path());
            std::string rel = fs::relative(entry.path(), kRoot).string();
            for (const Occurrence& o : findIds(source)) {
                scan.firstFile.emplace(o.id, rel);
                std::string text = literalTextAt(source, o.offset);
                if (!text.empty()) scan.texts[o.id].insert(text);
            }
        }
    }
    return scan;
}

std::set<std::string> idsIn(const std::string& text) {
    std::set<std::string> ids;
    for (const Occurrence& o : findIds(text)) ids.insert(o.id);
    return ids;
}

// How many Markdown heading lines name each identifier: an entry of the
// catalogue is a heading, a mere mention in another entry's text is not.
std::map<std::string, int> headingCounts(const std::string& markdown) {
    std::map<std::string, int> headings;
    std::istringstream lines(markdown);
    for (std::string line; std::getline(lines, line);)
        if (!line.empty() && line[0] == '#')
            for (const std::string& id : idsIn(line)) headings[id]++;
    return headings;
}

TEST(DocsScannerTest, RecognisesIdentifiersAndLiteralTexts) {
    struct Case {
        const char* text;
        std::vector<std::string> ids;
        std::string literal;  // text taken from the first identifier
    };
    const Case cases[] = {
        {"fatalErrorA(\"RLNCH0010E: Unable to create %ls directory.\", d, true);",
         {"RLNCH0010E"},
         "RLNCH0010E: Unable to create %ls directory."},
        {"SvcDebugOutW(L\"RLNCH0104E: Unable to open platform.xml.\\\"%s\\\"\", p);",
         {"RLNCH0104E"},
         "RLNCH0104E: Unable to open platform.xml."},
        {"fatalErrorA(\"\\nRLNCH0083E begin: Error removing old directory\\n%ls\\n\"\n"
         "            \"RLNCH0084E end: Unable to remove\", e, true);",
         {"RLNCH0083E", "RLNCH0084E"},
         "RLNCH0083E begin: Error removing old directory"},
        {"\"RLNCH0013E: Existing platform has not shutdown within allotted time. Invalidating the \"",
         {"RLNCH0013E"},
         "RLNCH0013E: Existing platform has not shutdown within allotted time. Invalidating the "},
        {"// RLNCH0019E when the log cannot be opened", {"RLNCH0019E"}, ""},
        {"RLNCH001E RLNCH00100E RLNCH0010e xRLNCH0031I:", {"RLNCH0031I"}, ""},
        {"RLNCH0005", {}, ""},
    };
    for (const Case& c : cases) {
        std::string text = c.text;
        std::vector<Occurrence> found = findIds(text);
        std::vector<std::string> ids;
        for (const Occurrence& o : found) ids.push_back(o.id);
        EXPECT_EQ(ids, c.ids) << text;
        if (!found.empty()) {
            EXPECT_EQ(literalTextAt(text, found[0].offset), c.literal) << text;
        }
    }
}

class MessageCatalogueTest : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        scan_ = new SourceScan(scanSources());
        catalogue_ = new std::string(slurp(kCatalogue));
    }
    static void TearDownTestSuite() {
        delete scan_;
        delete catalogue_;
        scan_ = nullptr;
        catalogue_ = nullptr;
    }
    static SourceScan* scan_;
    static std::string* catalogue_;
};

SourceScan* MessageCatalogueTest::scan_ = nullptr;
std::string* MessageCatalogueTest::catalogue_ = nullptr;

TEST_F(MessageCatalogueTest, EveryIdentifierOfTheCodeIsCatalogued) {
    ASSERT_FALSE(catalogue_->empty()) << kCatalogue << " is missing or empty";
    // Guards against a scan that silently finds nothing (wrong root, moved
    // sources) and so passes for the wrong reason.
    ASSERT_GT(scan_->files, 10u);
    ASSERT_GT(scan_->firstFile.size(), 40u);

    std::map<std::string, int> entries = headingCounts(*catalogue_);
    for (const auto& [id, file] : scan_->firstFile)
        EXPECT_TRUE(entries.count(id)) << id << " (used in " << file << ") has no entry in docs/messages.md";
}

TEST_F(MessageCatalogueTest, EveryCataloguedIdentifierOccursInTheCode) {
    ASSERT_FALSE(catalogue_->empty()) << kCatalogue << " is missing or empty";
    for (const std::string& id : idsIn(*catalogue_))
        EXPECT_TRUE(scan_->firstFile.count(id))
            << id << " is listed in docs/messages.md but occurs nowhere in common/ or src/";
}

TEST_F(MessageCatalogueTest, EachIdentifierHasExactlyOneHeading) {
    std::map<std::string, int> headings = headingCounts(*catalogue_);
    for (const std::string& id : idsIn(*catalogue_)) {
        auto it = headings.find(id);
        int count = it == headings.end() ? 0 : it->second;
        EXPECT_EQ(count, 1) << id << " should have exactly one heading in docs/messages.md";
    }
}

TEST_F(MessageCatalogueTest, QuotedTextsMatchTheCode) {
    for (const auto& [id, texts] : scan_->texts)
        for (const std::string& text : texts)
            EXPECT_NE(catalogue_->find(text), std::string::npos)
                << "docs/messages.md does not quote the text the launcher writes: \"" << text << "\"";
}

}  // namespace
