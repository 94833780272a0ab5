#include "bench/BenchRegistry.h"

#include <stdexcept>

#include <boost/asio/io_service.hpp>
#include <boost/asio/local/stream_protocol.hpp>

namespace qv {
namespace bench {

BenchRegistry::BenchRegistry(const std::string& path) {
    if (SomethingListens(path)) {
        throw std::runtime_error(
            "something already listens on " + path +
            " (a running scripts/serve or registry?): stop it, or run scripts/bench, which "
            "gives the benchmark a private /tmp");
    }
    m_pServer.reset(new devtools::RegistryServer(path));
    m_pServer->Start();
}

BenchRegistry::~BenchRegistry() { m_pServer.reset(); }

bool BenchRegistry::SomethingListens(const std::string& path) {
    boost::asio::io_service io;
    boost::asio::local::stream_protocol::socket socket(io);
    boost::system::error_code error;
    socket.connect(boost::asio::local::stream_protocol::endpoint(path), error);
    return !error;
}

}  // namespace bench
}  // namespace qv
