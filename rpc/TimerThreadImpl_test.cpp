#include "rpc/TimerThreadImpl.h"

#include <gtest/gtest.h>

#include <atomic>
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
