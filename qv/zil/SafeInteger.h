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

    static uint32_t Add(uint32_t a, uint32_t b);       // throws when a + b > 0xFFFFFFFF
    static uint32_t Multiply(uint32_t a, uint32_t b);  // throws when a * b > 0xFFFFFFFF
    static uint32_t FromSigned(int64_t value);         // throws when value < 0 or too large
};

}  // namespace zil
}  // namespace qv
