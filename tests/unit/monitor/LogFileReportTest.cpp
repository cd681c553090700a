#include "TestLog.h"
#include "monitor/ReportOutcome.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t blockSize = 64;

/// The numbers 0, 1, 2, ... as text, so that a block shows where it was read.
std::string countingText(std::size_t size) {
    std::string text;
    for (std::size_t i = 0; text.size() < size; ++i) {
        text += std::to_string(i) + " ";
    }
    return text.substr(0, size);
}

class Report : public MonitoredFile {
protected:
    Report() { m_log.setBlockSize(blockSize); }
    ~Report() override {
        if (m_info.fd >= 0) {
            close(m_info.fd);
        }
    }
    void open(const std::string& content) {
        m_content = content;
        m_directory.write("messages", content);
        ASSERT_GE(m_log.openLogForReport(&m_info), 0);
        m_info.bufferCount = 0;
    }
    /// Reads the previous block and expects the content of this range of the file.
    void expectBlock(std::size_t begin, std::size_t end) {
        ASSERT_EQ(m_log.fillReportBuffer(&m_info), static_cast<long>(end - begin));
        EXPECT_EQ(m_info.bufferCount, static_cast<std::int64_t>(end - begin));
        EXPECT_EQ(std::string(m_info.pBuffer, end - begin), m_content.substr(begin, end - begin));
        EXPECT_EQ(m_info.bytesLeft, static_cast<std::int64_t>(begin));
        EXPECT_EQ(lseek(m_info.fd, 0, SEEK_CUR), static_cast<off_t>(begin));
        m_info.bufferCount = 0; // all of it consumed
    }

    TestLog m_log{*m_line};
    std::vector<char> m_buffer = std::vector<char>(blockSize + 1, '#');
    _LogBufferInfo m_info{.pBuffer = m_buffer.data(), .bytesLeft = 0, .bufferCount = 0, .fd = -1};
    std::string m_content;
};

TEST_F(Report, TheBlockSizeIsTheFileSystems) {
    struct stat status;
    ASSERT_EQ(stat(m_path.c_str(), &status), 0);
    EXPECT_EQ(m_log.determineOptimumBlockSize(), 0);
    EXPECT_EQ(m_log.blockSize(), status.st_blksize);
}

TEST_F(Report, AFileSystemWithoutABlockSizeGetsBlocksOf8192) {
    const FakeBlockSize none(0);
    EXPECT_EQ(m_log.determineOptimumBlockSize(), 0);
    EXPECT_EQ(m_log.blockSize(), 8192);
}

TEST_F(Report, AFailedStatLeavesTheBlockSize) {
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("stat", EACCES);
    EXPECT_EQ(m_log.determineOptimumBlockSize(), 1);
    EXPECT_EQ(m_log.blockSize(), blockSize);
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + m_path +
                                              ";  errno = 13; Permission denied."));
}

TEST_F(Report, OpensAtTheEnd) {
    m_directory.write("messages", countingText(100));
    RecordingTrace trace(TRC1_DETAIL);
    const long fd = m_log.openLogForReport(&m_info);
    ASSERT_GE(fd, 0);
    EXPECT_EQ(m_info.fd, fd);
    EXPECT_EQ(m_info.bytesLeft, 100);
    EXPECT_EQ(fcntl(m_info.fd, F_GETFD, 0) & FD_CLOEXEC, FD_CLOEXEC);
    EXPECT_THAT(trace.messages(),
                ElementsAre("fd " + std::to_string(fd) + " opened for report on " + m_path +
                            "; file size is 100."));
}

TEST_F(Report, AnEmptyLogHasNoReport) {
    RecordingTrace trace(TRC1_DETAIL | TRC1_ERROR);
    EXPECT_EQ(m_log.openLogForReport(&m_info), -1);
    EXPECT_EQ(m_info.fd, -1);
    const auto messages = trace.messages();
    ASSERT_EQ(messages.size(), 2U);
    EXPECT_THAT(messages[0], testing::MatchesRegex("fd [0-9]+ closed for report on .*messages\\."));
    EXPECT_EQ(messages[1], "Log " + m_path + " is empty; report request terminating.");
    trace.setLevel(TRC1_ERROR);
    trace.clear();
    EXPECT_EQ(m_log.openLogForReport(&m_info), -1);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(Report, ALogThatCannotBeOpenedHasNoReport) {
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("open", EACCES);
    EXPECT_LT(m_log.openLogForReport(&m_info), 0);
    EXPECT_LT(m_info.fd, 0);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + m_path +
                                              " for report.  errno = 13; Permission denied"));
}

