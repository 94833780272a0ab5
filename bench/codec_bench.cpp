// Throughput of the UTF-8 codec against glibc iconv ("UTF-8" <-> "WCHAR_T") on 1 MiB each
// of ASCII, accented Latin and CJK text, and of decimal integer formatting against
// std::to_chars. Rates are in bytes of UTF-8 text (digits for the integers) per second;
// after the usual output the program prints one "ours / peer" line per pair.
#include <benchmark/benchmark.h>
#include <iconv.h>
#include <unistd.h>

#include <charconv>
#include <cstdint>
#include <cstdio>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "qv/zil/Utf8ToWide.h"
#include "qv/zil/WideToUtf8.h"
#include "qv/zil/osdep/IntegerToString.h"

namespace {

constexpr size_t kCorpusBytes = 1 << 20;

// A small deterministic generator, so every run measures the same text.
class Random {
public:
    explicit Random(uint64_t seed) : m_state(seed) {}
    uint32_t Next(uint32_t bound) {
        m_state = m_state * 6364136223846793005ULL + 1442695040888963407ULL;
        return static_cast<uint32_t>((m_state >> 33) % bound);
    }

private:
    uint64_t m_state;
};

// Joins words drawn from the list with separators until kCorpusBytes, padding the end
// with spaces so that no sequence is cut.
std::string MakeText(const std::vector<std::string>& words,
                     const std::vector<std::string>& separators, uint64_t seed) {
    Random random(seed);
    std::string text;
    text.reserve(kCorpusBytes);
    for (;;) {
        const std::string& word = words[random.Next(static_cast<uint32_t>(words.size()))];
        const std::string& separator =
            separators[random.Next(static_cast<uint32_t>(separators.size()))];
        if (text.size() + word.size() + separator.size() > kCorpusBytes) {
            break;
        }
        text += word;
        text += separator;
    }
    text.append(kCorpusBytes - text.size(), ' ');
    return text;
}

std::string AsciiText() {
    return MakeText({"the",     "quick",    "brown",   "fox",           "jumps",    "over",
                     "lazy",    "dog",      "system",  "configuration", "variable", "request",
                     "answer",  "registry", "service", "network",       "of",       "and",
                     "to",      "in",       "is",      "that",          "it",       "with",
                     "for",     "as",       "target",  "value",         "Property", "Method",
                     "session", "1024",     "42"},
                    {" ", " ", " ", " ", " ", " ", ", ", ". ", ".\n"}, 1);
}

// French and German prose: words drawn from a few paragraphs, so that accented letters
// come about as often as in running text (one in every 20 to 40 bytes).
std::string LatinText() {
    const char* const paragraphs =
        "Le matin, la lumière entrait doucement par la fenêtre de la cuisine où grand-mère "
        "préparait déjà le café. Elle racontait souvent l'histoire de son village, des fêtes "
        "d'été et des hivers très froids où les enfants allaient à l'école à pied. Nous "
        "écoutions en silence, car chaque récit était une leçon sur la patience et la "
        "générosité. Après le déjeuner, nous marchions le long de la rivière jusqu'au vieux "
        "pont de pierre. Am Abend saßen wir gemeinsam im Garten und sprachen über die Reise, "
        "die wir im nächsten Frühling machen wollten. Mein Bruder wollte unbedingt die Berge "
        "im Süden sehen, während meine Schwester lieber an einem ruhigen See übernachten "
        "würde. Schließlich einigten wir uns darauf, zuerst die Stadt zu besuchen und danach "
        "mit dem Zug weiterzufahren. Es war ein schöner Abend, und die Luft roch nach "
        "frischem Gras.";
    std::vector<std::string> words;
    std::string word;
    for (const char* c = paragraphs; *c != '\0'; ++c) {
        if (*c == ' ') {
            words.push_back(word);
            word.clear();
        } else {
            word += *c;
        }
    }
    words.push_back(word);
    return MakeText(words, {" ", " ", " ", " ", " ", " ", " ", "\n"}, 2);
}

// Chinese prose: three-byte characters and punctuation with the odd ASCII digit run.
std::string CjkText() {
    const char* const characters[] = {
        "的", "一", "是", "不", "了", "人", "我", "在", "有", "他", "这", "中", "大", "来", "上",
        "国", "个", "到", "说", "们", "为", "子", "和", "你", "地", "出", "道", "也", "时", "年",
        "得", "就", "那", "要", "下", "以", "生", "会", "自", "着", "去", "之", "过", "家", "学",
        "对", "可", "她", "里", "后", "小", "么", "心", "多", "天", "而", "能", "好", "都", "然",
        "没", "日", "于", "起", "还", "发", "成", "事", "只", "作", "当", "想", "看", "文", "无",
        "开", "手", "十", "用", "主", "行", "方", "又", "如", "前", "所", "本", "见", "经", "头",
        "面", "公", "同", "三", "已", "老", "从", "动", "两", "长", "知", "民", "样", "现", "分",
        "将", "外", "但", "身", "些", "与", "高", "意", "进", "把", "法", "此", "实", "回", "二",
        "理", "美", "点", "月", "明", "其", "种", "声", "全", "工", "己", "话", "儿", "者", "向",
        "情", "部", "正", "名", "定", "女", "问", "力", "机", "给", "等", "几", "很", "业", "最"};
    std::vector<std::string> words;
    Random random(3);
    for (int i = 0; i < 400; ++i) {
        std::string word;
        const uint32_t length = 1 + random.Next(4);
        for (uint32_t j = 0; j < length; ++j) {
            word += characters[random.Next(sizeof(characters) / sizeof(characters[0]))];
        }
        words.push_back(word);
    }
    words.push_back("2024");
    return MakeText(words, {"", "", "", "", "", "", "，", "，", "。", "。\n", "、"}, 4);
}

struct Corpus {
    const char* name;
    std::string utf8;
    std::vector<wchar_t> wide;
};

std::vector<Corpus>& Corpora() {
    static std::vector<Corpus> corpora = [] {
        std::vector<Corpus> result{
            {"ascii", AsciiText(), {}}, {"latin", LatinText(), {}}, {"cjk", CjkText(), {}}};
        for (Corpus& corpus : result) {
            const char* input = corpus.utf8.data();
            const char* const end = input + corpus.utf8.size();
            corpus.wide.resize(qv::zil::Utf8ToWide::Count(input, end));
            qv::zil::Utf8ToWide::ConvertAll(input, end, corpus.wide.data(),
                                            corpus.wide.data() + corpus.wide.size());
        }
        return result;
    }();
    return corpora;
}

// One iconv descriptor for the whole benchmark: only the conversion itself is timed.
class IconvDescriptor {
public:
    IconvDescriptor(const char* to, const char* from) : m_descriptor(iconv_open(to, from)) {
        if (m_descriptor == reinterpret_cast<iconv_t>(-1)) {
            throw std::runtime_error("iconv_open failed");
        }
    }
    ~IconvDescriptor() { iconv_close(m_descriptor); }
    IconvDescriptor(const IconvDescriptor&) = delete;
    IconvDescriptor& operator=(const IconvDescriptor&) = delete;

