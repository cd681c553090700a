#ifndef ZRM_HOST_WALL_CLOCK_H
#define ZRM_HOST_WALL_CLOCK_H

#include <chrono>
#include <cstdint>

namespace zrm::host {

/// The wall-clock time in the form in which the host stores it.
namespace WallClock {

/// Milliseconds since 1970-01-01, UTC.
inline std::int64_t now() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(
               std::chrono::system_clock::now().time_since_epoch())
        .count();
}

} // namespace WallClock

} // namespace zrm::host

#endif
