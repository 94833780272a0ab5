// The request context that the host web-service runtime passes to the plug-in's run entry,
// one per request, owned by the host and valid for that call only. Both sides compile
// against this header: the plug-in calls it through its virtual table by slot position,
// so the slots below are fixed (0 GetInt64Value, 1 and 2 unused, 3 GetOperationName) and
// nothing virtual may be declared before them - in particular no virtual destructor.
//
// A context is used by the thread that serves its request. GetInt64Value throws
// qv::zil::exception::UnableToConvert when no integer can be given for the name.
#pragma once

#include <cstdint>

#include "qv/zil/StringBase.h"

namespace qv {
namespace wsruntime {

class IRequestContext {
public:
    // Slot 0: stores the named value into `value` or throws UnableToConvert. The result
    // carries nothing the plug-in uses.
    virtual int32_t GetInt64Value(const zil::WideString& name, int64_t& value) = 0;
    // Slots 1 and 2: kept free for the host's own use.
    virtual int32_t ReservedSlot1() = 0;
    virtual int32_t ReservedSlot2() = 0;
    // Slot 3: the name of the operation the request invokes, owned by the host.
    virtual const zil::WideString* GetOperationName() = 0;

protected:
    IRequestContext() = default;
    ~IRequestContext() = default;  // not virtual: it would take slots before slot 0
    IRequestContext(const IRequestContext&) = default;
    IRequestContext& operator=(const IRequestContext&) = default;
};

}  // namespace wsruntime
}  // namespace qv
