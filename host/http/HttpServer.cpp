#include "host/http/HttpServer.h"

#include "agent/TraceScope.h"
#include "host/config/Columns.h"
#include "host/http/ActiveSamples.h"
#include "host/http/Problem.h"
#include "host/http/RequestGuard.h"
#include "host/http/SampleRequest.h"

#include <algorithm>
#include <array>
#include <condition_variable>
#include <exception>
#include <iterator>
#include <mutex>
#include <optional>
#include <string_view>
#include <thread>
#include <utility>

#include <httplib.h>
#include <signal.h>
#include <sys/socket.h>

namespace {

TRC1_Anchor anchor{"HttpServer.cpp"};

using Clock = std::chrono::steady_clock;

constexpr std::size_t largestBody = 64 * 1024;    ///< bytes
constexpr std::chrono::seconds networkTimeout{5}; ///< for a client that sends or reads slowly
constexpr int keepAliveSeconds = 1;               ///< for an idle connection; bounds a stop
constexpr std::size_t requestsPerConnection = 1000;

std::optional<std::string> header(const httplib::Request& request, const char* name) {
    return request.has_header(name) ? std::optional(request.get_header_value(name)) : std::nullopt;
}

void answer(httplib::Response& response, const Problem& problem) {
    response.status = problem.status;
    if (problem.status == 401) {
        response.set_header("WWW-Authenticate", "Bearer");
    }
    response.set_content(problem.json(), "application/problem+json");
}

/// Reads the body, also one that does not tell its length; none when it is longer than
/// `largestBody`, or breaks off.
std::optional<std::string> body(const httplib::ContentReader& reader) {
    std::string text;
    const bool isWhole = reader([&](const char* data, std::size_t size) {
        text.append(data, size);
        return text.size() <= largestBody;
    });
    return isWhole ? std::optional(std::move(text)) : std::nullopt;
}

/// True for the conditions that name a log, in either table.
bool namesLog(const Condition& condition) {
    constexpr std::array columns = {"LOGPATH", "LOGNAME", "ULOGPATH", "ULOGNAME"};
    return std::find(columns.begin(), columns.end(), condition.column) != columns.end();
}

/// The action of SIGPIPE as it was: the library sets it for the process, and children would
/// inherit that. The threads of the process block the signal anyway.
class BrokenPipeAction {
public:
    BrokenPipeAction() { sigaction(SIGPIPE, nullptr, &m_action); }
    void restore() const { sigaction(SIGPIPE, &m_action, nullptr); }

private:
    struct sigaction m_action {};
};

/// The answer to a request whose handler threw.
void failed(const httplib::Request& request, httplib::Response& response,
            const std::exception_ptr& failure) {
    TraceScope trace(anchor);
    try {
        std::rethrow_exception(failure);
    } catch (const std::exception& exception) {
        trace.error()("Request for %s failed: %s", request.path.c_str(), exception.what());
    } catch (...) {
        trace.error()("Request for %s failed.", request.path.c_str());
    }
    answer(response, {500, "the request failed", ""});
}

/// Two servers on one port would share its clients: an address in use is refused.
void setSocketOptions(socket_t socket) {
    const int on = 1;
    setsockopt(socket, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
}

} // namespace

class HttpServer::Implementation {
public:
    explicit Implementation(SampleSource& source);
    ~Implementation();
    Implementation(const Implementation&) = delete;
    Implementation& operator=(const Implementation&) = delete;

    std::string start(ListenAddress address, ApiToken token);
    void stop(Clock::time_point limit);
    void abandon(Clock::time_point limit) { m_active.close(limit); }
    std::uint16_t port() const noexcept { return m_port; }

private:
    using Handled = httplib::Server::HandlerResponse;

    void serve();
    void addRoutes();
    Handled guard(const httplib::Request& request, httplib::Response& response) const;
    void sample(const httplib::Request& request, httplib::Response& response,
                const httplib::ContentReader& reader);
    std::optional<Problem> trySample(const httplib::Request& request, httplib::Response& response,
                                     const httplib::ContentReader& reader);
    bool isMonitored(const std::vector<Condition>& report);

