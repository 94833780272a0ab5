#include "plugin/VariableReader.h"

#include <climits>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "platform/ws_runtime/WsRuntime.h"
#include "plugin/StatusCodes.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {

// True when a reader may ask the runtime for `name`; otherwise the code says why not.
bool MayRead(const char* name, StatusRecord& status) {
    if (status.IsError()) {
        return false;
    }
    if (name == nullptr) {
        status.SetCode(kVariableWithoutName);
        return false;
    }
    return true;
}

// The first runtime call, with a null buffer: the value's size plus its NUL, or 0 (and
// -356006) when the request has no such variable.
uint32_t AskSize(uint32_t handle, const char* name, StatusRecord& status) {
    uint32_t size = 0;
    ReadRequestVariable_C_REST_QV_GXWS_(handle, name, nullptr, &size);
    if (size == 0) {
        status.SetCode(kVariableAbsent);
    }
    return size;
}

// The second runtime call fills a string of exactly `size` bytes, NUL included.
void Fill(uint32_t handle, const char* name, uint32_t size, zil::ByteString& destination) {
    destination.resize(size - 1);
    ReadRequestVariable_C_REST_QV_GXWS_(handle, name, destination.data(), &size);
}

// Appends a string of size - 1 bytes and fills it. A short value's string is made at its
// final length in one allocation (from zero bytes), instead of growing an empty one.
void AppendFilled(uint32_t handle, const char* name, uint32_t size, ArgumentList& arguments) {
    static const char kZeros[256] = {};
    if (size <= sizeof kZeros) {
        arguments.emplace_back(kZeros, size - 1);
    } else {
        arguments.emplace_back();
        arguments.back().resize(size - 1);
    }
    ReadRequestVariable_C_REST_QV_GXWS_(handle, name, arguments.back().data(), &size);
}

}  // namespace

void ReadVariable(uint32_t handle, ArgumentList& arguments, const char* name,
                  StatusRecord& status) {
    if (!MayRead(name, status)) {
        return;
    }
    const uint32_t size = AskSize(handle, name, status);
    if (size == 0) {
        return;
    }
    // Filled in place at the end of the list: no second string and no swap per value.
    AppendFilled(handle, name, size, arguments);
}

void ReadVariableInto(uint32_t handle, zil::ByteString& destination, const char* name,
                      StatusRecord& status) {
    if (!MayRead(name, status)) {
        return;
    }
    const uint32_t size = AskSize(handle, name, status);
    if (size != 0) {
        Fill(handle, name, size, destination);
    }
}

void ReadNumberedVariable(uint32_t handle, ArgumentList& arguments, const char* base, int32_t index,
                          StatusRecord& status) {
    if (!MayRead(base, status)) {
        return;
    }
    // The name as "%s%ld" formats it, written by hand: snprintf cost more than the rest of
    // the read. The index in decimal, a '-' first when negative.
    char digits[12];
    char* const digitsEnd = digits + sizeof digits;
    char* first = digitsEnd;
    uint32_t magnitude =
        index < 0 ? 0u - static_cast<uint32_t>(index) : static_cast<uint32_t>(index);
    do {
        *--first = static_cast<char>('0' + magnitude % 10);
        magnitude /= 10;
    } while (magnitude != 0);
    if (index < 0) {
        *--first = '-';
    }
    const size_t digitCount = static_cast<size_t>(digitsEnd - first);
    const size_t baseLength = std::strlen(base);
    char name[36];
    if (baseLength + digitCount < sizeof name) {
        std::memcpy(name, base, baseLength);
        std::memcpy(name + baseLength, first, digitCount);
        name[baseLength + digitCount] = '\0';
        ReadVariable(handle, arguments, name, status);
        return;
    }
    // A base name longer than any in use: format it whole rather than cut it.
    std::vector<char> longName(baseLength + digitCount + 1);
    std::memcpy(longName.data(), base, baseLength);
    std::memcpy(longName.data() + baseLength, first, digitCount);
    longName[baseLength + digitCount] = '\0';
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
