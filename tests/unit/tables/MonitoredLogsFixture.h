#ifndef ZRM_TESTS_MONITORED_LOGS_FIXTURE_H
#define ZRM_TESTS_MONITORED_LOGS_FIXTURE_H

#include "tables/zrm_rmmonlog_agent.h"
#include "tables/zrm_rmmonlog_manager.h"

#include "base/ProcessValues.h"

#include "TestLogs.h"
#include "TestRequest.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

inline constexpr long now = 1'800'000'000;

inline std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(width - text.size(), ' ');
}

template <std::size_t width> std::string text(const char (&column)[width]) {
    return std::string(column, width);
}

/// A request on Monitored Logs, and the logs that it shows.
class MonitoredLogs : public testing::Test {
protected:
    MonitoredLogs() {
        std::memcpy(m_systemName, "web1:ZRM", sizeof "web1:ZRM");
        gSystemName = m_systemName;
    }
    ~MonitoredLogs() override { gSystemName = nullptr; }

    void open() { m_request.reset(m_manager.CreateCtreq(&m_test, nullptr)); }
    /// Takes one sample and returns its messages.
    std::vector<std::string> sample(unsigned traceClass) {
        if (!m_request) {
            open();
        }
        RecordingTrace trace(traceClass);
        m_request->TakeSample();
        return trace.messages();
    }
    zrm_rmmonlog_data_t row(unsigned index) const {
        zrm_rmmonlog_data_t copy{};
        EXPECT_LT(index, m_request->count);
        std::memcpy(&copy, m_request->rows() + std::size_t{index} * sizeof copy, sizeof copy);
        return copy;
    }

    TimeZone m_zone{"UTC0"};
    FakeClock m_clock{now};
    TemporaryDirectory m_directory;
    char m_systemName[65];
    TestLogs m_logs;
    zrm_rmmonlog_manager m_manager{"ZRM", "RMMONLOG"};
    TestRequest m_test{SAMPLE_REPORT, "report"};
    std::unique_ptr<ctreq> m_request;
};

#endif
