#include "logtypes/AdminLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "monitor/DescriptorReserve.h"

#include <cerrno>
#include <chrono>
#include <cstdint>
#include <optional>

#include <fcntl.h>
#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"AdminLogFile.cpp"};

constexpr std::size_t recordLength = AdminLogFile::recordLength;

/// How long to count the records that the end of the process leaves unread.
constexpr std::chrono::milliseconds countingTime{500};

/// Reads whole records, many per call. The result is the same as reading them one at a
/// time: if a record is incomplete when its turn comes, its available bytes are
/// consumed.
class RecordReader {
public:
    explicit RecordReader(int fd) : m_fd(fd) {}

    /// The next record, valid until the next call, or null at the end.
    char* next() {
        if (m_end - m_begin < recordLength) {
            refill();
        }
        if (m_end - m_begin < recordLength) {
            return nullptr;
        }
        char* const record = m_buffer + m_begin;
        m_begin += recordLength;
        return record;
    }

    /// After the end: 0, the size of an incomplete record in bytes, or -1 for a read error.
    ssize_t outcome() const { return m_failed ? -1 : static_cast<ssize_t>(m_end - m_begin); }

private:
    void refill() {
        // Fewer bytes than one record are left, so source and destination never overlap.
        for (std::size_t i = 0; i < m_end - m_begin; ++i) {
            m_buffer[i] = m_buffer[m_begin + i];
        }
        m_end -= m_begin;
        m_begin = 0;
        const ssize_t count = read(m_fd, m_buffer + m_end, sizeof m_buffer - m_end);
        m_failed = count < 0;
        if (count > 0) {
            m_end += static_cast<std::size_t>(count);
        }
    }

    int m_fd;
    bool m_failed = false;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
    char m_buffer[1024 * recordLength];
};

std::uint64_t countRest(RecordReader& reader) {
    std::uint64_t records = 0;
    const auto limit = std::chrono::steady_clock::now() + countingTime;
    while (reader.next() != nullptr && std::chrono::steady_clock::now() < limit) {
        ++records;
    }
    return records;
}

} // namespace

AdminLogFile::AdminLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

AdminLogFile::AdminLogFile(const ValidLog& log, Unmonitored) : LogFile(log, nullptr) {
    const TraceScope trace(anchor);
}

AdminLogFile::~AdminLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void AdminLogFile::processLogData() {
    TraceScope trace(anchor);
    if (isFollowed()) {
        followLog(recordLength);
        return;
    }
    openAdminLog();
    if (LogFD >= 0) {
        waitForEventLoop({1, 0});
        closeAdminLog();
    }
}

void AdminLogFile::openAdminLog() {
    TraceScope trace(anchor);
    LogFD = DescriptorReserve::openLog(fileNameLocal());
    if (LogFD < 0) {
        const ErrorText error(errno);
        trace.error()("Error opening file %s. errno = %d; %s", fileNameLocal(), error.number(),
                      error.text());
        setMonitorStatus(MONITOR_ERR_OPEN);
        return;
    }
    noteOpenFile();
    LogEOF = lseek(LogFD, 0, SEEK_END);
    if (LogEOF == -1) {
        const ErrorText error(errno);
        trace.error()("Error while seeking EOF for file %s.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        closeAdminLog();
        setMonitorStatus(MONITOR_ERR_SEEK_EOF);
        return;
    }
    guardEnd();
}

void AdminLogFile::closeAdminLog() {
    TraceScope trace(anchor);
    close(LogFD);
    m_ledger.noteFile(std::nullopt);
    LogFD = -1;
    LogEOF = -1;
}

long AdminLogFile::readLog() {
    TraceScope trace(anchor);
    RecordReader reader(LogFD);
    while (char* const record = reader.next()) {
        if (isReadingOver()) {
            return trace.result(0L);
        }
        if (!deliverEntry(record)) {
            notePassedOver(monitorStatus() == MONITOR_RUNNING ? countRest(reader) : 0);
            return trace.result(0L);
        }
    }
    const ErrorText error(errno);
    const ssize_t outcome = reader.outcome();
    if (outcome == 0) {
        return trace.result(0L);
    }
    if (outcome < 0) {
        trace.error()("Error occurred reading file %s.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
    } else {
        trace.error()("Incomplete record read from file %s. Bytes read = %d; bytes expected = %d",
                      fileNameLocal(), static_cast<int>(outcome), static_cast<int>(recordLength));
    }
    return trace.result(-1L);
}

bool AdminLogFile::deliverEntry(char* record) {
    count(NumEvents);
    zrm_rmlogent_data_t* const row = ownRow();
    if (formatEntryAsRow(record, row, nullptr) == 0) {
        if (!offer(row)) {
            return false;
        }
        writeToDebugLog(record, recordLength, row, sizeof *row);
    } else {
        count(NumFormatErrors);
        writeToDebugLog(record, recordLength, nullptr, 0);
    }
    return true;
}

} // namespace zrm
