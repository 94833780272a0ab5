// The request path of the shipped plug-in, timed in one process: a minimal host (the
// runtime functions of libws_runtime.so.13 and the development host's request context,
// no HTTP) loads libqv_variable_iotolvane.so with dlopen and calls its Run entry against an
// echo registry thread on the plug-in's fixed socket path. Next to it, in the same run, a
// plain blocking write and read of the very same request frame (as captured by the
// registry) to the same thread. Two requests: "check_version_compatibility" and an
// "access_property" with 16 property accesses. Then 1, 2, 4 and 8 host threads calling Run
// at once, as requests per second.
//
// Modes besides Google Benchmark's own (which takes the usual --benchmark_* flags):
//   --calls=N --request=check|access   N Runs only, for valgrind --tool=callgrind (collection
//                                      is zeroed after a warm-up when run under callgrind)
//   --footprint=N                      VmRSS before loading the plug-in, after Init and after
//                                      N requests, with the registry in a child process
// and --plugin=PATH, --latency-dir=DIR (per-request latency distributions for the plot),
// --summary=FILE (the figures as key=value lines).
#include <benchmark/benchmark.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <map>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#if __has_include(<valgrind/callgrind.h>)
#include <valgrind/callgrind.h>
#define QV_ZERO_CALLGRIND_STATS() CALLGRIND_ZERO_STATS
#else
#define QV_ZERO_CALLGRIND_STATS() ((void)0)
#endif

#include "bench/BenchRegistry.h"
#include "bench/BenchRequest.h"
#include "bench/LatencyRecorder.h"
#include "bench/RawRoundTrip.h"
#include "rpc/IPCClient.h"
#include "tools/webhost/PluginLibrary.h"

