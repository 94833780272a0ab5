#include "rpc/RemoteDataSender.h"

#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <memory>
#include <string>
#include <vector>

#include "tools/registry/RegistryReplies.h"
#include "tools/registry/RegistryServer.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

using devtools::RegistryReplies;
using devtools::RegistryServer;
using portableRegistry::rpc::RequestMessage;
using zil::ByteString;
using zil::WideString;
using Bytes = std::vector<unsigned char>;

class RemoteDataSenderTest : public ::testing::Test {
protected:
    void SetUp() override {
        char pattern[] = "/tmp/qv-sender-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        m_directory = pattern;
        m_path = m_directory + "/registry";
    }
    void TearDown() override {
        m_server.reset();
        rmdir(m_directory.c_str());
    }
    void StartRegistry(RegistryServer::Handler handler = RegistryServer::Handler()) {
        m_server.reset();
        m_server.reset(new RegistryServer(m_path, handler));
        m_server->Start();
    }
    // One Send of "close_session" with no arguments; returns the status code.
    int32_t Send(RemoteDataSender& sender, ByteString* output = nullptr) {
        ByteString local;
        StatusRecord status;
        sender.Send(ArgumentList(), "close_session", output ? *output : local, status);
        return status.code;
    }
    int32_t SendWithStatusFault(RemoteDataSender& sender, int32_t code) {
        RegistryServer::Fault fault;
        fault.kind = RegistryServer::FaultKind::kStatus;
        fault.status.code = code;
        m_server->SetFault(fault);
        return Send(sender);
    }

    std::string m_directory;
    std::string m_path;
    std::unique_ptr<RegistryServer> m_server;
};

TEST_F(RemoteDataSenderTest, CloseSessionFrameIsExact) {
    StartRegistry();
    RemoteDataSender sender(m_path, 5000);
    ByteString output;
    EXPECT_EQ(Send(sender, &output), 0);
    EXPECT_TRUE(output == ByteString("close_session"));
    Bytes expected = {0x52, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0,    0, 0, 0, 0,    0, 0, 4,
                      0,    0, 0, 5, 0, 0, 0, 0, 0, 0, 0, 0, 0x13, 0, 0, 0, 0x0E, 0, 0, 0};
    const std::string name = "close_session";
    expected.insert(expected.end(), name.begin(), name.end());
    const Bytes tail = {0, 0, 6, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0x0D, 0, 0, 0};
    expected.insert(expected.end(), tail.begin(), tail.end());
    expected.insert(expected.end(), 13, 0);  // the 12-byte empty status record, then NUL
    ASSERT_EQ(expected.size(), 82u);
    EXPECT_EQ(m_server->LastRequestFrame(), expected);
}

TEST_F(RemoteDataSenderTest, EchoAndRegistryStatusAreCopiedBack) {
    StartRegistry();
    RemoteDataSender sender(m_path, 5000);
    ByteString output("ignored");
    StatusRecord status;
    sender.Send(ArgumentList{"x", "yz"}, "resolve_class_and_url", output, status);
    EXPECT_EQ(status.code, 0);
    EXPECT_TRUE(output == ByteString("resolve_class_and_url\nx\nyz"));

    // The registry's own record replaces the caller's, text and entries included.
    StartRegistry([](const RequestMessage& request) {
        StatusRecord answer;
        answer.code = -356024;
        answer.text.reset(new WideString(L"no name"));
        answer.entries.reset(new StatusEntries(1));
        (*answer.entries)[0].code = 3;
        return RegistryReplies::Answer(request, "ok", answer);
    });
    status.Clear();
    sender.Send(ArgumentList(), "access_property", output, status);  // stale stream first
    EXPECT_EQ(status.code, RemoteDataSender::kBrokenPipe);
    EXPECT_FALSE(sender.IsConnected());
    status.Clear();
    sender.Send(ArgumentList(), "access_property", output, status);
    EXPECT_EQ(status.code, -356024);
    EXPECT_TRUE(output == ByteString("ok"));
    ASSERT_TRUE(status.text && status.entries);
    EXPECT_TRUE(*status.text == WideString(L"no name"));
    EXPECT_EQ((*status.entries)[0].code, 3);
    EXPECT_TRUE(sender.IsConnected());

    // A negative code on entry: nothing is sent, nothing changes.
    const uint32_t requests = m_server->RequestCount();
    status.SetCode(-5);
    output = "kept";
    sender.Send(ArgumentList{"a"}, "x", output, status);
    EXPECT_EQ(status.code, -5);
    EXPECT_TRUE(output == ByteString("kept"));
    EXPECT_EQ(m_server->RequestCount(), requests);
}

