// Formats integers of every standard width as wide text in a radix from 2 to 36:
// upper-case digits, no prefix, padding or grouping. Negative values carry a "-" only
// in radix 10; in every other radix they print as their two's-complement bit pattern.
// A radix outside 2 to 36 throws UnableToConvert.
#pragma once

#include <cstdint>
#include <type_traits>

#include "qv/zil/StringBase.h"

namespace qv {
namespace zil {
namespace osdep {

// The digit for `value`; throws UnableToConvert unless 2 <= radix <= 36 and value < radix.
wchar_t Digit(uint32_t value, uint32_t radix);

WideString IntegerToString(uint8_t value, uint32_t radix = 10);
WideString IntegerToString(uint16_t value, uint32_t radix = 10);
WideString IntegerToString(uint32_t value, uint32_t radix = 10);
WideString IntegerToString(uint64_t value, uint32_t radix = 10);
WideString IntegerToString(int8_t value, uint32_t radix = 10);
WideString IntegerToString(int16_t value, uint32_t radix = 10);
WideString IntegerToString(int32_t value, uint32_t radix = 10);
WideString IntegerToString(int64_t value, uint32_t radix = 10);

namespace detail {
template <std::size_t Bytes, bool Signed>
struct FixedWidth;
template <>
struct FixedWidth<1, false> {
    using type = uint8_t;
};
template <>
struct FixedWidth<2, false> {
    using type = uint16_t;
};
template <>
struct FixedWidth<4, false> {
    using type = uint32_t;
};
template <>
struct FixedWidth<8, false> {
    using type = uint64_t;
};
template <>
struct FixedWidth<1, true> {
    using type = int8_t;
};
template <>
struct FixedWidth<2, true> {
    using type = int16_t;
};
template <>
struct FixedWidth<4, true> {
    using type = int32_t;
};
template <>
struct FixedWidth<8, true> {
    using type = int64_t;
};

template <typename T>
using FixedWidthOf = typename FixedWidth<sizeof(T), std::is_signed<T>::value>::type;

template <typename T>
constexpr bool kNeedsForwarding = std::is_integral<T>::value && !std::is_same<T, bool>::value &&
                                  !std::is_same<T, FixedWidthOf<T>>::value;
}  // namespace detail

// Integer types that are none of the eight above (long on 32-bit targets, long long,
// char) format as the fixed-width type of the same size and signedness.
template <typename T, std::enable_if_t<detail::kNeedsForwarding<T>, int> = 0>
WideString IntegerToString(T value, uint32_t radix = 10) {
    return IntegerToString(static_cast<detail::FixedWidthOf<T>>(value), radix);
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
