#include "rpc/IPCClient.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <memory>
#include <string>

#include "tools/registry/RegistryServer.h"

namespace qv {
namespace portableRegistry {
namespace rpc {
namespace {

using devtools::RegistryServer;
using variable::remoteconfig::StatusRecord;
using zil::ByteString;
using Clock = std::chrono::steady_clock;

// Answers "R:" before every parameter and "ret" as the return value.
RegistryServer::Reply Prefix(const RequestMessage& request) {
    RegistryServer::Reply reply;
    reply.returnValue = "ret";
    for (uint32_t i = 0; i < request.GetParameterCount(); ++i) {
        reply.parameters.push_back(ByteString("R:") + request.GetParameter(i));
    }
    return reply;
}

int64_t MillisecondsSince(Clock::time_point start) {
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start).count();
}

class IPCClientTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/qv-rpc-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        m_directory = pattern;
        m_path = m_directory + "/registry";
        m_server.reset(new RegistryServer(m_path, &Prefix));
        m_server->Start();
    }
    void TearDown() override {
        m_server.reset();
        rmdir(m_directory.c_str());
    }

    std::unique_ptr<IPCClient> Connected(uint32_t timeoutMs = IPCClient::kDefaultTimeoutMs) {
        std::unique_ptr<IPCClient> client(new IPCClient(m_path, timeoutMs));
        EXPECT_FALSE(client->Connect());
        client->Watchdog().Start();
        return client;
    }

    // One call with four parameters "a".."d"; returns the status code.
    int32_t Call(IPCClient& client, ByteString* parameters = nullptr) {
        ByteString local[4] = {"a", "b", "c", "d"};
        ByteString* used = parameters ? parameters : local;
        ByteString returnValue("unset");
        StatusRecord status;
        client.Invoke(0, used, 4, returnValue, status);
        return status.code;
    }

    int32_t FaultyCall(const RegistryServer::Fault& fault) {
        m_server->SetFault(fault);
        std::unique_ptr<IPCClient> client = Connected();
        return Call(*client);
    }

