// The in-memory model behind IniStore (private to config/): sections and keys in order, plus
// a name index beside each ordered list (IniNameTable.h) so that lookups stay fast on large files
// while the answer is still "the first match in order". Not thread-safe, like the store itself.
#pragma once

#include "config/IniKeyPool.h"
#include "config/IniNameTable.h"
#include "config/IniStore.h"

#include <cstdint>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

namespace qv_ini {

// Names compare after trimming white space at both ends, byte by byte after toupper.
std::string_view Trim(std::string_view text);
std::string_view TrimRight(std::string_view text);

struct Section {
    std::string name;
    uint32_t hash = 0;        // HashName(name)
    std::vector<Key*> keys;   // owned by the pool
    KeyPool* pool = nullptr;  // the store's
    int32_t line = -1;
    NameTable<Key> index;  // filled only once the section has many keys
    bool indexed = false;

    Key* Find(std::string_view trimmedName, size_t* position = nullptr);
    Key* Append(std::string_view name, std::string_view value, int32_t line, int quote);
    void Erase(size_t position);  // gives the key back to the pool
    void Reindex();
};

}  // namespace qv_ini

struct IniStore {
    qv_ini::KeyPool keyPool;  // outlives the sections, whose keys it holds
    std::vector<std::unique_ptr<qv_ini::Section>> sections;
    qv_ini::Section* current = nullptr;
    int mergeDuplicates = 1;
    std::unique_ptr<char[]> scratch;
    size_t scratchSize = 0;
    int32_t maxLineLength = 80;
    char breakCharacter = 0;
    uint32_t writeFlags = 0x2E;
    uint32_t parseFlags = 2;
    std::string path;
    int32_t modificationTime = 0;
    qv_ini::NameTable<qv_ini::Section> sectionIndex;

    // The section of that name (current one first, then the first in order); makes it
    // current. Null when absent or the name is null.
    qv_ini::Section* FindSection(const char* name);
    qv_ini::Section* FindSection(std::string_view trimmedName);
    qv_ini::Section* AppendSection(std::string_view name, int32_t line);
    // Both leave the store as it was when memory runs out.
    void EraseSection(size_t position);
    qv_ini::NameTable<qv_ini::Section> BuildSectionIndex(
        const qv_ini::Section* without = nullptr) const;
    void Clear();
    // The key of that section and name, or null.
    qv_ini::Key* FindKey(const char* section, const char* key);
};

namespace qv_ini {

// Runs f and turns memory exhaustion into kIniNoMemory.
template <class F>
int NoThrow(F&& f) noexcept {
    try {
        return f();
    } catch (const std::bad_alloc&) {
        return kIniNoMemory;
    } catch (const std::length_error&) {
        return kIniNoMemory;
    }
}

// Serialises the store as the writers put it on disk; 0, or kIniCannotSplit.
int Serialize(const IniStore& store, std::string* text);

}  // namespace qv_ini
