#include "qv/zil/SafeInteger.h"

#include <gtest/gtest.h>

#include "qv/zil/Exceptions.h"

using qv::zil::SafeInteger;
using qv::zil::exception::OutOfRange;

TEST(SafeInteger, AddStopsExactlyAtThe32BitLimit) {
    EXPECT_EQ(0xFFFFFFFFu, SafeInteger::Add(0xFFFFFFFFu, 0));
    EXPECT_EQ(0xFFFFFFFFu, SafeInteger::Add(0x80000000u, 0x7FFFFFFFu));
    EXPECT_THROW(SafeInteger::Add(0xFFFFFFFFu, 1), OutOfRange);
    EXPECT_THROW(SafeInteger::Add(1, 0xFFFFFFFFu), OutOfRange);
    EXPECT_THROW(SafeInteger::Add(0x80000000u, 0x80000000u), OutOfRange);
}

TEST(SafeInteger, MultiplyByElementSizes) {
    EXPECT_EQ(0xFFFFFFFCu, SafeInteger::Multiply(0x3FFFFFFFu, 4));
    EXPECT_THROW(SafeInteger::Multiply(0x40000000u, 4), OutOfRange);
    EXPECT_EQ(0xFFFFFFF8u, SafeInteger::Multiply(0x1FFFFFFFu, 8));
    EXPECT_THROW(SafeInteger::Multiply(0x20000000u, 8), OutOfRange);
    EXPECT_EQ(0u, SafeInteger::Multiply(0, 0xFFFFFFFFu));
    EXPECT_THROW(SafeInteger::Multiply(0x10000u, 0x10000u), OutOfRange);
}

TEST(SafeInteger, FromSignedRefusesNegativeAndTooLargeValues) {
    EXPECT_EQ(0u, SafeInteger::FromSigned(0));
    EXPECT_EQ(0xFFFFFFFFu, SafeInteger::FromSigned(0xFFFFFFFFll));
    EXPECT_THROW(SafeInteger::FromSigned(-1), OutOfRange);
    EXPECT_THROW(SafeInteger::FromSigned(INT64_MIN), OutOfRange);
    EXPECT_THROW(SafeInteger::FromSigned(0x100000000ll), OutOfRange);
}
