// Expansion of "${...}" placeholders in property values and arguments.
//
// Standard placeholders stand for the installation directory and the
// workspace; user placeholders "${env.NAME}" and "${prop.KEY}" for an
// environment variable and another property. User placeholders are expanded
// from the right, so a placeholder produced by an inserted value is expanded
// next, before anything to its left.
#include <cwchar>

#include "rcp_launcher.h"
#include "rcp_launcher_testing.h"

namespace {

// A placeholder that keeps coming back at the same or a later position is a
// value that contains itself.
const int MAX_PLACEHOLDER_CYCLES = 10;

// Values that expand each other can double the text at every step, and many
// values can each take a copy of one large value. Both are bounded: one value
// by its length and its number of steps, the installation properties of a
// launch together by the text their expanded values hold (4 Mi characters,
// 16 MiB as wide text: far above any real installation). Past a bound the
// expansion is treated like a self-referencing value.
const size_t MAX_EXPANDED_LENGTH = 1u << 17;
const size_t MAX_EXPANSION_STEPS = 4096;
const size_t MAX_EXPANDED_TOTAL = 4u << 20;

// How much of a value that ran into a bound the RLNCH0088E line quotes.
const size_t QUOTED_VALUE_LIMIT = 256;

// Set by replaceUserPlaceholders when the value it failed on ran into a
// bound, rather than meeting a placeholder it cannot resolve.
bool ranIntoBound = false;

// The debug line is cut at 4096 bytes anyway; no need to copy more of a long
// text into it.
const size_t LOG_TEXT_LIMIT = 4096;

// Shared target of the argument marks that say "not changed"; never freed.
wchar_t unchangedArg[1] = {0};

// Expanded arguments replace entries of an argument vector that belongs to
// someone else and must live for the rest of the run; this pool owns them
// and releases them at process exit.
struct ExpandedArgPool {
    std::vector<String> strings;
    void release() {
        for (String s : strings) freeString(s);
        strings.clear();
    }
    ~ExpandedArgPool() { release(); }
};
ExpandedArgPool expandedArgs;

// Replaces every occurrence of placeholder by replacement, in one pass. The
// search goes on after the inserted text, so a path that itself contains the
// placeholder cannot make the replacement loop.
bool replacePlaceholderEverywhere(wstring& text, const wchar_t* placeholder, const wstring& replacement) {
    const size_t phLen = wcslen(placeholder);
    size_t pos = text.find(placeholder);
    if (pos == wstring::npos) return false;
    wstring result;
    size_t from = 0;
    while (pos != wstring::npos) {
        result.append(text, from, pos - from);
        result += replacement;
        from = pos + phLen;
        pos = text.find(placeholder, from);
    }
    result.append(text, from, wstring::npos);
    text.swap(result);
    return true;
}

bool startsWith(const wstring& s, const wchar_t* prefix) { return s.compare(0, wcslen(prefix), prefix) == 0; }

void appendForLog(wstring& log, const wstring& text) {
    if (log.length() >= LOG_TEXT_LIMIT) return;
    log.append(text, 0, LOG_TEXT_LIMIT - log.length());
}

// Ends the launch for a value that cannot be expanded, quoting it as far as
// it was expanded. A value that ran into a bound can be megabytes long: the
// line names only its beginning then.
[[noreturn]] void substitutionInvalid(wstring text, bool bounded) {
    if (bounded && text.length() > QUOTED_VALUE_LIMIT) text = text.substr(0, QUOTED_VALUE_LIMIT) + L"...";
    fatalErrorExit("RLNCH0088E: property substitution is invalid (%ls)", text.c_str());
}

}  // namespace

bool replaceStdPlaceholders(const wstring& workspaceLocation, const wstring& installDir, wstring& placeholderString) {
    bool modified = replacePlaceholderEverywhere(placeholderString, RCPHOME_REPLACE, installDir);
    modified =
        replacePlaceholderEverywhere(placeholderString, WORKSPACELOCATION_REPLACE, workspaceLocation) || modified;
    // The data area and the workspace are the same directory.
    modified = replacePlaceholderEverywhere(placeholderString, RCPDATA_REPLACE, workspaceLocation) || modified;
    return modified;
}

size_t findLastPlaceholder(const wstring& prop_contents, size_t prop_lastIndex, size_t& ph_numchars, wstring& ph_key) {
    if (prop_contents.empty()) return wstring::npos;
    // Nothing lies beyond the last character.
    if (prop_lastIndex >= prop_contents.length()) prop_lastIndex = prop_contents.length() - 1;

    const size_t ph_index = prop_contents.rfind(PH_OPEN, prop_lastIndex);
    if (ph_index == wstring::npos) return wstring::npos;

    // A closing brace beyond the limit is not used: the placeholder then ends
    // at the limit ("${abc" at the end is read with the key "ab").
    size_t endIndex = prop_contents.find(PH_CLOSE, ph_index);
    if (endIndex == wstring::npos || endIndex > prop_lastIndex) endIndex = prop_lastIndex;

    ph_numchars = endIndex - ph_index + 1;  // ph_index <= endIndex always holds
    if (ph_numchars > 2)
        ph_key = prop_contents.substr(ph_index + 2, ph_numchars - 3);
    else
        ph_key.clear();
    return ph_index;
}

