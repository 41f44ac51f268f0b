// The file-system layer: mkdirs, removal and its error list, the text copy
// and link targets.
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>

#include "unit_support.h"

namespace {

class FilesystemTest : public ::testing::Test {
protected:
    void SetUp() override { resetState(); }
    void TearDown() override { umask(022); }
    TempDir tmp;
};

std::string failed(int err) { return "  -  Failed with error " + std::to_string(err) + ": " + strerror(err); }

TEST_F(FilesystemTest, Mkdirs) {
    const std::string b = tmp.path();
    std::string backslashed = b;
    std::replace(backslashed.begin(), backslashed.end(), '/', '\\');
    auto ofLength = [&](const std::string& top, size_t length) {  // short components for every file system
        std::string p = b + "/" + top;
        while (p.size() + 1 < length) p += "/" + std::string(std::min<size_t>(length - p.size() - 1, 200), 'd');
        p.resize(length, 'e');
        return p;
    };
    writeText(b + "/file", "x");
    makeDirs(b + "/exists");
    umask(0);
    const std::tuple<std::string, int, std::string> cases[] = {  // path, result, directory made
        {b + "/a/b/c", 1, b + "/a/b/c"}, {b + "/exists", 0, b + "/exists"}, {b + "/exists/new", 1, b + "/exists/new"},
        {b.substr(1) + "/rel/x", 1, b + "/rel/x"}, {backslashed + "\\bs\\y", 1, b + "/bs/y"},
        {b + "//mix\\\\/z//", 1, b + "/mix/z"}, {b + "/file/sub", 0, ""}, {"", 1, ""},
        {ofLength("fits", 1023), 1, ofLength("fits", 1023)}, {ofLength("long", 1024), 0, ""}, {ofLength("huge", 5000), 0, ""}};
    for (const auto& [path, result, made] : cases) {
        EXPECT_EQ(mkdirs(widen(path).c_str()), result) << path.substr(0, 80);
        EXPECT_TRUE(made.empty() || isDir(made)) << made.substr(0, 80);
    }
    EXPECT_FALSE(pathExists(b + "/long") || pathExists(b + "/huge"));  // nothing made of a refused path
    struct stat st;
    ASSERT_EQ(stat((b + "/a/b").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777u, 0775u);
}

TEST_F(FilesystemTest, RemovalAndItsErrorList) {
    for (const char* f : {"top/a", "top/.hidden", "top/sub/deeper/c", "target/sub/t"}) writeText(tmp.sub(f), f);
    ASSERT_EQ(symlink(tmp.sub("target").c_str(), tmp.sub("top/dirlink").c_str()), 0);
    ASSERT_EQ(symlink(tmp.sub("nowhere").c_str(), tmp.sub("top/dangling").c_str()), 0);
    std::wstring errlist = L"old\n";
    EXPECT_EQ(removeDirectoryAndContents(tmp.wsub("top"), errlist), 0);
    // Links are followed into their target, which is emptied; the links, the
    // target and the top directory stay. The list is replaced.
    const std::string text = narrow(errlist);
    EXPECT_EQ(std::multiset<std::string>({text.substr(0, text.find('\n') + 1), text.substr(text.find('\n') + 1)}),
              std::multiset<std::string>({"Can't delete dir " + tmp.sub("top/dirlink") + failed(ENOTDIR) + "\n",
                                          "Can't stat " + tmp.sub("top/dangling") + failed(ENOENT) + "\n"}));
    EXPECT_TRUE(isDir(tmp.sub("top")) && isDir(tmp.sub("target")) && pathExists(tmp.sub("top/dangling")));
    EXPECT_FALSE(pathExists(tmp.sub("target/sub")) || pathExists(tmp.sub("top/a")) || pathExists(tmp.sub("top/sub")));

    unlink(tmp.sub("top/dirlink").c_str());
    unlink(tmp.sub("top/dangling").c_str());
    EXPECT_EQ(removeDirectoryAndContents(tmp.wsub("top"), errlist), 1);
    EXPECT_FALSE(pathExists(tmp.sub("top")));
    EXPECT_EQ(narrow(errlist), text);  // untouched on success

    const std::string missing = "Error in " + tmp.sub("top") + failed(ENOENT) + "\n";
    EXPECT_EQ(removeDirectoryContents(tmp.wsub("top"), errlist), 0);
    EXPECT_EQ(narrow(errlist), missing);
    std::string indent, narrowList = "kept\n";  // the narrow remover appends
    EXPECT_EQ(removeDirectoryContents(tmp.sub("top"), indent, narrowList), 0);
    EXPECT_EQ(narrowList, "kept\n" + missing);
}

TEST_F(FilesystemTest, CopyFileAndLinkTargets) {
    std::string longLine(2500, 'L');
    longLine[1000] = 'y';
    for (const std::string& content : {std::string(), "k=v\n\n#c\n" + longLine + "\n" + longLine,
                                       std::string(1000, 'k') + "\n", std::string("gr\xc3\xbc\xc3\x9f=\xe2\x82\xac\n"),
                                       std::string("latin-1 \xff\xfe and a cut \xe2\x82")}) {
        writeText(tmp.sub("src"), content);
        writeText(tmp.sub("dst"), std::string(5000, 'o'));  // an older, longer file is replaced
        EXPECT_EQ(copyFile(tmp.wsub("src").c_str(), tmp.wsub("dst").c_str()), 1);
        EXPECT_EQ(readText(tmp.sub("dst")), content);
    }
    ASSERT_EQ(mkfifo(tmp.sub("fifo").c_str(), 0600), 0);
    makeDirs(tmp.sub("dir"));
    auto copy = [](const std::string& from, const std::string& to) {
        return [=] { copyFile(widen(from).c_str(), widen(to).c_str()); };
    };
    writeText(tmp.sub("regular"), "");
    std::string target;
    ASSERT_EQ(symlink(std::string(1023, 't').c_str(), tmp.sub("fits").c_str()), 0);
    ASSERT_EQ(symlink(std::string(1024, 't').c_str(), tmp.sub("long").c_str()), 0);
    readsymln(target, tmp.sub("fits").c_str());
    EXPECT_EQ(target, std::string(1023, 't'));
    expectFatal({
        {copy(tmp.sub("nosuch"), tmp.sub("o")), "RLNCH0190E: Unable to open source file " + tmp.sub("nosuch") + " to be copied : "},
        {copy(tmp.sub("src"), tmp.sub("no/o")),
         "RLNCH0191E: Unable to open destination file " + tmp.sub("no/o") + " to be copied to : "},
        {copy(tmp.sub("fifo"), tmp.sub("o")), "RLNCH0190E: Unable to open source file " + tmp.sub("fifo") + " to be copied : "},
        {copy(tmp.sub("dir"), tmp.sub("o")), "RLNCH0190E: Unable to open source file " + tmp.sub("dir") + " to be copied : "},
        {[&] { readsymln(target, tmp.sub("long").c_str()); }, "RLNCH0184E: Getting command path failed! errno = "},
        {[&] { readsymln(target, tmp.sub("regular").c_str()); }, "RLNCH0184E: Getting command path failed! errno = 22 : "},
    });
    EXPECT_FALSE(pathExists(tmp.sub("o")) || pathExists(tmp.sub("o.new")));
}

}  // namespace
