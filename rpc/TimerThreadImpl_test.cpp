#include "rpc/TimerThreadImpl.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <stdexcept>

#include "qv/zil/osdep/Event.h"

namespace qv {
namespace portableRegistry {
namespace rpc {
namespace {

using Handler = std::function<void(const boost::system::error_code&)>;
using Watchdog = IPCClient::TimerThreadImpl<Handler>;

TEST(TimerThreadImpl, CancelEndsItsWatchEvenBeforeTheThreadWakes) {
    std::atomic<int> deadlines{0};
    zil::osdep::Event passed(true);
    Watchdog watchdog(
        [&](const boost::system::error_code& error) {
            if (error.value() != boost::asio::error::operation_aborted) {
                ++deadlines;
                passed.Set();
            }
        },
        50);
    watchdog.Start();
    // Each Cancel follows its Arm at once, mostly before the thread has left its wait.
    for (int i = 0; i < 500; ++i) {
        watchdog.Arm();
        watchdog.Cancel();
    }
    watchdog.Arm();  // the only watch that may run out
    ASSERT_TRUE(passed.Wait(10000));
    watchdog.Cancel();
    watchdog.Stop();
    watchdog.Join();
    EXPECT_EQ(deadlines.load(), 1);
}

TEST(TimerThreadImpl, ADeadlineNeverPassesBeforeItsTime) {
    // Whole milliseconds of rounding must not shorten a watch: a call armed late in one
    // millisecond still gets its full time-out.
    using Clock = std::chrono::steady_clock;
    std::atomic<int64_t> firedAtUs{0};
    zil::osdep::Event passed;  // automatic reset: one wait per watch
    Watchdog watchdog(
        [&](const boost::system::error_code& error) {
            if (!error) {
                firedAtUs = std::chrono::duration_cast<std::chrono::microseconds>(
                                Clock::now().time_since_epoch())
                                .count();
                passed.Set();
            }
        },
        3);
    watchdog.Start();
    for (int i = 0; i < 40; ++i) {
        const Clock::time_point armed = Clock::now();
        watchdog.Arm();
        ASSERT_TRUE(passed.Wait(10000));
        const int64_t armedUs =
            std::chrono::duration_cast<std::chrono::microseconds>(armed.time_since_epoch()).count();
        EXPECT_GE(firedAtUs.load() - armedUs, 3000) << "watch " << i;
    }
    watchdog.Stop();
    watchdog.Join();
}

TEST(TimerThreadImpl, AThrowingHandlerEndsOnlyTheWatchdogThread) {
    zil::osdep::Event called(true);
    Watchdog watchdog(
        [&](const boost::system::error_code& error) {
            if (!error) {
                called.Set();
                throw std::runtime_error("handler failed");
            }
        },
        20);
    watchdog.Start();
    watchdog.Arm();
    ASSERT_TRUE(called.Wait(10000));
    // The thread has ended; Arm, Cancel, Stop and Join still return.
    watchdog.Cancel();
    watchdog.Arm();
    watchdog.Stop();
    watchdog.Join();
    SUCCEED();
}

}  // namespace
}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
