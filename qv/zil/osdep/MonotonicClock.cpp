#include "qv/zil/osdep/MonotonicClock.h"

#include <ctime>

namespace qv {
namespace zil {
namespace osdep {

uint64_t MonotonicClock::Now(uint64_t unitNanoseconds) const {
    if (unitNanoseconds == 0) {
        return 0;
    }
    timespec now{};
    if (clock_gettime(CLOCK_MONOTONIC, &now) != 0) {
        return 0;
    }
    const uint64_t total = static_cast<uint64_t>(now.tv_sec) * m_nNanosecondsPerSecond +
                           static_cast<uint64_t>(now.tv_nsec);
    const uint64_t factor = m_nNanosecondsPerSecond / unitNanoseconds;
    return MulDiv96(total, factor, m_nNanosecondsPerSecond);
}

uint64_t MonotonicClock::MulDiv96(uint64_t value, uint64_t factor, uint64_t divisor) {
    // Schoolbook on 32-bit halves, so it needs no 128-bit type (none exists on 32-bit
    // ARM): value * factor = high * 2^32 + low with factor below 2^32.
    const uint64_t low = (value & 0xFFFFFFFFu) * factor;
    const uint64_t high = (value >> 32) * factor + (low >> 32);
    const uint64_t highQuotient = high / divisor;
    const uint64_t next = ((high % divisor) << 32) | (low & 0xFFFFFFFFu);
    return (highQuotient << 32) + next / divisor;
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