TEST_F(Report, ALogWhoseEndCannotBeFoundHasNoReport) {
    append("line\n");
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("lseek", EIO);
    const Fault closing("close", 0, {.times = 0});
    EXPECT_EQ(m_log.openLogForReport(&m_info), -1);
    EXPECT_EQ(m_info.fd, -1);
    EXPECT_EQ(closing.calls(), 1);
    EXPECT_THAT(trace.messages(), ElementsAre("Error while seeking EOF for report on file " +
                                              m_path + ". errno = 5; Input/output error"));
}

TEST_F(Report, ALogSmallerThanABlockIsReadAtOnce) {
    open(countingText(blockSize - 1));
    expectBlock(0, blockSize - 1);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
}

TEST_F(Report, AFullBlockAndOneByteMore) {
    open(countingText(blockSize));
    expectBlock(0, blockSize);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
    close(m_info.fd);
    open(countingText(blockSize + 1));
    expectBlock(1, blockSize + 1);
    expectBlock(0, 1);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
}

TEST_F(Report, ThreeBlocksAreThreeFills) {
    open(countingText(3 * blockSize));
    RecordingTrace trace(TRC1_DETAIL);
    expectBlock(2 * blockSize, 3 * blockSize);
    expectBlock(blockSize, 2 * blockSize);
    expectBlock(0, blockSize);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
    EXPECT_THAT(trace.messages(),
                ElementsAre("64 bytes read from file " + m_path + " from offset 128.",
                            "64 bytes read from file " + m_path + " from offset 64.",
                            "64 bytes read from file " + m_path + " from offset 0."));
}

TEST_F(Report, UnconsumedBytesAreReadAgain) {
    open(countingText(3 * blockSize));
    expectBlock(2 * blockSize, 3 * blockSize);
    m_info.bufferCount = 10;
    RecordingTrace trace(TRC1_DETAIL);
    expectBlock(blockSize + 10, 2 * blockSize + 10);
    EXPECT_THAT(trace.messages(),
                ElementsAre("10 bytes pushed back onto buffer for file " + m_path + ".",
                            "64 bytes read from file " + m_path + " from offset 74."));
    m_info.bufferCount = 1;
    expectBlock(11, blockSize + 11);
    expectBlock(0, 11);
}

