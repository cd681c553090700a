#ifndef ZRM_HOST_WEBHOOK_SINK_H
#define ZRM_HOST_WEBHOOK_SINK_H

#include "host/sinks/HttpPost.h"
#include "host/sinks/Sink.h"

#include <cstddef>
#include <optional>
#include <span>
#include <stop_token>
#include <string>
#include <string_view>

namespace zrm::host {

/// Signs texts with a shared secret (RFC 2104 with SHA-256). Stateless.
class HmacSha256 {
public:
    /// The signature of a text as 64 lower-case hexadecimal digits.
    static std::string hex(std::string_view secret, std::string_view text);
};

/// Posts events as {"events": [...]} to a URL, signed when there is a secret. A failed request is
/// repeated unchanged, so that the receiver can recognise a duplicate.
class WebhookSink : public Sink {
public:
    explicit WebhookSink(const SinkConfig& config);

    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_error; }

private:
    bool post(std::span<const EventRecord> events, const std::stop_token& giveUp);
    bool sign(const std::string& body, HttpPost::Headers& headers);

    const std::string m_name;
    const std::size_t m_batch;
    const std::string m_secret;
    const std::string m_secretFile;
    HttpPost m_http;
    std::size_t m_again = 0; ///< number of events of the failed request to be repeated
    std::string m_error;
};

} // namespace zrm::host

#endif
