// Byte encodings of the registry protocol: raw fields, little-endian integers, narrow
// strings (length + 1, bytes, NUL), wide strings (UTF-8 byte count, UTF-8 bytes) and
// string lists (count, narrow strings). Stateless; may be used from any thread.
//
// Writers take a cursor and the end of the output and advance the cursor; they throw
// qv::zil::exception::BufferOverflow when the item does not fit, leaving what was written
// so far. Readers take the same pair and throw DeserializationError for short or
// malformed input (InvalidSequence for malformed UTF-8); the target is then unchanged
// and only the cursor may have moved. Sizes saturate at 0xFFFFFFFF instead of wrapping.
#pragma once

#include <cstdint>

#include "qv/zil/StringBase.h"
#include "rpc/ArgumentList.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

class Wire {
public:
    Wire() = delete;

    static void WriteField(const void* source, uint32_t count, char*& cursor, const char* end);
    static void ReadField(void* destination, uint32_t count, const char*& cursor, const char* end);

    static void WriteUInt16(uint16_t value, char*& cursor, const char* end);
    static void WriteUInt32(uint32_t value, char*& cursor, const char* end);
    static void WriteInt32(int32_t value, char*& cursor, const char* end);
    static uint16_t ReadUInt16(const char*& cursor, const char* end);
    static uint32_t ReadUInt32(const char*& cursor, const char* end);
    static int32_t ReadInt32(const char*& cursor, const char* end);
    // The 32-bit little-endian value at data, without bounds checks.
    static uint32_t PeekUInt32(const char* data);
    static void PokeUInt32(uint32_t value, char* data);

    static uint32_t SaturatingAdd(uint32_t a, uint32_t b);

    static uint32_t NarrowSize(const zil::ByteString& text);  // length + 5
    static void WriteNarrow(const zil::ByteString& text, char*& cursor, const char* end);
    static void ReadNarrow(zil::ByteString& text, const char*& cursor, const char* end);

    static uint32_t WideSize(const zil::WideString& text);  // 4 + UTF-8 bytes
    static void WriteWide(const zil::WideString& text, char*& cursor, const char* end);
    static void ReadWide(zil::WideString& text, const char*& cursor, const char* end);

    static uint32_t StringListSize(const variable::remoteconfig::ArgumentList& list);
    static void WriteStringList(const variable::remoteconfig::ArgumentList& list, char*& cursor,
                                const char* end);
    static void ReadStringList(variable::remoteconfig::ArgumentList& list, const char*& cursor,
                               const char* end);

    // Bytes left between cursor and end; 0 when the cursor lies beyond the end.
    static uint32_t Remaining(const char* cursor, const char* end);

    static constexpr uint32_t kWideLengthCap = 0xFFFFFFFB;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
