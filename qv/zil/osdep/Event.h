// Event with manual or automatic reset whose time-outs run on the monotonic clock, so
// setting the system time does not shorten or stretch a wait. A set manual-reset event
// releases every waiter until Reset; an automatic-reset one releases a single wait and
// clears itself. May be shared between threads; reports no failure and never throws
// after construction (construction may throw bad_alloc).
#pragma once

#include <cstdint>
#include <memory>

namespace qv {
namespace zil {
namespace osdep {

class Event {
public:
    static constexpr uint32_t kInfinite = 0xFFFFFFFF;

    explicit Event(bool manualReset = false, bool initiallySignalled = false);
    ~Event();
    Event(const Event&) = delete;
    Event& operator=(const Event&) = delete;

    void Set();
    void Reset();
    void Wait();
    // 0 polls, kInfinite waits without limit; true when the event was signalled.
    bool Wait(uint32_t timeoutMs);
    bool TryWait();

private:
    struct Impl;
    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
