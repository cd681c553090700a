#include "host/cli/AgentClient.h"

#include "host/base/UrlText.h"
#include "host/cli/CliError.h"
#include "host/cli/InputFile.h"
#include "host/cli/JsonText.h"
#include "host/client/HttpClient.h"

#include <chrono>
#include <cstddef>
#include <optional>
#include <stop_token>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;
using Json = AgentClient::Json;
using Outcome = HttpClientAnswer::Outcome;

/// A report may wait for a refresh and read a large log.
constexpr HttpLimits answerLimits{.connect = 5s, .head = 120s, .whole = 900s, .silence = 120s};
/// The silence limit equals three missing keep-alive comments.
constexpr HttpLimits streamLimits{.connect = 5s, .head = 45s, .whole = 0s, .silence = 45s};

constexpr std::size_t longestAnswer = 256 * 1024 * 1024; ///< bytes
constexpr std::size_t longestLine = 1024 * 1024;         ///< bytes
constexpr std::size_t longestProblem = 64 * 1024;        ///< bytes

bool isSuccess(int status) {
    return status >= 200 && status < 300;
}

std::string withQuery(const std::string& path, const AgentClient::Query& query) {
    std::string text = path;
    for (const auto& [name, value] : query) {
        text += (text.size() == path.size() ? '?' : '&') + name + '=' + UrlText::encode(value);
    }
    return text;
}

HttpUrl serverOf(const AgentAccess& access) {
    const std::optional<HttpUrl> url = HttpUrl::parse(access.url);
    if (!url) {
        throw CliError(CliStatus::USAGE, "'" + access.url +
                                             "' is not the address of an agent; write it "
                                             "as https://HOST:PORT");
    }
    return *url;
}

/// The agent's certificate may be self-signed, or signed by a private authority.
std::string authoritiesOf(const AgentAccess& access) {
    std::string all;
    for (const std::string& file : access.authorities) {
        const std::string text = InputFile(file).text();
        if (text.find("CERTIFICATE-----") == std::string::npos) {
            throw CliError(CliStatus::USAGE,
                           file + " does not contain a certificate in PEM format");
        }
        all += text + '\n';
    }
    return all;
}

} // namespace

class AgentClient::Implementation {
public:
    explicit Implementation(AgentAccess access)
        : m_access(std::move(access)),
          m_client({serverOf(m_access), "", authoritiesOf(m_access), "zrmctl"}) {}

    void stop() { m_stop.request_stop(); }

    Json ask(HttpClientRequest request);
    void lines(HttpClientRequest request, const std::string& last,
               const std::function<void(Json&&)>& receiver);
    void stream(HttpClientRequest request, const std::function<void(std::string_view)>& receiver);

private:
    HttpClientAnswer send(HttpClientRequest& request);
    CliError unreachable(const HttpClientAnswer& answer) const;
    CliError refused(int status, const std::string& body) const;
    CliError foreign(const std::string& why) const;

    const AgentAccess m_access;
    HttpClient m_client;
    std::stop_source m_stop;
};

HttpClientAnswer AgentClient::Implementation::send(HttpClientRequest& request) {
    request.headers.push_back("Authorization: Bearer " + m_access.token);
    if (request.body != nullptr && !request.body->empty()) {
        request.headers.emplace_back("Content-Type: application/json");
    }
    HttpClientAnswer answer = m_client.send(request, m_stop.get_token());
    const bool isStopped = answer.outcome == Outcome::stopped;
    if (answer.status == 0 && !isStopped) {
        throw unreachable(answer);
    }
    return answer;
}

Json AgentClient::Implementation::ask(HttpClientRequest request) {
    std::string body;
    bool isTooLong = false;
    request.limits = answerLimits;
    request.receive = [&](int status, std::string_view piece) {
        isTooLong =
            piece.size() + body.size() > (isSuccess(status) ? longestAnswer : longestProblem);
        body += isTooLong ? "" : piece;
        return !isTooLong;
    };
    const HttpClientAnswer answer = send(request);
    if (isTooLong) {
        throw foreign("its answer does not end");
    }
    if (answer.outcome != Outcome::whole) {
        throw unreachable(answer);
    }
    if (!isSuccess(answer.status)) {
        throw refused(answer.status, body);
    }
    if (body.empty()) {
        return {};
    }
    Json document = JsonText::parse(body);
    if (!document.is_object()) {
        throw foreign("its answer is not a JSON object");
    }
    return document;
}

