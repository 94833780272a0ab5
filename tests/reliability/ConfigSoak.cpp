// Configuration soak: two processes share one configuration file for a given time. The
// writer (a forked child) rewrites it through the configuration manager, one generation
// after another: a growing and shrinking set of keys k0..k<n-1> whose values name the
// generation, plus Count and a Checksum over all of them, saved by a final SetString of
// Generation. The reader (the parent) reads the file over and over in three ways: parsed
// directly into a fresh store, through a fresh manager's key iterator, and through one
// long-lived manager that reloads the file when it changed. Every read must be one complete
// generation (all keys of one generation, the right count, the checksum right), and the
// generations each way sees never go backwards.
//
// Usage: config_soak [SECONDS]   (default 30). Prints PASS/FAIL lines and the figures.
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cinttypes>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <map>
#include <sstream>
#include <string>

#include "config/ConfigManager_qvini.h"
#include "config/IniStore.h"

namespace {

const char kSection[] = "Data";
constexpr int32_t kMaxKeys = 64;

using Pairs = std::map<std::string, std::string>;

int32_t KeyCountOf(int64_t generation) { return 4 + static_cast<int32_t>((generation * 37) % 61); }

std::string ValueOf(int64_t generation, int32_t key) {
    // Lengths vary with the generation so that files grow and shrink.
    const size_t padding = static_cast<size_t>((generation * 13 + key * 7) % 150);
    return "g" + std::to_string(generation) + "-k" + std::to_string(key) + "-" +
           std::string(padding, static_cast<char>('a' + key % 26));
}

// FNV-1a over "key=value\n" of the generation, count and keys in order.
std::string ChecksumOf(const Pairs& pairs) {
    uint64_t hash = 1469598103934665603ull;
    auto add = [&hash](const std::string& text) {
        for (unsigned char c : text) {
            hash = (hash ^ c) * 1099511628211ull;
        }
    };
    for (const auto& pair : pairs) {
        if (pair.first != "Checksum") {
            add(pair.first + "=" + pair.second + "\n");
        }
    }
    char text[17];
    std::snprintf(text, sizeof text, "%016" PRIx64, hash);
    return text;
}

// The generation the pairs hold, or -1 (with the reason in *why) when they are not one
// complete generation.
int64_t CompleteGeneration(const Pairs& pairs, std::string* why) {
    auto find = [&pairs](const char* key) {
        auto it = pairs.find(key);
        return it == pairs.end() ? std::string() : it->second;
    };
    const std::string generationText = find("Generation");
    char* end = nullptr;
    const int64_t generation = std::strtoll(generationText.c_str(), &end, 10);
    if (generationText.empty() || *end != '\0' || generation < 1) {
        *why = "no Generation";
        return -1;
    }
    const int32_t count = KeyCountOf(generation);
    if (find("Count") != std::to_string(count)) {
        *why = "Count '" + find("Count") + "' is not " + std::to_string(count);
        return -1;
    }
    if (pairs.size() != static_cast<size_t>(count) + 3) {
        *why = std::to_string(pairs.size()) + " keys, expected " + std::to_string(count + 3);
        return -1;
    }
    for (int32_t i = 0; i < count; ++i) {
        const std::string key = "k" + std::to_string(i);
        if (find(key.c_str()) != ValueOf(generation, i)) {
            *why = key + " is '" + find(key.c_str()) + "' in generation " + generationText;
            return -1;
        }
    }
    if (find("Checksum") != ChecksumOf(pairs)) {
        *why = "checksum " + find("Checksum") + " is not " + ChecksumOf(pairs);
        return -1;
    }
    return generation;
}

// Writes generations through the manager, after the one the file holds, until the deadline
// or the limit; returns the last generation written (-1 on failure).
int64_t RunWriter(const std::string& path, std::chrono::steady_clock::time_point deadline,
                  int64_t limit) {
    ph_fwk::ConfigManager_qvini config(path);
    int64_t generation = std::atoll(config.GetString(kSection, "Generation", "0").c_str());
    while (std::chrono::steady_clock::now() < deadline && generation < limit) {
        ++generation;
        const int32_t count = KeyCountOf(generation);
        Pairs pairs;
        for (int32_t i = count; i < kMaxKeys; ++i) {
            config.RemoveKeyNoSave(kSection, "k" + std::to_string(i));
        }
        for (int32_t i = 0; i < count; ++i) {
            pairs["k" + std::to_string(i)] = ValueOf(generation, i);
        }
        pairs["Count"] = std::to_string(count);
        pairs["Generation"] = std::to_string(generation);
        for (const auto& pair : pairs) {
            if (pair.first != "Generation" &&
                !config.SetStringNoSave(kSection, pair.first, pair.second)) {
                std::printf("FAIL: writer: SetStringNoSave %s\n", pair.first.c_str());
                return -1;
            }
        }
        if (!config.SetStringNoSave(kSection, "Checksum", ChecksumOf(pairs)) ||
            !config.SetString(kSection, "Generation", pairs["Generation"])) {
            std::printf("FAIL: writer: generation %" PRId64 " not saved\n", generation);
            return -1;
        }
    }
    return generation;
}

// One way of reading the file: its name, how many reads were complete, the latest
// generation it saw and how many distinct generations.
struct ReadWay {
    const char* name;
    int64_t reads = 0;
    int64_t latest = 0;
    int64_t distinct = 0;
    int64_t bad = 0;

