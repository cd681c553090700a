#include "host/http/HttpExchange.h"

#include <algorithm>
#include <cctype>
#include <charconv>
#include <string>
#include <utility>

#include <httplib.h>
#include <signal.h>

namespace {

/// The library hands parts of a connection to its own functions through this.
class ConnectionStream : public httplib::Stream {
public:
    explicit ConnectionStream(ClientConnection& connection) : m_connection(connection) {}

    bool is_readable() const override { return true; }
    bool is_writable() const override { return !m_isBroken; }
    ssize_t read(char* bytes, size_t size) override {
        return static_cast<ssize_t>(m_connection.read(bytes, size));
    }
    ssize_t write(const char* bytes, size_t size) override {
        m_isBroken = m_isBroken || !m_connection.write({bytes, size});
        return m_isBroken ? -1 : static_cast<ssize_t>(size);
    }
    void get_remote_ip_and_port(std::string& /*ip*/, int& /*port*/) const override {}
    void get_local_ip_and_port(std::string& /*ip*/, int& /*port*/) const override {}
    socket_t socket() const override { return INVALID_SOCKET; }
    bool isBroken() const noexcept { return m_isBroken; }

private:
    ClientConnection& m_connection;
    bool m_isBroken = false;
};

/// The request that a thread is serving.
struct Exchange {
    ClientConnection& connection;
    IncomingRequest incoming = {};
    bool isBodyRead = false; ///< what follows in the connection is the next request
};

thread_local Exchange* current = nullptr;

/// The action of SIGPIPE as it was: the library sets it for the process, and children would
/// inherit that. Nothing here raises the signal.
class BrokenPipeAction {
public:
    BrokenPipeAction() { sigaction(SIGPIPE, nullptr, &m_action); }
    void restore() const { sigaction(SIGPIPE, &m_action, nullptr); }

private:
    struct sigaction m_action {};
};

std::optional<std::string> header(const httplib::Request& request, const char* name) {
    return request.has_header(name) ? std::optional(request.get_header_value(name)) : std::nullopt;
}

/// How long the body is, and what leaves that open.
void readFraming(const httplib::Request& request, IncomingRequest& incoming) {
    const std::string length = request.get_header_value("Content-Length");
    const std::string coding = request.get_header_value("Transfer-Encoding");
    std::size_t size = 0;
    const char* const end = length.data() + length.size();
    const auto [stop, error] = std::from_chars(length.data(), end, size);
    const bool isNumber = error == std::errc() && stop == end;
    if (request.get_header_value_count("Host") > 1) {
        incoming.problem = "the Host header comes more than once";
    } else if (!coding.empty() && (!length.empty() || coding != "chunked")) {
        incoming.problem = "send the body's length, or the body in chunks";
    } else if (request.get_header_value_count("Content-Length") > 1 ||
               request.get_header_value_count("Transfer-Encoding") > 1 ||
               (request.has_header("Content-Length") && (length.empty() || !isNumber))) {
        incoming.problem = "the body's length is not clear";
    } else if (request.has_header("Content-Encoding")) {
        incoming.problem = "send the body without a content coding";
    }
    if (!length.empty()) {
        incoming.length = size;
    }
    incoming.hasBody = !coding.empty() || size > 0;
}

void readHeaders(const httplib::Request& request, IncomingRequest& incoming) {
    const std::size_t end = std::min(request.target.find('?'), request.target.size());
    incoming.request.method = request.method;
    incoming.request.path = request.target.substr(0, end);
    incoming.rawQuery = request.target.substr(std::min(end + 1, request.target.size()));
    incoming.rawQuery.erase(std::min(incoming.rawQuery.find('#'), incoming.rawQuery.size()));
    incoming.request.lastEventId = request.get_header_value("Last-Event-ID");
    incoming.request.accept = request.get_header_value("Accept");
    incoming.contentType = request.get_header_value("Content-Type");
    incoming.headers = {header(request, "Host"), header(request, "Origin"),
                        header(request, "Authorization")};
    readFraming(request, incoming);
}

/// Takes what is of interest out of a request, and from the library what it need not know: it
/// would search its routes with a recursion as deep as the path is long, and hold back what a
/// stream sends in order to compress it.
void takeOver(httplib::Request& request) {
    readHeaders(request, current->incoming);
    request.path = "/";
    request.headers.erase("Accept-Encoding");
}

} // namespace

class HttpExchange::Engine : private httplib::Server {
public:
    Engine(RequestDispatcher& dispatcher, std::stop_token stop);
    bool serve(ClientConnection& connection);

private:
    static BodyReader readerOf(const httplib::ContentReader& reader);
    static bool mayHaveBody(const std::string& method);
    void answer(httplib::Response& response, const BodyReader& readBody);
    void write(HttpAnswer answer, httplib::Response& response);
    void writeStream(HttpAnswer answer, httplib::Response& response);

    RequestDispatcher& m_dispatcher;
    const std::stop_token m_stop;
};

