// Reading an INI file: encoding check, line reader, parser and the joining of
// continuation keys ("Path Line0001", "Path Line0002", ...).
#include "config/IniLineReader.h"
#include "config/IniModel.h"

#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <memory>

using qv_ini::Key;
using qv_ini::LineReader;
using qv_ini::Section;

namespace {

void ParseSectionHeader(IniStore* store, std::string_view line, int32_t lineNumber) {
    size_t close = line.find(']');
    if (close == std::string_view::npos) {
        return;
    }
    std::string_view name = qv_ini::Trim(line.substr(1, close - 1));
    if (name.empty()) {
        return;
    }
    Section* section = store->FindSection(name);
    if (!section) {
        section = store->AppendSection(name, lineNumber);
    }
    section->line = lineNumber;
    store->current = section;
}

void ParseKeyLine(IniStore* store, std::string_view line, int32_t lineNumber) {
    const uint32_t flags = store->parseFlags;
    size_t separator = 0;
    size_t separatorLength = 0;
    for (size_t i = 0; i < line.size(); ++i) {
        if (line[i] == '=') {
            separator = i;
            separatorLength = 1;
            break;
        }
        if (line[i] == ':' && (flags & kIniParseColon)) {
            separator = i;
            separatorLength = (i + 1 < line.size() && line[i + 1] == '=') ? 2 : 1;
            break;
        }
    }
    if (separatorLength == 0) {
        return;
    }
    std::string_view name = qv_ini::TrimRight(line.substr(0, separator));
    std::string_view value = qv_ini::Trim(line.substr(separator + separatorLength));
    if (name.empty() || (value.empty() && !(flags & kIniParseKeepEmpty))) {
        return;
    }
    if (!store->current) {
        if (!(flags & kIniParseColon)) {
            return;
        }
        Section* null = store->FindSection(std::string_view("(null)"));
        store->current = null ? null : store->AppendSection("(null)", -1);
    }
    int quote = 0;
    if (value.size() >= 2) {
        for (char q : {'"', '\''}) {
            bool enabled =
                q == '"' ? (flags & kIniParseDoubleQuotes) : (flags & kIniParseSingleQuotes);
            if (enabled && value.front() == q && value.back() == q) {
                quote = q;
                value = value.substr(1, value.size() - 2);
                break;
            }
        }
    }
    // Beyond kIndexThreshold keys, FinishReading merges repeated names.
    Section* section = store->current;
    Key* key = section->keys.size() <= qv_ini::kIndexThreshold ? section->Find(name) : nullptr;
    if (key) {
        store->keyPool.SetValue(key, value);
        key->line = lineNumber;
        key->quote = quote;
    } else {
        section->AppendWhileReading(name, value, lineNumber, quote);
    }
}

// The base name length of a continuation key and its number, or false.
bool ContinuationOf(std::string_view name, size_t* baseLength, int32_t* number) {
    size_t at = name.find(" Line");
    if (at == std::string_view::npos || at + 5 == name.size()) {
        return false;
    }
    int64_t value = 0;
    for (size_t i = at + 5; i < name.size(); ++i) {
        char c = name[i];
        if (c < '0' || c > '9') {
            return false;
        }
        value = value * 10 + (c - '0');
        if (value > INT32_MAX) {
            return false;
        }
    }
    // Names are kept trimmed: "Path  Line0001" joins into "Path", not "Path ".
    *baseLength = qv_ini::TrimRight(name.substr(0, at)).size();
    *number = static_cast<int32_t>(value);
    return true;
}

void JoinContinuations(Section* section, std::string* joinedValue) {
    bool joined = false;
    auto& keys = section->keys;
    size_t i = 0;
    while (i < keys.size()) {
        size_t baseLength = 0;
        int32_t number = 0;
        if (!ContinuationOf(keys[i]->Name(), &baseLength, &number) || number != 1) {
            ++i;
            continue;
        }
        size_t end = i + 1;
        size_t nextBase = 0;
        int32_t nextNumber = 0;
        while (end < keys.size() && ContinuationOf(keys[end]->Name(), &nextBase, &nextNumber) &&
               nextNumber != 1) {
            ++end;
        }
        Key& first = *keys[i];
        joinedValue->assign(first.Value());
        for (size_t k = i + 1; k < end; ++k) {
            joinedValue->append(keys[k]->Value());
        }
        section->pool->SetText(&first, first.Name().substr(0, baseLength), *joinedValue);
        for (size_t k = i + 1; k < end; ++k) {
            section->pool->Recycle(keys[k]);
        }
        keys.erase(keys.begin() + static_cast<std::ptrdiff_t>(i + 1),
                   keys.begin() + static_cast<std::ptrdiff_t>(end));
        joined = true;
        ++i;
    }
    if (joined) {
        section->Reindex();
    }
}

int Parse(IniStore* store, LineReader* reader) {
    store->Clear();
    std::string_view line;
    int32_t lineNumber = 0;
    int rc;
    while ((rc = reader->Next(&line)) == 1) {
        ++lineNumber;
        size_t begin = 0;
        while (begin < line.size() && qv_ini::IsSpace(line[begin])) {
            ++begin;
        }
        line.remove_prefix(begin);
        if (line.empty() || line.front() == ';') {
            continue;
        }
        if (line.front() == '[') {
            ParseSectionHeader(store, line, lineNumber);
        } else {
            ParseKeyLine(store, line, lineNumber);
        }
    }
    if (rc < 0) {
        return rc;
    }
    std::string joinedValue;
    for (auto& section : store->sections) {
        section->FinishReading();
        JoinContinuations(section.get(), &joinedValue);
    }
    store->keyPool.Trim();
    store->keyPool.Compact();
    return 0;
}

}  // namespace

