// The data sender that talks to the registry service: connects an IPC client on first
// use, packs the argument list, operation name, output and status record into the four
// parameters of one call to procedure 0, unpacks the answer text and status, and drops
// the connection after a transport failure so that the next Send connects afresh.
//
// One Send at a time per sender (the plug-in holds its sender lock around it). Failures
// become status codes: the IPC client's codes, -1 for a value that cannot be encoded or
// decoded. std::bad_alloc, boost::system::system_error (the client's event loop) and
// qv::zil::osdep::PosixError (a watchdog thread that cannot start) pass out of Send.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "rpc/IDataSender.h"
#include "rpc/IPCClient.h"

namespace qv {
namespace variable {
namespace remoteconfig {

class RemoteDataSender : public IDataSender {
public:
    static constexpr int32_t kSendProcedureId = 0;
    static constexpr uint32_t kSendParameterCount = 4;
    static constexpr int32_t kMarshallingFailure = -1;
    static constexpr int32_t kBrokenPipe = -356060;

    explicit RemoteDataSender(
        const std::string& socketPath = portableRegistry::rpc::IPCClient::kDefaultSocketPath,
        uint32_t timeoutMs = portableRegistry::rpc::IPCClient::kDefaultTimeoutMs);
    ~RemoteDataSender() override;

    void Send(const ArgumentList& arguments, const zil::ByteString& operation,
              zil::ByteString& output, StatusRecord& status) override;

    bool IsConnected() const { return m_pClient != nullptr; }

    static void EncodeStringList(const ArgumentList& list, zil::ByteString& parameter,
                                 StatusRecord& status);
    static void EncodeString(const zil::ByteString& text, zil::ByteString& parameter,
                             StatusRecord& status);
    static void EncodeStatus(const StatusRecord& record, zil::ByteString& parameter,
                             StatusRecord& status);
    static void DecodeString(const zil::ByteString& parameter, zil::ByteString& text,
                             StatusRecord& status);
    static void DecodeStatus(const zil::ByteString& parameter, StatusRecord& status);

    // True for the codes after which the connection is dropped.
    static bool DropsConnection(int32_t code);

private:
    void EnsureConnected();
    void Disconnect();

    std::string m_socketPath;
    uint32_t m_nTimeoutMs;
    std::unique_ptr<portableRegistry::rpc::IPCClient> m_pClient;
    // The four call parameters, reused by each Send up to this size.
    static constexpr uint32_t kKeptParameterBytes = 64u * 1024u;
    zil::ByteString m_parameters[kSendParameterCount];
};

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
