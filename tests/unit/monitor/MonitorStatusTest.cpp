#include "monitor/MonitorStatus.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>

using namespace zrm;

namespace {

TEST(MonitorStatus, EveryValueHasItsText) {
    const std::pair<_MonitorStatus, const char*> expected[] = {
        {MONITOR_RUNNING, "Running"},
        {MONITOR_STOPPED, "Stopped"},
        {MONITOR_NOT_STARTED, "Not started"},
        {MONITOR_ERR_CREATE_CHILD, "Error: create child failed"},
        {MONITOR_ERR_CREATE_PIPE, "Error: create pipe failed"},
        {MONITOR_ERR_GET_PIPE_FLAG, "Error: get pipe flag failed"},
        {MONITOR_ERR_SET_PIPE_FLAG, "Error: set pipe flag failed"},
        {MONITOR_ERR_PIPE_FDOPEN, "Error: pipe FD to FP failed"},
        {MONITOR_ERR_WAIT_EVENT, "Error: wait for event failed"},
        {MONITOR_ERR_READ, "Error: log read failed"},
        {MONITOR_ERR_SEEK_EOF, "Error: seek for EOF failed"},
        {MONITOR_ERR_OPEN, "Error: log open failed"},
        {MONITOR_ERR_RESET_EOF, "Error: reset EOF failed"},
        {MONITOR_ERR_REWIND, "Error: log rewind failed"},
        {MONITOR_ERR_WAIT_LOOP, "Error: wait loop failed"},
        {MONITOR_ERR_FORMAT, "Error: format command"},
        {MONITOR_ERR_NO_MEMORY, "Error: insufficient memory"},
    };
    for (const auto& [status, text] : expected) {
        EXPECT_STREQ(monitorStatusText(status), text) << "status " << status;
    }
}

TEST(MonitorStatus, ValuesOutsideTheTableAreUnknown) {
    for (const int value : {3, -15, 1000000, -1000000}) {
        EXPECT_STREQ(monitorStatusText(static_cast<_MonitorStatus>(value)), "Error: unknown");
    }
}

} // namespace
