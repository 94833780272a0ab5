// A monitor: a normal priority-inheriting mutex, a condition variable on the real-time
// clock and a flag that is true while a member operation of the owner holds the mutex.
// Shared between threads by design. Construction throws PthreadError when the mutex
// cannot be built; waiting or signalling without holding the monitor, or a failing
// condition call, aborts with the checked expression.
#pragma once

#include <pthread.h>

#include <atomic>
#include <cstdint>

#include <boost/function.hpp>

#include "basic_thread/gnu/PthreadMutex.h"

namespace mthread {

class PthreadCond {
public:
    PthreadCond();
    ~PthreadCond();
    PthreadCond(const PthreadCond&) = delete;
    PthreadCond& operator=(const PthreadCond&) = delete;

    // Takes the monitor (mutex, then the flag) and gives it back (flag, then mutex).
    void Lock();
    void Unlock();

    // Wakes one waiter. The monitor must be held.
    void Signal();
    // Waits until the predicate holds. The monitor must be held.
    void WaitForCondition(const boost::function0<bool>& predicate);
    // Waits at most timeoutMs for the predicate; true when it holds. The monitor must be
    // held. A predicate that holds when the deadline passes still counts as success, so a
    // wake-up given to a waiter that times out is never lost.
    bool WaitForCondition(uint32_t timeoutMs, const boost::function0<bool>& predicate);

    // Holds the monitor for a scope.
    class Guard {
    public:
        explicit Guard(PthreadCond& monitor) : m_monitor(monitor) { m_monitor.Lock(); }
        ~Guard() { m_monitor.Unlock(); }
        Guard(const Guard&) = delete;
        Guard& operator=(const Guard&) = delete;

    private:
        PthreadCond& m_monitor;
    };

private:
    PthreadMutex m_mutex;
    pthread_cond_t m_condition;
    // Written only with the mutex held; atomic so that a misuse check reads it safely.
    std::atomic<bool> m_bIsLocked;
};

}  // namespace mthread
