// Checked arithmetic on the library's unsigned 32-bit size type. Every size
// computation of the strings, converters and serialisers goes through here; an
// overflow throws qv::zil::exception::OutOfRange instead of wrapping.
#pragma once

#include <cstdint>

namespace qv {
namespace zil {

class SafeInteger {
public:
    SafeInteger() = delete;

    // Inline: they run for every string built; only the throw is out of line.
    static uint32_t Add(uint32_t a, uint32_t b) {  // throws when a + b > 0xFFFFFFFF
        if (b > UINT32_MAX - a) {
            ThrowOutOfRange();
        }
        return a + b;
    }
    static uint32_t Multiply(uint32_t a, uint32_t b) {  // throws when a * b > 0xFFFFFFFF
        const uint64_t product = static_cast<uint64_t>(a) * b;
        if (product > UINT32_MAX) {
            ThrowOutOfRange();
        }
        return static_cast<uint32_t>(product);
    }
    static uint32_t FromSigned(int64_t value) {  // throws when value < 0 or too large
        if (value < 0 || value > static_cast<int64_t>(UINT32_MAX)) {
            ThrowOutOfRange();
        }
        return static_cast<uint32_t>(value);
    }

private:
    [[noreturn]] static void ThrowOutOfRange();
};

}  // namespace zil
}  // namespace qv
