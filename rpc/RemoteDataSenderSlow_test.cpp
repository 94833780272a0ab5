// The real time-out, waited out in full: run by CI under the "slow" label.
#include <gtest/gtest.h>
#include <stdlib.h>
#include <unistd.h>

#include <chrono>
#include <string>

#include "rpc/RemoteDataSender.h"
#include "tools/registry/RegistryServer.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

TEST(RemoteDataSenderSlow, SilentRegistryEndsTheCallAfterSixtySeconds) {
    char pattern[] = "/tmp/qv-slow-XXXXXX";
    ASSERT_NE(mkdtemp(pattern), nullptr);
    const std::string path = std::string(pattern) + "/registry";
    {
        devtools::RegistryServer registry(path);
        devtools::RegistryServer::Fault silent;
        silent.kind = devtools::RegistryServer::FaultKind::kHang;
        registry.SetFault(silent);
        registry.Start();

        RemoteDataSender sender(path);  // the shipped time-out
        zil::ByteString output("kept");
        StatusRecord status;
        const auto start = std::chrono::steady_clock::now();
        sender.Send(ArgumentList{"a"}, "close_session", output, status);
        const auto elapsed = std::chrono::duration_cast<std::chrono::milliseconds>(
                                 std::chrono::steady_clock::now() - start)
                                 .count();
        EXPECT_EQ(status.code, -314730);
        EXPECT_TRUE(output == zil::ByteString("kept"));
        EXPECT_FALSE(sender.IsConnected());
        EXPECT_GE(elapsed, 60000);
        EXPECT_LT(elapsed, 600000);
        EXPECT_EQ(registry.RequestCount(), 1u);
    }
    rmdir(pattern);
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
