#include "TestLog.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <chrono>
#include <filesystem>
#include <thread>

#include <fcntl.h>
#include <sys/stat.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

/// Opens the log and runs the wait loop on the test's own thread. `onLine` ends the loop by setting
/// a status, or a fault does.
class Tail : public MonitoredFile {
protected:
    void open() {
        m_log.openLogAndSeek();
        ASSERT_NE(m_log.reader(), nullptr);
    }
    ~Tail() override {
        if (m_log.reader() != nullptr) {
            m_log.closeLog();
        }
    }
    /// Ends the loop once this many lines have been read.
    void stopAfter(std::size_t count) {
        m_log.onLine = [this, count](const std::string&) {
            if (m_log.lines.size() >= count) {
                m_log.setMonitorStatus(MONITOR_STOPPED);
            }
        };
    }
    /// Follows the log while one call fails. Expects this message alone, and the status.
    void expectEnd(const char* call, int skip, const std::string& message, _MonitorStatus status) {
        RecordingTrace trace(TRC1_ERROR);
        const Fault fault(call, EIO, {.skip = skip});
        m_log.follow();
        EXPECT_THAT(trace.messages(), ElementsAre(message));
        EXPECT_EQ(m_log.monitorStatus(), status);
    }

    TestLog m_log{*m_line};
};

TEST_F(Tail, OpensAtTheCurrentEnd) {
    append("before\n");
    open();
    EXPECT_EQ(m_log.eof(), 7);
    const int fd = m_log.fd();
    EXPECT_EQ(fcntl(fd, F_GETFD, 0), FD_CLOEXEC);
    m_log.closeLog();
    EXPECT_EQ(fcntl(fd, F_GETFD, 0), -1);
    EXPECT_EQ(m_log.reader(), nullptr);
    EXPECT_EQ(m_log.fd(), -1);
    EXPECT_EQ(m_log.eof(), -1);
}

TEST_F(Tail, ALogThatCannotBeOpenedHasItsStatus) {
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("open", EACCES);
        m_log.openLogAndSeek();
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error opening file " + m_path + ".  errno = 13; Permission denied"));
    EXPECT_EQ(m_log.monitorStatus(), MONITOR_ERR_OPEN);
    EXPECT_EQ(m_log.reader(), nullptr);
}

TEST_F(Tail, ALogWithoutASeekableEndIsClosed) {
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("lseek", ESPIPE);
        m_log.openLogAndSeek();
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Error while seeking EOF for file " + m_path +
                                              ".  errno = 29; Illegal seek"));
    EXPECT_EQ(m_log.monitorStatus(), MONITOR_ERR_SEEK_EOF);
    EXPECT_EQ(m_log.reader(), nullptr);
    EXPECT_EQ(m_log.fd(), -1);
    EXPECT_EQ(m_log.eof(), -1);
}

TEST_F(Tail, ReportsWhatIsAppendedAndNothingElse) {
    append("before\n");
    open();
    append("one\ntwo\n");
    stopAfter(2);
    m_log.follow();
    EXPECT_THAT(m_log.lines, ElementsAre("one\n", "two\n"));
    EXPECT_EQ(m_log.numEvents(), 2);
    EXPECT_EQ(m_log.numFormatErrors(), 0);
    EXPECT_EQ(m_log.eof(), 15);
    const auto rows = EventRecorder::rows();
    ASSERT_THAT(rows, SizeIs(2));
    EXPECT_EQ(columnText(rows[0].entrydesc), "one\n");
    EXPECT_EQ(columnText(rows[1].entrydesc), "two\n");
    EXPECT_EQ(columnText(rows[1].logname), "messages");
}

TEST_F(Tail, RejectedLinesAreCountedAndDropped) {
    open();
    append("one\nbad\ntwo\nbad again\nthree\n");
    stopAfter(5);
    m_log.follow();
    EXPECT_EQ(m_log.numEvents(), 5);
    EXPECT_EQ(m_log.numFormatErrors(), 2);
    EXPECT_THAT(EventRecorder::rows(), SizeIs(3));
}

