// One call of the IPC client and its watchdog:
//
//   Invoke: write frame ---------> OnWriteComplete --read 4 bytes--> OnHeaderRead
//     | Arm watchdog                  | error / late: code, end         | error / late /
//     v                               v                                 | L < 5 / L > 16 MiB:
//   run event loop <----------- (chain ends: nothing started)           | code, end
//     |   ^                                                             v
//     |   +--- OnTimeout (watchdog thread): timedOut, stop loop      read L - 4 bytes
//     v                                                                 |
//   Cancel watchdog; timedOut? -> -314730, close socket           OnBodyRead: parse,
//                                                                 copy parameters, end
//
// The chain runs on the calling thread inside the event loop's run; a step ends the call
// by starting no further operation, which lets run return.
#include "rpc/IPCClient.h"

#include <boost/asio/placeholders.hpp>
#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>
#include <boost/bind/bind.hpp>
#include <boost/system/system_error.hpp>

#include "rpc/ParseMessage.h"
#include "rpc/RequestMessage.h"
#include "rpc/ResponseMessage.h"
#include "rpc/TimerThreadImpl.h"
#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

using boost::system::error_code;
using variable::remoteconfig::StatusRecord;

namespace {

constexpr uint64_t kMicrosecond = 1000;  // clock unit in nanoseconds

// The frame buffer is kept for the next call up to this size, so that ordinary calls do
// not allocate it afresh each time.
constexpr uint32_t kKeptFrameBytes = 64u * 1024u;

template <typename Handler>
IPCClient::TimerThread* MakeWatchdog(Handler handler, uint32_t timeoutMs) {
    return new IPCClient::TimerThreadImpl<Handler>(handler, timeoutMs);
}

// Calls the watchdog's Cancel on every way out of the event loop's run.
class CancelOnExit {
public:
    explicit CancelOnExit(IPCClient::TimerThread& watchdog) : m_watchdog(watchdog) {}
    ~CancelOnExit() { m_watchdog.Cancel(); }
    CancelOnExit(const CancelOnExit&) = delete;
    CancelOnExit& operator=(const CancelOnExit&) = delete;

private:
    IPCClient::TimerThread& m_watchdog;
};

}  // namespace

IPCClient::IPCClient(const std::string& socketPath, uint32_t timeoutMs)
    : m_endpoint(socketPath),
      m_socket(m_io),
      m_nTimeoutMs(timeoutMs),
      m_pWatchdog(MakeWatchdog(boost::bind(&IPCClient::OnTimeout, this, boost::placeholders::_1),
                               timeoutMs)),
      m_bTimedOut(false) {}

IPCClient::~IPCClient() {
    error_code ignored;  // a destructor never throws: a close error is dropped here
    m_socket.close(ignored);
    m_pWatchdog->Stop();
    m_pWatchdog->Join();
    m_pWatchdog.reset();
}

error_code IPCClient::Connect() {
    error_code error;
    m_socket.connect(m_endpoint, error);
    return error;
}

void IPCClient::OnTimeout(const error_code& error) {
    if (error.value() == boost::asio::error::operation_aborted) {
        return;
    }
    m_bTimedOut = true;
    m_io.stop();
}

void IPCClient::Invoke(int32_t procedureId, zil::ByteString* parameters, uint32_t count,
                       zil::ByteString& returnValue, StatusRecord& status) {
    if (status.IsError()) {
        return;
    }
    zil::osdep::Mutex::ScopedLock callLock(m_callLock);
    m_io.reset();
    m_pParameters = parameters;
    m_nCount = count;
    m_pReturnValue = &returnValue;
    m_pStatus = &status;
    WriteRequest(procedureId);
    if (status.IsError()) {
        return;
    }
    m_bTimedOut = false;
    m_nStartUs = m_clock.Now(kMicrosecond);
    boost::asio::async_write(
        m_socket, boost::asio::buffer(m_frame.data(), m_frame.size()),
        boost::bind(&IPCClient::OnWriteComplete, this, boost::asio::placeholders::error));
    m_pWatchdog->Arm();
    error_code runError;
    {
        CancelOnExit cancel(*m_pWatchdog);
        m_io.run(runError);
    }
    if (runError) {
        throw boost::system::system_error(runError);
    }
    if (m_bTimedOut) {
        // The stream still has an operation outstanding: close it so that no later call
        // can read this call's answer, and let the aborted operation finish now.
        error_code ignored;
        m_socket.close(ignored);
        m_io.reset();
        m_io.poll(ignored);
        status.SetCode(kTimedOut);
    }
    if (m_frame.capacity() > kKeptFrameBytes) {
        m_frame = zil::ByteString();  // a large answer's buffer is not kept between calls
    }
}

