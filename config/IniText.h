// Character rules of the INI store, as the "C" locale defines them: white space (isspace)
// and upper-casing (toupper) of single bytes, and the name rules built on them (names compare
// byte by byte after upper-casing). Compile-time tables: usable from any thread, at any time.
#pragma once

#include <array>
#include <cstdint>
#include <string_view>

namespace qv_ini {

struct CharTables {
    std::array<unsigned char, 256> upper{};
    std::array<bool, 256> space{};
};

constexpr CharTables MakeCharTables() {
    CharTables t{};
    for (int c = 0; c < 256; ++c) {
        t.upper[c] = static_cast<unsigned char>(c >= 'a' && c <= 'z' ? c - 'a' + 'A' : c);
        t.space[c] = c == ' ' || (c >= '\t' && c <= '\r');
    }
    return t;
}

inline constexpr CharTables kCharTables = MakeCharTables();

inline bool IsSpace(char c) { return kCharTables.space[static_cast<unsigned char>(c)]; }

inline unsigned char Upper(char c) { return kCharTables.upper[static_cast<unsigned char>(c)]; }

inline uint32_t HashName(std::string_view name) {
    uint32_t hash = 2166136261u;
    for (char c : name) {
        hash = (hash ^ Upper(c)) * 16777619u;
    }
    return hash;
}

inline bool SameName(std::string_view a, std::string_view b) {
    if (a.size() != b.size()) {
        return false;
    }
    for (size_t i = 0; i < a.size(); ++i) {
        if (Upper(a[i]) != Upper(b[i])) {
            return false;
        }
    }
    return true;
}

}  // namespace qv_ini
