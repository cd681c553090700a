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

/// The byte stream of one client, in plain text or under TLS. Used by one thread, with at most one
/// operation of a kind at a time. Completion handlers run on the thread of the socket's executor.
class ClientStream {
public:
    using Error = boost::system::error_code;
    using Done = std::function<void(const Error&, std::size_t)>;
    using Parts = std::array<boost::asio::const_buffer, 2>;

    /// Uses TLS when there is a context.
    static std::unique_ptr<ClientStream> make(boost::asio::ip::tcp::socket socket,
                                              const std::shared_ptr<const TlsContext>& tls);

    virtual ~ClientStream() = default;

    /// Does what must precede the first byte of a request.
    virtual void open(Done done) = 0;
    virtual void read(boost::asio::mutable_buffer buffer, Done done) = 0;
    virtual void write(const Parts& parts, Done done) = 0;
    /// Tells the client that no more data follows.
    virtual void sayFarewell(Done done) = 0;
    virtual boost::asio::ip::tcp::socket& socket() = 0;
};

} // namespace zrm::host

#endif
