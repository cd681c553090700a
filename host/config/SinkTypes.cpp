#include "host/config/SinkTypes.h"

#include <algorithm>
#include <array>
#include <string>

namespace zrm::host {

namespace {

std::string lowerCase(std::string_view name) {
    std::string lower(name);
    std::transform(lower.begin(), lower.end(), lower.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
    return lower;
}

bool isLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9');
}

} // namespace

bool isAddableHeader(std::string_view name) {
    constexpr std::array<std::string_view, 10> own = {
        "host",   "content-length", "content-type",    "transfer-encoding", "connection",
        "expect", "user-agent",     "accept-encoding", "idempotency-key",   "x-zrm-signature"};
    constexpr std::string_view signs = "!#$%&'*+-.^_`|~";
    const std::string lower = lowerCase(name);
    return !name.empty() && std::find(own.begin(), own.end(), lower) == own.end() &&
           std::all_of(lower.begin(), lower.end(), [&](char c) {
               return isLetterOrDigit(c) || signs.find(c) != std::string_view::npos;
           });
}

bool isSecretHeader(std::string_view name) {
    constexpr std::array<std::string_view, 6> parts = {"auth",   "token",    "key",
                                                       "secret", "password", "cookie"};
    const std::string lower = lowerCase(name);
    return std::any_of(parts.begin(), parts.end(), [&](std::string_view part) {
        return lower.find(part) != std::string::npos;
    });
}

namespace {

using Option = SinkOption;

constexpr std::array<std::string_view, 5> typeNames = {"jsonl", "webhook", "alertmanager", "syslog",
                                                       "otlp"};

constexpr std::array commonOptions = {
    Option{.name = "type",
           .kind = Option::CHOICE,
           .need = Option::REQUIRED,
           .value = "jsonl",
           .meaning = "how events are delivered",
           .choices = typeNames},
    Option{.name = "name",
           .kind = Option::TEXT,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "the sink's name in messages and metrics, under which its position in the "
                      "history is kept; unique",
           .most = 128},
};

// Options that every sink over HTTP has.
constexpr Option timeoutOption{
    .name = "timeout",
    .kind = Option::DURATION,
    .need = Option::OPTIONAL,
    .value = "10s",
    .meaning = "how long one request may take, from connecting to the end of the answer",
    .least = 1,
    .most = 300};
constexpr Option headersOption{.name = "headers",
                               .kind = Option::HEADERS,
                               .need = Option::OPTIONAL,
                               .value = "",
                               .meaning =
                                   "headers to send with each request, such as `Authorization`"};
constexpr Option headersFileOption{
    .name = "headers_file",
    .kind = Option::PATH,
    .need = Option::OPTIONAL,
    .value = "",
    .meaning = "a file with more headers, one `Name: value` per line; it is read for each request"};
constexpr Option caFileOption{
    .name = "ca_file",
    .kind = Option::PATH,
    .need = Option::OPTIONAL,
    .value = "",
    .meaning = "certificates (PEM) of the authorities to trust instead of the system's"};

constexpr std::array webhookOptions = {
    Option{.name = "url",
           .kind = Option::URL,
           .need = Option::REQUIRED,
           .value = "https://hooks.example.com/zrm",
           .meaning = "where events are posted"},
    Option{.name = "batch",
           .kind = Option::NUMBER,
           .need = Option::OPTIONAL,
           .value = "100",
           .meaning = "the largest number of events in one request",
           .least = 1,
           .most = 256},
    Option{.name = "secret",
           .kind = Option::TEXT,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "signs each request",
           .most = 4096,
           .instead = "secret_file"},
    Option{.name = "secret_file",
           .kind = Option::PATH,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "the file with the secret; it is read for each request"},
    timeoutOption,
    headersOption,
    headersFileOption,
    caFileOption,
};

constexpr std::array alertmanagerOptions = {
    Option{.name = "url",
           .kind = Option::URL,
           .need = Option::REQUIRED,
           .value = "http://127.0.0.1:9093",
           .meaning = "the Alertmanager's own URL; `/api/v2/alerts` is added"},
    Option{.name = "resolve_after",
           .kind = Option::DURATION,
           .need = Option::OPTIONAL,
           .value = "5m",
           .meaning = "how long after its event an alert ends",
           .least = 1,
           .most = 31'536'000},
    Option{.name = "labels",
           .kind = Option::LABELS,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "labels to add to each alert"},
    Option{.name = "generator_url",
           .kind = Option::URL,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "the link from an alert to its origin"},
    timeoutOption,
    headersOption,
    headersFileOption,
    caFileOption,
};

constexpr std::array<std::string_view, 2> transports = {"tcp", "udp"};

constexpr std::array syslogOptions = {
    Option{.name = "address",
           .kind = Option::ADDRESS,
           .need = Option::REQUIRED,
           .value = "logs.example.com:514",
           .meaning = "host and port of the receiver"},
    Option{.name = "transport",
           .kind = Option::CHOICE,
           .need = Option::OPTIONAL,
           .value = "tcp",
           .meaning = "TCP with octet-counted frames, or UDP datagrams",
           .choices = transports},
    Option{.name = "facility",
           .kind = Option::CHOICE,
           .need = Option::OPTIONAL,
           .value = "daemon",
           .meaning = "the facility of the messages",
           .choices = syslogFacilities},
    Option{.name = "timeout",
           .kind = Option::DURATION,
           .need = Option::OPTIONAL,
           .value = "10s",
           .meaning = "how long the receiver may keep a connection or a write waiting",
           .least = 1,
           .most = 300},
};

constexpr std::array otlpOptions = {
    Option{.name = "url",
           .kind = Option::URL,
           .need = Option::REQUIRED,
           .value = "http://127.0.0.1:4318",
           .meaning = "the receiver's own URL; `/v1/logs` is added"},
    Option{.name = "service_name",
           .kind = Option::TEXT,
           .need = Option::OPTIONAL,
           .value = "zrmagent",
           .meaning = "the resource attribute `service.name`",
           .most = 255},
    Option{.name = "attributes",
           .kind = Option::ATTRIBUTES,
           .need = Option::OPTIONAL,
           .value = "",
           .meaning = "resource attributes to add"},
    timeoutOption,
    headersOption,
    headersFileOption,
    caFileOption,
};

constexpr std::array jsonlOptions = {
    Option{.name = "path",
           .kind = Option::OUTPUT,
           .need = Option::REQUIRED,
           .value = "/var/log/zrm/events.jsonl",
           .meaning = "the file to which events are appended, or \"-\" for standard output"},
};

constexpr std::array<SinkType, typeNames.size()> types = {{
    {"jsonl", "one JSON object per event, one event per line", "path", jsonlOptions},
    {"webhook", "JSON in batches to a URL, by HTTP POST", "url", webhookOptions},
    {"alertmanager", "an alert in an Alertmanager for each event", "url", alertmanagerOptions},
    {"syslog", "syslog messages (RFC 5424) over TCP or UDP", "address", syslogOptions},
    {"otlp", "OpenTelemetry log records over HTTP, in JSON", "url", otlpOptions},
}};

} // namespace

std::span<const SinkOption> SinkTypes::common() noexcept {
    return commonOptions;
}

std::span<const SinkType> SinkTypes::all() noexcept {
    return types;
}

const SinkType* SinkTypes::find(std::string_view name) noexcept {
    const auto found = std::find_if(types.begin(), types.end(),
                                    [&](const SinkType& type) { return type.name == name; });
    return found == types.end() ? nullptr : &*found;
}

} // namespace zrm::host
