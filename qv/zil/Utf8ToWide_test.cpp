#include "qv/zil/Utf8ToWide.h"

#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace {

using exception::BufferOverflow;
using exception::InvalidArgument;
using exception::InvalidSequence;

// Bytes in a heap block of exactly their size, so that a read past the end is caught
// by the address sanitizer.
std::vector<char> Bytes(std::initializer_list<int> values) {
    std::vector<char> bytes;
    for (const int value : values) {
        bytes.push_back(static_cast<char>(value));
    }
    return bytes;
}

std::vector<char> Bytes(const std::string& text) {
    return std::vector<char>(text.begin(), text.end());
}

// Decodes one sequence and returns its code point as an unsigned value.
uint32_t DecodeValue(const std::vector<char>& bytes, uint32_t expectedLength) {
    wchar_t out = L'x';
    EXPECT_EQ(expectedLength,
              Utf8ToWide::DecodeOne(bytes.data(), bytes.data() + bytes.size(), &out, false));
    return static_cast<uint32_t>(out);
}

bool Rejected(const std::vector<char>& bytes) {
    wchar_t out = 0;
    try {
        Utf8ToWide::DecodeOne(bytes.data(), bytes.data() + bytes.size(), &out, false);
    } catch (const InvalidSequence&) {
        return true;
    }
    return false;
}

// Decodes sequence after sequence with DecodeOne alone: the reference the fast range
// converter must agree with. Stops at a rejected sequence and reports where.
struct Reference {
    std::vector<uint32_t> codePoints;
    size_t consumed = 0;
    bool rejected = false;
};

Reference DecodeByOne(const std::vector<char>& bytes, size_t room = SIZE_MAX) {
    Reference result;
    const char* p = bytes.data();
    const char* const end = p + bytes.size();
    while (p < end && result.codePoints.size() < room) {
        wchar_t out = 0;
        try {
            p += Utf8ToWide::DecodeOne(p, end, &out, false);
        } catch (const InvalidSequence&) {
            result.rejected = true;
            break;
        }
        result.codePoints.push_back(static_cast<uint32_t>(out));
    }
    result.consumed = static_cast<size_t>(p - bytes.data());
    return result;
}

TEST(Utf8ToWideTest, DecodesEveryLeadByteRangeAtItsBounds) {
    EXPECT_EQ(0x00u, DecodeValue(Bytes({0x00}), 1));
    EXPECT_EQ(0x7Fu, DecodeValue(Bytes({0x7F}), 1));
    EXPECT_EQ(0x80u, DecodeValue(Bytes({0xC2, 0x80}), 2));
    EXPECT_EQ(0x7FFu, DecodeValue(Bytes({0xDF, 0xBF}), 2));
    EXPECT_EQ(0x800u, DecodeValue(Bytes({0xE0, 0xA0, 0x80}), 3));
    EXPECT_EQ(0xFFFFu, DecodeValue(Bytes({0xEF, 0xBF, 0xBF}), 3));
    EXPECT_EQ(0x10000u, DecodeValue(Bytes({0xF0, 0x90, 0x80, 0x80}), 4));
    EXPECT_EQ(0x1FFFFFu, DecodeValue(Bytes({0xF7, 0xBF, 0xBF, 0xBF}), 4));
    EXPECT_EQ(0x200000u, DecodeValue(Bytes({0xF8, 0x88, 0x80, 0x80, 0x80}), 5));
    EXPECT_EQ(0x3FFFFFFu, DecodeValue(Bytes({0xFB, 0xBF, 0xBF, 0xBF, 0xBF}), 5));
    EXPECT_EQ(0x4000000u, DecodeValue(Bytes({0xFC, 0x84, 0x80, 0x80, 0x80, 0x80}), 6));
    EXPECT_EQ(0x7FFFFFFFu, DecodeValue(Bytes({0xFD, 0xBF, 0xBF, 0xBF, 0xBF, 0xBF}), 6));
    // Surrogates and values above the Unicode range are kept as they are.
    EXPECT_EQ(0xD800u, DecodeValue(Bytes({0xED, 0xA0, 0x80}), 3));
    EXPECT_EQ(0xDFFFu, DecodeValue(Bytes({0xED, 0xBF, 0xBF}), 3));
    EXPECT_EQ(0x110000u, DecodeValue(Bytes({0xF4, 0x90, 0x80, 0x80}), 4));
    // Trailing bytes after the sequence are not part of it.
    EXPECT_EQ(0xE9u, DecodeValue(Bytes({0xC3, 0xA9, 0xC3}), 2));
}

