#include "basic_thread/gnu/internal/TimingPlatform.h"

#include <gtest/gtest.h>

using mthread::TimingPlatform;

namespace {
timespec Deadline(time_t seconds, suseconds_t microseconds, uint32_t timeoutMs) {
    timeval now{};
    now.tv_sec = seconds;
    now.tv_usec = microseconds;
    timespec deadline{};
    TimingPlatform::CalculateTimeout(&deadline, timeoutMs, now);
    return deadline;
}
}  // namespace

TEST(TimingPlatform, AddsMillisecondsAndCarriesIntoSeconds) {
    timespec d = Deadline(10, 999999, 1999);
    EXPECT_EQ(12, d.tv_sec);
    EXPECT_EQ(998999000L, d.tv_nsec);

    d = Deadline(10, 999999, 999);  // largest sum of both parts
    EXPECT_EQ(11, d.tv_sec);
    EXPECT_EQ(998999000L, d.tv_nsec);

    d = Deadline(10, 0, 1000);  // exactly one second, no carry
    EXPECT_EQ(11, d.tv_sec);
    EXPECT_EQ(0L, d.tv_nsec);

    d = Deadline(7, 1, 0);
    EXPECT_EQ(7, d.tv_sec);
    EXPECT_EQ(1000L, d.tv_nsec);

    d = Deadline(0, 0, 0xFFFFFFFE);  // the largest finite time-out
    EXPECT_EQ(4294967, d.tv_sec);
    EXPECT_EQ(294000000L, d.tv_nsec);
}

TEST(TimingPlatform, DeadlineFromTheRealTimeClock) {
    timeval before{};
    gettimeofday(&before, nullptr);
    timespec deadline{};
    TimingPlatform::CalculateTimeout(&deadline, 2500);
    timeval after{};
    gettimeofday(&after, nullptr);

    const long long lowest =
        (before.tv_sec + 2) * 1000000000LL + before.tv_usec * 1000LL + 500000000LL;
    const long long highest =
        (after.tv_sec + 2) * 1000000000LL + after.tv_usec * 1000LL + 500000000LL;
    const long long got = deadline.tv_sec * 1000000000LL + deadline.tv_nsec;
    EXPECT_GE(got, lowest);
    EXPECT_LE(got, highest);
    EXPECT_LT(deadline.tv_nsec, 1000000000L);
}

TEST(TimingPlatformDeathTest, NullDeadlineAborts) {
    EXPECT_DEATH(TimingPlatform::CalculateTimeout(nullptr, 5),
                 "gnu/internal/TimingPlatform:[0-9]+: .*timeout != __null");
}
