// Loading INI files with our store (IniLoadFile) against inih on the same generated files:
// its INIReader, which also keeps every pair for lookup, and its bare parser with a handler
// that does nothing. Files of 1k, 10k and 100k keys, spread over sections of 10 keys or all
// in one section; ours also re-reading into one store, as the configuration manager does.
// After the usual output the program prints the times side by side, the
// ratios, and how loading grows from 10k to 100k keys; plus one lookup benchmark on the
// largest single section.
#include <benchmark/benchmark.h>

#include <INIReader.h>
#include <ini.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <map>
#include <stdexcept>
#include <string>
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

// Keeps the real time per iteration of every run, in milliseconds.
class CollectingReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            const bool aggregate = run.run_type == Run::RT_Aggregate;
            if ((aggregate && run.aggregate_name != "median") || run.error_occurred) {
                continue;
            }
            m_ms[run.run_name.function_name] =
                run.GetAdjustedRealTime() / benchmark::GetTimeUnitMultiplier(run.time_unit) * 1e3;
        }
    }
    double Ms(const std::string& name) const {
        auto found = m_ms.find(name);
        return found == m_ms.end() ? 0.0 : found->second;
    }

private:
    std::map<std::string, double> m_ms;
};

std::string Name(const char* who, const char* layout, int keys) {
    return std::string("load/") + who + "/" + layout + "/" + std::to_string(keys);
}

}  // namespace

int main(int argc, char** argv) {
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
        }
    }
    benchmark::RegisterBenchmark("lookup/ours/single/100000", LookupOurs);

    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 1;
    }
    CollectingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
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
    std::printf("\ngrowth 10k -> 100k keys (linear is 10x)\n");
    for (const char* layout : kLayouts) {
        for (const char* who : {"ours", "ours-reload", "INIReader", "bare"}) {
            const double small = reporter.Ms(Name(who, layout, 10000));
            const double large = reporter.Ms(Name(who, layout, 100000));
            if (small > 0.0 && large > 0.0) {
                std::printf("%-10s %-10s %6.2fx\n", layout, who, large / small);
            }
        }
    }
    return 0;
}
