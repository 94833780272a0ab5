// Reads CLOCK_MONOTONIC in ticks of a chosen number of nanoseconds (1000000 gives
// milliseconds). Stateless apart from a constant; may be used from any thread. When the
// clock cannot be read, or for a unit of 0, Now answers 0.
#pragma once

#include <cstdint>

namespace qv {
namespace zil {
namespace osdep {

class MonotonicClock {
public:
    MonotonicClock() = default;

    uint64_t Now(uint64_t unitNanoseconds) const;

    // value * factor / divisor with the product formed in 96 bits; the quotient must fit
    // in 64 bits, and factor and divisor must be below 2^32.
    static uint64_t MulDiv96(uint64_t value, uint64_t factor, uint64_t divisor);

private:
    uint64_t m_nNanosecondsPerSecond = 1000000000u;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