TEST(Utf8ToWideTest, RejectsStrayOverLongAndImpossibleForms) {
    EXPECT_TRUE(Rejected(Bytes({0x80})));
    EXPECT_TRUE(Rejected(Bytes({0xBF, 0x41})));
    EXPECT_TRUE(Rejected(Bytes({0xC0, 0x80})));
    EXPECT_TRUE(Rejected(Bytes({0xC1, 0xBF})));
    EXPECT_TRUE(Rejected(Bytes({0xE0, 0x9F, 0xBF})));
    EXPECT_TRUE(Rejected(Bytes({0xE0, 0x80, 0x80})));
    EXPECT_TRUE(Rejected(Bytes({0xF0, 0x8F, 0xBF, 0xBF})));
    EXPECT_TRUE(Rejected(Bytes({0xF8, 0x87, 0xBF, 0xBF, 0xBF})));
    EXPECT_TRUE(Rejected(Bytes({0xFC, 0x83, 0xBF, 0xBF, 0xBF, 0xBF})));
    EXPECT_TRUE(Rejected(Bytes({0xFE, 0x80, 0x80, 0x80, 0x80, 0x80, 0x80})));
    EXPECT_TRUE(Rejected(Bytes({0xFF})));
    // The over-long limits apply to the smallest lead of each length only.
    EXPECT_EQ(0x1000u, DecodeValue(Bytes({0xE1, 0x80, 0x80}), 3));
    EXPECT_EQ(0x40000u, DecodeValue(Bytes({0xF1, 0x80, 0x80, 0x80}), 4));
    EXPECT_EQ(0x1000000u, DecodeValue(Bytes({0xF9, 0x80, 0x80, 0x80, 0x80}), 5));
    EXPECT_EQ(0x40000000u, DecodeValue(Bytes({0xFD, 0x80, 0x80, 0x80, 0x80, 0x80}), 6));

    // A byte that is not a continuation, in every position of every length.
    const std::vector<std::vector<char>> valid = {
        Bytes({0xC3, 0xA9}), Bytes({0xE2, 0x82, 0xAC}), Bytes({0xF0, 0x9F, 0x98, 0x80}),
        Bytes({0xF8, 0x88, 0x80, 0x80, 0x80}), Bytes({0xFC, 0x84, 0x80, 0x80, 0x80, 0x80})};
    for (const std::vector<char>& sequence : valid) {
        for (size_t i = 1; i < sequence.size(); ++i) {
            for (const int bad : {0x41, 0xC0, 0xFF}) {
                std::vector<char> broken = sequence;
                broken[i] = static_cast<char>(bad);
                EXPECT_TRUE(Rejected(broken)) << "length " << sequence.size() << " at " << i;
            }
        }
    }
}

TEST(Utf8ToWideTest, SequenceCutShortByTheEndIsRejectedEverywhere) {
    const std::vector<std::vector<char>> valid = {
        Bytes({0xC3, 0xA9}), Bytes({0xE2, 0x82, 0xAC}), Bytes({0xF0, 0x9F, 0x98, 0x80}),
        Bytes({0xF8, 0x88, 0x80, 0x80, 0x80}), Bytes({0xFC, 0x84, 0x80, 0x80, 0x80, 0x80})};
    for (const std::vector<char>& sequence : valid) {
        for (size_t cut = 1; cut < sequence.size(); ++cut) {
            // Text before the cut sequence takes the fast paths up to it.
            const std::vector<char> bytes =
                Bytes(std::string(20, 'a') + std::string(sequence.begin(), sequence.begin() + cut));
            const char* const end = bytes.data() + bytes.size();
            EXPECT_THROW(Utf8ToWide::Count(bytes.data(), end), InvalidSequence);
            wchar_t out = 0;
            EXPECT_THROW(Utf8ToWide::DecodeNext(end - cut, end, out), InvalidSequence);

            std::vector<wchar_t> wide(bytes.size(), L'#');
            const char* input = bytes.data();
            EXPECT_THROW(
                Utf8ToWide::ConvertRange(input, end, wide.data(), wide.data() + wide.size()),
                InvalidSequence);
            EXPECT_EQ(end - cut, input) << "input stops at the cut sequence";
            EXPECT_EQ(L'a', wide[19]);
        }
    }
    // A two-byte lead at the last position, alone.
    const std::vector<char> lead = Bytes({0xC3});
    wchar_t out = 0;
    EXPECT_THROW(Utf8ToWide::Count(lead.data(), lead.data() + 1), InvalidSequence);
    EXPECT_THROW(Utf8ToWide::DecodeNext(lead.data(), lead.data() + 1, out), InvalidSequence);
}

