// Golden files: each testdata/<case>.ini is read with the case's parse flags; the store must
// look exactly like <case>.dump and be written byte for byte as <case>.out.
#include "config/IniTestSupport.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdio>
#include <cstring>

using namespace qv_ini_test;

namespace {

struct GoldenCase {
    const char* name;
    uint32_t parseFlags;
    uint32_t writeFlags;
};

// Writes through IniWriteFile (temporary-file flags) or IniWriteStream (others).
std::string Written(IniStore* store, uint32_t writeFlags, const TempDir& dir) {
    EXPECT_EQ(IniSetWriteOptions(store, -1, 0, writeFlags), 1);
    if (writeFlags & kIniWriteViaTemp) {
        std::string path = dir.File("written.ini");
        EXPECT_EQ(IniWriteFile(store, path.c_str()), 0);
        return ReadAll(path);
    }
    std::string path = dir.File("stream.ini");
    WriteAll(path, "old contents that must go away\n");
    std::unique_ptr<FILE, int (*)(FILE*)> stream(std::fopen(path.c_str(), "r+b"), &std::fclose);
    EXPECT_EQ(IniWriteStream(store, stream.get(), 0), 0);
    stream.reset();
    return ReadAll(path);
}

}  // namespace

TEST(IniGolden, FilesReadAndWriteAsExpected) {
    const GoldenCase cases[] = {
        {"basic", 0x12, 0x36},
        {"continuation", 0x12, 0x36},
        {"bom_crlf", 0x12, 0x37},
        {"colon", 0x0F, 0x08},
    };
    for (const GoldenCase& c : cases) {
        SCOPED_TRACE(c.name);
        TempDir dir;
        Store store = NewStore(c.parseFlags);
        std::string input = TestData(std::string(c.name) + ".ini");
        ASSERT_EQ(IniLoadFile(store.get(), input.c_str()), 0);
        EXPECT_EQ(Dump(store.get()), ReadAll(TestData(std::string(c.name) + ".dump")));
        std::string expected = ReadAll(TestData(std::string(c.name) + ".out"));
        EXPECT_EQ(Written(store.get(), c.writeFlags, dir), expected);

        // What was written reads back into the same entries.
        Store again = NewStore(c.parseFlags);
        std::string copy = dir.File("copy.ini");
        WriteAll(copy, expected);
        ASSERT_EQ(IniLoadFile(again.get(), copy.c_str()), 0);
        EXPECT_EQ(IniSectionCount(again.get()), IniSectionCount(store.get()));
        for (int s = 1; s <= IniSectionCount(store.get()); ++s) {
            const char* name = nullptr;
            IniSectionName(store.get(), s, &name);
            std::string section = name;
            for (int k = 1; k <= IniKeyCount(store.get(), section.c_str()); ++k) {
                const char* key = nullptr;
                const char* value = nullptr;
                const char* reread = nullptr;
                IniKeyName(store.get(), section.c_str(), k, &key);
                IniKeyValue(store.get(), section.c_str(), k, &value);
                ASSERT_EQ(IniGetValue(again.get(), section.c_str(), key, &reread), 1) << key;
                EXPECT_STREQ(reread, value);
            }
        }
    }
}

TEST(IniGolden, GettersOnBasicFile) {
    Store store = NewStore();
    ASSERT_EQ(IniLoadFile(store.get(), TestData("basic.ini").c_str()), 0);
    const char* value = nullptr;
    // Names match trimmed and ignoring case; the merged key kept its first spelling.
    ASSERT_EQ(IniGetValue(store.get(), "  NET ", " HOST\t", &value), 1);
    EXPECT_STREQ(value, "beta");
    EXPECT_EQ(IniKeyExists(store.get(), "Net", "Host_Name"), 0);  // empty value ignored
    EXPECT_EQ(IniKeyExists(store.get(), "Net", "# note"), 1);
    EXPECT_EQ(IniKeyExists(store.get(), "Net", "key"), 0);  // line before any header
    EXPECT_EQ(IniSectionExists(store.get(), "broken"), 0);
    EXPECT_EQ(IniKeyLine(store.get(), "Net", "missing"), -1);
    EXPECT_EQ(IniSectionLine(store.get(), "missing"), -1);
    EXPECT_EQ(IniKeyCount(store.get(), "missing"), 0);
    EXPECT_EQ(IniKeyName(store.get(), "Net", 0, &value), 0);
    EXPECT_EQ(IniKeyName(store.get(), "Net", 7, &value), 0);
    EXPECT_EQ(IniSectionName(store.get(), 3, &value), 0);

    char small[4];
    EXPECT_EQ(IniGetString(store.get(), "Net", "Quoted", small, sizeof small), 1);
    EXPECT_STREQ(small, "a b");
    EXPECT_EQ(IniGetString(store.get(), "Net", "Semi", small, sizeof small), 1);
    EXPECT_STREQ(small, "x ;");  // size-1 bytes, terminated
    EXPECT_EQ(IniGetString(store.get(), "Net", "nope", small, sizeof small), 0);
    EXPECT_STREQ(small, "");  // emptied first
    char* copy = nullptr;
    ASSERT_EQ(IniGetStringDup(store.get(), "Other", "k", &copy), 1);
    EXPECT_STREQ(copy, "v");
    std::free(copy);
}