bool getPlaceholderValue(const wstring& key, wstring& value, const std::vector<String>& propArray) {
    if (startsWith(key, ENV_PREFIX)) {
        if (getEnv(key.c_str() + wcslen(ENV_PREFIX), value) != nullptr) return true;
    } else if (startsWith(key, PROP_PREFIX)) {
        String found = findProperty(key.c_str() + wcslen(PROP_PREFIX), propArray);
        if (found != nullptr) {
            value = found;
            return true;
        }
    }
    value = PH_OPEN + key + PH_CLOSE;  // written back as it was
    return false;
}

bool replaceUserPlaceholders(wstring& prop_contents, const std::vector<String>& propArray) {
    ranIntoBound = false;
    if (prop_contents.empty()) return true;

    size_t prop_lastIndex = prop_contents.length() - 1;
    size_t last_ph_index = wstring::npos;
    bool bResult = true;
    int cycle_cnt = 0;
    size_t steps = 0;
    size_t ph_numChars = 0;
    wstring ph_key;
    wstring value;
    wstring logText;

    for (;;) {
        const size_t ph_index = findLastPlaceholder(prop_contents, prop_lastIndex, ph_numChars, ph_key);
        if (ph_index == wstring::npos) break;

        const bool logging = getDebug();
        if (logging) {
            logText.clear();
            appendForLog(logText, prop_contents);
        }

        if (!getPlaceholderValue(ph_key, value, propArray)) bResult = false;
        prop_contents.replace(ph_index, ph_numChars, value);

        if (logging) {
            appendForLog(logText, L" => ");
            appendForLog(logText, prop_contents);
            SvcDebugOutW(L"RLNCH0071I: Modified prop_contents %s", logText.c_str());
        }

        if (++steps > MAX_EXPANSION_STEPS || prop_contents.length() > MAX_EXPANDED_LENGTH) {
            ranIntoBound = true;
            bResult = false;
            break;
        }

        // Go on at the end of the inserted text, so that placeholders produced
        // by the value are expanded next. An empty value inserted at the very
        // start leaves nothing to the left to look at.
        if (ph_index + value.length() == 0) break;
        prop_lastIndex = ph_index + value.length() - 1;

        // The first placeholder is always "smaller" than npos, so p = "${prop.p}"
        // is stopped on its tenth repetition.
        if (ph_index >= last_ph_index) {
            if (++cycle_cnt >= MAX_PLACEHOLDER_CYCLES) {
                bResult = false;
                break;
            }
        } else {
            cycle_cnt = 0;
        }

        if (!bResult) {
            // Once a placeholder failed, the search only moves to the left of
            // the one that was written back.
            if (ph_index == 0) break;
            prop_lastIndex = ph_index - 1;
        }
        last_ph_index = ph_index;
    }
    return bResult;
}

bool replaceAllPlaceholders(const wstring& workspaceLocation, const wstring& installDir, wstring& placeholderString,
                            std::vector<String>& rcpInstallPropertiesArray) {
    bool modified = replaceStdPlaceholders(workspaceLocation, installDir, placeholderString);
    wstring temp = placeholderString;
    if (!replaceUserPlaceholders(temp, rcpInstallPropertiesArray)) substitutionInvalid(temp, ranIntoBound);
    if (temp != placeholderString) {
        placeholderString = temp;
        modified = true;
    }
    return modified;
}

void replacePlaceholdersInRcpInstallProp(wstring workspaceLocation, wstring installDir,
                                         std::vector<String>& rcpInstallPropertiesArray) {
    convertBS2S(workspaceLocation);
    convertBS2S(installDir);
    // Values in array order: a "${prop.KEY}" sees KEY's value expanded when
    // KEY came earlier in the file.
    size_t expandedTotal = 0;
    for (size_t i = 1; i < rcpInstallPropertiesArray.size(); i += 2) {
        if (rcpInstallPropertiesArray[i] == nullptr) continue;
        wstring value = rcpInstallPropertiesArray[i];
        if (replaceAllPlaceholders(workspaceLocation, installDir, value, rcpInstallPropertiesArray)) {
            expandedTotal += value.length();
            if (expandedTotal > MAX_EXPANDED_TOTAL) substitutionInvalid(value, true);
            String expanded = copyString(value.c_str());
            freeString(rcpInstallPropertiesArray[i]);
            rcpInstallPropertiesArray[i] = expanded;
        }
    }
}

void replacePlaceholdersInArgv(wstring workspaceLocation, wstring installDir, wchar_t** argv, wchar_t** cargv,
                               int argc) {
    convertBS2S(workspaceLocation);
    convertBS2S(installDir);
    for (int i = 0; i < argc; ++i) {
        wstring arg = argv[i];
        if (replaceStdPlaceholders(workspaceLocation, installDir, arg)) {
            // The old argument is not freed: it belongs to whoever built argv.
            String changed = copyString(arg.c_str());
            expandedArgs.strings.push_back(changed);
            argv[i] = changed;
            cargv[i] = changed;
        } else {
            cargv[i] = unchangedArg;
        }
    }
}

void replaceFirstRcpHome(wstring& text, const wstring& installDir) {
    size_t pos = text.find(RCPHOME_REPLACE);
    if (pos != wstring::npos) text.replace(pos, wcslen(RCPHOME_REPLACE), installDir);
}

void releaseExpandedArgs() { expandedArgs.release(); }
