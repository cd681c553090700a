#include "host/sinks/WebhookSink.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/sinks/SecretFile.h"

#include <algorithm>
#include <array>
#include <utility>

#include <openssl/evp.h>
#include <openssl/hmac.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"WebhookSink.cpp"};

} // namespace

std::string HmacSha256::hex(std::string_view secret, std::string_view text) {
    constexpr char digits[] = "0123456789abcdef";
    std::array<unsigned char, EVP_MAX_MD_SIZE> signature{};
    unsigned length = 0;
    HMAC(EVP_sha256(), secret.data(), static_cast<int>(secret.size()),
         reinterpret_cast<const unsigned char*>(text.data()), text.size(), signature.data(),
         &length);
    std::string hex;
    for (unsigned at = 0; at < length; ++at) {
        hex += digits[signature[at] >> 4];
        hex += digits[signature[at] & 15];
    }
    return hex;
}

namespace {

std::string bodyOf(std::span<const EventRecord> events) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("events").beginArray();
        for (const EventRecord& event : events) {
            json.raw(event.json);
        }
        json.endArray().endObject();
    });
}

/// Distinguishes a request from all others of this agent. Event ids alone would not: without a
/// history they start over at every start.
std::string keyOf(std::span<const EventRecord> events) {
    return std::to_string(events.front().id) + '-' + std::to_string(events.back().id) + '-' +
           std::to_string(events.front().raised);
}

} // namespace

WebhookSink::WebhookSink(const SinkConfig& config)
    : m_name(config.name), m_batch(static_cast<std::size_t>(config.number("batch"))),
      m_secret(config.text("secret")), m_secretFile(config.text("secret_file")),
      m_http(config, "") {}

bool WebhookSink::sign(const std::string& body, HttpPost::Headers& headers) {
    std::string secret = m_secret;
    if (!m_secretFile.empty()) {
        // Reread each time, so that a secret can be changed while the agent runs.
        Result<std::string> text = SecretFile::read(m_secretFile);
        if (!text) {
            m_error = text.error().text();
            return false;
        }
        secret = std::move(*text);
    }
    if (!secret.empty()) {
        headers.emplace("X-Zrm-Signature", "sha256=" + HmacSha256::hex(secret, body));
    }
    return true;
}

bool WebhookSink::post(std::span<const EventRecord> events, const std::stop_token& giveUp) {
    const std::string body = bodyOf(events);
    HttpPost::Headers headers = {{"Idempotency-Key", keyOf(events)}};
    if (!sign(body, headers)) {
        return false;
    }
    if (!m_http.send(body, headers, giveUp)) {
        m_error = m_http.error();
        return false;
    }
    return true;
}

std::size_t WebhookSink::deliver(std::span<const EventRecord> events,
                                 const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    std::size_t delivered = 0;
    while (delivered < events.size()) {
        const std::size_t most = m_again == 0 ? m_batch : m_again;
        const auto batch = events.subspan(delivered, std::min(most, events.size() - delivered));
        m_again = post(batch, giveUp) ? 0 : batch.size();
        if (m_again != 0) {
            break;
        }
        delivered += batch.size();
    }
    return trace.result(delivered);
}

} // namespace zrm::host
