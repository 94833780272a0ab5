// Base of worker threads: owns one POSIX thread, started with an optional name and stack
// size, that runs the derived class's Run() with every signal blocked, and maps the
// thread's scheduling onto nine priority levels (4 is an ordinary thread).
// Start, Join, IsCurrentThread and the priority calls may be used from several threads.
// Failing system calls throw qv::zil::osdep::PosixError, a level of 9 or more throws
// InvalidArgument; an exception escaping Run() ends that thread, never the process.
// The base destructor does not join: a derived class joins in its own destructor.
#pragma once

#include <cstdint>
#include <memory>

#include "qv/zil/StringBase.h"

namespace qv {
namespace zil {
namespace osdep {

class Thread {
public:
    static constexpr uint32_t kPriorityLevels = 9;
    static constexpr uint32_t kOrdinaryLevel = 4;
    static constexpr uint32_t kRealTimeStackSize = 0x40000;

    // Scheduling policy in the upper 16 bits, priority in the lower 16 bits.
    struct Scheduling {
        uint32_t packed;
    };

    Thread();
    virtual ~Thread();
    Thread(const Thread&) = delete;
    Thread& operator=(const Thread&) = delete;

    // A stack size of 0 means 256 KiB on a real-time kernel, else the system default.
    // Names longer than 15 bytes are shortened to "first6...last6"; blanks become "_".
    void Start(const ByteString& name, uint32_t stackSize = 0);
    void Start(uint32_t stackSize = 0);
    // Waits for the thread once; later calls, and calls from the thread itself, return.
    void Join();
    bool IsCurrentThread() const;

    uint32_t GetPriority();
    void SetPriority(uint32_t level);
    void SetPriority(Scheduling scheduling);

protected:
    // Runs on the new thread; its result is the thread's exit value.
    virtual void* Run() = 0;

private:
    struct Impl;
    struct StartBlock;
    static void* Entry(void* startBlock);
    void Launch(std::unique_ptr<ByteString> name, uint32_t stackSize);
    void SetScheduling(uint32_t packed);

    std::unique_ptr<Impl> m_pImpl;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
