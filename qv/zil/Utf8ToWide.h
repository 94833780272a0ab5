// Decodes UTF-8, historic 5- and 6-byte forms included, into wide text; stateless, any thread.
// Malformed or cut-short input throws InvalidSequence, a bad output range InvalidArgument.
#pragma once

#include <cstdint>
#include <memory>

namespace qv {
namespace zil {

class Utf8ToWide {
public:
    Utf8ToWide() = delete;

    // Decodes the sequence at input and stores its code point unless measureOnly.
    // Returns its length in bytes (1 to 6). Never reads at or beyond end; an empty
    // input or a sequence cut short by end throws InvalidSequence.
    static uint32_t DecodeOne(const char* input, const char* end, wchar_t* output,
                              bool measureOnly);

    // Number of code points in [input, end); 0 for null or empty input.
    static uint32_t Count(const char* input, const char* end);

    // Decodes one code point and returns the position after it. Null or empty input
    // stores 0 and returns input unchanged.
    static const char* DecodeNext(const char* input, const char* end, wchar_t& output);

    // Decodes while input has bytes left and the output has room, advancing input.
    // Returns the number of elements written. Null input converts nothing. On a throw,
    // input stands after the last sequence converted and its code points are stored.
    // Elements of the output past those written may have been overwritten.
    static uint32_t ConvertRange(const char*& input, const char* end, wchar_t* output,
                                 wchar_t* outputEnd);

    // As ConvertRange, and throws BufferOverflow when the output was too small for all
    // of the input.
    static uint32_t ConvertAll(const char*& input, const char* end, wchar_t* output,
                               wchar_t* outputEnd);

    // Decodes length bytes into a new array of exactly the code points plus a 0 element.
    // Null input gives an array holding only the 0.
    static std::unique_ptr<wchar_t[]> ToNewArray(const char* input, uint32_t length);
};

}  // namespace zil
}  // namespace qv
