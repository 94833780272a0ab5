// Sections, keys and their name indexes; store life and options.
#include "config/IniModel.h"

#include <array>
#include <cctype>
#include <cstring>

namespace qv_ini {

std::string_view TrimRight(std::string_view text) {
    size_t end = text.size();
    while (end > 0 && IsSpace(text[end - 1])) {
        --end;
    }
    return text.substr(0, end);
}

std::string_view Trim(std::string_view text) {
    size_t begin = 0;
    while (begin < text.size() && IsSpace(text[begin])) {
        ++begin;
    }
    return TrimRight(text.substr(begin));
}

Key* Section::Find(std::string_view trimmedName, size_t* position) {
    if (!indexed) {
        // Names that differ mostly differ in length or in the last character (numbered keys),
        // so those are compared first.
        const size_t size = trimmedName.size();
        const unsigned char last = size ? Upper(trimmedName[size - 1]) : 0;
        for (size_t i = 0; i < keys.size(); ++i) {
            const Key& key = *keys[i];
            if (key.nameLength == size && (size == 0 || Upper(key.text[size - 1]) == last) &&
                SameName(key.Name(), trimmedName)) {
                if (position) {
                    *position = i;
                }
                return keys[i];
            }
        }
        return nullptr;
    }
    const size_t found = index.Find(keys, trimmedName, HashName(trimmedName));
    if (found == NameTable::kAbsent) {
        return nullptr;
    }
    if (position) {
        *position = found;
    }
    return keys[found];
}

Key* Section::Append(std::string_view name, std::string_view value, int32_t line, int quote) {
    if (keys.capacity() == keys.size()) {
        keys.reserve(keys.empty() ? 8 : keys.size() * 2);
    }
    Key* key = pool->Make(name, value, line, quote);
    keys.push_back(key);  // cannot throw: there is room
    try {
        if (indexed) {
            index.Insert(keys, keys.size() - 1);  // keeps an earlier key of the same name
        } else if (keys.size() > kIndexThreshold) {
            Reindex();
        }
    } catch (...) {
        keys.pop_back();
        pool->Recycle(key);
        throw;
    }
    return key;
}

Key* Section::AppendWhileReading(std::string_view name, std::string_view value, int32_t line,
                                 int quote) {
    if (keys.capacity() == keys.size()) {
        keys.reserve(keys.empty() ? 8 : keys.size() * 2);
    }
    Key* key = pool->Make(name, value, line, quote);
    keys.push_back(key);  // cannot throw: there is room
    return key;
}

void Section::FinishReading() {
    if (keys.size() <= kIndexThreshold) {
        return;  // read key by key: no duplicates
    }
    index.Clear();
    indexed = false;
    NameTable fresh;
    fresh.Reserve(keys.size());
    size_t kept = 0;
    for (Key* key : keys) {
        keys[kept] = key;
        const size_t first = fresh.Insert(keys, kept);  // no allocation: reserved
        if (first == kept) {
            ++kept;
        } else {
            pool->MoveValue(key, keys[first]);
        }
    }
    keys.resize(kept);
    index = std::move(fresh);
    indexed = true;
}

void Section::Erase(size_t position) {
    if (indexed) {
        index.Remove(keys, position);
    }
    Key* gone = keys[position];
    keys.erase(keys.begin() + static_cast<std::ptrdiff_t>(position));
    pool->Recycle(gone);
}

void Section::Reindex() {
    try {
        NameTable fresh;
        if (keys.size() > kIndexThreshold) {
            fresh.Reserve(keys.size());
            for (size_t i = 0; i < keys.size(); ++i) {
                fresh.Insert(keys, i);
            }
        }
        index = std::move(fresh);
        indexed = keys.size() > kIndexThreshold;
    } catch (...) {
        index.Clear();  // lookups fall back to scanning the list
        indexed = false;
        throw;
    }
}

}  // namespace qv_ini

using qv_ini::Section;

Section* IniStore::FindSection(std::string_view trimmedName) {
    const uint32_t hash = qv_ini::HashName(trimmedName);
    if (current && current->hash == hash && qv_ini::SameName(current->name, trimmedName)) {
        return current;
    }
    const size_t found = sectionIndex.Find(sections, trimmedName, hash);
    if (found == qv_ini::NameTable::kAbsent) {
        return nullptr;
    }
    current = sections[found].get();
    return current;
}

Section* IniStore::FindSection(const char* name) {
    return name ? FindSection(qv_ini::Trim(name)) : nullptr;
}

Section* IniStore::AppendSection(std::string_view name, int32_t line) {
    auto section = std::make_unique<Section>();
    section->pool = &keyPool;
    section->name.assign(name);
    section->hash = qv_ini::HashName(section->name);
    section->line = line;
    Section* raw = section.get();
    sections.push_back(std::move(section));
    try {
        sectionIndex.Insert(sections, sections.size() - 1);
    } catch (...) {
        sections.pop_back();
        throw;
    }
    return raw;
}

void IniStore::EraseSection(size_t position) {
    Section* gone = sections[position].get();
    if (current == gone) {
        current = nullptr;
    }
    sectionIndex.Remove(sections, position);
    for (qv_ini::Key* key : gone->keys) {
        keyPool.Recycle(key);
    }
    sections.erase(sections.begin() + static_cast<std::ptrdiff_t>(position));
}

qv_ini::NameTable IniStore::BuildSectionIndex() const {
    qv_ini::NameTable fresh;
    for (size_t i = 0; i < sections.size(); ++i) {
        fresh.Insert(sections, i);
    }
    return fresh;
}

void IniStore::Clear() {
    current = nullptr;
    sectionIndex.Clear();
    sections.clear();
    keyPool.Reset();
}

qv_ini::Key* IniStore::FindKey(const char* section, const char* key) {
    if (!key) {
        return nullptr;
    }
    Section* found = FindSection(section);
    return found ? found->Find(qv_ini::Trim(key)) : nullptr;
}

IniStore* IniCreate() {
    try {
        auto store = std::make_unique<IniStore>();
        store->scratchSize = 256;
        store->scratch = std::make_unique<char[]>(store->scratchSize);
        return store.release();
    } catch (const std::bad_alloc&) {
        return nullptr;
    }
}

void IniDestroy(IniStore* store) { delete store; }

int IniSetWriteOptions(IniStore* store, int32_t maxLineLength, int breakCharacter,
                       uint32_t writeFlags) {
    if (breakCharacter < 0 || breakCharacter >= 128) {
        return kIniNotInt;
    }
    store->maxLineLength = maxLineLength;
    store->breakCharacter = static_cast<char>(breakCharacter);
    store->writeFlags = writeFlags;
    return 1;
}

int IniSetParseFlags(IniStore* store, uint32_t flags) {
    store->parseFlags = flags;
    return 1;
}
