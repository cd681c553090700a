#ifndef ZRM_TESTS_TEST_LOGS_H
#define ZRM_TESTS_TEST_LOGS_H

#include "logmgr/LogManager.h"
#include "logs/FollowSettings.h"
#include "logs/RequestThresholds.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/LogFile.h"

#include <memory>
#include <string>
#include <vector>

using namespace zrm;

/// A monitored log without a thread. A test sets its properties and the entries of its reports.
class TestLog : public LogFile {
public:
    /// `name` is both the local and the UTF-8 name.
    explicit TestLog(const std::string& name);

    void setLocalName(const std::string& name);
    void setUTF8Name(const std::string& name);
    void setNoName();
    void setType(char type) { LogType = type; }
    void setFollowed() { LogFollowSettings = std::make_shared<const zrm::FollowSettings>(); }
    void setDebugMode(char mode) { LogDebugMode = mode; }
    void setStatus(_MonitorStatus status, std::time_t changed);
    void setCounts(std::int64_t events, std::int64_t errors);

    void endReportRequest(void** reportState) override;
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    void* startReportRequest(void* thresholds) override;
    long formatEntryAsRow(char*, void*, void*) override { return -1; }
    void processLogData() override {}

    // The entries of a report, and the calls received.
    int entries = 0;                    ///< number of entries; the rows' ROWNO counts them
    bool canReport = true;              ///< false: startReportRequest returns null
    int asked = 0;                      ///< calls of getNextLogEntry
    int starts = 0;                     ///< calls of startReportRequest
    int ends = 0;                       ///< calls of endReportRequest
    _RequestThresholds seen;            ///< those passed to startReportRequest
    std::vector<std::ptrdiff_t> places; ///< offsets of the requested rows from the first one

private:
    int m_given = 0;
    char* m_firstRow = nullptr;
};

/// Replaces the log manager while it lives: publishes one with the logs of a test and records the
/// calls of the tables.
class TestLogs {
public:
    TestLogs();
    ~TestLogs();
    TestLogs(const TestLogs&) = delete;
    TestLogs& operator=(const TestLogs&) = delete;

    TestLog& add(const std::string& name);
    /// Removes the log manager, as if start-up had not created it yet.
    void withdraw();

    std::vector<std::unique_ptr<TestLog>> logs;
    int missing = 0; ///< logs missing from the manager's count
    std::vector<std::string> calls;

private:
    std::unique_ptr<LogManager> m_manager;
};

#endif
