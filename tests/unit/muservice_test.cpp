// The order in which the child's command line is assembled for each kind of
// launch, the shared-classes clean-up, and the multi-user service's area.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <climits>
#include <cstdlib>

#include "cmd_test_support.h"

using cmdtest::Args;
using rcptest::PropArray;
using rcptest::TempDir;
using rcptest::WArgs;

namespace {

class MuServiceTest : public ::testing::Test {
protected:
    void SetUp() override {
        cmdtest::resetCommandState(user);
        setenv("USER", "cmdtester", 1);
        inst_ = dir_.wpath();
        base_ = dir_.wsub("base");
        rcptest::writeText(dir_.sub("base/macosx/x86/eclipse"), "", 0755);
    }
    // Installation properties as the startup sequence read them, placeholders
    // still to be expanded, plus the extra pairs.
    void fill(PropArray& install, std::initializer_list<std::pair<std::wstring, std::wstring>> extra = {}) {
        std::vector<std::pair<std::wstring, std::wstring>> all{
            {L"rcp.base.location", base_}, {L"rcp.install.id", L"ID"}, {L"vm", L"/jvm/java"},
            {L"cp", L"${rcp.home}/boot.jar"}, {L"application", L"app"}, {L"provisioning.application", L"prov"},
            {L"vmarg.1", L"-Dva=1"}, {L"env.set.CMDT_ENV", L"set"}};
        all.insert(all.end(), extra);
        for (const auto& kv : all) {
            install.v().push_back(copyString(kv.first.c_str()));
            install.v().push_back(copyString(kv.second.c_str()));
        }
    }

