#include "basic_thread/gnu/Semaphore.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

using mthread::Semaphore;

TEST(Semaphore, StartsFullAndPollsWithoutWaiting) {
    Semaphore semaphore(2);
    EXPECT_TRUE(semaphore.Lock(0));
    EXPECT_TRUE(semaphore.Lock(0));
    EXPECT_FALSE(semaphore.Lock(0));
    semaphore.Unlock();
    EXPECT_TRUE(semaphore.Lock(0));
    EXPECT_FALSE(semaphore.Lock(0));

    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(semaphore.Lock(60));
    const auto elapsed = std::chrono::steady_clock::now() - start;
    EXPECT_GE(elapsed, std::chrono::milliseconds(59));
    EXPECT_LT(elapsed, std::chrono::milliseconds(6000));

    semaphore.Unlock();
    semaphore.Unlock();
}

TEST(Semaphore, UnlockWakesAWaiterOnAnotherThread) {
    Semaphore semaphore(2);
    ASSERT_TRUE(semaphore.Lock(0));
    ASSERT_TRUE(semaphore.Lock(0));
    std::atomic<int> acquired{0};
    std::thread infinite([&] {
        semaphore.Lock(Semaphore::kInfinite);
        acquired += 1;
    });
    std::thread timed([&] {
        if (semaphore.Lock(20000)) {
            acquired += 1;
        }
    });
    semaphore.Unlock();
    semaphore.Unlock();
    infinite.join();
    timed.join();
    EXPECT_EQ(2, acquired.load());
    EXPECT_FALSE(semaphore.Lock(0));
    semaphore.Unlock();
    semaphore.Unlock();
}

// Many threads, timed and untimed waits mixed: the number of holders never exceeds the
// count, no wake-up is lost (an untimed waiter would hang), no unit is released twice
// (the invariant check aborts) and all units are free at the end.
TEST(Semaphore, StressKeepsCountAndWakesEveryWaiter) {
    constexpr int kUnits = 3;
    constexpr int kThreads = 8;
    constexpr int kIterations = 1500;
    Semaphore semaphore(kUnits);
    std::atomic<int> inside{0};
    std::atomic<int> most{0};
    std::atomic<int> timeouts{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            for (int i = 0; i < kIterations; ++i) {
                const bool untimed = (t % 2) == 0;
                const uint32_t timeout = untimed ? Semaphore::kInfinite : (i % 3);
                if (!semaphore.Lock(timeout)) {
                    timeouts += 1;
                    continue;
                }
                const int now = ++inside;
                int seen = most.load();
                while (now > seen && !most.compare_exchange_weak(seen, now)) {
                }
                --inside;
                semaphore.Unlock();
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_LE(most.load(), kUnits);
    EXPECT_GE(most.load(), 1);
    for (int unit = 0; unit < kUnits; ++unit) {
        EXPECT_TRUE(semaphore.Lock(0));
    }
    EXPECT_FALSE(semaphore.Lock(0));
    for (int unit = 0; unit < kUnits; ++unit) {
        semaphore.Unlock();
    }
}

TEST(SemaphoreDeathTest, MisuseAbortsWithTheFailedCheck) {
    EXPECT_DEATH(Semaphore(0), "gnu/sync_objects:[0-9]+: .*nInitCount > 0");
    EXPECT_DEATH(Semaphore(-1), "nInitCount > 0");
    EXPECT_DEATH(
        {
            Semaphore semaphore(1);
            semaphore.Unlock();
        },
        "gnu/sync_objects:[0-9]+: .*m_pImpl->m_nSemCount <= m_pImpl->m_nMaxCount");
}
