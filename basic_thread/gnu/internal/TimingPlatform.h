// Absolute deadlines for the mthread condition waits, on the real-time clock
// (gettimeofday), so changing the system time moves a pending deadline. Stateless and
// thread-safe; a null deadline pointer is a programming error that aborts.
#pragma once

#include <sys/time.h>

#include <cstdint>
#include <ctime>

namespace mthread {

class TimingPlatform {
public:
    // *deadline = now + timeoutMs, with now read from gettimeofday.
    static void CalculateTimeout(timespec* deadline, uint32_t timeoutMs);
    // The same from a given `now`.
    static void CalculateTimeout(timespec* deadline, uint32_t timeoutMs, const timeval& now);
};

}  // namespace mthread
