#include "qv/zil/Utf8ToWide.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "qv/zil/Exceptions.h"
#include "qv/zil/SafeInteger.h"

#ifdef __SSE2__
#include <emmintrin.h>
#endif

namespace qv {
namespace zil {

using exception::BufferOverflow;
using exception::InvalidArgument;
using exception::InvalidSequence;

namespace {

using Byte = unsigned char;

constexpr ptrdiff_t kBlock = 16;  // bytes tested at once for ASCII

inline bool IsContinuation(uint32_t byte) { return (byte & 0xC0) == 0x80; }

// Decodes the 4- to 6-byte sequence whose lead byte is at p (lead >= 0xF0), with
// `left` bytes readable from p. Returns its length, or 0 when the sequence is rejected.
uint32_t DecodeLong(const Byte* p, ptrdiff_t left, uint32_t& codePoint) {
    const uint32_t lead = p[0];
    ptrdiff_t length;
    uint32_t value;
    uint32_t minimum;  // smallest first continuation byte that is not over-long
    if (lead < 0xF8) {
        length = 4;
        value = lead & 0x07;
        minimum = lead == 0xF0 ? 0x90 : 0x80;
    } else if (lead < 0xFC) {
        length = 5;
        value = lead & 0x03;
        minimum = lead == 0xF8 ? 0x88 : 0x80;
    } else if (lead < 0xFE) {
        length = 6;
        value = lead & 0x01;
        minimum = lead == 0xFC ? 0x84 : 0x80;
    } else {
        return 0;  // 0xFE and 0xFF never start a sequence
    }
    if (left < length || p[1] < minimum) {
        return 0;
    }
    for (ptrdiff_t i = 1; i < length; ++i) {
        const uint32_t c = p[i];
        if (!IsContinuation(c)) {
            return 0;
        }
        value = (value << 6) | (c & 0x3F);
    }
    codePoint = value;
    return static_cast<uint32_t>(length);
}

// Decodes the sequence at p (p < end, *p >= 0x80) byte by byte, never reading at or
// beyond end. Returns its length, or 0 when the sequence is rejected.
uint32_t DecodeMultiByte(const Byte* p, const Byte* end, uint32_t& codePoint) {
    const uint32_t lead = p[0];
    const ptrdiff_t left = end - p;
    if (lead >= 0xF0) {
        return DecodeLong(p, left, codePoint);
    }
    if (lead >= 0xE0) {
        if (left < 3) {
            return 0;
        }
        const uint32_t c1 = p[1];
        const uint32_t c2 = p[2];
        if (!IsContinuation(c1) || !IsContinuation(c2) || (lead == 0xE0 && c1 < 0xA0)) {
            return 0;
        }
        codePoint = ((lead & 0x0F) << 12) | ((c1 & 0x3F) << 6) | (c2 & 0x3F);
        return 3;
    }
    // 0x80 to 0xBF is a stray continuation byte, 0xC0 and 0xC1 start over-long forms.
    if (lead < 0xC2 || left < 2) {
        return 0;
    }
    const uint32_t c1 = p[1];
    if (!IsContinuation(c1)) {
        return 0;
    }
    codePoint = ((lead & 0x1F) << 6) | (c1 & 0x3F);
    return 2;
}

// The four bytes at p as one little-endian value, whatever the target's byte order
// (compilers turn this into a single load where that is allowed).
inline uint32_t Load4(const Byte* p) {
    return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 |
           static_cast<uint32_t>(p[2]) << 16 | static_cast<uint32_t>(p[3]) << 24;
}

// Masks over Load4 of a sequence's first bytes: the length markers of a lead byte and
// of its continuation bytes, then the payload bits of which at least one must be set for
// the form not to be over-long (leads 0xC0 and 0xC1; 0xE0 followed by less than 0xA0).
constexpr uint32_t kMarks2 = 0xC0E0, kLead2 = 0x80C0, kPayload2 = 0x1E;
constexpr uint32_t kMarks3 = 0xC0C0F0, kLead3 = 0x8080E0, kPayload3 = 0x200F;

inline bool IsTwoByte(uint32_t w) { return (w & kMarks2) == kLead2 && (w & kPayload2) != 0; }
inline bool IsThreeByte(uint32_t w) { return (w & kMarks3) == kLead3 && (w & kPayload3) != 0; }
inline uint32_t Value2(uint32_t w) { return ((w & 0x1F) << 6) | ((w >> 8) & 0x3F); }
inline uint32_t Value3(uint32_t w) {
    return ((w & 0x0F) << 12) | ((w & 0x3F00) >> 2) | ((w >> 16) & 0x3F);
}

// A mask over the kBlock bytes at p: 0 when all of them are ASCII, otherwise its lowest
// set bit is at the index of the first byte that is not.
inline uint32_t NonAscii(const Byte* p) {
#ifdef __SSE2__
    return static_cast<uint32_t>(
        _mm_movemask_epi8(_mm_loadu_si128(reinterpret_cast<const __m128i*>(p))));
#else
    uint64_t words[2];
    std::memcpy(words, p, sizeof(words));
    const uint64_t high = 0x8080808080808080ULL;
    if (((words[0] | words[1]) & high) == 0) {
        return 0;
    }
#if defined(__BYTE_ORDER__) && __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__
    if ((words[0] & high) != 0) {
        return 1u << (__builtin_ctzll(words[0] & high) / 8);
    }
    return 1u << (8 + __builtin_ctzll(words[1] & high) / 8);
#else
    uint32_t n = 0;
    while (p[n] < 0x80) {
        ++n;
    }
    return 1u << n;
#endif
#endif
}

// Stores decoded code points into [out, end).
class WideSink {
public:
    WideSink(wchar_t* out, wchar_t* end) : m_out(out), m_end(end) {}

