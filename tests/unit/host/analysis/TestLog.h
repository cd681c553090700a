#ifndef ZRM_TESTS_ANALYSIS_TEST_LOG_H
#define ZRM_TESTS_ANALYSIS_TEST_LOG_H

#include "logs/RequestThresholds.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"
#include "support/TestValidLog.h"

#include <cstddef>
#include <cstring>
#include <ctime>
#include <string>
#include <utility>
#include <vector>

using namespace zrm;

/// The 16-character time stamp so many seconds behind an arbitrary moment of the past.
inline std::string stampAt(int seconds) {
    const std::time_t time = 1'700'000'000 + seconds;
    std::tm local{};
    localtime_r(&time, &local);
    char text[32];
    std::strftime(text, sizeof text, "1%y%m%d%H%M%S000", &local);
    return text;
}

/// A row of an entry at so many seconds with this description.
inline zrm_rmlogent_data_t rowAt(int seconds, const std::string& description) {
    zrm_rmlogent_data_t row;
    std::memset(&row, ' ', sizeof row);
    row.freqthresh = row.periodthrs = row.sampleno = row.rowno = 0;
    std::memcpy(row.entrytime, stampAt(seconds).data(), sizeof row.entrytime);
    description.copy(row.entrydesc, sizeof row.entrydesc);
    return row;
}

/// A log without a monitor. Its lines are "SECONDS DESCRIPTION"; others do not fit. Reports give
/// the entries that a test states, oldest first here, newest first there.
class TestLog : public LogFile {
public:
    explicit TestLog(const std::string& path, const std::string& fields = "")
        : LogFile(*validLog(path, fields), nullptr) {}

    void* startReportRequest(void* window) override {
        m_window = *static_cast<_RequestThresholds*>(window);
        m_next = entries.size();
        ++reports;
        return canReport ? this : nullptr;
    }
    void* getNextLogEntry(void* row, void*, void*) override {
        while (m_next > 0) {
            const auto& [seconds, description] = entries[--m_next];
            const std::string stamp = stampAt(seconds);
            if (stamp >= m_window.startTime && stamp <= m_window.endTime) {
                *static_cast<zrm_rmlogent_data_t*>(row) = rowAt(seconds, description);
                return row;
            }
        }
        ReportOutcome::note(endsWith);
        return nullptr;
    }
    void endReportRequest(void** report) override {
        *report = nullptr;
        ++ends;
    }
    long formatEntryAsRow(char* line, void* row, void*) override {
        char* description = nullptr;
        const long seconds = std::strtol(line, &description, 10);
        if (description == line) {
            return -1;
        }
        std::string rest = *description == ' ' ? description + 1 : description;
        if (rest.ends_with('\n')) {
            rest.pop_back();
        }
        *line = '\0'; // a log type may change the line
        *static_cast<zrm_rmlogent_data_t*>(row) = rowAt(static_cast<int>(seconds), rest);
        return 0;
    }
    void processLogData() override {}

    const _RequestThresholds& window() const { return m_window; } ///< of the last report

    std::vector<std::pair<int, std::string>> entries;
    bool canReport = true;
    ReportEnd endsWith = ReportEnd::complete; ///< why a report ends
    int reports = 0;
    int ends = 0;

private:
    _RequestThresholds m_window{};
    std::size_t m_next = 0;
};

#endif
