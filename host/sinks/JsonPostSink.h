#ifndef ZRM_HOST_JSON_POST_SINK_H
#define ZRM_HOST_JSON_POST_SINK_H

#include "host/sinks/HttpPost.h"
#include "host/sinks/Sink.h"

#include <cstddef>
#include <span>
#include <stop_token>
#include <string>
#include <string_view>

namespace zrm::host {

/// A sink that posts each delivery as one JSON body, accepted as a whole or not at all. The derived
/// class provides the body. Used by one thread.
class JsonPostSink : public Sink {
public:
    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_http.error(); }

protected:
    /// `path` is appended to the configured URL.
    JsonPostSink(const SinkConfig& config, std::string_view path);

    /// The body for these events.
    virtual std::string bodyOf(std::span<const EventRecord> events) const = 0;

    /// Called with the receiver's answer after it has accepted this many events.
    virtual void taken(std::size_t events, const std::string& answer) const;

private:
    const std::string m_name;
    HttpPost m_http;
};

} // namespace zrm::host

#endif
