#include "qv/zil/osdep/Mutex.h"

#include <pthread.h>

#include <atomic>

#include "qv/zil/osdep/RealTimeKernel.h"

namespace qv {
namespace zil {
namespace osdep {

struct Mutex::Impl {
    // Written only by the holder, read by any thread without the mutex: each thread
    // compares it with its own identity only, which gives the right answer for it.
    std::atomic<pthread_t> owner{0};
    pthread_mutex_t mutex;
    int32_t count = 0;  // touched only by the holder
};

Mutex::Mutex() : m_pImpl(new Impl) {
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_RECURSIVE);
    if (IsRealTimeKernel()) {
        pthread_mutexattr_setprotocol(&attributes, PTHREAD_PRIO_INHERIT);
    }
    pthread_mutex_init(&m_pImpl->mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
}

Mutex::~Mutex() { pthread_mutex_destroy(&m_pImpl->mutex); }

void Mutex::Lock() {
    pthread_mutex_lock(&m_pImpl->mutex);
    m_pImpl->owner.store(pthread_self(), std::memory_order_relaxed);
    ++m_pImpl->count;
}

void Mutex::Unlock() {
    if (!IsOwnedByCurrentThread()) {
        return;
    }
    if (m_pImpl->count > 0) {
        --m_pImpl->count;
    }
    if (m_pImpl->count == 0) {
        m_pImpl->owner.store(0, std::memory_order_relaxed);
    }
    pthread_mutex_unlock(&m_pImpl->mutex);
}

bool Mutex::IsOwnedByCurrentThread() const {
    return pthread_equal(m_pImpl->owner.load(std::memory_order_relaxed), pthread_self()) != 0;
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
