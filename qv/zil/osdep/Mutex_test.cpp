#include "qv/zil/osdep/Mutex.h"

#include <gtest/gtest.h>

#include <unistd.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <future>
#include <thread>
#include <vector>

#include "qv/zil/osdep/RealTimeKernel.h"
#include "qv/zil/osdep/testing/SchedulingProbe.h"

using qv::zil::osdep::Mutex;

TEST(Mutex, RecursiveOwnerMustUnlockAsOftenAndOthersCannotUnlock) {
    Mutex mutex;
    EXPECT_FALSE(mutex.IsOwnedByCurrentThread());
    mutex.Unlock();  // not held by anyone: ignored
    mutex.Lock();
    mutex.Lock();
    EXPECT_TRUE(mutex.IsOwnedByCurrentThread());

    std::atomic<int> unlocksGiven{0};
    std::promise<pid_t> contender;
    std::atomic<int> unlocksSeenByContender{-1};
    bool ownedByContenderBeforeLock = true;
    std::thread other([&] {
        ownedByContenderBeforeLock = mutex.IsOwnedByCurrentThread();
        mutex.Unlock();  // a non-owner's unlock changes nothing
        mutex.Unlock();
        contender.set_value(qv::testing::CurrentTid());
        mutex.Lock();
        unlocksSeenByContender = unlocksGiven.load();
        EXPECT_TRUE(mutex.IsOwnedByCurrentThread());
        mutex.Unlock();
        EXPECT_FALSE(mutex.IsOwnedByCurrentThread());
    });
    const pid_t otherTid = contender.get_future().get();
    // Let the contender block on the mutex so that an early release would show.
    qv::testing::WaitUntilSleeping(otherTid, std::chrono::milliseconds(2000));
    EXPECT_TRUE(mutex.IsOwnedByCurrentThread());
    unlocksGiven = 1;
    mutex.Unlock();
    EXPECT_TRUE(mutex.IsOwnedByCurrentThread());
    unlocksGiven = 2;
    mutex.Unlock();
    EXPECT_FALSE(mutex.IsOwnedByCurrentThread());
    other.join();
    EXPECT_FALSE(ownedByContenderBeforeLock);
    EXPECT_EQ(2, unlocksSeenByContender.load());

    mutex.Lock();  // free again
    EXPECT_TRUE(mutex.IsOwnedByCurrentThread());
    mutex.Unlock();
}

TEST(Mutex, ContendedNestedLockingKeepsCountsExact) {
    constexpr int kThreads = 8;
    constexpr int kIterations = 5000;
    Mutex mutex;
    long counter = 0;
    std::atomic<int> ownershipErrors{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < kIterations; ++i) {
                Mutex::ScopedLock outer(mutex);
                {
                    Mutex::ScopedLock inner(mutex);
                    ++counter;
                }
                if (!mutex.IsOwnedByCurrentThread()) {
                    ownershipErrors += 1;
                }
            }
            if (mutex.IsOwnedByCurrentThread()) {
                ownershipErrors += 1;
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(static_cast<long>(kThreads) * kIterations, counter);
    EXPECT_EQ(0, ownershipErrors.load());
}

namespace {
// Builds a Mutex while the real-time check reads a file holding `content`.
std::unique_ptr<Mutex> MutexOnKernel(const char* content) {
    char path[] = "/tmp/qv_realtime_XXXXXX";
    const int fd = mkstemp(path);
    EXPECT_GE(fd, 0);
    EXPECT_EQ(static_cast<ssize_t>(std::strlen(content)), write(fd, content, std::strlen(content)));
    close(fd);
    qv::zil::osdep::internal::ResetRealTimeKernelCheck(path);
    std::unique_ptr<Mutex> mutex(new Mutex);
    qv::zil::osdep::internal::ResetRealTimeKernelCheck();
    unlink(path);
    return mutex;
}
}  // namespace

TEST(Mutex, PriorityInheritanceOnlyOnARealTimeKernel) {
    std::unique_ptr<Mutex> realTime = MutexOnKernel("1");
    int holderPrio = 0;
    auto outcome = qv::testing::ProbeInheritance([&] { realTime->Lock(); },
                                                 [&] { realTime->Unlock(); }, true, &holderPrio);
    if (outcome == qv::testing::Inheritance::NotPermitted) {
        GTEST_SKIP() << "SCHED_FIFO is not permitted here";
    }
    EXPECT_EQ(qv::testing::FifoProc(20), holderPrio);

    std::unique_ptr<Mutex> ordinary = MutexOnKernel("0");
    outcome = qv::testing::ProbeInheritance([&] { ordinary->Lock(); }, [&] { ordinary->Unlock(); },
                                            false, &holderPrio);
    EXPECT_EQ(qv::testing::FifoProc(10), holderPrio);
}