namespace {

using qv::bench::BenchRegistry;
using qv::bench::BenchRequest;
using qv::bench::LatencyRecorder;
using qv::bench::RawRoundTrip;
using qv::wsruntime::RequestTable;
using Clock = std::chrono::steady_clock;

const std::string kRegistryPath = qv::portableRegistry::rpc::IPCClient::kDefaultSocketPath;
const char* const kKinds[] = {"check_version", "access_property16"};
constexpr uint32_t kAccessCount = 16;

struct Options {
    std::string plugin = QV_PLUGIN_PATH;
    std::string latencyDir;
    std::string summary;
    std::string request = "access";
    uint32_t calls = 0;
    uint32_t footprint = 0;
};

std::unique_ptr<BenchRequest> MakeRequest(const std::string& kind) {
    return kind == "check_version" ? BenchRequest::CheckVersion()
                                   : BenchRequest::AccessProperty(kAccessCount);
}

// What the benchmarks share: the registry, the loaded plug-in, the frames it sends.
struct Shared {
    std::unique_ptr<BenchRegistry> registry;
    std::unique_ptr<qv::devtools::PluginLibrary> plugin;
    std::map<std::string, std::vector<unsigned char>> frames;  // by request kind
    std::map<std::string, LatencyRecorder> latencies;          // by benchmark name
};
Shared g_shared;

// Starts the registry, loads the plug-in and calls Init. Throws std::runtime_error.
void StartSystem(const Options& options) {
    g_shared.registry.reset(new BenchRegistry(kRegistryPath));
    g_shared.plugin.reset(new qv::devtools::PluginLibrary(options.plugin));
    g_shared.plugin->init();
}

// One Run of `kind`, checked in full; throws std::runtime_error on another answer.
void RunChecked(BenchRequest& request) {
    const RequestTable::Response response = request.Run(g_shared.plugin->run);
    if (!request.IsEchoAnswer(response)) {
        throw std::runtime_error(request.Operation() + ": unexpected answer (HTTP " +
                                 std::to_string(response.status) + ") '" +
                                 response.body.substr(0, 80) + "'");
    }
}

// A cheap check for every iteration: HTTP status unset and code 0.
bool LooksAnswered(const RequestTable::Response& response) {
    return response.status == 0 && response.body.size() >= 2 && response.body[0] == '0' &&
           response.body[1] == '\t';
}

uint64_t Nanoseconds(Clock::duration duration) {
    return static_cast<uint64_t>(
        std::chrono::duration_cast<std::chrono::nanoseconds>(duration).count());
}

void RunLatency(benchmark::State& state, const std::string& kind) {
    std::unique_ptr<BenchRequest> request = MakeRequest(kind);
    LatencyRecorder& latencies = g_shared.latencies["run/" + kind];
    uint64_t iteration = 0;
    Clock::time_point previous = Clock::now();
    for (auto _ : state) {
        const RequestTable::Response response = request->Run(g_shared.plugin->run);
        const Clock::time_point now = Clock::now();
        latencies.Add(Nanoseconds(now - previous));
        if (!LooksAnswered(response) ||
            ((iteration++ & 4095) == 0 && !request->IsEchoAnswer(response))) {
            state.SkipWithError("unexpected answer");
            break;
        }
        previous = Clock::now();
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
}

void RawLatency(benchmark::State& state, const std::string& kind) {
    const std::vector<unsigned char>& frame = g_shared.frames[kind];
    RawRoundTrip raw(kRegistryPath);
    const uint32_t expected = raw.Exchange(frame);
    LatencyRecorder& latencies = g_shared.latencies["raw/" + kind];
    Clock::time_point previous = Clock::now();
    for (auto _ : state) {
        const uint32_t length = raw.Exchange(frame);
        const Clock::time_point now = Clock::now();
        latencies.Add(Nanoseconds(now - previous));
        if (length != expected) {
            state.SkipWithError("unexpected answer length");
            break;
        }
        previous = Clock::now();
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
}

// Run and the raw round trip of the same frame in turn, one of each per iteration, so
// that both meet the same state of the machine: the ratio of their sums is the cost of
// Run against the round trip with the machine's drift paired out.
void PairedLatency(benchmark::State& state, const std::string& kind) {
    std::unique_ptr<BenchRequest> request = MakeRequest(kind);
    const std::vector<unsigned char>& frame = g_shared.frames[kind];
    RawRoundTrip raw(kRegistryPath);
    const uint32_t expected = raw.Exchange(frame);
    uint64_t runNs = 0;
    uint64_t rawNs = 0;
    for (auto _ : state) {
        const Clock::time_point start = Clock::now();
        const RequestTable::Response response = request->Run(g_shared.plugin->run);
        const Clock::time_point ran = Clock::now();
        const uint32_t length = raw.Exchange(frame);
        const Clock::time_point exchanged = Clock::now();
        runNs += Nanoseconds(ran - start);
        rawNs += Nanoseconds(exchanged - ran);
        if (!LooksAnswered(response) || length != expected) {
            state.SkipWithError("unexpected answer");
            break;
        }
    }
    const double iterations = static_cast<double>(state.iterations());
    if (iterations > 0 && rawNs > 0) {
        state.counters["run_us"] = static_cast<double>(runNs) / iterations / 1000.0;
        state.counters["raw_us"] = static_cast<double>(rawNs) / iterations / 1000.0;
        state.counters["ratio"] = static_cast<double>(runNs) / static_cast<double>(rawNs);
    }
}

// Context switches and CPU time of the whole process (host threads, registry, watchdog).
struct ProcessUsage {
    double switches = 0.0;
    double cpuUs = 0.0;
};

ProcessUsage ReadUsage() {
    struct rusage usage;
    getrusage(RUSAGE_SELF, &usage);
    ProcessUsage result;
    result.switches = static_cast<double>(usage.ru_nvcsw) + static_cast<double>(usage.ru_nivcsw);
    result.cpuUs = (static_cast<double>(usage.ru_utime.tv_sec) + usage.ru_stime.tv_sec) * 1e6 +
                   static_cast<double>(usage.ru_utime.tv_usec) + usage.ru_stime.tv_usec;
    return result;
}

void RunThroughput(benchmark::State& state, const std::string& kind) {
    std::unique_ptr<BenchRequest> request = MakeRequest(kind);  // one per host thread
    const ProcessUsage before = ReadUsage();
    for (auto _ : state) {
        const RequestTable::Response response = request->Run(g_shared.plugin->run);
        if (!LooksAnswered(response)) {
            state.SkipWithError("unexpected answer");
            break;
        }
    }
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations()));
    if (state.thread_index() == 0) {
        // Less sensitive to other load on the machine than the rate: what contention
        // costs in wake-ups and CPU per request (process-wide, registry thread included).
        const ProcessUsage after = ReadUsage();
        const double requests = static_cast<double>(state.iterations()) * state.threads();
        state.counters["switches/req"] = (after.switches - before.switches) / requests;
        state.counters["cpu_us/req"] = (after.cpuUs - before.cpuUs) / requests;
    }
}

// Shows the aggregates only, and keeps the real time per request of every repetition.
class CollectingReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override {
        std::vector<Run> shown;
        for (const Run& run : runs) {
            if (run.run_type == Run::RT_Aggregate) {
                shown.push_back(run);
            } else if (!run.error_occurred) {
                const std::string key = Key(run.run_name.function_name, run.threads);
                m_times[key].push_back(run.GetAdjustedRealTime());
                for (const auto& counter : run.counters) {
                    m_counters[key + "/" + counter.first].push_back(counter.second.value);
                }
            } else {
                m_bFailed = true;
            }
        }
        if (shown.empty()) {
            shown = runs;  // a single repetition has no aggregates
        }
        ConsoleReporter::ReportRuns(shown);
    }

