// qv-webhost: the development web host. Loads the plug-in, calls Init, serves requests on
// N threads that call Run concurrently, and on SIGINT or SIGTERM stops serving, calls
// Finalize and exits 0. See WebHostOptions.cpp for the command line.
#include <signal.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <memory>
#include <string>

#include <boost/asio/io_context.hpp>
#include <boost/asio/local/stream_protocol.hpp>

#include "rpc/IPCClient.h"
#include "tools/registry/RegistryServer.h"
#include "tools/webhost/HttpServer.h"
#include "tools/webhost/PluginLibrary.h"
#include "tools/webhost/RequestDispatcher.h"
#include "tools/webhost/WebHostOptions.h"

namespace {

using qv::devtools::WebHostOptions;

// The plug-in beside this executable: in a build tree <out>/bin/qv-webhost ->
// <out>/lib/libqv_variable_iotolvane.so; when that is absent, the installed layout of the
// packages, /usr/bin/qv-webhost -> /usr/lib/<triplet>/qv-webservices/... (both relative to
// the executable, so an installation unpacked under another root works as well).
std::string DefaultPluginPath() {
    char self[4096];
    const ssize_t length = readlink("/proc/self/exe", self, sizeof self - 1);
    std::string directory = ".";
    if (length > 0) {
        const std::string path(self, static_cast<size_t>(length));
        directory = path.substr(0, path.rfind('/'));
    }
    const std::string built = directory + "/../lib/libqv_variable_iotolvane.so";
    if (access(built.c_str(), F_OK) == 0) {
        return built;
    }
    return directory + "/" + QV_INSTALLED_PLUGIN_FROM_BINDIR;
}

bool SomethingListensOn(const std::string& path) {
    boost::asio::io_context io;
    boost::asio::local::stream_protocol::socket socket(io);
    boost::system::error_code error;
    socket.connect(boost::asio::local::stream_protocol::endpoint(path), error);
    return !error;
}

}  // namespace

int main(int argc, char** argv) {
    WebHostOptions options;
    std::string error;
    if (!options.Parse(argc, argv, error)) {
        std::fprintf(stderr, "qv-webhost: %s\n%s", error.c_str(), WebHostOptions::Usage());
        return 2;
    }
    if (options.help) {
        std::fputs(WebHostOptions::Usage(), stdout);
        return 0;
    }
    if (options.plugin.empty()) {
        options.plugin = DefaultPluginPath();
    }

    // Block the stop signals before any thread starts, so that only sigwait sees them.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    try {
        const std::string socketPath = qv::portableRegistry::rpc::IPCClient::kDefaultSocketPath;
        std::unique_ptr<qv::devtools::RegistryServer> registry;
        if (options.embeddedRegistry && !SomethingListensOn(socketPath)) {
            registry = std::make_unique<qv::devtools::RegistryServer>(socketPath);
            registry->Start();
            std::fprintf(stderr, "qv-webhost: development registry on %s\n", socketPath.c_str());
        }

        qv::devtools::PluginLibrary plugin(options.plugin);
        qv::devtools::RequestDispatcher dispatcher(plugin.run);
        qv::devtools::HttpServer server(options.address, options.port, dispatcher);
        plugin.init();
        server.Start(options.threads);
        std::printf("listening on http://%s:%u\n", options.address.c_str(), server.Port());
        std::fflush(stdout);

        int received = 0;
        sigwait(&stopSignals, &received);
        std::fprintf(stderr, "qv-webhost: stopping (signal %d)\n", received);
        server.Stop();
        plugin.finalize();
        if (registry) {
            registry->Stop();
        }
    } catch (const std::exception& e) {
        std::fprintf(stderr, "qv-webhost: %s\n", e.what());
        return 1;
    }
    return 0;
}
