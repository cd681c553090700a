#ifndef ZRM_TESTS_TEST_LOGS_H
#define ZRM_TESTS_TEST_LOGS_H

#include "logmgr/LogManager.h"
#include "logs/RequestThresholds.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/LogFile.h"

#include <memory>
#include <string>
#include <vector>

using namespace zrm;

/// A monitored log without a thread, whose every property and report entry a test states.
class TestLog : public LogFile {
public:
    /// `name` is both the local and the UTF-8 name.
    explicit TestLog(const std::string& name);

    void setLocalName(const std::string& name);
    void setUTF8Name(const std::string& name);
    void setNoName();
    void setType(char type) { LogType = type; }
    void setDebugMode(char mode) { LogDebugMode = mode; }
    void setStatus(_MonitorStatus status, std::time_t changed);
    void setCounts(std::int64_t events, std::int64_t errors);

    void endReportRequest(void** reportState) override;
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    void* startReportRequest(void* thresholds) override;
    long formatEntryAsRow(char*, void*, void*) override { return -1; }
    void processLogData() override {}

    // A report's entries, and what was asked for.
    int entries = 0;         ///< the log's number of entries; each row's ROWNO counts them
    bool canReport = true;   ///< else startReportRequest gives null
    int asked = 0;           ///< calls of getNextLogEntry
    int starts = 0;          ///< calls of startReportRequest
    int ends = 0;            ///< calls of endReportRequest
    _RequestThresholds seen; ///< as startReportRequest was given them
    std::vector<std::ptrdiff_t> places; ///< bytes from the first row asked for to each further one

private:
    int m_given = 0;
    char* m_firstRow = nullptr;
};

/// Stands in for the log manager while it lives: publishes one whose logs a test states, and
/// records what the tables ask of it.
class TestLogs {
public:
    TestLogs();
    ~TestLogs();
    TestLogs(const TestLogs&) = delete;
    TestLogs& operator=(const TestLogs&) = delete;

    TestLog& add(const std::string& name);
    /// Takes the log manager away, as before start-up created it.
    void withdraw();

    std::vector<std::unique_ptr<TestLog>> logs;
    int missing = 0; ///< logs that the manager's own count leaves out
    std::vector<std::string> calls;

private:
    std::unique_ptr<LogManager> m_manager;
};

#endif
