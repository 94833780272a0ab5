// qv-registry: the development registry service. Answers every request frame on every
// connection with status 0 and the text "<operation>" then "\n<argument>" per argument.
#include <signal.h>

#include <cstdio>
#include <cstring>
#include <exception>
#include <string>

#include "rpc/IPCClient.h"
#include "tools/registry/RegistryServer.h"

namespace {

void PrintUsage(FILE* out) {
    std::fprintf(out,
                 "Usage: qv-registry [--socket PATH]\n"
                 "Serves the registry protocol on the Unix socket PATH (default %s) and\n"
                 "answers every request with status 0 and its operation name followed by\n"
                 "one line per argument. Stops cleanly on SIGTERM or SIGINT.\n",
                 qv::portableRegistry::rpc::IPCClient::kDefaultSocketPath);
}

}  // namespace

int main(int argc, char** argv) {
    std::string path = qv::portableRegistry::rpc::IPCClient::kDefaultSocketPath;
    for (int i = 1; i < argc; ++i) {
        const char* argument = argv[i];
        if (std::strcmp(argument, "--help") == 0 || std::strcmp(argument, "-h") == 0) {
            PrintUsage(stdout);
            return 0;
        }
        if (std::strcmp(argument, "--socket") == 0 && i + 1 < argc) {
            path = argv[++i];
        } else if (std::strncmp(argument, "--socket=", 9) == 0) {
            path = argument + 9;
        } else {
            std::fprintf(stderr, "qv-registry: unknown argument '%s'\n", argument);
            PrintUsage(stderr);
            return 2;
        }
    }

    // Block the stop signals before any thread starts, so that only sigwait sees them.
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    try {
        qv::devtools::RegistryServer server(path);
        server.Start();
        std::fprintf(stderr, "qv-registry: listening on %s\n", path.c_str());
        int received = 0;
        sigwait(&stopSignals, &received);
        server.Stop();
        std::fprintf(stderr, "qv-registry: stopped after %u requests\n", server.RequestCount());
    } catch (const std::exception& e) {
        std::fprintf(stderr, "qv-registry: %s: %s\n", path.c_str(), e.what());
        return 1;
    }
    return 0;
}
