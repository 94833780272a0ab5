#include "qv/zil/osdep/Event.h"

#include <pthread.h>

#include <cerrno>
#include <ctime>

namespace qv {
namespace zil {
namespace osdep {

struct Event::Impl {
    pthread_cond_t condition;
    pthread_mutex_t mutex;
    bool manualReset;
    bool signalled;  // guarded by mutex

    // Returns the state seen by a successful wait and consumes it when automatic.
    bool Consume() {
        const bool was = signalled;
        if (!manualReset) {
            signalled = false;
        }
        return was;
    }
};

namespace {
// Locks the event's pthread mutex for a scope.
class Guard {
public:
    explicit Guard(pthread_mutex_t& mutex) : m_mutex(mutex) { pthread_mutex_lock(&m_mutex); }
    ~Guard() { pthread_mutex_unlock(&m_mutex); }
    Guard(const Guard&) = delete;
    Guard& operator=(const Guard&) = delete;

private:
    pthread_mutex_t& m_mutex;
};
}  // namespace

Event::Event(bool manualReset, bool initiallySignalled) : m_pImpl(new Impl) {
    pthread_condattr_t attributes;
    pthread_condattr_init(&attributes);
    pthread_condattr_setclock(&attributes, CLOCK_MONOTONIC);
    pthread_cond_init(&m_pImpl->condition, &attributes);
    pthread_condattr_destroy(&attributes);
    pthread_mutex_init(&m_pImpl->mutex, nullptr);
    m_pImpl->manualReset = manualReset;
    m_pImpl->signalled = initiallySignalled;
}

Event::~Event() {
    pthread_mutex_destroy(&m_pImpl->mutex);
    pthread_cond_destroy(&m_pImpl->condition);
}

void Event::Set() {
    Guard guard(m_pImpl->mutex);
    m_pImpl->signalled = true;
    if (m_pImpl->manualReset) {
        pthread_cond_broadcast(&m_pImpl->condition);
    } else {
        pthread_cond_signal(&m_pImpl->condition);
    }
}

void Event::Reset() {
    Guard guard(m_pImpl->mutex);
    m_pImpl->signalled = false;
}

void Event::Wait() {
    Guard guard(m_pImpl->mutex);
    while (!m_pImpl->signalled) {
        pthread_cond_wait(&m_pImpl->condition, &m_pImpl->mutex);
    }
    m_pImpl->Consume();
}

bool Event::Wait(uint32_t timeoutMs) {
    if (timeoutMs == 0) {
        return TryWait();
    }
    if (timeoutMs == kInfinite) {
        Wait();
        return true;
    }
    timespec deadline{};
    clock_gettime(CLOCK_MONOTONIC, &deadline);
    const long nanoseconds = deadline.tv_nsec + static_cast<long>(timeoutMs % 1000) * 1000000L;
    deadline.tv_sec += static_cast<time_t>(timeoutMs / 1000) + nanoseconds / 1000000000L;
    deadline.tv_nsec = nanoseconds % 1000000000L;

    Guard guard(m_pImpl->mutex);
    while (!m_pImpl->signalled) {
        if (pthread_cond_timedwait(&m_pImpl->condition, &m_pImpl->mutex, &deadline) == ETIMEDOUT) {
            break;
        }
    }
    return m_pImpl->Consume();
}

bool Event::TryWait() {
    Guard guard(m_pImpl->mutex);
    return m_pImpl->Consume();
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
