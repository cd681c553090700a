#include "host/sinks/HttpPost.h"

#include "agent/TraceScope.h"
#include "host/config/HttpUrl.h"
#include "host/sinks/BrokenPipeBlocked.h"
#include "host/sinks/ConnectionLimit.h"
#include "host/sinks/NameLookup.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <exception>
#include <optional>
#include <utility>
#include <vector>

#include <httplib.h>

namespace {

TRC1_Anchor anchor{"HttpPost.cpp"};

using Clock = std::chrono::steady_clock;

constexpr std::size_t longestAnswer = 64 * 1024; ///< bytes of the body that are kept
constexpr std::size_t longestExcerpt = 200;      ///< bytes of the body in a message
constexpr std::chrono::seconds longestPause{3600};

/// What the library's errors mean to an operator.
struct ErrorName {
    httplib::Error error;
    const char* text;
};

constexpr std::array errorNames = {
    ErrorName{httplib::Error::Connection, "no connection"},
    ErrorName{httplib::Error::ConnectionTimeout, "no connection in time"},
    ErrorName{httplib::Error::Read, "the connection ended without a whole answer"},
    ErrorName{httplib::Error::Write, "the connection ended while the events were sent"},
    ErrorName{httplib::Error::SSLConnection, "no TLS connection"},
    ErrorName{httplib::Error::SSLLoadingCerts, "ca_file cannot be read"},
    ErrorName{httplib::Error::SSLServerVerification,
              "the server's certificate is not trusted for this host"},
};

const char* textOf(httplib::Error error) {
    const auto found = std::find_if(errorNames.begin(), errorNames.end(),
                                    [&](const ErrorName& known) { return known.error == error; });
    return found == errorNames.end() ? "the request failed" : found->text;
}

/// The beginning of a body on one line.
std::string excerpt(const std::string& body) {
    std::string text = body.substr(0, longestExcerpt);
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c < ' ' || c > '~'; }, ' ');
    return text;
}

/// The header Host: the library leaves the brackets out.
std::string hostOf(const HttpUrl& url) {
    const std::string authority = url.authority();
    const bool isUsual = url.port == (url.isSecure ? 443 : 80);
    return isUsual ? authority.substr(0, authority.rfind(':')) : authority;
}

/// The pause that a busy receiver asks for; none when it gives no number of seconds.
std::chrono::seconds pauseOf(const httplib::Response& response) {
    const std::string text = response.get_header_value("Retry-After");
    std::int64_t seconds = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), seconds);
    const bool isPause = error == std::errc() && end == text.data() + text.size() && seconds > 0 &&
                         (response.status == 429 || response.status == 503);
    return isPause ? std::min(std::chrono::seconds(seconds), longestPause)
                   : std::chrono::seconds(0);
}

} // namespace

class HttpPost::Implementation {
public:
    Implementation(const SinkConfig& config, std::string_view path);

    bool send(const std::string& body, const Headers& headers, const std::stop_token& giveUp);
    void fail(const char* why) { m_error = why; }
    const std::string& answer() const noexcept { return m_answer; }
    const std::string& error() const noexcept { return m_error; }

private:
    /// LOST: a connection that was kept had ended. UNREACHED: nobody took the connection. UNKNOWN:
    /// the receiver has no address.
    enum Outcome { ANSWERED, LOST, UNREACHED, UNKNOWN, OVER };

    bool lookUp(const std::stop_token& giveUp);
    void connect();
    httplib::Request requestOf(const std::string& body, const Headers& headers);
    Outcome attempt(const std::string& body, const Headers& headers);
    Outcome attemptAll(const std::string& body, const Headers& headers,
                       const std::stop_token& giveUp);
    void note(const httplib::Response& response);
    bool judge();

    const HttpUrl m_url;
    const std::string m_target;
    const std::chrono::milliseconds m_timeout;
    const std::string m_caFile;
    const Headers m_headers;

    NameLookup m_lookup;
    std::vector<SocketAddress> m_addresses; ///< of the receiver, when it was last looked up
    std::size_t m_unreached = 0; ///< connections in a row that nobody took: tells which is next
    std::unique_ptr<httplib::ClientImpl> m_client; ///< made anew after every failure
    std::optional<ConnectionLimit> m_limit;        ///< of the request under way
    int m_status = 0;
    Clock::time_point m_notBefore{}; ///< the end of the pause that the receiver asked for
    std::string m_answer;
    std::string m_error;
};

HttpPost::Implementation::Implementation(const SinkConfig& config, std::string_view path)
    : m_url(HttpUrl::parse(config.text("url")).value_or(HttpUrl{})), m_target(m_url.withPath(path)),
      m_timeout(config.duration("timeout")), m_caFile(config.text("ca_file")),
      m_headers(config.texts("headers")), m_lookup(m_url.host, m_url.port) {}

bool HttpPost::Implementation::lookUp(const std::stop_token& giveUp) {
    m_addresses = m_lookup.find(m_limit->end(), giveUp);
    if (m_addresses.empty()) {
        m_error = m_url.authority() + " is not known: " + m_lookup.error();
    }
    return !m_addresses.empty();
}