TEST_F(Report, NothingIsPushedBackAtTheFilesStart) {
    open(countingText(10));
    expectBlock(0, 10);
    m_info.bufferCount = 5;
    RecordingTrace trace(TRC1_DETAIL | TRC1_ERROR);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(Report, TextBlocksAreTerminatedAndOthersNot) {
    for (const char type : {'S', 'U', 'A'}) {
        m_log.setType(type);
        std::fill(m_buffer.begin(), m_buffer.end(), '#');
        open(countingText(10));
        expectBlock(0, 10);
        EXPECT_EQ(m_buffer[10], type == 'A' ? '#' : '\0') << type;
        m_log.closeLogForReport(m_info.fd);
        m_info.fd = -1;
    }
}

TEST_F(Report, WhatIsAppendedDuringAReportIsNotPartOfIt) {
    open(countingText(10));
    append("more");
    expectBlock(0, 10);
    EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
}

TEST_F(Report, KeepsItsBlockSizeWhenThatOfTheLogChanges) {
    m_info.blockSize = 16;
    open(countingText(100));
    m_log.setBlockSize(4096); // another report determined another size
    expectBlock(84, 100);
    expectBlock(68, 84);
}

/// Each failure ends the report with its message; the class is that of errors.
class ReportFailure : public Report {
protected:
    void expectFailure(const char* call, int skip, const std::string& message) {
        RecordingTrace trace(TRC1_ERROR);
        const Fault fault(call, EIO, {.skip = skip});
        EXPECT_EQ(m_log.fillReportBuffer(&m_info), 0);
        EXPECT_THAT(trace.messages(), ElementsAre(message));
    }
};

TEST_F(ReportFailure, OfAPushBackEndsTheReport) {
    open(countingText(3 * blockSize));
    expectBlock(2 * blockSize, 3 * blockSize);
    m_info.bufferCount = 10;
    expectFailure("lseek", 0,
                  "Error while pushing 10 bytes onto buffer for file " + m_path +
                      ". errno = 5; Input/output error");
    EXPECT_EQ(m_info.bytesLeft, 0);
}

TEST_F(ReportFailure, OfTheSeekBeforeReading) {
    open(countingText(100));
    expectFailure("lseek", 0,
                  "Error while seeking start of read for report on file " + m_path +
                      ". errno = 5; Input/output error");
}

TEST_F(ReportFailure, OfReading) {
    open(countingText(100));
    expectFailure("read", 0,
                  "Error while reading file " + m_path +
                      ". Bytes requested = 64. Bytes received = -1.");
}

TEST_F(ReportFailure, OfALogThatShrank) {
    open(countingText(100));
    m_directory.write("messages", countingText(50));
    expectFailure("none", 0,
                  "Error while reading file " + m_path +
                      ". Bytes requested = 64. Bytes received = 14.");
}

TEST_F(ReportFailure, OfTheSeekAfterReading) {
    open(countingText(100));
    expectFailure("lseek", 1,
                  "Error while resetting file pointer after read for file " + m_path +
                      ". errno = 5; Input/output error");
}

TEST_F(ReportFailure, OfClosing) {
    open(countingText(100));
    const int fd = m_info.fd;
    {
        RecordingTrace trace(TRC1_DETAIL);
        m_log.closeLogForReport(fd);
        EXPECT_THAT(trace.messages(), ElementsAre("fd " + std::to_string(fd) +
                                                  " closed for report on " + m_path + "."));
    }
    RecordingTrace trace(TRC1_ERROR);
    m_log.closeLogForReport(fd);
    m_info.fd = -1;
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error closing fd " + std::to_string(fd) + " for report on file " +
                            m_path + ".  errno = 9; Bad file descriptor"));
}

TEST_F(Report, MayBeBoundToTheFileThatIsMonitored) {
    m_directory.write("messages", "monitored");
    m_log.openLogAndSeek();
    std::filesystem::rename(m_path, m_path + ".1");
    m_directory.write("other", "another file");
    std::filesystem::create_symlink(m_directory.file("other"), m_path);
    RecordingTrace trace(TRC1_ERROR);
    {
        const ReportOutcome outcome(ReportedFile::monitored);
        EXPECT_LT(m_log.openLogForReport(&m_info), 0);
        EXPECT_EQ(outcome.end(), ReportEnd::otherFile);
        EXPECT_EQ(m_info.fd, -1);
    }
    {
        const ReportOutcome outcome; // goes by the name
        EXPECT_GE(m_log.openLogForReport(&m_info), 0);
        EXPECT_EQ(m_info.bytesLeft, 12);
        m_log.closeLogForReport(m_info.fd);
    }
    std::filesystem::remove(m_path);
    std::filesystem::create_symlink(m_path + ".1", m_path);
    {
        const ReportOutcome outcome(ReportedFile::monitored);
        EXPECT_GE(m_log.openLogForReport(&m_info), 0) << "the same file through a link";
        EXPECT_EQ(m_info.bytesLeft, 9);
        m_log.closeLogForReport(m_info.fd);
    }
    m_log.closeLog();
    m_info.fd = -1;
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(Report, FollowsNoLinkUnlessTheMonitorHasAFileOpen) {
    m_directory.write("other", "another file");
    std::filesystem::remove(m_path);
    std::filesystem::create_symlink(m_directory.file("other"), m_path);
    RecordingTrace trace(TRC1_ERROR);
    const ReportOutcome outcome(ReportedFile::monitored);
    EXPECT_LT(m_log.openLogForReport(&m_info), 0);
    EXPECT_THAT(trace.messages(), testing::SizeIs(1));
}

} // namespace