    ptrdiff_t Room() const { return m_end - m_out; }
    void Put(uint32_t codePoint) { *m_out++ = static_cast<wchar_t>(codePoint); }
    void PutTwo(uint32_t first, uint32_t second) {
        m_out[0] = static_cast<wchar_t>(first);
        m_out[1] = static_cast<wchar_t>(second);
        m_out += 2;
    }
    // Widens the kBlock bytes at p and returns NonAscii(p). Only the elements before the
    // first non-ASCII byte count; Skip() moves past them, and the ones after are scratch
    // values that later stores overwrite.
    uint32_t Block(const Byte* p) {
#ifdef __SSE2__
        static_assert(sizeof(wchar_t) == 4, "wide elements hold 32 bits");
        const __m128i zero = _mm_setzero_si128();
        const __m128i bytes = _mm_loadu_si128(reinterpret_cast<const __m128i*>(p));
        const __m128i low = _mm_unpacklo_epi8(bytes, zero);
        const __m128i high = _mm_unpackhi_epi8(bytes, zero);
        __m128i* out = reinterpret_cast<__m128i*>(m_out);
        _mm_storeu_si128(out + 0, _mm_unpacklo_epi16(low, zero));
        _mm_storeu_si128(out + 1, _mm_unpackhi_epi16(low, zero));
        _mm_storeu_si128(out + 2, _mm_unpacklo_epi16(high, zero));
        _mm_storeu_si128(out + 3, _mm_unpackhi_epi16(high, zero));
        return static_cast<uint32_t>(_mm_movemask_epi8(bytes));
#else
        for (ptrdiff_t i = 0; i < kBlock; ++i) {
            m_out[i] = static_cast<wchar_t>(p[i]);
        }
        return NonAscii(p);
#endif
    }
    void Skip(ptrdiff_t n) { m_out += n; }
    wchar_t* Position() const { return m_out; }

private:
    wchar_t* m_out;
    wchar_t* const m_end;
};

// Counts code points without storing them; never runs out of room.
class CountingSink {
public:
    ptrdiff_t Room() const { return PTRDIFF_MAX; }
    void Put(uint32_t) { ++m_count; }
    void PutTwo(uint32_t, uint32_t) { m_count += 2; }
    uint32_t Block(const Byte* p) { return NonAscii(p); }
    void Skip(ptrdiff_t n) { m_count += static_cast<size_t>(n); }
    size_t Count() const { return m_count; }

private:
    size_t m_count = 0;
};

// Decodes [p, end) into the sink until either runs out. On a rejected sequence p stands
// on it, everything before it has gone to the sink, and false is returned.
template <typename Sink>
bool Scan(const Byte*& pRef, const Byte* end, Sink& sink) {
    const Byte* p = pRef;
    bool ok = true;
    while (p < end && sink.Room() > 0) {
        if (*p < 0x80) {
            // A run of ASCII, a block at a time while both sides have room for one. The
            // all-ASCII case is a branch of its own, so that the next block does not wait
            // for this one to be tested.
            while (end - p >= kBlock && sink.Room() >= kBlock) {
                const uint32_t nonAscii = sink.Block(p);
                if (nonAscii == 0) {
                    p += kBlock;
                    sink.Skip(kBlock);
                    continue;
                }
                const int n = __builtin_ctz(nonAscii);
                p += n;
                sink.Skip(n);
                // A lone two-byte sequence followed by ASCII, as accented letters come in
                // Latin text, is taken here and the blocks go on without leaving the loop.
                // Its four bytes lie inside the block just tested.
                if (n <= kBlock - 4) {
                    const uint32_t w = Load4(p);
                    if (IsTwoByte(w) && (w & 0x800000) == 0) {
                        sink.Put(Value2(w));
                        p += 2;
                        continue;
                    }
                }
                break;
            }
            while (p < end && sink.Room() > 0 && *p < 0x80) {
                sink.Put(*p++);
            }
            if (p == end || sink.Room() == 0) {
                break;
            }
        }
        // A run of multi-byte sequences. Where four bytes can be read at once, the two-
        // and three-byte forms are checked and decoded from them with masks; the longer
        // forms, rejected ones and those near the end go through the byte-wise decoder.
        do {
            while (end - p >= 7 && sink.Room() >= 2) {  // pairs of CJK characters
                const uint32_t first = Load4(p);
                const uint32_t second = Load4(p + 3);
                if (!IsThreeByte(first) || !IsThreeByte(second)) {
                    break;
                }
                sink.PutTwo(Value3(first), Value3(second));
                p += 6;
            }
            if (p == end || sink.Room() == 0 || *p < 0x80) {
                break;
            }
            const uint32_t w = end - p >= 4 ? Load4(p) : 0;
            uint32_t codePoint;
            uint32_t length;
            if (IsThreeByte(w)) {
                codePoint = Value3(w);
                length = 3;
            } else if (IsTwoByte(w)) {
                codePoint = Value2(w);
                length = 2;
            } else {
                length = DecodeMultiByte(p, end, codePoint);
                if (length == 0) {
                    ok = false;
                    break;
                }
            }
            sink.Put(codePoint);
            p += length;
        } while (p < end && sink.Room() > 0 && *p >= 0x80);
        if (!ok) {
            break;
        }
    }
    pRef = p;
    return ok;
}

inline const Byte* AsBytes(const char* p) { return reinterpret_cast<const Byte*>(p); }

}  // namespace

uint32_t Utf8ToWide::DecodeOne(const char* input, const char* end, wchar_t* output,
                               bool measureOnly) {
    if (input == nullptr || input >= end) {
        QV_THROW(InvalidSequence());
    }
    if (!measureOnly && output == nullptr) {
        QV_THROW(InvalidArgument());
    }
    const Byte* p = AsBytes(input);
    uint32_t codePoint = *p;
    uint32_t length = 1;
    if (codePoint >= 0x80) {
        length = DecodeMultiByte(p, AsBytes(end), codePoint);
        if (length == 0) {
            QV_THROW(InvalidSequence());
        }
    }
    if (!measureOnly) {
        *output = static_cast<wchar_t>(codePoint);
    }
    return length;
}

uint32_t Utf8ToWide::Count(const char* input, const char* end) {
    if (input == nullptr || input >= end) {
        return 0;
    }
    const Byte* p = AsBytes(input);
    CountingSink sink;
    if (!Scan(p, AsBytes(end), sink)) {
        QV_THROW(InvalidSequence());
    }
    return SafeInteger::FromSigned(static_cast<int64_t>(sink.Count()));
}

const char* Utf8ToWide::DecodeNext(const char* input, const char* end, wchar_t& output) {
    if (input == nullptr || input >= end) {
        output = 0;
        return input;
    }
    return input + DecodeOne(input, end, &output, false);
}

uint32_t Utf8ToWide::ConvertRange(const char*& input, const char* end, wchar_t* output,
                                  wchar_t* outputEnd) {
    if (output == nullptr || output > outputEnd) {
        QV_THROW(InvalidArgument());
    }
    if (input == nullptr) {
        return 0;
    }
    const Byte* p = AsBytes(input);
    WideSink sink(output, outputEnd);
    const bool ok = Scan(p, AsBytes(end), sink);
    input = reinterpret_cast<const char*>(p);
    if (!ok) {
        QV_THROW(InvalidSequence());
    }
    return SafeInteger::FromSigned(sink.Position() - output);
}

uint32_t Utf8ToWide::ConvertAll(const char*& input, const char* end, wchar_t* output,
                                wchar_t* outputEnd) {
    const uint32_t written = ConvertRange(input, end, output, outputEnd);
    if (input != nullptr && input < end) {
        QV_THROW(BufferOverflow());
    }
    return written;
}

std::unique_ptr<wchar_t[]> Utf8ToWide::ToNewArray(const char* input, uint32_t length) {
    const char* end = input == nullptr ? nullptr : input + length;
    const uint32_t count = Count(input, end);
    const uint32_t elements = SafeInteger::Add(count, 1);
    SafeInteger::Multiply(elements, sizeof(wchar_t));  // the block's size in bytes must fit too
    std::unique_ptr<wchar_t[]> result(new wchar_t[elements]);
    if (count != 0) {
        ConvertAll(input, end, result.get(), result.get() + count);
    }
    result[count] = 0;
    return result;
}

}  // namespace zil
}  // namespace qv
