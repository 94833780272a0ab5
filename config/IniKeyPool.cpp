#include "config/IniKeyPool.h"

namespace qv_ini {

Key* KeyPool::Make() {
    if (m_free) {
        Key* key = m_free;
        m_free = key->nextFree;
        key->nextFree = nullptr;
        return key;
    }
    if (m_used == kChunkKeys) {
        if (m_chunk + 1 == m_chunks.size()) {
            m_chunks.push_back(std::make_unique<Key[]>(kChunkKeys));
        }
        ++m_chunk;
        m_used = 0;
    } else if (m_chunks.empty()) {
        m_chunks.push_back(std::make_unique<Key[]>(kChunkKeys));
    }
    return &m_chunks[m_chunk][m_used++];
}

void KeyPool::Recycle(Key* key) noexcept {
    key->name.clear();
    key->value.clear();
    key->nextFree = m_free;
    m_free = key;
}

void KeyPool::Reset() noexcept {
    m_chunk = 0;
    m_used = 0;
    m_free = nullptr;
}

void KeyPool::Trim() noexcept {
    if (m_chunks.size() > m_chunk + 1) {
        m_chunks.resize(m_chunk + 1);
    }
}

}  // namespace qv_ini
