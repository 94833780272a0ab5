// The floor that Run is measured against: a plain blocking client of the registry socket
// that writes a ready-made request frame and reads the one answer frame, and does nothing
// else. Used by one thread. Construction and Exchange throw boost::system::system_error
// on a transport failure.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include <boost/asio/io_service.hpp>
#include <boost/asio/local/stream_protocol.hpp>

namespace qv {
namespace bench {

class RawRoundTrip {
public:
    explicit RawRoundTrip(const std::string& path);
    RawRoundTrip(const RawRoundTrip&) = delete;
    RawRoundTrip& operator=(const RawRoundTrip&) = delete;

    // Writes `frame` (frameLength included) and reads the answer frame; returns its
    // frameLength.
    uint32_t Exchange(const std::vector<unsigned char>& frame);

private:
    boost::asio::io_service m_io;
    boost::asio::local::stream_protocol::socket m_socket;
    std::vector<char> m_answer;
};

}  // namespace bench
}  // namespace qv
