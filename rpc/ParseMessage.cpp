#include "rpc/ParseMessage.h"

#include "qv/zil/Exceptions.h"
#include "rpc/RequestMessage.h"
#include "rpc/ResponseMessage.h"
#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

std::unique_ptr<Message> ParseMessage(const char*& cursor, const char* end,
                                      variable::remoteconfig::StatusRecord& status) {
    if (status.IsError()) {
        return nullptr;
    }
    try {
        const char* peek = cursor;
        const uint16_t version = Wire::ReadUInt16(peek, end);
        const uint32_t kind = Wire::ReadUInt32(peek, end);
        if (version > kProtocolVersion) {
            return nullptr;
        }
        std::unique_ptr<Message> message;
        if (kind == kResponseKind) {
            message.reset(new ResponseMessage(version));
        } else if (kind == kRequestKind) {
            message.reset(new RequestMessage(version));
        } else {
            return nullptr;
        }
        message->Deserialize(cursor, end);
        return message;
    } catch (const zil::exception::DeserializationError&) {
        status.SetCode(kMalformedAnswer);
    } catch (const zil::exception::Exception&) {
        status.SetCode(kTransportFailure);
    }
    return nullptr;
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
