// The development host's request context for one request: the operation name from the
// URL and the request's variables, of which GetInt64Value reads whole signed 64-bit
// decimal numbers. Used by the thread serving the request. GetInt64Value throws
// qv::zil::exception::UnableToConvert when the variable is absent or not such a number.
#pragma once

#include <cstdint>
#include <string>

#include "platform/ws_runtime/IRequestContext.h"
#include "platform/ws_runtime/RequestVariables.h"

namespace qv {
namespace devtools {

class HostRequestContext : public wsruntime::IRequestContext {
public:
    // Throws qv::zil::exception::InvalidSequence when `operation` is not UTF-8.
    HostRequestContext(const std::string& operation, const wsruntime::RequestVariables& variables);

    int32_t GetInt64Value(const zil::WideString& name, int64_t& value) override;
    int32_t ReservedSlot1() override { return 0; }
    int32_t ReservedSlot2() override { return 0; }
    const zil::WideString* GetOperationName() override { return &m_operation; }

    // "-5" -> -5; an optional sign and 1 to 19 digits within the 64-bit range, nothing else.
    static bool ParseInt64(const std::string& text, int64_t& value);

private:
    zil::WideString m_operation;
    const wsruntime::RequestVariables& m_variables;
};

}  // namespace devtools
}  // namespace qv
