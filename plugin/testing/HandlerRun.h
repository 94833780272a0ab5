// Runs one handler against a fresh fake request and returns what it collected, for the
// plug-in's unit tests.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "plugin/OperationHandler.h"
#include "plugin/testing/FakeContext.h"
#include "plugin/testing/FakeRuntime.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace testing {

struct Collected {
    std::vector<std::string> values;
    int32_t code;
    std::vector<std::string> asked;
};

inline Collected RunHandler(OperationHandler handler, std::map<std::string, std::string> vars,
                            FakeContext* context = nullptr, int32_t initialCode = 0) {
    static uint32_t nextHandle = 1000;
    const uint32_t handle = ++nextHandle;
    FakeRequest& request = FakeRuntime::Open(handle, std::move(vars));
    FakeContext defaultContext("", 42);
    ArgumentList arguments;
    StatusRecord status;
    status.code = initialCode;
    handler(context != nullptr ? context : &defaultContext, handle, arguments, status);
    Collected collected{{}, status.code, request.NamesAsked()};
    for (const zil::ByteString& value : arguments) {
        collected.values.emplace_back(value.data(), value.size());
    }
    return collected;
}

}  // namespace testing
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
