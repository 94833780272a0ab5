// The four operations without a session: each reads its request variables in their fixed
// order into the argument list (the order is the contract with the registry service).
// Handlers keep no state and run concurrently for different requests; an absent variable
// leaves -356006 and the values read before it; a negative code on entry reads nothing.
#pragma once

#include "plugin/OperationHandler.h"

namespace qv {
namespace variable {
namespace remoteconfig {

// X_QV_CLIENT_SIDE_VERSION, X_QV_OLDEST_COMPATIBLE_VERSION.
void CheckVersionCompatibility(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                               StatusRecord& status);
// X_QV_TAG, X_QV_CONFIGURED_CLASS.
void ResolveClassAndUrl(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                        StatusRecord& status);
// X_QV_LIBRARY_PATH_NAME, X_QV_FUNC_NAME, X_QV_CLASS_NAME, X_QV_CALLING_CONVENTION, name,
// leafClassName, resolvedTag, remoteSession.
void IoObjectProxied(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                     StatusRecord& status);
// X_QV_TAG, X_QV_CONFIGURED_CLASS, X_QV_CLASS_HIERARCHY_CRC, parentCount, childCount, then
// parent0..parent(n-1), then child0..child(m-1).
void RegisterClassAndUrl(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                         StatusRecord& status);

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
