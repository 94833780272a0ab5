// The comparison rules behind ByteString and WideString: byte-wise, element-wise and
// by UTF-8 code point, each case-sensitive or not. Every function returns a negative
// number, 0 or a positive number; a null text counts as empty text. The UTF-8 rule
// throws InvalidSequence for malformed input; the others never throw.
#pragma once

#include <cstdint>

namespace qv {
namespace zil {

class StringCompare {
public:
    StringCompare() = delete;

    // NUL-terminated narrow texts, ignoring case through toupper: the difference of the
    // upper-cased bytes at the first mismatch (the terminator takes part).
    static int32_t TextIgnoreCase(const char* a, const char* b);
    static int32_t Text(const char* a, const char* b);

    // Narrow ranges: the first differing (upper-cased) byte decides, otherwise the
    // difference of the lengths.
    static int32_t Ranges(const char* a, uint32_t aLength, const char* b, uint32_t bLength);
    static int32_t RangesIgnoreCase(const char* a, uint32_t aLength, const char* b,
                                    uint32_t bLength);

    // Wide texts and ranges; the case-insensitive forms fold through towupper.
    static int32_t Text(const wchar_t* a, const wchar_t* b);
    static int32_t TextIgnoreCase(const wchar_t* a, const wchar_t* b);
    static int32_t Ranges(const wchar_t* a, uint32_t aLength, const wchar_t* b, uint32_t bLength);
    static int32_t RangesIgnoreCase(const wchar_t* a, uint32_t aLength, const wchar_t* b,
                                    uint32_t bLength);

    // UTF-8 ranges by code point, optionally folded through the "C" locale; at the end
    // of either side, the bytes left in the first minus the bytes left in the second.
    static int32_t Utf8Ranges(const char* a, uint32_t aLength, const char* b, uint32_t bLength,
                              bool ignoreCase);
};

}  // namespace zil
}  // namespace qv
