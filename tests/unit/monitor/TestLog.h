#ifndef ZRM_TESTS_TEST_LOG_H
#define ZRM_TESTS_TEST_LOG_H

#include "monitor/LogFile.h"

#include "support/EventRecorder.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TestValidLog.h"

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <string>
#include <vector>

using namespace zrm;

/// A log type for tests. It rejects lines that begin with "bad"; any other line becomes the
/// description of its row. Its thread polls every millisecond. The operations for log types are
/// public, so that a test can also call them on its own thread.
class TestLog : public LogFile {
public:
    explicit TestLog(const ValidLog& log, LogFile* chainHead = nullptr) : LogFile(log, chainHead) {}
    using LogFile::operator=;
    ~TestLog() override { stopThread(); }

    void endReportRequest(void** /*reportState*/) override {}
    void* getNextLogEntry(void* /*row*/, void* /*state*/, void* /*thresholds*/) override {
        return nullptr;
    }
    void* startReportRequest(void* /*thresholds*/) override { return nullptr; }
    long formatEntryAsRow(char* entry, void* row, void* context) override;
    void processLogData() override;
    long readLog() override;

    using LogFile::closeLog;
    using LogFile::closeLogForReport;
    using LogFile::determineOptimumBlockSize;
    using LogFile::fillCommonColumns;
    using LogFile::fillReportBuffer;
    using LogFile::lockDebugFile;
    using LogFile::lockLog;
    using LogFile::openLogAndSeek;
    using LogFile::openLogForReport;
    using LogFile::ownRow;
    using LogFile::unlockDebugFile;
    using LogFile::unlockLog;
    using LogFile::waitForEventLoop;
    using LogFile::writeToDebugLog;

    /// Runs the wait loop on the calling thread until something ends it.
    void follow();
    std::int64_t eof() const { return LogEOF; }
    int fd() const { return LogFD; }
    /// What reads the log; null while it is closed.
    const LineReader* reader() const { return LogFileP; }
    pthread_mutex_t& lock() const { return LogLock; }
    std::int64_t blockSize() const { return OptimumBlockSize; }
    void setBlockSize(std::int64_t size) { OptimumBlockSize = size; }
    void setType(char type) { LogType = type; }
    std::string statusText() const;

    std::function<void(const std::string&)>
        onLine;                         ///< called with every line, on the reading thread
    std::function<void()> afterReading; ///< called after each pass of reading
    std::vector<std::string> lines;     ///< all lines read so far
    std::atomic<bool> closes{true};     ///< false: the log stays open at the end
};

/// A directory with one log file, "messages", empty at first.
class MonitoredFile : public testing::Test {
protected:
    MonitoredFile();
    ~MonitoredFile() override;
    void append(std::string_view text) { m_directory.append("messages", text); }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("messages", "");
    std::unique_ptr<ValidLog> m_line = validLog(m_path);
};

/// Waits until the condition holds; false after ten seconds.
bool waitUntil(const std::function<bool()>& condition);

/// The text as a regular expression that matches it alone.
std::string exactly(const std::string& text);

#endif