    static std::string Key(const std::string& name, int threads) {
        return name + "/threads:" + std::to_string(threads);
    }
    // Median, smallest and largest time per request (microseconds); false when not run.
    bool Times(const std::string& key, double& median, double& low, double& high) const {
        const auto found = m_times.find(key);
        if (found == m_times.end() || found->second.empty()) {
            return false;
        }
        std::vector<double> times = found->second;
        std::sort(times.begin(), times.end());
        const size_t n = times.size();
        median = n % 2 == 1 ? times[n / 2] : (times[n / 2 - 1] + times[n / 2]) / 2.0;
        low = times.front();
        high = times.back();
        return true;
    }
    // Median of a counter over the repetitions; false when not recorded.
    bool Counter(const std::string& key, const std::string& name, double& median) const {
        const auto found = m_counters.find(key + "/" + name);
        if (found == m_counters.end() || found->second.empty()) {
            return false;
        }
        std::vector<double> values = found->second;
        std::sort(values.begin(), values.end());
        const size_t n = values.size();
        median = n % 2 == 1 ? values[n / 2] : (values[n / 2 - 1] + values[n / 2]) / 2.0;
        return true;
    }
    bool Failed() const { return m_bFailed; }

private:
    std::map<std::string, std::vector<double>> m_counters;
    std::map<std::string, std::vector<double>> m_times;
    bool m_bFailed = false;
};

