// The text of one store's keys: names and values, each NUL-terminated, packed into chunks
// owned by the arena, so that reading a large file costs one allocation per chunk instead of
// one or two per key. Text is never freed one piece at a time: a piece that is no longer used
// is only counted as released, and the owner copies what is still used into a fresh arena
// (Swap) when too much has been released. Reset drops all text but keeps the chunks for the
// next read. Not thread-safe, like the store. Allocate may throw std::bad_alloc.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

namespace qv_ini {

class TextArena {
public:
    TextArena() = default;
    TextArena(const TextArena&) = delete;
    TextArena& operator=(const TextArena&) = delete;

    // Room for size bytes, valid until Reset or the arena is destroyed.
    char* Allocate(size_t size);
    // A NUL-terminated copy of text.
    char* Copy(std::string_view text);
    // Counts size bytes handed out earlier as no longer used.
    void Release(size_t size) noexcept { m_released += size; }
    size_t Used() const { return m_handedOut - m_released; }
    size_t Released() const { return m_released; }

    void Reset() noexcept;
    // Frees the chunks after the one in use.
    void Trim() noexcept;
    void Swap(TextArena& other) noexcept;

private:
    static constexpr size_t kFirstChunk = 1024;
    static constexpr size_t kLargestChunk = 64 * 1024;  // below glibc's mmap threshold

    struct Chunk {
        std::unique_ptr<char[]> bytes;
        size_t size = 0;
    };

    std::vector<Chunk> m_chunks;
    size_t m_chunk = 0;  // the chunk text is taken from, when there is one
    size_t m_used = 0;   // bytes taken from it
    size_t m_handedOut = 0;
    size_t m_released = 0;
};

}  // namespace qv_ini
