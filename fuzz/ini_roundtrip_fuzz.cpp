// Fuzz target: the INI parser and writer. The first input byte chooses the parse flags and
// the write options, the rest is the file: IniReadStream reads it from an in-memory
// stream, IniWriteStream writes the store back, and a second store reads that text with
// the same flags. Both stores must hold the same sections and keys (names and values, in
// order), except where the file format itself cannot carry a store through a round trip
// (see ExpectedAfterRoundTrip).
//
// Option byte: bits 0-3 parse flags 0x01 keep empty, 0x02 double quotes, 0x04 single
// quotes, 0x08 colon; bits 4-5 the max line length and break character (-1/none, 80/none,
// 32/',', 20/' '); bit 6 " = " between key and value; bit 7 byte order mark and compact
// blank lines.
#include <cctype>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include "config/IniStore.h"

namespace {

void Check(bool condition, const char* what) {
    if (!condition) {
        std::fprintf(stderr, "ini_roundtrip_fuzz: %s\n", what);
        std::abort();
    }
}

struct KeyCopy {
    std::string name;
    std::string value;
};

struct SectionCopy {
    std::string name;
    std::vector<KeyCopy> keys;
    bool keysCompared = true;
};

using StoreCopy = std::vector<SectionCopy>;

struct StoreDeleter {
    void operator()(IniStore* store) const { IniDestroy(store); }
};
using Store = std::unique_ptr<IniStore, StoreDeleter>;

struct Options {
    uint32_t parseFlags;
    int32_t maxLineLength;
    int breakCharacter;
    uint32_t writeFlags;
};

Options OptionsFrom(uint8_t byte) {
    static const int32_t kLengths[4] = {-1, 80, 32, 20};
    static const int kBreaks[4] = {0, 0, ',', ' '};
    Options options;
    options.parseFlags = byte & 0x0F;
    options.maxLineLength = kLengths[(byte >> 4) & 3];
    options.breakCharacter = kBreaks[(byte >> 4) & 3];
    options.writeFlags = ((byte & 0x40) ? kIniWriteSpacedEquals : 0u) |
                         ((byte & 0x80) ? (kIniWriteBom | kIniWriteCompact) : 0u);
    return options;
}

Store MakeStore(const Options& options) {
    Store store(IniCreate());
    Check(store != nullptr, "IniCreate failed");
    Check(IniSetParseFlags(store.get(), options.parseFlags) == 1, "IniSetParseFlags failed");
    Check(IniSetWriteOptions(store.get(), options.maxLineLength, options.breakCharacter,
                             options.writeFlags) == 1,
          "IniSetWriteOptions failed");
    return store;
}

// IniReadStream over the bytes through a read-only memory stream; 1 when the C library
// cannot open one (an empty buffer, on some versions).
int Read(IniStore* store, const std::string& text) {
    std::string buffer = text;
    FILE* stream = fmemopen(&buffer[0], buffer.size(), "rb");
    if (stream == nullptr) {
        return 1;
    }
    const int rc = IniReadStream(store, stream);
    std::fclose(stream);
    return rc;
}

int Write(IniStore* store, std::string& text) {
    char* data = nullptr;
    size_t size = 0;
    FILE* stream = open_memstream(&data, &size);
    Check(stream != nullptr, "open_memstream failed");
    const int rc = IniWriteStream(store, stream, 1);  // a memory stream cannot be truncated
    std::fclose(stream);
    text.assign(data, size);
    std::free(data);
    return rc;
}

StoreCopy Snapshot(IniStore* store) {
    StoreCopy copy;
    const int sections = IniSectionCount(store);
    for (int i = 1; i <= sections; ++i) {
        const char* name = nullptr;
        Check(IniSectionName(store, i, &name) == 1, "IniSectionName failed within the count");
        SectionCopy section;
        section.name = name;
        const int keys = IniKeyCount(store, section.name.c_str());
        for (int k = 1; k <= keys; ++k) {
            const char* keyName = nullptr;
            const char* value = nullptr;
            Check(IniKeyName(store, section.name.c_str(), k, &keyName) == 1 &&
                      IniKeyValue(store, section.name.c_str(), k, &value) == 1,
                  "IniKeyName or IniKeyValue failed within the count");
            section.keys.push_back(KeyCopy{keyName, value});
        }
        copy.push_back(std::move(section));
    }
    return copy;
}

bool SameName(const std::string& a, const std::string& b) {
    if (a.size() != b.size()) {
        return false;
    }
    for (size_t i = 0; i < a.size(); ++i) {
        if (std::toupper(static_cast<unsigned char>(a[i])) !=
            std::toupper(static_cast<unsigned char>(b[i]))) {
            return false;
        }
    }
    return true;
}

// The store that reading the written text back must give, derived from the first store
// by the rules of the file format that no writer can avoid:
// - A leading section named "(null)" is written without a header line (that is how keys
//   before the first header are stored under parse flag 0x08). Without flag 0x08 the
//   reader ignores such keys, and a "(null)" section without keys leaves no trace.
// - Joining continuation keys ("Path Line0001", ...) after parsing can leave two keys of
//   one name in a section ("Path=/a" before the run). They are written as two lines; the
//   reader lets the later replace the earlier when it is one line, but joins it again
//   into a second key of that name when it was split. The keys of such a section are not
//   compared; its name and place still are.
// - With a max line length, long values are written as continuation pieces named
//   "<name> Line0001" and so on, and the reader joins a run of such keys without comparing
//   base names. A key whose own name contains " Line" is therefore ambiguous: its pieces
//   may not join back ("Command Line Line0001" is no continuation key, as the first " Line"
//   decides), or it may itself be taken into the run of a split key before it. The keys of
//   a section holding such a name are not compared then either.
StoreCopy ExpectedAfterRoundTrip(StoreCopy store, const Options& options) {
    if (!store.empty() && store.front().name == "(null)" &&
        (!(options.parseFlags & kIniParseColon) || store.front().keys.empty())) {
        store.erase(store.begin());
    }
    for (SectionCopy& section : store) {
        const std::vector<KeyCopy>& keys = section.keys;
        for (size_t k = 0; k < keys.size() && section.keysCompared; ++k) {
            if (options.maxLineLength >= 0 && keys[k].name.find(" Line") != std::string::npos) {
                section.keysCompared = false;
            }
            for (size_t earlier = 0; earlier < k; ++earlier) {
                if (SameName(keys[earlier].name, keys[k].name)) {
                    section.keysCompared = false;
                }
            }
        }
    }
    return store;
}

// -3 exactly when the text starts with a UTF-16 or UTF-32 byte order mark.
bool StartsWithWideMark(const std::string& text) {
    auto at = [&text](size_t i) { return static_cast<unsigned char>(text[i]); };
    if (text.size() >= 4 && ((at(0) == 0xFF && at(1) == 0xFE && at(2) == 0 && at(3) == 0) ||
                             (at(0) == 0 && at(1) == 0 && at(2) == 0xFE && at(3) == 0xFF))) {
        return true;
    }
    if (text.size() >= 3 && at(0) == 0xEF && at(1) == 0xBB && at(2) == 0xBF) {
        return false;
    }
    return text.size() >= 2 &&
           ((at(0) == 0xFF && at(1) == 0xFE) || (at(0) == 0xFE && at(1) == 0xFF));
}

// What differs between the two stores, or null.
const char* Difference(const StoreCopy& expected, const StoreCopy& actual) {
    if (expected.size() != actual.size()) {
        return "the round trip changed the number of sections";
    }
    for (size_t i = 0; i < expected.size(); ++i) {
        const SectionCopy& want = expected[i];
        const SectionCopy& got = actual[i];
        if (want.name != got.name) {
            return "the round trip changed a section name";
        }
        if (!want.keysCompared) {
            continue;
        }
        if (want.keys.size() != got.keys.size()) {
            return "the round trip changed a key count";
        }
        for (size_t k = 0; k < want.keys.size(); ++k) {
            if (want.keys[k].name != got.keys[k].name) {
                return "the round trip changed a key name";
            }
            if (want.keys[k].value != got.keys[k].value) {
                return "the round trip changed a value";
            }
        }
    }
    return nullptr;
}

// Text with the bytes outside printable ASCII as \xNN, for the report of a finding.
std::string Escaped(const std::string& text) {
    std::string out;
    for (unsigned char c : text) {
        if (c >= 0x20 && c < 0x7F && c != '\\') {
            out += static_cast<char>(c);
        } else {
            char hex[8];
            std::snprintf(hex, sizeof hex, "\\x%02X", c);
            out += hex;
        }
    }
    return out;
}

void Print(const char* title, const StoreCopy& store) {
    std::fprintf(stderr, "%s:\n", title);
    for (const SectionCopy& section : store) {
        std::fprintf(stderr, "  [%s]%s\n", Escaped(section.name).c_str(),
                     section.keysCompared ? "" : " (keys not compared)");
        for (const KeyCopy& key : section.keys) {
            std::fprintf(stderr, "    %s = %s\n", Escaped(key.name).c_str(),
                         Escaped(key.value).c_str());
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0) {
        return 0;
    }
    const Options options = OptionsFrom(data[0]);
    const std::string text(reinterpret_cast<const char*>(data) + 1, size - 1);

    Store first = MakeStore(options);
    const int readRc = Read(first.get(), text);
    if (readRc == 1) {
        return 0;
    }
    if (StartsWithWideMark(text)) {
        Check(readRc == kIniWideEncoding && IniSectionCount(first.get()) == 0,
              "a UTF-16 or UTF-32 mark was not refused with -3 and an empty store");
        return 0;
    }
    Check(readRc == 0, "reading from a memory stream failed");

    std::string written;
    const int writeRc = Write(first.get(), written);
    if (writeRc == kIniCannotSplit) {
        // A key name too long for the line length leaves no room for a piece of its
        // value, or white space or break characters leave no place to cut: the writer
        // refuses rather than write what would not read back.
        Check(options.maxLineLength >= 0, "-2 without a max line length");
        return 0;
    }
    Check(writeRc == 0, "writing to a memory stream failed");

    Store second = MakeStore(options);
    const int rereadRc = Read(second.get(), written);
    Check(rereadRc == 0 || (rereadRc == 1 && written.empty()), "the written text does not read");
    const StoreCopy expected = ExpectedAfterRoundTrip(Snapshot(first.get()), options);
    const StoreCopy actual = Snapshot(second.get());
    const char* difference = Difference(expected, actual);
    if (difference != nullptr) {
        std::fprintf(stderr, "written text: %s\n", Escaped(written).c_str());
        Print("expected store", expected);
        Print("store read back", actual);
        Check(false, difference);
    }
    return 0;
}
