#include "qv/zil/StringBase.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "qv/zil/Exceptions.h"

using namespace qv::zil;
using qv::zil::exception::InvalidLocale;
using qv::zil::exception::InvalidSequence;
using qv::zil::exception::OutOfRange;
using qv::zil::exception::OutOfRange2;

namespace {
std::string Bytes(const ByteString& s) { return std::string(s.data(), s.size()); }
std::wstring Wide(const WideString& s) { return std::wstring(s.data(), s.size()); }

// A string of `size` elements whose capacity is `capacity`.
ByteString WithCapacity(uint32_t size, uint32_t capacity) {
    ByteString s;
    s.reserve(capacity);
    s.append(size, 'x');
    return s;
}
}  // namespace

TEST(StringBase, ConstructionKeepsTheTerminatorAndExactCapacity) {
    const ByteString empty;
    EXPECT_EQ(0u, empty.size());
    EXPECT_EQ('\0', *empty.c_str());

    const ByteString fromNull(static_cast<const char*>(nullptr));
    EXPECT_TRUE(fromNull.empty());

    const ByteString embedded("a\0b", 3);
    EXPECT_EQ(3u, embedded.size());
    EXPECT_EQ(3u, embedded.capacity());
    EXPECT_EQ('b', embedded[2]);
    EXPECT_EQ('\0', embedded.c_str()[3]);

    const ByteString roomy = WithCapacity(5, 100);
    const ByteString copy(roomy);
    EXPECT_EQ(100u, roomy.capacity());
    EXPECT_EQ(5u, copy.capacity());

    const WideString wide(L"h\u00e9llo");
    EXPECT_EQ(5u, wide.size());
    EXPECT_EQ(L'\0', wide.c_str()[5]);

    const ByteString sum = ByteString("abc") + ByteString("de");
    EXPECT_EQ("abcde", Bytes(sum));
    EXPECT_EQ(5u, sum.capacity());
}

TEST(StringBase, AssignKeepsABlockUpToTwiceTheNeed) {
    ByteString s = WithCapacity(0, 100);
    const std::string sixty(60, 'a');
    s.assign(sixty.c_str());
    EXPECT_EQ(100u, s.capacity());
    EXPECT_EQ(sixty, Bytes(s));

    const std::string forty(40, 'b');
    s.assign(forty.data(), 40);
    EXPECT_EQ(40u, s.capacity());
    EXPECT_EQ(forty, Bytes(s));

    s.assign(nullptr, 7);  // null is empty text
    EXPECT_TRUE(s.empty());
    EXPECT_EQ('\0', *s.c_str());
}

TEST(StringBase, AssignFromAPieceOfItself) {
    ByteString s = WithCapacity(0, 1000);
    s.assign("0123456789");
    s.assign(s.data() + 3, 4);
    EXPECT_EQ("3456", Bytes(s));

    // Even when the block is given back, the piece arrives intact.
    ByteString big = WithCapacity(0, 4000);
    big.append(ByteString("abcdefgh"));
    big.assign(big.data() + 4, 4);
    EXPECT_EQ("efgh", Bytes(big));
    EXPECT_EQ(4u, big.capacity());

    const ByteString& same = s;  // through a reference: clang warns on a literal "s = s"
    s = same;                    // self-assignment changes nothing
    EXPECT_EQ("3456", Bytes(s));
}

TEST(StringBase, AppendGrowsToTwiceTheNeed) {
    ByteString s("0123456789");
    ASSERT_EQ(10u, s.capacity());
    s.append(1, '!');
    EXPECT_EQ(22u, s.capacity());
    EXPECT_EQ("0123456789!", Bytes(s));

    s.append(ByteString("ab"));
    EXPECT_EQ(22u, s.capacity());  // fits, no reallocation

    ByteString twice("xyz");
    twice.append(twice);
    EXPECT_EQ("xyzxyz", Bytes(twice));
    twice.append(twice);
    EXPECT_EQ("xyzxyzxyzxyz", Bytes(twice));

    WideString wide(L"ab");
    wide.append(3, L'\u00e9');
    EXPECT_EQ(L"ab\u00e9\u00e9\u00e9", Wide(wide));
    EXPECT_EQ(10u, wide.capacity());

    // The needed size itself overflowing 32 bits is refused before any allocation.
    EXPECT_THROW(s.append(0xFFFFFFFFu, 'x'), OutOfRange);
    EXPECT_EQ("0123456789!ab", Bytes(s));
}

