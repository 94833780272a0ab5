#include "plugin/VariableReader.h"

#include <climits>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include "platform/ws_runtime/WsRuntime.h"
#include "plugin/StatusCodes.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {

// Two runtime calls: the first with a null buffer asks for the size (value plus NUL, or 0
// when absent); the second fills a string of exactly that many bytes, NUL included.
bool ReadInto(uint32_t handle, zil::ByteString& destination, const char* name,
              StatusRecord& status) {
    if (status.IsError()) {
        return false;
    }
    if (name == nullptr) {
        status.SetCode(kVariableWithoutName);
        return false;
    }
    uint32_t size = 0;
    ReadRequestVariable_C_REST_QV_GXWS_(handle, name, nullptr, &size);
    if (size == 0) {
        status.SetCode(kVariableAbsent);
        return false;
    }
    destination.resize(size - 1);
    ReadRequestVariable_C_REST_QV_GXWS_(handle, name, destination.data(), &size);
    return true;
}

}  // namespace

void ReadVariable(uint32_t handle, ArgumentList& arguments, const char* name,
                  StatusRecord& status) {
    zil::ByteString value;
    if (ReadInto(handle, value, name, status)) {
        arguments.emplace_back();
        arguments.back().swap(value);
    }
}

void ReadVariableInto(uint32_t handle, zil::ByteString& destination, const char* name,
                      StatusRecord& status) {
    ReadInto(handle, destination, name, status);
}

void ReadNumberedVariable(uint32_t handle, ArgumentList& arguments, const char* base, int32_t index,
                          StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    if (base == nullptr) {
        status.SetCode(kVariableWithoutName);
        return;
    }
    char name[36];
    const int length = std::snprintf(name, sizeof name, "%s%ld", base, static_cast<long>(index));
    if (length < 0) {
        status.SetCode(kVariableWithoutName);
        return;
    }
    if (static_cast<size_t>(length) < sizeof name) {
        ReadVariable(handle, arguments, name, status);
        return;
    }
    // A base name longer than any in use: format it whole rather than cut it.
    std::vector<char> longName(static_cast<size_t>(length) + 1);
    std::snprintf(longName.data(), longName.size(), "%s%ld", base, static_cast<long>(index));
    ReadVariable(handle, arguments, longName.data(), status);
}

uint32_t CountOfLast(const ArgumentList& arguments) {
    if (arguments.empty()) {
        return 0;
    }
    const long parsed = std::strtol(arguments.back().c_str(), nullptr, 10);
    // long is 64-bit on the workstation: clamp as the 32-bit target's strtol does.
    const long clamped = parsed > INT32_MAX ? INT32_MAX : (parsed < INT32_MIN ? INT32_MIN : parsed);
    return static_cast<uint32_t>(static_cast<int32_t>(clamped));
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
