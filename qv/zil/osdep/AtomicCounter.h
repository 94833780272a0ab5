// Atomic operations on a shared 32-bit word, for counters that several threads change
// without a lock. Increment and decrement return the new value; they wrap around at the
// 32-bit limits like unsigned arithmetic. Never fail.
#pragma once

#include <cstdint>

namespace qv {
namespace zil {
namespace osdep {

int32_t AtomicIncrement(int32_t* word);
int32_t AtomicDecrement(int32_t* word);
// Writes `value`, then a full memory barrier.
void AtomicStore(int32_t* word, int32_t value);

}  // namespace osdep
}  // namespace zil
}  // namespace qv
