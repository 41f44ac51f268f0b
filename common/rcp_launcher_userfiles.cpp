// The per-user files of a configuration area, made on the first launch into
// it: the user's rcpinstall.properties (the installation's copy filtered for
// this platform, with the values the launcher computed appended), config.ini
// and the update manager's platform.xml. Existing files are never touched.
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// The values appended to the per-user file, in their order: the key written,
// the launcher property it comes from, whether it is a path (backslashes made
// "/", then escaped so that the reader gives the path back unchanged), and
// whether the file cannot be completed without it (RLNCH0008E). The values are
// the launcher properties' own texts; placeholders are expanded when the file
// is read.
struct AppendedValue {
    const wchar_t* key;
    const wchar_t* source;
    bool path;
    bool required;
};
constexpr AppendedValue APPENDED_VALUES[] = {
    {RCP_INSTALL_ID_PROPERTY, RCP_INSTALL_ID_PROPERTY, false, true},
    {RCP_DATA_PROPERTY, RCP_DATA_PROPERTY, true, false},
    {VM, JVM_LOCATION, true, true},
    {RCP_BASE_LOC_PROPERTY, RCP_BASE_LOC_PROPERTY, true, true},
    {CONFIGURATION_PROPERTY, CONFIGURATION_PROPERTY, false, true},
    {LOCALE_PROPERTY, LOCALE_PROPERTY, false, false},
    {BIDI_PROPERTY, BIDI_PROPERTY, false, false},
};

bool hasRequiredValues(const std::vector<String>& props) {
    for (const AppendedValue& v : APPENDED_VALUES)
        if (v.required && findProperty(v.source, props) == nullptr) return false;
    return true;
}

// "key=value\n" for every appended value the launcher properties hold.
wstring appendedBlock(const std::vector<String>& props) {
    wstring block;
    for (const AppendedValue& v : APPENDED_VALUES) {
        String value = findProperty(v.source, props);
        if (value == nullptr) continue;
        block += v.key;
        block += EQUALS_CHAR;
        if (v.path) {
            wstring path = value;
            convertBS2S(path);
            convWcharTo8859_1_Value(path, block);
        } else {
            block += value;
        }
        block += NEWLINE;
    }
    return block;
}

void writeCopiedLine(FILE* out, const wstring& line) {
    if (!putWide(out, line + NEWLINE)) {
        SvcDebugOutA(
            "RLNCH0001E: Error while copying base rcpinstall.properties to user specific rcpinstall.properties file.");
    }
}

}  // namespace

wstring getCoreFileLocation(const wstring& coreLocation, const wchar_t* filename) {
    const wstring name = filename != nullptr ? filename : L"";
    // Built as one name, so that an empty sub-folder deliberately leaves the
    // design's "config//name": the path is still valid and matches what
    // existing installations expect.
    const wstring subFolder = installCfgTraits().coreSubFolder;
    const wstring candidate = joinPath(coreLocation, wstring(CORE_CONFIG_DIR) + L"/" + subFolder + L"/" + name);
    if (exists(candidate.c_str())) return candidate;

    return joinPath(coreLocation, name);
}

wstring createRCPInstallProps(const wstring& workspaceLocation, const wstring& configLocation,
                              const wstring& baseLocation, const wstring& installDir, std::vector<String> propsArray) {
    const wstring propPath = joinPath(configLocation, INSTALL_PROPS);
    if (exists(propPath.c_str())) return propPath;

    // The plain copy is made under a name of its own and only the finished
    // file is renamed to the per-user name, so that name never holds a file
    // without the computed values: a launch killed half-way leaves work files
    // that the next launch makes again, not a copy that every later launch
    // would keep and fail on (no base location, no JVM).
    const wstring basePath = getCoreFileLocation(baseLocation, INSTALL_PROPS);
    const wstring copyPath = propPath + BASE_COPY_SUFFIX;
    if (!copyFile(basePath.c_str(), copyPath.c_str()))
        fatalErrorExit("RLNCH0022E: Unable to copy rcpinstall.properties to the user directory.");

    // Without the required values the launch ends while the copy is
    // completed; the plain copy is then meant to stay under the per-user
    // name, as the administrator's evidence, and is kept by later launches.
    const bool complete = hasRequiredValues(propsArray);
    wstring inPath = complete ? copyPath : propPath;
    if (!complete) moveFile(copyPath.c_str(), propPath.c_str());

    wstring newPropPath = propPath + WORK_FILE_SUFFIX;
    const int fixed = fixUserRCPInstallProperties(workspaceLocation, inPath, newPropPath, installDir, propsArray);
    deleteFile(copyPath.c_str());

    // One rename puts the finished file in place. When the work file could
    // not be written in full (a full disk) or renamed, no per-user file is
    // left: the read that follows fails (RLNCH0014E) and the next launch
    // builds the file again.
    if (fixed != 0 || !moveFile(newPropPath.c_str(), propPath.c_str())) {
        deleteFile(newPropPath.c_str());
        deleteFile(propPath.c_str());
    }

    userFirstLaunch = true;
    return propPath;
}

