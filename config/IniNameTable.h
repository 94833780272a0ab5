// An index from names to the positions of elements (sections or keys) in an ordered list,
// keeping for each name the first element in list order. Open addressing with linear probing
// over 8-byte (hash, position) slots in a table sized to the number of names (at most 3/4
// full), so that indexing a large file costs no allocation per entry and the table stays small
// (100k keys: 1.1 MB) and grows in step with the file. The list is passed to every
// call that compares names: any sequence of pointers (Key*, unique_ptr<Section>) whose
// elements have Name() and Hash() (HashName of the name, trimmed and upper-cased like every
// name comparison of the store; the slots keep it, so it is asked for once per insertion). Not
// thread-safe; Insert may throw std::bad_alloc, leaving the table as it was.
#pragma once

#include "config/IniText.h"

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

namespace qv_ini {

class NameTable {
public:
    static constexpr size_t kAbsent = static_cast<size_t>(-1);

    // The position of the first element named name, or kAbsent; hash: HashName(name).
    template <class List>
    size_t Find(const List& list, std::string_view name, uint32_t hash) const {
        if (m_slots.empty()) {
            return kAbsent;
        }
        for (size_t i = Home(hash); m_slots[i].position != kEmpty; i = Next(i)) {
            if (m_slots[i].hash == hash && SameName(list[m_slots[i].position]->Name(), name)) {
                return m_slots[i].position;
            }
        }
        return kAbsent;
    }

    // Makes room for count elements, so that inserting up to that many allocates nothing.
    void Reserve(size_t count) {
        size_t size = count / 3 * 4 + 4;  // at least count * 4 / 3
        if (size < 16) {
            size = 16;
        }
        if (count * 4 > m_slots.size() * 3) {
            Rehash(size);
        }
    }

    // Adds list[position] unless an element of the same name is indexed already; the
    // position of the element indexed for the name.
    template <class List>
    size_t Insert(const List& list, size_t position) {
        if ((m_count + 1) * 4 > m_slots.size() * 3) {
            Grow();
        }
        const auto& element = list[position];
        const uint32_t hash = element->Hash();
        size_t i = Home(hash);
        for (; m_slots[i].position != kEmpty; i = Next(i)) {
            if (m_slots[i].hash == hash &&
                SameName(list[m_slots[i].position]->Name(), element->Name())) {
                return m_slots[i].position;
            }
        }
        m_slots[i] = Slot{hash, static_cast<uint32_t>(position)};
        ++m_count;
        return position;
    }

    // To call before the list loses the element at position: drops it from the index, moves
    // the later positions down by one and indexes the next element of the same name, if any,
    // in its place. Never allocates.
    template <class List>
    void Remove(const List& list, size_t position) {
        const auto& gone = list[position];
        const uint32_t hash = gone->Hash();
        const bool indexed = Erase(position, hash);
        Shift(position);
        if (!indexed) {
            return;
        }
        for (size_t next = position + 1; next < list.size(); ++next) {
            if (SameName(list[next]->Name(), gone->Name())) {
                Place(hash, next - 1);  // its position once the list has lost gone
                return;
            }
        }
    }

    void Clear() {
        m_slots.clear();
        m_count = 0;
    }

private:
    static constexpr uint32_t kEmpty = UINT32_MAX;

    struct Slot {
        uint32_t hash = 0;
        uint32_t position = kEmpty;
    };

    // The slot a hash belongs in: the table need not be a power of two in size, so it follows
    // the number of names instead of doubling past it.
    size_t Home(uint32_t hash) const {
        return static_cast<size_t>((static_cast<uint64_t>(hash) * m_slots.size()) >> 32);
    }
    size_t Next(size_t i) const { return i + 1 == m_slots.size() ? 0 : i + 1; }
    // Steps from slot from forward (wrapping) to slot to.
    size_t Distance(size_t from, size_t to) const {
        return to >= from ? to - from : to + m_slots.size() - from;
    }

    // Removes the slot of that position (hash: its element's) if there is one; true when there
    // was.
    bool Erase(size_t position, uint32_t hash) {
        if (m_slots.empty()) {
            return false;
        }
        size_t i = Home(hash);
        for (; m_slots[i].position != position; i = Next(i)) {
            if (m_slots[i].position == kEmpty) {
                return false;
            }
        }
        // Backward shift: move later members of the probe run into the hole.
        for (size_t next = Next(i); m_slots[next].position != kEmpty; next = Next(next)) {
            const size_t home = Home(m_slots[next].hash);
            if (Distance(home, next) >= Distance(i, next)) {
                m_slots[i] = m_slots[next];
                i = next;
            }
        }
        m_slots[i] = Slot{};
        --m_count;
        return true;
    }

    // The positions after position move down by one.
    void Shift(size_t position) {
        for (Slot& slot : m_slots) {
            if (slot.position != kEmpty && slot.position > position) {
                --slot.position;
            }
        }
    }

    // A slot for a name not indexed yet, in a table with room (the caller just freed one).
    void Place(uint32_t hash, size_t position) {
        size_t i = Home(hash);
        while (m_slots[i].position != kEmpty) {
            i = Next(i);
        }
        m_slots[i] = Slot{hash, static_cast<uint32_t>(position)};
        ++m_count;
    }

    void Grow() { Rehash(m_slots.empty() ? 16 : m_slots.size() * 2); }

    void Rehash(size_t size) {
        std::vector<Slot> old(size);
        old.swap(m_slots);
        for (const Slot& slot : old) {
            if (slot.position != kEmpty) {
                size_t i = Home(slot.hash);
                while (m_slots[i].position != kEmpty) {
                    i = Next(i);
                }
                m_slots[i] = slot;
            }
        }
    }

    std::vector<Slot> m_slots;
    size_t m_count = 0;
};

}  // namespace qv_ini
