#include "qv/zil/osdep/IConv.h"

#include <iconv.h>
#include <langinfo.h>

#include <cerrno>
#include <cstring>

#include "qv/zil/Exceptions.h"
#include "qv/zil/SafeInteger.h"
#include "qv/zil/osdep/IConvDescriptor.h"

namespace qv {
namespace zil {
namespace osdep {

using exception::InvalidArgument;

namespace {

// iconv's name for the C library's wide character set.
constexpr const char* kWideCharset = "WCHAR_T";

// A null character-set name counts as the empty one, the current locale's set.
const char* OrLocale(const char* charset) { return charset == nullptr ? "" : charset; }

// Number of elements in [begin, end); a null begin with a null end is empty, any other
// null or inverted range is refused.
template <typename T>
uint32_t Length(const T* begin, const T* end) {
    if (begin == nullptr ? end != nullptr : end < begin) {
        QV_THROW(InvalidArgument());
    }
    return begin == nullptr ? 0 : SafeInteger::FromSigned(end - begin);
}

// The character sets of one direction, its input unit in bytes, and the output unit that
// stands in for input that cannot be converted.
struct Direction {
    const char* to;
    const char* from;
    size_t inputUnit;
    const void* replacement;
    size_t replacementSize;
};

// Converts inputBytes bytes at input into at most outputBytes bytes at output and returns
// the number of bytes written. Whenever iconv stops early while input and room are left,
// one replacement unit is written, one input unit skipped, and the conversion goes on.
size_t Convert(const Direction& direction, const void* input, size_t inputBytes, void* output,
               size_t outputBytes) {
    const IConvDescriptor descriptor(direction.to, direction.from);
    char* in = static_cast<char*>(const_cast<void*>(input));
    size_t inLeft = inputBytes;
    char* out = static_cast<char*>(output);
    size_t outLeft = outputBytes;
    while (inLeft > 0 && outLeft > 0) {
        if (iconv(descriptor.Get(), &in, &inLeft, &out, &outLeft) != static_cast<size_t>(-1)) {
            continue;
        }
        if (inLeft == 0 || outLeft < direction.replacementSize) {
            break;
        }
        std::memcpy(out, direction.replacement, direction.replacementSize);
        out += direction.replacementSize;
        outLeft -= direction.replacementSize;
        const size_t skip = inLeft < direction.inputUnit ? inLeft : direction.inputUnit;
        in += skip;
        inLeft -= skip;
    }
    // Return a stateful character set to its initial shift state, so that the text
    // ends well-formed (this writes nothing for stateless sets or when no room is left).
    iconv(descriptor.Get(), nullptr, nullptr, &out, &outLeft);
    return outputBytes - outLeft;
}

// True when `charset` ("" = the locale's) holds the 128 ASCII characters as the bytes
// 0-127, one byte each, under the name iconv and the locale give it: UTF-8, ASCII and the
// ISO 8859 parts. Text of ASCII characters alone then converts byte for element without
// iconv; any other name, suffixes such as "//TRANSLIT" included, goes through iconv.
bool KeepsAsciiAsIs(const char* charset) {
    const char* name = *charset == '\0' ? nl_langinfo(CODESET) : charset;
    if (std::strcmp(name, "UTF-8") == 0 || std::strcmp(name, "ANSI_X3.4-1968") == 0) {
        return true;
    }
    static const char kIso8859[] = "ISO-8859-";
    if (std::strncmp(name, kIso8859, sizeof kIso8859 - 1) != 0) {
        return false;
    }
    // The parts there are: 1 to 16 without 12.
    const char* part = name + sizeof kIso8859 - 1;
    const size_t digits = std::strspn(part, "0123456789");
    if (digits == 0 || digits > 2 || part[digits] != '\0' || part[0] == '0') {
        return false;
    }
    const int number = digits == 1 ? part[0] - '0' : (part[0] - '0') * 10 + (part[1] - '0');
    return number <= 16 && number != 12;
}

// Copies ASCII text unit for unit into at most `room` units; false (nothing written) when
// some unit is not ASCII. Returns the number of units written in `written`.
template <typename From, typename To>
bool CopyAscii(const From* input, uint32_t count, To* output, uint32_t room, uint32_t& written) {
    for (uint32_t i = 0; i < count; ++i) {
        if (static_cast<uint32_t>(input[i]) >= 0x80u) {
            return false;
        }
    }
    written = count < room ? count : room;
    for (uint32_t i = 0; i < written; ++i) {
        output[i] = static_cast<To>(input[i]);
    }
    return true;
}

const wchar_t kWideReplacement = L'?';
const char kNarrowReplacement = '?';

// Converts narrow input to wide output; returns the number of elements written.
uint32_t ToWide(const char* input, const char* inputEnd, const char* charset, wchar_t* output,
                wchar_t* outputEnd) {
    const uint32_t inputBytes = Length(input, inputEnd);
    const uint32_t room = Length(output, outputEnd);
    if (inputBytes == 0 || room == 0) {
        IConvDescriptor check(kWideCharset, OrLocale(charset));  // an unknown set is still refused
        return 0;
    }
    uint32_t written = 0;
    if (KeepsAsciiAsIs(OrLocale(charset)) && CopyAscii(input, inputBytes, output, room, written)) {
        return written;
    }
    const Direction direction{kWideCharset, OrLocale(charset), 1, &kWideReplacement,
                              sizeof(wchar_t)};
    const size_t bytes =
        Convert(direction, input, inputBytes, output, static_cast<size_t>(room) * sizeof(wchar_t));
    return static_cast<uint32_t>(bytes / sizeof(wchar_t));
}

// Converts wide input to narrow output; returns the number of bytes written.
uint32_t ToNarrow(const wchar_t* input, const wchar_t* inputEnd, char* output, char* outputEnd,
                  const char* charset) {
    const uint32_t inputElements = Length(input, inputEnd);
    const uint32_t room = Length(output, outputEnd);
    if (inputElements == 0 || room == 0) {
        IConvDescriptor check(OrLocale(charset), kWideCharset);
        return 0;
    }
    uint32_t written = 0;
    if (KeepsAsciiAsIs(OrLocale(charset)) &&
        CopyAscii(input, inputElements, output, room, written)) {
        return written;
    }
    const Direction direction{OrLocale(charset), kWideCharset, sizeof(wchar_t), &kNarrowReplacement,
                              1};
    return static_cast<uint32_t>(Convert(
        direction, input, static_cast<size_t>(inputElements) * sizeof(wchar_t), output, room));
}

}  // namespace

void IConv::NarrowToWide(const char* input, const char* inputEnd, const char* charset,
                         wchar_t* output, wchar_t*& outputEnd) {
    outputEnd = output + ToWide(input, inputEnd, charset, output, outputEnd);
}

uint32_t IConv::NarrowToWideCount(const char* input, const char* inputEnd, const char* charset,
                                  wchar_t* output, wchar_t* outputEnd) {
    return ToWide(input, inputEnd, charset, output, outputEnd);
}

std::unique_ptr<wchar_t[]> IConv::NarrowToWideNewArray(const char* input, const char* inputEnd,
                                                       const char* charset) {
    const uint32_t inputBytes = Length(input, inputEnd);
    // At most one element per input byte, plus the terminator.
    const uint32_t elements = SafeInteger::Add(inputBytes, 1);
    SafeInteger::Multiply(elements, sizeof(wchar_t));
    std::unique_ptr<wchar_t[]> result(new wchar_t[elements]);
    uint32_t written = 0;
    if (inputBytes != 0) {
        written = ToWide(input, inputEnd, charset, result.get(), result.get() + inputBytes);
    }
    result[written] = 0;
    return result;
}

std::unique_ptr<wchar_t[]> IConv::NarrowTextToWideNewArray(const char* text, uint32_t maxLength,
                                                           const char* charset) {
    if (text == nullptr) {
        return NarrowToWideNewArray(nullptr, nullptr, charset);
    }
    return NarrowToWideNewArray(text, text + strnlen(text, maxLength), charset);
}

void IConv::WideToNarrow(const wchar_t* input, const wchar_t* inputEnd, char* output,
                         char*& outputEnd, const char* charset) {
    outputEnd = output + ToNarrow(input, inputEnd, output, outputEnd, charset);
}

uint32_t IConv::WideToNarrowCount(const wchar_t* input, const wchar_t* inputEnd, char* output,
                                  char* outputEnd, const char* charset) {
    return ToNarrow(input, inputEnd, output, outputEnd, charset);
}

std::unique_ptr<char[]> IConv::WideToNarrowNewArray(const wchar_t* input, const wchar_t* inputEnd,
                                                    const char* charset) {
    const uint32_t inputElements = Length(input, inputEnd);
    // Four bytes per input element, plus the terminator.
    const uint32_t bytes = SafeInteger::Add(SafeInteger::Multiply(inputElements, 4), 1);
    std::unique_ptr<char[]> result(new char[bytes]);
    uint32_t written = 0;
    if (inputElements != 0) {
        written = ToNarrow(input, inputEnd, result.get(), result.get() + bytes - 1, charset);
    }
    result[written] = '\0';
    return result;
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
