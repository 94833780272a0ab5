// The answer to a remote call: header, return value (narrow string), parameter count and
// the parameters after the call as narrow strings, in a shared ParameterArray. Used by
// one thread at a time. Serialize throws BufferOverflow (it does not enforce
// kMaxParameters); Deserialize throws DeserializationError for short or malformed input,
// a kind other than 1 or more than kMaxParameters parameters, and then leaves the message
// as it was.
#pragma once

#include <cstdint>

#include "rpc/Message.h"
#include "rpc/ParameterArray.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

class ResponseMessage : public Message {
public:
    // Empty name and return value, no parameters.
    explicit ResponseMessage(uint16_t version = kProtocolVersion);
    ~ResponseMessage() override;

    uint32_t GetSerializedSize() const override;
    void Serialize(char*& cursor, const char* end) const override;
    void Deserialize(const char*& cursor, const char* end) override;

    const zil::ByteString& GetReturnValue() const { return m_returnValue; }
    void SetReturnValue(const zil::ByteString& value) { m_returnValue = value; }
    uint32_t GetParameterCount() const { return m_nParameterCount; }
    const zil::ByteString& GetParameter(uint32_t index) const;
    ParameterArray* GetParameters() const { return m_pParameters; }
    // Takes over one reference of holder (released with the message) and the count.
    void SetParameters(ParameterArray* holder, uint32_t count);

private:
    ParameterArray* m_pParameters;
    uint32_t m_nParameterCount;
    zil::ByteString m_returnValue;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
