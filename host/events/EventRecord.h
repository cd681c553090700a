#ifndef ZRM_HOST_EVENT_RECORD_H
#define ZRM_HOST_EVENT_RECORD_H

#include <cstdint>
#include <string_view>

namespace zrm::host {

/// One event in the form in which it leaves the process. The texts belong to the provider of the
/// record, which says how long they are valid.
struct EventRecord {
    std::uint64_t id = 0;       ///< increases from event to event
    std::int64_t raised = 0;    ///< milliseconds since 1970-01-01, UTC
    std::string_view situation; ///< its name
    std::string_view severity;  ///< info, minor, warning, major or critical
    std::string_view log;       ///< the monitored log's full path
    std::string_view json;      ///< the event as one JSON object, on one line, without a newline
    std::string_view text = {}; ///< the situation's description for people; may be empty
};

} // namespace zrm::host

#endif
