#include "basic_thread/gnu/PthreadMutex.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <future>
#include <thread>
#include <vector>

#include "qv/zil/Exception.h"

#include "basic_thread/gnu/sync_objects.h"
#include "qv/zil/osdep/testing/SchedulingProbe.h"

namespace {

// pthread_mutex_trylock from a thread that is not the caller.
int TryLockElsewhere(mthread::PthreadMutex& mutex) {
    return std::async(std::launch::async,
                      [&mutex] {
                          const int result = pthread_mutex_trylock(mutex.NativeHandle());
                          if (result == 0) {
                              pthread_mutex_unlock(mutex.NativeHandle());
                          }
                          return result;
                      })
        .get();
}

}  // namespace

TEST(PthreadError, MessageHasPrefixAndIsNotAFoundationException) {
    const mthread::PthreadError error("Mutex initialization failed.");
    EXPECT_STREQ("PthreadError: Mutex initialization failed.", error.what());
    EXPECT_EQ(nullptr, dynamic_cast<const qv::zil::exception::Exception*>(
                           static_cast<const std::exception*>(&error)));
}

TEST(PthreadMutex, RejectedTypeThrowsWithItsReason) {
    try {
        mthread::PthreadMutex mutex(12345);
        FAIL() << "an unknown mutex type was accepted";
    } catch (const mthread::PthreadError& error) {
        EXPECT_STREQ("PthreadError: Unable to set mutex type.", error.what());
    }
}

TEST(CriticalSection, OwnerLocksAgainAndMustUnlockAsOften) {
    mthread::CriticalSection section;
    section.Lock();
    section.Lock();
    EXPECT_EQ(EBUSY, TryLockElsewhere(section));
    section.Unlock();
    EXPECT_EQ(EBUSY, TryLockElsewhere(section));
    section.Unlock();
    EXPECT_EQ(0, TryLockElsewhere(section));
}

TEST(ScopedLock, EarlyReleaseUnlocksOnceAndDestructorDoesNotUnlockAgain) {
    mthread::CriticalSection section;
    {
        mthread::ScopedLock lock(section);
        EXPECT_EQ(EBUSY, TryLockElsewhere(section));
        lock.Release();
        EXPECT_EQ(0, TryLockElsewhere(section));
        lock.Release();  // a second release does nothing
        section.Lock();  // taken again by hand: the scope's end must not release it
    }
    EXPECT_EQ(EBUSY, TryLockElsewhere(section));
    section.Unlock();
    EXPECT_EQ(0, TryLockElsewhere(section));

    { mthread::ScopedLock lock(section); }
    EXPECT_EQ(0, TryLockElsewhere(section));
}

TEST(PthreadMutex, HolderInheritsThePriorityOfAWaiter) {
    for (const int type : {PTHREAD_MUTEX_NORMAL, PTHREAD_MUTEX_RECURSIVE}) {
        mthread::PthreadMutex mutex(type);
        int holderPrio = 0;
        const auto outcome = qv::testing::ProbeInheritance(
            [&] { mutex.Lock(); }, [&] { mutex.Unlock(); }, true, &holderPrio);
        if (outcome == qv::testing::Inheritance::NotPermitted) {
            GTEST_SKIP() << "SCHED_FIFO is not permitted here";
        }
        EXPECT_EQ(qv::testing::FifoProc(20), holderPrio) << "mutex type " << type;
    }
}

TEST(PthreadMutex, ContendedCounterStaysExact) {
    mthread::CriticalSection section;
    constexpr int kThreads = 8;
    constexpr int kIterations = 5000;
    long counter = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < kIterations; ++i) {
                mthread::ScopedLock outer(section);
                mthread::ScopedLock inner(section);
                ++counter;
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(static_cast<long>(kThreads) * kIterations, counter);
}
