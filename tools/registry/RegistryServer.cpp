#include "tools/registry/RegistryServer.h"

#include <unistd.h>

#include <boost/asio/deadline_timer.hpp>
#include <boost/asio/placeholders.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>
#include <boost/bind/bind.hpp>
#include <boost/system/system_error.hpp>

#include "rpc/IPCClient.h"
#include "rpc/ParseMessage.h"
#include "rpc/ResponseMessage.h"
#include "rpc/Wire.h"
#include "tools/registry/RegistryReplies.h"

namespace qv {
namespace devtools {

using boost::system::error_code;
using portableRegistry::rpc::Message;
using portableRegistry::rpc::ParameterArray;
using portableRegistry::rpc::RequestMessage;
using portableRegistry::rpc::ResponseMessage;
using portableRegistry::rpc::Wire;
namespace asio = boost::asio;

// One accepted stream: reads a request frame, answers it (or not, by the fault), reads
// the next. Lives as long as an operation of it is pending.
class RegistryServer::Connection : public std::enable_shared_from_this<Connection> {
public:
    Connection(RegistryServer& server, asio::io_service& io)
        : m_server(server), m_socket(io), m_timer(io) {}

    asio::local::stream_protocol::socket& Socket() { return m_socket; }

    void ReadRequest() {
        asio::async_read(
            m_socket, asio::buffer(m_header, 4),
            boost::bind(&Connection::OnHeaderRead, shared_from_this(), asio::placeholders::error));
    }

private:
    void OnHeaderRead(const error_code& error) {
        if (error) {
            return;
        }
        const uint32_t frameLength = Wire::PeekUInt32(m_header);
        if (frameLength < 4 || frameLength > portableRegistry::rpc::kMaxFrameLength) {
            return;  // not our protocol: the connection closes
        }
        m_body.assign(frameLength - 4, 0);
        asio::async_read(
            m_socket, asio::buffer(m_body),
            boost::bind(&Connection::OnBodyRead, shared_from_this(), asio::placeholders::error));
    }

    void OnBodyRead(const error_code& error) {
        if (error) {
            return;
        }
        m_server.RecordFrame(m_header, m_body);
        ++m_server.m_nRequests;
        variable::remoteconfig::StatusRecord status;
        const char* cursor = m_body.data();
        std::unique_ptr<Message> message =
            portableRegistry::rpc::ParseMessage(cursor, m_body.data() + m_body.size(), status);
        if (!message || message->GetKind() != portableRegistry::rpc::kRequestKind) {
            return;
        }
        const Fault fault = m_server.CurrentFault();
        switch (fault.kind) {
            case FaultKind::kHang:
                ReadRequest();  // keeps reading, so that a close by the peer ends it
                return;
            case FaultKind::kCloseAfterRead:
                return;
            default:
                break;
        }
        m_answer = m_server.Answer(static_cast<const RequestMessage&>(*message), fault);
        if (fault.kind == FaultKind::kDelay) {
            m_timer.expires_from_now(boost::posix_time::milliseconds(fault.value));
            m_timer.async_wait(
                boost::bind(&Connection::OnDelayed, shared_from_this(), asio::placeholders::error));
            return;
        }
        WriteAnswer();
    }

    void OnDelayed(const error_code& error) {
        if (!error) {
            WriteAnswer();
        }
    }

    void WriteAnswer() {
        asio::async_write(m_socket, asio::buffer(m_answer),
                          boost::bind(&Connection::OnAnswerWritten, shared_from_this(),
                                      asio::placeholders::error));
    }

    void OnAnswerWritten(const error_code& error) {
        if (!error) {
            ReadRequest();
        }
    }

