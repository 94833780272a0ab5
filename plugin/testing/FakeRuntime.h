// A programmable stand-in for the host runtime's three C functions, linked into the
// plug-in's unit tests instead of libws_runtime.so.13. Each request handle has its own
// variables and records every call made for it. Open and Get may be used from several
// threads; one request's record is used by the thread serving it.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace qv {
namespace variable {
namespace remoteconfig {
namespace testing {

struct ReadCall {
    std::string name;
    bool nullBuffer;
    uint32_t sizeOnEntry;
};

struct FakeRequest {
    std::map<std::string, std::string> variables;
    std::vector<ReadCall> reads;
    std::vector<int32_t> statusCalls;  // every SetHTTPResponseCode, in order
    std::vector<std::string> writes;   // every WriteOutput, in order

    // The names asked for with the first (null-buffer) call, in order.
    std::vector<std::string> NamesAsked() const;
};

class FakeRuntime {
public:
    // A fresh record for `handle` with the given variables.
    static FakeRequest& Open(uint32_t handle, std::map<std::string, std::string> variables = {});
    static FakeRequest& Get(uint32_t handle);
};

}  // namespace testing
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
