#include "basic_thread/gnu/internal/TimingPlatform.h"

#include <cstddef>

#include "basic_thread/gnu/internal/Assertion.h"

namespace mthread {

namespace {
constexpr const char* kFile = "gnu/internal/TimingPlatform";
}

void TimingPlatform::CalculateTimeout(timespec* timeout, uint32_t timeoutMs) {
    MTHREAD_ASSERT(timeout != NULL, kFile);
    timeval now{};
    gettimeofday(&now, nullptr);
    CalculateTimeout(timeout, timeoutMs, now);
}

void TimingPlatform::CalculateTimeout(timespec* timeout, uint32_t timeoutMs, const timeval& now) {
    MTHREAD_ASSERT(timeout != NULL, kFile);
    // Both terms stay below 10^9, so their sum fits a 32-bit long and one carry suffices.
    timeout->tv_sec = now.tv_sec + static_cast<time_t>(timeoutMs / 1000);
    timeout->tv_nsec =
        static_cast<long>(now.tv_usec) * 1000L + static_cast<long>(timeoutMs % 1000) * 1000000L;
    if (timeout->tv_nsec > 999999999L) {
        timeout->tv_nsec -= 1000000000L;
        timeout->tv_sec += 1;
    }
}

}  // namespace mthread
