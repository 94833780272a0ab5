// A pthread mutex whose type (PTHREAD_MUTEX_NORMAL, _RECURSIVE, ...) is chosen at
// construction and whose protocol is always priority inheritance. Shared between
// threads by design. Construction throws PthreadError (undoing what it had done);
// Lock and Unlock report nothing.
#pragma once

#include <pthread.h>

#include <memory>

namespace mthread {

class PthreadMutex {
public:
    explicit PthreadMutex(int type);
    virtual ~PthreadMutex();
    PthreadMutex(const PthreadMutex&) = delete;
    PthreadMutex& operator=(const PthreadMutex&) = delete;

    void Lock();
    void Unlock();
    // For condition waits on this mutex.
    pthread_mutex_t* NativeHandle();

private:
    struct Impl;
    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace mthread
