// The INI file store: one INI file held in memory as ordered sections of ordered key/value
// pairs, with typed getters, setters and a writer that replaces the file safely through a
// temporary file. Plain functions over an IniStore; a store has no lock and must not be used
// by two threads at once. Results: 1 found/done, 0 absent, negative codes (below) on
// failure; a failed call leaves the store as it was unless its comment says otherwise.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdio>

struct IniStore;

// Result codes.
constexpr int kIniCannotSplit = -2;   // a value cannot be split to fit the max line length
constexpr int kIniWideEncoding = -3;  // UTF-16 or UTF-32 byte order mark
constexpr int kIniNoPath = -4;        // no path remembered yet (change check)
constexpr int kIniStreamMisuse = -5;  // stream write with flag 0x02, or truncate/rewind failed
constexpr int kIniBadName = -6;       // empty name; a name or value that would not read back (line
                                      // break, "]" in a section, "=" in a key)
constexpr int kIniNoMemory = -12;     // out of memory
constexpr int kIniCannotReplace = -13;   // target not writable, or the rename failed
constexpr int kIniInvalid = -22;         // no stream, empty path, or the file does not exist
constexpr int kIniWriteFailed = -28;     // a write, flush, fsync or close failed
constexpr int kIniCannotOpen = -5001;    // the file exists but cannot be opened for reading
constexpr int kIniReadError = -5002;     // a read error
constexpr int kIniNoTempFile = -5003;    // the temporary file cannot be made
constexpr int kIniCannotCreate = -5004;  // the temporary (or target) file cannot be opened to write
constexpr int kIniNotInt = -5021;        // not a 32-bit signed integer; also a break char >= 128
constexpr int kIniNotUnsigned = -5022;   // not a 32-bit unsigned integer
constexpr int kIniNotDouble = -5023;     // not a floating-point number
constexpr int kIniNotBool = -5024;       // neither "True" nor "False"

// Write flags.
constexpr uint32_t kIniWriteBom = 0x01;      // begin with EF BB BF
constexpr uint32_t kIniWriteViaTemp = 0x02;  // write a temporary file and rename it over the target
constexpr uint32_t kIniWriteMkstemp =
    0x04;  // temporary name from mkstemp in the target's directory
constexpr uint32_t kIniWriteSpacedEquals = 0x08;  // " = " between key and value
constexpr uint32_t kIniWriteCompact = 0x10;       // compact blank lines
constexpr uint32_t kIniWriteSync = 0x20;          // fsync before closing

// Parse flags.
constexpr uint32_t kIniParseKeepEmpty = 0x01;     // keep keys with an empty value
constexpr uint32_t kIniParseDoubleQuotes = 0x02;  // strip "..." and remember the quote
constexpr uint32_t kIniParseSingleQuotes = 0x04;  // strip '...' and remember the quote
constexpr uint32_t kIniParseColon =
    0x08;  // ':' separates too; keys before any header go to "(null)"

// Life and options.
IniStore* IniCreate();  // null when memory is short
void IniDestroy(IniStore* store);
int IniSetWriteOptions(IniStore* store, int32_t maxLineLength, int breakCharacter,
                       uint32_t writeFlags);
int IniSetParseFlags(IniStore* store, uint32_t flags);

// Files and streams. Reads return 0 on success; writes return 0 on success.
int IniLoadFile(IniStore* store, const char* path);
int IniReadStream(IniStore* store, FILE* stream);
int IniWriteFile(IniStore* store, const char* path);
int IniWriteStream(IniStore* store, FILE* stream, int append);
int IniFileChanged(IniStore* store);

// Lookup. Returned texts point into the store and stay valid until it changes.
int IniSectionExists(IniStore* store, const char* section);
int IniKeyExists(IniStore* store, const char* section, const char* key);
int IniGetValue(IniStore* store, const char* section, const char* key, const char** value);
int IniKeyLine(IniStore* store, const char* section, const char* key);
int IniSectionLine(IniStore* store, const char* section);
int IniSectionCount(IniStore* store);
int IniSectionName(IniStore* store, int position, const char** name);
int IniKeyCount(IniStore* store, const char* section);
int IniKeyName(IniStore* store, const char* section, int position, const char** name);
int IniKeyValue(IniStore* store, const char* section, int position, const char** value);

// Typed getters: 1 read, 0 absent (or blank for the numeric/bool ones), else the error code.
int IniGetInt(IniStore* store, const char* section, const char* key, int32_t* value);
int IniGetUnsigned(IniStore* store, const char* section, const char* key, uint32_t* value);
int IniGetDouble(IniStore* store, const char* section, const char* key, double* value);
int IniGetBool(IniStore* store, const char* section, const char* key, bool* value);
int IniGetString(IniStore* store, const char* section, const char* key, char* buffer, size_t size);
int IniGetStringDup(IniStore* store, const char* section, const char* key,
                    char** copy);  // free() the copy
int IniGetEscaped(IniStore* store, const char* section, const char* key,
                  const char** text);  // valid until the next escaped getter call
int IniGetEscapedString(IniStore* store, const char* section, const char* key, char* buffer,
                        size_t size);
int IniGetEscapedDup(IniStore* store, const char* section, const char* key,
                     char** copy);  // free() the copy

// Setters: 1 on success.
int IniSetValue(IniStore* store, const char* section, const char* key, const char* value,
                int quoteCharacter);
int IniSetString(IniStore* store, const char* section, const char* key, const char* value);
int IniSetEscaped(IniStore* store, const char* section, const char* key, const char* value);
int IniSetInt(IniStore* store, const char* section, const char* key, int32_t value);
int IniSetDouble(IniStore* store, const char* section, const char* key, double value);
int IniSetBool(IniStore* store, const char* section, const char* key, bool value);

// Removal and renaming: 1 when something was removed or renamed, 0 when absent.
int IniDeleteKey(IniStore* store, const char* section, const char* key);
int IniDeleteSection(IniStore* store, const char* section);
int IniRenameSection(IniStore* store, const char* section, const char* newName);
