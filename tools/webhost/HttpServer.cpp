#include "tools/webhost/HttpServer.h"

#include <cstdio>
#include <memory>

#include <boost/asio/strand.hpp>

#include "tools/webhost/HttpSession.h"

namespace qv {
namespace devtools {

namespace asio = boost::asio;
using asio::ip::tcp;

HttpServer::HttpServer(const std::string& address, uint16_t port,
                       const RequestDispatcher& dispatcher)
    : m_dispatcher(dispatcher),
      m_acceptor(m_io, tcp::endpoint(asio::ip::make_address(address), port)),
      m_nPort(m_acceptor.local_endpoint().port()) {}

HttpServer::~HttpServer() { Stop(); }

void HttpServer::Start(unsigned threads) {
    Accept();
    for (unsigned i = 0; i < threads; ++i) {
        m_threads.emplace_back([this] {
            try {
                m_io.run();
            } catch (const std::exception& e) {
                std::fprintf(stderr, "qv-webhost: server thread ended: %s\n", e.what());
            }
        });
    }
}

void HttpServer::Stop() {
    m_io.stop();
    for (std::thread& thread : m_threads) {
        thread.join();
    }
    m_threads.clear();
}

void HttpServer::Accept() {
    m_acceptor.async_accept(asio::make_strand(m_io), [this](const boost::system::error_code& error,
                                                            tcp::socket socket) {
        if (error == asio::error::operation_aborted) {
            return;
        }
        if (!error) {
            std::make_shared<HttpSession>(std::move(socket), m_dispatcher)->Start();
        }
        Accept();
    });
}

}  // namespace devtools
}  // namespace qv
