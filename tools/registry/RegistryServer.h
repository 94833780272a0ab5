// The development registry service: listens on a Unix socket path, serves any number of
// connections at once and answers every request frame with one response frame produced
// by a handler callback. Tests script faults into the answers (delay, hang, close after
// reading, raw bytes, a chosen frameLength, parameter count, kind or version, a chosen
// status record) to drive the IPC client through its failure paths.
//
// Start, Stop, SetFault and the counters may be used from any thread; the handler runs
// on the server's own thread. Start throws boost::system::system_error when the path
// cannot be bound. A request that is not a well-formed request message closes its
// connection. The destructor stops the server, closes every connection and removes the
// socket file.
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <boost/asio/io_service.hpp>
#include <boost/asio/local/stream_protocol.hpp>

#include "qv/zil/StringBase.h"
#include "rpc/RequestMessage.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace devtools {

class RegistryServer {
public:
    // What the handler answers: the response's return value and parameters.
    struct Reply {
        zil::ByteString returnValue;
        std::vector<zil::ByteString> parameters;
    };
    using Handler = std::function<Reply(const portableRegistry::rpc::RequestMessage&)>;

    enum class FaultKind {
        kNone,
        kDelay,           // answer after value milliseconds
        kHang,            // read the request, never answer
        kCloseAfterRead,  // read the request, close the connection
        kRawBytes,        // send bytes instead of a response frame
        kFrameLength,     // send value as frameLength, then bytes
        kParameterCount,  // answer with value parameters (cut or padded)
        kKind,            // answer with kind value
        kVersion,         // answer with version value
        kStatus,          // replace parameter 3 by the encoding of status
    };
    struct Fault {
        FaultKind kind = FaultKind::kNone;
        uint32_t value = 0;
        zil::ByteString bytes;
        variable::remoteconfig::StatusRecord status;
    };

    explicit RegistryServer(const std::string& socketPath, Handler handler = Handler());
    ~RegistryServer();
    RegistryServer(const RegistryServer&) = delete;
    RegistryServer& operator=(const RegistryServer&) = delete;

    // Replaces a stale socket file, listens and starts the server thread. A stopped
    // server may be started again.
    void Start();
    // Ends the server thread and closes the listener and every connection.
    void Stop();

    // Applies to every request read from now on, until replaced.
    void SetFault(const Fault& fault);
    uint32_t RequestCount() const { return m_nRequests; }
    // The bytes of the latest request frame read, frameLength included.
    std::vector<unsigned char> LastRequestFrame();
    uint32_t ConnectionCount() const { return m_nConnections; }

private:
    class Connection;
    void StartAccept();
    void OnAccepted(const std::shared_ptr<Connection>& connection,
                    const boost::system::error_code& error);
    Fault CurrentFault();
    void RecordFrame(const char* header, const std::vector<char>& body);
    std::vector<char> Answer(const portableRegistry::rpc::RequestMessage& request,
                             const Fault& fault);

    std::string m_path;
    Handler m_handler;
    // Made by Start, destroyed by Stop: destroying the loop drops every connection.
    std::unique_ptr<boost::asio::io_service> m_pIo;
    std::unique_ptr<boost::asio::local::stream_protocol::acceptor> m_pAcceptor;
    std::thread m_thread;
    std::mutex m_faultLock;  // guards m_fault and m_lastFrame
    Fault m_fault;
    std::vector<unsigned char> m_lastFrame;
    std::atomic<uint32_t> m_nRequests{0};
    std::atomic<uint32_t> m_nConnections{0};
};

}  // namespace devtools
}  // namespace qv
