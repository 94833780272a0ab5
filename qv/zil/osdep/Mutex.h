// Recursive mutex that remembers its owner and nesting depth. It uses priority
// inheritance only on a real-time kernel. An Unlock by a thread that does not hold it
// is ignored. May be shared between threads; reports no failure (pthread results are
// ignored) and never throws after construction (construction may throw bad_alloc).
#pragma once

#include <cstdint>
#include <memory>

namespace qv {
namespace zil {
namespace osdep {

class Mutex {
public:
    Mutex();
    ~Mutex();
    Mutex(const Mutex&) = delete;
    Mutex& operator=(const Mutex&) = delete;

    void Lock();
    void Unlock();  // ignored unless the calling thread holds the mutex
    bool IsOwnedByCurrentThread() const;

    // Holds a Mutex for the lifetime of a scope.
    class ScopedLock {
    public:
        explicit ScopedLock(Mutex& mutex) : m_mutex(mutex) { m_mutex.Lock(); }
        ~ScopedLock() { m_mutex.Unlock(); }
        ScopedLock(const ScopedLock&) = delete;
        ScopedLock& operator=(const ScopedLock&) = delete;

    private:
        Mutex& m_mutex;
    };

private:
    struct Impl;
    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
