#include "monitor/MonitorStatus.h"

#include <iterator>

namespace zrm {

namespace {

// From the lowest to the highest value, without gaps.
constexpr const char* statusTexts[] = {
    "Error: insufficient memory",
    "Error: format command",
    "Error: wait loop failed",
    "Error: log rewind failed",
    "Error: reset EOF failed",
    "Error: log open failed",
    "Error: seek for EOF failed",
    "Error: log read failed",
    "Error: wait for event failed",
    "Error: pipe FD to FP failed",
    "Error: set pipe flag failed",
    "Error: get pipe flag failed",
    "Error: create pipe failed",
    "Error: create child failed",
    "Not started",
    "Stopped",
    "Running",
};
static_assert(std::size(statusTexts) == MONITOR_RUNNING - MONITOR_ERR_NO_MEMORY + 1);

} // namespace

const char* monitorStatusText(_MonitorStatus status) noexcept {
    if (status < MONITOR_ERR_NO_MEMORY || status > MONITOR_RUNNING) {
        return "Error: unknown";
    }
    return statusTexts[status - MONITOR_ERR_NO_MEMORY];
}

} // namespace zrm
