#ifndef ZRM_HOST_EVENT_SOURCE_H
#define ZRM_HOST_EVENT_SOURCE_H

#include "host/events/EventRecord.h"

#include <cstddef>
#include <cstdint>
#include <span>

namespace zrm::host {

/// Where one sink's events come from, in order and with a place that is the sink's own. read and
/// release are called by the sink's thread, the others by any.
class EventSource {
public:
    virtual ~EventSource() = default;

    /// Waits for events and gives the oldest that were not released, at most `most`. They stay as
    /// they are until the next read. Empty only after end, when everything has been released.
    virtual std::span<const EventRecord> read(std::size_t most) = 0;

    /// Moves the place past the oldest `count` events of the last read.
    virtual void release(std::size_t count) = 0;

    /// Number of events that were not released.
    virtual std::uint64_t backlog() const = 0;

    /// Nobody adds events any more: a read gives what is left, and does not wait.
    virtual void end() = 0;
};

} // namespace zrm::host

#endif
