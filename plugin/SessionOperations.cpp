#include "plugin/SessionOperations.h"

#include "plugin/StatusCodes.h"
#include "plugin/VariableReader.h"
#include "qv/zil/Exceptions.h"
#include "qv/zil/osdep/IntegerToString.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {

const char* const kMethodNames[] = {"X_QV_LIBRARY_PATH_NAME", "X_QV_FUNC_NAME", "X_QV_CLASS_NAME",
                                    "X_QV_CALLING_CONVENTION"};

void ReadMethodNames(uint32_t handle, ArgumentList& arguments, StatusRecord& status) {
    for (const char* name : kMethodNames) {
        ReadVariable(handle, arguments, name, status);
    }
}

// The session value first; false when the handler must stop.
bool StartSession(IRequestContext* context, ArgumentList& arguments, StatusRecord& status) {
    if (status.IsError()) {
        return false;
    }
    AppendSessionArgument(context, arguments, status);
    return !status.IsError();
}

// Reads the batch variables of one argument: libraryPathName i, and funcName b, className b,
// callingConvention b when the path differs (ignoring ASCII case) from the previous one.
void ReadBatchEntry(uint32_t handle, ArgumentList& arguments, int32_t index,
                    zil::ByteString& previousPath, int32_t& batch, StatusRecord& status) {
    ReadNumberedVariable(handle, arguments, "libraryPathName", index, status);
    if (status.IsError()) {
        return;
    }
    const bool opensBatch =
        index == 0 || arguments.back().IsNotEqual(previousPath, zil::CompareMode::IgnoreCase);
    previousPath = arguments.back();
    if (opensBatch) {
        ReadNumberedVariable(handle, arguments, "funcName", batch, status);
        ReadNumberedVariable(handle, arguments, "className", batch, status);
        ReadNumberedVariable(handle, arguments, "callingConvention", batch, status);
        ++batch;
    }
}

// Reads action i, id i, flags i, tdr i, and value i when the action is 1.
void ReadActionEntry(uint32_t handle, ArgumentList& arguments, int32_t index,
                     StatusRecord& status) {
    ReadNumberedVariable(handle, arguments, "action", index, status);
    if (status.IsError()) {
        return;
    }
    const uint32_t action = CountOfLast(arguments);
    ReadNumberedVariable(handle, arguments, "id", index, status);
    ReadNumberedVariable(handle, arguments, "flags", index, status);
    ReadNumberedVariable(handle, arguments, "tdr", index, status);
    if (!status.IsError() && action == 1) {
        ReadNumberedVariable(handle, arguments, "value", index, status);
    }
}

}  // namespace

void AppendSessionArgument(IRequestContext* context, ArgumentList& arguments,
                           StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        if (context == nullptr) {
            throw zil::exception::UnableToConvert();
        }
        const zil::WideString name(zil::ByteString("session"), "");
        int64_t value = 0;
        context->GetInt64Value(name, value);
        const zil::ByteString text(zil::osdep::IntegerToString(value), "");
        arguments.push_back(text);
    } catch (const zil::exception::UnableToConvert&) {
        status.SetCode(kSessionUnobtainable);
    }
}

void CloseSession(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                  StatusRecord& status) {
    if (!StartSession(context, arguments, status)) {
        return;
    }
    ReadMethodNames(handle, arguments, status);
}

void InvokeMethod(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                  StatusRecord& status) {
    if (!StartSession(context, arguments, status)) {
        return;
    }
    ReadMethodNames(handle, arguments, status);
    static const char* const kNames[] = {"code", "returnErrClustCode", "tdr", "struct",
                                         "numberOfPointers"};
    for (const char* name : kNames) {
        ReadVariable(handle, arguments, name, status);
    }
    if (status.IsError()) {
        return;
    }
    const uint32_t count = CountOfLast(arguments);
    for (uint32_t i = 0; i < count && !status.IsError(); ++i) {
        ReadNumberedVariable(handle, arguments, "value", static_cast<int32_t>(i), status);
    }
}

void AccessProperty(IRequestContext* context, uint32_t handle, ArgumentList& arguments,
                    StatusRecord& status) {
    if (!StartSession(context, arguments, status)) {
        return;
    }
    ReadVariable(handle, arguments, "ignoreErrors", status);
    ReadVariable(handle, arguments, "argc", status);
    const uint32_t count = status.IsError() ? 0 : CountOfLast(arguments);
    ReadVariable(handle, arguments, "numberOfBatches", status);
    if (count == 0 || status.IsError()) {
        return;
    }

    zil::ByteString previousPath;
    int32_t batch = 0;
    for (uint32_t i = 0; i < count && !status.IsError(); ++i) {
        ReadBatchEntry(handle, arguments, static_cast<int32_t>(i), previousPath, batch, status);
    }
    for (uint32_t i = 0; i < count && !status.IsError(); ++i) {
        ReadActionEntry(handle, arguments, static_cast<int32_t>(i), status);
    }
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