void IPCClient::WriteRequest(int32_t procedureId) {
    RequestMessage request;
    request.SetProcedureId(procedureId);
    request.SetParameters(ParameterArray::Borrow(m_pParameters, m_nCount), m_nCount);
    const uint32_t size = request.GetSerializedSize();
    if (size > 0xFFFFFFFFu - 4) {
        request.GetParameters()->Detach();
        m_pStatus->SetCode(-1);  // cannot be framed
        return;
    }
    m_frame.resize(0);
    m_frame.resize(size + 4);
    Wire::PokeUInt32(size + 4, m_frame.data());
    char* cursor = m_frame.data() + 4;
    try {
        request.Serialize(cursor, m_frame.data() + m_frame.size());
    } catch (...) {
        request.GetParameters()->Detach();
        throw;
    }
    request.GetParameters()->Detach();  // the caller's strings stay the caller's
}

bool IPCClient::EndsCall(const error_code& error) {
    if (error) {
        m_pStatus->SetCode(StatusCodeFromSystemError(error));
        return true;
    }
    // In microseconds, so that rounding to whole milliseconds never ends a call early;
    // 64 bits of them do not wrap.
    if (m_clock.Now(kMicrosecond) - m_nStartUs >= uint64_t(m_nTimeoutMs) * 1000u) {
        m_pStatus->SetCode(kTimedOut);
        return true;
    }
    return false;
}

void IPCClient::OnWriteComplete(const error_code& error) {
    if (EndsCall(error)) {
        return;
    }
    if (m_frame.size() < 4) {
        m_frame.resize(4);
    }
    boost::asio::async_read(
        m_socket, boost::asio::buffer(m_frame.data(), 4),
        boost::bind(&IPCClient::OnHeaderRead, this, boost::asio::placeholders::error));
}

void IPCClient::OnHeaderRead(const error_code& error) {
    if (EndsCall(error)) {
        return;
    }
    const uint32_t frameLength = Wire::PeekUInt32(m_frame.data());
    if (frameLength < 5 || frameLength > kMaxFrameLength) {
        m_pStatus->SetCode(kMalformedAnswer);
        return;
    }
    m_nBodyLength = frameLength - 4;
    if (m_frame.size() < m_nBodyLength) {
        m_frame.resize(m_nBodyLength);
    }
    boost::asio::async_read(
        m_socket, boost::asio::buffer(m_frame.data(), m_nBodyLength),
        boost::bind(&IPCClient::OnBodyRead, this, boost::asio::placeholders::error));
}

void IPCClient::OnBodyRead(const error_code& error) {
    if (EndsCall(error)) {
        return;
    }
    const char* cursor = m_frame.data();
    std::unique_ptr<Message> message =
        ParseMessage(cursor, m_frame.data() + m_nBodyLength, *m_pStatus);
    if (!message) {
        m_pStatus->SetCode(kMalformedAnswer);
        return;
    }
    if (message->GetKind() != kResponseKind) {
        return;
    }
    const ResponseMessage& response = static_cast<const ResponseMessage&>(*message);
    if (response.GetParameterCount() != m_nCount) {
        return;  // dropped without a code: the caller's parameters stay as sent
    }
    // The parsed message is ours alone and dropped next: its strings are handed over
    // rather than copied.
    zil::ByteString* answers = response.GetParameters()->Strings();
    for (uint32_t i = 0; i < m_nCount; ++i) {
        m_pParameters[i].swap(answers[i]);
    }
    *m_pReturnValue = response.GetReturnValue();
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
