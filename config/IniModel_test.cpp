// The model behind the store on large inputs: repeated names merged while reading large
// sections, the position index after removals and renames, and the text arena after many
// replaced values, removals and re-reads into the same store.
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <cctype>
#include <random>
#include <string>
#include <vector>

using namespace qv_ini_test;

namespace {

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

// What reading a file key by key gives, written as Dump writes it.
struct Expected {
    struct Entry {
        std::string name;
        std::string value;
        int line;
        char quote;
    };
    struct Group {
        std::string name;
        int line;
        std::vector<Entry> entries;
    };
    std::vector<Group> groups;
    Group* current = nullptr;

    void Header(const std::string& name, int line) {
        current = nullptr;
        for (Group& group : groups) {
            if (SameName(group.name, name)) {
                current = &group;
            }
        }
        if (!current) {
            groups.push_back(Group{name, line, {}});
            current = &groups.back();
        }
        current->line = line;
    }
    void Pair(const std::string& name, const std::string& value, int line, char quote) {
        for (Entry& entry : current->entries) {
            if (SameName(entry.name, name)) {
                entry.value = value;
                entry.line = line;
                entry.quote = quote;
                return;
            }
        }
        current->entries.push_back(Entry{name, value, line, quote});
    }
    std::string Dump() const {
        std::string out;
        for (const Group& group : groups) {
            out += "[" + group.name + "] @" + std::to_string(group.line) + "\n";
            for (const Entry& entry : group.entries) {
                out += entry.name + "=" + entry.value + " @" + std::to_string(entry.line);
                if (entry.quote) {
                    out += std::string(" q") + entry.quote;
                }
                out += "\n";
            }
        }
        return out;
    }
};

std::string MixCase(std::string name, std::mt19937* random) {
    for (char& c : name) {
        if ((*random)() % 2) {
            c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
        }
    }
    return name;
}

}  // namespace

TEST(IniModel, RepeatedNamesInLargeSectionsMergeIntoTheFirst) {
    // Sections far beyond the index threshold, reopened later, with names repeated in any case
    // and quoted or plain values: the first key of a name keeps its place and takes the value,
    // line and quote of the last one, exactly as in a small section.
    TempDir dir;
    for (unsigned seed = 1; seed <= 4; ++seed) {
        std::mt19937 random(seed);
        Expected expected;
        std::string text;
        int line = 0;
        for (int block = 0; block < 12; ++block) {
            const std::string section = MixCase("sect" + std::to_string(random() % 4), &random);
            text += " [ " + section + " ]\n";
            expected.Header(section, ++line);
            const int names = block % 3 == 0 ? 5 : 300;  // some sections stay small
            const int count = static_cast<int>(random() % 400);
            for (int k = 0; k < count; ++k) {
                const std::string name = MixCase(
                    "key_" + std::to_string(random() % static_cast<unsigned>(names)), &random);
                const std::string value = "v" + std::to_string(line);
                const bool quoted = random() % 5 == 0;
                text += name + " = " + (quoted ? "\"" + value + "\"" : value) + "\n";
                expected.Pair(name, value, ++line, quoted ? '"' : 0);
            }
        }
        const std::string path = dir.File("repeated.ini");
        WriteAll(path, text);
        Store store = NewStore();
        ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(Dump(store.get()), expected.Dump()) << "seed " << seed;
        // Reading again into the same store gives the same.
        ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
        EXPECT_EQ(Dump(store.get()), expected.Dump()) << "seed " << seed << ", re-read";
    }
}

