#include "tools/registry/RegistryReplies.h"

#include "qv/zil/Exception.h"
#include "rpc/StatusRecordWire.h"
#include "rpc/Wire.h"

namespace qv {
namespace devtools {

using portableRegistry::rpc::RequestMessage;
using portableRegistry::rpc::StatusRecordWire;
using portableRegistry::rpc::Wire;
using variable::remoteconfig::ArgumentList;
using variable::remoteconfig::StatusRecord;
using zil::ByteString;

ByteString RegistryReplies::EncodeString(const ByteString& text) {
    ByteString encoded;
    encoded.resize(Wire::NarrowSize(text));
    char* cursor = encoded.data();
    Wire::WriteNarrow(text, cursor, encoded.data() + encoded.size());
    return encoded;
}

ByteString RegistryReplies::EncodeStatus(const StatusRecord& status) {
    ByteString encoded;
    encoded.resize(StatusRecordWire::Size(status));
    char* cursor = encoded.data();
    StatusRecordWire::Write(status, cursor, encoded.data() + encoded.size());
    return encoded;
}

RegistryServer::Reply RegistryReplies::Answer(const RequestMessage& request, const ByteString& text,
                                              const StatusRecord& status) {
    RegistryServer::Reply reply;
    for (uint32_t i = 0; i < 2 && i < request.GetParameterCount(); ++i) {
        reply.parameters.push_back(request.GetParameter(i));
    }
    reply.parameters.resize(2);
    reply.parameters.push_back(EncodeString(text));
    reply.parameters.push_back(EncodeStatus(status));
    return reply;
}

RegistryServer::Reply RegistryReplies::Echo(const RequestMessage& request) {
    StatusRecord status;
    if (request.GetParameterCount() != 4) {
        status.code = -1;
        return Answer(request, ByteString(), status);
    }
    try {
        ArgumentList arguments;
        const ByteString& list = request.GetParameter(0);
        const char* cursor = list.data();
        Wire::ReadStringList(arguments, cursor, list.data() + list.size());
        ByteString text;
        const ByteString& name = request.GetParameter(1);
        cursor = name.data();
        Wire::ReadNarrow(text, cursor, name.data() + name.size());
        for (const ByteString& argument : arguments) {
            text.append(1, '\n');
            text.append(argument);
        }
        return Answer(request, text, status);
    } catch (const zil::exception::Exception&) {
        status.code = -1;
        return Answer(request, ByteString(), status);
    }
}

}  // namespace devtools
}  // namespace qv
