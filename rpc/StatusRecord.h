// The status record that every step of a request receives and updates, and that travels
// to the registry and back inside the request: a signed 32-bit code (negative: an error
// after which every further step does nothing), an optional text and optional further
// entries. A record belongs to one request and is used by one thread at a time. Nothing
// here fails except memory exhaustion (std::bad_alloc) when a record is copied.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "qv/zil/StringBase.h"

namespace qv {
namespace variable {
namespace remoteconfig {

// One further code of a status record with its optional text.
struct StatusEntry {
    int32_t code = 0;
    std::unique_ptr<zil::WideString> text;
};

using StatusEntries = std::vector<StatusEntry>;

class StatusRecord {
public:
    StatusRecord() = default;  // empty: code 0, no text, no entries
    StatusRecord(StatusRecord&&) = default;
    StatusRecord& operator=(StatusRecord&&) = default;
    StatusRecord(const StatusRecord& other);
    StatusRecord& operator=(const StatusRecord& other);

    bool IsError() const { return code < 0; }

    // Stores a new code and drops the text, so that no text stays attached to a code it
    // does not belong to; the entries stay.
    void SetCode(int32_t newCode);
    // Code 0, text and entries released.
    void Clear();
    // Releases the text and the entries (end of the request); the code stays.
    void Release();

    int32_t code = 0;
    std::unique_ptr<zil::WideString> text;
    std::unique_ptr<StatusEntries> entries;
};

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
