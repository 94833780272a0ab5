#include "tools/webhost/HttpSession.h"

#include <cstdio>
#include <utility>

#include <boost/beast/http/error.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/write.hpp>

namespace qv {
namespace devtools {

namespace http = boost::beast::http;

HttpSession::HttpSession(boost::asio::ip::tcp::socket socket, const RequestDispatcher& dispatcher)
    : m_socket(std::move(socket)), m_dispatcher(dispatcher) {
    boost::system::error_code ignored;
    const auto peer = m_socket.remote_endpoint(ignored);
    m_peer = ignored ? "-" : peer.address().to_string() + ":" + std::to_string(peer.port());
}

void HttpSession::Start() { ReadRequest(); }

void HttpSession::ReadRequest() {
    m_parser.emplace();
    m_parser->body_limit(kBodyLimit);
    auto self = shared_from_this();
    http::async_read(m_socket, m_buffer, *m_parser,
                     [self](const boost::system::error_code& error, std::size_t) {
                         self->OnRequestRead(error);
                     });
}

void HttpSession::OnRequestRead(const boost::system::error_code& error) {
    m_started = std::chrono::steady_clock::now();
    if (error == http::error::end_of_stream || error == boost::asio::error::eof ||
        error == boost::asio::error::connection_reset ||
        error == boost::asio::error::operation_aborted) {
        Close();
        return;
    }
    if (error == http::error::body_limit) {
        m_requestLine = "- (body over 1 MiB)";
        WriteResponse(RequestDispatcher::MakeResponse(413, "request body over 1 MiB\n", 11, false));
        return;
    }
    if (error) {
        m_requestLine = "- (" + error.message() + ")";
        WriteResponse(RequestDispatcher::MakeResponse(400, "malformed request\n", 11, false));
        return;
    }
    const HttpRequest& request = m_parser->get();
    m_requestLine = std::string(request.method_string()) + " " + std::string(request.target());
    WriteResponse(m_dispatcher.Dispatch(request));
}

void HttpSession::WriteResponse(HttpResponse response) {
    LogLine(response);
    m_pResponse = std::make_shared<HttpResponse>(std::move(response));
    const bool close = !m_pResponse->keep_alive();
    auto self = shared_from_this();
    http::async_write(m_socket, *m_pResponse,
                      [self, close](const boost::system::error_code& error, std::size_t) {
                          self->OnResponseWritten(close, error);
                      });
}

void HttpSession::OnResponseWritten(bool close, const boost::system::error_code& error) {
    m_pResponse.reset();
    if (error || close) {
        Close();
        return;
    }
    ReadRequest();
}

void HttpSession::LogLine(const HttpResponse& response) {
    const auto elapsed = std::chrono::duration_cast<std::chrono::microseconds>(
        std::chrono::steady_clock::now() - m_started);
    std::fprintf(stderr, "%s \"%s\" %u %zu %.3f ms\n", m_peer.c_str(), m_requestLine.c_str(),
                 response.result_int(), response.body().size(), elapsed.count() / 1000.0);
}

void HttpSession::Close() {
    boost::system::error_code ignored;
    m_socket.shutdown(boost::asio::ip::tcp::socket::shutdown_both, ignored);
    m_socket.close(ignored);
}

}  // namespace devtools
}  // namespace qv
