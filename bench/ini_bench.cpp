// Loading INI files with our store (IniLoadFile) against inih on the same generated files:
// its INIReader, which also keeps every pair for lookup, and its bare parser with a handler
// that does nothing. Files of 1k, 10k and 100k keys, spread over sections of 10 keys or all
// in one section; ours also re-reading into one store, as the configuration manager does.
// After the usual output the program prints the times side by side, the
// ratios, and how loading grows from 10k to 100k keys; plus one lookup benchmark on the
// largest single section.
// Each benchmark runs in a child process of its own (fork), so that the heap left behind by
// one case (pages glibc keeps or has given back, a raised mmap threshold) does not bend the
// times of the next; --in_process runs them all in this process instead. Times are the
// medians of five repetitions unless --benchmark_repetitions says otherwise. The growth/
// benchmarks load the 10k- and 100k-key files in turn in one process, so that the growth
// from one to the other is measured with the machine's drift paired out.
#include <benchmark/benchmark.h>

#include <INIReader.h>
#include <ini.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <regex>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "config/IniStore.h"

namespace {

const int kSizes[] = {1000, 10000, 100000};
const char* const kLayouts[] = {"sections", "single"};

// A directory of generated files, removed with them at exit.
class Files {
public:
    Files() {
        char templ[] = "/tmp/ini_bench.XXXXXX";
        if (!::mkdtemp(templ)) {
            throw std::runtime_error("mkdtemp failed");
        }
        m_dir = templ;
        for (const char* layout : kLayouts) {
            for (int keys : kSizes) {
                Generate(Path(layout, keys), keys, std::string(layout) == "sections" ? 10 : keys);
            }
        }
    }
    ~Files() {
        for (const auto& path : m_paths) {
            ::unlink(path.c_str());
        }
        ::rmdir(m_dir.c_str());
    }
    Files(const Files&) = delete;
    Files& operator=(const Files&) = delete;

    std::string Path(const std::string& layout, int keys) const {
        return m_dir + "/" + layout + "_" + std::to_string(keys) + ".ini";
    }

private:
    void Generate(const std::string& path, int keys, int perSection) {
        FILE* file = std::fopen(path.c_str(), "wb");
        if (!file) {
            throw std::runtime_error("cannot write " + path);
        }
        std::fprintf(file, "; generated: %d keys, %d per section\n", keys, perSection);
        for (int i = 0; i < keys; ++i) {
            if (i % perSection == 0) {
                std::fprintf(file, "\n[Section_%d]\n", i / perSection);
            }
            std::fprintf(file, "Key_%d = value number %d of the file\n", i, i);
        }
        std::fclose(file);
        m_paths.push_back(path);
    }

