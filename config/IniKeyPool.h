// Storage for the keys of one store. Key objects come from chunks of 256 and stay owned by the
// pool; the text of each key (name, NUL, value, NUL) lives in the pool's TextArena. A removed
// key goes on a free list and is reused by the next key made; a re-read reuses the chunks and
// the text memory. Reading a large file thus costs a few allocations per thousand keys instead
// of two or three per key, and a key takes 24 bytes (20 on 32-bit targets) plus its text. Text
// given up by a removed key or a replaced value is copied away by Compact once it outweighs the
// text in use. Not thread-safe, like the store. Make, SetValue and SetText may throw
// std::bad_alloc, leaving the key as it was; recycling never fails.
#pragma once

#include "config/IniTextArena.h"

#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

namespace qv_ini {

struct Key {
    union {
        char* text;     // name, NUL, value, NUL, in the pool's arena
        Key* nextFree;  // while on the pool's free list
    };
    uint32_t nameLength = 0;  // kFree while on the free list
    uint32_t valueLength = 0;
    int32_t line = -1;
    int32_t quote = 0;

    static constexpr uint32_t kFree = UINT32_MAX;

    Key() : text(nullptr) {}
    std::string_view Name() const { return {text, nameLength}; }
    std::string_view Value() const { return {ValueText(), valueLength}; }
    const char* NameText() const { return text; }
    const char* ValueText() const { return text + nameLength + 1; }
    uint32_t Hash() const;  // HashName(Name()), computed: the index keeps it
};

class KeyPool {
public:
    KeyPool() = default;
    KeyPool(const KeyPool&) = delete;
    KeyPool& operator=(const KeyPool&) = delete;

    // A key with copies of name and value.
    Key* Make(std::string_view name, std::string_view value, int32_t line, int32_t quote);
    // Replaces the value; in place when the new one is not longer. value may point into the
    // store's text.
    void SetValue(Key* key, std::string_view value);
    // Replaces the name and the value at once; they may point into the store's text.
    void SetText(Key* key, std::string_view name, std::string_view value);
    void Recycle(Key* key) noexcept;
    // Gives from's value, line and quote to into, whose name is the same but for case, and
    // recycles from. Nothing is allocated: into takes from's text, with its own spelling of
    // the name copied over.
    void MoveValue(Key* from, Key* into) noexcept;
    // Takes every key back at once (only when none is referenced any more); the chunks and
    // the text memory are kept for the keys made next, as when a file is re-read.
    void Reset() noexcept;
    // Frees the chunks after the ones in use, so memory follows what the store holds.
    void Trim() noexcept;
    // Copies the text of the keys in use into a fresh arena when the text given up outweighs
    // it. Moves every name and value: call it only when no Key text is referenced. Memory
    // exhaustion just leaves the text where it is.
    void Compact() noexcept;

private:
    static constexpr size_t kChunkKeys = 256;

    std::vector<std::unique_ptr<Key[]>> m_chunks;
    size_t m_chunk = 0;  // the chunk keys are taken from
    size_t m_used = 0;   // keys taken from it
    Key* m_free = nullptr;
    TextArena m_text;
};

}  // namespace qv_ini
