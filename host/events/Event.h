#ifndef ZRM_HOST_EVENT_H
#define ZRM_HOST_EVENT_H

#include "framework/LogPositions.h"
#include "host/events/SituationLabel.h"

#include <cstdint>
#include <memory>

namespace zrm::host {

class FollowedLog;

/// One event in the queue.
struct Event {
    std::uint64_t id = 0;    ///< counted from 1 in the order of arrival
    std::int64_t raised = 0; ///< milliseconds since 1970-01-01, UTC
    std::shared_ptr<const SituationLabel> situation;
    const char* row = nullptr;        ///< the row's bytes, owned by the queue
    bool endsEntry = true;            ///< false: its entry has raised the next event, too
    std::shared_ptr<FollowedLog> log; ///< with the last event of an entry of a followed log
    LogPosition behind;               ///< where the log's next entry begins
};

} // namespace zrm::host

#endif
