// Storage for the keys of one store: Key objects come from chunks of 128 and stay owned by
// the pool; a removed key (with its string buffers) goes on a free list and is reused by the
// next key made, and a re-read reuses all of them. Reading a large file thus costs a few
// allocations per hundred keys instead of one per key. Not thread-safe, like the store. Make may
// throw std::bad_alloc; recycling never fails.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace qv_ini {

struct Key {
    std::string name;
    uint32_t hash = 0;  // HashName(name)
    std::string value;
    int32_t line = -1;
    int quote = 0;
    Key* nextFree = nullptr;  // while on the pool's free list
};

class KeyPool {
public:
    KeyPool() = default;
    KeyPool(const KeyPool&) = delete;
    KeyPool& operator=(const KeyPool&) = delete;

    Key* Make();
    void Recycle(Key* key) noexcept;
    // Takes every key back at once (only when none is referenced any more); the chunks and
    // the keys' string buffers are kept for the keys made next, as when a file is re-read.
    void Reset() noexcept;
    // Frees the chunks after the one in use, so memory follows what the store holds.
    void Trim() noexcept;

private:
    static constexpr size_t kChunkKeys = 128;

    std::vector<std::unique_ptr<Key[]>> m_chunks;
    size_t m_chunk = 0;  // the chunk keys are taken from
    size_t m_used = 0;   // keys taken from it
    Key* m_free = nullptr;
};

}  // namespace qv_ini
