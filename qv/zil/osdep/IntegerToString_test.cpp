#include "qv/zil/osdep/IntegerToString.h"

#include <gtest/gtest.h>

#include <climits>

#include "qv/zil/Exceptions.h"

using qv::zil::WideString;
using qv::zil::exception::UnableToConvert;
using qv::zil::osdep::Digit;
using qv::zil::osdep::IntegerToString;

namespace {
std::wstring Text(const WideString& s) { return std::wstring(s.data(), s.size()); }
}  // namespace

TEST(IntegerToString, UnsignedInEveryRadix) {
    EXPECT_EQ(L"FF", Text(IntegerToString(uint32_t{255}, 16)));
    EXPECT_EQ(L"0", Text(IntegerToString(uint32_t{0}, 2)));
    EXPECT_EQ(L"Z", Text(IntegerToString(uint32_t{35}, 36)));
    EXPECT_EQ(std::wstring(32, L'1'), Text(IntegerToString(uint32_t{0xFFFFFFFF}, 2)));
    EXPECT_EQ(std::wstring(64, L'1'), Text(IntegerToString(UINT64_MAX, 2)));
    EXPECT_EQ(L"18446744073709551615", Text(IntegerToString(UINT64_MAX, 10)));
    EXPECT_EQ(L"3W5E11264SGSF", Text(IntegerToString(UINT64_MAX, 36)));
    EXPECT_EQ(L"255", Text(IntegerToString(uint8_t{255})));
    EXPECT_EQ(L"65535", Text(IntegerToString(uint16_t{65535})));
    EXPECT_EQ(L"10", Text(IntegerToString(uint32_t{36}, 36)));
}

TEST(IntegerToString, SignOnlyInRadixTen) {
    EXPECT_EQ(L"-5", Text(IntegerToString(int32_t{-5}, 10)));
    EXPECT_EQ(L"FFFFFFFB", Text(IntegerToString(int32_t{-5}, 16)));
    EXPECT_EQ(L"FF", Text(IntegerToString(int8_t{-1}, 16)));
    EXPECT_EQ(L"-1", Text(IntegerToString(int16_t{-1}, 10)));
    EXPECT_EQ(L"1111111111111111", Text(IntegerToString(int16_t{-1}, 2)));
    EXPECT_EQ(L"-128", Text(IntegerToString(int8_t{-128}, 10)));
    EXPECT_EQ(L"-2147483648", Text(IntegerToString(int32_t{INT32_MIN}, 10)));
    EXPECT_EQ(L"-9223372036854775808", Text(IntegerToString(int64_t{INT64_MIN}, 10)));
    EXPECT_EQ(L"9223372036854775807", Text(IntegerToString(int64_t{INT64_MAX}, 10)));
    EXPECT_EQ(L"0", Text(IntegerToString(int64_t{0}, 10)));
}

TEST(IntegerToString, LongAndCharFollowTheirWidth) {
    // long is 32 bits on the target and 64 bits here; both must format by their width.
    EXPECT_EQ(L"-7", Text(IntegerToString(-7L)));
    EXPECT_EQ(sizeof(long) == 4 ? L"FFFFFFF9" : L"FFFFFFFFFFFFFFF9",
              Text(IntegerToString(-7L, 16)));
    EXPECT_EQ(L"4294967295", Text(IntegerToString(static_cast<unsigned long>(UINT32_MAX))));
    EXPECT_EQ(L"-1", Text(IntegerToString(-1LL)));
    EXPECT_EQ(L"65", Text(IntegerToString('A')));
}

TEST(IntegerToString, RadixOutsideTwoToThirtySixThrows) {
    for (uint32_t radix : {0u, 1u, 37u, 0xFFFFFFFFu}) {
        EXPECT_THROW(IntegerToString(uint32_t{0}, radix), UnableToConvert) << radix;
        EXPECT_THROW(IntegerToString(int64_t{-5}, radix), UnableToConvert) << radix;
        EXPECT_THROW(IntegerToString(uint8_t{200}, radix), UnableToConvert) << radix;
    }
    EXPECT_THROW(Digit(10, 10), UnableToConvert);
    EXPECT_EQ(L'9', Digit(9, 10));
    try {
        IntegerToString(uint32_t{1}, 37);
    } catch (const UnableToConvert& e) {
        EXPECT_STREQ("qv/zil/osdep/IntegerToString.cpp", e.file);
        EXPECT_STREQ("Unable to convert.", e.what());
    }
}
