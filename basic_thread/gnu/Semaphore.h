// Counting semaphore that starts with all of its units free. Shared between threads by
// design. Construction throws PthreadError when its monitor cannot be built; a count of 0
// or less, or an Unlock that would exceed the initial count, aborts with the failed check.
#pragma once

#include <cstdint>
#include <memory>

namespace mthread {

class Semaphore {
public:
    static constexpr uint32_t kInfinite = 0xFFFFFFFF;

    explicit Semaphore(int32_t nInitCount);
    virtual ~Semaphore();
    Semaphore(const Semaphore&) = delete;
    Semaphore& operator=(const Semaphore&) = delete;

    // Takes one unit, waiting at most timeoutMs (0 polls, kInfinite waits without limit);
    // false when none became free in time.
    bool Lock(uint32_t timeoutMs = kInfinite);
    // Gives one unit back and wakes one waiter.
    void Unlock();

private:
    struct Impl;
    void CheckInvariant() const;

    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace mthread
