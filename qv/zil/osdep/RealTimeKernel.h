// Whether this process runs on a real-time kernel: the first byte of
// "/sys/kernel/realtime" is "1". The answer is read once per process; concurrent
// first callers wait on a spin lock with a growing sleep. A missing or unreadable
// file means "not real-time"; nothing is reported and nothing throws.
// May be called from any thread, also during static initialisation.
#pragma once

#include <cstdint>

namespace qv {
namespace zil {
namespace osdep {

bool IsRealTimeKernel();

namespace internal {

constexpr const char* kRealTimeKernelPath = "/sys/kernel/realtime";

// Test seam: forgets the stored answer, so that the next IsRealTimeKernel() reads
// `path` (which must outlive that call). Shipped code never calls it.
void ResetRealTimeKernelCheck(const char* path = kRealTimeKernelPath);

// Sleeps `milliseconds` on the monotonic clock, resuming after signal handlers.
void SleepMilliseconds(uint32_t milliseconds);

}  // namespace internal
}  // namespace osdep
}  // namespace zil
}  // namespace qv
