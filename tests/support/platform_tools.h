// Helpers for the tests that go beyond the stub child: running external
// programs (the JVM, the Java compiler, cmake) with a time limit, putting the
// Equinox launcher and framework into an installation, building the demo
// bundle, and reading the report it writes.
#ifndef RCP_PLATFORM_TOOLS_H
#define RCP_PLATFORM_TOOLS_H

#include <map>
#include <string>
#include <vector>

namespace rcptest {

// The first executable file called name in the directories of $PATH, or "".
std::string findOnPath(const std::string& name);

struct ProgramResult {
    int status = -1;        // exit status; 128 + signal when killed; -1 when it could not run
    bool timedOut = false;  // killed after the time limit
    std::string output;     // standard output and standard error together
};

// Runs argv (argv[0] looked up in $PATH) with standard input from /dev/null;
// kills it and its process group after timeoutSeconds.
ProgramResult runProgram(const std::vector<std::string>& argv, int timeoutSeconds);

// The Equinox launcher and framework jars from $RCP_EQUINOX_PLUGINS, else
// Debian's /usr/lib/eclipse/plugins; empty paths when absent.
struct EquinoxJars {
    std::string launcher;   // org.eclipse.equinox.launcher_<version>.jar
    std::string framework;  // org.eclipse.osgi_<version>.jar
    bool found() const { return !launcher.empty() && !framework.empty(); }
};
EquinoxJars findEquinox();

// Where installEquinox puts the launcher jar, relative to the installation.
extern const char* const kEquinoxLauncherInInstall;

// Copies both jars into <installDir>/eclipse/plugins: the launcher under a
// fixed name, the framework under its own versioned name, which is how the
// Equinox launcher finds it.
void installEquinox(const EquinoxJars& jars, const std::string& installDir);

// Compiles demo/bundle into <installDir>/eclipse/plugins; false, with the
// compiler's output in log, when that fails.
bool buildDemoBundle(const std::string& javac, const EquinoxJars& jars, const std::string& installDir,
                     std::string& log);

// The "name=value" lines of the demo bundle's report (first occurrence wins).
std::map<std::string, std::string> parseReport(const std::string& text);
// The values of prefix + "0", prefix + "1", ... up to the first gap.
std::vector<std::string> reportList(const std::map<std::string, std::string>& report, const std::string& prefix);

}  // namespace rcptest

#endif  // RCP_PLATFORM_TOOLS_H
