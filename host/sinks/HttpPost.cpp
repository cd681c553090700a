#include "host/sinks/HttpPost.h"

#include "base/TraceScope.h"
#include "host/client/HttpClient.h"
#include "host/config/HttpUrl.h"
#include "host/sinks/SecretFile.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <cstdint>
#include <exception>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"HttpPost.cpp"};

using Clock = std::chrono::steady_clock;
using Outcome = HttpClientAnswer::Outcome;

constexpr std::size_t longestAnswer = 64 * 1024; ///< bytes of the body kept
constexpr std::size_t longestExcerpt = 200;      ///< bytes of the body shown in a message
constexpr std::chrono::seconds longestPause{3600};

/// An outcome in words for the operator.
struct OutcomeName {
    Outcome outcome;
    const char* text;
};

constexpr std::array outcomeNames = {
    OutcomeName{Outcome::stopped, "the agent is stopping"},
    OutcomeName{Outcome::late, "no answer in time"},
    OutcomeName{Outcome::unreachable, "no connection"},
    OutcomeName{Outcome::untrusted, "the server's certificate is not trusted for this host"},
    OutcomeName{Outcome::noTls, "no TLS connection"},
    OutcomeName{Outcome::noAuthorities, "ca_file cannot be read"},
    OutcomeName{Outcome::sendFailed, "the connection ended while the events were sent"},
    OutcomeName{Outcome::brokenOff, "the connection ended before the answer was complete"},
    OutcomeName{Outcome::notHttp, "the answer is not HTTP, or its head is longer than 64 kB"},
};

std::string textOf(const HttpClientAnswer& answer) {
    const auto* const found =
        std::find_if(outcomeNames.begin(), outcomeNames.end(),
                     [&](const OutcomeName& known) { return known.outcome == answer.outcome; });
    return found == outcomeNames.end() ? answer.detail : found->text;
}

/// The beginning of a body, on one line.
std::string excerpt(const std::string& body) {
    std::string text = body.substr(0, longestExcerpt);
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c < ' ' || c > '~'; }, ' ');
    return text;
}

/// The pause that a busy receiver asks for; zero when it gives no number of seconds.
std::chrono::seconds pauseOf(const HttpClientAnswer& answer) {
    const std::string& text = answer.retryAfter;
    std::int64_t seconds = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), seconds);
    const bool isPause = error == std::errc() && end == text.data() + text.size() && seconds > 0 &&
                         (answer.status == 429 || answer.status == 503);
    return isPause ? std::min(std::chrono::seconds(seconds), longestPause)
                   : std::chrono::seconds(0);
}

} // namespace

class HttpPost::Implementation {
public:
    Implementation(const SinkConfig& config, std::string_view path);

    bool send(const std::string& body, const Headers& headers, const std::stop_token& giveUp);
    void fail(const char* why) { m_error = why; }
    const std::string& answer() const noexcept { return m_body; }
    const std::string& error() const noexcept { return m_error; }

private:
    HttpClientRequest requestOf(const std::string& body, const Headers& headers);
    bool addHeadersOfFile(HttpClientRequest& request);
    bool judge(const HttpClientAnswer& answer);

    const HttpUrl m_url;
    const std::string m_target;
    const std::chrono::milliseconds m_timeout;
    const Headers m_headers;
    const std::string m_headersFile;
    HttpClient m_client;
    Clock::time_point m_notBefore{}; ///< the end of the pause that the receiver asked for
    std::string m_body;              ///< body of the last answer
    std::string m_error;
};

HttpPost::Implementation::Implementation(const SinkConfig& config, std::string_view path)
    : m_url(HttpUrl::parse(config.text("url")).value_or(HttpUrl{})), m_target(m_url.withPath(path)),
      m_timeout(config.duration("timeout")), m_headers(config.texts("headers")),
      m_headersFile(config.text("headers_file")),
      m_client({m_url, config.text("ca_file"), "", "zrmagent"}) {}

HttpClientRequest HttpPost::Implementation::requestOf(const std::string& body,
                                                      const Headers& headers) {
    HttpClientRequest request{
        .method = "POST",
        .target = m_target,
        .headers = {"Content-Type: application/json"},
        .body = &body,
        .limits = {.connect = m_timeout, .head = m_timeout, .whole = m_timeout},
        .receive =
            [this](int, std::string_view piece) {
                m_body += piece.substr(0, longestAnswer - m_body.size());
                return m_body.size() < longestAnswer;
            },
    };
    for (const Headers* const some : {&m_headers, &headers}) {
        for (const auto& [name, value] : *some) {
            request.headers.push_back(name + ": " + value);
        }
    }
    return request;
}

/// Reread each time, so that they can be changed while the agent runs.
bool HttpPost::Implementation::addHeadersOfFile(HttpClientRequest& request) {
    if (m_headersFile.empty()) {
        return true;
    }
    const Result<Headers> headers = HeadersFile::read(m_headersFile);
    if (!headers) {
        m_error = headers.error().text();
        return false;
    }
    for (const auto& [name, value] : *headers) {
        request.headers.push_back(name + ": " + value);
    }
    return true;
}

bool HttpPost::Implementation::judge(const HttpClientAnswer& answer) {
    if (answer.status == 0) {
        const bool isUnknown = answer.outcome == Outcome::unknownName;
        m_error = isUnknown ? m_url.authority() + " is not known: " + answer.detail
                            : textOf(answer) + " (" + m_url.authority() + ')';
        return false;
    }
    // Only the status counts, not what happened to the body.
    if (answer.status >= 200 && answer.status < 300) {
        return true;
    }
    m_error = m_url.authority() + " answered with status " + std::to_string(answer.status);
    if (!m_body.empty()) {
        m_error += ": " + excerpt(m_body);
    }
    return false;
}

bool HttpPost::Implementation::send(const std::string& body, const Headers& headers,
                                    const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (Clock::now() < m_notBefore) {
        return trace.result(false); // the last error still applies
    }
    m_body.clear();
    HttpClientRequest request = requestOf(body, headers);
    if (!addHeadersOfFile(request)) {
        return trace.result(false);
    }
    const HttpClientAnswer answer = m_client.send(request, giveUp);
    m_notBefore = Clock::now() + pauseOf(answer);
    return trace.result(judge(answer));
}

HttpPost::HttpPost(const SinkConfig& config, std::string_view path)
    : m_implementation(std::make_unique<Implementation>(config, path)) {}

HttpPost::~HttpPost() = default;

bool HttpPost::send(const std::string& body, const Headers& headers,
                    const std::stop_token& giveUp) {
    try {
        return m_implementation->send(body, headers, giveUp);
    } catch (const std::exception& exception) { // no memory or no thread
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

} // namespace zrm::host