    SampleSource& m_source;
    ActiveSamples m_active;
    const BrokenPipeAction m_brokenPipe; ///< before the server, which changes the action
    httplib::Server m_server;
    std::optional<RequestGuard> m_guard; ///< set before the server's threads exist
    std::uint16_t m_port = 0;
    std::thread m_thread;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    bool m_hasEnded = false; ///< the server's threads have nothing more to do
};

HttpServer::Implementation::Implementation(SampleSource& source) : m_source(source) {
    m_brokenPipe.restore();
    addRoutes();
}

HttpServer::Implementation::~Implementation() {
    if (m_thread.joinable()) {
        m_server.stop();
        m_thread.join();
    }
}

void HttpServer::Implementation::serve() {
    m_server.listen_after_bind();
    {
        const std::lock_guard guard(m_mutex);
        m_hasEnded = true;
    }
    m_changed.notify_all();
}

void HttpServer::Implementation::addRoutes() {
    m_server.set_socket_options(setSocketOptions);
    m_server.set_payload_max_length(largestBody);
    m_server.set_read_timeout(networkTimeout);
    m_server.set_write_timeout(networkTimeout);
    m_server.set_keep_alive_timeout(keepAliveSeconds);
    m_server.set_keep_alive_max_count(requestsPerConnection);
    m_server.set_default_headers(
        {{"Cache-Control", "no-store"}, {"X-Content-Type-Options", "nosniff"}});
    m_server.set_pre_routing_handler(
        [this](const auto& request, auto& response) { return guard(request, response); });
    m_server.Get("/healthz", [](const httplib::Request&, httplib::Response& response) {
        response.set_content(R"({"status":"ok"})", "application/json");
    });
    m_server.Post(
        R"(/api/v1/tables/([^/]*)/sample)",
        [this](const httplib::Request& request, httplib::Response& response,
               const httplib::ContentReader& reader) { sample(request, response, reader); });
    m_server.set_error_handler([](const httplib::Request&, httplib::Response& response) {
        if (response.body.empty()) {
            answer(response,
                   {response.status,
                    response.status == 404 ? "there is nothing at this path for this method"
                                           : "the request cannot be served",
                    ""});
        }
    });
    m_server.set_exception_handler(failed);
}

HttpServer::Implementation::Handled
HttpServer::Implementation::guard(const httplib::Request& request,
                                  httplib::Response& response) const {
    const std::optional<Problem> problem = m_guard->refuse(
        {header(request, "Host"), header(request, "Origin"), header(request, "Authorization")},
        request.path == "/healthz");
    if (!problem) {
        return Handled::Unhandled;
    }
    answer(response, *problem);
    return Handled::Handled;
}

void HttpServer::Implementation::sample(const httplib::Request& request,
                                        httplib::Response& response,
                                        const httplib::ContentReader& reader) {
    TraceScope trace(anchor);
    if (const std::optional<Problem> problem = trySample(request, response, reader)) {
        trace.detail()("Sample refused: %s.", problem->detail.c_str());
        answer(response, *problem);
    }
}

std::optional<Problem> HttpServer::Implementation::trySample(const httplib::Request& request,
                                                             httplib::Response& response,
                                                             const httplib::ContentReader& reader) {
    const std::string table = request.matches[1];
    const std::optional<std::string> text = body(reader);
    if (!text) {
        return Problem{413, "the body has more than 65536 bytes", "body"};
    }
    if (columnsOf(table).empty()) {
        return Problem{404, "no such table; the tables are RMLOGENT and RMMONLOG", "table"};
    }
    if (!request.get_header_value("Content-Type").starts_with("application/json")) {
        return Problem{415, "send the filters as application/json", "Content-Type"};
    }
    const auto conditions = SampleRequest::parse(table, *text);
    if (const auto* const problem = std::get_if<Problem>(&conditions)) {
        return *problem;
    }
    const ActiveSamples::Guard active(m_active);
    if (!active) {
        return Problem{503, "the agent is ending", ""};
    }
    const auto& wanted = std::get<std::vector<Condition>>(conditions);
    const SampleSource::Rows rows = m_source.take(table, wanted);
    if (rows.count == 0 && table == "RMLOGENT" && !isMonitored(wanted)) {
        return Problem{404, "the agent does not monitor this log", "filters"};
    }
    response.set_content("{\"table\":\"" + table + "\",\"rows\":" + rows.json +
                             ",\"count\":" + std::to_string(rows.count) +
                             ",\"truncated\":" + (rows.truncated ? "true}" : "false}"),
                         "application/json");
    return std::nullopt;
}

bool HttpServer::Implementation::isMonitored(const std::vector<Condition>& report) {
    std::vector<Condition> log;
    std::copy_if(report.begin(), report.end(), std::back_inserter(log), namesLog);
    return m_source.take("RMMONLOG", log).count > 0;
}

std::string HttpServer::Implementation::start(ListenAddress address, ApiToken token) {
    TraceScope trace(anchor);
    if (address.port == 0) {
        const int port = m_server.bind_to_any_port(address.host);
        if (port <= 0) {
            return "cannot listen at " + address.text();
        }
        address.port = static_cast<std::uint16_t>(port);
    } else if (!m_server.bind_to_port(address.host, address.port)) {
        return "cannot listen at " + address.text() + ": is another agent running?";
    }
    m_port = address.port;
    m_guard.emplace(address, std::move(token));
    m_thread = std::thread([this] { serve(); });
    // A stop before the server runs would be lost.
    std::unique_lock lock(m_mutex);
    while (!m_server.is_running() && !m_hasEnded) {
        m_changed.wait_for(lock, std::chrono::milliseconds(1));
    }
    trace.detail()("Listening at %s.", address.text().c_str());
    return "";
}

void HttpServer::Implementation::stop(Clock::time_point limit) {
    TraceScope trace(anchor);
    if (!m_thread.joinable()) {
        return;
    }
    m_server.stop();
    std::unique_lock lock(m_mutex);
    if (m_changed.wait_until(lock, limit, [&] { return m_hasEnded; })) {
        lock.unlock();
        m_thread.join();
    } else {
        trace.detail()("Clients are still being served.");
        m_active.close(limit);
    }
}

HttpServer::HttpServer(SampleSource& source)
    : m_implementation(std::make_unique<Implementation>(source)) {}

HttpServer::~HttpServer() = default;

std::string HttpServer::start(const ListenAddress& address, ApiToken token) {
    return m_implementation->start(address, std::move(token));
}

std::uint16_t HttpServer::port() const noexcept {
    return m_implementation->port();
}

void HttpServer::stop(Clock::time_point limit) {
    m_implementation->stop(limit);
}

void HttpServer::abandon(Clock::time_point limit) {
    m_implementation->abandon(limit);
}
