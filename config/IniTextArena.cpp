#include "config/IniTextArena.h"

#include <cstring>
#include <utility>

namespace qv_ini {

char* TextArena::Allocate(size_t size) {
    if (m_chunks.empty() || m_chunks[m_chunk].size - m_used < size) {
        // Move on to the next kept chunk when it is large enough, else put a new one there.
        const size_t next = m_chunks.empty() ? 0 : m_chunk + 1;
        if (next == m_chunks.size() || m_chunks[next].size < size) {
            size_t chunkSize = m_chunks.empty() ? kFirstChunk : m_chunks[m_chunk].size * 2;
            if (chunkSize > kLargestChunk) {
                chunkSize = kLargestChunk;
            }
            if (chunkSize < size) {
                chunkSize = size;
            }
            Chunk chunk;
            chunk.bytes.reset(new char[chunkSize]);
            chunk.size = chunkSize;
            m_chunks.insert(m_chunks.begin() + static_cast<std::ptrdiff_t>(next), std::move(chunk));
        }
        m_chunk = next;
        m_used = 0;
    }
    char* room = m_chunks[m_chunk].bytes.get() + m_used;
    m_used += size;
    m_handedOut += size;
    return room;
}

char* TextArena::Copy(std::string_view text) {
    char* copy = Allocate(text.size() + 1);
    if (!text.empty()) {
        std::memcpy(copy, text.data(), text.size());
    }
    copy[text.size()] = '\0';
    return copy;
}

void TextArena::Reset() noexcept {
    m_chunk = 0;
    m_used = 0;
    m_handedOut = 0;
    m_released = 0;
}

void TextArena::Trim() noexcept {
    if (m_chunks.size() > m_chunk + 1) {
        m_chunks.resize(m_chunk + 1);
    }
}

void TextArena::Swap(TextArena& other) noexcept {
    m_chunks.swap(other.m_chunks);
    std::swap(m_chunk, other.m_chunk);
    std::swap(m_used, other.m_used);
    std::swap(m_handedOut, other.m_handedOut);
    std::swap(m_released, other.m_released);
}

}  // namespace qv_ini
