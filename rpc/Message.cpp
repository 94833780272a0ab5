#include "rpc/Message.h"

#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

Message::Message(uint32_t kind, uint16_t version) : m_nKind(kind), m_nVersion(version) {}

Message::~Message() = default;

uint32_t Message::GetKind() const { return m_nKind; }

uint16_t Message::GetVersion() const { return m_nVersion; }

const zil::ByteString& Message::GetName() const { return m_name; }

uint32_t Message::GetSerializedSize() const {
    return Wire::SaturatingAdd(6, Wire::NarrowSize(m_name));
}

void Message::Serialize(char*& cursor, const char* end) const {
    Wire::WriteUInt16(m_nVersion, cursor, end);
    Wire::WriteUInt32(m_nKind, cursor, end);
    Wire::WriteNarrow(m_name, cursor, end);
}

void Message::Deserialize(const char*& cursor, const char* end) {
    const uint16_t version = Wire::ReadUInt16(cursor, end);
    const uint32_t kind = Wire::ReadUInt32(cursor, end);
    zil::ByteString name;
    Wire::ReadNarrow(name, cursor, end);
    m_nVersion = version;
    m_nKind = kind;
    m_name.swap(name);
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
