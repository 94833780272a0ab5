#include "qv/zil/WideToUtf8.h"

#include <cstddef>

#include "qv/zil/Exceptions.h"
#include "qv/zil/SafeInteger.h"

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace qv {
namespace zil {

using exception::BufferOverflow;
using exception::InvalidArgument;

namespace {

constexpr ptrdiff_t kBlock = 16;  // elements tested at once for ASCII
constexpr char kReplacement = '?';

// Code points are compared as unsigned 32-bit values: wchar_t is signed on some targets.
inline uint32_t Value(wchar_t element) { return static_cast<uint32_t>(element); }

// Length of the sequence for v, or 0 when v cannot be encoded.
inline uint32_t LengthOf(uint32_t v) {
    if (v < 0x80) {
        return 1;
    }
    if (v < 0x800) {
        return 2;
    }
    if (v < 0x10000) {
        return 3;
    }
    if (v < 0x200000) {
        return 4;
    }
    if (v < 0x4000000) {
        return 5;
    }
    return v < 0x80000000 ? 6 : 0;
}

// Writes the `length`-byte sequence of v at out: the lead byte carries the length
// marker and the top bits, each continuation byte six bits, most significant first.
inline void Write(char* out, uint32_t v, uint32_t length) {
    static constexpr unsigned char kLeadMark[7] = {0, 0x00, 0xC0, 0xE0, 0xF0, 0xF8, 0xFC};
    for (uint32_t i = length - 1; i > 0; --i) {
        out[i] = static_cast<char>(0x80 | (v & 0x3F));
        v >>= 6;
    }
    out[0] = static_cast<char>(kLeadMark[length] | v);
}

// Number of leading elements below 0x80 among the kBlock elements at in (kBlock when
// all are). When it is not 0, those elements have been narrowed to out; the bytes
// after them in [out, out + kBlock) hold scratch values.
inline uint32_t NarrowAscii(const wchar_t* in, char* out) {
#ifdef __SSE2__
    static_assert(sizeof(wchar_t) == 4, "wide elements hold 32 bits");
    const __m128i* source = reinterpret_cast<const __m128i*>(in);
    const __m128i a = _mm_loadu_si128(source + 0);
    const __m128i b = _mm_loadu_si128(source + 1);
    const __m128i c = _mm_loadu_si128(source + 2);
    const __m128i d = _mm_loadu_si128(source + 3);
    const __m128i high = _mm_set1_epi32(static_cast<int>(0xFFFFFF80u));
    const __m128i zero = _mm_setzero_si128();
    // One 0xFF byte per ASCII element, in element order.
    const __m128i asciiWords = _mm_packs_epi32(_mm_cmpeq_epi32(_mm_and_si128(a, high), zero),
                                               _mm_cmpeq_epi32(_mm_and_si128(b, high), zero));
    const __m128i asciiWords2 = _mm_packs_epi32(_mm_cmpeq_epi32(_mm_and_si128(c, high), zero),
                                                _mm_cmpeq_epi32(_mm_and_si128(d, high), zero));
    const unsigned ascii =
        static_cast<unsigned>(_mm_movemask_epi8(_mm_packs_epi16(asciiWords, asciiWords2)));
    if ((ascii & 1) == 0) {
        return 0;
    }
    // Values that are not ASCII saturate to scratch bytes; only the prefix counts.
    const __m128i bytes = _mm_packus_epi16(_mm_packs_epi32(a, b), _mm_packs_epi32(c, d));
    _mm_storeu_si128(reinterpret_cast<__m128i*>(out), bytes);
    return ascii == 0xFFFF ? kBlock : static_cast<uint32_t>(__builtin_ctz(~ascii));
#else
    uint32_t any = 0;
    for (ptrdiff_t i = 0; i < kBlock; ++i) {
        any |= Value(in[i]);
    }
    if (any < 0x80) {
        for (ptrdiff_t i = 0; i < kBlock; ++i) {
            out[i] = static_cast<char>(in[i]);
        }
        return kBlock;
    }
    uint32_t n = 0;
    while (Value(in[n]) < 0x80) {
        out[n] = static_cast<char>(in[n]);
        ++n;
    }
    return n;
#endif
}

inline bool AllAscii(const wchar_t* in) {
    uint32_t any = 0;
    for (ptrdiff_t i = 0; i < kBlock; ++i) {
        any |= Value(in[i]);
    }
    return any < 0x80;
}

}  // namespace

int32_t WideToUtf8::EncodeOne(char* output, char* outputEnd, wchar_t codePoint, bool measureOnly) {
    const uint32_t v = Value(codePoint);
    const uint32_t length = LengthOf(v);
    if (length == 0) {
        return kCannotEncode;
    }
    if (measureOnly) {
        return static_cast<int32_t>(length);
    }
    if (output == nullptr || outputEnd < output ||
        static_cast<size_t>(outputEnd - output) < length) {
        return kNoRoom;
    }
    Write(output, v, length);
    return static_cast<int32_t>(length);
}

uint32_t WideToUtf8::Measure(const wchar_t* input, const wchar_t* end, uint32_t limit) {
    if (input == nullptr || input >= end) {
        return 0;
    }
    uint32_t sum = 0;
    while (input < end) {
        if (end - input >= kBlock && limit - sum >= kBlock && AllAscii(input)) {
            input += kBlock;
            sum += kBlock;
            continue;
        }
        const uint32_t length = LengthOf(Value(*input));
        const uint32_t bytes = length == 0 ? 1 : length;  // "?" stands in for the unencodable
        if (bytes > limit - sum) {
            break;
        }
        sum += bytes;
        ++input;
    }
    return sum;
}

uint32_t WideToUtf8::ConvertRange(const wchar_t*& input, const wchar_t* end, char* output,
                                  char* outputEnd) {
    if (output == nullptr || output > outputEnd) {
        QV_THROW(InvalidArgument());
    }
    if (input == nullptr) {
        return 0;
    }
    const wchar_t* in = input;
    char* out = output;
    while (in < end && out < outputEnd) {
        uint32_t v = Value(*in);
        if (v < 0x80) {
            // A run of ASCII: whole blocks while both sides have room for one.
            while (end - in >= kBlock && outputEnd - out >= kBlock) {
                const uint32_t n = NarrowAscii(in, out);
                in += n;
                out += n;
                if (n != kBlock) {
                    break;
                }
            }
            while (in < end && out < outputEnd && Value(*in) < 0x80) {
                *out++ = static_cast<char>(*in++);
            }
            continue;
        }
        // A run of multi-byte sequences; two- and three-byte ones, the common cases of
        // Latin and CJK text, are written directly.
        bool full = false;
        do {
            const ptrdiff_t room = outputEnd - out;
            if (v < 0x800 && room >= 2) {
                out[0] = static_cast<char>(0xC0 | (v >> 6));
                out[1] = static_cast<char>(0x80 | (v & 0x3F));
                out += 2;
            } else if (v - 0x800 < 0x10000 - 0x800 && room >= 3) {
                out[0] = static_cast<char>(0xE0 | (v >> 12));
                out[1] = static_cast<char>(0x80 | ((v >> 6) & 0x3F));
                out[2] = static_cast<char>(0x80 | (v & 0x3F));
                out += 3;
            } else {
                const uint32_t length = LengthOf(v);
                if (length == 0) {
                    *out++ = kReplacement;
                } else if (room < static_cast<ptrdiff_t>(length)) {
                    full = true;  // the code point stays unread
                    break;
                } else {
                    Write(out, v, length);
                    out += length;
                }
            }
            ++in;
        } while (in < end && out < outputEnd && (v = Value(*in)) >= 0x80);
        if (full) {
            break;
        }
    }
    input = in;
    return SafeInteger::FromSigned(out - output);
}

uint32_t WideToUtf8::ConvertAll(const wchar_t*& input, const wchar_t* end, char* output,
                                char* outputEnd) {
    const uint32_t written = ConvertRange(input, end, output, outputEnd);
    if (input != nullptr && input < end) {
        QV_THROW(BufferOverflow());
    }
    return written;
}

std::unique_ptr<char[]> WideToUtf8::ToNewArray(const wchar_t* input, const wchar_t* end) {
    const uint32_t length = Measure(input, end);
    std::unique_ptr<char[]> result(new char[SafeInteger::Add(length, 1)]);
    if (length != 0) {
        ConvertAll(input, end, result.get(), result.get() + length);
    }
    result[length] = '\0';
    return result;
}

}  // namespace zil
}  // namespace qv
