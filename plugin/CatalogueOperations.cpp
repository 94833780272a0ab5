#include "plugin/CatalogueOperations.h"

#include "plugin/VariableReader.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {

template <size_t N>
void ReadAll(uint32_t handle, ArgumentList& arguments, const char* const (&names)[N],
             StatusRecord& status) {
    for (const char* name : names) {
        ReadVariable(handle, arguments, name, status);
    }
}

// Reads base0 .. base(count-1), stopping at the first absent one.
void ReadNumbered(uint32_t handle, ArgumentList& arguments, const char* base, uint32_t count,
                  StatusRecord& status) {
    for (uint32_t i = 0; i < count && !status.IsError(); ++i) {
        ReadNumberedVariable(handle, arguments, base, static_cast<int32_t>(i), status);
    }
}

}  // namespace

void CheckVersionCompatibility(IRequestContext*, uint32_t handle, ArgumentList& arguments,
                               StatusRecord& status) {
    static const char* const kNames[] = {"X_QV_CLIENT_SIDE_VERSION",
                                         "X_QV_OLDEST_COMPATIBLE_VERSION"};
    ReadAll(handle, arguments, kNames, status);
}

void ResolveClassAndUrl(IRequestContext*, uint32_t handle, ArgumentList& arguments,
                        StatusRecord& status) {
    static const char* const kNames[] = {"X_QV_TAG", "X_QV_CONFIGURED_CLASS"};
    ReadAll(handle, arguments, kNames, status);
}

void IoObjectProxied(IRequestContext*, uint32_t handle, ArgumentList& arguments,
                     StatusRecord& status) {
    static const char* const kNames[] = {"X_QV_LIBRARY_PATH_NAME",
                                         "X_QV_FUNC_NAME",
                                         "X_QV_CLASS_NAME",
                                         "X_QV_CALLING_CONVENTION",
                                         "name",
                                         "leafClassName",
                                         "resolvedTag",
                                         "remoteSession"};
    ReadAll(handle, arguments, kNames, status);
}

void RegisterClassAndUrl(IRequestContext*, uint32_t handle, ArgumentList& arguments,
                         StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    static const char* const kNames[] = {"X_QV_TAG", "X_QV_CONFIGURED_CLASS",
                                         "X_QV_CLASS_HIERARCHY_CRC"};
    ReadAll(handle, arguments, kNames, status);
    ReadVariable(handle, arguments, "parentCount", status);
    const uint32_t parents = status.IsError() ? 0 : CountOfLast(arguments);
    ReadVariable(handle, arguments, "childCount", status);
    const uint32_t children = status.IsError() ? 0 : CountOfLast(arguments);
    if (status.IsError()) {
        return;
    }
    ReadNumbered(handle, arguments, "parent", parents, status);
    ReadNumbered(handle, arguments, "child", children, status);
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
