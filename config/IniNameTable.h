// An index from names to elements (sections or keys) that keeps, for each name, the first
// element in list order: open addressing with linear probing over (hash, element) slots, so
// that indexing a large file costs no allocation per entry. Names are hashed trimmed and
// upper-cased like every name comparison of the store; elements carry the hash of their name. Not
// thread-safe; Insert and Rebuild may throw std::bad_alloc, leaving the table as it was.
#pragma once

#include "config/IniText.h"

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace qv_ini {

template <class T>
class NameTable {
public:
    // hash: HashName(name).
    T* Find(std::string_view name, uint32_t hash) const {
        if (m_slots.empty()) {
            return nullptr;
        }
        for (size_t i = hash & Mask(); m_slots[i].element; i = (i + 1) & Mask()) {
            if (m_slots[i].hash == hash && SameName(m_slots[i].element->name, name)) {
                return m_slots[i].element;
            }
        }
        return nullptr;
    }

    // Adds the element unless an element of the same name is indexed already.
    void Insert(T* element) {
        if ((m_count + 1) * 4 > m_slots.size() * 3) {
            Grow();
        }
        const uint32_t hash = element->hash;
        size_t i = hash & Mask();
        for (; m_slots[i].element; i = (i + 1) & Mask()) {
            if (m_slots[i].hash == hash && SameName(m_slots[i].element->name, element->name)) {
                return;
            }
        }
        m_slots[i] = Slot{hash, element};
        ++m_count;
    }

    // Removes the element if it is the one indexed for its name; true when it was.
    bool Erase(const T* element) {
        if (m_slots.empty()) {
            return false;
        }
        size_t i = element->hash & Mask();
        for (; m_slots[i].element != element; i = (i + 1) & Mask()) {
            if (!m_slots[i].element) {
                return false;
            }
        }
        // Backward shift: move later members of the probe run into the hole.
        for (size_t next = (i + 1) & Mask(); m_slots[next].element; next = (next + 1) & Mask()) {
            const size_t home = m_slots[next].hash & Mask();
            if (((next - home) & Mask()) >= ((next - i) & Mask())) {
                m_slots[i] = m_slots[next];
                i = next;
            }
        }
        m_slots[i] = Slot{};
        --m_count;
        return true;
    }

    void Clear() {
        m_slots.clear();
        m_count = 0;
    }

private:
    struct Slot {
        uint32_t hash = 0;
        T* element = nullptr;
    };

    size_t Mask() const { return m_slots.size() - 1; }

    void Grow() {
        std::vector<Slot> old(m_slots.empty() ? 16 : m_slots.size() * 2);
        old.swap(m_slots);
        for (const Slot& slot : old) {
            if (slot.element) {
                size_t i = slot.hash & Mask();
                while (m_slots[i].element) {
                    i = (i + 1) & Mask();
                }
                m_slots[i] = slot;
            }
        }
    }

    std::vector<Slot> m_slots;
    size_t m_count = 0;
};

}  // namespace qv_ini
