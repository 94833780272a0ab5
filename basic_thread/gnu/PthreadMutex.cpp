#include "basic_thread/gnu/PthreadMutex.h"

#include <cstring>

#include "basic_thread/gnu/PthreadError.h"

namespace mthread {

struct PthreadMutex::Impl {
    pthread_mutex_t mutex;
    pthread_mutexattr_t attributes;  // kept for the mutex's lifetime
};

PthreadMutex::PthreadMutex(int type) : m_pImpl(new Impl) {
    std::memset(&m_pImpl->mutex, 0, sizeof m_pImpl->mutex);
    if (pthread_mutexattr_init(&m_pImpl->attributes) != 0) {
        throw PthreadError("Unable to initialize mutex attributes.");
    }
    const char* failure = nullptr;
    if (pthread_mutexattr_settype(&m_pImpl->attributes, type) != 0) {
        failure = "Unable to set mutex type.";
    } else if (pthread_mutexattr_setprotocol(&m_pImpl->attributes, PTHREAD_PRIO_INHERIT) != 0) {
        failure = "Unable to set mutex protocol.";
    } else if (pthread_mutex_init(&m_pImpl->mutex, &m_pImpl->attributes) != 0) {
        failure = "Mutex initialization failed.";
    }
    if (failure != nullptr) {
        pthread_mutexattr_destroy(&m_pImpl->attributes);
        throw PthreadError(failure);
    }
}

PthreadMutex::~PthreadMutex() {
    pthread_mutex_destroy(&m_pImpl->mutex);
    pthread_mutexattr_destroy(&m_pImpl->attributes);
}

void PthreadMutex::Lock() { pthread_mutex_lock(&m_pImpl->mutex); }

void PthreadMutex::Unlock() { pthread_mutex_unlock(&m_pImpl->mutex); }

pthread_mutex_t* PthreadMutex::NativeHandle() { return &m_pImpl->mutex; }

}  // namespace mthread