    std::string m_dir;
    std::vector<std::string> m_paths;
};

const Files& TheFiles() {
    static const Files files;
    return files;
}

int Ignore(void*, const char*, const char*, const char*) { return 1; }

void LoadOurs(benchmark::State& state, std::string path) {
    for (auto _ : state) {
        IniStore* store = IniCreate();
        IniSetParseFlags(store, 0x12);
        if (IniLoadFile(store, path.c_str()) != 0) {
            state.SkipWithError("IniLoadFile failed");
        }
        benchmark::DoNotOptimize(IniSectionCount(store));
        IniDestroy(store);
    }
}

// Re-reading into one store, as the configuration manager does when the file changes.
void ReloadOurs(benchmark::State& state, std::string path) {
    IniStore* store = IniCreate();
    IniSetParseFlags(store, 0x12);
    for (auto _ : state) {
        if (IniLoadFile(store, path.c_str()) != 0) {
            state.SkipWithError("IniLoadFile failed");
        }
        benchmark::DoNotOptimize(IniSectionCount(store));
    }
    IniDestroy(store);
}

void LoadINIReader(benchmark::State& state, std::string path) {
    for (auto _ : state) {
        INIReader reader(path);
        if (reader.ParseError() != 0) {
            state.SkipWithError("INIReader failed");
        }
        benchmark::DoNotOptimize(&reader);
    }
}

void LoadBare(benchmark::State& state, std::string path) {
    for (auto _ : state) {
        if (ini_parse(path.c_str(), &Ignore, nullptr) != 0) {
            state.SkipWithError("ini_parse failed");
        }
    }
}

// One load of a file by one of the contenders; false when it failed.
using Loader = bool (*)(const std::string& path);

bool LoadOnceOurs(const std::string& path) {
    IniStore* store = IniCreate();
    IniSetParseFlags(store, 0x12);
    const bool loaded = IniLoadFile(store, path.c_str()) == 0;
    benchmark::DoNotOptimize(IniSectionCount(store));
    IniDestroy(store);
    return loaded;
}

bool LoadOnceINIReader(const std::string& path) {
    INIReader reader(path);
    benchmark::DoNotOptimize(&reader);
    return reader.ParseError() == 0;
}

bool LoadOnceBare(const std::string& path) {
    return ini_parse(path.c_str(), &Ignore, nullptr) == 0;
}

// Growth from 10k to 100k keys paired in time: each iteration loads the 10k-key file ten
// times and the 100k-key file once, so that both meet the same state of the machine; the
// ratio of the two sums is the growth with the machine's drift paired out.
void PairedGrowth(benchmark::State& state, std::string layout, Loader load) {
    const std::string small = TheFiles().Path(layout.c_str(), 10000);
    const std::string large = TheFiles().Path(layout.c_str(), 100000);
    using Clock = std::chrono::steady_clock;
    Clock::duration smallTime{};
    Clock::duration largeTime{};
    for (auto _ : state) {
        const Clock::time_point start = Clock::now();
        bool loaded = true;
        for (int i = 0; i < 10; ++i) {
            loaded = load(small) && loaded;
        }
        const Clock::time_point middle = Clock::now();
        loaded = load(large) && loaded;
        const Clock::time_point end = Clock::now();
        if (!loaded) {
            state.SkipWithError("a load failed");
            break;
        }
        smallTime += middle - start;
        largeTime += end - middle;
    }
    if (smallTime.count() > 0) {
        // Ten small loads per iteration: ten times the large-to-small ratio of the sums.
        state.counters["growth"] = 10.0 * std::chrono::duration<double>(largeTime).count() /
                                   std::chrono::duration<double>(smallTime).count();
    }
}

// Looks up every 97th key of the 100k-key single section by name.
void LookupOurs(benchmark::State& state) {
    IniStore* store = IniCreate();
    IniLoadFile(store, TheFiles().Path("single", 100000).c_str());
    std::vector<std::string> names;
    for (int i = 0; i < 100000; i += 97) {
        names.push_back("key_" + std::to_string(i));  // case differs from the file
    }
    for (auto _ : state) {
        for (const auto& name : names) {
            const char* value = nullptr;
            if (IniGetValue(store, "Section_0", name.c_str(), &value) != 1) {
                state.SkipWithError("key not found");
            }
            benchmark::DoNotOptimize(value);
        }
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * names.size()));
    IniDestroy(store);
}

// Keeps the real time per iteration of every run, in milliseconds; prints the context (machine,
// load) only while printContext is set, so that children print it once between them.
class CollectingReporter : public benchmark::ConsoleReporter {
public:
    bool printContext = true;
    size_t nameWidth = 0;  // the same columns in every child

