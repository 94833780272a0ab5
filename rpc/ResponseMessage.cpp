#include "rpc/ResponseMessage.h"

#include <memory>

#include "qv/zil/Exceptions.h"
#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

namespace {
struct ReleaseHolder {
    void operator()(ParameterArray* holder) const { holder->Release(); }
};
using HolderPtr = std::unique_ptr<ParameterArray, ReleaseHolder>;
}  // namespace

ResponseMessage::ResponseMessage(uint16_t version)
    : Message(kResponseKind, version),
      m_pParameters(ParameterArray::Create(0)),
      m_nParameterCount(0) {}

ResponseMessage::~ResponseMessage() { m_pParameters->Release(); }

void ResponseMessage::SetParameters(ParameterArray* holder, uint32_t count) {
    m_pParameters->Release();
    m_pParameters = holder;
    m_nParameterCount = count;
}

const zil::ByteString& ResponseMessage::GetParameter(uint32_t index) const {
    return m_pParameters->Strings()[index];
}

uint32_t ResponseMessage::GetSerializedSize() const {
    uint32_t total = Wire::SaturatingAdd(10, Wire::NarrowSize(m_name));
    total = Wire::SaturatingAdd(total, Wire::NarrowSize(m_returnValue));
    for (uint32_t i = 0; i < m_nParameterCount; ++i) {
        total = Wire::SaturatingAdd(total, Wire::NarrowSize(GetParameter(i)));
    }
    return total;
}

void ResponseMessage::Serialize(char*& cursor, const char* end) const {
    Message::Serialize(cursor, end);
    Wire::WriteNarrow(m_returnValue, cursor, end);
    Wire::WriteUInt32(m_nParameterCount, cursor, end);
    for (uint32_t i = 0; i < m_nParameterCount; ++i) {
        Wire::WriteNarrow(GetParameter(i), cursor, end);
    }
}

void ResponseMessage::Deserialize(const char*& cursor, const char* end) {
    const uint16_t version = Wire::ReadUInt16(cursor, end);
    const uint32_t kind = Wire::ReadUInt32(cursor, end);
    zil::ByteString name;
    Wire::ReadNarrow(name, cursor, end);
    if (kind != kResponseKind) {
        QV_THROW(zil::exception::DeserializationError());
    }
    zil::ByteString returnValue;
    Wire::ReadNarrow(returnValue, cursor, end);
    const uint32_t count = Wire::ReadUInt32(cursor, end);
    if (count > kMaxParameters) {
        QV_THROW(zil::exception::DeserializationError());
    }
    HolderPtr parameters(ParameterArray::Create(count));
    for (uint32_t i = 0; i < count; ++i) {
        Wire::ReadNarrow(parameters->Strings()[i], cursor, end);
    }
    m_nVersion = version;
    m_nKind = kind;
    m_name.swap(name);
    m_returnValue.swap(returnValue);
    SetParameters(parameters.release(), count);
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