    TempDir dir_;
    std::wstring inst_, base_;
};

TEST_F(MuServiceTest, EachKindOfLaunchHasItsOwnOrder) {
    const std::wstring eclipse = base_ + L"/macosx/x86/eclipse", svcWs = inst_ + L"/eclipse/.workspace";
    const std::wstring muWs = inst_ + L"/eclipse/.muservice";
    auto dashD = [&](const std::wstring& ws, const wchar_t* cfg) {
        return Args{L"-Drcp.home=" + inst_, L"-Drcp.data=" + ws, L"-Dcom.kel.rcp.install.id=ID",
                    std::wstring(L"-Drcp.install.config=") + cfg, L"-Drcp.osgi.install.area=" + inst_ + L"/rcp/eclipse",
                    L"-cp", inst_ + L"/boot.jar"};
    };
    auto cat = [](std::initializer_list<Args> parts) {
        Args all;
        for (const Args& p : parts) all.insert(all.end(), p.begin(), p.end());
        return all;
    };
    // "-console" keeps the console fix away but reaches the platform.
    const Args platform{L"-x", L"-console", L"-data", L"/ws", L"-configuration", L"/ws/.config", L"-application",
                        L"app"};
    const Args startup{L"-startup", base_ + L"/launcher.jar", L"-vmargs", L"-Dva=1"};
    struct Case {
        installCfg cfg;
        bool mainProcess, provisioning, bRelaunch;
        Args expected;
    };
    const Case cases[] = {
        {user, false, false, false,
         cat({{eclipse}, platform, {L"-vm", L"/jvm/java", L"-useDaemon", L"4711"}, startup, dashD(L"/ws", L"user")})},
        {lockdown, true, false, false,
         cat({{eclipse}, platform, {L"-vm", L"/jvm/java"}, startup, dashD(L"/ws", L"lockdown")})},
        {service, false, false, false,
         cat({{L"/jvm/java", L"-Dva=1"}, dashD(svcWs, L"service"),
              {L"org.eclipse.core.launcher.Main", L"-nosplash", L"-x", L"-console", L"-data", svcWs,
               L"-configuration", inst_ + L"/eclipse/.config", L"-application", L"app"}})},
        {multiuser, true, true, true,
         cat({{eclipse}, platform, {L"-application", L"prov", L"-userProvLaunch", L"-vm", L"/jvm/java"}, startup,
              dashD(L"/ws", L"multiuser")})},
        {user, false, true, false,
         cat({{eclipse}, platform, {L"-application", L"prov", L"-vm", L"/jvm/java"}, startup,
              dashD(L"/ws", L"user")})},
        // The service's JVM boots from the base plug-in's startup.jar in the
        // service's own area, whatever "cp" says.
        {multiuser_service, true, false, false,
         {L"/jvm/java", L"-Dva=1", L"-Drcp.home=" + inst_, L"-Drcp.data=" + muWs, L"-Dcom.kel.rcp.install.id=ID",
          L"-Drcp.install.config=multiuser", L"-Drcp.osgi.install.area=" + inst_ + L"/rcp/eclipse", L"-cp",
          base_ + L"/startup.jar", L"org.eclipse.core.launcher.Main", L"-nosplash", L"-x", L"-console", L"-data",
          muWs, L"-configuration", muWs + L"/.config", L"-application", L"app"}},
    };
    for (const Case& c : cases) {
        cmdtest::resetCommandState(c.cfg, c.mainProcess);
        pid = 4711;
        unsetenv("CMDT_ENV");
        unsetenv("JAVA_HIGH_ZIPFDS");
        PropArray install, launcher;
        fill(install);
        WArgs args{L"l", L"-data", L"/ws", L"-x", L"-console"};
        getUserCmdString(L"/ws", args.argc(), args.argv(), inst_, install.v(), launcher.v(), c.provisioning,
                         c.bRelaunch);
        EXPECT_EQ(launchArgs, c.expected) << c.cfg << " provisioning " << c.provisioning;
        // The environment builders close every order.
        EXPECT_STREQ(getenv("CMDT_ENV"), "set");
        EXPECT_STREQ(getenv("JAVA_HIGH_ZIPFDS"), "500");
    }
}

TEST_F(MuServiceTest, SharedClassesAreClearedForANewProvisioningLevel) {
    const std::string shared = dir_.sub("shared");
    struct Case {
        const wchar_t *installLevel, *launcherLevel;
        bool cleared;
    };
    for (const Case& c : {Case{L"1", L"2", true}, Case{nullptr, L"2", true}, Case{L"2", L"2", false}}) {
        cmdtest::resetCommandState(user);
        rcptest::writeText(shared + "/cache/a.bin", "x");
        PropArray install, launcher;
        fill(install, {{L"jvm.shareclasses.fullpath", rcptest::widen(shared)}});
        for (auto* p : {&install, &launcher}) {
            const wchar_t* level = p == &install ? c.installLevel : c.launcherLevel;
            if (!level) continue;
            p->v().push_back(copyString(L"provisioning.manifest.version"));
            p->v().push_back(copyString(level));
        }
        WArgs args{L"l", L"-data", L"/ws"};
        getUserCmdString(L"/ws", args.argc(), args.argv(), inst_, install.v(), launcher.v(), false, false);
        EXPECT_TRUE(rcptest::isDir(shared));  // the directory itself stays
        EXPECT_EQ(rcptest::pathExists(shared + "/cache"), !c.cleared);
    }

    // A failed clean-up is reported and the launch goes on.
    cmdtest::resetCommandState(user);
    PropArray install, launcher;
    fill(install, {{L"jvm.shareclasses.fullpath", dir_.wsub("none")}});
    WArgs args{L"l", L"-data", L"/ws"};
    getUserCmdString(L"/ws", args.argc(), args.argv(), inst_, install.v(), launcher.v(), false, false);
    const std::string& log = getLogQueue();
    EXPECT_NE(log.find("\nRLNCH0086E begin: Error removing shared classes directory\nError in " + dir_.sub("none")),
              std::string::npos)
        << log;
    EXPECT_NE(log.find("RLNCH0087E end: Unable to remove all files in the shared classes directory. Please correct "
                       "the problems listed above : "),
              std::string::npos);
    EXPECT_EQ(launchArgs.front(), base_ + L"/macosx/x86/eclipse");
}

TEST_F(MuServiceTest, ServiceAreaIsPreparedOnlyByTheSuperuserOrTheService) {
    if (geteuid() != 0) GTEST_SKIP() << "needs the superuser";
    rcptest::writeText(dir_.sub("base/rcpinstall.properties"), "application=svc.app\n");
    rcptest::writeText(dir_.sub("base/config.ini"), "osgi.bundles=x\n");
    rcptest::writeText(dir_.sub("base/platform.xml"), "<config/>\n");
    PropArray launcher{{L"rcp.install.id", L"ID"}, {L"rcp.base.location", L"${rcp.home}/base"},
                       {L"jvm.location", L"/jvm/java"}, {L"install.configuration", L"multiuser"}};
    WArgs args{L"l"};
    for (installCfg cfg : {multiuser, multiuser_service}) {
        cmdtest::resetCommandState(cfg);
        setDebug(true);
        rcptest::removeTree(dir_.sub("eclipse"));
        std::vector<String> install;
        std::wstring workspace;
        createMUServiceWkspc(workspace, inst_, install, launcher.v(), args.argc(), args.argv());
        EXPECT_EQ(workspace, inst_ + L"/eclipse/.muservice");
        EXPECT_TRUE(rcptest::pathExists(dir_.sub("eclipse/.muservice/.config/org.eclipse.update/platform.xml")));
        String app = findProperty(L"application", install);  // the service's own properties were read
        EXPECT_STREQ(app ? app : L"<none>", L"svc.app");
        EXPECT_NE(getLogQueue().find(cfg == multiuser ? "RLNCH0043I: UserName: cmdtester\n"
                                                      : "RLNCH0043I: UserName: muservice\n"),
                  std::string::npos);
        freeProperties(install);
    }
    rcptest::removeTree(dir_.sub("eclipse"));

    cmdtest::resetCommandState(user);
    EXPECT_EXIT(
        {
            if (setuid(65534) != 0) exit(2);
            std::vector<String> install;
            std::wstring ws = L"unchanged";
            createMUServiceWkspc(ws, inst_, install, launcher.v(), args.argc(), args.argv());
            exit(ws == L"unchanged" && install.empty() ? 0 : 1);
        },
        ::testing::ExitedWithCode(0), "");
    EXPECT_FALSE(rcptest::pathExists(dir_.sub("eclipse")));
    std::vector<String> none;
    std::wstring ws;
    EXPECT_FATAL_IN(dir_, unsetenv("USER"); createMUServiceWkspc(ws, inst_, none, launcher.v(), 1, args.argv()),
                    "RLNCH0006E: Couldn't find the user name!");
}

// The service start needs its launcher in the service layout: this program
// copies itself there and runs the copy, which starts the service from this
// environment instead of running tests and writes down the command line and
// the environment variables it built.
const char* const SERVICE_PROBE_OUT = "RCP_MUSERVICE_PROBE_OUT";

class ServiceStartProbe : public ::testing::Environment {
public:
    void SetUp() override {
        const char* out = getenv(SERVICE_PROBE_OUT);
        if (out == nullptr) return;
        cmdtest::resetCommandState(undefined, true);
        enableLogging(rcptest::widen(std::string(out) + ".log"));
        unsetenv("JAVA_HIGH_ZIPFDS");
        WArgs args{L"probe", L"-x"};
        startupMUService(args.argc(), args.argv());
        std::string text;
        for (const std::wstring& a : launchArgs) text += rcptest::narrow(a) + "\n";
        for (const char* name : {"SVC_ENV", "JAVA_HIGH_ZIPFDS"}) {
            const char* value = getenv(name);
            text += std::string(name) + "=" + (value != nullptr ? value : "<unset>") + "\n";
        }
        rcptest::writeText(out, text);
        _exit(eConfig == multiuser_service ? 0 : 3);
    }
};
const ::testing::Environment* const serviceProbe = ::testing::AddGlobalTestEnvironment(new ServiceStartProbe);

TEST(MuServiceStart, ServiceIsStartedFromItsOwnAreaInTheServiceLayout) {
    TempDir dir;
    char* resolved = realpath(dir.path().c_str(), nullptr);
    ASSERT_NE(resolved, nullptr);
    const std::string inst = resolved;
    free(resolved);
    // The service directory is two levels, the installation six levels above
    // the launcher's directory.
    const std::string svc = inst + "/p1/p2/p3/svc", probe = svc + "/b1/b2/probe";
    std::string self;
    read_executable_path(self);
    rcptest::writeText(probe, rcptest::readText(self), 0755);
    rcptest::writeText(svc + "/rcp/rcplauncher.properties",
                       "rcp.install.id=SVC1\nrcp.base.location=${rcp.home}/base\njvm.location=/jvm/java\n"
                       "install.configuration=lockdown\n");
    rcptest::writeText(inst + "/base/rcpinstall.properties",
                       "application=svc.app\ncp=/ignored.jar\n-Dsvc=1\nenv.set.SVC_ENV=on\n");
    rcptest::writeText(inst + "/base/config.ini", "osgi.bundles=x\n");
    rcptest::writeText(inst + "/base/platform.xml", "<config/>\n");

    const std::string out = dir.sub("answer");
    pid_t child = fork();
    if (child == 0) {
        setenv(SERVICE_PROBE_OUT, out.c_str(), 1);
        if (freopen("/dev/null", "w", stdout) == nullptr || freopen("/dev/null", "w", stderr) == nullptr) _exit(126);
        execl(probe.c_str(), probe.c_str(), "--gtest_filter=MuServiceStart.*", static_cast<char*>(nullptr));
        _exit(127);
    }
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 0) << rcptest::readText(out + ".log");

