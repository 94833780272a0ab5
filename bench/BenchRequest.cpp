#include "bench/BenchRequest.h"

#include <algorithm>

namespace qv {
namespace bench {

BenchRequest::BenchRequest(const std::string& operation, uint32_t argumentCount)
    : m_operation(operation), m_nArguments(argumentCount) {}

std::unique_ptr<BenchRequest> BenchRequest::CheckVersion() {
    std::unique_ptr<BenchRequest> request(new BenchRequest("check_version_compatibility", 2));
    request->m_variables.AddExact("X_QV_CLIENT_SIDE_VERSION", "1");
    request->m_variables.AddExact("X_QV_OLDEST_COMPATIBLE_VERSION", "1");
    request->m_pContext.reset(
        new devtools::HostRequestContext(request->m_operation, request->m_variables));
    return request;
}

std::unique_ptr<BenchRequest> BenchRequest::AccessProperty(uint32_t count) {
    // Session, ignoreErrors, argc, numberOfBatches; per access its library path, action,
    // id, flags and type descriptor, and a value for a write; three names per batch.
    const uint32_t batches = count > 1 ? 2 : 1;
    const uint32_t writes = (count + 1) / 2;
    std::unique_ptr<BenchRequest> request(
        new BenchRequest("access_property", 4 + count * 5 + writes + batches * 3));
    wsruntime::RequestVariables& variables = request->m_variables;
    variables.AddExact("session", "7");
    variables.AddExact("ignoreErrors", "0");
    variables.AddExact("argc", std::to_string(count));
    variables.AddExact("numberOfBatches", std::to_string(batches));
    const char* const libraries[] = {"/opt/qv/lib/libpump_io.so", "/opt/qv/lib/libvalve_io.so"};
    for (uint32_t i = 0; i < count; ++i) {
        const std::string n = std::to_string(i);
        const uint32_t batch = (batches == 2 && i >= count / 2) ? 1 : 0;
        variables.AddExact("libraryPathName" + n, libraries[batch]);
        const bool write = i % 2 == 0;
        variables.AddExact("action" + n, write ? "1" : "0");
        variables.AddExact("id" + n, "Channel" + n + ".Setpoint");
        variables.AddExact("flags" + n, "0");
        variables.AddExact("tdr" + n, "0x0A000000");
        if (write) {
            variables.AddExact("value" + n, std::to_string(100 + i * 25));
        }
    }
    for (uint32_t b = 0; b < batches; ++b) {
        const std::string n = std::to_string(b);
        variables.AddExact("funcName" + n, b == 0 ? "PumpAccess" : "ValveAccess");
        variables.AddExact("className" + n, b == 0 ? "Pump" : "Valve");
        variables.AddExact("callingConvention" + n, "C");
    }
    request->m_pContext.reset(
        new devtools::HostRequestContext(request->m_operation, request->m_variables));
    return request;
}

wsruntime::RequestTable::Response BenchRequest::Run(QvPluginRunEntry run) {
    const uint32_t handle = wsruntime::RequestTable::Open(m_variables);
    run(m_pContext.get(), handle);
    return wsruntime::RequestTable::Close(handle);
}

bool BenchRequest::IsEchoAnswer(const wsruntime::RequestTable::Response& response) const {
    const std::string prefix = "0\t" + m_operation + "\n";
    if (response.status != 0 || response.body.compare(0, prefix.size(), prefix) != 0) {
        return false;
    }
    const auto lines = std::count(response.body.begin(), response.body.end(), '\n');
    return static_cast<uint32_t>(lines) == m_nArguments;
}

}  // namespace bench
}  // namespace qv
