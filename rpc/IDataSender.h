// The seam between the plug-in and the registry: one Send per operation request hands the
// argument list, the operation name, an output string and the caller's status record to
// the registry service and brings back its answer text and status. Implementations are
// used by one thread at a time; failures are reported in the caller's status record.
#pragma once

#include "qv/zil/StringBase.h"
#include "rpc/ArgumentList.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace variable {
namespace remoteconfig {

class IDataSender {
public:
    IDataSender() = default;
    virtual ~IDataSender();
    IDataSender(const IDataSender&) = delete;
    IDataSender& operator=(const IDataSender&) = delete;

    // Does nothing when status.code is negative on entry.
    virtual void Send(const ArgumentList& arguments, const zil::ByteString& operation,
                      zil::ByteString& output, StatusRecord& status) = 0;

protected:
    StatusRecord m_ownStatus;  // outcome of the latest connection attempt; only code is used
};

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
