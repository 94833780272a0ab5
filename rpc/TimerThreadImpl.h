// The IPC client's watchdog: a thread with its own event loop and deadline timer that
// bounds every call between Arm and Cancel. Arm, Cancel and Stop may be called from any
// thread; the handler runs on the watchdog thread. An error of the timer or its event
// loop ends the watchdog thread (never the process); Stop and Join still work afterwards.
//
//   idle --Arm (wakes the thread)--> watching: timer set to the deadline of the call
//    ^                                   |  Arm / Cancel of later calls: bookkeeping
//    |                                   |  only, no wake-up
//    |                                   v
//    |                          timer expires
//    |                           |- latest call cancelled ---------> idle
//    |                           |- latest call not yet due -------> timer set to its
//    |                           |                                   deadline, watching
//    +--- handler(ok) <----------+- latest call past its deadline
//
// Every Arm starts a new call with its own start time; Cancel marks it ended under the
// lock, and the handler runs under the same lock only for a call that is not ended and
// whose own deadline has passed. So a Cancel ends its call's watch even when the thread
// has not reached its wait yet, a deadline flags only the call that armed it, and a run of
// short calls costs the watchdog one wake-up per time-out period, not one per call.
#pragma once

#include <cstdint>
#include <mutex>

#include <boost/asio/deadline_timer.hpp>
#include <boost/asio/error.hpp>
#include <boost/asio/io_service.hpp>
#include <boost/asio/placeholders.hpp>
#include <boost/bind/bind.hpp>
#include <boost/system/system_error.hpp>

#include "qv/zil/osdep/Event.h"
#include "qv/zil/osdep/MonotonicClock.h"
#include "rpc/IPCClient.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

template <typename Handler>
class IPCClient::TimerThreadImpl : public IPCClient::TimerThread {
public:
    TimerThreadImpl(Handler handler, uint32_t timeoutMs)
        : m_timer(m_timerIo), m_nTimeoutMs(timeoutMs), m_handler(handler), m_wakeUp(false) {}

    ~TimerThreadImpl() override {
        Stop();
        Join();
    }

    void Arm() override {
        bool wake = false;
        {
            std::lock_guard<std::mutex> lock(m_lock);
            ++m_nArmed;
            m_nArmedAtUs = NowUs();
            if (!m_bWatching) {
                m_bWatching = true;
                wake = true;
            }
        }
        if (wake) {
            m_wakeUp.Set();
        }
    }

    void Cancel() override {
        std::lock_guard<std::mutex> lock(m_lock);
        m_nCancelled = m_nArmed;
    }

    void Start() override { zil::osdep::Thread::Start(0u); }

    void Stop() override {
        {
            std::lock_guard<std::mutex> lock(m_lock);
            m_bStopRequested = true;
            m_timerIo.stop();
        }
        m_wakeUp.Set();
    }

protected:
    void* Run() override {
        for (;;) {
            m_wakeUp.Wait();
            uint64_t remainingUs;
            {
                std::lock_guard<std::mutex> lock(m_lock);
                if (m_bStopRequested) {
                    return nullptr;
                }
                if (!m_bWatching) {
                    continue;
                }
                remainingUs = RemainingUs();
                m_timerIo.reset();  // under the lock: a Stop's stop is never undone
            }
            Wait(remainingUs);
            boost::system::error_code error;
            m_timerIo.run(error);
            if (error) {
                throw boost::system::system_error(error);
            }
        }
    }

private:
    // Microseconds, so that a deadline never passes early by the rounding of whole
    // milliseconds; 64 bits of them do not wrap.
    uint64_t NowUs() const { return m_clock.Now(1000); }

    // Microseconds until the latest call's deadline.
    uint64_t RemainingUs() const {
        const uint64_t elapsed = NowUs() - m_nArmedAtUs;
        const uint64_t timeout = uint64_t(m_nTimeoutMs) * 1000u;
        return elapsed >= timeout ? 0 : timeout - elapsed;
    }

    void Wait(uint64_t microseconds) {
        boost::system::error_code error;
        m_timer.expires_from_now(
            boost::posix_time::microseconds(static_cast<int64_t>(microseconds)), error);
        if (error) {
            throw boost::system::system_error(error, "expires_from_now");
        }
        m_timer.async_wait(
            boost::bind(&TimerThreadImpl::OnDeadline, this, boost::asio::placeholders::error));
    }

    void OnDeadline(const boost::system::error_code& error) {
        if (error) {
            return;  // cancelled by the next expires_from_now
        }
        std::lock_guard<std::mutex> lock(m_lock);
        if (m_bStopRequested) {
            return;
        }
        if (m_nCancelled == m_nArmed) {
            m_bWatching = false;  // nothing in progress: the next Arm wakes the thread
            return;
        }
        const uint64_t remainingUs = RemainingUs();
        if (remainingUs != 0) {
            Wait(remainingUs);  // a later call is in progress: watch its own deadline
            return;
        }
        m_nCancelled = m_nArmed;  // flagged once
        m_bWatching = false;
        m_handler(boost::system::error_code());
    }

    boost::asio::io_service m_timerIo;
    boost::asio::deadline_timer m_timer;
    uint32_t m_nTimeoutMs;
    Handler m_handler;
    zil::osdep::Event m_wakeUp;  // automatic reset
    zil::osdep::MonotonicClock m_clock;
    std::mutex m_lock;  // guards the fields below and the handler's call
    bool m_bStopRequested = false;
    bool m_bWatching = false;  // the thread has, or is about to have, a deadline set
    uint32_t m_nArmed = 0;     // number of the latest call
    uint32_t m_nCancelled = 0;
    uint64_t m_nArmedAtUs = 0;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
