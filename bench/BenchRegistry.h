// The echo registry of the request benchmark: the development registry with its default
// answer (status 0, the operation name, then one line per argument) served on its own
// thread at the plug-in's fixed socket path. It refuses to start while something else
// accepts connections on that path (a developer's scripts/serve, say), so a running system
// is never taken over silently. Owned by one thread; the server thread is its own.
#pragma once

#include <memory>
#include <string>

#include "tools/registry/RegistryServer.h"

namespace qv {
namespace bench {

class BenchRegistry {
public:
    // Throws std::runtime_error when the path is in use and boost::system::system_error
    // when it cannot be bound.
    explicit BenchRegistry(const std::string& path);
    ~BenchRegistry();  // stops the server and removes the socket file
    BenchRegistry(const BenchRegistry&) = delete;
    BenchRegistry& operator=(const BenchRegistry&) = delete;

    devtools::RegistryServer& Server() { return *m_pServer; }

    // True when a stream connection to `path` is accepted.
    static bool SomethingListens(const std::string& path);

private:
    std::unique_ptr<devtools::RegistryServer> m_pServer;
};

}  // namespace bench
}  // namespace qv
