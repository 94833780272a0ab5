#include "basic_thread/gnu/Semaphore.h"

#include "basic_thread/gnu/internal/Assertion.h"
#include "basic_thread/gnu/internal/PthreadCond.h"

namespace mthread {

namespace {
// The public primitives' checks name their module.
constexpr const char* kFile = "gnu/sync_objects";
}  // namespace

struct Semaphore::Impl {
    explicit Impl(int32_t count) : m_nSemCount(count), m_nMaxCount(count) {}

    PthreadCond m_monitor;
    int32_t m_nSemCount;  // free units, guarded by m_monitor
    int32_t m_nMaxCount;
};

Semaphore::Semaphore(int32_t nInitCount) {
    MTHREAD_ASSERT(nInitCount > 0, kFile);
    m_pImpl.reset(new Impl(nInitCount));
}

Semaphore::~Semaphore() { CheckInvariant(); }

void Semaphore::CheckInvariant() const {
    MTHREAD_ASSERT(m_pImpl->m_nSemCount >= 0, kFile);
    MTHREAD_ASSERT(m_pImpl->m_nSemCount <= m_pImpl->m_nMaxCount, kFile);
}

bool Semaphore::Lock(uint32_t timeoutMs) {
    PthreadCond::Guard guard(m_pImpl->m_monitor);
    CheckInvariant();
    Impl* impl = m_pImpl.get();
    const boost::function0<bool> unitFree = [impl] { return impl->m_nSemCount > 0; };
    bool taken = true;
    if (timeoutMs == kInfinite) {
        impl->m_monitor.WaitForCondition(unitFree);
    } else {
        taken = impl->m_monitor.WaitForCondition(timeoutMs, unitFree);
    }
    if (taken) {
        --impl->m_nSemCount;
    }
    CheckInvariant();
    return taken;
}

void Semaphore::Unlock() {
    PthreadCond::Guard guard(m_pImpl->m_monitor);
    CheckInvariant();
    ++m_pImpl->m_nSemCount;
    m_pImpl->m_monitor.Signal();
    CheckInvariant();
}

}  // namespace mthread