void AgentClient::Implementation::lines(HttpClientRequest request, const std::string& last,
                                        const std::function<void(Json&&)>& receiver) {
    std::string text; // of a problem, or the line that is not complete
    bool isOver = false;
    request.limits = answerLimits;
    request.headers.emplace_back("Accept: application/x-ndjson");
    request.receive = [&](int status, std::string_view piece) {
        if (text.size() + piece.size() > longestLine) {
            throw foreign("its answer does not end");
        }
        text += piece;
        for (std::size_t end = 0;
             isSuccess(status) && (end = text.find('\n')) != std::string::npos;) {
            Json line = JsonText::parse(std::string_view(text).substr(0, end));
            if (!line.is_object()) {
                throw foreign("its answer is not JSON objects");
            }
            text.erase(0, end + 1);
            isOver = line.contains(last);
            receiver(std::move(line));
        }
        return true;
    };
    const HttpClientAnswer answer = send(request);
    if (answer.status != 0 && !isSuccess(answer.status)) {
        throw refused(answer.status, text);
    }
    if (answer.outcome != Outcome::whole || !isOver) {
        throw CliError(CliStatus::UNREACHABLE, "the connection to the agent at " + m_access.url +
                                                   " ended before the answer did");
    }
}

void AgentClient::Implementation::stream(HttpClientRequest request,
                                         const std::function<void(std::string_view)>& receiver) {
    std::string problem;
    request.limits = streamLimits;
    request.receive = [&](int status, std::string_view piece) {
        if (isSuccess(status)) {
            receiver(piece);
            return true;
        }
        problem += piece.substr(0, longestProblem - problem.size());
        return problem.size() < longestProblem;
    };
    const HttpClientAnswer answer = send(request);
    if (answer.status != 0 && !isSuccess(answer.status)) {
        throw refused(answer.status, problem);
    }
}

CliError AgentClient::Implementation::unreachable(const HttpClientAnswer& answer) const {
    const std::string agent = "the agent at " + m_access.url;
    switch (answer.outcome) {
    case Outcome::unreachable:
    case Outcome::unknownName:
        return {CliStatus::UNREACHABLE, "cannot reach " + agent +
                                            ": is zrmagent running? (systemctl status zrmagent; "
                                            "another address: --url or --config)"};
    case Outcome::untrusted:
    case Outcome::noTls:
    case Outcome::noAuthorities:
        return {
            CliStatus::UNREACHABLE,
            agent +
                " has no certificate that this machine trusts for this address: name the file with "
                "its authority's certificate, or with the certificate itself, with --ca-file"};
    case Outcome::notHttp:
        return foreign("its answer is not HTTP");
    case Outcome::failed:
        return {CliStatus::UNREACHABLE, "the connection to " + agent + " failed: " + answer.detail};
    default:
        return {CliStatus::UNREACHABLE,
                agent + " did not answer: it has stopped, or it is too busy"};
    }
}

CliError AgentClient::Implementation::refused(int status, const std::string& body) const {
    if (status == 401) {
        return {CliStatus::FORBIDDEN,
                "the agent at " + m_access.url + " does not accept the token from " +
                    m_access.tokenSource + ": give the right one with --token-file or --config"};
    }
    const Json problem = JsonText::parse(body);
    std::string text = problem.is_discarded() ? "" : JsonText::text(problem, "detail");
    if (text.empty()) {
        text = "the agent at " + m_access.url + " answered with status " + std::to_string(status);
    }
    const std::string field = problem.is_discarded() ? "" : JsonText::text(problem, "field");
    constexpr int unavailable = 503;
    return {status == unavailable ? CliStatus::UNREACHABLE : CliStatus::REFUSED,
            field.empty() ? text : field + ": " + text};
}

CliError AgentClient::Implementation::foreign(const std::string& why) const {
    return {CliStatus::UNREACHABLE,
            "what answers at " + m_access.url + " is not a zrmagent: " + why};
}

AgentClient::AgentClient(AgentAccess access)
    : m_implementation(std::make_unique<Implementation>(std::move(access))) {}

AgentClient::~AgentClient() = default;

Json AgentClient::get(const std::string& path, const Query& query) {
    return m_implementation->ask({.method = "GET", .target = withQuery(path, query)});
}

namespace {

/// Empty for a null value.
std::string textOf(const Json& body) {
    if (body.is_null()) {
        return "";
    }
    try {
        return body.dump();
    } catch (const Json::type_error&) {
        throw CliError(CliStatus::USAGE,
                       "the command line, or the file that it names, is not valid "
                       "UTF-8, which the agent's API requires");
    }
}

} // namespace

Json AgentClient::send(const std::string& method, const std::string& path, const Json& body) {
    const std::string text = textOf(body);
    const bool hasBody = method != "DELETE" || !text.empty();
    return m_implementation->ask(
        {.method = method, .target = path, .body = hasBody ? &text : nullptr});
}

void AgentClient::lines(const std::string& path, const Json& body, const std::string& last,
                        const std::function<void(Json&&)>& receiver) {
    const std::string text = textOf(body);
    m_implementation->lines({.method = "POST", .target = path, .body = &text}, last, receiver);
}

void AgentClient::stream(const std::string& path, const Query& query,
                         const std::function<void(std::string_view)>& receiver) {
    m_implementation->stream({.method = "GET", .target = withQuery(path, query)}, receiver);
}

void AgentClient::stop() {
    m_implementation->stop();
}

} // namespace zrm::host
