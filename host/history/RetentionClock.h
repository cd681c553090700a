#ifndef ZRM_HOST_RETENTION_CLOCK_H
#define ZRM_HOST_RETENTION_CLOCK_H

#include <chrono>
#include <cstdint>
#include <optional>

namespace zrm::host {

/// The wall-clock time by which events expire. A clock that jumps ahead would expire everything at
/// once, so a jump is accepted only after it has lasted for an hour. Used by one thread.
class RetentionClock {
public:
    using Clock = std::chrono::steady_clock;

    /// The time to use, in milliseconds since 1970, given the wall-clock time and a clock that
    /// never jumps.
    std::int64_t now(std::int64_t wall, Clock::time_point steady);

private:
    std::optional<std::int64_t> m_wall;         ///< when last accepted
    Clock::time_point m_steady;                 ///< at that moment
    std::optional<Clock::time_point> m_leaptAt; ///< when the current jump was first seen
};

} // namespace zrm::host

#endif
