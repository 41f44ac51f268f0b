// Throughput of the properties reader and of placeholder expansion.
//
// getProperties reads generated files of 1,000, 10,000 and 100,000 lines of
// the kinds an installation's properties hold (comments, plain pairs, -D and
// -X lines, vmarg/env.set/cp keys, escapes, placeholders, a few UTF-8
// letters). The cost per line must not depend on the size of the file:
// "items_per_second" is lines per second, "per_line" the time of one line.
//
// The placeholder cases expand typical values one by one
// (replaceUserPlaceholders, replaceAllPlaceholders; items are values), and a
// whole installation array of each size (replacePlaceholdersInRcpInstallProp).
//
// The locale is taken from the environment as the launcher does
// (scripts/bench.sh sets LANG=C.UTF-8); debug output is off, as in a launch
// without "-debug".
#include <benchmark/benchmark.h>
#include <unistd.h>
#ifdef __GLIBC__
#include <malloc.h>
#endif

#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <map>
#include <string>
#include <vector>

#include "rcp_launcher.h"

namespace {

// One line of a generated properties file, by position.
std::string typicalLine(int i) {
    const std::string n = std::to_string(i);
    switch (i % 12) {
        case 0: return "# settings of group " + n + " of the installation";
        case 1: return "vmarg." + n + "=-Dcom.kel.option" + n + "=enabled";
        case 2: return "-Dorg.eclipse.setting" + n + "=true";
        case 3: return "cp." + n + "=${rcp.home}/plugins/com.kel.bundle" + n + "_1.0.0.jar";
        case 4: return "env.set.RCP_VAR_" + n + "=some value " + n;
        case 5: return "app.title." + n + " = Caf\\u00e9 des Sch\xc3\xa4tze " + n;
        case 6: return "-Xss" + n + "k";
        case 7: return "data.dir." + n + "=C:\\\\Program Files\\\\KEL\\\\data" + n;
        case 8: return "copy." + n + "=${prop.application}/" + n;
        case 9: return "feature.path." + n + ".macosx=${workspace.location}/features/f" + n;
        case 10: return "long.value." + n + "=first part of a long value that goes on \\";
        default: return "    and ends on the continuation line " + n;
    }
}

class PropertiesFiles {
public:
    PropertiesFiles() {
        const char* t = getenv("TMPDIR");
        std::string tmpl = std::string(t && *t ? t : "/tmp") + "/rcpbench-props.XXXXXX";
        std::vector<char> buf(tmpl.begin(), tmpl.end());
        buf.push_back('\0');
        if (mkdtemp(buf.data()) != nullptr) dir_ = buf.data();
    }
    ~PropertiesFiles() {
        for (const auto& f : files_) unlink(f.second.path.c_str());
        if (!dir_.empty()) rmdir(dir_.c_str());
    }

    struct File {
        std::string path;
        size_t bytes = 0;
    };