// The figures after the benchmarks: printed, and written as key=value lines when asked.
// The "envelope" of Run/raw is the fastest Run over the slowest raw repetition up to the
// slowest Run over the fastest raw one: the repetitions are not paired in time.
int Summarise(const CollectingReporter& reporter, const Options& options) {
    std::vector<std::string> lines;
    auto add = [&lines](const std::string& key, double value) {
        char text[160];
        std::snprintf(text, sizeof text, "%s=%.4f", key.c_str(), value);
        lines.push_back(text);
    };
    std::printf("\n%-22s %11s %11s %9s %18s %9s %9s\n", "request", "Run us", "raw us", "Run/raw",
                "Run/raw envelope", "Run p99", "raw p99");
    for (const char* kind : kKinds) {
        double run, runLow, runHigh, raw, rawLow, rawHigh;
        if (!reporter.Times(CollectingReporter::Key(std::string("run/") + kind, 1), run, runLow,
                            runHigh) ||
            !reporter.Times(CollectingReporter::Key(std::string("raw/") + kind, 1), raw, rawLow,
                            rawHigh)) {
            continue;
        }
        LatencyRecorder& runLatency = g_shared.latencies[std::string("run/") + kind];
        LatencyRecorder& rawLatency = g_shared.latencies[std::string("raw/") + kind];
        std::printf("%-22s %11.2f %11.2f %9.2f %8.2f .. %6.2f %9.1f %9.1f\n", kind, run, raw,
                    run / raw, runLow / rawHigh, runHigh / rawLow, runLatency.PercentileUs(0.99),
                    rawLatency.PercentileUs(0.99));
        const std::string k = kind;
        add("run." + k + ".us", run);
        add("run." + k + ".us_min", runLow);
        add("run." + k + ".us_max", runHigh);
        add("raw." + k + ".us", raw);
        add("raw." + k + ".us_min", rawLow);
        add("raw." + k + ".us_max", rawHigh);
        add("ratio." + k, run / raw);
        const std::string pairedKey = CollectingReporter::Key(std::string("paired/") + kind, 1);
        double pairedRatio = 0.0;
        double pairedRun = 0.0;
        double pairedRaw = 0.0;
        if (reporter.Counter(pairedKey, "ratio", pairedRatio) &&
            reporter.Counter(pairedKey, "run_us", pairedRun) &&
            reporter.Counter(pairedKey, "raw_us", pairedRaw)) {
            std::printf("%-22s %11.2f %11.2f %9.2f   (paired in time)\n", kind, pairedRun,
                        pairedRaw, pairedRatio);
            add("paired." + k + ".ratio", pairedRatio);
            add("paired." + k + ".run_us", pairedRun);
            add("paired." + k + ".raw_us", pairedRaw);
        }
        for (const double p : {0.5, 0.9, 0.99}) {
            const std::string name = "p" + std::to_string(static_cast<int>(p * 100));
            add("run." + k + "." + name + "_us", runLatency.PercentileUs(p));
            add("raw." + k + "." + name + "_us", rawLatency.PercentileUs(p));
        }
        if (!options.latencyDir.empty()) {
            for (const char* side : {"run", "raw"}) {
                const std::string path = options.latencyDir + "/" + side + "-" + k + ".dat";
                if (!g_shared.latencies[std::string(side) + "/" + k].WriteDistribution(path,
                                                                                       2000)) {
                    std::fprintf(stderr, "cannot write %s\n", path.c_str());
                    return 1;
                }
            }
        }
    }

    std::printf("\n%-22s %8s %14s %13s %14s %12s\n", "request", "threads", "requests/s",
                "x 1-thread", "switches/req", "CPU us/req");
    for (const char* kind : kKinds) {
        double one = 0.0;
        for (const int threads : {1, 2, 4, 8}) {
            double time, low, high;
            if (!reporter.Times(CollectingReporter::Key(std::string("threads/") + kind, threads),
                                time, low, high)) {
                continue;
            }
            const double rate = 1e6 / time;
            if (threads == 1) {
                one = rate;
            }
            const std::string runKey =
                CollectingReporter::Key(std::string("threads/") + kind, threads);
            double switches = 0.0;
            double cpu = 0.0;
            reporter.Counter(runKey, "switches/req", switches);
            reporter.Counter(runKey, "cpu_us/req", cpu);
            std::printf("%-22s %8d %14.0f %13.2f %14.2f %12.1f\n", kind, threads, rate,
                        one > 0.0 ? rate / one : 0.0, switches, cpu);
            const std::string key = std::string("threads.") + kind + "." + std::to_string(threads);
            add(key + ".switches", switches);
            add(key + ".cpu_us", cpu);
            add(key + ".rps", rate);
            add(key + ".rps_min", 1e6 / high);
            add(key + ".rps_max", 1e6 / low);
            if (one > 0.0) {
                add(key + ".ratio", rate / one);
            }
        }
    }
    if (!options.summary.empty()) {
        std::ofstream out(options.summary);
        for (const std::string& line : lines) {
            out << line << '\n';
        }
        if (!out) {
            std::fprintf(stderr, "cannot write %s\n", options.summary.c_str());
            return 1;
        }
    }
    return reporter.Failed() ? 1 : 0;
}

