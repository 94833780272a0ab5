// The in-memory model behind IniStore (private to config/): sections and keys in order, plus
// a name index of positions beside each ordered list (IniNameTable.h) so that lookups stay fast
// on large files while the answer is still "the first match in order". Keys and their text are
// owned by the store's KeyPool (chunks and a text arena); a section holds pointers to its keys
// in order. Not thread-safe, like the store itself.
#pragma once

#include "config/IniKeyList.h"
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

// Sections with more keys than this get a name index; smaller ones are scanned.
constexpr size_t kIndexThreshold = 16;

struct Section {
    std::string name;
    uint32_t hash = 0;        // HashName(name)
    KeyList keys;             // owned by the pool
    KeyPool* pool = nullptr;  // the store's
    int32_t line = -1;
    NameTable index;  // positions in keys, filled only once the section has many keys
    bool indexed = false;

    std::string_view Name() const { return name; }
    uint32_t Hash() const { return hash; }

    Key* Find(std::string_view trimmedName, size_t* position = nullptr);
    Key* Append(std::string_view name, std::string_view value, int32_t line, int quote);
    void Erase(size_t position);  // gives the key back to the pool
    void Reindex();

    // Reading a file: while a section has at most kIndexThreshold keys the reader merges a
    // repeated name itself (Find); beyond, it only appends, without looking for an earlier key
    // of the name or indexing. FinishReading then merges every later key of a name into the
    // first one (which takes its value, line and quote, as reading key by key would have done)
    // and builds the index once at its final size, instead of growing it table by table.
    Key* AppendWhileReading(std::string_view name, std::string_view value, int32_t line, int quote);
    void FinishReading();  // may throw std::bad_alloc, leaving the section unindexed
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
    qv_ini::NameTable sectionIndex;  // positions in sections

    // The section of that name (current one first, then the first in order); makes it
    // current. Null when absent or the name is null.
    qv_ini::Section* FindSection(const char* name);
    qv_ini::Section* FindSection(std::string_view trimmedName);
    // Leaves the store as it was when memory runs out.
    qv_ini::Section* AppendSection(std::string_view name, int32_t line);
    void EraseSection(size_t position);  // never fails
    qv_ini::NameTable BuildSectionIndex() const;
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
