#include "host/http/HttpExchange.h"

#include "host/http/HttpDate.h"
#include "host/http/RequestHead.h"

#include <iterator>
#include <string>
#include <utility>

#include <httplib.h>
#include <signal.h>

namespace {

/// Headers of every answer that does not say otherwise. Answers are given whole: without ranges.
constexpr std::pair<const char*, const char*> usualHeaders[] = {
    {"Cache-Control", "no-store"},
    {"X-Content-Type-Options", "nosniff"},
    {"Accept-Ranges", "none"},
};

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
    IncomingRequest incoming;
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

/// Takes from the library what it need not know: it would search its routes with a recursion as
/// deep as the path is long, and hold back what a stream sends in order to compress it.
void takeOver(httplib::Request& request) {
    request.path = "/";
    request.headers.erase("Accept-Encoding");
    if (current->incoming.isLast) {
        request.headers.erase("Connection");
        request.set_header("Connection", "close"); // so that the answer says it too
    }
}

} // namespace

class HttpExchange::Engine : private httplib::Server {
public:
    Engine(RequestDispatcher& dispatcher, std::stop_token stop);
    bool serve(ClientConnection& connection, bool isLast);
    static void refuse(ClientConnection& connection, const HttpAnswer& answer);
    RequestDispatcher& dispatcher() const noexcept { return m_dispatcher; }

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
    set_default_headers({std::begin(usualHeaders), std::end(usualHeaders)});
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
            write(m_dispatcher.refuse({response.status, "the request cannot be read as HTTP", ""}),
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
    const bool hasBody = exchange.incoming.hasBody;
    const bool isSaidToBeLast = exchange.incoming.isLast;
    exchange.isBodyRead = !hasBody;
    if (hasBody && readBody == nullptr) {
        exchange.incoming.problem = {400, "this method has no body", ""};
    }
    HttpAnswer answer = m_dispatcher.answer(std::move(exchange.incoming), readBody);
    if (!exchange.isBodyRead && !isSaidToBeLast) {
        response.set_header("Connection", "close");
    }
    write(std::move(answer), response);
}

void HttpExchange::Engine::write(HttpAnswer answer, httplib::Response& response) {
    response.status = answer.status;
    response.set_header("Date", HttpDate::now());
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

bool HttpExchange::Engine::serve(ClientConnection& connection, bool isLast) {
    Exchange exchange{connection, RequestHead::read(connection.head())};
    if (exchange.incoming.problem) {
        refuse(connection, m_dispatcher.answer(std::move(exchange.incoming), nullptr));
        return false;
    }
    exchange.incoming.isLast = exchange.incoming.isLast || isLast;
    isLast = exchange.incoming.isLast;
    current = &exchange;
    ConnectionStream stream(connection);
    bool isClosed = false;
    const bool isServed = process_request(stream, false, isClosed, takeOver);
    current = nullptr;
    return isServed && !isLast && !isClosed && exchange.isBodyRead && !stream.isBroken();
}

// Not by the library, which has not seen the request, or could see another one in it.
void HttpExchange::Engine::refuse(ClientConnection& connection, const HttpAnswer& answer) {
    std::string head = "HTTP/1.1 " + std::to_string(answer.status) + " Refused\r\n";
    for (const auto& [name, value] : usualHeaders) {
        head += std::string(name) + ": " + value + "\r\n";
    }
    connection.write(head + "Date: " + HttpDate::now() + "\r\nContent-Type: " + answer.contentType +
                     "\r\nContent-Length: " + std::to_string(answer.body.size()) +
                     "\r\nConnection: close\r\n\r\n" + answer.body);
}

HttpExchange::HttpExchange(RequestDispatcher& dispatcher, std::stop_token stop)
    : m_engine([&] {
          const BrokenPipeAction brokenPipe;
          auto engine = std::make_unique<Engine>(dispatcher, std::move(stop));
          brokenPipe.restore();
          return engine;
      }()) {}

HttpExchange::~HttpExchange() = default;

bool HttpExchange::serve(ClientConnection& connection, bool isLast) {
    return m_engine->serve(connection, isLast);
}

void HttpExchange::refuse(ClientConnection& connection, const Problem& problem) {
    Engine::refuse(connection, m_engine->dispatcher().refuse(problem));
}
