#include "basic_thread/gnu/Event.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>

TEST(MthreadEvent, OneSetLetsOneWaitThrough) {
    mthread::Event event;
    EXPECT_FALSE(event.Wait(0));
    event.Set();
    EXPECT_TRUE(event.Wait(0));
    EXPECT_FALSE(event.Wait(0));

    event.Set();
    event.Set();  // not counted
    EXPECT_TRUE(event.Wait(0));
    EXPECT_FALSE(event.Wait(0));

    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(event.Wait(50));
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(49));

    event.Set();
    EXPECT_TRUE(event.Wait(mthread::Event::kInfinite));
    EXPECT_FALSE(event.Wait(0));
}

// Two threads hand a turn back and forth; a lost wake-up shows as a failed wait.
TEST(MthreadEvent, PingPongLosesNoWakeUp) {
    constexpr int kRounds = 3000;
    mthread::Event ping;
    mthread::Event pong;
    int failures = 0;
    std::thread partner([&] {
        for (int i = 0; i < kRounds; ++i) {
            if (!ping.Wait(10000)) {
                ++failures;
                return;
            }
            pong.Set();
        }
    });
    int mainFailures = 0;
    for (int i = 0; i < kRounds; ++i) {
        ping.Set();
        const bool woken = (i % 2 == 0) ? pong.Wait(10000) : pong.Wait(mthread::Event::kInfinite);
        if (!woken) {
            ++mainFailures;
            break;
        }
    }
    partner.join();
    EXPECT_EQ(0, failures);
    EXPECT_EQ(0, mainFailures);
    EXPECT_FALSE(ping.Wait(0));
    EXPECT_FALSE(pong.Wait(0));
}
