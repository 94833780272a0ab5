#include "qv/zil/StringCompare.h"

#include <cctype>
#include <cstring>
#include <cwchar>
#include <cwctype>

#include "qv/zil/Utf8ToWide.h"
#include "qv/zil/osdep/CharacterAttributes.h"

namespace qv {
namespace zil {

namespace {

// a - b without wrapping: exact for ordinary sizes, always of the right sign.
int32_t LengthDifference(int64_t a, int64_t b) {
    const int64_t difference = a - b;
    if (difference > INT32_MAX) {
        return INT32_MAX;
    }
    if (difference < INT32_MIN) {
        return INT32_MIN;
    }
    return static_cast<int32_t>(difference);
}

// The sign of comparing two elements as one-element wide strings.
int32_t ElementOrder(wchar_t a, wchar_t b) {
    if (a == b) {
        return 0;
    }
    return a < b ? -1 : 1;
}

int UpperByte(char c) { return std::toupper(static_cast<unsigned char>(c)); }

wchar_t UpperWide(wchar_t c) { return static_cast<wchar_t>(std::towupper(c)); }

}  // namespace

int32_t StringCompare::TextIgnoreCase(const char* a, const char* b) {
    a = a ? a : "";
    b = b ? b : "";
    for (; *a == *b && *a != '\0'; ++a, ++b) {
    }
    for (;; ++a, ++b) {
        const int upperA = UpperByte(*a);
        const int upperB = UpperByte(*b);
        if (upperA != upperB || *a == '\0') {
            return upperA - upperB;
        }
    }
}

int32_t StringCompare::Text(const char* a, const char* b) {
    return std::strcmp(a ? a : "", b ? b : "");
}

int32_t StringCompare::Ranges(const char* a, uint32_t aLength, const char* b, uint32_t bLength) {
    const uint32_t common = aLength < bLength ? aLength : bLength;
    for (uint32_t i = 0; i < common; ++i) {
        const int byteA = static_cast<unsigned char>(a[i]);
        const int byteB = static_cast<unsigned char>(b[i]);
        if (byteA != byteB) {
            return byteA - byteB;
        }
    }
    return LengthDifference(aLength, bLength);
}

int32_t StringCompare::RangesIgnoreCase(const char* a, uint32_t aLength, const char* b,
                                        uint32_t bLength) {
    const uint32_t common = aLength < bLength ? aLength : bLength;
    // Equal bytes fold to equal bytes: only from the first difference on is the locale asked.
    if (aLength == bLength && std::memcmp(a, b, aLength) == 0) {
        return 0;
    }
    uint32_t i = 0;
    while (i < common && a[i] == b[i]) {
        ++i;
    }
    for (; i < common; ++i) {
        const int upperA = UpperByte(a[i]);
        const int upperB = UpperByte(b[i]);
        if (upperA != upperB) {
            return upperA - upperB;
        }
    }
    return LengthDifference(aLength, bLength);
}

int32_t StringCompare::Text(const wchar_t* a, const wchar_t* b) {
    const int result = std::wcscmp(a ? a : L"", b ? b : L"");
    return result < 0 ? -1 : (result > 0 ? 1 : 0);
}

int32_t StringCompare::TextIgnoreCase(const wchar_t* a, const wchar_t* b) {
    a = a ? a : L"";
    b = b ? b : L"";
    for (; *a != 0 && *b != 0; ++a, ++b) {
        const int32_t order = ElementOrder(UpperWide(*a), UpperWide(*b));
        if (order != 0) {
            return order;
        }
    }
    return ElementOrder(*a, *b);
}

int32_t StringCompare::Ranges(const wchar_t* a, uint32_t aLength, const wchar_t* b,
                              uint32_t bLength) {
    const uint32_t common = aLength < bLength ? aLength : bLength;
    for (uint32_t i = 0; i < common; ++i) {
        const int32_t order = ElementOrder(a[i], b[i]);
        if (order != 0) {
            return order;
        }
    }
    return LengthDifference(aLength, bLength);
}

int32_t StringCompare::RangesIgnoreCase(const wchar_t* a, uint32_t aLength, const wchar_t* b,
                                        uint32_t bLength) {
    const uint32_t common = aLength < bLength ? aLength : bLength;
    for (uint32_t i = 0; i < common; ++i) {
        const int32_t order = ElementOrder(UpperWide(a[i]), UpperWide(b[i]));
        if (order != 0) {
            return order;
        }
    }
    return LengthDifference(aLength, bLength);
}

int32_t StringCompare::Utf8Ranges(const char* a, uint32_t aLength, const char* b, uint32_t bLength,
                                  bool ignoreCase) {
    const char* const aEnd = a + (a ? aLength : 0);
    const char* const bEnd = b + (b ? bLength : 0);
    const osdep::CharacterAttributes classic;
    while (a != aEnd && b != bEnd) {
        wchar_t codeA = 0;
        wchar_t codeB = 0;
        a = Utf8ToWide::DecodeNext(a, aEnd, codeA);
        b = Utf8ToWide::DecodeNext(b, bEnd, codeB);
        if (ignoreCase) {
            codeA = classic.ToUpper(codeA);
            codeB = classic.ToUpper(codeB);
        }
        const int32_t order = ElementOrder(codeA, codeB);
        if (order != 0) {
            return order;
        }
    }
    return LengthDifference(aEnd - a, bEnd - b);
}

}  // namespace zil
}  // namespace qv
