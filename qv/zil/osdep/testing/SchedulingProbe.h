// Test helpers that observe the kernel's view of a thread: its state letter and its
// effective priority (which shows priority-inheritance boosts), read from /proc.
// Header-only, for the unit tests of the thread primitives.
#pragma once

#include <pthread.h>
#include <sched.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <fstream>
#include <functional>
#include <future>
#include <sstream>
#include <string>
#include <thread>

namespace qv {
namespace testing {

inline pid_t CurrentTid() { return static_cast<pid_t>(::syscall(SYS_gettid)); }

// Fields 3 (state) and 18 (prio) of /proc/self/task/<tid>/stat; false when unreadable.
inline bool ReadTaskStat(pid_t tid, char* state, int* prio) {
    std::ifstream file("/proc/self/task/" + std::to_string(tid) + "/stat");
    std::string text((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    const std::string::size_type close = text.rfind(')');
    if (close == std::string::npos) {
        return false;
    }
    std::istringstream fields(text.substr(close + 1));
    std::string field;
    for (int index = 3; index <= 18 && (fields >> field); ++index) {
        if (index == 3) {
            *state = field[0];
        } else if (index == 18) {
            *prio = std::stoi(field);
            return true;
        }
    }
    return false;
}

// Polls (yielding) until the task sleeps; false after `limit`.
inline bool WaitUntilSleeping(pid_t tid, std::chrono::milliseconds limit) {
    const auto deadline = std::chrono::steady_clock::now() + limit;
    char state = 0;
    int prio = 0;
    while (std::chrono::steady_clock::now() < deadline) {
        if (ReadTaskStat(tid, &state, &prio) && (state == 'S' || state == 'D')) {
            return true;
        }
        std::this_thread::yield();
    }
    return false;
}

inline bool MakeCurrentThreadFifo(int priority) {
    sched_param parameters{};
    parameters.sched_priority = priority;
    return pthread_setschedparam(pthread_self(), SCHED_FIFO, &parameters) == 0;
}

// Effective priority in /proc of a SCHED_FIFO task of priority p is -1 - p.
constexpr int FifoProc(int priority) { return -1 - priority; }

enum class Inheritance { NotPermitted, Observed };

// A SCHED_FIFO 10 thread takes the lock through `lock`, then a SCHED_FIFO 20 thread
// blocks on it. When the higher thread sleeps, *holderPrio receives the holder's
// effective priority: FifoProc(20) with priority inheritance, FifoProc(10) without.
// With inheritance expected, the reading waits up to 5 s for the boost to show.
inline Inheritance ProbeInheritance(const std::function<void()>& lock,
                                    const std::function<void()>& unlock, bool expectBoost,
                                    int* holderPrio) {
    std::promise<pid_t> holding;
    std::promise<void> release;
    std::shared_future<void> released = release.get_future().share();
    std::thread holder([&] {
        if (!MakeCurrentThreadFifo(10)) {
            holding.set_value(0);
            return;
        }
        lock();
        holding.set_value(CurrentTid());
        released.wait();
        unlock();
    });
    const pid_t holderTid = holding.get_future().get();
    if (holderTid == 0) {
        holder.join();
        return Inheritance::NotPermitted;
    }
    std::promise<pid_t> waiting;
    std::thread waiter([&] {
        MakeCurrentThreadFifo(20);
        waiting.set_value(CurrentTid());
        lock();
        unlock();
    });
    const pid_t waiterTid = waiting.get_future().get();
    WaitUntilSleeping(waiterTid, std::chrono::milliseconds(5000));
    char state = 0;
    *holderPrio = 0;
    ReadTaskStat(holderTid, &state, holderPrio);
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(5000);
    while (expectBoost && *holderPrio != FifoProc(20) &&
           std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
        ReadTaskStat(holderTid, &state, holderPrio);
    }
    release.set_value();
    holder.join();
    waiter.join();
    return Inheritance::Observed;
}

}  // namespace testing
}  // namespace qv
