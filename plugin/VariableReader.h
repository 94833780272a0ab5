// The readers through which every request variable is read from the host runtime, and the
// count taken from the last value read. Each reader returns at once, calling nothing, when
// the status code is negative; an absent variable sets -356006 and appends nothing, a null
// name sets -356024. Memory exhaustion throws std::bad_alloc. No state is kept between
// calls: readers run concurrently for different requests.
#pragma once

#include <cstdint>

#include "qv/zil/StringBase.h"
#include "rpc/ArgumentList.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace variable {
namespace remoteconfig {

// Appends the value of the variable `name` to `arguments`.
void ReadVariable(uint32_t handle, ArgumentList& arguments, const char* name, StatusRecord& status);

// Stores the value of the variable `name` in `destination` (left as it was when absent).
void ReadVariableInto(uint32_t handle, zil::ByteString& destination, const char* name,
                      StatusRecord& status);

// Reads the variable named `base` followed by `index` in decimal (child7), as ReadVariable.
void ReadNumberedVariable(uint32_t handle, ArgumentList& arguments, const char* base, int32_t index,
                          StatusRecord& status);

// The last value of the list read as a count: strtol base 10 (leading space, a sign and
// digits, the rest ignored; no digits give 0), clamped to the signed 32-bit range and
// taken as unsigned, so "-1" gives 4294967295. An empty list gives 0.
uint32_t CountOfLast(const ArgumentList& arguments);

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
