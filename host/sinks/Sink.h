#ifndef ZRM_HOST_SINK_H
#define ZRM_HOST_SINK_H

#include "host/events/EventRecord.h"

#include <chrono>
#include <cstddef>
#include <optional>
#include <span>
#include <stop_token>
#include <string>

namespace zrm::host {

/// A place to which events are delivered. Used by one thread.
class Sink {
public:
    virtual ~Sink() = default;

    /// How the sink is called in messages.
    virtual std::string name() const = 0;

    /// Delivers events in order and returns how many were delivered; fewer than all is a failure
    /// that error() explains, and the caller offers the rest again, beginning with the first that
    /// was not delivered. May wait for the receiver; ends a wait when `giveUp` is requested.
    virtual std::size_t deliver(std::span<const EventRecord> events,
                                const std::stop_token& giveUp) = 0;

    /// Since when a delivery waits for a receiver that takes nothing; none when it does not. Any
    /// thread.
    virtual std::optional<std::chrono::steady_clock::time_point> waitsSince() const {
        return std::nullopt;
    }

    /// Why the last delivery failed.
    virtual std::string error() const = 0;
};

} // namespace zrm::host

#endif