TEST_F(Tail, ALongLineComesInThreePieces) {
    open();
    append(std::string(5000, 'x') + "\n");
    stopAfter(3);
    m_log.follow();
    ASSERT_THAT(m_log.lines, SizeIs(3));
    EXPECT_EQ(m_log.lines[0], std::string(2047, 'x'));
    EXPECT_EQ(m_log.lines[1], std::string(2047, 'x'));
    EXPECT_EQ(m_log.lines[2], std::string(906, 'x') + "\n");
    EXPECT_EQ(m_log.numEvents(), 3);
    EXPECT_THAT(EventRecorder::rows(), SizeIs(3));
}

TEST_F(Tail, AnUnfinishedLineIsReportedAtOnceAndItsRestAsALine) {
    open();
    append("begin");
    EXPECT_EQ(m_log.readLog(), 0);
    EXPECT_THAT(m_log.lines, ElementsAre("begin"));
    append("ning\n");
    EXPECT_EQ(m_log.readLog(), 0);
    EXPECT_THAT(m_log.lines, ElementsAre("begin", "ning\n"));
}

TEST_F(Tail, WhatIsAppendedWhileReadingIsReadInTheSamePass) {
    open();
    append("one\n");
    m_log.onLine = [this](const std::string& line) {
        if (line == "one\n") {
            append("two\n");
        } else {
            m_log.setMonitorStatus(MONITOR_STOPPED);
        }
    };
    const Fault passes("select", 0, {.times = 0});
    m_log.follow();
    EXPECT_THAT(m_log.lines, ElementsAre("one\n", "two\n"));
    EXPECT_EQ(m_log.eof(), 8);
    EXPECT_EQ(passes.calls(), 1);
}

TEST_F(Tail, WhatIsAppendedAfterReadingIsLeftToTheNextPass) {
    open();
    append("one\n");
    m_log.afterReading = [this] {
        m_log.afterReading = nullptr;
        append("two\n");
    };
    stopAfter(2);
    m_log.follow();
    EXPECT_THAT(m_log.lines, ElementsAre("one\n", "two\n"));
    EXPECT_EQ(m_log.eof(), 8);
}

TEST_F(Tail, ATruncatedLogIsFollowedFromItsNewEnd) {
    append("something long\n");
    open();
    m_directory.write("messages", "new\n"); // shorter, and not reported
    m_log.onLine = [this](const std::string&) { m_log.setMonitorStatus(MONITOR_STOPPED); };
    RecordingTrace trace(TRC1_ERROR);
    std::thread writer([&] {
        const std::string warning =
            "Warning: log file " + m_path + " truncated. Resetting EOF to offset 4.";
        EXPECT_TRUE(trace.waitFor(warning));
        append("after\n");
    });
    m_log.follow();
    writer.join();
    EXPECT_THAT(m_log.lines, ElementsAre("after\n"));
    EXPECT_THAT(trace.messages(), ElementsAre("Warning: log file " + m_path +
                                              " truncated. Resetting EOF to offset 4."));
    EXPECT_EQ(m_log.eof(), 10);
}

// Reading continues as if the log had only grown; the ledger records the truncation.
TEST_F(Tail, ALogThatIsTruncatedAndGrowsPastItsOldEndIsInTheLedger) {
    append("first\n");
    open();
    stopAfter(1);
    append("old\n");
    m_log.follow();
    m_directory.write("messages.1", "first\nold\nnever read\n");
    m_directory.write("messages", "new line 1\nnew line 2\n");
    stopAfter(2);
    RecordingTrace trace(TRC1_ERROR);
    m_log.follow();
    EXPECT_THAT(m_log.lines, ElementsAre("old\n", "\n", "new line 2\n"));
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_EQ(m_log.ledger().truncations(), 1);
    EXPECT_EQ(m_log.ledger().skippedBytes(), 10 + 11);
    LogLedger::SkippedRange ranges[LogLedger::mostKept];
    ASSERT_EQ(m_log.ledger().copySkipped(ranges), 1U);
    EXPECT_EQ(ranges[0].to, 10);
    EXPECT_EQ(ranges[0].unread, 11);
    EXPECT_EQ(ranges[0].kind, LogLedger::Truncation::regrown);
}

