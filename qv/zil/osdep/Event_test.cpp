#include "qv/zil/osdep/Event.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include "qv/zil/osdep/MonotonicClock.h"

using qv::zil::osdep::Event;

TEST(Event, ManualResetStaysSetUntilReset) {
    Event event(true);
    EXPECT_FALSE(event.Wait(0));
    EXPECT_FALSE(event.TryWait());
    event.Set();
    for (int i = 0; i < 5; ++i) {
        EXPECT_TRUE(event.Wait(0));
        EXPECT_TRUE(event.TryWait());
        EXPECT_TRUE(event.Wait(10));
        EXPECT_TRUE(event.Wait(Event::kInfinite));
    }
    event.Wait();
    event.Reset();
    EXPECT_FALSE(event.Wait(0));
    EXPECT_FALSE(event.Wait(20));

    Event initiallySet(true, true);
    EXPECT_TRUE(initiallySet.TryWait());
    EXPECT_TRUE(initiallySet.TryWait());
}

TEST(Event, AutomaticResetLetsOneWaitThrough) {
    Event event;
    event.Set();
    event.Set();  // not counted
    EXPECT_TRUE(event.Wait(0));
    EXPECT_FALSE(event.Wait(0));
    event.Set();
    EXPECT_TRUE(event.TryWait());
    EXPECT_FALSE(event.TryWait());
    event.Set();
    EXPECT_TRUE(event.Wait(Event::kInfinite));
    EXPECT_FALSE(event.TryWait());
    event.Set();
    event.Reset();
    EXPECT_FALSE(event.TryWait());

    Event initiallySet(false, true);
    EXPECT_TRUE(initiallySet.Wait(10));
    EXPECT_FALSE(initiallySet.TryWait());
}

TEST(Event, TimedWaitOnAClearEventLastsItsTimeOnTheMonotonicClock) {
    Event event;
    const qv::zil::osdep::MonotonicClock clock;
    const uint64_t start = clock.Now(1000000);
    EXPECT_FALSE(event.Wait(1500));
    const uint64_t elapsed = clock.Now(1000000) - start;
    EXPECT_GE(elapsed, 1500u);
    EXPECT_LT(elapsed, 15000u);
}

TEST(Event, ManualSetReleasesEveryWaiter) {
    constexpr int kWaiters = 6;
    Event event(true);
    std::atomic<int> released{0};
    std::vector<std::thread> waiters;
    for (int w = 0; w < kWaiters; ++w) {
        waiters.emplace_back([&, w] {
            if (w % 2 == 0 ? event.Wait(20000) : (event.Wait(), true)) {
                released += 1;
            }
        });
    }
    event.Set();
    for (auto& waiter : waiters) {
        waiter.join();
    }
    EXPECT_EQ(kWaiters, released.load());
}

// Each Set of an automatic event is consumed by exactly one of several waiters.
TEST(Event, AutomaticSetReleasesOneWaiterEach) {
    constexpr int kWaiters = 4;
    Event event;
    Event progress;
    std::atomic<int> released{0};
    std::vector<std::thread> waiters;
    for (int w = 0; w < kWaiters; ++w) {
        waiters.emplace_back([&] {
            if (event.Wait(20000)) {
                released += 1;
                progress.Set();
            }
        });
    }
    for (int round = 1; round <= kWaiters; ++round) {
        event.Set();
        ASSERT_TRUE(progress.Wait(20000));
        EXPECT_EQ(round, released.load());
    }
    for (auto& waiter : waiters) {
        waiter.join();
    }
    EXPECT_EQ(kWaiters, released.load());
    EXPECT_FALSE(event.TryWait());
}

// Two threads hand a turn back and forth; a lost wake-up shows as a failed wait.
TEST(Event, PingPongLosesNoWakeUp) {
    constexpr int kRounds = 3000;
    Event ping;
    Event pong;
    std::atomic<int> failures{0};
    std::thread partner([&] {
        for (int i = 0; i < kRounds; ++i) {
            if (!ping.Wait(10000)) {
                failures += 1;
                return;
            }
            pong.Set();
        }
    });
    for (int i = 0; i < kRounds; ++i) {
        ping.Set();
        if (!(i % 2 == 0 ? pong.Wait(10000) : (pong.Wait(), true))) {
            failures += 1;
            break;
        }
    }
    partner.join();
    EXPECT_EQ(0, failures.load());
    EXPECT_FALSE(ping.TryWait());
    EXPECT_FALSE(pong.TryWait());
}
