#include "qv/zil/osdep/OSException.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

#include "qv/zil/osdep/PosixError.h"

using qv::zil::ByteString;
using qv::zil::osdep::OSException;
using qv::zil::osdep::PosixError;

TEST(OSException, DefaultAndGiven) {
    const OSException unknown;
    EXPECT_STREQ("Unknown error", unknown.what());
    EXPECT_EQ(42, unknown.GetCode());
    EXPECT_EQ(0, unknown.GetNativeError());

    const OSException given(ByteString("mount failed"), 5);
    EXPECT_STREQ("mount failed", given.what());
    EXPECT_EQ(5, given.GetNativeError());
}

TEST(PosixError, MapsErrorNumbersToCodes) {
    const PosixError noEntry(ENOENT);
    EXPECT_EQ(7, noEntry.GetCode());
    EXPECT_EQ(2, noEntry.GetNativeError());
    EXPECT_STREQ(std::strerror(ENOENT), noEntry.what());

    EXPECT_EQ(0, PosixError(0).GetCode());
    EXPECT_EQ(42, PosixError(EACCES).GetCode());
    EXPECT_EQ(42, PosixError(ByteString("custom"), EAGAIN).GetCode());
    EXPECT_STREQ("custom", PosixError(ByteString("custom"), EAGAIN).what());

    errno = EPERM;
    const PosixError current;
    EXPECT_EQ(EPERM, current.GetNativeError());
    EXPECT_STREQ(std::strerror(EPERM), current.what());

    // Caught as the foundation's root class.
    EXPECT_THROW(throw PosixError(EINVAL), qv::zil::exception::Exception);
}