    RegistryServer& m_server;
    asio::local::stream_protocol::socket m_socket;
    asio::deadline_timer m_timer;
    char m_header[4] = {};
    std::vector<char> m_body;
    std::vector<char> m_answer;
};

RegistryServer::RegistryServer(const std::string& socketPath, Handler handler)
    : m_path(socketPath), m_handler(handler ? handler : Handler(&RegistryReplies::Echo)) {}

RegistryServer::~RegistryServer() {
    Stop();
    ::unlink(m_path.c_str());
}

void RegistryServer::Start() {
    Stop();
    ::unlink(m_path.c_str());
    m_pIo.reset(new asio::io_service);
    m_pAcceptor.reset(new asio::local::stream_protocol::acceptor(*m_pIo));
    const asio::local::stream_protocol::endpoint endpoint(m_path);
    m_pAcceptor->open(endpoint.protocol());
    m_pAcceptor->bind(endpoint);
    m_pAcceptor->listen();
    StartAccept();
    asio::io_service* io = m_pIo.get();
    m_thread = std::thread([io] {
        error_code ignored;
        io->run(ignored);
    });
}

void RegistryServer::Stop() {
    if (!m_pIo) {
        return;
    }
    m_pIo->stop();
    if (m_thread.joinable()) {
        m_thread.join();
    }
    m_pAcceptor.reset();
    // Pending operations own their connections: dropping them closes every stream.
    m_pIo.reset();
}

void RegistryServer::SetFault(const Fault& fault) {
    std::lock_guard<std::mutex> lock(m_faultLock);
    m_fault = fault;
}

RegistryServer::Fault RegistryServer::CurrentFault() {
    std::lock_guard<std::mutex> lock(m_faultLock);
    return m_fault;
}

void RegistryServer::RecordFrame(const char* header, const std::vector<char>& body) {
    std::lock_guard<std::mutex> lock(m_faultLock);
    m_lastFrame.assign(header, header + 4);
    m_lastFrame.insert(m_lastFrame.end(), body.begin(), body.end());
}

std::vector<unsigned char> RegistryServer::LastRequestFrame() {
    std::lock_guard<std::mutex> lock(m_faultLock);
    return m_lastFrame;
}

void RegistryServer::StartAccept() {
    std::shared_ptr<Connection> connection = std::make_shared<Connection>(*this, *m_pIo);
    m_pAcceptor->async_accept(
        connection->Socket(),
        boost::bind(&RegistryServer::OnAccepted, this, connection, asio::placeholders::error));
}

void RegistryServer::OnAccepted(const std::shared_ptr<Connection>& connection,
                                const error_code& error) {
    if (error) {
        return;
    }
    ++m_nConnections;
    connection->ReadRequest();
    StartAccept();
}

std::vector<char> RegistryServer::Answer(const RequestMessage& request, const Fault& fault) {
    if (fault.kind == FaultKind::kRawBytes) {
        return std::vector<char>(fault.bytes.data(), fault.bytes.data() + fault.bytes.size());
    }
    if (fault.kind == FaultKind::kFrameLength) {
        std::vector<char> bytes(4 + fault.bytes.size());
        Wire::PokeUInt32(fault.value, bytes.data());
        std::copy(fault.bytes.data(), fault.bytes.data() + fault.bytes.size(), bytes.data() + 4);
        return bytes;
    }
    Reply reply = m_handler(request);
    if (fault.kind == FaultKind::kStatus) {
        reply.parameters.resize(4);
        reply.parameters[3] = RegistryReplies::EncodeStatus(fault.status);
    }
    if (fault.kind == FaultKind::kParameterCount) {
        reply.parameters.resize(fault.value);
    }
    const uint16_t version = fault.kind == FaultKind::kVersion
                                 ? static_cast<uint16_t>(fault.value)
                                 : portableRegistry::rpc::kProtocolVersion;
    const uint32_t count = static_cast<uint32_t>(reply.parameters.size());
    ParameterArray* parameters = ParameterArray::Create(count);
    for (uint32_t i = 0; i < count; ++i) {
        parameters->Strings()[i] = reply.parameters[i];
    }
    // Kind 0 answers with a well-formed request, any other kind with a relabelled response.
    std::unique_ptr<Message> message;
    if (fault.kind == FaultKind::kKind && fault.value == portableRegistry::rpc::kRequestKind) {
        RequestMessage* asRequest = new RequestMessage(version);
        message.reset(asRequest);
        asRequest->SetProcedureId(0);
        asRequest->SetParameters(parameters, count);
    } else {
        ResponseMessage* response = new ResponseMessage(version);
        message.reset(response);
        response->SetReturnValue(reply.returnValue);
        response->SetParameters(parameters, count);
    }
    std::vector<char> bytes(message->GetSerializedSize() + 4);
    Wire::PokeUInt32(static_cast<uint32_t>(bytes.size()), bytes.data());
    char* cursor = bytes.data() + 4;
    message->Serialize(cursor, bytes.data() + bytes.size());
    if (fault.kind == FaultKind::kKind) {
        Wire::PokeUInt32(fault.value, bytes.data() + 6);  // kind follows length and version
    }
    return bytes;
}

}  // namespace devtools
}  // namespace qv
