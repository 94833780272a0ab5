// The three operations within a session: each first puts the session value (from the
// request context's GetInt64Value("session"), as signed decimal text) at the head of the
// argument list, then reads its variables. When the context cannot give the value
// (UnableToConvert) the code becomes -356020 and nothing is read; any other exception
// passes on to the run entry. Handlers keep no state and run concurrently for different
// requests; a negative code on entry does nothing.
#pragma once

#include "plugin/OperationHandler.h"

namespace qv {
namespace variable {
namespace remoteconfig {

// Appends the session value; sets -356020 on UnableToConvert.
void AppendSessionArgument(IRequestContext* context, ArgumentList& arguments, StatusRecord& status);

// session, X_QV_LIBRARY_PATH_NAME, X_QV_FUNC_NAME, X_QV_CLASS_NAME, X_QV_CALLING_CONVENTION.
void CloseSession(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                  StatusRecord& status);
// session, the four of CloseSession, code, returnErrClustCode, tdr, struct,
// numberOfPointers, then value0..value(n-1).
void InvokeMethod(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                  StatusRecord& status);
// session, ignoreErrors, argc, numberOfBatches; then per argument libraryPathName i and,
// when it opens batch b, funcName b, className b, callingConvention b; then per argument
// action i, id i, flags i, tdr i and value i when the action is 1.
void AccessProperty(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                    StatusRecord& status);

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
