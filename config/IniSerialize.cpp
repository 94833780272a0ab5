// The store as text, as both writers put it on disk. Serialising never touches a file, so a
// value that cannot be split fails before anything is opened.
#include "config/IniModel.h"

#include <cstdio>

using qv_ini::Key;
using qv_ini::Section;

namespace {

const char kNullSection[] = "(null)";

void AppendPiece(std::string* out, const Key& key, int quote, const char* separator, int counter,
                 std::string_view piece) {
    char number[16];
    std::snprintf(number, sizeof number, "%04d", counter);
    *out += key.Name();
    *out += " Line";
    *out += number;
    *out += separator;
    if (quote) {
        *out += static_cast<char>(quote);
    }
    *out += piece;
    if (quote) {
        *out += static_cast<char>(quote);
    }
    *out += '\n';
}

// True when the reader would take the piece for a quoted value.
bool EnclosedInQuotes(std::string_view piece) {
    return piece.size() >= 2 && (piece.front() == '"' || piece.front() == '\'') &&
           piece.back() == piece.front();
}

// The quote character the key's value is written between: its own, or, for a value
// without one that begins and ends with a quote this store's reader strips (a joined
// value, or one set without quotes), that quote once more, so that the value reads back
// whole.
int WrittenQuote(const IniStore& store, const Key& key) {
    if (key.quote || !EnclosedInQuotes(key.Value())) {
        return key.quote;
    }
    const char quote = key.Value().front();
    const uint32_t strips = quote == '"' ? kIniParseDoubleQuotes : kIniParseSingleQuotes;
    return (store.parseFlags & strips) ? quote : 0;
}

// The end of the next piece of value starting at begin, or begin when no piece fits.
size_t PieceEnd(const IniStore& store, const Key& key, int quote, size_t begin, size_t allowance) {
    const std::string_view value = key.Value();
    size_t end;
    if (value.size() - begin <= allowance) {
        if (quote || !EnclosedInQuotes(value.substr(begin))) {
            return value.size();
        }
        end = value.size() - 1;  // the rest fits, but would read back as a quoted value
    } else {
        end = begin + allowance;
        if (store.breakCharacter) {
            size_t at =
                std::string_view(value).substr(begin, allowance).rfind(store.breakCharacter);
            if (at != std::string_view::npos) {
                end = begin + at + 1;
            }
        }
    }
    if (!quote) {
        // Reading trims every piece and strips the quotes of a piece enclosed in them: an
        // unquoted piece must not begin or end in white space, nor begin and end with the
        // same quote character.
        while (end > begin && (qv_ini::IsSpace(value[end - 1]) || qv_ini::IsSpace(value[end]) ||
                               EnclosedInQuotes(value.substr(begin, end - begin)))) {
            --end;
        }
    }
    return end;
}

// True when the text begins with bytes that the reader takes for a byte order mark.
bool StartsLikeMark(const std::string& text) {
    return text.compare(0, 3, "\xEF\xBB\xBF") == 0 || text.compare(0, 2, "\xFF\xFE") == 0 ||
           text.compare(0, 2, "\xFE\xFF") == 0;
}

int AppendKey(std::string* out, const IniStore& store, const Key& key, const char* separator,
              size_t separatorLength) {
    const int quote = WrittenQuote(store, key);
    const size_t quotes = quote ? 2 : 0;
    const size_t length = key.Name().size() + separatorLength + key.Value().size() + quotes;
    if (store.maxLineLength < 0 || length <= static_cast<size_t>(store.maxLineLength)) {
        *out += key.Name();
        *out += separator;
        if (quote) {
            *out += static_cast<char>(quote);
        }
        *out += key.Value();
        if (quote) {
            *out += static_cast<char>(quote);
        }
        *out += '\n';
        return 0;
    }
    const int64_t allowance = static_cast<int64_t>(store.maxLineLength) - 12 -
                              static_cast<int64_t>(key.Name().size()) -
                              static_cast<int64_t>(quotes);
    if (allowance <= 0) {
        return kIniCannotSplit;
    }
    int counter = 1;
    for (size_t begin = 0; begin < key.Value().size(); ++counter) {
        size_t end = PieceEnd(store, key, quote, begin, static_cast<size_t>(allowance));
        if (end == begin) {
            return kIniCannotSplit;
        }
        AppendPiece(out, key, quote, separator, counter, key.Value().substr(begin, end - begin));
        begin = end;
    }
    return 0;
}

}  // namespace

namespace qv_ini {

int Serialize(const IniStore& store, std::string* out) {
    const uint32_t flags = store.writeFlags;
    const bool compact = (flags & kIniWriteCompact) != 0;
    const char* separator = (flags & kIniWriteSpacedEquals) ? " = " : "=";
    const size_t separatorLength = (flags & kIniWriteSpacedEquals) ? 3 : 1;
    out->clear();
    if (flags & kIniWriteBom) {
        *out += "\xEF\xBB\xBF";
    }
    for (size_t i = 0; i < store.sections.size(); ++i) {
        const Section& section = *store.sections[i];
        const bool fromFile = section.line >= 0;
        // Only a leading "(null)" section goes without a header: anywhere else its keys
        // would be read back into the section before it.
        const bool headless = i == 0 && section.name == kNullSection;
        if (compact && !fromFile && i > 0 && store.sections[i - 1]->line >= 0) {
            *out += '\n';
        }
        if (!headless) {
            *out += '[';
            *out += section.name;
            *out += "]\n";
        }
        for (const auto& key : section.keys) {
            int rc = AppendKey(out, store, *key, separator, separatorLength);
            if (rc < 0) {
                return rc;
            }
        }
        if (!(compact && (fromFile || section.name == kNullSection))) {
            *out += '\n';
        }
    }
    // A headerless "(null)" section whose first key begins with such bytes would lose them
    // on reading (EF BB BF is skipped) or make the file unreadable (FF FE and FE FF give
    // -3): the UTF-8 mark in front is the one the reader skips, and the key stays whole.
    if (!(flags & kIniWriteBom) && StartsLikeMark(*out)) {
        out->insert(0, "\xEF\xBB\xBF");
    }
    return 0;
}

}  // namespace qv_ini
