#include "basic_thread/gnu/Event.h"

#include "basic_thread/gnu/internal/PthreadCond.h"

namespace mthread {

struct Event::Impl {
    PthreadCond m_monitor;
    bool m_bSignalled = false;  // guarded by m_monitor
};

Event::Event() : m_pImpl(new Impl) {}

Event::~Event() = default;

void Event::Set() {
    PthreadCond::Guard guard(m_pImpl->m_monitor);
    m_pImpl->m_bSignalled = true;
    m_pImpl->m_monitor.Signal();
}

bool Event::Wait(uint32_t timeoutMs) {
    PthreadCond::Guard guard(m_pImpl->m_monitor);
    Impl* impl = m_pImpl.get();
    const boost::function0<bool> signalled = [impl] { return impl->m_bSignalled; };
    bool woken = true;
    if (timeoutMs == kInfinite) {
        impl->m_monitor.WaitForCondition(signalled);
    } else {
        woken = impl->m_monitor.WaitForCondition(timeoutMs, signalled);
    }
    if (woken) {
        impl->m_bSignalled = false;
    }
    return woken;
}

}  // namespace mthread
