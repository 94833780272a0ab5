// The development web host's listener: accepts TCP connections on one address and serves
// each with an HttpSession on a pool of N threads, so that N requests may be inside the
// plug-in's Run at once.
//
// Threads: construct, Start and Stop from one thread. Construction throws
// boost::system::system_error when the address cannot be bound; Stop waits for requests
// in progress to finish and then joins the threads.
#pragma once

#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>

#include "tools/webhost/RequestDispatcher.h"

namespace qv {
namespace devtools {

class HttpServer {
public:
    HttpServer(const std::string& address, uint16_t port, const RequestDispatcher& dispatcher);
    ~HttpServer();
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;

    uint16_t Port() const { return m_nPort; }
    void Start(unsigned threads);
    void Stop();

private:
    void Accept();

    const RequestDispatcher& m_dispatcher;
    boost::asio::io_context m_io;
    boost::asio::ip::tcp::acceptor m_acceptor;
    uint16_t m_nPort;
    std::vector<std::thread> m_threads;
};

}  // namespace devtools
}  // namespace qv
