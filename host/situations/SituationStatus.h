#ifndef ZRM_HOST_SITUATION_STATUS_H
#define ZRM_HOST_SITUATION_STATUS_H

#include "host/config/HostConfig.h"

#include <cstdint>
#include <string>

namespace zrm::host {

/// A snapshot of a situation's state.
struct SituationStatus {
    enum Source { FILE, API };
    enum State { RUNNING, STOPPED, FAILED };

    SituationConfig config;
    Source source = FILE;
    State state = RUNNING;
    std::string problem; ///< empty: none

    std::uint64_t offered = 0;   ///< entries offered to it
    std::uint64_t matched = 0;   ///< of these, those that met every condition
    std::uint64_t discarded = 0; ///< of these, those that the thresholds refused
    std::uint64_t raised = 0;
    std::int64_t lastRaised = 0; ///< milliseconds since 1970, UTC; 0: never
};

} // namespace zrm::host

#endif
