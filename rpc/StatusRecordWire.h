// The wire form of a status record: the code, then the text part (a zero word when there
// is no text or it is empty, else the wide string), then the entries part (a zero word
// when there is no list or it is empty, else the count and each entry's code and text
// part). Stateless; any thread.
//
// Write throws BufferOverflow when the record does not fit. Read updates the record part
// by part (code, text, entries) and throws DeserializationError or InvalidSequence on a
// short or malformed part, leaving the parts read before it in the record.
#pragma once

#include <cstdint>

#include "rpc/StatusRecord.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

class StatusRecordWire {
public:
    StatusRecordWire() = delete;

    static uint32_t Size(const variable::remoteconfig::StatusRecord& record);
    static void Write(const variable::remoteconfig::StatusRecord& record, char*& cursor,
                      const char* end);
    static void Read(variable::remoteconfig::StatusRecord& record, const char*& cursor,
                     const char* end);
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
