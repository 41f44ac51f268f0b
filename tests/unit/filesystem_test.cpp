// The file-system layer: mkdirs, and tree removal with its error list (the
// reset's list of directories to remove among them).
#include <algorithm>

#include "unit_support.h"

TEST(FilesystemTest, Mkdirs) {
    TempDir tmp;
    std::string b = tmp.path(), backslashed = b, fits = b;
    std::replace(backslashed.begin(), backslashed.end(), '/', '\\');
    // fits: 1023 characters in short components; one more is refused
    while (fits.size() < 1023) fits += "/" + std::string(std::min<size_t>(200, 1022 - fits.size()), 'd');
    writeText(b + "/file", "x");
    const std::tuple<std::string, int, std::string> cases[] = {  // path, result, directory made
        {b + "/a/b/c", 1, b + "/a/b/c"}, {b + "/a", 0, b + "/a"}, {b.substr(1) + "/rel/x", 1, b + "/rel/x"},
        {backslashed + "\\bs\\y", 1, b + "/bs/y"}, {b + "//mix\\\\/z//", 1, b + "/mix/z"}, {b + "/file/sub", 0, ""},
        {"", 1, ""}, {fits, 1, fits}, {fits + "e", 0, ""}};
    for (const auto& [path, result, made] : cases) {
        EXPECT_EQ(mkdirs(W(path).c_str()), result) << path.size();
        EXPECT_EQ(isDir(made), !made.empty()) << made;
    }
}

TEST(FilesystemTest, RemovalAndItsErrorList) {
    TempDir tmp;
    auto error = [&](const std::string& what, const std::string& path, int err) {
        return W(what + tmp.sub(path) + "  -  Failed with error " + std::to_string(err) + ": " + strerror(err) + "\n");
    };
    for (const char* f : {"top/a", "top/sub/deeper/c", "target/sub/t"}) writeText(tmp.sub(f), f);
    ASSERT_EQ(symlink(tmp.sub("target").c_str(), tmp.sub("top/dirlink").c_str()), 0);
    ASSERT_EQ(symlink(tmp.sub("nowhere").c_str(), tmp.sub("top/dangling").c_str()), 0);
    std::wstring errlist = L"old\n";  // replaced on failure, kept on success
    EXPECT_EQ(removeDirectoryAndContents(W(tmp.sub("top")), errlist), 0);
    // A link is followed into its target, which is emptied; the link, the target and the top directory stay.
    const std::wstring link = error("Can't delete dir ", "top/dirlink", ENOTDIR), failed = errlist;
    const std::wstring dangling = error("Can't stat ", "top/dangling", ENOENT);
    EXPECT_EQ(errlist == dangling + link ? link + dangling : errlist, link + dangling);  // in either order
    EXPECT_TRUE(isDir(tmp.sub("target")));
    for (const char* gone : {"target/sub", "top/sub"}) EXPECT_FALSE(pathExists(tmp.sub(gone))) << gone;
    for (const char* l : {"top/dirlink", "top/dangling"}) unlink(tmp.sub(l).c_str());
    EXPECT_EQ(removeDirectoryAndContents(W(tmp.sub("top")), errlist), 1);
    EXPECT_EQ(errlist, failed);
    EXPECT_EQ(removeDirectoryContents(W(tmp.sub("top")), errlist), 0);
    EXPECT_EQ(errlist, error("Error in ", "top", ENOENT));
    // A reset removes the plug-in state directories its installation lists: no list, no reset.
    expectFatal({{[&] { resetMetaDataDirs(L"/no/ws", L"/no/ws/.config", L"/no/core"); },
                  "RLNCH0106E: Unable to locate /no/core/rcpinstall.properties file. : "}});
}
