#include "host/http/ClientStream.h"

#include <utility>

#include <boost/asio/post.hpp>
#include <boost/asio/ssl/context.hpp>
#include <boost/asio/ssl/stream.hpp>
#include <openssl/ssl.h>

namespace zrm::host {

namespace {

namespace asio = boost::asio;
using asio::ip::tcp;

class PlainStream : public ClientStream {
public:
    explicit PlainStream(tcp::socket socket) : m_socket(std::move(socket)) {}

    void open(Done done) override {
        asio::post(m_socket.get_executor(), [done = std::move(done)] { done({}, 0); });
    }
    void read(asio::mutable_buffer buffer, Done done) override {
        m_socket.async_read_some(asio::buffer(buffer), std::move(done));
    }
    void write(const Parts& parts, Done done) override {
        m_socket.async_write_some(parts, std::move(done));
    }
    void sayFarewell(Done done) override {
        asio::post(m_socket.get_executor(), [done = std::move(done)] { done({}, 0); });
    }
    tcp::socket& socket() override { return m_socket; }

private:
    tcp::socket m_socket;
};

/// The library's own handle of a shared context.
asio::ssl::context shared(const TlsContext& tls) {
    SSL_CTX_up_ref(tls.handle());
    return asio::ssl::context(tls.handle());
}

class TlsStream : public ClientStream {
public:
    TlsStream(tcp::socket socket, const TlsContext& tls)
        : m_context(shared(tls)), m_stream(std::move(socket), m_context) {}

    void open(Done done) override {
        m_stream.async_handshake(asio::ssl::stream_base::server,
                                 [done = std::move(done)](const Error& error) { done(error, 0); });
    }
    void read(asio::mutable_buffer buffer, Done done) override {
        m_stream.async_read_some(asio::buffer(buffer), std::move(done));
    }
    void write(const Parts& parts, Done done) override {
        m_stream.async_write_some(parts, std::move(done));
    }
    void sayFarewell(Done done) override {
        m_stream.async_shutdown([done = std::move(done)](const Error& error) { done(error, 0); });
    }
    tcp::socket& socket() override { return m_stream.next_layer(); }

private:
    asio::ssl::context m_context;
    asio::ssl::stream<tcp::socket> m_stream;
};

} // namespace

std::unique_ptr<ClientStream> ClientStream::make(tcp::socket socket,
                                                 const std::shared_ptr<const TlsContext>& tls) {
    if (tls != nullptr) {
        return std::make_unique<TlsStream>(std::move(socket), *tls);
    }
    return std::make_unique<PlainStream>(std::move(socket));
}

} // namespace zrm::host