    bool ReportContext(const Context& context) override {
        const bool ok = printContext ? ConsoleReporter::ReportContext(context) : true;
        name_field_width_ = std::max(nameWidth, context.name_field_width);
        printed_header_ = !printContext;
        return ok;
    }
    void ReportRuns(const std::vector<Run>& runs) override {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            const bool aggregate = run.run_type == Run::RT_Aggregate;
            if ((aggregate && run.aggregate_name != "median") || run.error_occurred) {
                continue;
            }
            const double toMs = 1e3 / benchmark::GetTimeUnitMultiplier(run.time_unit);
            const auto growth = run.counters.find("growth");
            m_ms[run.run_name.function_name] = {
                run.GetAdjustedRealTime() * toMs, run.GetAdjustedCPUTime() * toMs,
                growth == run.counters.end() ? 0.0 : static_cast<double>(growth->second)};
        }
    }
    // Real (wall-clock) and CPU time per load of a benchmark, 0 when it did not run.
    struct Times {
        double real = 0.0;
        double cpu = 0.0;
        double growth = 0.0;  // the paired growth benchmarks' counter
    };
    Times Get(const std::string& name) const {
        auto found = m_ms.find(name);
        return found == m_ms.end() ? Times{} : found->second;
    }
    double Ms(const std::string& name) const { return Get(name).real; }
    void Set(const std::string& name, Times times) { m_ms[name] = times; }

private:
    std::map<std::string, Times> m_ms;
};

std::string Name(const char* who, const char* layout, int keys) {
    return std::string("load/") + who + "/" + layout + "/" + std::to_string(keys);
}

std::string GrowthName(const char* who, const char* layout) {
    return std::string("growth/") + who + "/" + layout;
}

// Runs the one benchmark called name in a child process and takes its time into reporter;
// false when the child failed.
bool RunIsolated(const std::string& name, CollectingReporter* reporter) {
    int channel[2];
    if (::pipe(channel) != 0) {
        return false;
    }
    std::fflush(stdout);
    const pid_t child = ::fork();
    if (child < 0) {
        ::close(channel[0]);
        ::close(channel[1]);
        return false;
    }
    if (child == 0) {
        ::close(channel[0]);
        benchmark::RunSpecifiedBenchmarks(reporter, "^" + name + "$");
        const CollectingReporter::Times times = reporter->Get(name);
        const bool sent =
            ::write(channel[1], &times, sizeof times) == static_cast<ssize_t>(sizeof times);
        std::fflush(stdout);
        ::_exit(sent ? 0 : 1);  // no static destructors: the parent owns the generated files
    }
    ::close(channel[1]);
    CollectingReporter::Times times;
    const bool received =
        ::read(channel[0], &times, sizeof times) == static_cast<ssize_t>(sizeof times);
    ::close(channel[0]);
    int status = 0;
    while (::waitpid(child, &status, 0) < 0) {
    }
    if (received && WIFEXITED(status) && WEXITSTATUS(status) == 0) {
        reporter->Set(name, times);
        reporter->printContext = false;
        return true;
    }
    return false;
}

}  // namespace

