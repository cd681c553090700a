#ifndef ZRM_HOST_STORED_EVENT_H
#define ZRM_HOST_STORED_EVENT_H

#include <cstdint>
#include <string>

namespace zrm::host {

/// One event as returned by the history to a reader, which owns the texts.
struct StoredEvent {
    std::uint64_t id = 0;
    std::int64_t raised = 0; ///< milliseconds since 1970-01-01, UTC
    std::string situation;   ///< its name
    std::string severity;    ///< info, minor, warning, major or critical
    std::string log;         ///< the monitored log's whole path
    std::string json;        ///< the event as one JSON object, on one line, without a newline
    bool operator==(const StoredEvent&) const = default;
};

} // namespace zrm::host

#endif
