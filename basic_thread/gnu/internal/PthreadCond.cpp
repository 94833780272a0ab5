#include "basic_thread/gnu/internal/PthreadCond.h"

#include <cerrno>
#include <cstring>
#include <ctime>

#include "basic_thread/gnu/internal/Assertion.h"
#include "basic_thread/gnu/internal/TimingPlatform.h"

namespace mthread {

namespace {
constexpr const char* kFile = "gnu/internal/PthreadCond";
}

PthreadCond::PthreadCond() : m_mutex(PTHREAD_MUTEX_NORMAL), m_bIsLocked(false) {
    std::memset(&m_condition, 0, sizeof m_condition);
    const int nRet = pthread_cond_init(&m_condition, nullptr);
    MTHREAD_ASSERT(nRet == 0, kFile);
}

PthreadCond::~PthreadCond() {
    const int nRet = pthread_cond_destroy(&m_condition);
    MTHREAD_ASSERT(nRet == 0, kFile);
}

void PthreadCond::Lock() {
    m_mutex.Lock();
    m_bIsLocked = true;
}

void PthreadCond::Unlock() {
    m_bIsLocked = false;
    m_mutex.Unlock();
}

void PthreadCond::Signal() {
    MTHREAD_ASSERT(m_bIsLocked, kFile);
    const int nRet = pthread_cond_signal(&m_condition);
    MTHREAD_ASSERT(nRet == 0, kFile);
}

void PthreadCond::WaitForCondition(const boost::function0<bool>& predicate) {
    MTHREAD_ASSERT(m_bIsLocked, kFile);
    while (!predicate()) {
        pthread_cond_wait(&m_condition, m_mutex.NativeHandle());
        m_bIsLocked = true;  // held again; another owner cleared the flag meanwhile
    }
}

bool PthreadCond::WaitForCondition(uint32_t timeoutMs, const boost::function0<bool>& predicate) {
    MTHREAD_ASSERT(m_bIsLocked, kFile);
    timespec deadline{};
    TimingPlatform::CalculateTimeout(&deadline, timeoutMs);
    while (!predicate()) {
        const int nRet = pthread_cond_timedwait(&m_condition, m_mutex.NativeHandle(), &deadline);
        m_bIsLocked = true;
        if (nRet == ETIMEDOUT) {
            // The wait may have consumed a signal given just before the deadline: then the
            // predicate holds, and this waiter must take what it was woken for.
            return predicate();
        }
        if (nRet != 0) {
            return false;
        }
    }
    return true;
}

}  // namespace mthread