    void Check(const Pairs& pairs) {
        std::string why;
        const int64_t generation = CompleteGeneration(pairs, &why);
        ++reads;
        if (generation < 0) {
            if (++bad <= 5) {
                std::printf("FAIL: %s read %" PRId64 " is not a complete generation: %s\n", name,
                            reads, why.c_str());
            }
            return;
        }
        if (generation < latest) {
            if (++bad <= 5) {
                std::printf("FAIL: %s read generation %" PRId64 " after %" PRId64 "\n", name,
                            generation, latest);
            }
            return;
        }
        distinct += generation != latest ? 1 : 0;
        latest = generation;
    }
};

Pairs ParseDirectly(const std::string& path, bool* ok) {
    Pairs pairs;
    IniStore* store = IniCreate();
    *ok = store != nullptr && IniSetParseFlags(store, 0x12) >= 0 &&
          IniLoadFile(store, path.c_str()) == 0;
    const int count = *ok ? IniKeyCount(store, kSection) : 0;
    for (int i = 1; i <= count; ++i) {
        const char* key = nullptr;
        const char* value = nullptr;
        if (IniKeyName(store, kSection, i, &key) == 1 &&
            IniKeyValue(store, kSection, i, &value) == 1) {
            pairs[key] = value;
        }
    }
    IniDestroy(store);
    return pairs;
}

Pairs ReadThrough(ph_fwk::ConfigManager& config) {
    Pairs pairs;
    for (auto it = config.GetKeyIterator(kSection); !it->AtEnd(); it->Next()) {
        pairs[it->Key()] = it->Value();
    }
    return pairs;
}

// The checks must be able to fail: a generation cut short, or with one key of the next
// generation, is refused.
bool CheckerRefusesBrokenFiles() {
    Pairs good;
    const int64_t generation = 7;
    for (int32_t i = 0; i < KeyCountOf(generation); ++i) {
        good["k" + std::to_string(i)] = ValueOf(generation, i);
    }
    good["Count"] = std::to_string(KeyCountOf(generation));
    good["Generation"] = std::to_string(generation);
    good["Checksum"] = ChecksumOf(good);
    std::string why;
    Pairs cut = good;
    cut.erase("k3");
    Pairs mixed = good;
    mixed["k1"] = ValueOf(generation + 1, 1);
    Pairs truncatedValue = good;
    truncatedValue["k2"].pop_back();
    return CompleteGeneration(good, &why) == generation && CompleteGeneration(cut, &why) < 0 &&
           CompleteGeneration(mixed, &why) < 0 && CompleteGeneration(truncatedValue, &why) < 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc > 1 && (std::strcmp(argv[1], "--help") == 0 || std::strcmp(argv[1], "-h") == 0)) {
        std::printf(
            "Usage: config_soak [SECONDS]\n"
            "One process rewrites a configuration file through the manager for SECONDS\n"
            "(default 30) while another reads it; every read must be a complete\n"
            "generation. Prints PASS/FAIL lines and the rounds written and read.\n");
        return 0;
    }
    const int seconds = argc > 1 ? std::atoi(argv[1]) : 30;
    if (seconds < 1) {
        std::fprintf(stderr, "config_soak: bad SECONDS\n");
        return 2;
    }
    if (!CheckerRefusesBrokenFiles()) {
        std::printf("FAIL: the completeness check accepts broken generations\n");
        return 1;
    }
    std::printf("PASS: the completeness check refuses cut and mixed generations\n");

