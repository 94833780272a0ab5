// Setters, removal and renaming.
#include "config/IniModel.h"

#include <cctype>
#include <cstdio>
#include <string>

using qv_ini::Key;
using qv_ini::Section;

namespace {

bool HasLineBreak(std::string_view text) {
    return text.find_first_of("\r\n") != std::string_view::npos;
}

// A section name that reads back as itself: not empty, no line break, no "]".
bool WritableSectionName(std::string_view name) {
    return !name.empty() && !HasLineBreak(name) && name.find(']') == std::string_view::npos;
}

// A key name that reads back as itself: not empty, no line break or "=", and not beginning
// like a comment or a section header.
bool WritableKeyName(std::string_view name) {
    return !name.empty() && !HasLineBreak(name) && name.find('=') == std::string_view::npos &&
           name.front() != ';' && name.front() != '[';
}

std::string Escape(const char* value) {
    std::string out;
    for (const char* p = value; *p; ++p) {
        unsigned char c = static_cast<unsigned char>(*p);
        if (c == '"' || c == '\\') {
            out += '\\';
            out += static_cast<char>(c);
        } else if (c == '\t') {
            out += "\\t";
        } else if (c == '\n') {
            out += "\\n";
        } else if (std::iscntrl(c)) {
            char hex[8];
            std::snprintf(hex, sizeof hex, "\\x%02x", c);
            out += hex;
        } else {
            out += static_cast<char>(c);
        }
    }
    return out;
}

}  // namespace

int IniSetValue(IniStore* store, const char* section, const char* key, const char* value,
                int quoteCharacter) {
    if (!section || !key || !value) {
        return kIniBadName;
    }
    std::string_view sectionName = qv_ini::Trim(section);
    std::string_view keyName = qv_ini::Trim(key);
    std::string_view text = qv_ini::Trim(value);
    if (!WritableSectionName(sectionName) || !WritableKeyName(keyName) || HasLineBreak(text)) {
        return kIniBadName;
    }
    return qv_ini::NoThrow([&] {
        Section* found = store->FindSection(sectionName);
        if (!found) {
            found = store->AppendSection(sectionName, -1);
            store->current = found;
        }
        Key* existing = found->Find(keyName);
        if (existing) {
            store->keyPool.SetValue(existing, text);
            existing->quote = quoteCharacter;
        } else {
            found->Append(keyName, text, -1, quoteCharacter);
        }
        store->keyPool.Compact();
        return 1;
    });
}

int IniSetString(IniStore* store, const char* section, const char* key, const char* value) {
    return IniSetValue(store, section, key, value, '"');
}

int IniSetEscaped(IniStore* store, const char* section, const char* key, const char* value) {
    if (!value) {
        return kIniBadName;
    }
    return qv_ini::NoThrow([&] {
        std::string escaped = Escape(value);
        return IniSetValue(store, section, key, escaped.c_str(), '"');
    });
}

int IniSetInt(IniStore* store, const char* section, const char* key, int32_t value) {
    char text[16];
    std::snprintf(text, sizeof text, "%d", static_cast<int>(value));
    return IniSetValue(store, section, key, text, 0);
}

int IniSetDouble(IniStore* store, const char* section, const char* key, double value) {
    char text[40];
    std::snprintf(text, sizeof text, "%.14e", value);
    return IniSetValue(store, section, key, text, 0);
}

int IniSetBool(IniStore* store, const char* section, const char* key, bool value) {
    return IniSetValue(store, section, key, value ? "True" : "False", 0);
}

int IniDeleteKey(IniStore* store, const char* section, const char* key) {
    Section* found = store->FindSection(section);
    size_t position = 0;
    if (!found || !key || !found->Find(qv_ini::Trim(key), &position)) {
        return 0;
    }
    found->Erase(position);
    store->keyPool.Compact();
    return 1;
}

int IniDeleteSection(IniStore* store, const char* section) {
    Section* found = store->FindSection(section);
    if (!found) {
        return 0;
    }
    for (size_t i = 0; i < store->sections.size(); ++i) {
        if (store->sections[i].get() == found) {
            store->EraseSection(i);
            store->keyPool.Compact();
            return 1;
        }
    }
    return 0;
}

int IniRenameSection(IniStore* store, const char* section, const char* newName) {
    Section* found = store->FindSection(section);
    if (!found) {
        return 0;
    }
    std::string_view name = qv_ini::Trim(newName ? newName : "");
    if (!WritableSectionName(name)) {
        return kIniBadName;
    }
    return qv_ini::NoThrow([&] {
        std::string copy(name);
        const uint32_t oldHash = found->hash;
        found->name.swap(copy);
        found->hash = qv_ini::HashName(found->name);
        try {
            store->sectionIndex = store->BuildSectionIndex();
        } catch (...) {
            found->name.swap(copy);
            found->hash = oldHash;
            throw;
        }
        return 1;
    });
}