int main(int argc, char** argv) {
    // Our one flag; the rest are Google Benchmark's.
    bool inProcess = false;
    bool repetitionsGiven = false;
    std::vector<char*> args{argv[0]};
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--in_process") == 0) {
            inProcess = true;
        } else {
            repetitionsGiven |= std::strncmp(argv[i], "--benchmark_repetitions", 23) == 0;
            args.push_back(argv[i]);
        }
    }
    // A single load time moves by a fifth between runs here: the medians of five
    // repetitions unless told otherwise.
    char repetitions[] = "--benchmark_repetitions=5";
    char aggregatesOnly[] = "--benchmark_display_aggregates_only=true";
    if (!repetitionsGiven) {
        args.push_back(repetitions);
        args.push_back(aggregatesOnly);
    }
    argc = static_cast<int>(args.size());
    argv = args.data();
    std::vector<std::string> names;
    for (const char* layout : kLayouts) {
        for (int keys : kSizes) {
            const std::string path = TheFiles().Path(layout, keys);
            benchmark::RegisterBenchmark(Name("ours", layout, keys).c_str(), LoadOurs, path)
                ->Unit(benchmark::kMillisecond);
            benchmark::RegisterBenchmark(Name("ours-reload", layout, keys).c_str(), ReloadOurs,
                                         path)
                ->Unit(benchmark::kMillisecond);
            benchmark::RegisterBenchmark(Name("INIReader", layout, keys).c_str(), LoadINIReader,
                                         path)
                ->Unit(benchmark::kMillisecond);
            benchmark::RegisterBenchmark(Name("bare", layout, keys).c_str(), LoadBare, path)
                ->Unit(benchmark::kMillisecond);
            for (const char* who : {"ours", "ours-reload", "INIReader", "bare"}) {
                names.push_back(Name(who, layout, keys));
            }
        }
    }
    const std::pair<const char*, Loader> kLoaders[] = {
        {"ours", LoadOnceOurs}, {"INIReader", LoadOnceINIReader}, {"bare", LoadOnceBare}};
    for (const char* layout : kLayouts) {
        for (const auto& loader : kLoaders) {
            const std::string name = GrowthName(loader.first, layout);
            benchmark::RegisterBenchmark(name.c_str(), PairedGrowth, std::string(layout),
                                         loader.second)
                ->Unit(benchmark::kMillisecond);
            names.push_back(name);
        }
    }
    benchmark::RegisterBenchmark("lookup/ours/single/100000", LookupOurs);
    names.push_back("lookup/ours/single/100000");

    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 1;
    }
    CollectingReporter reporter;
    for (const std::string& name : names) {
        reporter.nameWidth = std::max(reporter.nameWidth, name.size() + 8);  // + "_median"
    }
    if (inProcess) {
        benchmark::RunSpecifiedBenchmarks(&reporter);
    } else {
        std::string filter = benchmark::GetBenchmarkFilter();
        const std::regex selected(filter.empty() || filter == "all" ? "." : filter);
        for (const std::string& name : names) {
            if (std::regex_search(name, selected) && !RunIsolated(name, &reporter)) {
                std::fprintf(stderr, "%s: the child process failed\n", name.c_str());
                return 1;
            }
        }
    }
    benchmark::Shutdown();

    std::printf("\n%-18s %10s %10s %12s %10s %10s %10s\n", "file", "ours ms", "reload ms",
                "INIReader ms", "bare ms", "ours/INIR", "ours/bare");
    for (const char* layout : kLayouts) {
        for (int keys : kSizes) {
            const double ours = reporter.Ms(Name("ours", layout, keys));
            const double reload = reporter.Ms(Name("ours-reload", layout, keys));
            const double reader = reporter.Ms(Name("INIReader", layout, keys));
            const double bare = reporter.Ms(Name("bare", layout, keys));
            if (ours == 0.0 || reader == 0.0 || bare == 0.0) {
                continue;
            }
            std::printf("%-18s %10.3f %10.3f %12.3f %10.3f %10.2f %10.2f\n",
                        (std::string(layout) + "/" + std::to_string(keys)).c_str(), ours, reload,
                        reader, bare, ours / reader, ours / bare);
        }
    }
    // CPU time beside real time: on a busy machine the wall clock also counts the time the
    // process waited for a core, which says nothing about how loading grows.
    // "paired": the growth/ benchmarks, 10k and 100k loads in turn in one process.
    std::printf("\ngrowth 10k -> 100k keys (linear is 10x)  real     cpu  paired\n");
    for (const char* layout : kLayouts) {
        for (const char* who : {"ours", "ours-reload", "INIReader", "bare"}) {
            const auto small = reporter.Get(Name(who, layout, 10000));
            const auto large = reporter.Get(Name(who, layout, 100000));
            const double paired = reporter.Get(GrowthName(who, layout)).growth;
            if (small.real > 0.0 && large.real > 0.0 && small.cpu > 0.0) {
                std::printf("%-10s %-28s %6.2fx %6.2fx", layout, who, large.real / small.real,
                            large.cpu / small.cpu);
                if (paired > 0.0) {
                    std::printf(" %6.2fx", paired);
                }
                std::printf("\n");
            }
        }
    }
    return 0;
}