    char directory[] = "/tmp/qv-config-soak.XXXXXX";
    if (::mkdtemp(directory) == nullptr) {
        std::perror("mkdtemp");
        return 1;
    }
    const std::string path = std::string(directory) + "/qv-rt.ini";
    // Generation 1 exists before the reader starts.
    const auto start = std::chrono::steady_clock::now();
    const auto deadline = start + std::chrono::seconds(seconds);
    if (RunWriter(path, deadline, 1) != 1) {
        std::printf("FAIL: the first generation was not written\n");
        return 1;
    }
    int pipeFds[2];
    if (::pipe(pipeFds) != 0) {
        std::perror("pipe");
        return 1;
    }
    std::fflush(stdout);
    const pid_t writer = ::fork();
    if (writer < 0) {
        std::perror("fork");
        return 1;
    }
    if (writer == 0) {
        ::close(pipeFds[0]);
        const int64_t written = RunWriter(path, deadline, INT64_MAX);
        const ssize_t n = ::write(pipeFds[1], &written, sizeof written);
        std::fflush(stdout);
        ::_exit(n == static_cast<ssize_t>(sizeof written) && written > 0 ? 0 : 1);
    }
    ::close(pipeFds[1]);

    ReadWay direct{"direct parse"};
    ReadWay fresh{"fresh manager"};
    ReadWay lasting{"long-lived manager"};
    ph_fwk::ConfigManager_qvini lastingConfig(path);
    bool loadFailed = false;
    while (std::chrono::steady_clock::now() < deadline) {
        bool ok = false;
        Pairs pairs = ParseDirectly(path, &ok);
        if (!ok) {
            loadFailed = true;
        }
        direct.Check(pairs);
        {
            ph_fwk::ConfigManager_qvini config(path);
            fresh.Check(ReadThrough(config));
        }
        lasting.Check(ReadThrough(lastingConfig));
    }
    int64_t written = -1;
    const bool reported = ::read(pipeFds[0], &written, sizeof written) == sizeof written;
    int status = 0;
    ::waitpid(writer, &status, 0);

    int failures = 0;
    if (!reported || !WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        std::printf("FAIL: the writer failed (status %d)\n", status);
        ++failures;
    } else {
        std::printf("PASS: writer: %" PRId64 " generations written in %d s\n", written, seconds);
    }
    if (loadFailed) {
        std::printf("FAIL: the file could not be loaded at some read\n");
        ++failures;
    }
    for (const ReadWay* way : {&direct, &fresh, &lasting}) {
        const bool ok = way->bad == 0 && way->reads > 0 && way->distinct > 1;
        std::printf("%s: %s: %" PRId64 " reads, %" PRId64 " not complete, %" PRId64
                    " distinct generations seen, latest %" PRId64 "\n",
                    ok ? "PASS" : "FAIL", way->name, way->reads, way->bad, way->distinct,
                    way->latest);
        failures += ok ? 0 : 1;
    }
    ::unlink(path.c_str());
    ::rmdir(directory);
    std::printf("%s: configuration soak\n", failures == 0 ? "PASS" : "FAIL");
    return failures == 0 ? 0 : 1;
}