    std::string m_directory;
    std::string m_path;
    std::unique_ptr<RegistryServer> m_server;
};

TEST(IPCClientErrors, StatusCodeTableAndConnectFailures) {
    using boost::system::error_code;
    const auto& generic = boost::system::generic_category();
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(EPIPE, generic)), -356060);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(ECONNREFUSED, generic)), -314707);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(ETIMEDOUT, generic)), -314730);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(1, generic)), -314723);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(13, generic)), -314700);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(125, generic)), -314727);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(124, generic)), -314899);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(error_code(126, generic)), -314899);
    // Asio's end of file is value 2 in its own category and maps like ENOENT.
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(boost::asio::error::eof), -314899);

    char pattern[] = "/tmp/qv-rpc-XXXXXX";
    ASSERT_NE(mkdtemp(pattern), nullptr);
    const std::string path = std::string(pattern) + "/registry";
    IPCClient missing(path, 200);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(missing.Connect()), -314899);

    // A socket file that nobody listens on refuses the connection.
    const int fd = socket(AF_UNIX, SOCK_STREAM, 0);
    ASSERT_GE(fd, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::strncpy(address.sun_path, path.c_str(), sizeof(address.sun_path) - 1);
    ASSERT_EQ(bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
    close(fd);
    IPCClient refused(path, 200);
    EXPECT_EQ(IPCClient::StatusCodeFromSystemError(refused.Connect()), -314707);
    unlink(path.c_str());
    rmdir(pattern);
}

TEST_F(IPCClientTest, TwoCallsOnOneConnectionCopyTheAnswerBack) {
    std::unique_ptr<IPCClient> client = Connected();
    ByteString parameters[4] = {"a", ByteString("\0z", 2), "", "d"};
    ByteString returnValue;
    StatusRecord status;
    client->Invoke(0, parameters, 4, returnValue, status);
    EXPECT_EQ(status.code, 0);
    EXPECT_TRUE(parameters[0] == ByteString("R:a"));
    EXPECT_TRUE(parameters[1] == ByteString("R:\0z", 4));
    EXPECT_TRUE(parameters[2] == ByteString("R:"));
    EXPECT_TRUE(returnValue == ByteString("ret"));
    client->Invoke(0, parameters, 4, returnValue, status);
    EXPECT_EQ(status.code, 0);
    EXPECT_TRUE(parameters[3] == ByteString("R:R:d"));
    EXPECT_EQ(m_server->ConnectionCount(), 1u);
    EXPECT_EQ(m_server->RequestCount(), 2u);

    // A negative code on entry sends nothing.
    status.code = -7;
    client->Invoke(0, parameters, 4, returnValue, status);
    EXPECT_EQ(status.code, -7);
    EXPECT_EQ(m_server->RequestCount(), 2u);
}

TEST_F(IPCClientTest, BrokenAnswersGiveTheirCodes) {
    using Kind = RegistryServer::FaultKind;
    RegistryServer::Fault fault;
    fault.kind = Kind::kCloseAfterRead;
    EXPECT_EQ(FaultyCall(fault), -314899);  // end of file while reading the header
    fault.kind = Kind::kFrameLength;
    fault.value = 4;
    EXPECT_EQ(FaultyCall(fault), -314898);
    fault.value = 5;
    fault.bytes = ByteString("\x01", 1);
    EXPECT_EQ(FaultyCall(fault), -314898);
    // A huge frameLength is refused before anything is allocated for it.
    fault.value = 0x7FFFFFF0;
    fault.bytes = ByteString();
    EXPECT_EQ(FaultyCall(fault), -314898);
    fault.value = kMaxFrameLength + 1;
    EXPECT_EQ(FaultyCall(fault), -314898);
    fault.kind = Kind::kVersion;
    fault.value = 0x0101;
    EXPECT_EQ(FaultyCall(fault), -314898);
    fault.kind = Kind::kKind;
    fault.value = 2;
    EXPECT_EQ(FaultyCall(fault), -314898);
    fault.kind = Kind::kRawBytes;
    fault.bytes = ByteString("\x0b\0\0\0\0\x01\x01\0\0\0\x07", 11);  // a bad name item
    EXPECT_EQ(FaultyCall(fault), -314898);
}

TEST_F(IPCClientTest, ForeignAnswersAreDroppedWithoutACode) {
    using Kind = RegistryServer::FaultKind;
    RegistryServer::Fault fault;
    fault.kind = Kind::kParameterCount;
    fault.value = 3;
    m_server->SetFault(fault);
    std::unique_ptr<IPCClient> client = Connected();
    ByteString parameters[4] = {"a", "b", "c", "d"};
    EXPECT_EQ(Call(*client, parameters), 0);
    EXPECT_TRUE(parameters[0] == ByteString("a"));
    EXPECT_TRUE(parameters[3] == ByteString("d"));

    // A request (kind 0) as the answer is dropped the same way.
    fault.kind = Kind::kKind;
    fault.value = 0;
    m_server->SetFault(fault);
    EXPECT_EQ(Call(*client, parameters), 0);
    EXPECT_TRUE(parameters[1] == ByteString("b"));
}

TEST_F(IPCClientTest, HangingRegistryTimesOutAndANewClientWorks) {
    RegistryServer::Fault fault;
    fault.kind = RegistryServer::FaultKind::kHang;
    m_server->SetFault(fault);
    std::unique_ptr<IPCClient> client = Connected(200);
    const Clock::time_point start = Clock::now();
    EXPECT_EQ(Call(*client), kTimedOut);
    const int64_t elapsed = MillisecondsSince(start);
    EXPECT_GE(elapsed, 200);
    EXPECT_LT(elapsed, 2000);
    // The timed-out stream is closed: a further call on it never reads the late answer.
    m_server->SetFault(RegistryServer::Fault());
    EXPECT_EQ(Call(*client), -314709);

    client = Connected(200);
    ByteString parameters[4] = {"a", "b", "c", "d"};
    EXPECT_EQ(Call(*client, parameters), 0);
    EXPECT_TRUE(parameters[0] == ByteString("R:a"));
}

TEST_F(IPCClientTest, NoStaleDeadlineHitsALaterCall) {
    // A call may run out of time on a loaded machine, but only by a deadline of its own,
    // never before that deadline passed; a timed-out client is replaced.
    std::unique_ptr<IPCClient> client;
    uint32_t timeoutMs = 0;
    auto call = [&](int index) {
        const Clock::time_point callStart = Clock::now();
        const int32_t code = Call(*client);
        if (code == kTimedOut) {
            EXPECT_GE(MillisecondsSince(callStart), timeoutMs) << "call " << index;
            client = Connected(timeoutMs);
        } else {
            EXPECT_EQ(code, 0) << "call " << index;
        }
    };

    // Fast calls: every deadline is cancelled long before it passes, most of them before
    // the watchdog thread has even woken up for them.
    timeoutMs = 30;
    client = Connected(timeoutMs);
    const Clock::time_point start = Clock::now();
    for (int i = 0; i < 300 || MillisecondsSince(start) < 150; ++i) {
        call(i);
    }

    // Slow calls answered shortly before their deadline: a deadline left over from the
    // previous call would end the next one early.
    timeoutMs = 100;
    RegistryServer::Fault fault;
    fault.kind = RegistryServer::FaultKind::kDelay;
    fault.value = 80;
    m_server->SetFault(fault);
    client = Connected(timeoutMs);
    for (int i = 0; i < 12; ++i) {
        call(i);
    }
}

}  // namespace
}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
