#include "rpc/RemoteDataSender.h"

#include "qv/zil/Exception.h"
#include "rpc/StatusRecordWire.h"
#include "rpc/Wire.h"

namespace qv {
namespace variable {
namespace remoteconfig {

using portableRegistry::rpc::IPCClient;
using portableRegistry::rpc::StatusRecordWire;
using portableRegistry::rpc::Wire;
using zil::ByteString;

IDataSender::~IDataSender() = default;

RemoteDataSender::RemoteDataSender(const std::string& socketPath, uint32_t timeoutMs)
    : m_socketPath(socketPath), m_nTimeoutMs(timeoutMs) {}

RemoteDataSender::~RemoteDataSender() { Disconnect(); }

bool RemoteDataSender::DropsConnection(int32_t code) {
    // A broken pipe lies outside the range but leaves a stream that can carry nothing more.
    return (code >= -314899 && code <= -314700) || code == kBrokenPipe;
}

void RemoteDataSender::Send(const ArgumentList& arguments, const ByteString& operation,
                            ByteString& output, StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    EnsureConnected();
    if (m_ownStatus.IsError()) {
        status.SetCode(m_ownStatus.code);
        return;
    }
    // The parameters' buffers are kept for the next Send, as the client keeps its frame.
    ByteString* const parameters = m_parameters;
    EncodeStringList(arguments, parameters[0], status);
    EncodeString(operation, parameters[1], status);
    EncodeString(output, parameters[2], status);
    EncodeStatus(status, parameters[3], status);
    if (!status.IsError()) {
        ByteString returnValue;
        m_pClient->Invoke(kSendProcedureId, parameters, kSendParameterCount, returnValue, status);
    }
    if (!status.IsError()) {
        DecodeString(parameters[2], output, status);
        DecodeStatus(parameters[3], status);
    }
    if (DropsConnection(status.code)) {
        Disconnect();
    }
    for (ByteString& parameter : m_parameters) {
        if (parameter.capacity() > kKeptParameterBytes) {
            parameter = ByteString();  // a large request's buffers are not kept
        }
    }
}

void RemoteDataSender::EnsureConnected() {
    if (m_pClient) {
        return;
    }
    std::unique_ptr<IPCClient> client(new IPCClient(m_socketPath, m_nTimeoutMs));
    const boost::system::error_code error = client->Connect();
    m_ownStatus.SetCode(error ? IPCClient::StatusCodeFromSystemError(error) : 0);
    client->Watchdog().Start();
    m_pClient = std::move(client);
    if (m_ownStatus.IsError()) {
        Disconnect();
    }
}

void RemoteDataSender::Disconnect() { m_pClient.reset(); }

void RemoteDataSender::EncodeStringList(const ArgumentList& list, ByteString& parameter,
                                        StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        parameter.resize(0);
        parameter.resize(Wire::StringListSize(list));
        char* cursor = parameter.data();
        Wire::WriteStringList(list, cursor, parameter.data() + parameter.size());
    } catch (const zil::exception::Exception&) {
        status.SetCode(kMarshallingFailure);
    }
}

void RemoteDataSender::EncodeString(const ByteString& text, ByteString& parameter,
                                    StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        parameter.resize(0);
        parameter.resize(Wire::NarrowSize(text));
        char* cursor = parameter.data();
        Wire::WriteNarrow(text, cursor, parameter.data() + parameter.size());
    } catch (const zil::exception::Exception&) {
        status.SetCode(kMarshallingFailure);
    }
}

void RemoteDataSender::EncodeStatus(const StatusRecord& record, ByteString& parameter,
                                    StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        parameter.resize(0);
        parameter.resize(StatusRecordWire::Size(record));
        char* cursor = parameter.data();
        StatusRecordWire::Write(record, cursor, parameter.data() + parameter.size());
    } catch (const zil::exception::Exception&) {
        status.SetCode(kMarshallingFailure);
    }
}

void RemoteDataSender::DecodeString(const ByteString& parameter, ByteString& text,
                                    StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        const char* cursor = parameter.data();
        Wire::ReadNarrow(text, cursor, parameter.data() + parameter.size());
    } catch (const zil::exception::Exception&) {
        status.SetCode(kMarshallingFailure);
    }
}

void RemoteDataSender::DecodeStatus(const ByteString& parameter, StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    try {
        const char* cursor = parameter.data();
        StatusRecordWire::Read(status, cursor, parameter.data() + parameter.size());
    } catch (const zil::exception::Exception&) {
        status.SetCode(kMarshallingFailure);
    }
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