TEST(StringBase, ResizeAndEraseWithShrink) {
    ByteString s = WithCapacity(0, 100);
    s.append(ByteString("hello"));
    s.resize(8, '.');
    EXPECT_EQ("hello...", Bytes(s));
    s.resize(2);
    EXPECT_EQ("he", Bytes(s));
    EXPECT_EQ(100u, s.capacity());  // no shrink asked for
    s.resize(1, 'x', true);
    EXPECT_EQ("h", Bytes(s));
    EXPECT_EQ(1u, s.capacity());

    ByteString full = WithCapacity(10, 100);
    full.erase(0, ByteString::npos, true);
    EXPECT_TRUE(full.empty());
    EXPECT_EQ(0u, full.capacity());
    EXPECT_EQ('\0', *full.c_str());

    ByteString middle("abcdef");
    middle.erase(1, 2);
    EXPECT_EQ("adef", Bytes(middle));
    EXPECT_EQ('\0', middle.c_str()[4]);
    middle.erase(4, 10);  // at the end: nothing
    EXPECT_EQ("adef", Bytes(middle));
    EXPECT_THROW(middle.erase(5, 1), OutOfRange2);
    EXPECT_EQ("adef", Bytes(middle));
}

TEST(StringBase, ReplaceGrowsShrinksAndChecksOffsets) {
    ByteString s("hello world");
    s.replace(0, 5, ByteString("goodbye"));
    EXPECT_EQ("goodbye world", Bytes(s));
    s.replace(8, 100, ByteString("all of you"), 7, 3);
    EXPECT_EQ("goodbye you", Bytes(s));
    s.replace(0, 7, ByteString("hi"));
    EXPECT_EQ("hi you", Bytes(s));
    s.replace(6, 0, ByteString("!"));
    EXPECT_EQ("hi you!", Bytes(s));
    s.replace(3, 3, ByteString("abc"));
    EXPECT_EQ("hi abc!", Bytes(s));
    EXPECT_EQ('\0', s.c_str()[s.size()]);

    try {
        s.replace(8, 0, ByteString("x"));
        FAIL() << "no exception";
    } catch (const OutOfRange2& e) {
        EXPECT_STREQ("Out of range: String offset out of range", e.what());
        EXPECT_STREQ("qv/zil/StringBase.cpp", e.file);
    }
    EXPECT_THROW(s.replace(0, 1, ByteString("ab"), 3), OutOfRange2);
    EXPECT_EQ("hi abc!", Bytes(s));
}

TEST(StringBase, ReplaceFromItself) {
    ByteString s("abcdef");
    s.replace(0, 1, s, 2, 3);  // the source lies in the tail that moves
    EXPECT_EQ("cdebcdef", Bytes(s));
    ByteString t("abcdef");
    t.replace(1, 4, t, 0, 2);
    EXPECT_EQ("aabf", Bytes(t));
}

TEST(StringBase, SubstrAndCopyAtTheEdges) {
    const ByteString s("abc");
    EXPECT_EQ("", Bytes(s.substr(3, 5)));
    EXPECT_EQ("bc", Bytes(s.substr(1)));
    EXPECT_EQ(2u, s.substr(1).capacity());
    EXPECT_THROW(s.substr(4, 0), OutOfRange2);

    char out[8] = {'#', '#', '#', '#'};
    EXPECT_EQ(0u, s.copy(out, 5, 3));
    EXPECT_EQ(2u, s.copy(out, 5, 1));
    EXPECT_EQ('b', out[0]);
    EXPECT_EQ('c', out[1]);
    EXPECT_EQ('#', out[2]);  // no terminator written
    EXPECT_THROW(s.copy(out, 1, 4), OutOfRange2);
}

