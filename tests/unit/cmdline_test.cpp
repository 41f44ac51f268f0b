// The child's command line and environment where a launch of the built
// launcher cannot show them: the builders' odd inputs, the library path, the
// preload link and the fatal inputs.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>

#include "unit_support.h"

namespace {

std::string env(const char* name) {
    const char* v = getenv(name);
    return v != nullptr ? v : "<unset>";
}

TEST(CmdlineTest, BuildersTakeOnlyWhatTheirOptionsGive) {
    auto vm = [](PropArray& p, WArgs& a) { addVmToCommandLine(p.v(), p.v(), a.argc(), a.argv()); };
    auto startup = [](PropArray& p, WArgs& a) { addStartupToCommandLine(p.v(), a.argc(), a.argv()); };
    auto options = [](PropArray& p, WArgs& a) {
        std::wstring dir = L"/i";
        addMainOptionsToCommandLine(p.v(), p.v(), a.argc(), a.argv(), dir);
    };
    const std::tuple<installCfg, Strings, std::function<void(PropArray&, WArgs&)>, Strings> cases[] = {
        {user, {L"l", L"-vm", L"/A", L"-vm", L"/C"}, vm, {L"/e", L"-vm", L"/A"}},  // the first wins
        {lockdown, {L"l", L"-vm"}, vm, {L"/e", L"-vm", L"/B/java"}},             // no value: as if absent
        {user, {L"l", L"-perfJar", L"/p/1.jar", L"-perfJar", L"/p/2.jar"}, startup, {L"/e", L"-startup", L"/p/1.jar"}},
        // the launcher's own pairs and orders are held back, by index only; nothing from -vmargs on reaches the
        // platform, even as the value of -vm
        {user, {L"l", L"-configuration", L"/c", L"-vm", L"/j", L"-k", L"-restart", L"-resetconfig", L"-vm", L"/b"}, options,
         {L"/e", L"-k", L"-vm", L"/b", L"-data", L"/ws", L"-configuration", L"/ws/.config"}},
        {user, {L"l", L"-vm", L"-vmargs", L"-a"}, options, {L"/e", L"-data", L"/ws", L"-configuration", L"/ws/.config"}},
    };
    for (const auto& [cfg, argv, build, expected] : cases) {
        resetState(cfg);
        launchArgs = {L"/e"};
        PropArray props{{L"vm", L"/B/java"}, {L"rcp.install.id", L"ID"}, {L"rcp.data", L"/ws"}};
        WArgs args(argv);
        build(props, args);
        EXPECT_EQ(launchArgs, expected) << narrow(argv[1]);
    }
    TempDir dir;
    writeText(dir.sub("bin/java"), "", 0755);
    std::wstring javaw = dir.wsub("bin/javaw"), java = dir.wsub("bin/java");
    EXPECT_TRUE(isJavaw(javaw, L"javaw", L"java"));
    EXPECT_EQ(javaw, java);
    EXPECT_FALSE(isJavaw(javaw, L"javaw", L"java") || replaceJavaExecutableName(javaw, L"java", L"jexec"));
    EXPECT_EQ(javaw, java);  // no such file: unchanged
}

TEST(CmdlineTest, LibraryPathHasNoEmptyPieces) {
    const std::tuple<const char*, const char*, const char*, const char*> cases[] = {  // prepend, inherited, append
        {nullptr, nullptr, nullptr, nullptr}, {"/p", "/c", "/a", "/p:/c:/a"}, {"/p", nullptr, "/a", "/p:/a"},
        {nullptr, "", "/a", "/a"}, {"", "/c", nullptr, "/c"}, {"", nullptr, "", nullptr}};
    for (const auto& [prepend, inherited, append, result] : cases) {
        resetState(user);
        inherited ? setenv("LD_LIBRARY_PATH", inherited, 1) : unsetenv("LD_LIBRARY_PATH");
        PropArray lib;
        if (prepend) addProps(lib, {{L"library.path.prepend", widen(prepend)}});
        if (append) addProps(lib, {{L"library.path.append", widen(append)}});
        addLibpathToCommandLine(lib.v());
        EXPECT_EQ(env("LD_LIBRARY_PATH"), result ? result : "<unset>") << (prepend ? prepend : "-") << (append ? append : "-");
    }
    unsetenv("LD_LIBRARY_PATH");
}

TEST(CmdlineTest, PreloadThroughOurOwnLink) {
    resetState(user);
    setenv("USER", "cmdtester", 1);
    TempDir dir;
    const std::wstring id = L"cmdt" + std::to_wstring(getpid()), lib = dir.wsub("my libs/libhook.so");
    const std::string link = "/tmp/kel.rcp.cmdtester." + narrow(id) + ".libhook.so";
    writeText(narrow(lib), "", 0755);
    unsetenv("LD_PRELOAD");
    setPreload(dir.wsub("my libs/none.so").c_str(), id.c_str());  // no such library: nothing set
    EXPECT_EQ(env("LD_PRELOAD"), "<unset>");
    struct stat made, kept;
    setPreload(lib.c_str(), id.c_str());
    ASSERT_EQ(lstat(link.c_str(), &made), 0);
    setPreload(lib.c_str(), id.c_str());  // a later launch keeps the link
    ASSERT_EQ(lstat(link.c_str(), &kept), 0);
    EXPECT_EQ(made.st_ino, kept.st_ino);
    EXPECT_EQ(std::filesystem::read_symlink(link), narrow(lib));
    EXPECT_EQ(env("LD_PRELOAD"), link);
    unlink(link.c_str());
    unsetenv("LD_PRELOAD");
}

TEST(CmdlineTest, FatalInputs) {
    resetState(user);
    TempDir dir;
    writeText(dir.sub("plain/macosx/x86/eclipse"), "", 0644);
    writeText(dir.sub("lib with blank.so"), "");
    PropArray none, vmx{{L"vmx", L"/B/java"}}, preload{{L"library.preload", L"/x.so"}};
    PropArray notExecutable{{L"rcp.base.location", dir.wsub("plain")}};
    PropArray gap{{L"config.initial.1", L"-initialCompleteFlag"}, {L"config.initial.2", L"k"}, {L"config.initial.4", L"x"}};
    PropArray flagLast{{L"config.initial.1", L"-a"}, {L"config.initial.2", L"-initialCompleteFlag"}};
    WArgs args{L"l", L"-vm"};
    std::wstring vm = dir.wsub("java"), installDir = L"/i";
    expectFatal({
        {[&] { addVmToCommandLine(vmx.v(), none.v(), args.argc(), args.argv()); }, "RLNCH0002E: vm string must be specified!"},
        {[&] { isJavaw(vm, L"java", L"javaz"); }, "RLNCH0003E: Specified vm (" + dir.sub("javaz") + ") does not exist!"},
        {[&] { addMainOptionsToCommandLine(vmx.v(), none.v(), 1, args.argv(), installDir); },
         "RLNCH0005E: Couldn't find the rcp.install.id property!"},
        {[&] { addLdPreloadToCommandLine(preload.v()); }, "RLNCH0005E: Couldn't find the rcp.install.id property!"},
        {[&] { unsetenv("USER"); setPreload(dir.wsub("lib with blank.so").c_str(), L"ID"); },
         "RLNCH0006E: Couldn't find the user name!"},
        {[&] { addBaseEclipseToCommandLine(notExecutable.v()); },
         "RLNCH0007E: " + dir.sub("plain") + "/macosx/x86/eclipse is not executable or does not exist."},
        {[&] { addBaseEclipseToCommandLine(none.v()); }, "RLNCH0011E: Unable to determine RCP Base"},
        {[&] { isInitialRequired(gap.v(), none.v()); }, "RLNCH0114E: Invalid config.initial arguments. config.initial.3 not found"},
        {[&] { isInitialRequired(flagLast.v(), none.v()); },
         "RLNCH0115E: Invalid config.initial arguments. -initialCompleteFlag not found"},
        {[&] { if (chdir(dir.path().c_str()) == 0) setPreload(L"lib with blank.so", L"ID"); },
         "RLNCH0189E: Couldn't find filename for library.preload property"},
    });
}

}  // namespace
