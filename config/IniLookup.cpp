// Lookup by name and by position. A section found by name becomes the current section,
// which the next lookup tries first.
#include "config/IniModel.h"

using qv_ini::Key;
using qv_ini::Section;

namespace {

// The key at a position counted from 1, or null.
Key* KeyAt(IniStore* store, const char* section, int position) {
    Section* found = store->FindSection(section);
    if (!found || position < 1 || static_cast<size_t>(position) > found->keys.size()) {
        return nullptr;
    }
    return found->keys[static_cast<size_t>(position) - 1];
}

}  // namespace

int IniSectionExists(IniStore* store, const char* section) {
    return store->FindSection(section) ? 1 : 0;
}

int IniKeyExists(IniStore* store, const char* section, const char* key) {
    return store->FindKey(section, key) ? 1 : 0;
}

int IniGetValue(IniStore* store, const char* section, const char* key, const char** value) {
    Key* found = store->FindKey(section, key);
    if (!found) {
        return 0;
    }
    *value = found->ValueText();
    return 1;
}

int IniKeyLine(IniStore* store, const char* section, const char* key) {
    Key* found = store->FindKey(section, key);
    return found ? found->line : -1;
}

int IniSectionLine(IniStore* store, const char* section) {
    Section* found = store->FindSection(section);
    return found ? found->line : -1;
}

int IniSectionCount(IniStore* store) { return static_cast<int>(store->sections.size()); }

int IniSectionName(IniStore* store, int position, const char** name) {
    if (position < 1 || static_cast<size_t>(position) > store->sections.size()) {
        return 0;
    }
    store->current = store->sections[static_cast<size_t>(position) - 1].get();
    *name = store->current->name.c_str();
    return 1;
}

int IniKeyCount(IniStore* store, const char* section) {
    Section* found = store->FindSection(section);
    return found ? static_cast<int>(found->keys.size()) : 0;
}

int IniKeyName(IniStore* store, const char* section, int position, const char** name) {
    Key* key = KeyAt(store, section, position);
    if (!key) {
        return 0;
    }
    *name = key->NameText();
    return 1;
}

int IniKeyValue(IniStore* store, const char* section, int position, const char** value) {
    Key* key = KeyAt(store, section, position);
    if (!key) {
        return 0;
    }
    *value = key->ValueText();
    return 1;
}