void HttpPost::Implementation::connect() {
    if (m_url.isSecure) {
        m_client = std::make_unique<httplib::SSLClient>(m_url.host, m_url.port);
        m_client->enable_server_certificate_verification(true);
        m_client->set_ca_cert_path(m_caFile); // empty: the system's
    } else {
        m_client = std::make_unique<httplib::ClientImpl>(m_url.host, m_url.port);
    }
    // Its own lookup of the name could not be ended.
    const SocketAddress& address = m_addresses[m_unreached % m_addresses.size()];
    m_client->set_hostname_addr_map({{m_url.host, address.text()}});
    m_client->set_keep_alive(true);
    m_client->set_tcp_nodelay(true);
    m_client->set_url_encode(false); // the URL is written as it is sent
    m_client->set_decompress(false);
    // These begin anew with each read; the whole request has its own limit, which comes first.
    const auto spare = m_timeout + std::chrono::seconds(5);
    m_client->set_connection_timeout(spare);
    m_client->set_read_timeout(spare);
    m_client->set_write_timeout(spare);
    m_client->set_socket_options([this](socket_t socket) { m_limit->watch(socket); });
}

httplib::Request HttpPost::Implementation::requestOf(const std::string& body,
                                                     const Headers& headers) {
    httplib::Request request;
    request.method = "POST";
    request.path = m_target;
    request.body = body;
    request.headers = {m_headers.begin(), m_headers.end()};
    request.headers.insert(headers.begin(), headers.end());
    request.headers.emplace("Host", hostOf(m_url));
    request.headers.emplace("Content-Type", "application/json");
    request.headers.emplace("User-Agent", "zrmagent");
    request.response_handler = [this](const httplib::Response& response) {
        note(response); // before the body, of which nothing may come
        return true;
    };
    request.content_receiver = [this](const char* data, std::size_t size, std::uint64_t,
                                      std::uint64_t) {
        m_answer.append(data, std::min(size, longestAnswer - m_answer.size()));
        return m_answer.size() < longestAnswer;
    };
    return request;
}

HttpPost::Implementation::Outcome HttpPost::Implementation::attempt(const std::string& body,
                                                                    const Headers& headers) {
    const bool isKept = m_client != nullptr;
    if (isKept) {
        m_limit->watch(m_client->socket());
    } else {
        connect();
    }
    m_status = 0;
    m_answer.clear();
    httplib::Request request = requestOf(body, headers);
    const httplib::Result result = m_client->send(request);
    m_limit->watch(-1);
    if (result) {
        m_unreached = 0;
        note(*result);
    } else {
        m_client.reset(); // nothing of a failed connection is used again
    }
    if (m_status != 0) {
        return ANSWERED; // the status counts, whatever came of the body
    }
    m_error = std::string(textOf(result.error())) + " (" + m_url.authority() + ')';
    if (result.error() == httplib::Error::Connection ||
        result.error() == httplib::Error::ConnectionTimeout) {
        ++m_unreached;
        return UNREACHED;
    }
    // A receiver may end a connection that it kept at the moment in which it is used again.
    return isKept ? LOST : OVER;
}

HttpPost::Implementation::Outcome
HttpPost::Implementation::attemptAll(const std::string& body, const Headers& headers,
                                     const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (m_client != nullptr && m_client->is_socket_open() == 0) {
        m_client.reset(); // the receiver has said that it ends the connection
    }
    Outcome outcome = m_client == nullptr ? LOST : attempt(body, headers);
    if (outcome != LOST || m_limit->hasEnded()) {
        return outcome;
    }
    trace.detail()("A connection to %s is made.", m_url.authority().c_str());
    if (!lookUp(giveUp)) {
        return UNKNOWN;
    }
    // Each address once, beginning with the one whose turn it is.
    for (std::size_t tries = m_addresses.size(); tries > 0; --tries) {
        outcome = attempt(body, headers);
        if (outcome != UNREACHED || m_limit->hasEnded()) {
            break;
        }
    }
    return outcome;
}

void HttpPost::Implementation::note(const httplib::Response& response) {
    m_status = response.status;
    m_notBefore = Clock::now() + pauseOf(response);
}

bool HttpPost::Implementation::judge() {
    if (m_status >= 200 && m_status < 300) {
        return true;
    }
    m_error = m_url.authority() + " answered with status " + std::to_string(m_status);
    if (!m_answer.empty()) {
        m_error += ": " + excerpt(m_answer);
    }
    return false;
}

bool HttpPost::Implementation::send(const std::string& body, const Headers& headers,
                                    const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (Clock::now() < m_notBefore) {
        return trace.result(false); // the last error holds
    }
    const BrokenPipeBlocked blocked;
    m_limit.emplace(Clock::now() + m_timeout, giveUp);
    const Outcome outcome = attemptAll(body, headers, giveUp);
    const bool isOverTime = m_limit->hasEnded();
    m_limit.reset();
    if (outcome == ANSWERED) {
        return trace.result(judge());
    }
    if (giveUp.stop_requested()) {
        m_error = "the agent is ending (" + m_url.authority() + ')';
    } else if (isOverTime && outcome != UNKNOWN) {
        m_error = "no answer in time (" + m_url.authority() + ')';
    }
    return trace.result(false);
}

HttpPost::HttpPost(const SinkConfig& config, std::string_view path)
    : m_implementation(std::make_unique<Implementation>(config, path)) {}

HttpPost::~HttpPost() = default;

bool HttpPost::send(const std::string& body, const Headers& headers,
                    const std::stop_token& giveUp) {
    try {
        return m_implementation->send(body, headers, giveUp);
    } catch (const std::exception& exception) { // no memory, or no thread
        m_implementation->fail(exception.what());
        return false;
    }
}

const std::string& HttpPost::answer() const noexcept {
    return m_implementation->answer();
}

const std::string& HttpPost::error() const noexcept {
    return m_implementation->error();
}
