#ifndef ZRM_HOST_EVENT_PAGE_H
#define ZRM_HOST_EVENT_PAGE_H

#include "host/history/StoredEvent.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace zrm::host {

/// The result of one query of the history.
struct EventPage {
    std::vector<StoredEvent> events; ///< in the filter's order
    /// Ids of corrupted events, which are not among the events.
    std::vector<std::uint64_t> damaged = {};
    /// Set when a text search stopped early: the id of the last event examined.
    std::optional<std::uint64_t> reached = std::nullopt;
};

} // namespace zrm::host

#endif
