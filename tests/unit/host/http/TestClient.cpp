#include "unit/host/http/TestClient.h"

#include <algorithm>
#include <cctype>

#include <arpa/inet.h>
#include <boost/asio/connect.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/write.hpp>
#include <boost/beast/core/flat_buffer.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/read.hpp>
#include <boost/beast/http/string_body.hpp>
#include <boost/beast/http/write.hpp>
#include <sys/socket.h>
#include <unistd.h>

namespace {

namespace asio = boost::asio;
namespace http = boost::beast::http;
using asio::ip::tcp;
using Error = boost::system::error_code;
using Parser = http::response_parser<http::string_body>;

TestClient::Reply replyOf(Parser& parser) {
    TestClient::Reply reply;
    reply.status = static_cast<int>(parser.get().result_int());
    for (const auto& field : parser.get()) {
        std::string name(field.name_string());
        std::transform(name.begin(), name.end(), name.begin(),
                       [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
        reply.headers.emplace(std::move(name), std::string(field.value()));
    }
    reply.body = std::move(parser.get().body());
    return reply;
}

} // namespace

class TestClient::Connection {
public:
    Connection(const std::string& host, std::uint16_t port) {
        tcp::resolver resolver(m_io);
        asio::connect(socket, resolver.resolve(host, std::to_string(port), error), error);
    }

private:
    asio::io_context m_io;

public:
    tcp::socket socket{m_io};
    boost::beast::flat_buffer buffer;
    Error error;
};

TestClient::TestClient(std::string host, std::uint16_t port, std::string token)
    : m_host(std::move(host)), m_port(port), m_token(std::move(token)) {}

TestClient::~TestClient() = default;

TestClient::TestClient(TestClient&&) noexcept = default;

std::optional<TestClient::Reply> TestClient::ask(const std::string& method, const std::string& path,
                                                 const std::string& body, const Headers& headers) {
    if (m_connection == nullptr) {
        m_connection = std::make_unique<Connection>(m_host, m_port);
    }
    Connection& connection = *m_connection;
    http::request<http::string_body> request;
    request.version(11);
    request.method_string(method);
    request.target(path);
    request.set("Host", (m_host.find(':') == std::string::npos ? m_host : '[' + m_host + ']') +
                            ':' + std::to_string(m_port));
    if (!m_token.empty()) {
        request.set("Authorization", "Bearer " + m_token);
    }
    for (const auto& [name, value] : headers) {
        request.set(name, value);
    }
    request.body() = body;
    request.prepare_payload();
    Error& error = connection.error;
    Error unsent; // a server that refuses does not read everything but still answers
    if (!error) {
        http::write(connection.socket, request, unsent);
    }
    Parser parser;
    parser.body_limit(boost::none);
    parser.skip(method == "HEAD");
    if (!error) {
        http::read(connection.socket, connection.buffer, parser, error);
    }
    if (error) {
        m_connection.reset();
        return std::nullopt;
    }
    if (!parser.get().keep_alive()) {
        m_connection.reset();
    }
    return replyOf(parser);
}

std::optional<TestClient::Reply>
TestClient::follow(const std::string& path, const std::function<bool(std::string_view)>& take) {
    Connection connection(m_host, m_port);
    const std::string request = "GET " + path + " HTTP/1.1\r\nHost: " + m_host + ":" +
                                std::to_string(m_port) + "\r\nAuthorization: Bearer " + m_token +
                                "\r\nAccept-Encoding: gzip, br\r\n\r\n";
    Error& error = connection.error;
    if (!error) {
        asio::write(connection.socket, asio::buffer(request), error);
    }
    Parser parser;
    parser.body_limit(boost::none);
    std::size_t seen = 0;
    while (!error && !parser.is_done()) {
        http::read_some(connection.socket, connection.buffer, parser, error);
        const std::string& body = parser.get().body();
        if (body.size() > seen && !take(std::string_view(body).substr(seen))) {
            return std::nullopt;
        }
        seen = body.size();
    }
    return error ? std::nullopt : std::optional(replyOf(parser));
}

std::string TestClient::raw(const std::string& bytes) {
    const int fd = connected(m_port);
    std::string answer;
    if (send(fd, bytes.data(), bytes.size(), MSG_NOSIGNAL) == static_cast<ssize_t>(bytes.size())) {
        char piece[4096];
        ssize_t count = 0;
        while ((count = recv(fd, piece, sizeof piece, 0)) > 0) {
            answer.append(piece, static_cast<std::size_t>(count));
        }
    }
    close(fd);
    return answer;
}

int TestClient::connected(std::uint16_t port) {
    const int fd = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(port);
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    if (connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) {
        close(fd);
        return -1;
    }
    return fd;
}
