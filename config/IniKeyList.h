// The keys of one section in order: an array of pointers to keys owned by the store's KeyPool.
// Like std::vector<Key*> in the parts the model uses, but grown with realloc, which moves a
// large array by remapping its pages instead of copying it into fresh memory: reading a
// 100k-key section then touches its final array once, not every smaller one before it. Not
// thread-safe, like the store; reserve and push_back may throw std::bad_alloc, leaving the list
// as it was.
#pragma once

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <new>

namespace qv_ini {

struct Key;

class KeyList {
public:
    KeyList() = default;
    ~KeyList() { std::free(m_keys); }
    KeyList(const KeyList&) = delete;
    KeyList& operator=(const KeyList&) = delete;

    size_t size() const { return m_size; }
    bool empty() const { return m_size == 0; }
    size_t capacity() const { return m_capacity; }
    Key*& operator[](size_t i) { return m_keys[i]; }
    Key* operator[](size_t i) const { return m_keys[i]; }
    Key** begin() { return m_keys; }
    Key** end() { return m_keys + m_size; }
    Key* const* begin() const { return m_keys; }
    Key* const* end() const { return m_keys + m_size; }

    void reserve(size_t count) {
        if (count <= m_capacity) {
            return;
        }
        if (count > static_cast<size_t>(-1) / sizeof(Key*)) {
            throw std::bad_alloc();
        }
        void* grown = std::realloc(m_keys, count * sizeof(Key*));
        if (!grown) {
            throw std::bad_alloc();
        }
        m_keys = static_cast<Key**>(grown);
        m_capacity = count;
    }
    void push_back(Key* key) {
        if (m_size == m_capacity) {
            reserve(m_capacity ? m_capacity * 2 : 8);
        }
        m_keys[m_size++] = key;
    }
    void pop_back() { --m_size; }
    // Shrinks to count keys (never grows).
    void resize(size_t count) {
        if (count < m_size) {
            m_size = count;
        }
    }
    void erase(Key** first, Key** last) {
        std::memmove(first, last, static_cast<size_t>(end() - last) * sizeof(Key*));
        m_size -= static_cast<size_t>(last - first);
    }
    void erase(Key** at) { erase(at, at + 1); }

private:
    Key** m_keys = nullptr;
    size_t m_size = 0;
    size_t m_capacity = 0;
};

}  // namespace qv_ini
