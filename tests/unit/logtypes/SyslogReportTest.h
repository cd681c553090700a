#ifndef ZRM_TESTS_SYSLOG_REPORT_TEST_H
#define ZRM_TESTS_SYSLOG_REPORT_TEST_H

#include "SyslogTest.h"

#include "logs/RequestThresholds.h"

#include <cstring>
#include <string>
#include <vector>

using namespace zrm;

inline constexpr const char* farPast = "0000000000000000";
inline constexpr const char* farFuture = "9999999999999999";

/// A report's time window.
inline _RequestThresholds window(const char* start, const char* end) {
    _RequestThresholds thresholds{};
    std::memcpy(thresholds.startTime, start, 16);
    std::memcpy(thresholds.endTime, end, 16);
    return thresholds;
}

/// Reports over a syslog file whose content a test states.
class SyslogReport : public SyslogTest {
protected:
    ~SyslogReport() override { m_log->endReportRequest(&m_state); }

    void start() {
        m_state = m_log->startReportRequest(nullptr);
        ASSERT_NE(m_state, nullptr);
    }
    bool next() {
        std::memset(&m_row, '#', sizeof m_row);
        void* const given = m_log->getNextLogEntry(&m_row, m_state, &m_window);
        EXPECT_TRUE(given == nullptr || given == &m_row);
        return given != nullptr;
    }
    /// The descriptions of a complete report on the current content of the log.
    std::vector<std::string> report(const char* from = farPast, const char* to = farFuture) {
        m_window = window(from, to);
        std::vector<std::string> descriptions;
        m_state = m_log->startReportRequest(nullptr);
        if (m_state == nullptr) {
            return descriptions;
        }
        while (next()) {
            descriptions.push_back(columnText(m_row.entrydesc));
        }
        m_log->endReportRequest(&m_state);
        EXPECT_EQ(m_state, nullptr);
        return descriptions;
    }
    /// The times of a complete report.
    std::vector<std::string> times(const std::string& content) {
        m_directory.write("messages", content);
        m_window = window(farPast, farFuture);
        std::vector<std::string> stamps;
        start();
        while (next()) {
            stamps.push_back(columnText(m_row.entrytime));
        }
        return stamps;
    }

    void* m_state = nullptr;
    _RequestThresholds m_window = window(farPast, farFuture);
    zrm_rmlogent_data_t m_row;
};

#endif
