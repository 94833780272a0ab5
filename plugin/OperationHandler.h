// The signature of an operation handler and the table that maps operation names to them.
// A handler collects its request variables into the argument list and reports failure
// only through the status record (or by exceptions, which the run entry catches). The
// table is filled under the init lock and afterwards only read, by any thread.
#pragma once

#include <cstdint>
#include <map>

#include "platform/ws_runtime/IRequestContext.h"
#include "qv/zil/StringBase.h"
#include "rpc/ArgumentList.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace variable {
namespace remoteconfig {

using IRequestContext = wsruntime::IRequestContext;

using OperationHandler = void (*)(IRequestContext* context, uint32_t handle,
                                  ArgumentList& arguments, StatusRecord& status);

// Keys compare byte-wise ignoring ASCII case, so ACCESS_PROPERTY finds access_property.
using OperationTable = std::map<zil::ByteString, OperationHandler, zil::LessIgnoreCase>;

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
