#include "basic_thread/gnu/ScopedLock.h"

namespace mthread {

ScopedLock::ScopedLock(PthreadMutex& mutex) : m_pMutex(&mutex), m_bLocked(false) {
    m_pMutex->Lock();
    m_bLocked = true;
}

ScopedLock::~ScopedLock() { Release(); }

void ScopedLock::Release() {
    if (m_bLocked) {
        m_pMutex->Unlock();
        m_bLocked = false;
    }
}

}  // namespace mthread
