#include "qv/zil/osdep/IConv.h"

#include <gtest/gtest.h>

#include <clocale>
#include <cstring>
#include <string>
#include <vector>

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace osdep {
namespace {

using exception::InvalidArgument;
using exception::InvalidLocale;
using exception::OutOfRange;

// Wide text as unsigned code points, comparable on every target.
std::vector<uint32_t> CodePoints(const wchar_t* begin, const wchar_t* end) {
    std::vector<uint32_t> result;
    for (const wchar_t* p = begin; p < end; ++p) {
        result.push_back(static_cast<uint32_t>(*p));
    }
    return result;
}

std::vector<uint32_t> CodePoints(const wchar_t* text) {
    return CodePoints(text, text + wcslen(text));
}

std::vector<wchar_t> WideText(std::initializer_list<uint32_t> values) {
    std::vector<wchar_t> text;
    for (const uint32_t value : values) {
        text.push_back(static_cast<wchar_t>(value));
    }
    return text;
}

// Converts narrow text to wide with ample room and returns the code points.
std::vector<uint32_t> ToWide(const std::string& text, const char* charset) {
    std::vector<wchar_t> out(text.size() + 1);
    wchar_t* reached = out.data() + out.size();
    IConv::NarrowToWide(text.data(), text.data() + text.size(), charset, out.data(), reached);
    return CodePoints(out.data(), reached);
}

std::string ToNarrow(const std::vector<wchar_t>& text, const char* charset) {
    std::vector<char> out(4 * text.size() + 16);
    char* reached = out.data() + out.size();
    IConv::WideToNarrow(text.data(), text.data() + text.size(), out.data(), reached, charset);
    return std::string(out.data(), reached);
}

TEST(IConvTest, ConvertsBetweenNamedCharacterSetsAndWide) {
    const std::vector<uint32_t> mixed = {'a', 0xE9, 0x20AC, 0x1F600};
    EXPECT_EQ(mixed, ToWide("a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80", "UTF-8"));
    EXPECT_EQ("a\xC3\xA9\xE2\x82\xAC\xF0\x9F\x98\x80",
              ToNarrow(WideText({'a', 0xE9, 0x20AC, 0x1F600}), "UTF-8"));

    // Every Latin-1 byte is the code point of the same value, both ways.
    std::string latin1;
    std::vector<uint32_t> values;
    std::vector<wchar_t> wide;
    for (uint32_t byte = 1; byte < 256; ++byte) {
        latin1 += static_cast<char>(byte);
        values.push_back(byte);
        wide.push_back(static_cast<wchar_t>(byte));
    }
    EXPECT_EQ(values, ToWide(latin1, "ISO-8859-1"));
    EXPECT_EQ(latin1, ToNarrow(wide, "ISO-8859-1"));
    EXPECT_EQ(std::vector<uint32_t>({0x20AC}), ToWide("\xA4", "ISO-8859-15"));
}

// ASCII text into a set that keeps ASCII as it is is copied without iconv: the result
// must be what iconv gives, room and all, and any other set or name still goes to iconv.
TEST(IConvTest, AsciiTextConvertsAlikeWithAndWithoutIConv) {
    const std::vector<wchar_t> ascii = WideText({'o', 'p', '\0', 0x7F, '='});
    const std::string bytes("op\0\x7F=", 5);
    for (const char* set : {"UTF-8", "ISO-8859-1", "ISO-8859-15", "ANSI_X3.4-1968", "", "UTF8",
                            "US-ASCII", "UTF-8//TRANSLIT", "ISO-8859-1//IGNORE"}) {
        EXPECT_EQ(bytes, ToNarrow(ascii, set)) << set;
        EXPECT_EQ(std::vector<uint32_t>({'o', 'p', 0, 0x7F, '='}), ToWide(bytes, set)) << set;
    }
    // Sets in which ASCII is not one byte each.
    EXPECT_EQ(std::string("o\0p\0", 4), ToNarrow(WideText({'o', 'p'}), "UTF-16LE"));
    EXPECT_EQ(std::vector<uint32_t>({0x706F}), ToWide("op", "UTF-16LE"));
    EXPECT_EQ("\x96\x97", ToNarrow(WideText({'o', 'p'}), "EBCDIC-US"));
    // Stops at the room like iconv, and one non-ASCII unit sends the whole text to iconv.
    char narrow[3] = {'#', '#', '#'};
    EXPECT_EQ(
        2u, IConv::WideToNarrowCount(ascii.data(), ascii.data() + 5, narrow, narrow + 2, "UTF-8"));
    EXPECT_EQ("op#", std::string(narrow, 3));
    EXPECT_EQ("a\xC3\xA9", ToNarrow(WideText({'a', 0xE9}), "UTF-8"));
    EXPECT_EQ("a\xE9", ToNarrow(WideText({'a', 0xE9}), "ISO-8859-1"));
    EXPECT_EQ("a?", ToNarrow(WideText({'a', 0xE9}), "ANSI_X3.4-1968"));
    for (const char* unknown : {"ISO-8859-12", "ISO-8859-17", "ISO-8859-01", "ISO-8859-"}) {
        EXPECT_THROW(ToNarrow(WideText({'a'}), unknown), InvalidLocale) << unknown;
    }
    EXPECT_EQ("a", ToNarrow(WideText({'a'}), "ISO-8859-16"));
}

TEST(IConvTest, EachUnitThatCannotBeConvertedBecomesOneQuestionMark) {
    EXPECT_EQ("a?b", ToNarrow(WideText({'a', 0xE9, 'b'}), "US-ASCII"));
    // Surrogates and values of 32 bits are not characters for iconv; each wide element
    // is skipped whole.
    EXPECT_EQ("a??b", ToNarrow(WideText({'a', 0xD800, 0x80000000, 'b'}), "UTF-8"));

    const std::vector<uint32_t> q = {'a', '?', 'b'};
    EXPECT_EQ(q, ToWide("a\xFF"
                        "b",
                        "UTF-8"));
    EXPECT_EQ(q, ToWide("a\xE9"
                        "b",
                        "US-ASCII"));
    // A sequence cut short by the end: one "?" per byte skipped.
    EXPECT_EQ(std::vector<uint32_t>({'a', '?', '?'}), ToWide("a\xE2\x82", "UTF-8"));
}

TEST(IConvTest, StopsAtTheEndOfTheRoomAndReportsThePositionReached) {
    const std::string text = "abc";
    wchar_t wide[4] = {L'#', L'#', L'#', L'#'};
    wchar_t* reached = wide + 2;
    IConv::NarrowToWide(text.data(), text.data() + 3, "UTF-8", wide, reached);
    EXPECT_EQ(wide + 2, reached);
    EXPECT_EQ(std::vector<uint32_t>({'a', 'b', '#', '#'}), CodePoints(wide, wide + 4));
    EXPECT_EQ(3u, IConv::NarrowToWideCount(text.data(), text.data() + 3, "UTF-8", wide, wide + 4));
    EXPECT_EQ(L'#', wide[3]) << "the output is not terminated";
    EXPECT_EQ(0u, IConv::NarrowToWideCount(text.data(), text.data() + 3, "UTF-8", wide, wide));
    EXPECT_EQ(0u, IConv::NarrowToWideCount(nullptr, nullptr, "UTF-8", wide, wide + 4));

    const std::vector<wchar_t> euros = WideText({0x20AC, 0x20AC});
    char narrow[6] = {'#', '#', '#', '#', '#', '#'};
    // A character too long for the room left is replaced like one that cannot be
    // converted, so the cut is marked.
    EXPECT_EQ(
        4u, IConv::WideToNarrowCount(euros.data(), euros.data() + 2, narrow, narrow + 4, "UTF-8"));
    EXPECT_EQ("\xE2\x82\xAC?#", std::string(narrow, 5));
    EXPECT_EQ(
        3u, IConv::WideToNarrowCount(euros.data(), euros.data() + 2, narrow, narrow + 3, "UTF-8"));
    char* end = narrow + 6;
    IConv::WideToNarrow(euros.data(), euros.data() + 2, narrow, end, "UTF-8");
    EXPECT_EQ(narrow + 6, end);
}

TEST(IConvTest, StatefulCharacterSetsEndInTheirInitialState) {
    // Without the final reset the text would end while still shifted into JIS X 0208.
    EXPECT_EQ("\x1B$BF|K\\\x1B(B", ToNarrow(WideText({0x65E5, 0x672C}), "ISO-2022-JP"));
    EXPECT_EQ("+AOk-", ToNarrow(WideText({0xE9}), "UTF-7"));
}

TEST(IConvTest, UnknownCharacterSetThrowsInvalidLocaleFromEveryForm) {
    const char text[] = "abc";
    const std::vector<wchar_t> wide = WideText({'a'});
    wchar_t wideOut[4];
    char narrowOut[4];
    wchar_t* wideEnd = wideOut + 4;
    char* narrowEnd = narrowOut + 4;
    const char* const bogus = "NO-SUCH-CHARSET";
    EXPECT_THROW(IConv::NarrowToWide(text, text + 3, bogus, wideOut, wideEnd), InvalidLocale);
    EXPECT_THROW(IConv::NarrowToWideCount(text, text, bogus, wideOut, wideOut + 4), InvalidLocale);
    EXPECT_THROW(IConv::NarrowToWideNewArray(text, text + 3, bogus), InvalidLocale);
    EXPECT_THROW(IConv::NarrowTextToWideNewArray(text, 10, bogus), InvalidLocale);
    EXPECT_THROW(IConv::WideToNarrow(wide.data(), wide.data() + 1, narrowOut, narrowEnd, bogus),
                 InvalidLocale);
    EXPECT_THROW(IConv::WideToNarrowCount(wide.data(), wide.data(), narrowOut, narrowOut, bogus),
                 InvalidLocale);
    try {
        IConv::WideToNarrowNewArray(wide.data(), wide.data() + 1, bogus);
        ADD_FAILURE() << "no throw";
    } catch (const InvalidLocale& e) {
        EXPECT_STREQ("Invalid locale", e.what());
        EXPECT_STREQ("qv/zil/osdep/IConvDescriptor.cpp", e.file);  // where iconv_open failed
    }
    EXPECT_EQ(wideOut + 4, wideEnd);
}

TEST(IConvTest, NewArraysAreTerminatedAfterThePositionReached) {
    const std::string text =
        "gr\xC3\xBC\xC3\x9F"
        "e";
    const std::unique_ptr<wchar_t[]> wide =
        IConv::NarrowToWideNewArray(text.data(), text.data() + text.size(), "UTF-8");
    EXPECT_EQ(std::vector<uint32_t>({'g', 'r', 0xFC, 0xDF, 'e'}), CodePoints(wide.get()));
    EXPECT_EQ(0, IConv::NarrowToWideNewArray(text.data(), text.data(), "UTF-8")[0]);
    EXPECT_EQ(0, IConv::NarrowToWideNewArray(nullptr, nullptr, "UTF-8")[0]);

    // Text ends at its first 0 byte or at the maximum length, whichever comes first.
    const char withZero[] = {'a', 'b', '\0', 'c'};
    EXPECT_EQ(std::vector<uint32_t>({'a', 'b'}),
              CodePoints(IConv::NarrowTextToWideNewArray(withZero, 4, "UTF-8").get()));
    EXPECT_EQ(std::vector<uint32_t>({'a'}),
              CodePoints(IConv::NarrowTextToWideNewArray(withZero, 1, "UTF-8").get()));
    const char noZero[] = {'x', 'y'};  // never read beyond the maximum
    EXPECT_EQ(std::vector<uint32_t>({'x', 'y'}),
              CodePoints(IConv::NarrowTextToWideNewArray(noZero, 2, "UTF-8").get()));
    EXPECT_EQ(0, IConv::NarrowTextToWideNewArray(nullptr, 5, "UTF-8")[0]);

    // Four bytes per wide element are always enough for UTF-8 of real characters.
    const std::vector<wchar_t> wideText = WideText({0x1F600, 0x10FFFF, 'z'});
    const std::unique_ptr<char[]> narrow =
        IConv::WideToNarrowNewArray(wideText.data(), wideText.data() + 3, "UTF-8");
    EXPECT_STREQ("\xF0\x9F\x98\x80\xF4\x8F\xBF\xBFz", narrow.get());
    EXPECT_EQ('\0', IConv::WideToNarrowNewArray(nullptr, nullptr, "UTF-8")[0]);
}

TEST(IConvTest, RefusesBadRangesAndSizesThatDoNotFitThirtyTwoBits) {
    const char text[] = "abc";
    wchar_t wide[4];
    EXPECT_THROW(IConv::NarrowToWideCount(text + 2, text, "UTF-8", wide, wide + 4),
                 InvalidArgument);
    EXPECT_THROW(IConv::NarrowToWideCount(text, text + 3, "UTF-8", wide + 4, wide),
                 InvalidArgument);
    EXPECT_THROW(IConv::NarrowToWideCount(text, text + 3, "UTF-8", nullptr, wide), InvalidArgument);
    EXPECT_THROW(IConv::NarrowToWideNewArray(text + 1, text, "UTF-8"), InvalidArgument);

    // 2^30 input bytes need 2^30 + 1 wide elements, whose size in bytes does not fit in
    // 32 bits: refused before anything is allocated or read. The range is never read.
    static char block[16];
    const char* const far =
        reinterpret_cast<const char*>(reinterpret_cast<uintptr_t>(block) + 0x40000000u);
    EXPECT_THROW(IConv::NarrowToWideNewArray(block, far, "UTF-8"), OutOfRange);
}

TEST(IConvTest, EmptyNameMeansTheCurrentLocalesCharacterSet) {
    const std::vector<wchar_t> text = WideText({'a', 0xE9});
    EXPECT_EQ("a?", ToNarrow(text, ""));  // the "C" locale's set is ASCII
    EXPECT_EQ("a?", ToNarrow(text, nullptr));
    if (std::setlocale(LC_ALL, "C.UTF-8") == nullptr) {
        GTEST_SKIP() << "no C.UTF-8 locale here";
    }
    const std::string utf8 = ToNarrow(text, "");
    const std::vector<uint32_t> back = ToWide("a\xC3\xA9", "");
    std::setlocale(LC_ALL, "C");
    EXPECT_EQ("a\xC3\xA9", utf8);
    EXPECT_EQ(std::vector<uint32_t>({'a', 0xE9}), back);
}

}  // namespace
}  // namespace osdep
}  // namespace zil
}  // namespace qv