    // Converts all of the input; returns false when iconv stops early.
    bool Convert(const void* input, size_t inputBytes, void* output, size_t outputBytes) const {
        iconv(m_descriptor, nullptr, nullptr, nullptr, nullptr);
        char* in = static_cast<char*>(const_cast<void*>(input));
        char* out = static_cast<char*>(output);
        return iconv(m_descriptor, &in, &inputBytes, &out, &outputBytes) != static_cast<size_t>(-1);
    }

private:
    iconv_t m_descriptor;
};

void DecodeOurs(benchmark::State& state, const Corpus* corpus) {
    std::vector<wchar_t> output(corpus->wide.size());
    for (auto _ : state) {
        const char* input = corpus->utf8.data();
        const uint32_t written = qv::zil::Utf8ToWide::ConvertAll(
            input, input + corpus->utf8.size(), output.data(), output.data() + output.size());
        benchmark::DoNotOptimize(written);
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * corpus->utf8.size()));
}

void DecodeIconv(benchmark::State& state, const Corpus* corpus) {
    const IconvDescriptor descriptor("WCHAR_T", "UTF-8");
    std::vector<wchar_t> output(corpus->wide.size());
    for (auto _ : state) {
        const bool done = descriptor.Convert(corpus->utf8.data(), corpus->utf8.size(),
                                             output.data(), output.size() * sizeof(wchar_t));
        benchmark::DoNotOptimize(done);
        benchmark::ClobberMemory();
    }
    if (output != corpus->wide) {
        state.SkipWithError("iconv decoded differently");
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * corpus->utf8.size()));
}

void EncodeOurs(benchmark::State& state, const Corpus* corpus) {
    std::vector<char> output(corpus->utf8.size());
    for (auto _ : state) {
        const wchar_t* input = corpus->wide.data();
        const uint32_t written = qv::zil::WideToUtf8::ConvertAll(
            input, input + corpus->wide.size(), output.data(), output.data() + output.size());
        benchmark::DoNotOptimize(written);
        benchmark::ClobberMemory();
    }
    if (std::string(output.begin(), output.end()) != corpus->utf8) {
        state.SkipWithError("encoded differently");
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * corpus->utf8.size()));
}

void EncodeIconv(benchmark::State& state, const Corpus* corpus) {
    const IconvDescriptor descriptor("UTF-8", "WCHAR_T");
    std::vector<char> output(corpus->utf8.size());
    for (auto _ : state) {
        const bool done =
            descriptor.Convert(corpus->wide.data(), corpus->wide.size() * sizeof(wchar_t),
                               output.data(), output.size());
        benchmark::DoNotOptimize(done);
        benchmark::ClobberMemory();
    }
    if (std::string(output.begin(), output.end()) != corpus->utf8) {
        state.SkipWithError("iconv encoded differently");
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * corpus->utf8.size()));
}

