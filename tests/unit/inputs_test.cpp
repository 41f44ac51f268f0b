// Inputs that a launch of the built launcher does not reach cheaply: a data
// property made of placeholders, a preload library that is not there, and
// inputs that end the launch, the bound on a launch's placeholder expansion
// among them.
#include <sys/resource.h>

#include <csignal>

#include "unit_support.h"

TEST(InputsTest, ThatALaunchDoesNotReach) {
    resetState(serial_multiuser);
    setenv("RCP_AREAS_DIR", "/srv/d", 1);
    unsetenv("LD_PRELOAD");
    Props data{{L"rcp.data", L"${env.RCP_AREAS_DIR}/${prop.s}\\"}, {L"s", L"w"}}, none;
    Props bad{{L"rcp.data", L"/x/${env.RCP_AREAS_UNSET}/${prop.s}"}, {L"s", L"v"}};
    Props gap{{L"config.initial.1", L"-initialCompleteFlag"}, {L"config.initial.3", L"k"}};
    Props last{{L"config.initial.1", L"-initialCompleteFlag"}};
    std::wstring installDir, ws;
    getWorkspaceLocation(ws, data, 0, nullptr, installDir);
    EXPECT_EQ(ws, L"/srv/d/w");  // one trailing separator dropped
    setPreload(L"/no such/libhook.so", L"ID");  // nothing to preload
    EXPECT_EQ(getenv("LD_PRELOAD"), nullptr);
    Props copies{{L"a0", std::wstring(100000, L'a')}};  // 4,000 copies of one large value
    for (int i = 1; i <= 4000; ++i) copies.add({{L"a" + std::to_wstring(i), L"${prop.a0}"}});
    TempDir pb;  // the launcher properties of a package-builder install, larger than a file may grow below
    writeText(pb.sub("rcplauncher.properties"), "# " + std::string(10000, 'p') + "\n");
    expectFatal({{[&] { getWorkspaceLocation(ws, bad, 0, nullptr, installDir); },
                  "RLNCH0099E: rcp.data property is invalid (/x/${env.RCP_AREAS_UNSET}/v) : "},
                 // the expansion of a launch's installation properties is bounded as a whole, the quoted value cut
                 {[&] { replacePlaceholdersInRcpInstallProp(L"/ws", L"/opt", copies); },
                  "RLNCH0088E: property substitution is invalid (" + std::string(256, 'a') + "...) : "},
                 {[&] {
                      const struct rlimit limit = {4096, 4096};
                      signal(SIGXFSZ, SIG_IGN);
                      eConfig = userpb, setrlimit(RLIMIT_FSIZE, &limit);
                      getInstallID(W(pb.sub("rcplauncher.properties")), none);
                  },
                  "RLNCH0018E: Error while writing to " + pb.sub("rcplauncher.properties") + " file. : "},
                 {[&] { resetMetaDataDirs(L"/no/ws", L"/no/ws/.config", L"/no/core"); },  // no list of directories
                  "RLNCH0106E: Unable to locate /no/core/rcpinstall.properties file. : "},
                 {[&] { eConfig = user, isInitialRequired(gap, none); },
                  "RLNCH0114E: Invalid config.initial arguments. config.initial.2 not found"},
                 {[&] { eConfig = user, isInitialRequired(last, none); },
                  "RLNCH0115E: Invalid config.initial arguments. -initialCompleteFlag not found"}});
}
