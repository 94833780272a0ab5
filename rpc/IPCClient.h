// Carries one remote procedure call at a time to the registry service over a local stream
// socket: writes the request frame, reads the response frame and copies the response's
// parameters back into the caller's strings. Every call is bounded by a time-out, enforced
// by the watchdog thread (which stops the call's event loop) and by an elapsed-time check
// in every completion step.
//
// Invoke may be called from several threads; calls are serialised by the call lock.
// Failures of the transport, the time-out and malformed answers become status codes in
// the caller's record; only memory exhaustion, errors of the event loop itself
// (boost::system::system_error) and a watchdog thread that cannot start
// (qv::zil::osdep::PosixError) leave as exceptions. The destructor never throws.
// A response frameLength above kMaxFrameLength is a malformed answer (-314898). After a
// time-out the stream is closed, so a late answer is never read by a later call: further
// calls on that client report EBADF (-314709) and its owner replaces it.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>

#include <boost/asio/io_service.hpp>
#include <boost/asio/local/stream_protocol.hpp>
#include <boost/system/error_code.hpp>

#include "qv/zil/StringBase.h"
#include "qv/zil/osdep/MonotonicClock.h"
#include "qv/zil/osdep/Mutex.h"
#include "qv/zil/osdep/Thread.h"
#include "rpc/StatusRecord.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

constexpr int32_t kTimedOut = -314730;
// The largest response frame accepted; a larger frameLength is a malformed answer.
constexpr uint32_t kMaxFrameLength = 16u * 1024u * 1024u;

class IPCClient {
public:
    static constexpr const char* kDefaultSocketPath = "/tmp/qvPortableRegistry";
    static constexpr uint32_t kDefaultTimeoutMs = 60000;

    // The watchdog: one thread that runs one deadline per call between Arm and Cancel.
    class TimerThread : public zil::osdep::Thread {
    public:
        virtual void Arm() = 0;     // starts the deadline of the current call
        virtual void Cancel() = 0;  // ends the deadline started by the preceding Arm
        virtual void Start() = 0;   // starts the thread
        virtual void Stop() = 0;    // ends the thread's loop; Join afterwards
    };
    template <typename Handler>
    class TimerThreadImpl;

    // Builds everything; the socket stays closed and the watchdog thread is not started.
    explicit IPCClient(const std::string& socketPath = kDefaultSocketPath,
                       uint32_t timeoutMs = kDefaultTimeoutMs);
    ~IPCClient();
    IPCClient(const IPCClient&) = delete;
    IPCClient& operator=(const IPCClient&) = delete;

    // Blocking connect to the socket path; the error is handed back unchanged.
    boost::system::error_code Connect();
    TimerThread& Watchdog() { return *m_pWatchdog; }

    // One request/response exchange over the caller's parameter strings; the outcome is
    // in status. Does nothing when status.code is negative on entry.
    void Invoke(int32_t procedureId, zil::ByteString* parameters, uint32_t count,
                zil::ByteString& returnValue, variable::remoteconfig::StatusRecord& status);

    // The watchdog's deadline handler: a cancelled wait (125) does nothing; otherwise the
    // call is flagged as timed out and its event loop stopped. Any thread.
    void OnTimeout(const boost::system::error_code& error);

    static int32_t StatusCodeFromSystemError(const boost::system::error_code& error);

private:
    void OnWriteComplete(const boost::system::error_code& error);
    void OnHeaderRead(const boost::system::error_code& error);
    void OnBodyRead(const boost::system::error_code& error);
    // Records an error or an expired time limit; true when the call must end here.
    bool EndsCall(const boost::system::error_code& error);
    void WriteRequest(int32_t procedureId);

    zil::osdep::Mutex m_callLock;
    zil::osdep::MonotonicClock m_clock;
    boost::asio::io_service m_io;
    boost::asio::local::stream_protocol::endpoint m_endpoint;
    boost::asio::local::stream_protocol::socket m_socket;
    uint32_t m_nTimeoutMs;
    std::unique_ptr<TimerThread> m_pWatchdog;
    std::atomic<bool> m_bTimedOut;

    // State of the call in progress, valid between the start and the end of Invoke.
    zil::ByteString m_frame;
    zil::ByteString* m_pParameters = nullptr;
    uint32_t m_nCount = 0;
    zil::ByteString* m_pReturnValue = nullptr;
    variable::remoteconfig::StatusRecord* m_pStatus = nullptr;
    uint64_t m_nStartUs = 0;  // monotonic clock at the start of the call
    uint32_t m_nBodyLength = 0;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
