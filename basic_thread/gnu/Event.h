// Auto-reset event of the mthread family: Set releases one waiter (or the next Wait);
// a successful Wait clears it. Sets given while nobody waits are not counted. Shared
// between threads by design; construction throws PthreadError when its monitor cannot
// be built.
#pragma once

#include <cstdint>
#include <memory>

namespace mthread {

class Event {
public:
    static constexpr uint32_t kInfinite = 0xFFFFFFFF;

    Event();
    ~Event();
    Event(const Event&) = delete;
    Event& operator=(const Event&) = delete;

    void Set();
    // Waits at most timeoutMs (0 polls, kInfinite waits without limit); true when the
    // event was set, which also clears it.
    bool Wait(uint32_t timeoutMs = kInfinite);

private:
    struct Impl;
    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace mthread
