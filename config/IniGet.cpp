// Typed and escaped getters.
#include "config/IniModel.h"

#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <limits>

using qv_ini::Key;

namespace {

// Optional white space, at most one sign directly before one or more decimal digits,
// optional white space; magnitudes above 4294967295 are refused.
bool ReadMagnitude(std::string_view text, bool* negative, uint64_t* magnitude) {
    size_t i = 0;
    while (i < text.size() && qv_ini::IsSpace(text[i])) {
        ++i;
    }
    *negative = false;
    if (i < text.size() && (text[i] == '+' || text[i] == '-')) {
        *negative = text[i] == '-';
        ++i;
    }
    size_t digits = i;
    uint64_t value = 0;
    while (i < text.size() && text[i] >= '0' && text[i] <= '9') {
        value = value * 10 + static_cast<uint64_t>(text[i] - '0');
        if (value > 4294967295u) {
            return false;
        }
        ++i;
    }
    if (i == digits) {
        return false;
    }
    while (i < text.size() && qv_ini::IsSpace(text[i])) {
        ++i;
    }
    *magnitude = value;
    return i == text.size();
}

// The key, or null when absent; *blank tells whether its value is only white space.
Key* FindForNumber(IniStore* store, const char* section, const char* key, bool* blank) {
    Key* found = store->FindKey(section, key);
    *blank = found && qv_ini::Trim(found->Value()).empty();
    return found;
}

void CopyBounded(const std::string_view text, char* buffer, size_t size) {
    if (size == 0) {
        return;
    }
    buffer[0] = '\0';
    size_t n = text.size() < size - 1 ? text.size() : size - 1;
    std::memcpy(buffer, text.data(), n);
    buffer[n] = '\0';
}

int Duplicate(std::string_view text, char** copy) {
    char* p = static_cast<char*>(std::malloc(text.size() + 1));
    if (!p) {
        return kIniNoMemory;
    }
    std::memcpy(p, text.data(), text.size());
    p[text.size()] = '\0';
    *copy = p;
    return 1;
}

int HexDigit(char c) {
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    if (c >= 'a' && c <= 'f') {
        return c - 'a' + 10;
    }
    if (c >= 'A' && c <= 'F') {
        return c - 'A' + 10;
    }
    return -1;
}

// Decodes the value into the scratch buffer; its length through *length.
int DecodeEscaped(IniStore* store, std::string_view value, size_t* length) {
    const size_t need = value.size() + 1;
    if (store->scratchSize < need || store->scratchSize > need + 1024) {
        size_t size = need > 256 ? need : 256;
        char* fresh = new (std::nothrow) char[size];
        if (!fresh) {
            return kIniNoMemory;
        }
        store->scratch.reset(fresh);
        store->scratchSize = size;
    }
    char* out = store->scratch.get();
    size_t n = 0;
    for (size_t i = 0; i < value.size(); ++i) {
        char c = value[i];
        if (c != '\\' || i + 1 == value.size()) {
            out[n++] = c;  // a lone backslash at the very end stays
            continue;
        }
        char next = value[++i];
        int high = -1;
        int low = -1;
        if (next == 'x' && i + 2 < value.size()) {
            high = HexDigit(value[i + 1]);
            low = HexDigit(value[i + 2]);
        }
        if (next == 'n') {
            out[n++] = '\n';
        } else if (next == 't') {
            out[n++] = '\t';
        } else if (high >= 0 && low >= 0) {
            out[n++] = static_cast<char>(high * 16 + low);
            i += 2;
        } else {
            out[n++] = next;  // any other escaped character, "\x" without two hex digits too
        }
    }
    out[n] = '\0';
    *length = n;
    return 1;
}

}  // namespace

