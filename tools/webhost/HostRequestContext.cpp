#include "tools/webhost/HostRequestContext.h"

#include "qv/zil/Exceptions.h"

namespace qv {
namespace devtools {

HostRequestContext::HostRequestContext(const std::string& operation,
                                       const wsruntime::RequestVariables& variables)
    : m_operation(zil::ByteString(operation.data(), static_cast<uint32_t>(operation.size()))),
      m_variables(variables) {}

int32_t HostRequestContext::GetInt64Value(const zil::WideString& name, int64_t& value) {
    const zil::ByteString narrow(name);
    const std::string* text = m_variables.Find(std::string(narrow.data(), narrow.size()));
    if (text == nullptr || !ParseInt64(*text, value)) {
        throw zil::exception::UnableToConvert();
    }
    return 0;
}

bool HostRequestContext::ParseInt64(const std::string& text, int64_t& value) {
    std::string::size_type i = 0;
    const bool negative = !text.empty() && text[0] == '-';
    if (!text.empty() && (text[0] == '-' || text[0] == '+')) {
        i = 1;
    }
    if (i == text.size()) {
        return false;
    }
    // Accumulate the magnitude as unsigned, then check it against the signed range.
    uint64_t magnitude = 0;
    for (; i < text.size(); ++i) {
        const char c = text[i];
        if (c < '0' || c > '9') {
            return false;
        }
        const uint64_t digit = static_cast<uint64_t>(c - '0');
        if (magnitude > (UINT64_MAX - digit) / 10) {
            return false;
        }
        magnitude = magnitude * 10 + digit;
    }
    const uint64_t limit = negative ? uint64_t{1} << 63 : (uint64_t{1} << 63) - 1;
    if (magnitude > limit) {
        return false;
    }
    value = negative ? static_cast<int64_t>(0 - magnitude) : static_cast<int64_t>(magnitude);
    return true;
}

}  // namespace devtools
}  // namespace qv
