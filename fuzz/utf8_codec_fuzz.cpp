// Fuzz target: the UTF-8 codec. The input read as UTF-8: Utf8ToWide::Count, then
// ConvertAll into exactly that many elements, checked against the byte-wise decoder
// (DecodeNext); what decoded encodes back with WideToUtf8 to exactly the input (the
// decoder accepts only shortest forms) and decodes again to the same wide text. Malformed
// input must be refused alike by Count, ConvertRange and DecodeNext with InvalidSequence.
// The input read as wide elements: WideToUtf8::Measure, ConvertAll and a decode back,
// in which every element of 0x80000000 or above reads "?".
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "qv/zil/Utf8ToWide.h"
#include "qv/zil/WideToUtf8.h"

namespace {

using qv::zil::Utf8ToWide;
using qv::zil::WideToUtf8;
using qv::zil::exception::InvalidSequence;

void Check(bool condition, const char* what) {
    if (!condition) {
        std::fprintf(stderr, "utf8_codec_fuzz: %s\n", what);
        std::abort();
    }
}

// The code points of [begin, end) one sequence at a time; false when DecodeNext refuses one.
bool DecodeBytewise(const char* begin, const char* end, std::vector<wchar_t>& out) {
    out.clear();
    try {
        for (const char* p = begin; p < end;) {
            wchar_t c = 0;
            p = Utf8ToWide::DecodeNext(p, end, c);
            out.push_back(c);
        }
    } catch (const InvalidSequence&) {
        return false;
    }
    return true;
}

std::vector<char> Encode(const wchar_t* begin, const wchar_t* end) {
    const uint32_t length = WideToUtf8::Measure(begin, end);
    std::vector<char> bytes(length);
    const wchar_t* input = begin;
    const uint32_t written =
        length == 0 ? 0 : WideToUtf8::ConvertAll(input, end, bytes.data(), bytes.data() + length);
    Check(written == length, "WideToUtf8 wrote another length than it measured");
    Check(length == 0 || input == end, "WideToUtf8 left input unread");
    return bytes;
}

void FuzzNarrowInput(const char* begin, const char* end) {
    std::vector<wchar_t> expected;
    const bool valid = DecodeBytewise(begin, end, expected);

    uint32_t count = 0;
    try {
        count = Utf8ToWide::Count(begin, end);
    } catch (const InvalidSequence&) {
        Check(!valid, "Count refused input that DecodeNext accepts");
        // ConvertRange must refuse it too, after storing what came before the fault.
        std::vector<wchar_t> out(static_cast<size_t>(end - begin) + 1);
        const char* input = begin;
        bool refused = false;
        try {
            Utf8ToWide::ConvertRange(input, end, out.data(), out.data() + out.size());
        } catch (const InvalidSequence&) {
            refused = true;
        }
        Check(refused, "ConvertRange accepted input that Count refuses");
        return;
    }
    Check(valid, "Count accepted input that DecodeNext refuses");
    Check(count == expected.size(), "Count differs from the byte-wise decoder");

    // Exactly count elements, and no more: ASan catches a write past them.
    std::unique_ptr<wchar_t[]> wide(new wchar_t[count == 0 ? 1 : count]);
    const char* input = begin;
    const uint32_t converted = Utf8ToWide::ConvertAll(input, end, wide.get(), wide.get() + count);
    Check(converted == count, "ConvertAll wrote another number of elements than Count");
    Check(input == end, "ConvertAll left input unread");
    Check(count == 0 || std::memcmp(wide.get(), expected.data(), count * sizeof(wchar_t)) == 0,
          "ConvertAll differs from the byte-wise decoder");

    const std::vector<char> bytes = Encode(wide.get(), wide.get() + count);
    Check(bytes.size() == static_cast<size_t>(end - begin) &&
              (bytes.empty() || std::memcmp(bytes.data(), begin, bytes.size()) == 0),
          "decoded text encodes to other bytes than it was decoded from");

    const char* again = bytes.data();
    const char* againEnd = again + bytes.size();
    std::unique_ptr<wchar_t[]> wideAgain(new wchar_t[count == 0 ? 1 : count]);
    Check(Utf8ToWide::Count(again, againEnd) == count, "re-encoded text counts differently");
    Utf8ToWide::ConvertAll(again, againEnd, wideAgain.get(), wideAgain.get() + count);
    Check(count == 0 || std::memcmp(wideAgain.get(), wide.get(), count * sizeof(wchar_t)) == 0,
          "re-encoded text decodes to another wide text");

    const std::unique_ptr<wchar_t[]> array =
        Utf8ToWide::ToNewArray(begin, static_cast<uint32_t>(end - begin));
    Check(array[count] == 0 &&
              (count == 0 || std::memcmp(array.get(), wide.get(), count * sizeof(wchar_t)) == 0),
          "ToNewArray differs from ConvertAll");
}

void FuzzWideInput(const uint8_t* data, size_t size) {
    const size_t n = size / sizeof(wchar_t);
    std::unique_ptr<wchar_t[]> wide(new wchar_t[n == 0 ? 1 : n]);
    if (n != 0) {
        std::memcpy(wide.get(), data, n * sizeof(wchar_t));
    }
    const std::vector<char> bytes = Encode(wide.get(), wide.get() + n);

    std::vector<wchar_t> decoded;
    Check(DecodeBytewise(bytes.data(), bytes.data() + bytes.size(), decoded),
          "WideToUtf8 produced bytes that do not decode");
    Check(decoded.size() == n, "WideToUtf8 output decodes to another number of elements");
    for (size_t i = 0; i < n; ++i) {
        const uint32_t value = static_cast<uint32_t>(wide[i]);
        const wchar_t expected = value < 0x80000000u ? wide[i] : L'?';
        Check(decoded[i] == expected, "WideToUtf8 output decodes to other code points");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    // A copy of exactly the input, so that ASan sees every read past its end.
    std::vector<char> bytes(data, data + size);
    FuzzNarrowInput(bytes.data(), bytes.data() + bytes.size());
    FuzzWideInput(data, size);
    return 0;
}
