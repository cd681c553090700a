#ifndef ZRM_HOST_SINK_H
#define ZRM_HOST_SINK_H

#include "host/events/Event.h"

#include <chrono>
#include <cstddef>
#include <optional>
#include <span>
#include <stop_token>
#include <string>

namespace zrm::host {

/// A destination for events. Used by one thread.
class Sink {
public:
    virtual ~Sink() = default;

    /// The sink's name in messages.
    virtual std::string name() const = 0;

    /// Delivers events in order and returns how many were delivered. Fewer than all is a failure,
    /// explained by error(); the caller retries from the first event that was not delivered. May
    /// wait for the receiver, but stops waiting when `giveUp` is requested.
    virtual std::size_t deliver(std::span<const EventRecord> events,
                                const std::stop_token& giveUp) = 0;

    /// Since when a delivery has been waiting for a receiver that accepts nothing; none if it is
    /// not. Any thread.
    virtual std::optional<std::chrono::steady_clock::time_point> waitsSince() const {
        return std::nullopt;
    }

    /// Why the last delivery failed.
    virtual std::string error() const = 0;
};

} // namespace zrm::host

#endif