int IniReadStream(IniStore* store, FILE* stream) {
    if (!stream) {
        return kIniInvalid;
    }
    unsigned char head[4];
    size_t got = std::fread(head, 1, sizeof head, stream);
    if (got < sizeof head && std::ferror(stream)) {
        return kIniReadError;
    }
    if (got == 4 && ((head[0] == 0xFF && head[1] == 0xFE && head[2] == 0 && head[3] == 0) ||
                     (head[0] == 0 && head[1] == 0 && head[2] == 0xFE && head[3] == 0xFF))) {
        return kIniWideEncoding;
    }
    size_t skip = 0;
    if (got >= 3 && head[0] == 0xEF && head[1] == 0xBB && head[2] == 0xBF) {
        skip = 3;
    } else if (got >= 2 &&
               ((head[0] == 0xFF && head[1] == 0xFE) || (head[0] == 0xFE && head[1] == 0xFF))) {
        return kIniWideEncoding;
    }
    // The bytes read ahead go to the line reader instead of seeking back, so pipes work too.
    return qv_ini::NoThrow([&] {
        auto reader = std::make_unique<LineReader>(
            stream, reinterpret_cast<const char*>(head) + skip, got - skip);
        return Parse(store, reader.get());
    });
}

int IniLoadFile(IniStore* store, const char* path) {
    if (!path || !*path) {
        return kIniInvalid;
    }
    std::unique_ptr<FILE, int (*)(FILE*)> file(std::fopen(path, "rbe"), &std::fclose);
    if (!file) {
        struct stat info;
        return ::stat(path, &info) == 0 ? kIniCannotOpen : kIniInvalid;
    }
    struct stat info;
    int32_t modified =
        ::fstat(fileno(file.get()), &info) == 0 ? static_cast<int32_t>(info.st_mtime) : 0;
    int rc = IniReadStream(store, file.get());
    if (rc >= 0) {
        rc = qv_ini::NoThrow([&] {
            store->path = path;
            return 0;
        });
        store->modificationTime = modified;
    }
    return rc;
}
