// Base of the registry protocol's messages: kind (0 request, 1 response), protocol
// version and a name text. On the wire the header is version (2 bytes), kind (4 bytes),
// name (narrow string), little-endian. A message is used by one thread at a time.
// Serialize throws BufferOverflow when the output is too small; Deserialize throws
// DeserializationError for short or malformed input.
#pragma once

#include <cstdint>

#include "qv/zil/StringBase.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

constexpr uint16_t kProtocolVersion = 0x0100;
constexpr uint32_t kMaxParameters = 5;  // checked when reading only
constexpr uint32_t kRequestKind = 0;
constexpr uint32_t kResponseKind = 1;

class Message {
public:
    Message(uint32_t kind, uint16_t version);
    virtual ~Message();
    Message(const Message&) = delete;
    Message& operator=(const Message&) = delete;

    virtual uint32_t GetKind() const;
    virtual uint16_t GetVersion() const;
    virtual const zil::ByteString& GetName() const;
    virtual uint32_t GetSerializedSize() const;
    virtual void Serialize(char*& cursor, const char* end) const;
    virtual void Deserialize(const char*& cursor, const char* end);

    void SetName(const zil::ByteString& name) { m_name = name; }

protected:
    uint32_t m_nKind;
    uint16_t m_nVersion;
    zil::ByteString m_name;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
