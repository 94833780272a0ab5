#include "qv/zil/WideToUtf8.h"

#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "qv/zil/Utf8ToWide.h"

namespace qv {
namespace zil {
namespace {

using exception::BufferOverflow;
using exception::InvalidArgument;
using exception::InvalidSequence;

// Code points are given as unsigned values: wchar_t is signed on some targets.
wchar_t Wide(uint32_t value) { return static_cast<wchar_t>(value); }

std::vector<wchar_t> WideText(std::initializer_list<uint32_t> values) {
    std::vector<wchar_t> text;
    for (const uint32_t value : values) {
        text.push_back(Wide(value));
    }
    return text;
}

// The bytes EncodeOne writes for value, or the negative result as text.
std::string Encoded(uint32_t value) {
    char out[8];
    const int32_t length = WideToUtf8::EncodeOne(out, out + sizeof(out), Wide(value), false);
    return length < 0 ? "error " + std::to_string(length) : std::string(out, length);
}

TEST(WideToUtf8Test, EncodesEveryLengthAtItsBounds) {
    EXPECT_EQ(std::string(1, '\0'), Encoded(0));
    EXPECT_EQ("\x7F", Encoded(0x7F));
    EXPECT_EQ("\xC2\x80", Encoded(0x80));
    EXPECT_EQ("\xDF\xBF", Encoded(0x7FF));
    EXPECT_EQ("\xE0\xA0\x80", Encoded(0x800));
    EXPECT_EQ("\xED\xA0\x80", Encoded(0xD800));  // surrogates like any other value
    EXPECT_EQ("\xEF\xBF\xBF", Encoded(0xFFFF));
    EXPECT_EQ("\xF0\x90\x80\x80", Encoded(0x10000));
    EXPECT_EQ("\xF4\x90\x80\x80", Encoded(0x110000));
    EXPECT_EQ("\xF7\xBF\xBF\xBF", Encoded(0x1FFFFF));
    EXPECT_EQ("\xF8\x88\x80\x80\x80", Encoded(0x200000));
    EXPECT_EQ("\xFB\xBF\xBF\xBF\xBF", Encoded(0x3FFFFFF));
    EXPECT_EQ("\xFC\x84\x80\x80\x80\x80", Encoded(0x4000000));
    EXPECT_EQ("\xFD\xBF\xBF\xBF\xBF\xBF", Encoded(0x7FFFFFFF));
    EXPECT_EQ("error -1", Encoded(0x80000000));
    EXPECT_EQ("error -1", Encoded(0xFFFFFFFF));
}

TEST(WideToUtf8Test, EncodeOneNeedsRoomOnlyWhenWriting) {
    char out[6] = {'#', '#', '#', '#', '#', '#'};
    EXPECT_EQ(WideToUtf8::kNoRoom, WideToUtf8::EncodeOne(out, out + 2, Wide(0x20AC), false));
    EXPECT_EQ(std::string(6, '#'), std::string(out, 6)) << "nothing written without room";
    EXPECT_EQ(3, WideToUtf8::EncodeOne(out, out + 3, Wide(0x20AC), false));
    EXPECT_EQ("\xE2\x82\xAC###", std::string(out, 6));
    EXPECT_EQ(WideToUtf8::kNoRoom, WideToUtf8::EncodeOne(out, out, L'a', false));
    EXPECT_EQ(WideToUtf8::kNoRoom, WideToUtf8::EncodeOne(nullptr, nullptr, L'a', false));

    EXPECT_EQ(6, WideToUtf8::EncodeOne(nullptr, nullptr, Wide(0x7FFFFFFF), true));
    EXPECT_EQ(WideToUtf8::kCannotEncode,
              WideToUtf8::EncodeOne(out, out + 6, Wide(0x80000000), true));
    EXPECT_EQ(WideToUtf8::kCannotEncode, WideToUtf8::EncodeOne(out, out, Wide(0x80000000), false));
}

TEST(WideToUtf8Test, MeasureCountsReplacementsAndStopsAtTheLimit) {
    const std::vector<wchar_t> text =
        WideText({'a', 0xE9, 0x20AC, 0x80000000, 0x10000, 0x7FFFFFFF});
    const wchar_t* const begin = text.data();
    const wchar_t* const end = begin + text.size();
    EXPECT_EQ(1u + 2 + 3 + 1 + 4 + 6, WideToUtf8::Measure(begin, end));
    EXPECT_EQ(0u, WideToUtf8::Measure(nullptr, end));
    EXPECT_EQ(0u, WideToUtf8::Measure(end, end));
    EXPECT_EQ(0u, WideToUtf8::Measure(end, begin));
    EXPECT_EQ(0u, WideToUtf8::Measure(begin, end, 0));
    EXPECT_EQ(1u, WideToUtf8::Measure(begin, end, 2)) << "the second code point needs two";
    EXPECT_EQ(3u, WideToUtf8::Measure(begin, end, 3));
    EXPECT_EQ(6u, WideToUtf8::Measure(begin, end, 6));
    EXPECT_EQ(7u, WideToUtf8::Measure(begin, end, 10)) << "the replacement counts one";
    EXPECT_EQ(11u, WideToUtf8::Measure(begin, end, 11));
    EXPECT_EQ(11u, WideToUtf8::Measure(begin, end, 16));

    // The limit also holds inside long ASCII runs.
    const std::wstring ascii(100, L'x');
    EXPECT_EQ(100u, WideToUtf8::Measure(ascii.data(), ascii.data() + ascii.size()));
    EXPECT_EQ(37u, WideToUtf8::Measure(ascii.data(), ascii.data() + ascii.size(), 37));
}

TEST(WideToUtf8Test, RangeConversionWritesWhatFitsAndReplacesTheUnencodable) {
    const std::vector<wchar_t> text = WideText({0xE9, 0xE9});
    const wchar_t* const end = text.data() + text.size();
    char out[8] = {};

    const wchar_t* input = text.data();
    EXPECT_EQ(2u, WideToUtf8::ConvertRange(input, end, out, out + 2));
    EXPECT_EQ(text.data() + 1, input);
    EXPECT_EQ("\xC3\xA9", std::string(out, 2));
    EXPECT_EQ(0u, WideToUtf8::ConvertRange(input, end, out, out + 1))
        << "half a sequence is not written";
    EXPECT_EQ(text.data() + 1, input);

    input = text.data();
    EXPECT_THROW(WideToUtf8::ConvertAll(input, end, out, out + 3), BufferOverflow);
    EXPECT_EQ(text.data() + 1, input);
    input = text.data();
    EXPECT_EQ(4u, WideToUtf8::ConvertAll(input, end, out, out + 4));
    EXPECT_EQ(end, input);

    const std::vector<wchar_t> invalid = WideText({'a', 0x80000000, 0xFFFFFFFF, 'b'});
    input = invalid.data();
    EXPECT_EQ(4u, WideToUtf8::ConvertAll(input, invalid.data() + 4, out, out + 4));
    EXPECT_EQ("a??b", std::string(out, 4));

    input = text.data();
    EXPECT_THROW(WideToUtf8::ConvertRange(input, end, nullptr, nullptr), InvalidArgument);
    EXPECT_THROW(WideToUtf8::ConvertRange(input, end, out + 1, out), InvalidArgument);
    EXPECT_EQ(0u, WideToUtf8::ConvertRange(input, end, out, out));
    EXPECT_EQ(0u, WideToUtf8::ConvertRange(input, input, out, out + 8));
    EXPECT_EQ(text.data(), input);
    const wchar_t* none = nullptr;
    EXPECT_EQ(0u, WideToUtf8::ConvertAll(none, nullptr, out, out + 8));
}

TEST(WideToUtf8Test, NewArrayIsExactlyTheEncodingAndATerminator) {
    EXPECT_EQ('\0', WideToUtf8::ToNewArray(nullptr, nullptr)[0]);
    const std::vector<wchar_t> text = WideText({'z', 0xFC, 0, 0x4E2D, 0x80000000, 0x1F600});
    const std::unique_ptr<char[]> bytes = WideToUtf8::ToNewArray(text.data(), text.data() + 6);
    const std::string expected("z\xC3\xBC\0\xE4\xB8\xAD?\xF0\x9F\x98\x80", 12);
    EXPECT_EQ(expected, std::string(bytes.get(), 12));
    EXPECT_EQ('\0', bytes[12]);
}

// Encodes text with EncodeOne alone into room bytes: the reference for the fast paths.
std::string EncodeByOne(const std::vector<wchar_t>& text, size_t room, size_t& consumed) {
    std::string result;
    consumed = 0;
    for (const wchar_t element : text) {
        char out[6];
        int32_t length = WideToUtf8::EncodeOne(out, out + sizeof(out), element, false);
        if (length < 0) {
            out[0] = '?';
            length = 1;
        }
        if (result.size() + length > room) {
            break;
        }
        result.append(out, length);
        ++consumed;
    }
    return result;
}

// A random code point whose encoded length is uniformly 1 to 6 bytes.
uint32_t RandomCodePoint(std::mt19937& random) {
    static const uint32_t bounds[] = {0, 0x80, 0x800, 0x10000, 0x200000, 0x4000000, 0x80000000};
    const uint32_t length = random() % 6;
    return bounds[length] + random() % (bounds[length + 1] - bounds[length]);
}

TEST(WideToUtf8Test, EveryEncodableCodePointSurvivesTheRoundTrip) {
    std::mt19937 random(7);
    std::vector<wchar_t> text;
    for (int i = 0; i < 20000; ++i) {
        text.push_back(Wide(RandomCodePoint(random)));
    }
    text.push_back(Wide(0x7FFFFFFF));
    const std::unique_ptr<char[]> bytes =
        WideToUtf8::ToNewArray(text.data(), text.data() + text.size());
    const uint32_t length = WideToUtf8::Measure(text.data(), text.data() + text.size());
    ASSERT_EQ(text.size(), Utf8ToWide::Count(bytes.get(), bytes.get() + length));
    const std::unique_ptr<wchar_t[]> decoded = Utf8ToWide::ToNewArray(bytes.get(), length);
    for (size_t i = 0; i < text.size(); ++i) {
        ASSERT_EQ(static_cast<uint32_t>(text[i]), static_cast<uint32_t>(decoded[i])) << i;
    }
}

TEST(WideToUtf8Test, RandomBytesDecodeToTheirOwnEncodingOrAreRejected) {
    // Every accepted sequence is the shortest form, so encoding what was decoded must
    // give the same bytes back.
    std::mt19937 random(11);
    int accepted = 0;
    for (int round = 0; round < 20000; ++round) {
        std::string bytes(1 + random() % 8, '\0');
        for (char& byte : bytes) {
            // Mostly lead and continuation bytes, so that whole sequences come up often.
            const uint32_t kind = random() % 4;
            byte = static_cast<char>(kind == 0   ? random() % 256
                                     : kind == 1 ? 0xC0 + random() % 64
                                                 : 0x80 + random() % 64);
        }
        const std::vector<char> exact(bytes.begin(), bytes.end());
        std::unique_ptr<wchar_t[]> decoded;
        try {
            decoded = Utf8ToWide::ToNewArray(exact.data(), static_cast<uint32_t>(exact.size()));
        } catch (const InvalidSequence&) {
            continue;
        }
        ++accepted;
        const uint32_t count = Utf8ToWide::Count(exact.data(), exact.data() + exact.size());
        const wchar_t* const end = decoded.get() + count;
        const std::unique_ptr<char[]> again = WideToUtf8::ToNewArray(decoded.get(), end);
        ASSERT_EQ(bytes.size(), WideToUtf8::Measure(decoded.get(), end)) << "round " << round;
        ASSERT_EQ(bytes, std::string(again.get(), bytes.size())) << "round " << round;
    }
    EXPECT_GT(accepted, 500);
}

TEST(WideToUtf8Test, FastPathsAgreeWithEncodeOneForEveryRoom) {
    std::mt19937 random(3);
    for (int round = 0; round < 2000; ++round) {
        // ASCII runs of random length around the block size, between other code points.
        std::vector<wchar_t> text;
        while (text.size() < 60) {
            text.insert(text.end(), random() % 40, L'a' + static_cast<wchar_t>(random() % 26));
            const uint32_t kind = random() % 4;
            text.push_back(Wide(kind == 0   ? 0xE9
                                : kind == 1 ? 0x4E2D
                                : kind == 2 ? 0x80000000 + random() % 5
                                            : RandomCodePoint(random)));
        }
        const size_t room = random() % (4 * text.size());
        size_t consumed = 0;
        const std::string expected = EncodeByOne(text, room, consumed);

        std::vector<char> out(room + 1, '#');
        const wchar_t* input = text.data();
        const uint32_t written = WideToUtf8::ConvertRange(input, text.data() + text.size(),
                                                          out.data(), out.data() + room);
        ASSERT_EQ(expected, std::string(out.data(), written)) << "round " << round;
        ASSERT_EQ(consumed, static_cast<size_t>(input - text.data())) << "round " << round;
        ASSERT_EQ('#', out[room]);
    }
}

}  // namespace
}  // namespace zil
}  // namespace qv
