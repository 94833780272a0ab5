#include "platform/ws_runtime/RequestTable.h"

#include <atomic>
#include <cstring>
#include <memory>
#include <mutex>
#include <string_view>
#include <unordered_map>

namespace qv {
namespace wsruntime {

namespace {

struct RequestState {
    const RequestVariables* variables;
    RequestTable::Response response;
    // The last variable found under its exact name: a plug-in asks for each variable
    // twice in a row, for the size and then for the value. The name is the stored one
    // (NUL-terminated, and without NULs since a C name found it).
    std::string_view lastName;
    const std::string* lastValue = nullptr;
};

// The value of `name` in the request, or null.
const std::string* FindVariable(RequestState& state, const char* name) {
    if (state.lastValue != nullptr && std::strcmp(name, state.lastName.data()) == 0) {
        return state.lastValue;
    }
    std::string_view exactName;
    const std::string* value = state.variables->Find(name, exactName);
    state.lastName = exactName;
    state.lastValue = exactName.empty() ? nullptr : value;
    return value;
}

// The process-wide table. The lock guards the map only: a request's state is used by the
// one thread serving it, between Open and Close.
struct Table {
    std::mutex lock;
    std::unordered_map<uint32_t, std::unique_ptr<RequestState>> requests;
    uint32_t nextHandle = 1;
};

Table& TheTable() {
    static Table table;
    return table;
}

// Counts the requests closed so far: a state found while it stood at some value has not
// been destroyed as long as it stands there still.
std::atomic<uint64_t> g_closed{0};

// The last handle this thread looked up (a plug-in calls the runtime some hundred times
// for one request), valid while g_closed has not moved.
struct LastLookup {
    uint32_t handle = 0;
    RequestState* state = nullptr;
    uint64_t closed = 0;
};
thread_local LastLookup t_last;

RequestState* Lookup(uint32_t handle) {
    LastLookup& last = t_last;
    const uint64_t closed = g_closed.load(std::memory_order_acquire);
    if (last.state != nullptr && last.handle == handle && last.closed == closed) {
        return last.state;
    }
    Table& table = TheTable();
    std::lock_guard<std::mutex> guard(table.lock);
    auto found = table.requests.find(handle);
    RequestState* state = found == table.requests.end() ? nullptr : found->second.get();
    // Read under the lock: a Close counts before it releases the lock.
    last = LastLookup{handle, state, g_closed.load(std::memory_order_relaxed)};
    return state;
}

}  // namespace

uint32_t RequestTable::Open(const RequestVariables& variables) {
    auto state = std::make_unique<RequestState>();
    state->variables = &variables;
    Table& table = TheTable();
    std::lock_guard<std::mutex> guard(table.lock);
    uint32_t handle = table.nextHandle;
    while (handle == 0 || table.requests.count(handle) != 0) {
        ++handle;
    }
    table.nextHandle = handle + 1;
    table.requests.emplace(handle, std::move(state));
    return handle;
}

RequestTable::Response RequestTable::Close(uint32_t handle) {
    std::unique_ptr<RequestState> state;
    {
        Table& table = TheTable();
        std::lock_guard<std::mutex> guard(table.lock);
        auto found = table.requests.find(handle);
        if (found == table.requests.end()) {
            return Response();
        }
        state = std::move(found->second);
        table.requests.erase(found);
        g_closed.fetch_add(1, std::memory_order_release);
    }
    return std::move(state->response);
}

uint32_t RequestTable::OpenCount() {
    Table& table = TheTable();
    std::lock_guard<std::mutex> guard(table.lock);
    return static_cast<uint32_t>(table.requests.size());
}

}  // namespace wsruntime
}  // namespace qv

using qv::wsruntime::FindVariable;
using qv::wsruntime::Lookup;
using qv::wsruntime::RequestState;

extern "C" int32_t ReadRequestVariable_C_REST_QV_GXWS_(uint32_t handle, const char* name,
                                                       char* buffer, uint32_t* size) {
    if (size == nullptr) {
        return -1;
    }
    RequestState* state = Lookup(handle);
    const std::string* value =
        (state == nullptr || name == nullptr) ? nullptr : FindVariable(*state, name);
    if (value == nullptr || value->size() >= 0xFFFFFFFFu) {
        *size = 0;
        return -1;
    }
    const uint32_t needed = static_cast<uint32_t>(value->size()) + 1;
    if (buffer != nullptr && *size > 0) {
        const uint32_t copied = *size - 1 < needed - 1 ? *size - 1 : needed - 1;
        std::memcpy(buffer, value->data(), copied);
        buffer[copied] = '\0';
    }
    *size = needed;
    return 0;
}

extern "C" int32_t SetHTTPResponseCode_QV_GXWS_(uint32_t handle, int32_t status) {
    RequestState* state = Lookup(handle);
    if (state == nullptr || status < 100 || status > 599) {
        return -1;
    }
    state->response.status = status;
    return 0;
}

extern "C" int32_t WriteOutput_C_REST_QV_GXWS_(uint32_t handle, const char* data, uint32_t length) {
    RequestState* state = Lookup(handle);
    if (state == nullptr || (data == nullptr && length != 0)) {
        return -1;
    }
    try {
        state->response.body.append(data, length);
    } catch (...) {  // out of memory: a C caller cannot take an exception
        return -1;
    }
    return 0;
}
