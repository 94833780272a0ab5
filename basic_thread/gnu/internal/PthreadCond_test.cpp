#include "basic_thread/gnu/internal/PthreadCond.h"

#include <gtest/gtest.h>

#include <sys/time.h>

#include <atomic>
#include <thread>

using mthread::PthreadCond;

namespace {
long long NowUs() {
    timeval now{};
    gettimeofday(&now, nullptr);
    return now.tv_sec * 1000000LL + now.tv_usec;
}
}  // namespace

TEST(PthreadCond, TimedWaitReturnsAtOnceWhenThePredicateHoldsAndFailsAfterTheDeadline) {
    PthreadCond monitor;
    PthreadCond::Guard guard(monitor);
    int calls = 0;
    EXPECT_TRUE(monitor.WaitForCondition(0, [&] { return ++calls > 0; }));
    EXPECT_EQ(1, calls);
    EXPECT_TRUE(monitor.WaitForCondition(60000, [] { return true; }));

    EXPECT_FALSE(monitor.WaitForCondition(0, [] { return false; }));
    const long long start = NowUs();
    EXPECT_FALSE(monitor.WaitForCondition(50, [] { return false; }));
    const long long elapsedUs = NowUs() - start;
    EXPECT_GE(elapsedUs, 49000);
    EXPECT_LT(elapsedUs, 5000000);
}

// The waiter holds the monitor after a wait during which another owner took the monitor
// and gave it back (clearing the flag), so it may signal in turn. The partner can take
// the monitor only once the waiter waits, which fixes the order.
TEST(PthreadCond, WaiterHoldsTheMonitorAfterAnotherOwnerReleasedIt) {
    PthreadCond monitor;
    bool ready = false;
    {
        PthreadCond::Guard guard(monitor);
        std::thread partner([&] {
            PthreadCond::Guard partnerGuard(monitor);
            ready = true;
            monitor.Signal();
        });
        monitor.WaitForCondition([&] { return ready; });
        monitor.Signal();  // aborts if the partner's release left the flag cleared
        partner.join();    // the partner is done with the monitor
    }

    bool timedReady = false;
    {
        PthreadCond::Guard guard(monitor);
        std::thread partner([&] {
            PthreadCond::Guard partnerGuard(monitor);
            timedReady = true;
            monitor.Signal();
        });
        EXPECT_TRUE(monitor.WaitForCondition(20000, [&] { return timedReady; }));
        monitor.Signal();
        partner.join();
    }
}

TEST(PthreadCondDeathTest, SignalOrWaitWithoutTheMonitorAborts) {
    EXPECT_DEATH(
        {
            PthreadCond monitor;
            monitor.Signal();
        },
        "gnu/internal/PthreadCond:[0-9]+: .*m_bIsLocked");
    EXPECT_DEATH(
        {
            PthreadCond monitor;
            monitor.WaitForCondition([] { return true; });
        },
        "gnu/internal/PthreadCond:[0-9]+: .*m_bIsLocked");
    EXPECT_DEATH(
        {
            PthreadCond monitor;
            monitor.WaitForCondition(10, [] { return true; });
        },
        "gnu/internal/PthreadCond:[0-9]+: .*m_bIsLocked");
    EXPECT_DEATH(
        {
            PthreadCond monitor;
            monitor.Lock();
            monitor.Unlock();
            monitor.Signal();
        },
        "m_bIsLocked");
}
