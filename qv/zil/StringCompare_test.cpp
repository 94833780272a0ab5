#include "qv/zil/StringCompare.h"

#include <gtest/gtest.h>

#include <map>

#include "qv/zil/Exceptions.h"
#include "qv/zil/StringBase.h"

using namespace qv::zil;

TEST(StringCompare, NarrowTextIgnoringCase) {
    EXPECT_LT(StringCompare::TextIgnoreCase("abc", "ABD"), 0);
    EXPECT_EQ(0, StringCompare::TextIgnoreCase("ab", "AB"));
    EXPECT_EQ(0, StringCompare::TextIgnoreCase(nullptr, ""));
    EXPECT_EQ(-67, StringCompare::TextIgnoreCase("ab", "abc"));  // the terminator takes part
    EXPECT_EQ(67, StringCompare::TextIgnoreCase("abc", "AB"));
    EXPECT_GT(StringCompare::TextIgnoreCase("a", nullptr), 0);
}

TEST(StringCompare, NarrowRanges) {
    EXPECT_EQ(0, StringCompare::RangesIgnoreCase("Text", 4, "tEXT", 4));
    EXPECT_EQ(-2, StringCompare::RangesIgnoreCase("ab", 2, "ABcd", 4));
    EXPECT_EQ(0, StringCompare::RangesIgnoreCase("a\0b", 3, "A\0B", 3));  // past embedded NULs
    // Case folds after an equal prefix too: 'Z' > 'A', though 'Z' < 'a' byte-wise.
    EXPECT_GT(StringCompare::RangesIgnoreCase("/lib/Z", 6, "/lib/a", 6), 0);
    EXPECT_GT(StringCompare::TextIgnoreCase("/lib/Z", "/lib/a"), 0);
    EXPECT_EQ(0, StringCompare::TextIgnoreCase("/lib/x", "/lib/X"));
    EXPECT_LT(StringCompare::Ranges("a\0a", 3, "a\0b", 3), 0);
    EXPECT_GT(StringCompare::Ranges("a", 1, "A", 1), 0);
    EXPECT_GT(StringCompare::Ranges("\xE9", 1, "z", 1), 0);  // raw bytes are unsigned
    EXPECT_EQ(3, StringCompare::Ranges("abc", 3, "", 0));
}

TEST(StringCompare, WideTextsAndRanges) {
    EXPECT_EQ(0, StringCompare::TextIgnoreCase(L"Hello", L"hELLO"));
    EXPECT_LT(StringCompare::TextIgnoreCase(L"ab", L"abc"), 0);
    EXPECT_GT(StringCompare::TextIgnoreCase(L"b", L"A"), 0);
    EXPECT_EQ(0, StringCompare::TextIgnoreCase(nullptr, L""));
    EXPECT_LT(StringCompare::Text(L"A", L"a"), 0);
    EXPECT_EQ(0, StringCompare::RangesIgnoreCase(L"abc", 3, L"ABC", 3));
    EXPECT_EQ(-1, StringCompare::RangesIgnoreCase(L"abc", 3, L"ABCD", 4));
    EXPECT_LT(StringCompare::Ranges(L"abc", 3, L"abd", 3), 0);
}

TEST(StringCompare, Utf8ByCodePoint) {
    // U+00E9 (2 bytes) sorts before U+4E2D (3 bytes) by code point as well as by bytes.
    EXPECT_LT(StringCompare::Utf8Ranges("\xC3\xA9", 2, "\xE4\xB8\xAD", 3, false), 0);
    EXPECT_EQ(0, StringCompare::Utf8Ranges("Ab\xC3\xA9", 4, "aB\xC3\xA9", 4, true));
    EXPECT_NE(0, StringCompare::Utf8Ranges("Ab", 2, "aB", 2, false));
    // At the end of one side: the bytes left in the first minus those in the second.
    EXPECT_EQ(-2, StringCompare::Utf8Ranges("a", 1, "a\xC3\xA9", 3, false));
    EXPECT_EQ(3, StringCompare::Utf8Ranges("x\xE4\xB8\xAD", 4, "X", 1, true));
    EXPECT_EQ(0, StringCompare::Utf8Ranges(nullptr, 0, "", 0, true));
    EXPECT_THROW(StringCompare::Utf8Ranges("\xC3", 1, "a", 1, false), exception::InvalidSequence);
}

TEST(StringCompare, StringMembersAndPredicates) {
    const ByteString name("Access_Property");
    EXPECT_TRUE(name.IsEqual("access_property", CompareMode::IgnoreCase));
    EXPECT_TRUE(name.IsNotEqual("access_property"));
    EXPECT_TRUE(name.IsEqual(ByteString("ACCESS_PROPERTY"), CompareMode::Utf8IgnoreCase));
    EXPECT_TRUE(name.IsLess("b", CompareMode::IgnoreCase));
    EXPECT_TRUE(name.IsLess("a"));  // exact: upper-case letters sort first
    EXPECT_TRUE(name.IsGreater("a", CompareMode::IgnoreCase));
    EXPECT_EQ(-67, ByteString("ab").Compare("abc", CompareMode::IgnoreCase));
    EXPECT_EQ(-1, ByteString("ab").Compare(ByteString("abc"), CompareMode::IgnoreCase));

    const WideString wide(L"Session");
    EXPECT_TRUE(wide.IsEqual(L"SESSION", CompareMode::IgnoreCase));
    EXPECT_TRUE(wide.IsLess(WideString(L"session")));
    EXPECT_TRUE(wide == WideString(L"Session"));

    std::map<ByteString, int, LessIgnoreCase> table;
    table[ByteString("Invoke_Method")] = 1;
    table[ByteString("close_session")] = 2;
    EXPECT_EQ(1, table.count(ByteString("INVOKE_METHOD")));
    EXPECT_EQ(2, table[ByteString("Close_Session")]);
    EXPECT_EQ(2u, table.size());
}
