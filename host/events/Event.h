#ifndef ZRM_HOST_EVENT_H
#define ZRM_HOST_EVENT_H

#include "host/events/SituationLabel.h"

#include <cstdint>
#include <memory>

namespace zrm::host {

/// One event in the queue.
struct Event {
    std::uint64_t id = 0;    ///< counted from 1 in the order of arrival
    std::int64_t raised = 0; ///< milliseconds since 1970-01-01, UTC
    std::shared_ptr<const SituationLabel> situation;
    const char* row = nullptr; ///< the row's bytes, owned by the queue
};

} // namespace zrm::host

#endif
