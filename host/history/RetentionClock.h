#ifndef ZRM_HOST_RETENTION_CLOCK_H
#define ZRM_HOST_RETENTION_CLOCK_H

#include <chrono>
#include <cstdint>
#include <optional>

namespace zrm::host {

/// The time of day by which events expire. A clock that leaps ahead would expire everything at
/// once, so a leap is believed only when it has lasted for an hour. One thread.
class RetentionClock {
public:
    using Clock = std::chrono::steady_clock;

    /// The time to go by, in milliseconds since 1970, given the time of day and a clock that never
    /// leaps.
    std::int64_t now(std::int64_t wall, Clock::time_point steady);

private:
    std::optional<std::int64_t> m_wall;         ///< when last believed
    Clock::time_point m_steady;                 ///< at that moment
    std::optional<Clock::time_point> m_leaptAt; ///< when the leap under way was first seen
};

} // namespace zrm::host

#endif