TEST_F(Tail, TheUnreadEndLostToATruncationIsInTheLedger) {
    append("first\n");
    open();
    m_directory.write("messages.1", "first\nnever read\n");
    m_directory.write("messages", "new\n");
    const Fault end("select", EINVAL);
    m_log.follow();
    EXPECT_EQ(m_log.ledger().truncations(), 1);
    EXPECT_EQ(m_log.ledger().skippedBytes(), 4 + 11);
}

TEST_F(Tail, AGrowingLogIsNeverMistakenForATruncatedOne) {
    append(std::string(5000, 'x') + "\n");
    open();
    for (std::size_t count = 1; count <= 50; ++count) {
        append("line " + std::to_string(count) + "\n");
        stopAfter(count);
        m_log.follow();
    }
    EXPECT_THAT(m_log.lines, SizeIs(50));
    EXPECT_EQ(m_log.ledger().truncations(), 0);
}

TEST_F(Tail, AnIdleLogCostsOneSeekPerCheck) {
    append("first\n");
    open();
    const Fault reads("pread", EIO, {.times = 0});
    const Fault seeks("lseek", EIO, {.times = 0});
    const Fault waits("select", EINVAL, {.skip = 20});
    m_log.follow();
    EXPECT_EQ(waits.calls(), 21);
    EXPECT_EQ(seeks.calls(), 21);
    EXPECT_EQ(reads.calls(), 0);
}

TEST_F(Tail, TheLedgerKnowsTheFileAsLongAsItIsFollowed) {
    open();
    stopAfter(1);
    append("one\n");
    m_log.follow();
    struct stat status;
    ASSERT_EQ(fstat(m_log.fd(), &status), 0);
    EXPECT_EQ(m_log.ledger().file(), (FileIdentity{status.st_dev, status.st_ino}));
    m_log.closeLog();
    m_log.startThread();
    m_log.stopThread();
    EXPECT_EQ(m_log.ledger().file(), std::nullopt);
}

TEST_F(Tail, TheWarningOfATruncationIsOfTheErrorClass) {
    append("something long\n");
    open();
    m_directory.write("messages", "");
    RecordingTrace trace(~TRC1_ERROR);
    const Fault end("select", EINVAL);
    m_log.follow();
    EXPECT_EQ(m_log.eof(), 0);
    for (const std::string& message : trace.messages()) {
        EXPECT_THAT(message, testing::Not(testing::StartsWith("Warning")));
    }
}

TEST_F(Tail, ALogThatIsMovedAwayIsFollowedUnderItsNewName) {
    open();
    std::filesystem::rename(m_path, m_directory.file("old"));
    m_directory.write("messages", "of the new file\n");
    m_directory.append("old", "of the old file\n");
    stopAfter(1);
    m_log.follow();
    EXPECT_THAT(m_log.lines, ElementsAre("of the old file\n"));
}

TEST_F(Tail, AnInterruptedWaitContinues) {
    open();
    append("one\n");
    m_log.onLine = [this](const std::string& line) {
        if (line == "two\n") {
            m_log.setMonitorStatus(MONITOR_STOPPED);
        }
    };
    RecordingTrace trace(TRC1_ERROR);
    const Fault interruption("select", EINTR, {.times = 3});
    std::thread writer([&] {
        EXPECT_TRUE(waitUntil([&] { return interruption.failed() == 3; }));
        append("two\n");
    });
    m_log.follow();
    writer.join();
    EXPECT_THAT(m_log.lines, ElementsAre("one\n", "two\n"));
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_EQ(m_log.monitorStatus(), MONITOR_STOPPED);
}

