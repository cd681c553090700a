#ifndef ZRM_HOST_QUEUE_STATE_H
#define ZRM_HOST_QUEUE_STATE_H

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace zrm::host {

/// How the queue stands between the log threads and those who take the events.
struct QueueState {
    std::size_t size = 0;               ///< events that somebody has still to take
    std::size_t capacity = 0;           ///< events that find room
    std::uint64_t waits = 0;            ///< times that a log thread had to wait for room
    std::chrono::nanoseconds waited{0}; ///< how long in all
};

} // namespace zrm::host

#endif
