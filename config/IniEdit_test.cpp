// Setters, escapes, removal, renaming, and lookups in large sections (the name index).
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

using namespace qv_ini_test;

namespace {

std::string Serialized(IniStore* store, uint32_t writeFlags, const TempDir& dir) {
    IniSetWriteOptions(store, -1, 0, writeFlags);
    std::string path = dir.File("out.ini");
    EXPECT_EQ(IniWriteFile(store, path.c_str()), 0);
    return ReadAll(path);
}

}  // namespace

TEST(IniEdit, SettersFormatAndWrite) {
    TempDir dir;
    Store store = NewStore();
    IniStore* s = store.get();
    EXPECT_EQ(IniSetDouble(s, "Num", "half", 0.5), 1);
    EXPECT_EQ(IniSetInt(s, "Num", "min", INT32_MIN), 1);
    EXPECT_EQ(IniSetBool(s, "Num", "flag", true), 1);
    EXPECT_EQ(IniSetString(s, " Text ", " name ", "  a b  "), 1);
    EXPECT_EQ(IniSetValue(s, "text", "NAME", "c", 0), 1);  // same key, new value and quote
    EXPECT_EQ(IniSetString(s, "Text", "other", "x"), 1);
    EXPECT_EQ(Serialized(s, 0x06, dir),
              "[Num]\nhalf=5.00000000000000e-01\nmin=-2147483648\nflag=True\n\n"
              "[Text]\nname=c\nother=\"x\"\n\n");
    EXPECT_EQ(Serialized(s, 0x1E, dir),
              "[Num]\nhalf = 5.00000000000000e-01\nmin = -2147483648\nflag = True\n\n"
              "[Text]\nname = c\nother = \"x\"\n\n");

    // Refused names and values change nothing.
    EXPECT_EQ(IniSetString(s, "", "k", "v"), kIniBadName);
    EXPECT_EQ(IniSetString(s, "S", "  ", "v"), kIniBadName);
    EXPECT_EQ(IniSetString(s, "S", "k", "line\ninjected=1"), kIniBadName);
    EXPECT_EQ(IniSetString(s, "S]x", "k", "v"), kIniBadName);
    EXPECT_EQ(IniSetString(s, "S", "a=b", "v"), kIniBadName);
    EXPECT_EQ(IniSetString(s, "S", "[k", "v"), kIniBadName);
    EXPECT_EQ(IniSetString(s, nullptr, "k", "v"), kIniBadName);
    EXPECT_EQ(IniSectionExists(s, "S"), 0);
    EXPECT_EQ(IniSectionCount(s), 2);

    double d = 0;
    ASSERT_EQ(IniGetDouble(s, "Num", "half", &d), 1);
    EXPECT_EQ(d, 0.5);
    bool b = false;
    ASSERT_EQ(IniGetBool(s, "num", "FLAG", &b), 1);
    EXPECT_TRUE(b);
}

TEST(IniEdit, EscapedValuesRoundTrip) {
    TempDir dir;
    Store store = NewStore();
    IniStore* s = store.get();
    const std::string original = "tab\there \"q\" back\\slash\nnl \x01 cr\r end";
    ASSERT_EQ(IniSetEscaped(s, "E", "k", original.c_str()), 1);
    std::string file = Serialized(s, 0x06, dir);
    EXPECT_EQ(file, "[E]\nk=\"tab\\there \\\"q\\\" back\\\\slash\\nnl \\x01 cr\\x0d end\"\n\n");

    Store reread = NewStore();
    std::string path = dir.File("out.ini");
    ASSERT_EQ(IniLoadFile(reread.get(), path.c_str()), 0);
    const char* text = nullptr;
    ASSERT_EQ(IniGetEscaped(reread.get(), "E", "k", &text), 1);
    EXPECT_EQ(std::string(text), original);

    // Loose escapes: unknown letters lose the backslash, "\x" needs two hex digits, a
    // closing lone backslash stays.
    IniSetValue(s, "E", "loose", R"(\q\x41\x4G\X41\x4"x\)", 0);
    ASSERT_EQ(IniGetEscaped(s, "E", "loose", &text), 1);
    EXPECT_STREQ(text, "qAx4GX41x4\"x\\");
    char small[5];
    EXPECT_EQ(IniGetEscapedString(s, "E", "loose", small, sizeof small), 1);
    EXPECT_STREQ(small, "qAx4");
    EXPECT_EQ(IniGetEscapedString(s, "E", "absent", small, sizeof small), 0);
    EXPECT_STREQ(small, "");

    // The scratch buffer follows the size of each decoded text.
    for (size_t length : {10u, 3000u, 5u, 1300u, 200u}) {
        std::string value(length, 'z');
        value += "\\n";
        IniSetValue(s, "E", "sized", value.c_str(), 0);
        char* copy = nullptr;
        ASSERT_EQ(IniGetEscapedDup(s, "E", "sized", &copy), 1);
        EXPECT_EQ(std::string(copy), std::string(length, 'z') + "\n");
        std::free(copy);
    }
}

