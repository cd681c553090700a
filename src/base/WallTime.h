#ifndef ZRM_WALL_TIME_H
#define ZRM_WALL_TIME_H

#include <ctime>

namespace zrm {

/// The time since the epoch by the clock that can be set. Any thread.
inline std::timespec wallTime() noexcept {
    std::timespec time{};
    clock_gettime(CLOCK_REALTIME, &time);
    return time;
}

} // namespace zrm

#endif