// The sender keeps its parameter buffers between calls: nothing of a longer earlier call
// may show in a later frame.
TEST_F(RemoteDataSenderTest, AFrameIsTheSameAfterLargerCallsAsFromAFreshSender) {
    StartRegistry();
    const ArgumentList shortList{"a", "bc"};
    Bytes fresh;
    {
        RemoteDataSender sender(m_path, 5000);
        ByteString output;
        StatusRecord status;
        sender.Send(shortList, "close_session", output, status);
        ASSERT_EQ(status.code, 0);
        fresh = m_server->LastRequestFrame();
    }
    RemoteDataSender sender(m_path, 5000);
    for (const uint32_t size : {100u * 1024u, 3000u}) {  // past the kept size, then below it
        ArgumentList longList(40, ByteString("some longer argument text"));
        longList.push_back(ByteString(std::string(size, 'v').c_str()));
        ByteString output;
        StatusRecord status;
        sender.Send(longList, "access_property", output, status);
        ASSERT_EQ(status.code, 0);
        ByteString shortOutput;  // the output goes to the registry too
        status.Clear();
        sender.Send(shortList, "close_session", shortOutput, status);
        ASSERT_EQ(status.code, 0);
        EXPECT_TRUE(shortOutput == ByteString("close_session\na\nbc"));
        EXPECT_EQ(m_server->LastRequestFrame(), fresh);
    }
}

TEST_F(RemoteDataSenderTest, ConnectsOnceTheRegistryRuns) {
    RemoteDataSender sender(m_path, 5000);
    StatusRecord status;
    status.text.reset(new WideString(L"dropped"));
    status.entries.reset(new StatusEntries(2));
    ByteString output("kept");
    sender.Send(ArgumentList(), "close_session", output, status);
    EXPECT_EQ(status.code, -314899);  // no socket file
    EXPECT_FALSE(status.text);
    EXPECT_TRUE(status.entries);
    EXPECT_TRUE(output == ByteString("kept"));
    EXPECT_FALSE(sender.IsConnected());

    StartRegistry();
    EXPECT_EQ(Send(sender), 0);
    EXPECT_TRUE(sender.IsConnected());
    EXPECT_EQ(Send(sender), 0);
    EXPECT_EQ(m_server->ConnectionCount(), 1u);
}

TEST_F(RemoteDataSenderTest, EveryDisconnectCodeDropsTheConnection) {
    StartRegistry();
    RemoteDataSender sender(m_path, 5000);
    uint32_t connections = 0;
    for (int32_t code = -314899; code <= -314700; ++code) {
        ASSERT_EQ(SendWithStatusFault(sender, code), code);
        ASSERT_FALSE(sender.IsConnected()) << code;
        ASSERT_EQ(m_server->ConnectionCount(), ++connections);
    }
    // Codes outside the range keep it.
    for (int32_t code : {-314900, -314699, -1, 1}) {
        EXPECT_EQ(SendWithStatusFault(sender, code), code);
        EXPECT_TRUE(sender.IsConnected()) << code;
    }
    EXPECT_EQ(m_server->ConnectionCount(), connections + 1);
}

TEST_F(RemoteDataSenderTest, TimeOutDropsTheConnectionAndTheNextSendReconnects) {
    StartRegistry();
    RemoteDataSender sender(m_path, 200);
    RegistryServer::Fault fault;
    fault.kind = RegistryServer::FaultKind::kHang;
    m_server->SetFault(fault);
    ByteString output("kept");
    EXPECT_EQ(Send(sender, &output), -314730);
    EXPECT_TRUE(output == ByteString("kept"));
    EXPECT_FALSE(sender.IsConnected());
    m_server->SetFault(RegistryServer::Fault());
    EXPECT_EQ(Send(sender), 0);
    EXPECT_EQ(m_server->ConnectionCount(), 2u);
}

TEST_F(RemoteDataSenderTest, UndecodableOrForeignAnswers) {
    StartRegistry([](const RequestMessage& request) {
        RegistryServer::Reply reply = RegistryReplies::Echo(request);
        reply.parameters[2] = ByteString("\x05\0\0\0ab", 6);  // length beyond its bytes
        return reply;
    });
    RemoteDataSender sender(m_path, 5000);
    ByteString output("kept");
    EXPECT_EQ(Send(sender, &output), RemoteDataSender::kMarshallingFailure);
    EXPECT_TRUE(output == ByteString("kept"));
    EXPECT_TRUE(sender.IsConnected());

    // An answer with the wrong number of parameters is dropped: everything as sent.
    StartRegistry();
    RegistryServer::Fault fault;
    fault.kind = RegistryServer::FaultKind::kParameterCount;
    fault.value = 3;
    m_server->SetFault(fault);
    RemoteDataSender fresh(m_path, 5000);
    StatusRecord status;
    status.code = 4;
    status.text.reset(new WideString(L"t"));
    sender.Send(ArgumentList(), "x", output, status);  // old stream: broken pipe
    status.Clear();
    status.code = 4;
    status.text.reset(new WideString(L"t"));
    fresh.Send(ArgumentList(), "x", output, status);
    EXPECT_EQ(status.code, 4);
    ASSERT_TRUE(status.text);
    EXPECT_TRUE(output == ByteString("kept"));
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
