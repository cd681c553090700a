#ifndef ZRM_TESTS_USER_LOG_TEST_H
#define ZRM_TESTS_USER_LOG_TEST_H

#include "logtypes/UserLogFile.h"

#include "base/ProcessValues.h"
#include "logs/RequestThresholds.h"
#include "logtypes/EntryTime.h"
#include "support/EventRecorder.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TestValidLog.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

using namespace zrm;

/// Names the protected members of user logs, for pointers to them.
class UserLogMembers : public UserLogFile {
public:
    using UserLogFile::formatEntryTime;
    using UserLogFile::LogFD;
    using UserLogFile::LogFileP;
    using UserLogFile::NumericMonth;
    using UserLogFile::OptimumBlockSize;
    using UserLogFile::SPAnchor;
};

/// A user log whose monitor has learned the format, could not open the file, and has ended. A test
/// has the object to itself and need not wait for a check of the file. The time is 5 October 2006,
/// 12:34:56 UTC.
class UserLogTest : public testing::Test {
protected:
    static constexpr std::time_t now = 1160051696;
    static constexpr char wholeLine[] = R"(A,"%255[^\n]",description)";

    UserLogTest() {
        LocaleDouble::reset();
        EventRecorder::clear();
        gSystemName = m_systemName;
    }
    ~UserLogTest() override { gSystemName = nullptr; }

    /// Creates the log again with this format.
    void makeLog(const std::string& format) { makeLogOfLine(" ;N ;U ;" + format); }
    /// Creates it from the fields of a configuration line after the file name.
    void makeLogOfLine(const std::string& fields) {
        m_log.reset();
        m_line = validLog(m_path, fields);
        const Fault fault("open", EACCES);
        m_log = std::make_unique<UserLogFile>(*m_line, nullptr);
        waitForEnd(*m_log);
    }
    static void waitForEnd(const UserLogFile& log) {
        while (log.monitorStatus() == MONITOR_RUNNING) {
            std::this_thread::yield();
        }
    }
    void write(std::string_view text) { m_directory.write("app.log", text); }

    /// The row of a line. Sets `result` to that of the formatting.
    zrm_rmlogent_data_t format(std::string line, long& result) {
        zrm_rmlogent_data_t row{};
        result = m_log->formatEntryAsRow(line.data(), &row, nullptr);
        return row;
    }
    /// The time stamp of a line, or "failed" if it has no row.
    std::string timeOf(const std::string& line) {
        long result = 0;
        const zrm_rmlogent_data_t row = format(line, result);
        return result == 0 ? std::string(row.entrytime, sizeof row.entrytime) : "failed";
    }
    /// The time stamp of these texts.
    std::string timeOf(_EntryTimeBuffers texts, void* context = nullptr) {
        char stamp[16];
        const long result = ((*m_log).*(&UserLogMembers::formatEntryTime))(stamp, &texts, context);
        return result == 0 ? std::string(stamp, sizeof stamp) : "failed";
    }
    bool& numericMonth() { return (*m_log).*(&UserLogMembers::NumericMonth); }

    static _RequestThresholds window(const char* start, const char* end) {
        _RequestThresholds thresholds{};
        std::snprintf(thresholds.startTime, sizeof thresholds.startTime, "%s", start);
        std::snprintf(thresholds.endTime, sizeof thresholds.endTime, "%s", end);
        return thresholds;
    }
    /// The rows of a report on all times or on a window.
    std::vector<zrm_rmlogent_data_t> report(const char* start = "0700101000000000",
                                            const char* end = "1991231235959000") {
        std::vector<zrm_rmlogent_data_t> rows;
        _RequestThresholds thresholds = window(start, end);
        void* state = m_log->startReportRequest(&thresholds);
        if (state != nullptr) {
            zrm_rmlogent_data_t row;
            while (m_log->getNextLogEntry(&row, state, &thresholds) != nullptr) {
                rows.push_back(row);
            }
            m_log->endReportRequest(&state);
            EXPECT_EQ(state, nullptr);
        }
        return rows;
    }

    TimeZone m_zone{"UTC0"};
    FakeClock m_clock{now};
    char m_systemName[65] = "web1:ZRM";
    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "");
    std::unique_ptr<ValidLog> m_line;
    std::unique_ptr<UserLogFile> m_log;
};

#endif
