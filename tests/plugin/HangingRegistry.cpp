// A development registry whose first request is answered only after two minutes, far past
// the plug-in's 60 s time-out; every later request is answered at once. Prints "held" on
// stdout when the first request has arrived. Runs until SIGTERM or SIGINT.
// Usage: hanging_registry PATH
#include <signal.h>

#include <cstdio>
#include <exception>

#include "tools/registry/RegistryReplies.h"
#include "tools/registry/RegistryServer.h"

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: hanging_registry PATH\n");
        return 2;
    }
    sigset_t stopSignals;
    sigemptyset(&stopSignals);
    sigaddset(&stopSignals, SIGTERM);
    sigaddset(&stopSignals, SIGINT);
    pthread_sigmask(SIG_BLOCK, &stopSignals, nullptr);

    using qv::devtools::RegistryServer;
    try {
        RegistryServer* self = nullptr;
        RegistryServer server(argv[1], [&self](const qv::portableRegistry::rpc::RequestMessage& r) {
            // The fault of this request was taken before the handler runs: clearing it here
            // holds this request only.
            if (self != nullptr) {
                self->SetFault(RegistryServer::Fault());
                self = nullptr;
                std::printf("held\n");
                std::fflush(stdout);
            }
            return qv::devtools::RegistryReplies::Echo(r);
        });
        RegistryServer::Fault hold;
        hold.kind = RegistryServer::FaultKind::kDelay;
        hold.value = 120000;
        server.SetFault(hold);
        self = &server;
        server.Start();
        int received = 0;
        sigwait(&stopSignals, &received);
        server.Stop();
    } catch (const std::exception& e) {
        std::fprintf(stderr, "hanging_registry: %s\n", e.what());
        return 1;
    }
    return 0;
}