TEST(Utf8ToWideTest, SingleSequenceOperationsAndTheirEmptyInputs) {
    const std::vector<char> bytes = Bytes({0xE2, 0x82, 0xAC, 0x41});
    const char* const end = bytes.data() + bytes.size();

    wchar_t out = L'#';
    EXPECT_EQ(3u, Utf8ToWide::DecodeOne(bytes.data(), end, &out, true));
    EXPECT_EQ(L'#', out) << "measuring stores nothing";
    EXPECT_EQ(3u, Utf8ToWide::DecodeOne(bytes.data(), end, nullptr, true));
    EXPECT_THROW(Utf8ToWide::DecodeOne(bytes.data(), end, nullptr, false), InvalidArgument);
    EXPECT_THROW(Utf8ToWide::DecodeOne(end, end, &out, false), InvalidSequence);
    EXPECT_THROW(Utf8ToWide::DecodeOne(nullptr, nullptr, &out, false), InvalidSequence);

    const char* next = Utf8ToWide::DecodeNext(bytes.data(), end, out);
    EXPECT_EQ(bytes.data() + 3, next);
    EXPECT_EQ(0x20ACu, static_cast<uint32_t>(out));
    EXPECT_EQ(end, Utf8ToWide::DecodeNext(next, end, out));
    EXPECT_EQ(L'A', out);
    out = L'#';
    EXPECT_EQ(end, Utf8ToWide::DecodeNext(end, end, out));
    EXPECT_EQ(0, out) << "empty input gives 0";
    EXPECT_EQ(nullptr, Utf8ToWide::DecodeNext(nullptr, nullptr, out));

    EXPECT_EQ(2u, Utf8ToWide::Count(bytes.data(), end));
    EXPECT_EQ(0u, Utf8ToWide::Count(end, end));
    EXPECT_EQ(0u, Utf8ToWide::Count(nullptr, end));
}

TEST(Utf8ToWideTest, RangeConversionChecksItsOutputAndStopsWhenFull) {
    const std::vector<char> bytes = Bytes(u8"a\u00e9\u20ac\U0001F600z");
    const char* const end = bytes.data() + bytes.size();
    wchar_t wide[8];

    const char* input = bytes.data();
    EXPECT_THROW(Utf8ToWide::ConvertRange(input, end, nullptr, nullptr), InvalidArgument);
    EXPECT_THROW(Utf8ToWide::ConvertRange(input, end, wide + 1, wide), InvalidArgument);
    EXPECT_EQ(bytes.data(), input);

    const char* none = nullptr;
    EXPECT_EQ(0u, Utf8ToWide::ConvertRange(none, end, wide, wide + 8));
    EXPECT_EQ(0u, Utf8ToWide::ConvertAll(none, nullptr, wide, wide + 8));
    EXPECT_EQ(0u, Utf8ToWide::ConvertRange(input, end, wide, wide));
    EXPECT_EQ(bytes.data(), input);

    // Room for three: stops after the euro sign, leaving input on the next sequence.
    EXPECT_EQ(3u, Utf8ToWide::ConvertRange(input, end, wide, wide + 3));
    EXPECT_EQ(bytes.data() + 6, input);
    EXPECT_EQ(0x20ACu, static_cast<uint32_t>(wide[2]));
    EXPECT_EQ(2u, Utf8ToWide::ConvertRange(input, end, wide, wide + 8));
    EXPECT_EQ(end, input);
    EXPECT_EQ(0x1F600u, static_cast<uint32_t>(wide[0]));
    EXPECT_EQ(L'z', wide[1]);

    input = bytes.data();
    EXPECT_THROW(Utf8ToWide::ConvertAll(input, end, wide, wide + 4), BufferOverflow);
    EXPECT_EQ(end - 1, input) << "everything that fitted was converted";
    input = bytes.data();
    EXPECT_EQ(5u, Utf8ToWide::ConvertAll(input, end, wide, wide + 5));
    EXPECT_EQ(end, input);
}

TEST(Utf8ToWideTest, RejectedSequenceLeavesInputAfterTheLastConvertedOne) {
    // The bad byte sits at every offset around a block boundary and the end.
    for (size_t at = 0; at < 40; ++at) {
        std::vector<char> bytes = Bytes(std::string(40, 'x') + u8"\u00e9\u4e2d");
        bytes[at] = static_cast<char>(0xFF);
        std::vector<wchar_t> wide(bytes.size(), L'#');
        const char* input = bytes.data();
        try {
            Utf8ToWide::ConvertAll(input, bytes.data() + bytes.size(), wide.data(),
                                   wide.data() + wide.size());
            ADD_FAILURE() << "no throw for a bad byte at " << at;
        } catch (const InvalidSequence& e) {
            EXPECT_EQ(bytes.data() + at, input);
            EXPECT_STREQ("qv/zil/Utf8ToWide.cpp", e.file);
            EXPECT_GT(e.line, 0);
        }
        EXPECT_EQ(std::wstring(at, L'x'), std::wstring(wide.data(), at));
    }
}

