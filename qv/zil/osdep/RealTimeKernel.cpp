#include "qv/zil/osdep/RealTimeKernel.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <ctime>

namespace qv {
namespace zil {
namespace osdep {

namespace {

// Constant-initialised, so the check works from other objects' static constructors.
std::atomic<int32_t> g_spinLock{0};
std::atomic<bool> g_done{false};
std::atomic<bool> g_answer{false};
std::atomic<const char*> g_path{internal::kRealTimeKernelPath};

// Takes the process-wide spin lock; the k-th failed attempt sleeps min(k, 100) ms.
void AcquireSpinLock() {
    for (uint32_t attempt = 0;; ++attempt) {
        int32_t expected = 0;
        if (g_spinLock.compare_exchange_strong(expected, 1, std::memory_order_acquire)) {
            return;
        }
        internal::SleepMilliseconds(std::min<uint32_t>(attempt, 100));
    }
}

void ReleaseSpinLock() { g_spinLock.store(0, std::memory_order_release); }

bool ReadRealTimeFlag(const char* path) {
    const int fd = ::open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0) {
        return false;
    }
    char first = 0;
    const ssize_t got = ::read(fd, &first, 1);
    ::close(fd);
    return got == 1 && first == '1';
}

}  // namespace

bool IsRealTimeKernel() {
    if (g_done.load(std::memory_order_acquire)) {
        return g_answer.load(std::memory_order_relaxed);
    }
    AcquireSpinLock();
    if (!g_done.load(std::memory_order_relaxed)) {
        g_answer.store(ReadRealTimeFlag(g_path.load()), std::memory_order_relaxed);
        g_done.store(true, std::memory_order_release);
    }
    const bool answer = g_answer.load(std::memory_order_relaxed);
    ReleaseSpinLock();
    return answer;
}

namespace internal {

void ResetRealTimeKernelCheck(const char* path) {
    AcquireSpinLock();
    g_path.store(path);
    g_done.store(false, std::memory_order_release);
    ReleaseSpinLock();
}

void SleepMilliseconds(uint32_t milliseconds) {
    timespec remaining{};
    remaining.tv_sec = static_cast<time_t>(milliseconds / 1000);
    remaining.tv_nsec = static_cast<long>(milliseconds % 1000) * 1000000L;
    // clock_nanosleep returns the error number itself and fills in what is left of a
    // relative sleep when a signal handler interrupted it.
    while (::clock_nanosleep(CLOCK_MONOTONIC, 0, &remaining, &remaining) == EINTR) {
    }
}

}  // namespace internal
}  // namespace osdep
}  // namespace zil
}  // namespace qv
