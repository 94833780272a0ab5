#include "qv/zil/osdep/MonotonicClock.h"

#include <gtest/gtest.h>

#include <ctime>

#include "qv/zil/osdep/Event.h"

using qv::zil::osdep::MonotonicClock;

TEST(MonotonicClock, ProductDoesNotOverflowSixtyFourBits) {
    constexpr uint64_t kMax = 0xFFFFFFFFFFFFFFFFu;
    EXPECT_EQ(kMax, MonotonicClock::MulDiv96(kMax, 1000000000u, 1000000000u));
    EXPECT_EQ(kMax / 1000000u, MonotonicClock::MulDiv96(kMax, 1000u, 1000000000u));
    EXPECT_EQ(kMax / 100u, MonotonicClock::MulDiv96(kMax, 10000000u, 1000000000u));
    EXPECT_EQ(0u, MonotonicClock::MulDiv96(kMax, 0u, 1000000000u));
    EXPECT_EQ(0u, MonotonicClock::MulDiv96(999999999u, 1u, 1000000000u));
    EXPECT_EQ(1u, MonotonicClock::MulDiv96(1000000000u, 1u, 1000000000u));
    // 2^63 ns scaled to 100 ns ticks: the plain 64-bit product would wrap.
    EXPECT_EQ((uint64_t{1} << 63) / 100u,
              MonotonicClock::MulDiv96(uint64_t{1} << 63, 10000000u, 1000000000u));
#ifdef __SIZEOF_INT128__
    uint64_t value = 0x9E3779B97F4A7C15u;
    for (int i = 0; i < 1000; ++i) {
        value = value * 6364136223846793005u + 1442695040888963407u;
        for (const uint64_t factor : {1u, 1000u, 1000000u, 10000000u, 1000000000u}) {
            const unsigned __int128 exact =
                static_cast<unsigned __int128>(value) * factor / 1000000000u;
            EXPECT_EQ(static_cast<uint64_t>(exact),
                      MonotonicClock::MulDiv96(value, factor, 1000000000u));
        }
    }
#endif
}

TEST(MonotonicClock, UnitsAgreeWithTheClock) {
    const MonotonicClock clock;
    timespec before{};
    clock_gettime(CLOCK_MONOTONIC, &before);
    const uint64_t seconds = clock.Now(1000000000u);
    const uint64_t nanoseconds = clock.Now(1u);
    const uint64_t milliseconds = clock.Now(1000000u);
    const uint64_t ticks = clock.Now(100u);
    timespec after{};
    clock_gettime(CLOCK_MONOTONIC, &after);

    EXPECT_GE(seconds, static_cast<uint64_t>(before.tv_sec));
    EXPECT_LE(seconds, static_cast<uint64_t>(after.tv_sec));
    EXPECT_LE(seconds, nanoseconds / 1000000000u);
    EXPECT_LE(nanoseconds / 1000000u, milliseconds);
    EXPECT_LE(milliseconds * 10000u, ticks + 10000u);
    EXPECT_LE(milliseconds, static_cast<uint64_t>(after.tv_sec) * 1000u + after.tv_nsec / 1000000);
    EXPECT_EQ(0u, clock.Now(0u));
}

TEST(MonotonicClock, MillisecondsGrowWithElapsedTime) {
    const MonotonicClock clock;
    qv::zil::osdep::Event never;
    const uint64_t start = clock.Now(1000000u);
    never.Wait(200);
    const uint64_t elapsed = clock.Now(1000000u) - start;
    EXPECT_GE(elapsed, 200u);
    EXPECT_LT(elapsed, 2000u);
}