TEST(Utf8ToWideTest, NewArrayHoldsExactlyTheCodePointsAndATerminator) {
    const std::unique_ptr<wchar_t[]> none = Utf8ToWide::ToNewArray(nullptr, 5);
    EXPECT_EQ(0, none[0]);
    const std::unique_ptr<wchar_t[]> empty = Utf8ToWide::ToNewArray("", 0);
    EXPECT_EQ(0, empty[0]);

    const std::string text = std::string(u8"gr\u00fc\u00dfe ") + '\0' + u8"\u65e5\u672c";
    const std::unique_ptr<wchar_t[]> wide = Utf8ToWide::ToNewArray(text.data(), text.size());
    const wchar_t expected[] = {L'g', L'r', 0xFC, 0xDF, L'e', L' ', 0, 0x65E5, 0x672C, 0};
    for (size_t i = 0; i < sizeof(expected) / sizeof(expected[0]); ++i) {
        EXPECT_EQ(static_cast<uint32_t>(expected[i]), static_cast<uint32_t>(wide[i])) << i;
    }
    // The length bounds the input: the cut sequence is rejected, not read past.
    EXPECT_THROW(Utf8ToWide::ToNewArray(text.data(), text.size() - 1), InvalidSequence);
}

// Text made of pieces that exercise every path: ASCII runs long enough for whole blocks,
// runs of two- and three-byte sequences, long forms, and now and then a bad or cut one.
std::vector<char> RandomText(std::mt19937& random) {
    static const char* const pieces[] = {"a",
                                         "hello world, ",
                                         "0123456789abcdefghij",
                                         u8"\u00e9",
                                         u8"\u00df\u00fc",
                                         u8"\u4e2d\u6587\u5b57",
                                         u8"\u0800",
                                         u8"\uffff",
                                         u8"\U0001F600",
                                         u8"\U0010FFFF",
                                         "\xF8\x88\x80\x80\x80",
                                         "\xFD\xBF\xBF\xBF\xBF\xBF",
                                         "\xED\xA0\x80"};
    static const char* const bad[] = {"\x80", "\xC0\xAF", "\xC1\xBF",         "\xE0\x9F\xBF",
                                      "\xFE", "\xE2\x82", "\xF0\x8F\xBF\xBF", "\xC3\x41"};
    std::vector<char> bytes;
    const int count = static_cast<int>(random() % 24);
    for (int i = 0; i < count; ++i) {
        const char* piece = random() % 40 == 0 ? bad[random() % 8] : pieces[random() % 13];
        bytes.insert(bytes.end(), piece, piece + std::strlen(piece));
    }
    if (random() % 8 == 0 && !bytes.empty()) {
        bytes.resize(random() % bytes.size());  // may cut a sequence short
    }
    return bytes;
}

TEST(Utf8ToWideTest, FastPathsAgreeWithTheSequenceDecoderOnRandomText) {
    std::mt19937 random(20240611);
    int rejected = 0;
    for (int round = 0; round < 3000; ++round) {
        const std::vector<char> bytes = RandomText(random);
        const char* const end = bytes.data() + bytes.size();
        const size_t room = random() % 4 == 0 ? random() % (bytes.size() + 1) : bytes.size();
        const Reference expected = DecodeByOne(bytes, room);
        rejected += expected.rejected;

        std::vector<wchar_t> wide(room + 1, L'#');
        const char* input = bytes.data();
        bool threw = false;
        uint32_t written = 0;
        try {
            written = Utf8ToWide::ConvertRange(input, end, wide.data(), wide.data() + room);
        } catch (const InvalidSequence&) {
            threw = true;
            written = static_cast<uint32_t>(expected.codePoints.size());
        }
        ASSERT_EQ(expected.rejected, threw) << "round " << round;
        ASSERT_EQ(expected.consumed, static_cast<size_t>(input - bytes.data())) << round;
        ASSERT_EQ(expected.codePoints.size(), written) << round;
        for (size_t i = 0; i < written; ++i) {
            ASSERT_EQ(expected.codePoints[i], static_cast<uint32_t>(wide[i])) << round;
        }
        EXPECT_EQ(L'#', wide[room]) << "nothing written past the output's end";

        if (room == bytes.size()) {
            const Reference whole = expected;
            if (whole.rejected) {
                EXPECT_THROW(Utf8ToWide::Count(bytes.data(), end), InvalidSequence);
            } else {
                EXPECT_EQ(whole.codePoints.size(), Utf8ToWide::Count(bytes.data(), end));
            }
        }
    }
    EXPECT_GT(rejected, 100) << "the generator must produce both kinds of text";
    EXPECT_LT(rejected, 2900);
}

}  // namespace
}  // namespace zil
}  // namespace qv
