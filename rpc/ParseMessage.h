// Turns the bytes of one received message (without its frame length) into a request or
// a response object chosen by the kind in its header. Reports failures in the status
// record, never as foundation exceptions: -314898 for a short or malformed message,
// -314899 for any other foundation failure; returns none, with the status unchanged, for
// a version above kProtocolVersion or a kind other than 0 and 1. Does nothing when the
// status code is already negative. Stateless; any thread. std::bad_alloc passes through.
#pragma once

#include <memory>

#include "rpc/Message.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

constexpr int32_t kMalformedAnswer = -314898;
constexpr int32_t kTransportFailure = -314899;

std::unique_ptr<Message> ParseMessage(const char*& cursor, const char* end,
                                      variable::remoteconfig::StatusRecord& status);

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