HttpExchange::Engine::Engine(RequestDispatcher& dispatcher, std::stop_token stop)
    : m_dispatcher(dispatcher), m_stop(std::move(stop)) {
    svr_sock_ = 0; // the library takes no socket for a server that is stopping
    set_payload_max_length(RequestDispatcher::largestBody + 1);
    set_keep_alive_timeout(15); // for the header that tells the client
    set_keep_alive_max_count(HttpExchange::requestsPerConnection);
    set_default_headers({{"Cache-Control", "no-store"}, {"X-Content-Type-Options", "nosniff"}});
    set_pre_routing_handler([this](const auto& request, auto& response) {
        if (mayHaveBody(request.method)) {
            return HandlerResponse::Unhandled;
        }
        answer(response, nullptr);
        return HandlerResponse::Handled;
    });
    const HandlerWithContentReader withBody = [this](const auto&, auto& response,
                                                     const auto& reader) {
        answer(response, readerOf(reader));
    };
    Post("/", withBody).Put("/", withBody).Patch("/", withBody).Delete("/", withBody);
    set_error_handler([this](const auto&, auto& response) {
        if (response.body.empty() && !response.content_provider_) {
            write(RequestDispatcher::answerOf(
                      {response.status, "the request cannot be read as HTTP", ""}),
                  response);
        }
    });
}

bool HttpExchange::Engine::mayHaveBody(const std::string& method) {
    return method == "POST" || method == "PUT" || method == "PATCH" || method == "DELETE";
}

BodyReader HttpExchange::Engine::readerOf(const httplib::ContentReader& reader) {
    return [&reader](std::size_t most) {
        std::string text;
        Exchange& exchange = *current;
        exchange.isBodyRead = reader([&](const char* data, std::size_t size) {
            text.append(data, size);
            return text.size() <= most;
        });
        if (text.size() > most) {
            throw RequestDispatcher::tooLong();
        }
        if (!exchange.isBodyRead && exchange.connection.isLate()) {
            throw RequestRefused(408, "the request did not come within 10 s", "body");
        }
        if (!exchange.isBodyRead) {
            throw RequestRefused(400, "the body did not come whole", "body");
        }
        return text;
    };
}

void HttpExchange::Engine::answer(httplib::Response& response, const BodyReader& readBody) {
    Exchange& exchange = *current;
    const bool hasBody = exchange.incoming.hasBody || !exchange.incoming.problem.empty();
    exchange.isBodyRead = !hasBody;
    if (hasBody && readBody == nullptr) {
        exchange.incoming.problem = "this method has no body";
    }
    HttpAnswer answer = m_dispatcher.answer(std::move(exchange.incoming), readBody);
    if (!exchange.isBodyRead) {
        response.set_header("Connection", "close");
    }
    write(std::move(answer), response);
}

void HttpExchange::Engine::write(HttpAnswer answer, httplib::Response& response) {
    response.status = answer.status;
    for (const auto& [name, value] : answer.headers) {
        response.headers.erase(name); // in place of a default
        response.set_header(name, value);
    }
    if (answer.stream) {
        writeStream(std::move(answer), response);
    } else if (answer.status != 204) {
        response.set_content(answer.body, answer.contentType);
    }
}

void HttpExchange::Engine::writeStream(HttpAnswer answer, httplib::Response& response) {
    const std::string contentType = answer.contentType;
    response.set_chunked_content_provider(
        contentType,
        [this, stream = std::move(answer.stream)](std::size_t /*offset*/, httplib::DataSink& sink) {
            ClientConnection& connection = current->connection;
            connection.beginStream();
            const BodyWriter writer = [&](std::string_view text) {
                return text.empty() ? !connection.isGone() : sink.write(text.data(), text.size());
            };
            m_dispatcher.stream(stream, writer, m_stop);
            sink.done();
            return true;
        });
}

bool HttpExchange::Engine::serve(ClientConnection& connection) {
    Exchange exchange{connection};
    current = &exchange;
    ConnectionStream stream(connection);
    bool isLast = false;
    const bool isServed = process_request(stream, false, isLast, takeOver);
    current = nullptr;
    return isServed && !isLast && exchange.isBodyRead && !stream.isBroken();
}

HttpExchange::HttpExchange(RequestDispatcher& dispatcher, std::stop_token stop)
    : m_engine([&] {
          const BrokenPipeAction brokenPipe;
          auto engine = std::make_unique<Engine>(dispatcher, std::move(stop));
          brokenPipe.restore();
          return engine;
      }()) {}

HttpExchange::~HttpExchange() = default;

bool HttpExchange::serve(ClientConnection& connection) {
    return m_engine->serve(connection);
}

void HttpExchange::refuse(ClientConnection& connection, const Problem& problem) {
    const std::string body = problem.json();
    connection.write("HTTP/1.1 " + std::to_string(problem.status) +
                     " Refused\r\nContent-Type: application/problem+json\r\nContent-Length: " +
                     std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body);
}