TEST(IniGolden, WideEncodingsAreRefusedAndLeaveTheStore) {
    Store store = NewStore();
    std::string basic = TestData("basic.ini");
    ASSERT_EQ(IniLoadFile(store.get(), basic.c_str()), 0);
    std::string before = Dump(store.get());
    for (const char* name : {"utf16le.ini", "utf16be.ini", "utf32le.ini"}) {
        SCOPED_TRACE(name);
        EXPECT_EQ(IniLoadFile(store.get(), TestData(name).c_str()), kIniWideEncoding);
        EXPECT_EQ(Dump(store.get()), before);
        EXPECT_EQ(IniFileChanged(store.get()), 0);  // still the path of basic.ini
    }
    EXPECT_EQ(IniLoadFile(store.get(), TestData("does-not-exist.ini").c_str()), kIniInvalid);
    EXPECT_EQ(IniLoadFile(store.get(), ""), kIniInvalid);
    EXPECT_EQ(Dump(store.get()), before);
    // A directory opens but cannot be read.
    EXPECT_EQ(IniLoadFile(store.get(), CONFIG_TESTDATA_DIR), kIniReadError);
    EXPECT_EQ(IniReadStream(store.get(), nullptr), kIniInvalid);
}

TEST(IniGolden, NumbersAtTheirLimits) {
    Store store = NewStore();
    ASSERT_EQ(IniLoadFile(store.get(), TestData("numbers.ini").c_str()), 0);
    IniStore* s = store.get();
    int32_t i = 0;
    EXPECT_EQ(IniGetInt(s, "N", "min", &i), 1);
    EXPECT_EQ(i, INT32_MIN);
    EXPECT_EQ(IniGetInt(s, "N", "max", &i), 1);
    EXPECT_EQ(i, INT32_MAX);
    EXPECT_EQ(IniGetInt(s, "N", "plus", &i), 1);
    EXPECT_EQ(i, 7);
    EXPECT_EQ(IniGetInt(s, "N", "neg", &i), 1);
    EXPECT_EQ(i, -1);
    for (const char* bad : {"over", "umax", "uover", "spaced", "junk", "twosign", "half"}) {
        EXPECT_EQ(IniGetInt(s, "N", bad, &i), kIniNotInt) << bad;
    }
    EXPECT_EQ(IniGetInt(s, "N", "blank", &i), 0);
    EXPECT_EQ(IniGetInt(s, "N", "absent", &i), 0);
    EXPECT_EQ(i, -1);  // untouched by failures

    uint32_t u = 0;
    EXPECT_EQ(IniGetUnsigned(s, "N", "umax", &u), 1);
    EXPECT_EQ(u, 4294967295u);
    EXPECT_EQ(IniGetUnsigned(s, "N", "plus", &u), 1);
    EXPECT_EQ(u, 7u);
    for (const char* bad : {"uover", "neg", "min", "junk"}) {
        EXPECT_EQ(IniGetUnsigned(s, "N", bad, &u), kIniNotUnsigned) << bad;
    }
    EXPECT_EQ(IniGetUnsigned(s, "N", "blank", &u), 0);

    double d = 0;
    EXPECT_EQ(IniGetDouble(s, "N", "inf", &d), 1);
    EXPECT_TRUE(std::isinf(d) && d > 0);
    EXPECT_EQ(IniGetDouble(s, "N", "minf", &d), 1);
    EXPECT_TRUE(std::isinf(d) && d < 0);
    EXPECT_EQ(IniGetDouble(s, "N", "pinf", &d), 1);
    EXPECT_TRUE(std::isinf(d) && d > 0);
    EXPECT_EQ(IniGetDouble(s, "N", "half", &d), 1);
    EXPECT_EQ(d, 0.5);
    EXPECT_EQ(IniGetDouble(s, "N", "min", &d), kIniNotDouble);  // trailing blank left over
    EXPECT_EQ(IniGetDouble(s, "N", "dbljunk", &d), kIniNotDouble);
    EXPECT_EQ(IniGetDouble(s, "N", "huge", &d), kIniNotDouble);
    EXPECT_EQ(IniGetDouble(s, "N", "blank", &d), 0);

    bool b = false;
    EXPECT_EQ(IniGetBool(s, "N", "yes", &b), 1);
    EXPECT_TRUE(b);
    EXPECT_EQ(IniGetBool(s, "N", "no", &b), 1);
    EXPECT_FALSE(b);
    EXPECT_EQ(IniGetBool(s, "N", "maybe", &b), kIniNotBool);
    EXPECT_EQ(IniGetBool(s, "N", "max", &b), kIniNotBool);

    // Text getters give a blank value as found.
    char buffer[8];
    EXPECT_EQ(IniGetString(s, "N", "blank", buffer, sizeof buffer), 1);
    EXPECT_STREQ(buffer, "  ");
}

TEST(IniGolden, LinesOfAnyLengthAcrossChunks) {
    TempDir dir;
    std::string path = dir.File("long.ini");
    std::string longValue(100000, 'v');
    longValue[2083] = 'X';  // lands on a chunk boundary
    // The CR LF pair straddles a chunk boundary: the LF is byte 2084 of the file.
    std::string head = "[S]\r\na=";
    std::string pad(2084 - head.size() - 1, 'p');
    WriteAll(path, head + pad + "\r\nlong=" + longValue + "\n\nlast=1");
    Store store = NewStore();
    ASSERT_EQ(IniLoadFile(store.get(), path.c_str()), 0);
    const char* value = nullptr;
    ASSERT_EQ(IniGetValue(store.get(), "S", "a", &value), 1);
    EXPECT_EQ(std::string(value), pad);
    ASSERT_EQ(IniGetValue(store.get(), "S", "long", &value), 1);
    EXPECT_EQ(std::string(value), longValue);
    EXPECT_EQ(IniKeyLine(store.get(), "S", "long"), 3);
    EXPECT_EQ(IniKeyLine(store.get(), "S", "last"), 5);
}
