#include "qv/zil/osdep/AtomicCounter.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

using qv::zil::osdep::AtomicDecrement;
using qv::zil::osdep::AtomicIncrement;
using qv::zil::osdep::AtomicStore;

TEST(AtomicCounter, ReturnsTheNewValueAndWrapsAtTheLimits) {
    int32_t word = 0;
    EXPECT_EQ(1, AtomicIncrement(&word));
    EXPECT_EQ(0, AtomicDecrement(&word));
    EXPECT_EQ(-1, AtomicDecrement(&word));
    AtomicStore(&word, INT32_MAX);
    EXPECT_EQ(INT32_MAX, word);
    EXPECT_EQ(INT32_MIN, AtomicIncrement(&word));
    EXPECT_EQ(INT32_MAX, AtomicDecrement(&word));
}

// Every new value is handed to exactly one caller, and the total is exact.
TEST(AtomicCounter, ConcurrentChangesAreNeitherLostNorDuplicated) {
    constexpr int kThreads = 6;
    constexpr int kPerThread = 20000;
    constexpr int kTotal = kThreads * kPerThread;
    int32_t word = 0;
    std::vector<std::atomic<int>> seen(kTotal + 1);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < kPerThread; ++i) {
                const int32_t value = AtomicIncrement(&word);
                if (value >= 1 && value <= kTotal) {
                    seen[value] += 1;
                }
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(kTotal, word);
    int unique = 0;
    for (int value = 1; value <= kTotal; ++value) {
        unique += seen[value].load() == 1 ? 1 : 0;
    }
    EXPECT_EQ(kTotal, unique);

    threads.clear();
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < kPerThread; ++i) {
                AtomicDecrement(&word);
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(0, word);
}
