// Sections, keys and their name indexes; store life and options.
#include "config/IniModel.h"

#include <array>
#include <cctype>
#include <cstring>

namespace qv_ini {
namespace {

// Keys beyond this count get a hash index; smaller sections are scanned.
constexpr size_t kIndexThreshold = 16;

}  // namespace

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
    const uint32_t hash = HashName(trimmedName);
    if (!indexed) {
        for (size_t i = 0; i < keys.size(); ++i) {
            if (keys[i]->hash == hash && SameName(keys[i]->name, trimmedName)) {
                if (position) {
                    *position = i;
                }
                return keys[i];
            }
        }
        return nullptr;
    }
    Key* found = index.Find(trimmedName, hash);
    if (found && position) {
        for (size_t i = 0; i < keys.size(); ++i) {
            if (keys[i] == found) {
                *position = i;
                break;
            }
        }
    }
    return found;
}

Key* Section::Append(std::string_view name, std::string_view value, int32_t line, int quote) {
    Key* key = pool->Make();
    try {
        key->name.assign(name);
        key->hash = HashName(key->name);
        key->value.assign(value);
        key->line = line;
        key->quote = quote;
        if (keys.empty()) {
            keys.reserve(8);
        }
        keys.push_back(key);
    } catch (...) {
        pool->Recycle(key);
        throw;
    }
    try {
        if (indexed) {
            index.Insert(key);  // keeps an earlier key of the same name
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

void Section::Erase(size_t position) {
    Key* gone = keys[position];
    if (indexed && index.Erase(gone)) {
        for (size_t i = position + 1; i < keys.size(); ++i) {
            if (SameName(keys[i]->name, gone->name)) {
                index.Insert(keys[i]);
                break;
            }
        }
    }
    keys.erase(keys.begin() + static_cast<std::ptrdiff_t>(position));
    pool->Recycle(gone);
}

void Section::Reindex() {
    try {
        NameTable<Key> fresh;
        if (keys.size() > kIndexThreshold) {
            for (const auto& key : keys) {
                fresh.Insert(key);
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
    Section* found = sectionIndex.Find(trimmedName, hash);
    if (found) {
        current = found;
    }
    return found;
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
        sectionIndex.Insert(raw);
    } catch (...) {
        sections.pop_back();
        throw;
    }
    return raw;
}

void IniStore::EraseSection(size_t position) {
    Section* gone = sections[position].get();
    qv_ini::NameTable<Section> fresh = BuildSectionIndex(gone);
    if (current == gone) {
        current = nullptr;
    }
    for (qv_ini::Key* key : gone->keys) {
        keyPool.Recycle(key);
    }
    sections.erase(sections.begin() + static_cast<std::ptrdiff_t>(position));
    sectionIndex = std::move(fresh);
}

qv_ini::NameTable<Section> IniStore::BuildSectionIndex(const Section* without) const {
    qv_ini::NameTable<Section> fresh;
    for (const auto& section : sections) {
        if (section.get() != without) {
            fresh.Insert(section.get());
        }
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
