#include "bench/RawRoundTrip.h"

#include <boost/asio/read.hpp>
#include <boost/asio/write.hpp>

#include "rpc/Wire.h"

namespace qv {
namespace bench {

RawRoundTrip::RawRoundTrip(const std::string& path) : m_socket(m_io) {
    m_socket.connect(boost::asio::local::stream_protocol::endpoint(path));
}

uint32_t RawRoundTrip::Exchange(const std::vector<unsigned char>& frame) {
    boost::asio::write(m_socket, boost::asio::buffer(frame));
    char header[4];
    boost::asio::read(m_socket, boost::asio::buffer(header, 4));
    const uint32_t length = portableRegistry::rpc::Wire::PeekUInt32(header);
    m_answer.resize(length < 4 ? 0 : length - 4);
    boost::asio::read(m_socket, boost::asio::buffer(m_answer));
    return length;
}

}  // namespace bench
}  // namespace qv
