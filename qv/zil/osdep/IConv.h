// Converts between narrow text in a named character set ("" = the locale's) and wide text by iconv.
// An unknown set throws InvalidLocale; each unit that cannot be converted becomes one "?".
#pragma once

#include <cstdint>
#include <memory>

namespace qv {
namespace zil {
namespace osdep {

class IConv {
public:
    IConv() = delete;

    // Converts [input, inputEnd) from charset into [output, outputEnd) and sets outputEnd
    // to the position reached. The output is not terminated. A null or inverted range
    // throws InvalidArgument.
    static void NarrowToWide(const char* input, const char* inputEnd, const char* charset,
                             wchar_t* output, wchar_t*& outputEnd);

    // As NarrowToWide; returns the number of elements written.
    static uint32_t NarrowToWideCount(const char* input, const char* inputEnd, const char* charset,
                                      wchar_t* output, wchar_t* outputEnd);

    // Converts into a new array with room for one element per input byte, terminated
    // after the last element written.
    static std::unique_ptr<wchar_t[]> NarrowToWideNewArray(const char* input, const char* inputEnd,
                                                           const char* charset);

    // As NarrowToWideNewArray for text that ends at its first 0 byte or after maxLength
    // bytes, whichever comes first. Null text is empty.
    static std::unique_ptr<wchar_t[]> NarrowTextToWideNewArray(const char* text, uint32_t maxLength,
                                                               const char* charset);

    // Converts [input, inputEnd) into charset in [output, outputEnd) and sets outputEnd to
    // the position reached. The output is not terminated.
    static void WideToNarrow(const wchar_t* input, const wchar_t* inputEnd, char* output,
                             char*& outputEnd, const char* charset);

    // As WideToNarrow; returns the number of bytes written.
    static uint32_t WideToNarrowCount(const wchar_t* input, const wchar_t* inputEnd, char* output,
                                      char* outputEnd, const char* charset);

    // Converts into a new array with room for four bytes per input element, terminated
    // after the last byte written.
    static std::unique_ptr<char[]> WideToNarrowNewArray(const wchar_t* input,
                                                        const wchar_t* inputEnd,
                                                        const char* charset);
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
