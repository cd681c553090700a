#ifndef ZRM_HOST_EVENT_PAGE_H
#define ZRM_HOST_EVENT_PAGE_H

#include "host/history/StoredEvent.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace zrm::host {

/// What one query of the history found.
struct EventPage {
    std::vector<StoredEvent> events; ///< in the filter's order
    /// Ids of events whose stored form is not what was written: they are not among the events.
    std::vector<std::uint64_t> damaged = {};
    /// Set when the search for a text stopped before its end: the id of the last event looked at.
    std::optional<std::uint64_t> reached = std::nullopt;
};

} // namespace zrm::host

#endif
