#ifndef ZRM_HOST_QUEUE_STATE_H
#define ZRM_HOST_QUEUE_STATE_H

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace zrm::host {

/// The state of the queue between the log threads and its readers.
struct QueueState {
    std::size_t size = 0;               ///< events that some reader has not yet taken
    std::size_t capacity = 0;           ///< events that fit
    std::uint64_t waits = 0;            ///< how often a log thread had to wait for room
    std::chrono::nanoseconds waited{0}; ///< total time of these waits
};

} // namespace zrm::host

#endif
