#include "plugin/testing/FakeRuntime.h"

#include <cstring>
#include <mutex>
#include <utility>

#include "platform/ws_runtime/WsRuntime.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace testing {

namespace {

std::mutex g_lock;
std::map<uint32_t, FakeRequest> g_requests;  // nodes stay put while others are added

}  // namespace

std::vector<std::string> FakeRequest::NamesAsked() const {
    std::vector<std::string> names;
    for (const ReadCall& call : reads) {
        if (call.nullBuffer) {
            names.push_back(call.name);
        }
    }
    return names;
}

FakeRequest& FakeRuntime::Open(uint32_t handle, std::map<std::string, std::string> variables) {
    std::lock_guard<std::mutex> guard(g_lock);
    FakeRequest& request = g_requests[handle];
    request = FakeRequest();
    request.variables = std::move(variables);
    return request;
}

FakeRequest& FakeRuntime::Get(uint32_t handle) {
    std::lock_guard<std::mutex> guard(g_lock);
    return g_requests[handle];
}

}  // namespace testing
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv

using qv::variable::remoteconfig::testing::FakeRequest;
using qv::variable::remoteconfig::testing::FakeRuntime;

extern "C" int32_t ReadRequestVariable_C_REST_QV_GXWS_(uint32_t handle, const char* name,
                                                       char* buffer, uint32_t* size) {
    FakeRequest& request = FakeRuntime::Get(handle);
    request.reads.push_back({name, buffer == nullptr, *size});
    auto found = request.variables.find(name);
    if (found == request.variables.end()) {
        *size = 0;
        return -1;
    }
    const uint32_t needed = static_cast<uint32_t>(found->second.size()) + 1;
    if (buffer != nullptr) {
        if (*size != needed) {
            return -2;  // the plug-in must pass exactly the size it was told
        }
        std::memcpy(buffer, found->second.c_str(), needed);
    }
    *size = needed;
    return 0;
}

extern "C" int32_t SetHTTPResponseCode_QV_GXWS_(uint32_t handle, int32_t status) {
    FakeRuntime::Get(handle).statusCalls.push_back(status);
    return 0;
}

extern "C" int32_t WriteOutput_C_REST_QV_GXWS_(uint32_t handle, const char* data, uint32_t length) {
    FakeRuntime::Get(handle).writes.emplace_back(data, length);
    return 0;
}
