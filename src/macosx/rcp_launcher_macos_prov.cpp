// Running the provisioning child: the prepared command line is started with
// fork/execv and the launcher waits for it to end.
#include <sys/types.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "rcp_launcher.h"

void doProvisioning(std::vector<String>& /*launcherPropsArray*/, std::vector<String>& /*installPropsArray*/,
                    const wchar_t* /*executable*/, const std::vector<std::wstring>& launchArgs) {
    std::vector<char*> cargs;
    cargs.reserve(launchArgs.size() + 1);
    SvcDebugOutA("RLNCH0129I: ===== Begin Provisioning Parameters =====");
    for (const std::wstring& arg : launchArgs) {
        std::string argA;
        wstrtocs(argA, arg);
        char* copy = strdup(argA.c_str());
        if (copy == nullptr) fatalErrorExit("RLNCH0004E: malloc failed!");
        cargs.push_back(copy);
        SvcDebugOutA("%s", copy);
    }
    cargs.push_back(nullptr);
    SvcDebugOutA("RLNCH0130I: ===== End Provisioning Parameters =====");

    // Nothing to start without a program.
    if (!launchArgs.empty()) {
        pid_t child = fork();
        if (child == 0) {
            execv(cargs[0], cargs.data());
            // execv failed: the child carries on like the parent (it releases
            // the lock and ends with status 0).
        } else if (child > 0) {
            int status = 0;
            while (waitpid(child, &status, 0) == -1 && errno == EINTR) {
            }
        }
    }

    for (char* arg : cargs) free(arg);
}
