#ifndef ZRM_HOST_CLIENT_STREAM_H
#define ZRM_HOST_CLIENT_STREAM_H

#include "host/http/TlsContext.h"

#include <array>
#include <cstddef>
#include <functional>
#include <memory>

#include <boost/asio/buffer.hpp>
#include <boost/asio/ip/tcp.hpp>

namespace zrm::host {

/// The bytes that go to and from one client, in the clear or under TLS. One thread; at most one
/// operation of a kind at a time. What is done is called on the thread of the socket's executor.
class ClientStream {
public:
    using Error = boost::system::error_code;
    using Done = std::function<void(const Error&, std::size_t)>;
    using Parts = std::array<boost::asio::const_buffer, 2>;

    /// Under TLS where there is a context.
    static std::unique_ptr<ClientStream> make(boost::asio::ip::tcp::socket socket,
                                              const std::shared_ptr<const TlsContext>& tls);

    virtual ~ClientStream() = default;

    /// Whatever goes before the first byte of a request.
    virtual void open(Done done) = 0;
    virtual void read(boost::asio::mutable_buffer buffer, Done done) = 0;
    virtual void write(const Parts& parts, Done done) = 0;
    /// Says that nothing follows.
    virtual void sayFarewell(Done done) = 0;
    virtual boost::asio::ip::tcp::socket& socket() = 0;
};

} // namespace zrm::host

#endif
