// Helpers for the tests that go beyond the stub child: finding and running
// external programs (the JVM, the Java compiler, cmake) with a time limit,
// putting the Equinox launcher and framework into an installation, building
// the demo bundle, and reading the report it writes.
#ifndef RCP_PLATFORM_TOOLS_H
#define RCP_PLATFORM_TOOLS_H

#include <map>
#include <string>
#include <vector>

namespace rcptest {

// The first executable file called name in the directories of $PATH, or "".
std::string findOnPath(const std::string& name);

struct ProgramResult {
    int status = -1;       // exit status; 128 + signal when killed; -1 when it could not run
    bool timedOut = false;  // killed after the time limit
    std::string output;    // standard output and standard error together
};

// Runs argv[0] (looked up in $PATH when it has no slash) with the test's
// environment, standard input from /dev/null, and kills it after
// timeoutSeconds.
ProgramResult runProgram(const std::vector<std::string>& argv, int timeoutSeconds);

// The Equinox launcher (it holds org.eclipse.core.launcher.Main) and the
// framework jar, from an Eclipse "plugins" directory: $RCP_EQUINOX_PLUGINS,
// else Debian's /usr/lib/eclipse/plugins. Empty paths when absent.
struct EquinoxJars {
    std::string launcher;   // .../org.eclipse.equinox.launcher_<version>.jar
    std::string framework;  // .../org.eclipse.osgi_<version>.jar
    bool found() const { return !launcher.empty() && !framework.empty(); }
};
EquinoxJars findEquinox();

// The class path entry under which installEquinox places the launcher jar,
// relative to the installation directory.
extern const char* const kEquinoxLauncherInInstall;  // "eclipse/plugins/org.eclipse.equinox.launcher.jar"

// Copies both jars into <installDir>/eclipse/plugins: the launcher under a
// fixed name, the framework under its own versioned name, which is how the
// Equinox launcher finds it (the parent of "plugins" is the install area).
void installEquinox(const EquinoxJars& jars, const std::string& installDir);

// Compiles the demo bundle of demo/bundle into the directory bundle
// <installDir>/eclipse/plugins/com.kel.demo.report_1.0.0. False, with the
// compiler's output in log, when that fails.
bool buildDemoBundle(const std::string& javac, const EquinoxJars& jars, const std::string& installDir,
                     std::string& log);

// Where the demo bundle writes its report, for a configuration area.
std::string demoReportPath(const std::string& configurationArea);

// The "name=value" lines of a report (split at the first "="; lines without
// one are ignored; the first occurrence of a name wins).
std::map<std::string, std::string> parseReport(const std::string& text);

// The values of prefix + "0", prefix + "1", ... up to the first gap.
std::vector<std::string> reportList(const std::map<std::string, std::string>& report, const std::string& prefix);

}  // namespace rcptest

#endif  // RCP_PLATFORM_TOOLS_H
