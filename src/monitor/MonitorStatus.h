#ifndef ZRM_MONITOR_STATUS_H
#define ZRM_MONITOR_STATUS_H

#include <cstdint>

namespace zrm {

/// The state of a log's monitor. The monitoring loop continues only in MONITOR_RUNNING. Negative
/// values are errors.
enum _MonitorStatus : std::int32_t {
    MONITOR_RUNNING = 2,
    MONITOR_STOPPED = 1,
    MONITOR_NOT_STARTED = 0,
    MONITOR_ERR_CREATE_CHILD = -1,
    MONITOR_ERR_CREATE_PIPE = -2,
    MONITOR_ERR_GET_PIPE_FLAG = -3,
    MONITOR_ERR_SET_PIPE_FLAG = -4,
    MONITOR_ERR_PIPE_FDOPEN = -5,
    MONITOR_ERR_WAIT_EVENT = -6,
    MONITOR_ERR_READ = -7,
    MONITOR_ERR_SEEK_EOF = -8,
    MONITOR_ERR_OPEN = -9,
    MONITOR_ERR_RESET_EOF = -10,
    MONITOR_ERR_REWIND = -11,
    MONITOR_ERR_WAIT_LOOP = -12,
    MONITOR_ERR_FORMAT = -13,
    MONITOR_ERR_NO_MEMORY = -14,
};

/// The display text of the status; "Error: unknown" for any other value.
const char* monitorStatusText(_MonitorStatus status) noexcept;

} // namespace zrm

#endif
