// Holds a PthreadMutex from construction until Release() or the end of the scope,
// whichever comes first. Used by one thread; never fails.
#pragma once

#include "basic_thread/gnu/PthreadMutex.h"

namespace mthread {

class ScopedLock {
public:
    explicit ScopedLock(PthreadMutex& mutex);
    ~ScopedLock();
    ScopedLock(const ScopedLock&) = delete;
    ScopedLock& operator=(const ScopedLock&) = delete;

    // Unlocks early; later calls and the destructor then do nothing.
    void Release();

private:
    PthreadMutex* m_pMutex;
    bool m_bLocked;
};

}  // namespace mthread
