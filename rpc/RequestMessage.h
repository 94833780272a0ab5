// A call of a remote procedure: header, procedure id (signed 32-bit), parameter count and
// the parameters as narrow strings. The parameters live in a shared ParameterArray.
// Used by one thread at a time. Serialize throws BufferOverflow (it does not enforce
// kMaxParameters); Deserialize throws DeserializationError for short or malformed input,
// a kind other than 0 or more than kMaxParameters parameters, and then leaves the message
// as it was.
#pragma once

#include <cstdint>

#include "rpc/Message.h"
#include "rpc/ParameterArray.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

class RequestMessage : public Message {
public:
    // procedureId -1, no parameters, empty name.
    explicit RequestMessage(uint16_t version = kProtocolVersion);
    ~RequestMessage() override;

    uint32_t GetSerializedSize() const override;
    void Serialize(char*& cursor, const char* end) const override;
    void Deserialize(const char*& cursor, const char* end) override;

    int32_t GetProcedureId() const { return m_nProcedureId; }
    void SetProcedureId(int32_t procedureId) { m_nProcedureId = procedureId; }
    uint32_t GetParameterCount() const { return m_nParameterCount; }
    // Element i of the parameters; valid for i below GetParameterCount().
    const zil::ByteString& GetParameter(uint32_t index) const;
    ParameterArray* GetParameters() const { return m_pParameters; }
    // Takes over one reference of holder (released with the message) and the count.
    void SetParameters(ParameterArray* holder, uint32_t count);

private:
    int32_t m_nProcedureId;
    ParameterArray* m_pParameters;
    uint32_t m_nParameterCount;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
