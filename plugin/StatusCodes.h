// The status codes that the plug-in itself sets, and the HTTP status it answers each final
// code with. Pure functions; usable from any thread.
#pragma once

#include <cstdint>

namespace qv {
namespace variable {
namespace remoteconfig {

constexpr int32_t kVariableAbsent = -356006;
constexpr int32_t kAcceptsOnlyHtml = -356007;
constexpr int32_t kSessionUnobtainable = -356020;
constexpr int32_t kVariableWithoutName = -356024;
constexpr int32_t kUnknownOperation = static_cast<int32_t>(0x80004001u);
// Run without a data sender (before Init or after Finalize): the transport failure code.
constexpr int32_t kNotInitialised = -314899;

// 0 for code 0 (no status is set); 400, 406, 501 for their codes; 500 for any other.
int32_t HttpStatusForCode(int32_t code);

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