// Values of every decimal length from 1 to 10 digits, in equal shares.
const std::vector<uint32_t>& IntegerValues() {
    static const std::vector<uint32_t> values = [] {
        std::vector<uint32_t> result;
        Random random(5);
        const uint32_t limits[] = {10u,      100u,      1000u,      10000u,      100000u,
                                   1000000u, 10000000u, 100000000u, 1000000000u, 0xFFFFFFFFu};
        for (int i = 0; i < 1000; ++i) {
            const uint32_t limit = limits[i % 10];
            result.push_back(random.Next(limit));
        }
        return result;
    }();
    return values;
}

int64_t DigitCount() {
    int64_t digits = 0;
    for (const uint32_t value : IntegerValues()) {
        char buffer[16];
        digits += std::to_chars(buffer, buffer + sizeof(buffer), value).ptr - buffer;
    }
    return digits;
}

void FormatOurs(benchmark::State& state) {
    const std::vector<uint32_t>& values = IntegerValues();
    for (auto _ : state) {
        for (const uint32_t value : values) {
            qv::zil::WideString text = qv::zil::osdep::IntegerToString(value, 10);
            benchmark::DoNotOptimize(text.data());
        }
    }
    state.SetBytesProcessed(state.iterations() * DigitCount());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * values.size()));
}

void FormatToChars(benchmark::State& state) {
    const std::vector<uint32_t>& values = IntegerValues();
    for (auto _ : state) {
        for (const uint32_t value : values) {
            char buffer[16];
            const std::to_chars_result result =
                std::to_chars(buffer, buffer + sizeof(buffer), value, 10);
            benchmark::DoNotOptimize(result.ptr);
            benchmark::ClobberMemory();
        }
    }
    state.SetBytesProcessed(state.iterations() * DigitCount());
    state.SetItemsProcessed(static_cast<int64_t>(state.iterations() * values.size()));
}

struct Pair {
    std::string label;
    std::string ours;
    std::string peer;
};

// Keeps the rate of every run (the median when repetitions are asked for).
class CollectingReporter : public benchmark::ConsoleReporter {
public:
    explicit CollectingReporter(OutputOptions options) : ConsoleReporter(options) {}

    void ReportRuns(const std::vector<Run>& runs) override {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            const bool aggregate = run.run_type == Run::RT_Aggregate;
            if ((aggregate && run.aggregate_name != "median") || run.error_occurred) {
                continue;
            }
            const auto rate = run.counters.find("bytes_per_second");
            if (rate != run.counters.end()) {
                m_rates[run.run_name.function_name] = rate->second.value;
            }
        }
    }

    // Bytes per second of the named benchmark, or 0 when it did not run.
    double Rate(const std::string& name) const {
        const auto found = m_rates.find(name);
        return found == m_rates.end() ? 0.0 : found->second;
    }

private:
    std::map<std::string, double> m_rates;
};

}  // namespace

int main(int argc, char** argv) {
    std::vector<Pair> pairs;
    for (const Corpus& corpus : Corpora()) {
        const std::string name(corpus.name);
        benchmark::RegisterBenchmark(("decode/ours/" + name).c_str(), DecodeOurs, &corpus);
        benchmark::RegisterBenchmark(("decode/iconv/" + name).c_str(), DecodeIconv, &corpus);
        pairs.push_back({"UTF-8 -> wide, " + name, "decode/ours/" + name, "decode/iconv/" + name});
    }
    for (const Corpus& corpus : Corpora()) {
        const std::string name(corpus.name);
        benchmark::RegisterBenchmark(("encode/ours/" + name).c_str(), EncodeOurs, &corpus);
        benchmark::RegisterBenchmark(("encode/iconv/" + name).c_str(), EncodeIconv, &corpus);
        pairs.push_back({"wide -> UTF-8, " + name, "encode/ours/" + name, "encode/iconv/" + name});
    }
    benchmark::RegisterBenchmark("format/ours/u32", FormatOurs);
    benchmark::RegisterBenchmark("format/to_chars/u32", FormatToChars);
    pairs.push_back({"uint32 -> decimal", "format/ours/u32", "format/to_chars/u32"});

    // Colours only on a terminal, and never when they were turned off.
    bool color = isatty(STDOUT_FILENO) != 0;
    for (int i = 1; i < argc; ++i) {
        const std::string argument(argv[i]);
        if (argument == "--benchmark_color=false" || argument == "--benchmark_color=no") {
            color = false;
        }
    }
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 1;
    }
    CollectingReporter reporter(color ? benchmark::ConsoleReporter::OO_ColorTabular
                                      : benchmark::ConsoleReporter::OO_Tabular);
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();

    std::printf("\n%-24s %12s %12s %10s\n", "pair", "ours GB/s", "peer GB/s", "ours/peer");
    for (const Pair& pair : pairs) {
        const double ours = reporter.Rate(pair.ours);
        const double peer = reporter.Rate(pair.peer);
        if (ours == 0.0 || peer == 0.0) {
            std::printf("%-24s %12s\n", pair.label.c_str(), "(not run)");
            continue;
        }
        std::printf("%-24s %12.3f %12.3f %10.2f\n", pair.label.c_str(), ours / 1e9, peer / 1e9,
                    ours / peer);
    }
    return 0;
}