int RunBenchmarks(int argc, char** argv, const Options& options) {
    StartSystem(options);
    for (const char* kind : kKinds) {
        std::unique_ptr<BenchRequest> request = MakeRequest(kind);
        RunChecked(*request);  // connects the plug-in and shows the answer is the echo
        g_shared.frames[kind] = g_shared.registry->Server().LastRequestFrame();
        g_shared.latencies["run/" + std::string(kind)].Reserve(1u << 20);
        g_shared.latencies["raw/" + std::string(kind)].Reserve(1u << 20);
        std::printf("%s: Run answers %u arguments; the frame is %zu bytes\n", kind,
                    request->ArgumentCount(), g_shared.frames[kind].size());
    }
    for (const char* kind : kKinds) {
        const std::string k = kind;
        benchmark::RegisterBenchmark(("run/" + k).c_str(), RunLatency, k)
            ->UseRealTime()
            ->Unit(benchmark::kMicrosecond);
        benchmark::RegisterBenchmark(("raw/" + k).c_str(), RawLatency, k)
            ->UseRealTime()
            ->Unit(benchmark::kMicrosecond);
        benchmark::RegisterBenchmark(("paired/" + k).c_str(), PairedLatency, k)
            ->UseRealTime()
            ->Unit(benchmark::kMicrosecond);
    }
    for (const char* kind : kKinds) {
        const std::string k = kind;
        benchmark::RegisterBenchmark(("threads/" + k).c_str(), RunThroughput, k)
            ->Threads(1)
            ->Threads(2)
            ->Threads(4)
            ->Threads(8)
            ->UseRealTime()
            ->Unit(benchmark::kMicrosecond);
    }
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 2;
    }
    CollectingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();
    const int result = Summarise(reporter, options);
    g_shared.plugin->finalize();
    return result;
}

// N Runs of one request after a warm-up, for callgrind.
int RunCalls(const Options& options) {
    StartSystem(options);
    std::unique_ptr<BenchRequest> request = MakeRequest(
        options.request == "check" ? std::string("check_version") : "access_property16");
    for (int i = 0; i < 20; ++i) {
        RunChecked(*request);
    }
    QV_ZERO_CALLGRIND_STATS();
    for (uint32_t i = 0; i < options.calls; ++i) {
        RunChecked(*request);
    }
    g_shared.plugin->finalize();
    std::printf("%u calls of %s answered\n", options.calls, request->Operation().c_str());
    return 0;
}

struct Resident {
    long rssKb = -1;
    long anonKb = -1;
    long fileKb = -1;
};

Resident ReadResident() {
    Resident resident;
    std::ifstream status("/proc/self/status");
    std::string line;
    while (std::getline(status, line)) {
        long* field = line.rfind("VmRSS:", 0) == 0     ? &resident.rssKb
                      : line.rfind("RssAnon:", 0) == 0 ? &resident.anonKb
                      : line.rfind("RssFile:", 0) == 0 ? &resident.fileKb
                                                       : nullptr;
        if (field != nullptr) {
            *field = std::strtol(line.c_str() + line.find(':') + 1, nullptr, 10);
        }
    }
    if (resident.rssKb < 0) {
        throw std::runtime_error("no VmRSS in /proc/self/status");
    }
    return resident;
}