int IniGetInt(IniStore* store, const char* section, const char* key, int32_t* value) {
    bool blank = false;
    Key* found = FindForNumber(store, section, key, &blank);
    if (!found || blank) {
        return 0;
    }
    bool negative = false;
    uint64_t magnitude = 0;
    if (!ReadMagnitude(found->Value(), &negative, &magnitude) ||
        magnitude > (negative ? 2147483648u : 2147483647u)) {
        return kIniNotInt;
    }
    *value = negative ? static_cast<int32_t>(-static_cast<int64_t>(magnitude))
                      : static_cast<int32_t>(magnitude);
    return 1;
}

int IniGetUnsigned(IniStore* store, const char* section, const char* key, uint32_t* value) {
    bool blank = false;
    Key* found = FindForNumber(store, section, key, &blank);
    if (!found || blank) {
        return 0;
    }
    bool negative = false;
    uint64_t magnitude = 0;
    if (!ReadMagnitude(found->Value(), &negative, &magnitude) || negative) {
        return kIniNotUnsigned;
    }
    *value = static_cast<uint32_t>(magnitude);
    return 1;
}

int IniGetDouble(IniStore* store, const char* section, const char* key, double* value) {
    bool blank = false;
    Key* found = FindForNumber(store, section, key, &blank);
    if (!found || blank) {
        return 0;
    }
    auto same = qv_ini::SameName;
    std::string_view name = qv_ini::Trim(found->Value());
    if (same(name, "Inf") || same(name, "+Inf")) {
        *value = std::numeric_limits<double>::infinity();
        return 1;
    }
    if (same(name, "-Inf")) {
        *value = -std::numeric_limits<double>::infinity();
        return 1;
    }
    const char* text = found->ValueText();
    char* end = nullptr;
    errno = 0;
    double parsed = std::strtod(text, &end);
    if (errno != 0 || end != text + found->valueLength) {
        return kIniNotDouble;
    }
    *value = parsed;
    return 1;
}

int IniGetBool(IniStore* store, const char* section, const char* key, bool* value) {
    bool blank = false;
    Key* found = FindForNumber(store, section, key, &blank);
    if (!found || blank) {
        return 0;
    }
    auto same = qv_ini::SameName;
    std::string_view name = qv_ini::Trim(found->Value());
    if (same(name, "True") || same(name, "False")) {
        *value = same(name, "True");
        return 1;
    }
    return kIniNotBool;
}

int IniGetString(IniStore* store, const char* section, const char* key, char* buffer, size_t size) {
    CopyBounded("", buffer, size);
    Key* found = store->FindKey(section, key);
    if (!found) {
        return 0;
    }
    CopyBounded(found->Value(), buffer, size);
    return 1;
}

int IniGetStringDup(IniStore* store, const char* section, const char* key, char** copy) {
    Key* found = store->FindKey(section, key);
    return found ? Duplicate(found->Value(), copy) : 0;
}

int IniGetEscaped(IniStore* store, const char* section, const char* key, const char** text) {
    Key* found = store->FindKey(section, key);
    if (!found) {
        return 0;
    }
    size_t length = 0;
    int rc = DecodeEscaped(store, found->Value(), &length);
    if (rc == 1) {
        *text = store->scratch.get();
    }
    return rc;
}

int IniGetEscapedString(IniStore* store, const char* section, const char* key, char* buffer,
                        size_t size) {
    CopyBounded("", buffer, size);
    Key* found = store->FindKey(section, key);
    if (!found) {
        return 0;
    }
    size_t length = 0;
    int rc = DecodeEscaped(store, found->Value(), &length);
    if (rc == 1) {
        CopyBounded(std::string_view(store->scratch.get(), length), buffer, size);
    }
    return rc;
}

int IniGetEscapedDup(IniStore* store, const char* section, const char* key, char** copy) {
    Key* found = store->FindKey(section, key);
    if (!found) {
        return 0;
    }
    size_t length = 0;
    int rc = DecodeEscaped(store, found->Value(), &length);
    return rc == 1 ? Duplicate(std::string_view(store->scratch.get(), length), copy) : rc;
}
