// "-config NAME": the arguments listed as config.NAME.1, config.NAME.2, ... in
// the launcher properties are merged into the launcher's own arguments.
#include <cstdlib>
#include <cwchar>
#include <string>

#include "rcp_launcher.h"

namespace {

// Options that the platform takes once; a second occurrence of the word
// (not its value) is removed after the merge. "-personality" is listed twice
// on purpose: a third occurrence goes as well.
const wchar_t* const SINGLE_VALUED_OPTIONS[] = {VMARG,          DATAARG, PLUGINCUSTARG,  APPARG, PRODUCTARG,
                                                PERSONALITYARG, NLARG,   PERSONALITYARG, DIRARG};

}  // namespace

bool addConfigExtentionsToArg(int* cargc, wchar_t*** cargv, int argc, wchar_t** argv,
                              std::vector<String> rcpLauncherPropertiesArray, std::vector<wstring>& newargs) {
    const wchar_t* configName = optionValue(CONFIGOPTARG, argc, argv);
    if (configName == nullptr) return false;
    const wstring configOption = configName;
    const int configOptionIDX = findOption(CONFIGOPTARG, argc, argv);

    // cargv will point into newargs, so it must hold exactly this call's list.
    newargs.clear();
    int vmargsIDX = -1;
    // Whether the arguments hold "-vmargs" at all: vmargsIDX can be -1 for a
    // "-vmargs" near the start, so it cannot tell.
    bool vmargsInArgv = false;
    for (int i = 0; i < argc; ++i) {
        if (i == configOptionIDX || i == configOptionIDX + 1) continue;
        const wchar_t* arg = argv[i];
        newargs.push_back(arg);
        // The position in argv minus the two skipped words: right when
        // "-config NAME" came before "-vmargs", two places too early otherwise.
        if (wcscmp(arg, VMARGS) == 0) {
            vmargsIDX = i - 2;
            vmargsInArgv = true;
        }
    }

    bool bvmargsFound = false;
    for (int j = 1;; ++j) {
        const wstring key = L"config." + configOption + L"." + std::to_wstring(j);
        const wchar_t* configExt = findProperty(key.c_str(), rcpLauncherPropertiesArray);
        if (configExt == nullptr) break;
        if (configExt[0] == 0) continue;  // empty entries keep the numbering going

        if (!vmargsInArgv) {
            newargs.push_back(configExt);
        } else if (wcscmp(configExt, VMARGS) == 0) {
            bvmargsFound = true;  // what follows belongs after the own VM arguments
        } else if (!bvmargsFound) {
            // Before the command line's own "-vmargs". With "-vmargs" ahead of
            // "-config" the point comes out too early, even before the program
            // (element 0); inserted there, the extension would become the
            // program and the launcher's own path a platform argument. So the
            // earliest place is right after the program.
            size_t at = vmargsIDX < 1 ? 1 : static_cast<size_t>(vmargsIDX);
            if (at > newargs.size()) at = newargs.size();
            newargs.insert(newargs.begin() + static_cast<std::ptrdiff_t>(at), configExt);
            vmargsIDX = static_cast<int>(at) + 1;
        } else {
            newargs.push_back(configExt);
        }
    }

    for (const wchar_t* option : SINGLE_VALUED_OPTIONS) removeDuplicates(newargs, option);

    const size_t count = newargs.size();
    wchar_t** args = static_cast<wchar_t**>(malloc((count == 0 ? 1 : count) * sizeof(wchar_t*)));
    if (args == nullptr) fatalErrorExit("RLNCH0004E: malloc failed!");
    for (size_t i = 0; i < count; ++i) args[i] = &newargs[i][0];
    *cargc = static_cast<int>(count);
    *cargv = args;
    return true;
}