    const std::string ws = inst + "/eclipse/.muservice";
    const std::vector<std::string> expected = {
        "/jvm/java", "-Drcp.home=" + inst, "-Drcp.data=" + ws, "-Dcom.kel.rcp.install.id=SVC1",
        "-Drcp.install.config=multiuser", "-Dsvc=1", "-Drcp.osgi.install.area=" + inst + "/eclipse", "-cp",
        inst + "/base/startup.jar", "org.eclipse.core.launcher.Main", "-nosplash", "-x", "-data", ws,
        "-configuration", ws + "/.config", "-application", "svc.app", "SVC_ENV=on", "JAVA_HIGH_ZIPFDS=500"};
    std::vector<std::string> lines;
    std::string answer = rcptest::readText(out);
    for (size_t from = 0, nl; (nl = answer.find('\n', from)) != std::string::npos; from = nl + 1)
        lines.push_back(answer.substr(from, nl - from));
    EXPECT_EQ(lines, expected) << rcptest::readText(out + ".log");
    // The service's own installation properties, with the computed block.
    EXPECT_NE(rcptest::readText(ws + "/.config/rcpinstall.properties").find("vm=/jvm/java\n"), std::string::npos);
    EXPECT_TRUE(rcptest::pathExists(ws + "/.config/config.ini"));
}

}  // namespace
