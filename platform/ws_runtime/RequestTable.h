// The host side of libws_runtime.so.13: the per-request state behind each request handle.
// The web host opens a request with its variables, passes the handle to the plug-in's run
// entry, and closes it to collect the HTTP status and body the plug-in set through the
// runtime functions of WsRuntime.h.
//
// Open and Close may be called from several threads at once; the state of one handle is
// used by the thread serving that request. Open throws std::bad_alloc on memory
// exhaustion; Close of an unknown handle returns an empty response.
#pragma once

#include <cstdint>
#include <string>

#include "platform/ws_runtime/RequestVariables.h"

namespace qv {
namespace wsruntime {

class QV_WS_RUNTIME_API RequestTable {
public:
    struct Response {
        int32_t status = 0;  // 0: the plug-in set none
        std::string body;
    };

    // Registers a request whose variables (kept by reference; they must outlive the
    // request) the plug-in may read. Returns a handle that no other open request has;
    // never 0.
    static uint32_t Open(const RequestVariables& variables);
    // Ends the request and returns what the plug-in set; the handle becomes unknown.
    static Response Close(uint32_t handle);
    // Number of open requests (for tests and diagnostics).
    static uint32_t OpenCount();
};

}  // namespace wsruntime
}  // namespace qv
