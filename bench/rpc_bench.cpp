// One registry call through IPCClient::Invoke against the development registry, versus a
// plain blocking write and read of the very same frame bytes to the same server. Prints
// Google Benchmark's table and then the "Invoke / plain" ratio of the times per call.
#include <benchmark/benchmark.h>
#include <stdlib.h>
#include <unistd.h>

#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>
#include <cstdio>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "rpc/IPCClient.h"
#include "rpc/RemoteDataSender.h"
#include "rpc/Wire.h"
#include "tools/registry/RegistryServer.h"

namespace {

using qv::devtools::RegistryServer;
using qv::portableRegistry::rpc::IPCClient;
using qv::portableRegistry::rpc::RequestMessage;
using qv::portableRegistry::rpc::Wire;
using qv::variable::remoteconfig::ArgumentList;
using qv::variable::remoteconfig::RemoteDataSender;
using qv::variable::remoteconfig::StatusRecord;
using qv::zil::ByteString;

// Answers with the request's own parameters, so that every call sends the same bytes.
RegistryServer::Reply Identity(const RequestMessage& request) {
    RegistryServer::Reply reply;
    for (uint32_t i = 0; i < request.GetParameterCount(); ++i) {
        reply.parameters.push_back(request.GetParameter(i));
    }
    return reply;
}

// The four parameters the data sender makes for "close_session" with no arguments.
std::vector<ByteString> SenderParameters() {
    std::vector<ByteString> parameters(4);
    StatusRecord status;
    RemoteDataSender::EncodeStringList(ArgumentList(), parameters[0], status);
    RemoteDataSender::EncodeString("close_session", parameters[1], status);
    RemoteDataSender::EncodeString("", parameters[2], status);
    RemoteDataSender::EncodeStatus(StatusRecord(), parameters[3], status);
    return parameters;
}

struct Registry {
    std::string directory;
    std::string path;
    std::unique_ptr<RegistryServer> server;

    Registry() {
        char pattern[] = "/tmp/qv-bench-XXXXXX";
        if (mkdtemp(pattern) == nullptr) {
            std::perror("mkdtemp");
            std::exit(1);
        }
        directory = pattern;
        path = directory + "/registry";
        server.reset(new RegistryServer(path, &Identity));
        server->Start();
    }
    ~Registry() {
        server.reset();
        rmdir(directory.c_str());
    }
};

Registry& TheRegistry() {
    static Registry registry;
    return registry;
}

void InvokeRoundTrip(benchmark::State& state) {
    IPCClient client(TheRegistry().path);
    if (client.Connect()) {
        state.SkipWithError("connect failed");
        return;
    }
    client.Watchdog().Start();
    std::vector<ByteString> parameters = SenderParameters();
    ByteString returnValue;
    StatusRecord status;
    for (auto _ : state) {
        client.Invoke(0, parameters.data(), 4, returnValue, status);
        if (status.code != 0) {
            state.SkipWithError("call failed");
            break;
        }
    }
}

void PlainRoundTrip(benchmark::State& state) {
    // The exact frame Invoke sends, built the same way.
    std::vector<ByteString> parameters = SenderParameters();
    RequestMessage request;
    request.SetProcedureId(0);
    qv::portableRegistry::rpc::ParameterArray* holder =
        qv::portableRegistry::rpc::ParameterArray::Create(4);
    for (uint32_t i = 0; i < 4; ++i) {
        holder->Strings()[i] = parameters[i];
    }
    request.SetParameters(holder, 4);
    std::vector<char> frame(request.GetSerializedSize() + 4);
    Wire::PokeUInt32(static_cast<uint32_t>(frame.size()), frame.data());
    char* cursor = frame.data() + 4;
    request.Serialize(cursor, frame.data() + frame.size());

    boost::asio::io_service io;
    boost::asio::local::stream_protocol::socket socket(io);
    boost::system::error_code error;
    socket.connect(boost::asio::local::stream_protocol::endpoint(TheRegistry().path), error);
    if (error) {
        state.SkipWithError("connect failed");
        return;
    }
    std::vector<char> answer(frame.size());
    for (auto _ : state) {
        boost::asio::write(socket, boost::asio::buffer(frame));
        char header[4];
        boost::asio::read(socket, boost::asio::buffer(header, 4));
        const uint32_t length = Wire::PeekUInt32(header);
        answer.resize(length - 4);
        boost::asio::read(socket, boost::asio::buffer(answer));
        benchmark::DoNotOptimize(answer.data());
    }
}

// Keeps the real time per iteration of every run (the median with repetitions).
class CollectingReporter : public benchmark::ConsoleReporter {
public:
    void ReportRuns(const std::vector<Run>& runs) override {
        ConsoleReporter::ReportRuns(runs);
        for (const Run& run : runs) {
            const bool aggregate = run.run_type == Run::RT_Aggregate;
            if ((aggregate && run.aggregate_name != "median") || run.error_occurred) {
                continue;
            }
            m_times[run.run_name.function_name] = run.GetAdjustedRealTime();
        }
    }
    double Time(const std::string& name) const {
        const auto found = m_times.find(name);
        return found == m_times.end() ? 0.0 : found->second;
    }

private:
    std::map<std::string, double> m_times;
};

}  // namespace

int main(int argc, char** argv) {
    benchmark::RegisterBenchmark("rpc/invoke", InvokeRoundTrip)->UseRealTime();
    benchmark::RegisterBenchmark("rpc/plain", PlainRoundTrip)->UseRealTime();
    benchmark::Initialize(&argc, argv);
    if (benchmark::ReportUnrecognizedArguments(argc, argv)) {
        return 1;
    }
    CollectingReporter reporter;
    benchmark::RunSpecifiedBenchmarks(&reporter);
    benchmark::Shutdown();

    const double invoke = reporter.Time("rpc/invoke");
    const double plain = reporter.Time("rpc/plain");
    if (invoke == 0.0 || plain == 0.0) {
        std::printf("\nrpc round trip: (not run)\n");
        return 0;
    }
    std::printf("\n%-24s %12s %12s %14s\n", "pair", "invoke", "plain", "invoke/plain");
    std::printf("%-24s %12.2f %12.2f %14.2f\n", "round trip (time/call)", invoke, plain,
                invoke / plain);
    return 0;
}