TEST_F(Tail, TheTimeoutIsResetForEveryWait) {
    // select may reduce the timeout; a loop that used what is left would spin.
    open();
    const Fault passes("select", EINVAL, {.skip = 20});
    const auto begin = std::chrono::steady_clock::now();
    m_log.follow();
    EXPECT_GE(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(20));
}

TEST_F(Tail, AFailedCheckOfTheEndEndsTheMonitor) {
    open();
    expectEnd("lseek", 0,
              "Error while seeking new EOF for file " + m_path + ". errno = 5; Input/output error",
              MONITOR_ERR_SEEK_EOF);
    EXPECT_EQ(m_log.statusText(), "Error: seek for EOF failed");
}

TEST_F(Tail, AFailedRewindEndsTheMonitor) {
    open();
    append("one\n");
    expectEnd("lseek", 1,
              "Error while rewinding file pointer for file " + m_path +
                  "; errno = 5; Input/output error",
              MONITOR_ERR_REWIND);
    EXPECT_THAT(m_log.lines, IsEmpty());
}

TEST_F(Tail, AFailedReadEndsTheMonitor) {
    open();
    append("one\n");
    expectEnd("read", 0,
              "Error occurred while reading file " + m_path + ".  errno = 5; Input/output error",
              MONITOR_ERR_READ);
    EXPECT_THAT(m_log.lines, IsEmpty());
    EXPECT_EQ(m_log.eof(), 0);
}

TEST_F(Tail, AReadThatFailsLaterKeepsTheLinesBeforeIt) {
    open();
    append("one\n");
    expectEnd("read", 1,
              "Error occurred while reading file " + m_path + ".  errno = 5; Input/output error",
              MONITOR_ERR_READ);
    EXPECT_THAT(m_log.lines, ElementsAre("one\n"));
    EXPECT_EQ(m_log.numEvents(), 1);
}

TEST_F(Tail, AnUnknownPositionAfterReadingEndsTheMonitor) {
    open();
    append("one\n");
    expectEnd("lseek", 2,
              "Error occurred while determining new EOF for file " + m_path +
                  ". errno = 5; Input/output error",
              MONITOR_ERR_RESET_EOF);
    EXPECT_THAT(m_log.lines, ElementsAre("one\n"));
}

TEST_F(Tail, AFailedWaitEndsTheMonitor) {
    open();
    expectEnd("select", 0,
              "Error occurred while waiting for data for file " + m_path +
                  "; errno = 5; Input/output error",
              MONITOR_ERR_WAIT_LOOP);
}

TEST_F(Tail, OnlyARunningMonitorChecksTheFile) {
    open();
    append("one\n");
    const Fault looks("lseek", 0, {.times = 0});
    for (const _MonitorStatus status :
         {MONITOR_STOPPED, MONITOR_NOT_STARTED, MONITOR_ERR_READ, MONITOR_ERR_NO_MEMORY}) {
        m_log.setMonitorStatus(status);
        m_log.waitForEventLoop(timeval{0, 1000});
    }
    EXPECT_EQ(looks.calls(), 0);
    EXPECT_THAT(m_log.lines, IsEmpty());
}

TEST_F(Tail, TheThreadReportsAndStopsWithinItsInterval) {
    append("before\n");
    m_log.startThread();
    EXPECT_TRUE(waitUntil([&] { return m_log.eof() == 7; }));
    append("one\n");
    EXPECT_THAT(EventRecorder::waitForRows(1), SizeIs(1));
    m_log.stopThread();
    append("two\n");
    EXPECT_EQ(m_log.numEvents(), 1);
    EXPECT_EQ(m_log.monitorStatus(), MONITOR_STOPPED);
}

} // namespace