    // The file of the given number of lines, written on first use.
    const File& get(int lines) {
        auto it = files_.find(lines);
        if (it != files_.end()) return it->second;
        File f;
        f.path = dir_ + "/lines" + std::to_string(lines) + ".properties";
        std::string text = "application=com.kel.bench.application\n";
        for (int i = 1; i < lines; ++i) text += typicalLine(i) + "\n";
        std::ofstream(f.path, std::ios::binary) << text;
        f.bytes = text.size();
        return files_[lines] = f;
    }

private:
    std::string dir_;
    std::map<int, File> files_;
};

PropertiesFiles& files() {
    static PropertiesFiles f;
    return f;
}

const wstring WORKSPACE = L"/Users/bench/KEL/RCP/BENCH1/bench";
const wstring INSTALL_DIR = L"/Applications/KEL Bench";

void setLineCounters(benchmark::State& state, int lines, size_t bytes) {
    state.SetItemsProcessed(state.iterations() * lines);
    state.SetBytesProcessed(state.iterations() * static_cast<int64_t>(bytes));
    state.counters["per_line"] = benchmark::Counter(static_cast<double>(lines),
                                                    benchmark::Counter::kIsIterationInvariantRate |
                                                        benchmark::Counter::kInvert);
}

// Releases an array outside the timed part and gives the freed memory back to
// the allocator's free lists, so that each pass starts like a fresh process
// rather than paying for the previous pass's frees (glibc consolidates them
// on the next large allocation).
void releaseUntimed(benchmark::State& state, std::vector<String>& props) {
    state.PauseTiming();
    freeProperties(props);
#ifdef __GLIBC__
    malloc_trim(0);
#endif
    state.ResumeTiming();
}

// Read a file into a fresh array.
void BM_GetProperties(benchmark::State& state) {
    const int lines = static_cast<int>(state.range(0));
    const PropertiesFiles::File& file = files().get(lines);
    const wstring path(file.path.begin(), file.path.end());
    std::vector<String> props;
    for (auto _ : state) {
        getProperties(path, props);
        benchmark::DoNotOptimize(props.data());
        releaseUntimed(state, props);
    }
    setLineCounters(state, lines, file.bytes);
}
BENCHMARK(BM_GetProperties)->Arg(1000)->Arg(10000)->Arg(100000)->Unit(benchmark::kMicrosecond);

// The installation properties a value may refer to.
std::vector<String> typicalInstallArray() {
    std::vector<String> a;
    const wchar_t* pairs[][2] = {
        {L"application", L"com.kel.bench.application"},
        {L"-Dbench.greeting", L"hello"},
        {L"-Xmx256m", L""},
        {L"vmarg.1", L"-Dfile.encoding=UTF-8"},
        {L"vmfix.noconsole", L"-Dosgi.instance.area=/Users/bench/ws"},
        {L"env.set.RCP_BENCH", L"Hello"},
        {L"library.path.append", L"/Applications/KEL Bench/lib"},
        {L"cp", L"/Applications/KEL Bench/base/startup.jar"},
        {L"product.name", L"KEL Bench"},
        {L"product.dir", L"${prop.product.name}/product"},
    };
    for (const auto& p : pairs) {
        a.push_back(copyString(p[0]));
        a.push_back(copyString(p[1]));
    }
    return a;
}

void releaseArray(std::vector<String>& a) {
    for (String& s : a) s = freeString(s);
    a.clear();
}

// Values of the kinds that meet user placeholders in a launch.
const std::vector<wstring> USER_VALUES = {
    L"${env.HOME}/KEL/RCP",
    L"${prop.application}",
    L"-Dbench.user=${env.USER} -Dbench.app=${prop.application}",
    L"${prop.product.dir}/plugins",
    L"a plain value without any placeholder",
    L"-Dosgi.framework.extensions=org.eclipse.fx.osgi",
};

const std::vector<wstring> ALL_VALUES = {
    L"${rcp.home}/plugins/com.kel.bundle_1.0.0.jar",
    L"-Dosgi.instance.area=${workspace.location}",
    L"${rcp.data}/logs",
    L"${prop.application}",
    L"${rcp.home}/lib:${env.HOME}/lib",
    L"a plain value without any placeholder",
};

void BM_ReplaceUserPlaceholders(benchmark::State& state) {
    std::vector<String> props = typicalInstallArray();
    wstring value;
    for (auto _ : state) {
        for (const wstring& v : USER_VALUES) {
            value = v;
            bool ok = replaceUserPlaceholders(value, props);
            benchmark::DoNotOptimize(ok);
        }
    }
    state.SetItemsProcessed(state.iterations() * static_cast<int64_t>(USER_VALUES.size()));
    releaseArray(props);
}
BENCHMARK(BM_ReplaceUserPlaceholders);

void BM_ReplaceAllPlaceholders(benchmark::State& state) {
    std::vector<String> props = typicalInstallArray();
    wstring value;
    for (auto _ : state) {
        for (const wstring& v : ALL_VALUES) {
            value = v;
            bool modified = replaceAllPlaceholders(WORKSPACE, INSTALL_DIR, value, props);
            benchmark::DoNotOptimize(modified);
        }
    }
    state.SetItemsProcessed(state.iterations() * static_cast<int64_t>(ALL_VALUES.size()));
    releaseArray(props);
}
BENCHMARK(BM_ReplaceAllPlaceholders);

// Every value of a whole installation array of 1,000 to 100,000 lines (a
// quarter of its values hold placeholders). The array is read again, untimed,
// before each pass, since the pass changes it.
void BM_ReplacePlaceholdersInRcpInstallProp(benchmark::State& state) {
    const int lines = static_cast<int>(state.range(0));
    const PropertiesFiles::File& file = files().get(lines);
    const wstring path(file.path.begin(), file.path.end());
    std::vector<String> props;
    size_t values = 0;
    for (auto _ : state) {
        state.PauseTiming();
        getProperties(path, props);
        values = props.size() / 2;
        state.ResumeTiming();
        replacePlaceholdersInRcpInstallProp(WORKSPACE, INSTALL_DIR, props);
        releaseUntimed(state, props);
    }
    freeProperties(props);
    state.SetItemsProcessed(state.iterations() * static_cast<int64_t>(values));
}
BENCHMARK(BM_ReplacePlaceholdersInRcpInstallProp)
    ->Arg(1000)
    ->Arg(10000)
    ->Arg(100000)
    ->Unit(benchmark::kMicrosecond);

}  // namespace

int main(int argc, char** argv) {
    const char* locale = setlocale(LC_CTYPE, "");
    benchmark::AddCustomContext("LC_CTYPE", locale ? locale : "(not set)");
    setDebug(false);
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 1;
    benchmark::RunSpecifiedBenchmarks();
    benchmark::Shutdown();
    return 0;
}