TEST(IniEdit, DeleteAndRename) {
    TempDir dir;
    Store store = NewStore();
    IniStore* s = store.get();
    IniSetValue(s, "A", "k1", "1", 0);
    IniSetValue(s, "A", "k2", "2", 0);
    IniSetValue(s, "B", "k", "b", 0);
    EXPECT_EQ(IniDeleteKey(s, "A", "K1"), 1);
    EXPECT_EQ(IniDeleteKey(s, "A", "K1"), 0);
    EXPECT_EQ(IniDeleteKey(s, "missing", "k"), 0);
    EXPECT_EQ(IniKeyCount(s, "A"), 1);

    EXPECT_EQ(IniRenameSection(s, "a", "  C "), 1);
    EXPECT_EQ(IniSectionExists(s, "A"), 0);
    EXPECT_EQ(IniKeyExists(s, "c", "k2"), 1);
    EXPECT_EQ(IniRenameSection(s, "missing", "D"), 0);
    EXPECT_EQ(IniRenameSection(s, "C", " "), kIniBadName);
    EXPECT_EQ(IniRenameSection(s, "C", "x]y"), kIniBadName);

    // Renaming onto an existing name: the first section in order wins lookups.
    EXPECT_EQ(IniRenameSection(s, "B", "C"), 1);
    const char* name = nullptr;
    IniSectionName(s, 1, &name);  // makes the first "C" current
    const char* value = nullptr;
    EXPECT_EQ(IniGetValue(s, "C", "k", &value), 0);
    EXPECT_EQ(IniDeleteSection(s, "C"), 1);
    EXPECT_EQ(IniGetValue(s, "C", "k", &value), 1);
    EXPECT_STREQ(value, "b");
    EXPECT_EQ(IniDeleteSection(s, "C"), 1);
    EXPECT_EQ(IniDeleteSection(s, "C"), 0);
    EXPECT_EQ(IniSectionCount(s), 0);
    EXPECT_EQ(Serialized(s, 0x06, dir), "");
}

TEST(IniEdit, LargeSectionsKeepFirstMatchOrder) {
    Store store = NewStore();
    IniStore* s = store.get();
    const int n = 2000;
    for (int i = 0; i < n; ++i) {
        std::string key = "key" + std::to_string(i);
        ASSERT_EQ(IniSetInt(s, "Big", key.c_str(), i), 1);
    }
    int32_t v = 0;
    EXPECT_EQ(IniGetInt(s, "BIG", " KEY1999 ", &v), 1);
    EXPECT_EQ(v, 1999);
    // Deleting every other key keeps order and lookups of the rest.
    for (int i = 0; i < n; i += 2) {
        std::string key = "KEY" + std::to_string(i);
        ASSERT_EQ(IniDeleteKey(s, "big", key.c_str()), 1);
    }
    EXPECT_EQ(IniKeyCount(s, "Big"), n / 2);
    const char* name = nullptr;
    ASSERT_EQ(IniKeyName(s, "Big", 1, &name), 1);
    EXPECT_STREQ(name, "key1");
    EXPECT_EQ(IniKeyExists(s, "Big", "key998"), 0);
    EXPECT_EQ(IniGetInt(s, "Big", "key999", &v), 1);
    EXPECT_EQ(v, 999);

    // A continuation run joined into an existing name: the earlier key still wins.
    TempDir dir;
    std::string path = dir.File("dup.ini");
    std::string text = "[D]\nPath=first\n";
    for (int i = 0; i < 20; ++i) {
        text += "k" + std::to_string(i) + "=" + std::to_string(i) + "\n";
    }
    text += "Path Line0001=/a\nPath Line0002=/b\n";
    WriteAll(path, text);
    ASSERT_EQ(IniLoadFile(s, path.c_str()), 0);
    const char* value = nullptr;
    ASSERT_EQ(IniGetValue(s, "D", "Path", &value), 1);
    EXPECT_STREQ(value, "first");
    EXPECT_EQ(IniKeyCount(s, "D"), 22);
    ASSERT_EQ(IniDeleteKey(s, "D", "Path"), 1);
    ASSERT_EQ(IniGetValue(s, "D", "Path", &value), 1);
    EXPECT_STREQ(value, "/a/b");
}
