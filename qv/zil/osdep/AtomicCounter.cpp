#include "qv/zil/osdep/AtomicCounter.h"

namespace qv {
namespace zil {
namespace osdep {

namespace {
// Adds `delta` with a compare-and-swap loop and returns the value it wrote.
int32_t AtomicAdd(int32_t* word, uint32_t delta) {
    int32_t seen = __atomic_load_n(word, __ATOMIC_RELAXED);
    int32_t wanted;
    do {
        wanted = static_cast<int32_t>(static_cast<uint32_t>(seen) + delta);
    } while (!__atomic_compare_exchange_n(word, &seen, wanted, false, __ATOMIC_SEQ_CST,
                                          __ATOMIC_RELAXED));
    return wanted;
}
}  // namespace

int32_t AtomicIncrement(int32_t* word) { return AtomicAdd(word, 1u); }

int32_t AtomicDecrement(int32_t* word) { return AtomicAdd(word, 0xFFFFFFFFu); }

void AtomicStore(int32_t* word, int32_t value) {
    // A sequentially consistent store is followed by a full barrier on every target
    // (dmb after the store on ARM, an exchange on x86), and ThreadSanitizer models it.
    __atomic_store_n(word, value, __ATOMIC_SEQ_CST);
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
