// Encodes wide text as UTF-8, up to 0x7FFFFFFF in the historic 6-byte form; stateless, any thread.
// Larger values become "?"; a bad output range throws InvalidArgument, short output BufferOverflow.
#pragma once

#include <cstdint>
#include <memory>

namespace qv {
namespace zil {

class WideToUtf8 {
public:
    WideToUtf8() = delete;

    static constexpr int32_t kCannotEncode = -1;  // code point 0x80000000 or above
    static constexpr int32_t kNoRoom = -2;        // fewer bytes left than the sequence needs

    // Writes the UTF-8 sequence of codePoint into [output, outputEnd) unless measureOnly
    // (which needs no room) and returns its length (1 to 6), or one of the negative codes
    // above with nothing written.
    static int32_t EncodeOne(char* output, char* outputEnd, wchar_t codePoint, bool measureOnly);

    // Bytes needed for [input, end), each unencodable code point counting 1 for its "?".
    // Stops before the first code point that would take the sum past limit.
    static uint32_t Measure(const wchar_t* input, const wchar_t* end, uint32_t limit = 0xFFFFFFFF);

    // Encodes while input is left and the output has room, advancing input past every
    // code point written; one that does not fit ends the conversion and stays unread.
    // Returns the number of bytes written. Null input converts nothing. Bytes of the
    // output past those written may have been overwritten.
    static uint32_t ConvertRange(const wchar_t*& input, const wchar_t* end, char* output,
                                 char* outputEnd);

    // As ConvertRange, and throws BufferOverflow when the output was too small for all
    // of the input.
    static uint32_t ConvertAll(const wchar_t*& input, const wchar_t* end, char* output,
                               char* outputEnd);

    // Encodes [input, end) into a new array of exactly the bytes needed plus a 0 byte.
    // Null input gives an array holding only the 0.
    static std::unique_ptr<char[]> ToNewArray(const wchar_t* input, const wchar_t* end);
};

}  // namespace zil
}  // namespace qv
