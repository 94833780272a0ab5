#include "qv/zil/SafeInteger.h"

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {

using exception::OutOfRange;

uint32_t SafeInteger::Add(uint32_t a, uint32_t b) {
    if (b > UINT32_MAX - a) {
        QV_THROW(OutOfRange());
    }
    return a + b;
}

uint32_t SafeInteger::Multiply(uint32_t a, uint32_t b) {
    const uint64_t product = static_cast<uint64_t>(a) * b;
    if (product > UINT32_MAX) {
        QV_THROW(OutOfRange());
    }
    return static_cast<uint32_t>(product);
}

uint32_t SafeInteger::FromSigned(int64_t value) {
    if (value < 0 || value > static_cast<int64_t>(UINT32_MAX)) {
        QV_THROW(OutOfRange());
    }
    return static_cast<uint32_t>(value);
}

}  // namespace zil
}  // namespace qv
