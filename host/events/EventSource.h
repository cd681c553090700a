#ifndef ZRM_HOST_EVENT_SOURCE_H
#define ZRM_HOST_EVENT_SOURCE_H

#include "host/events/Event.h"

#include <cstddef>
#include <cstdint>
#include <span>

namespace zrm::host {

/// The source of one sink's events, in order and with a position of its own. read and release are
/// called by the sink's thread, the rest by any.
class EventSource {
public:
    virtual ~EventSource() = default;

    /// Waits for events and returns the oldest unreleased ones, at most `most`. They stay unchanged
    /// until the next read. Empty only after end, when everything has been released.
    virtual std::span<const EventRecord> read(std::size_t most) = 0;

    /// Moves the position past the oldest `count` events of the last read.
    virtual void release(std::size_t count) = 0;

    /// Number of unreleased events.
    virtual std::uint64_t backlog() const = 0;

    /// No more events are added: a read returns what is left and does not wait.
    virtual void end() = 0;
};

} // namespace zrm::host

#endif
