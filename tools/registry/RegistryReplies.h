// Answers of the development registry at the level of the data sender's four parameters
// (argument list, operation name, output text, status record). Stateless; any thread.
// Malformed requests are answered with their own parameters and a status code of -1.
#pragma once

#include "qv/zil/StringBase.h"
#include "tools/registry/RegistryServer.h"

namespace qv {
namespace devtools {

class RegistryReplies {
public:
    RegistryReplies() = delete;

    // Status 0 and the text "<operation>" then "\n<argument>" for each argument.
    static RegistryServer::Reply Echo(const portableRegistry::rpc::RequestMessage& request);
    // The request's first two parameters, then text and status encoded as the data sender
    // reads them back.
    static RegistryServer::Reply Answer(const portableRegistry::rpc::RequestMessage& request,
                                        const zil::ByteString& text,
                                        const variable::remoteconfig::StatusRecord& status);
    static zil::ByteString EncodeString(const zil::ByteString& text);
    static zil::ByteString EncodeStatus(const variable::remoteconfig::StatusRecord& status);
};

}  // namespace devtools
}  // namespace qv
