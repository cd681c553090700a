#include "host/cli/AgentClient.h"

#include "host/cli/CliError.h"
#include "host/cli/InputFile.h"
#include "host/cli/JsonText.h"

#include <utility>

#include <httplib.h>
#include <nlohmann/json.hpp>

namespace {

using Json = AgentClient::Json;

constexpr std::chrono::seconds connectTimeout{5};
constexpr std::chrono::seconds answerTimeout{120}; ///< a report waits for a refresh
constexpr std::chrono::seconds streamTimeout{45};  ///< three keep-alive comments are missing

bool isSuccess(int status) {
    return status >= 200 && status < 300;
}

std::string withQuery(const std::string& path, const AgentClient::Query& query) {
    std::string text = path;
    for (const auto& [name, value] : query) {
        text +=
            (text.size() == path.size() ? '?' : '&') + name + '=' + AgentClient::pathPart(value);
    }
    return text;
}

} // namespace

class AgentClient::Implementation {
public:
    explicit Implementation(AgentAccess access)
        : m_access(std::move(access)), m_client(m_access.url) {
        m_client.set_connection_timeout(connectTimeout);
        m_client.set_read_timeout(answerTimeout);
        m_client.set_bearer_token_auth(m_access.token);
        trustAuthorities();
    }

    httplib::Client& client() { return m_client; }

    Json answer(const httplib::Result& result) const {
        if (!result) {
            throw unreachable(result.error());
        }
        if (!isSuccess(result->status)) {
            throw refused(result->status, result->body);
        }
        if (result->body.empty()) {
            return {};
        }
        Json body = Json::parse(result->body, nullptr, false);
        if (!body.is_object()) {
            throw CliError(CLI_UNREACHABLE, "what answers at " + m_access.url +
                                                " is no zrmagent: its answer is no JSON object");
        }
        return body;
    }

    CliError unreachable(httplib::Error error) const {
        const std::string agent = "the agent at " + m_access.url;
        switch (error) {
        case httplib::Error::Connection:
            return {CLI_UNREACHABLE, "cannot reach " + agent +
                                         ": is zrmagent running? (systemctl status zrmagent; "
                                         "another address: --url or --config)"};
        case httplib::Error::SSLConnection:
        case httplib::Error::SSLServerVerification:
        case httplib::Error::SSLLoadingCerts:
            return {CLI_UNREACHABLE, agent + " shows no certificate that this machine trusts for "
                                             "this address: name the file of its authority, or of "
                                             "the certificate itself, with --ca-file"};
        case httplib::Error::Read:
            return {CLI_UNREACHABLE, agent + " did not answer: it ended, or it is too busy"};
        default:
            return {CLI_UNREACHABLE,
                    "the connection to " + agent + " failed: " + httplib::to_string(error)};
        }
    }

    CliError refused(int status, const std::string& body) const {
        if (status == 401) {
            return {CLI_FORBIDDEN, "the agent at " + m_access.url +
                                       " does not accept the token of " + m_access.tokenSource +
                                       ": name the agent's own with --token-file or --config"};
        }
        const Json problem = Json::parse(body, nullptr, false);
        std::string text = problem.is_discarded() ? "" : JsonText::text(problem, "detail");
        if (text.empty()) {
            text =
                "the agent at " + m_access.url + " answered with status " + std::to_string(status);
        }
        const std::string field = problem.is_discarded() ? "" : JsonText::text(problem, "field");
        constexpr int unavailable = 503;
        return {status == unavailable ? CLI_UNREACHABLE : CLI_REFUSED,
                field.empty() ? text : field + ": " + text};
    }

private:
    /// The agent's own certificate may be signed by itself, or by an authority of the house.
    void trustAuthorities() {
        SSL_CTX* const tls = m_client.ssl_context();
        if (tls == nullptr || m_access.authorities.empty()) {
            return;
        }
        for (const std::string& file : m_access.authorities) {
            InputFile(file).text(); // tells why it cannot be read, which OpenSSL does not
            if (SSL_CTX_load_verify_locations(tls, file.c_str(), nullptr) != 1) {
                throw CliError(CLI_USAGE, file + " holds no certificate in PEM");
            }
        }
        X509_STORE_set_flags(SSL_CTX_get_cert_store(tls), X509_V_FLAG_PARTIAL_CHAIN);
    }

    const AgentAccess m_access;
    httplib::Client m_client;
};

AgentClient::AgentClient(AgentAccess access)
    : m_implementation(std::make_unique<Implementation>(std::move(access))) {}

AgentClient::~AgentClient() = default;

Json AgentClient::get(const std::string& path, const Query& query) {
    return m_implementation->answer(m_implementation->client().Get(withQuery(path, query)));
}

Json AgentClient::send(const std::string& method, const std::string& path, const Json& body) {
    httplib::Request request;
    request.method = method;
    request.path = path;
    if (!body.is_null()) {
        try {
            request.body = body.dump();
        } catch (const Json::type_error&) {
            throw CliError(CLI_USAGE, "the command line, or the file that it names, is not valid "
                                      "UTF-8, as the agent's API wants it");
        }
        request.set_header("Content-Type", "application/json");
    }
    return m_implementation->answer(m_implementation->client().send(request));
}

void AgentClient::stream(const std::string& path, const Query& query,
                         const std::function<void(std::string_view)>& receiver) {
    httplib::Client& client = m_implementation->client();
    client.set_read_timeout(streamTimeout);
    int status = 0;
    std::string problem;
    const httplib::Result result = client.Get(
        withQuery(path, query),
        [&](const httplib::Response& response) {
            status = response.status;
            return !m_isStopped; // stop may have come before there was a connection
        },
        [&](const char* data, std::size_t size) {
            if (isSuccess(status)) {
                receiver({data, size});
            } else {
                problem.append(data, size);
            }
            return true;
        });
    client.set_read_timeout(answerTimeout);
    if (status == 0) {
        throw m_implementation->unreachable(result.error());
    }
    if (!isSuccess(status)) {
        throw m_implementation->refused(status, problem);
    }
}

void AgentClient::stop() {
    m_isStopped = true;
    m_implementation->client().stop();
}

std::string AgentClient::pathPart(std::string_view text) {
    constexpr std::string_view plain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
                                       "0123456789-._~";
    constexpr const char* digits = "0123456789ABCDEF";
    std::string part;
    for (const char c : text) {
        if (plain.find(c) != std::string_view::npos) {
            part += c;
        } else {
            const auto byte = static_cast<unsigned char>(c);
            part += {'%', digits[byte >> 4], digits[byte & 0x0f]};
        }
    }
    return part;
}