TEST(StringBase, SearchesForwardAndBackward) {
    const ByteString s("a,b;;c\0d", 8);
    EXPECT_EQ(1u, s.find(','));
    EXPECT_EQ(6u, s.find('\0'));  // an embedded NUL is an element like any other
    EXPECT_EQ(ByteString::npos, s.find(',', 2));
    EXPECT_EQ(ByteString::npos, s.find('a', 8));
    EXPECT_EQ(3u, s.find(";;"));
    EXPECT_EQ(4u, s.find(";c"));
    EXPECT_EQ(2u, s.find("", 2));
    EXPECT_EQ(ByteString::npos, s.find("d!"));
    EXPECT_EQ(1u, s.find_first_of(";,"));
    EXPECT_EQ(3u, s.find_first_of(";,", 2));
    EXPECT_EQ(2u, s.find_first_not_of(",a"));
    EXPECT_EQ(ByteString::npos, s.find_first_of(""));
    EXPECT_EQ(4u, s.rfind(';'));
    EXPECT_EQ(3u, s.rfind(';', 3));
    EXPECT_EQ(0u, s.rfind('a', ByteString::npos));
    EXPECT_EQ(ByteString::npos, s.rfind('z'));
    EXPECT_EQ(7u, s.find_last_not_of(";"));
    EXPECT_EQ(2u, s.find_last_not_of(";", 4));

    const ByteString empty;
    EXPECT_EQ(ByteString::npos, empty.rfind('a'));
    EXPECT_EQ(ByteString::npos, empty.find_last_not_of("a"));
    EXPECT_EQ(ByteString::npos, empty.find(""));

    const WideString wide(L"x\u00e9y\u00e9");
    EXPECT_EQ(1u, wide.find(L'\u00e9'));
    EXPECT_EQ(3u, wide.rfind(L'\u00e9'));
    EXPECT_EQ(2u, wide.find(L"y\u00e9"));
}

TEST(StringBase, Utf8Conversions) {
    const WideString wide(ByteString("h\xC3\xA9\xE4\xB8\xAD\xF0\x9F\x98\x80"));
    EXPECT_EQ(L"h\u00e9\u4e2d\U0001F600", Wide(wide));
    EXPECT_EQ(4u, wide.capacity());

    const ByteString back(wide);
    EXPECT_EQ("h\xC3\xA9\xE4\xB8\xAD\xF0\x9F\x98\x80", Bytes(back));
    EXPECT_EQ(10u, back.capacity());

    EXPECT_TRUE(ByteString(WideString()).empty());
    EXPECT_THROW(WideString(ByteString("ok\xC0\x80")), InvalidSequence);
    EXPECT_THROW(WideString(ByteString("cut\xE4\xB8")), InvalidSequence);

    // A value that UTF-8 cannot carry becomes one "?".
    const wchar_t unencodable[] = {L'a', static_cast<wchar_t>(0x80000000u), L'b'};
    EXPECT_EQ("a?b", Bytes(ByteString(WideString(unencodable, 3))));
}

TEST(StringBase, CharacterSetConversions) {
    const WideString wide(L"a\u00e9b");
    const ByteString ascii(wide, "US-ASCII");
    EXPECT_EQ("a?b", Bytes(ascii));
    EXPECT_EQ(12u, ascii.capacity());  // four bytes per wide element

    const ByteString latin1(wide, "ISO-8859-1");
    EXPECT_EQ(
        "a\xE9"
        "b",
        Bytes(latin1));
    EXPECT_EQ(L"a\u00e9b", Wide(WideString(latin1, "ISO-8859-1")));
    EXPECT_EQ(L"a?b", Wide(WideString(ByteString("a\xE9"
                                                 "b"),
                                      "US-ASCII")));

    EXPECT_THROW(ByteString(wide, "NO-SUCH-CHARSET"), InvalidLocale);
    EXPECT_THROW(WideString(latin1, "NO-SUCH-CHARSET"), InvalidLocale);
    EXPECT_TRUE(ByteString(WideString(), "NO-SUCH-CHARSET").empty());
}