int fixUserRCPInstallProperties(const wstring& workspaceLocation, wstring& propPath, wstring& newPropPath,
                                const wstring& installDir, std::vector<String>& propsArray) {
    (void)workspaceLocation;
    (void)installDir;
    const wstring inPath = nativePath(propPath);
    const wstring outPath = nativePath(newPropPath);

    FILE* in = nullptr;
    open_file(in, inPath.c_str(), L"r");
    FILE* out = createWorkFile(outPath);
    if (in == nullptr || out == nullptr) {
        SvcDebugOutA(
            "RLNCH0074E: Unable to open user specific rcpinstall.properties and temporary rcpinstall.properties "
            "files.");
        if (in != nullptr) fclose(in);
        if (out != nullptr) finishWorkFile(out, outPath);
        return -1;
    }

    rewind(in);
    bool bPropertyContinuation = false;         // a kept property continues on the next line
    bool bInvalidPropertyContinuation = false;  // a dropped property continues on the next line
    wstring line;
    while (!feof(in) && readTemplateLine(in, line) > 0) {
        if (bInvalidPropertyContinuation) {
            bInvalidPropertyContinuation = isContinuationLine(line);
            bPropertyContinuation = false;
            continue;
        }
        if (bPropertyContinuation) {
            bPropertyContinuation = isContinuationLine(line);
            writeCopiedLine(out, line);
            continue;
        }
        if (isComment(line)) {
            writeCopiedLine(out, line);
            continue;
        }
        bPropertyContinuation = isContinuationLine(line);
        if (processFilterKey(line)) {
            // Another platform's line: its continuation lines go with it.
            if (bPropertyContinuation) {
                bInvalidPropertyContinuation = true;
                bPropertyContinuation = false;
            }
            continue;
        }
        writeCopiedLine(out, line);
    }
    fclose(in);

    // The values this launch computed. The reader takes the first occurrence
    // of a key, so a key already in the base file keeps the base file's value.
    if (!hasRequiredValues(propsArray)) {
        // The plain copy stays in place (and the work file beside it).
        fclose(out);
        fatalErrorExit(
            "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file.");
    }

    // The block is expanded as a text without arguments ("%%" gives "%"),
    // never handed to printf as a format. Only a work file whose every line
    // reached the disk counts as written.
    putWide(out, formatWithoutArgs(appendedBlock(propsArray)));
    if (!finishWorkFile(out, outPath)) {
        SvcDebugOutA("RLNCH0015E: Unable to append values to user specific rcpinstall.properties file.");
        return -1;
    }
    return 0;
}

void createConfigIni(const wstring& configLocation, const wstring& baseLocation) {
    const wstring target = joinPath(configLocation, CONFIG_INI);
    if (exists(target.c_str())) return;

    // copyFile puts the file in place only once it is complete, so a launch
    // killed during the copy leaves no cut file for later launches to keep.
    const wstring basePath = getCoreFileLocation(baseLocation, CONFIG_INI);
    if (!copyFile(basePath.c_str(), target.c_str()))
        fatalErrorExit("RLNCH0009E: Unable to copy config.ini to the user directory.");
    userFirstLaunch = true;
}

int createPlatformXML(const wstring& configLocation, const wstring& baseLocation,
                      std::vector<String> rcpLauncherPropertiesArray) {
    // A package-builder installation manages its own update sites.
    if (eConfig == userpb) return 0;

    const wstring updateDir = joinPath(configLocation, UPDATE_DIR);
    ensureDirectory(updateDir);

    const wstring target = joinPath(updateDir, PLATFORM_XML);
    if (exists(target.c_str())) return 0;

    // A managed update policy means the platform writes its own file.
    String policy = findProperty(UPDATE_POLICY_MGD, rcpLauncherPropertiesArray);
    if (policy != nullptr && wcscmp(policy, L"false") == 0) return 0;

    const wstring basePath = getCoreFileLocation(baseLocation, PLATFORM_XML);
    FILE* in = nullptr;
    open_file(in, basePath.c_str(), L"r");
    if (in == nullptr) {
        SvcDebugOutW(L"RLNCH0104E: Unable to open platform.xml.\"%s\"", basePath.c_str());
        return -1;
    }
    // Written under a work name and renamed into place once complete, so that
    // neither a launch killed half-way nor a full disk leaves a cut file for
    // later launches to keep: without a file, the next launch writes it again.
    const wstring work = target + WORK_FILE_SUFFIX;
    FILE* out = createWorkFile(work);
    if (out == nullptr) {
        SvcDebugOutW(L"RLNCH0105E: Unable to open platform.xml for writing.\"%s\"", target.c_str());
        fclose(in);
        return -1;
    }

    rewind(in);
    wstring line;
    bool written = true;
    while (written && !feof(in) && readTemplateLine(in, line) > 0) {
        // The JVM's feature is filled in by the platform at run time.
        if (line.find(JVM_FEATUREID_REPLACE) != wstring::npos) line = FEATURE_LINE;
        if (line.find(JVM_PARENT_FEATUREID_REPLACE) != wstring::npos) line = FEATURE_LINE;
        written = putWide(out, line + NEWLINE);
    }
    fclose(in);
    // A copy that was begun counts as this launch's first launch into the
    // area, whether or not it could be finished (as the design has it): a
    // user who is missing the file is provisioned again.
    userFirstLaunch = true;
    // A failed write leaves the stream's error flag set, so this also covers
    // what only the flush and the close report (a full disk).
    if (!finishWorkFile(out, work)) {
        SvcDebugOutA("RLNCH0103E: Error while copying platform.xml to user specific platform.xml file.");
        return 0;
    }
    if (!moveFile(work.c_str(), target.c_str())) {
        SvcDebugOutW(L"RLNCH0105E: Unable to open platform.xml for writing.\"%s\"", target.c_str());
        deleteFile(work.c_str());
        return -1;
    }
    return 0;
}
