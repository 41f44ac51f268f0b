// The per-user files of a configuration area, made on the first launch into
// it: the user's rcpinstall.properties (the installation's copy filtered for
// this platform, with the values the launcher computed appended), config.ini
// and the update manager's platform.xml. Existing files are never touched.
#include <cwchar>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// Template files live below <core>/config/<sub-folder>; the sub-folder
// depends on the install configuration.
const wchar_t* coreSubFolder() {
    switch (eConfig) {
        case multiuser_service:
            return CORE_SUBDIR_MUSERVICE;
        case user:
        case multiuser:
        case lockdown:
            return CORE_SUBDIR_USER;
        case userpb:
            return CORE_SUBDIR_PBUILDER;
        default:
            return L"";
    }
}

// The launcher properties without which the per-user file cannot be
// completed (RLNCH0008E).
constexpr const wchar_t* REQUIRED_LAUNCHER_VALUES[] = {RCP_INSTALL_ID_PROPERTY, JVM_LOCATION, RCP_BASE_LOC_PROPERTY,
                                                       CONFIGURATION_PROPERTY};

// Reads the next line of a template; false at the end of the file. The
// line format swallows the white space after each line, so the scan can meet
// a line end only at the very start of a file: such leading empty lines are
// skipped like every other blank line (with the indentation after them).
bool readTemplateLine(FILE* in, wstring& line) {
    int scanResult = readFile(in, LINE_SCAN_FORMAT, line);
    if (scanResult == 0) scanResult = readFile(in, PROP_LINE_FORMAT, line);
    return scanResult > 0;
}

// Appends "key=value\n" with the value as the launcher properties hold it.
// Returns false when the property is absent.
bool appendPlain(wstring& block, const wchar_t* key, const wchar_t* sourceKey, const std::vector<String>& props) {
    String value = findProperty(sourceKey, props);
    if (value == nullptr) return false;
    block += key;
    block += EQUALS_CHAR;
    block += value;
    block += NEWLINE;
    return true;
}

// Appends "key=value\n" for a path: backslashes made "/", then escaped so
// that the properties reader gives the path back unchanged.
bool appendPath(wstring& block, const wchar_t* key, const wchar_t* sourceKey, const std::vector<String>& props) {
    String value = findProperty(sourceKey, props);
    if (value == nullptr) return false;
    wstring path = value;
    convertBS2S(path);
    block += key;
    block += EQUALS_CHAR;
    convWcharTo8859_1_Value(path, block);
    block += NEWLINE;
    return true;
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
    // An empty sub-folder deliberately leaves "config//name": the path is
    // still valid and matches what existing installations expect.
    const wstring candidate = joinPath(coreLocation, wstring(CORE_CONFIG_DIR) + L"/" + coreSubFolder() + L"/" + name);
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
    bool complete = true;
    for (const wchar_t* key : REQUIRED_LAUNCHER_VALUES)
        if (findProperty(key, propsArray) == nullptr) complete = false;
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
    while (!feof(in) && readTemplateLine(in, line)) {
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

    // The values this launch computed, in a fixed order. The reader takes
    // the first occurrence of a key, so a key already in the base file keeps
    // the base file's value.
    wstring block;
    int missing = 0;
    if (!appendPlain(block, RCP_INSTALL_ID_PROPERTY, RCP_INSTALL_ID_PROPERTY, propsArray)) missing++;
    appendPath(block, RCP_DATA_PROPERTY, RCP_DATA_PROPERTY, propsArray);
    if (!appendPath(block, VM, JVM_LOCATION, propsArray)) missing++;
    if (!appendPath(block, RCP_BASE_LOC_PROPERTY, RCP_BASE_LOC_PROPERTY, propsArray)) missing++;
    if (!appendPlain(block, CONFIGURATION_PROPERTY, CONFIGURATION_PROPERTY, propsArray)) missing++;
    appendPlain(block, LOCALE_PROPERTY, LOCALE_PROPERTY, propsArray);
    appendPlain(block, BIDI_PROPERTY, BIDI_PROPERTY, propsArray);

    if (missing > 0) {
        // The plain copy stays in place (and the work file beside it).
        fclose(out);
        fatalErrorExit(
            "RLNCH0008E: Unable to calculate necessary values for user specific rcpinstall.properties file.");
    }

    // The block is expanded as a text without arguments ("%%" gives "%"),
    // never handed to printf as a format. Only a work file whose every line
    // reached the disk counts as written.
    putWide(out, formatWithoutArgs(block));
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
    while (written && !feof(in) && readTemplateLine(in, line)) {
        // The JVM's feature is filled in by the platform at run time.
        if (line.find(JVM_FEATUREID_REPLACE) != wstring::npos) line = FEATURE_LINE;
        if (line.find(JVM_PARENT_FEATUREID_REPLACE) != wstring::npos) line = FEATURE_LINE;
        written = putWide(out, line + NEWLINE);
    }
    fclose(in);
    // A failed write leaves the stream's error flag set, so this also covers
    // what only the flush and the close report (a full disk).
    if (!finishWorkFile(out, work)) {
        SvcDebugOutA("RLNCH0103E: Error while copying platform.xml to user specific platform.xml file.");
        return -1;
    }
    if (!moveFile(work.c_str(), target.c_str())) {
        SvcDebugOutW(L"RLNCH0105E: Unable to open platform.xml for writing.\"%s\"", target.c_str());
        deleteFile(work.c_str());
        return -1;
    }
    userFirstLaunch = true;
    return 0;
}