// The registry runs in a child process, so that the host's resident memory holds the
// host and the plug-in only.
int Footprint(const Options& options) {
    int ready[2];
    int done[2];
    if (pipe(ready) != 0 || pipe(done) != 0) {
        std::perror("pipe");
        return 1;
    }
    const pid_t child = fork();
    if (child < 0) {
        std::perror("fork");
        return 1;
    }
    if (child == 0) {
        close(ready[0]);
        close(done[1]);
        try {
            BenchRegistry registry(kRegistryPath);
            const char byte = 'r';
            if (write(ready[1], &byte, 1) != 1) {
                _exit(1);
            }
            char ignored;
            while (read(done[0], &ignored, 1) > 0) {
            }
        } catch (const std::exception& error) {
            std::fprintf(stderr, "registry: %s\n", error.what());
            _exit(1);
        }
        _exit(0);
    }
    close(ready[1]);
    close(done[0]);
    char byte = 0;
    if (read(ready[0], &byte, 1) != 1) {
        waitpid(child, nullptr, 0);
        return 1;
    }

    std::unique_ptr<BenchRequest> check = MakeRequest("check_version");
    std::unique_ptr<BenchRequest> access = MakeRequest("access_property16");
    const Resident before = ReadResident();
    qv::devtools::PluginLibrary plugin(options.plugin);
    plugin.init();
    const Resident afterInit = ReadResident();
    bool answered = true;
    for (uint32_t i = 0; i < options.footprint && answered; ++i) {
        BenchRequest& request = i % 2 == 0 ? *check : *access;
        answered = LooksAnswered(request.Run(plugin.run));
    }
    const Resident afterRequests = ReadResident();
    plugin.finalize();
    close(done[1]);
    waitpid(child, nullptr, 0);
    if (!answered) {
        std::fprintf(stderr, "footprint: a request was not answered\n");
        return 1;
    }
    std::printf("rss.before_kb=%ld\nrss.after_init_kb=%ld\nrss.after_requests_kb=%ld\n",
                before.rssKb, afterInit.rssKb, afterRequests.rssKb);
    std::printf("rss.init_added_kb=%ld\nrss.requests_added_kb=%ld\nrss.requests=%u\n",
                afterInit.rssKb - before.rssKb, afterRequests.rssKb - before.rssKb,
                options.footprint);
    std::printf("rss.init_added_anon_kb=%ld\nrss.init_added_file_kb=%ld\n",
                afterInit.anonKb - before.anonKb, afterInit.fileKb - before.fileKb);
    std::printf("rss.requests_added_anon_kb=%ld\nrss.requests_added_file_kb=%ld\n",
                afterRequests.anonKb - before.anonKb, afterRequests.fileKb - before.fileKb);
    return 0;
}

void Usage() {
    std::printf(
        "Usage: request_bench [--plugin=PATH] [--latency-dir=DIR] [--summary=FILE]\n"
        "                     [--benchmark_* flags of Google Benchmark]\n"
        "       request_bench --calls=N [--request=check|access] [--plugin=PATH]\n"
        "       request_bench --footprint=N [--plugin=PATH]\n"
        "Times the plug-in's Run against a plain round trip of the same frame to an echo\n"
        "registry on %s (which must be free), and Run from 1, 2, 4 and 8 threads.\n",
        kRegistryPath.c_str());
}

// Takes our own flags out of argv; false on an unknown value.
bool ParseOptions(int& argc, char** argv, Options& options, bool& help) {
    int kept = 1;
    for (int i = 1; i < argc; ++i) {
        const std::string arg = argv[i];
        auto value = [&arg](const char* prefix) { return arg.substr(std::strlen(prefix)); };
        if (arg == "--help" || arg == "-h") {
            help = true;
        } else if (arg.rfind("--plugin=", 0) == 0) {
            options.plugin = value("--plugin=");
        } else if (arg.rfind("--latency-dir=", 0) == 0) {
            options.latencyDir = value("--latency-dir=");
        } else if (arg.rfind("--summary=", 0) == 0) {
            options.summary = value("--summary=");
        } else if (arg.rfind("--request=", 0) == 0) {
            options.request = value("--request=");
            if (options.request != "check" && options.request != "access") {
                return false;
            }
        } else if (arg.rfind("--calls=", 0) == 0) {
            options.calls = static_cast<uint32_t>(std::stoul(value("--calls=")));
        } else if (arg.rfind("--footprint=", 0) == 0) {
            options.footprint = static_cast<uint32_t>(std::stoul(value("--footprint=")));
        } else {
            argv[kept++] = argv[i];
        }
    }
    argc = kept;
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    bool help = false;
    try {
        if (!ParseOptions(argc, argv, options, help)) {
            Usage();
            return 2;
        }
        if (help) {
            Usage();
            return 0;
        }
        if (options.footprint != 0) {
            return Footprint(options);
        }
        if (options.calls != 0) {
            return RunCalls(options);
        }
        return RunBenchmarks(argc, argv, options);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "request_bench: %s\n", error.what());
        return 1;
    }
}
