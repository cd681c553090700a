#ifndef ZRM_HOST_PULSE_REGISTRY_H
#define ZRM_HOST_PULSE_REGISTRY_H

#include "framework/Pulse.h"

#include <chrono>
#include <string>
#include <vector>

namespace zrm::host {

/// The pulses of the agent's threads, as the host sees them. Any thread; holds its lock for
/// moments.
class PulseRegistry {
public:
    using Clock = std::chrono::steady_clock;

    /// A thread that works.
    struct Working {
        std::string subject;           ///< what it serves: a log's path, or the log manager
        std::string doing;             ///< "reads the log"
        std::chrono::seconds standing; ///< since it was last seen to move
    };

    /// Looks at every pulse and returns the threads that are at work.
    static std::vector<Working> look(Clock::time_point now = Clock::now());

    /// Waits until every thread rests, at most until the limit; false when the time is up.
    static bool waitUntilAllRest(Clock::time_point limit);
};

} // namespace zrm::host

#endif
