#include "config/IniKeyPool.h"

#include "config/IniText.h"

#include <cstring>
#include <new>

namespace qv_ini {
namespace {

// Released text is copied away only beyond this many bytes, so small stores never compact.
constexpr size_t kCompactAbove = 64 * 1024;

size_t TextSize(const Key& key) { return size_t{key.nameLength} + key.valueLength + 2; }

// Room for name and value with their NULs, both copied in; the lengths must fit a Key.
char* CopyText(TextArena* arena, std::string_view name, std::string_view value) {
    if (name.size() >= Key::kFree - 1 || value.size() >= Key::kFree - 1) {
        throw std::bad_alloc();
    }
    char* text = arena->Allocate(name.size() + value.size() + 2);
    std::memcpy(text, name.data(), name.size());
    text[name.size()] = '\0';
    if (!value.empty()) {
        std::memcpy(text + name.size() + 1, value.data(), value.size());
    }
    text[name.size() + 1 + value.size()] = '\0';
    return text;
}

}  // namespace

uint32_t Key::Hash() const { return HashName(Name()); }

Key* KeyPool::Make(std::string_view name, std::string_view value, int32_t line, int32_t quote) {
    char* text = CopyText(&m_text, name, value);
    Key* key;
    if (m_free) {
        key = m_free;
        m_free = key->nextFree;
    } else {
        if (m_chunks.empty() || m_used == kChunkKeys) {
            const size_t next = m_chunks.empty() ? 0 : m_chunk + 1;
            if (next == m_chunks.size()) {
                try {
                    m_chunks.push_back(std::make_unique<Key[]>(kChunkKeys));
                } catch (...) {
                    m_text.Release(name.size() + value.size() + 2);
                    throw;
                }
            }
            m_chunk = next;
            m_used = 0;
        }
        key = &m_chunks[m_chunk][m_used++];
    }
    key->text = text;
    key->nameLength = static_cast<uint32_t>(name.size());
    key->valueLength = static_cast<uint32_t>(value.size());
    key->line = line;
    key->quote = quote;
    return key;
}

void KeyPool::SetValue(Key* key, std::string_view value) {
    if (value.size() <= key->valueLength) {
        char* room = key->text + key->nameLength + 1;
        std::memmove(room, value.data(), value.size());
        room[value.size()] = '\0';
        m_text.Release(key->valueLength - value.size());
        key->valueLength = static_cast<uint32_t>(value.size());
        return;
    }
    SetText(key, key->Name(), value);
}

void KeyPool::SetText(Key* key, std::string_view name, std::string_view value) {
    // The old text stays where it is, so name and value may be read from it.
    char* text = CopyText(&m_text, name, value);
    m_text.Release(TextSize(*key));
    key->text = text;
    key->nameLength = static_cast<uint32_t>(name.size());
    key->valueLength = static_cast<uint32_t>(value.size());
}

void KeyPool::Recycle(Key* key) noexcept {
    m_text.Release(TextSize(*key));
    key->nameLength = Key::kFree;
    key->valueLength = 0;
    key->nextFree = m_free;
    m_free = key;
}

void KeyPool::MoveValue(Key* from, Key* into) noexcept {
    std::memcpy(from->text, into->text, into->nameLength);  // same length: same name
    m_text.Release(TextSize(*into));
    into->text = from->text;
    into->valueLength = from->valueLength;
    into->line = from->line;
    into->quote = from->quote;
    from->nameLength = Key::kFree;
    from->valueLength = 0;
    from->nextFree = m_free;
    m_free = from;
}

void KeyPool::Reset() noexcept {
    m_chunk = 0;
    m_used = 0;
    m_free = nullptr;
    m_text.Reset();
}

void KeyPool::Trim() noexcept {
    if (m_chunks.size() > m_chunk + 1) {
        m_chunks.resize(m_chunk + 1);
    }
    m_text.Trim();
}

void KeyPool::Compact() noexcept {
    if (m_text.Released() <= kCompactAbove || m_text.Released() <= m_text.Used()) {
        return;
    }
    TextArena fresh;
    char* next = nullptr;
    try {
        next = fresh.Allocate(m_text.Used());
    } catch (...) {
        return;
    }
    for (size_t c = 0; c < m_chunks.size() && c <= m_chunk; ++c) {
        const size_t count = c == m_chunk ? m_used : kChunkKeys;
        for (size_t k = 0; k < count; ++k) {
            Key& key = m_chunks[c][k];
            if (key.nameLength == Key::kFree) {
                continue;  // on the free list
            }
            const size_t size = TextSize(key);
            std::memcpy(next, key.text, size);
            key.text = next;
            next += size;
        }
    }
    m_text.Swap(fresh);
}

}  // namespace qv_ini