TEST(IniModel, IndexFollowsRemovalsAndRenamedDuplicates) {
    Store store = NewStore();
    IniStore* s = store.get();
    for (int i = 0; i < 40; ++i) {
        const std::string section = "S" + std::to_string(i);
        ASSERT_EQ(IniSetInt(s, section.c_str(), "n", i), 1);
    }
    // Two sections named S5 now. The renamed one is current and answers first; once another
    // section is current the earlier one in order answers, and the later one once it is gone.
    ASSERT_EQ(IniRenameSection(s, "S30", "s5"), 1);
    int32_t v = -1;
    EXPECT_EQ(IniGetInt(s, "S5", "n", &v), 1);
    EXPECT_EQ(v, 30);
    ASSERT_EQ(IniSectionExists(s, "S1"), 1);
    EXPECT_EQ(IniGetInt(s, "S5", "n", &v), 1);
    EXPECT_EQ(v, 5);
    ASSERT_EQ(IniDeleteSection(s, "S5"), 1);
    EXPECT_EQ(IniGetInt(s, "S5", "n", &v), 1);
    EXPECT_EQ(v, 30);
    // Every section after the removed ones is still found by name, at its new position.
    ASSERT_EQ(IniDeleteSection(s, "S0"), 1);
    EXPECT_EQ(IniSectionCount(s), 38);
    for (int i = 1; i < 40; ++i) {
        const std::string section = "S" + std::to_string(i);
        if (i == 5 || i == 30) {
            continue;
        }
        ASSERT_EQ(IniGetInt(s, section.c_str(), "n", &v), 1) << section;
        EXPECT_EQ(v, i);
    }
    const char* name = nullptr;
    ASSERT_EQ(IniSectionName(s, 29, &name), 1);
    EXPECT_STREQ(name, "s5");

    // Keys of a large section: removing keys moves the positions of the later ones down.
    for (int i = 0; i < 100; ++i) {
        ASSERT_EQ(IniSetInt(s, "Big", ("k" + std::to_string(i)).c_str(), i), 1);
    }
    for (int i = 0; i < 100; i += 3) {
        ASSERT_EQ(IniDeleteKey(s, "Big", ("k" + std::to_string(i)).c_str()), 1);
    }
    for (int i = 0; i < 100; ++i) {
        EXPECT_EQ(IniGetInt(s, "Big", ("K" + std::to_string(i)).c_str(), &v), i % 3 ? 1 : 0);
        if (i % 3) {
            EXPECT_EQ(v, i);
        }
    }
    ASSERT_EQ(IniKeyName(s, "Big", 1, &name), 1);
    EXPECT_STREQ(name, "k1");
    ASSERT_EQ(IniSetInt(s, "Big", "k0", 0), 1);  // appended at the end
    ASSERT_EQ(IniKeyName(s, "Big", IniKeyCount(s, "Big"), &name), 1);
    EXPECT_STREQ(name, "k0");
}

TEST(IniModel, TextSurvivesReplacedValuesRemovalsAndRereads) {
    TempDir dir;
    const std::string bigPath = dir.File("big.ini");
    const std::string smallPath = dir.File("small.ini");
    std::string big = "[A]\n";
    for (int i = 0; i < 3000; ++i) {
        big += "key" + std::to_string(i) + "=initial value " + std::to_string(i) + "\n";
    }
    WriteAll(bigPath, big);
    WriteAll(smallPath, "[A]\nkey1=one\nkey2=two\n[B]\nx=y\n");

    Store store = NewStore();
    IniStore* s = store.get();
    // A big file, then a small one into the same store: the keys and text of the big one
    // are taken back and must not be touched again.
    ASSERT_EQ(IniLoadFile(s, bigPath.c_str()), 0);
    ASSERT_EQ(IniLoadFile(s, smallPath.c_str()), 0);
    EXPECT_EQ(Dump(s), "[A] @1\nkey1=one @2\nkey2=two @3\n[B] @4\nx=y @5\n");
    for (size_t length = 1000; length < 1200; ++length) {
        ASSERT_EQ(IniSetValue(s, "A", "key1", std::string(length, 'v').c_str(), 0), 1);
    }
    EXPECT_EQ(Dump(s),
              "[A] @1\nkey1=" + std::string(1199, 'v') + " @2\nkey2=two @3\n[B] @4\nx=y @5\n");
    ASSERT_EQ(IniLoadFile(s, bigPath.c_str()), 0);

    // Values replaced by longer ones many times over leave most text unused, which is copied
    // away; every value must read back after each round, and after removals.
    for (int round = 1; round <= 6; ++round) {
        for (int i = 0; i < 3000; ++i) {
            const std::string key = "key" + std::to_string(i);
            const std::string value =
                std::string(static_cast<size_t>(round * 8), 'x') + std::to_string(i);
            ASSERT_EQ(IniSetValue(s, "A", key.c_str(), value.c_str(), 0), 1);
        }
        for (int i = round; i < 3000; i += 97) {
            IniDeleteKey(s, "A", ("key" + std::to_string(i)).c_str());
        }
        int wrong = 0;
        int present = 0;
        for (int i = 0; i < 3000; ++i) {
            const char* value = nullptr;
            if (IniGetValue(s, "A", ("key" + std::to_string(i)).c_str(), &value) != 1) {
                continue;
            }
            ++present;
            const std::string want =
                std::string(static_cast<size_t>(round * 8), 'x') + std::to_string(i);
            wrong += want != value ? 1 : 0;
        }
        EXPECT_EQ(wrong, 0) << "round " << round;
        EXPECT_EQ(present, IniKeyCount(s, "A"));
    }
    // Shorter values are written in place; names are unchanged throughout.
    ASSERT_EQ(IniSetValue(s, "A", "key0", "s", 0), 1);
    const char* value = nullptr;
    ASSERT_EQ(IniGetValue(s, "A", "KEY0", &value), 1);
    EXPECT_STREQ(value, "s");
    const char* name = nullptr;
    ASSERT_EQ(IniKeyName(s, "A", 1, &name), 1);
    EXPECT_STREQ(name, "key0");
}
