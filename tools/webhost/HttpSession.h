// One HTTP connection of the development web host: reads requests one after the other
// (keep-alive), hands each to the dispatcher and writes its response. A body over 1 MiB is
// answered 413 and a request that cannot be parsed 400, both without calling the plug-in,
// and the connection is closed after them. One access-log line per answered request goes
// to stderr.
//
// Threads: the session's steps run on its own strand; the dispatcher's work (one plug-in
// Run) happens on whichever server thread runs the step. Failures close the connection.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>

#include <boost/asio/ip/tcp.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/parser.hpp>

#include "tools/webhost/RequestDispatcher.h"

namespace qv {
namespace devtools {

class HttpSession : public std::enable_shared_from_this<HttpSession> {
public:
    static constexpr uint64_t kBodyLimit = 1024 * 1024;

    HttpSession(boost::asio::ip::tcp::socket socket, const RequestDispatcher& dispatcher);
    HttpSession(const HttpSession&) = delete;
    HttpSession& operator=(const HttpSession&) = delete;

    void Start();

private:
    void ReadRequest();
    void OnRequestRead(const boost::system::error_code& error);
    void WriteResponse(HttpResponse response);
    void OnResponseWritten(bool close, const boost::system::error_code& error);
    void LogLine(const HttpResponse& response);
    void Close();

    boost::asio::ip::tcp::socket m_socket;
    const RequestDispatcher& m_dispatcher;
    std::string m_peer;
    boost::beast::flat_buffer m_buffer;
    std::optional<boost::beast::http::request_parser<boost::beast::http::string_body>> m_parser;
    std::shared_ptr<HttpResponse> m_pResponse;  // kept alive until written
    std::string m_requestLine;
    std::chrono::steady_clock::time_point m_started;
};

}  // namespace devtools
}  // namespace qv
