#include "qv/zil/osdep/IntegerToString.h"

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace osdep {

namespace {

const wchar_t kDigits[] = L"0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZ";

template <typename U>
WideString FormatUnsigned(U value, uint32_t radix) {
    if (radix == 0) {
        QV_THROW(exception::UnableToConvert());
    }
    // One element per bit, plus the terminator that stays 0.
    constexpr uint32_t kBits = sizeof(U) * 8;
    wchar_t digits[kBits + 1];
    wchar_t* position = digits + kBits;
    *position = 0;
    if (radix == 10) {
        // The common case, with a constant divisor the compiler turns into a multiply.
        do {
            *--position = kDigits[value % 10];
            value = static_cast<U>(value / 10);
        } while (value != 0);
    } else {
        do {
            if (position == digits) {
                QV_THROW(exception::UnableToConvert());
            }
            *--position = Digit(static_cast<uint32_t>(value % radix), radix);
            value = static_cast<U>(value / radix);
        } while (value != 0);
    }
    return WideString(position, static_cast<uint32_t>(digits + kBits - position));
}

template <typename S>
WideString FormatSigned(S value, uint32_t radix) {
    using U = std::make_unsigned_t<S>;
    if (radix == 10 && value < 0) {
        // The two's-complement negation, exact for the most negative value too.
        const U magnitude = static_cast<U>(U(0) - static_cast<U>(value));
        return WideString(L"-") + FormatUnsigned(magnitude, radix);
    }
    return FormatUnsigned(static_cast<U>(value), radix);
}

}  // namespace

wchar_t Digit(uint32_t value, uint32_t radix) {
    if (radix < 2 || radix > 36 || value >= radix) {
        QV_THROW(exception::UnableToConvert());
    }
    return kDigits[value];
}

WideString IntegerToString(uint8_t value, uint32_t radix) { return FormatUnsigned(value, radix); }
WideString IntegerToString(uint16_t value, uint32_t radix) { return FormatUnsigned(value, radix); }
WideString IntegerToString(uint32_t value, uint32_t radix) { return FormatUnsigned(value, radix); }
WideString IntegerToString(uint64_t value, uint32_t radix) { return FormatUnsigned(value, radix); }
WideString IntegerToString(int8_t value, uint32_t radix) { return FormatSigned(value, radix); }
WideString IntegerToString(int16_t value, uint32_t radix) { return FormatSigned(value, radix); }
WideString IntegerToString(int32_t value, uint32_t radix) { return FormatSigned(value, radix); }
WideString IntegerToString(int64_t value, uint32_t radix) { return FormatSigned(value, radix); }

}  // namespace osdep
}  // namespace zil
}  // namespace qv
