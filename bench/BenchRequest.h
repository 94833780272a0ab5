// One prepared request of the request benchmark, as the development host would hand it to
// the plug-in: its request variables, its request context (the development host's own) and
// the host runtime's request handle around every Run. Also checks an answer against what
// the echo registry must give for it. Used by one thread; not copyable, because the context
// refers to the variables.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "platform/ws_runtime/RequestTable.h"
#include "platform/ws_runtime/RequestVariables.h"
#include "plugin/EntryPoints.h"
#include "tools/webhost/HostRequestContext.h"

namespace qv {
namespace bench {

class BenchRequest {
public:
    // "check_version_compatibility" with its two variables.
    static std::unique_ptr<BenchRequest> CheckVersion();
    // "access_property" with `count` property accesses (argc) in two batches (two
    // libraries), every other one a write that carries a value.
    static std::unique_ptr<BenchRequest> AccessProperty(uint32_t count);

    BenchRequest(const BenchRequest&) = delete;
    BenchRequest& operator=(const BenchRequest&) = delete;

    // Opens a request handle, calls `run` once with it and closes the handle.
    wsruntime::RequestTable::Response Run(QvPluginRunEntry run);
    // True for HTTP status 200 (none set) and the echo registry's answer: code 0, TAB, the
    // operation name and one line per argument of the list the plug-in sent.
    bool IsEchoAnswer(const wsruntime::RequestTable::Response& response) const;

    const std::string& Operation() const { return m_operation; }
    uint32_t ArgumentCount() const { return m_nArguments; }

private:
    BenchRequest(const std::string& operation, uint32_t argumentCount);

    std::string m_operation;
    uint32_t m_nArguments;  // entries of the argument list the plug-in builds
    wsruntime::RequestVariables m_variables;
    std::unique_ptr<devtools::HostRequestContext> m_pContext;
};

}  // namespace bench
}  // namespace qv
