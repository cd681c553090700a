#include "logtypes/AdminLogFile.h"

#include "AccountingRecords.h"
#include "LogTypeTest.h"
#include "monitor/ReportOutcome.h"
#include "support/TestValidLog.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstddef>
#include <filesystem>
#include <memory>
#include <system_error>
#include <vector>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t dayStart = 1159920000; // 4 October 2006 00:00:00 UTC

class AdminLogFileReportTest : public LogTypeTest {
protected:
    // Reports need no monitor, so this one ends immediately.
    AdminLogFileReportTest() {
        const Fault fault("open", EACCES);
        m_monitor = std::make_unique<AdminLogFile>(*validLog(log, " ;N ;A"), nullptr);
        EXPECT_TRUE(waitForStatus(*m_monitor, MONITOR_ERR_OPEN));
        trace.clear();
    }

    /// A file of `count` records, one per minute from the start of the day, for users "u0", "u1",
    /// ...
    void write(int count, const std::string& tail = "") {
        std::string bytes;
        for (int i = 0; i < count; ++i) {
            bytes += AccountingRecord{.user = "u" + std::to_string(i), .time = dayStart + 60L * i}
                         .bytes();
        }
        directory.write("wtmp", bytes + tail);
    }

    /// How many times this process has the log open.
    std::ptrdiff_t descriptorsOfTheLog() const {
        std::ptrdiff_t count = 0;
        for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
            std::error_code gone; // the directory's own descriptor
            count += std::filesystem::read_symlink(entry.path(), gone) == log ? 1 : 0;
        }
        return count;
    }

    /// The users of the rows that a report on the window returns, in that order.
    std::vector<std::string> report(const char* start, const char* end) {
        _RequestThresholds thresholds = window(start, end);
        void* state = m_monitor->startReportRequest(&thresholds);
        if (state == nullptr) {
            return {"no report"};
        }
        std::vector<std::string> users;
        zrm_rmlogent_data_t row;
        while (void* const found = m_monitor->getNextLogEntry(&row, state, &thresholds)) {
            EXPECT_EQ(found, &row);
            const std::string description = columnText(row.entrydesc);
            users.push_back(description.substr(7, description.find(';') - 7));
        }
        m_monitor->endReportRequest(&state);
        EXPECT_EQ(state, nullptr);
        return users;
    }
    std::vector<std::string> wholeReport() {
        return report("0700101000000000", "1991231000000000");
    }
    static std::vector<std::string> users(int newest, int oldest) {
        std::vector<std::string> result;
        for (int i = newest; i >= oldest; --i) {
            result.push_back("u" + std::to_string(i));
        }
        return result;
    }
    std::string endMessage(int length = 0) const {
        return "Incomplete record found while building report for file " + log +
               ". Record length = " + std::to_string(length) + "; expected length = 40.";
    }

    const TimeZone zone{"UTC0"};
    const std::string log = directory.write("wtmp", "");

    AdminLogFile& monitor() { return *m_monitor; }

private:
    std::unique_ptr<AdminLogFile> m_monitor;
};

TEST_F(AdminLogFileReportTest, ReturnsTheRecordsOfTheWindowNewestFirst) {
    write(10);
    EXPECT_EQ(report("1061004000200000", "1061004000500000"), users(5, 2));
    // An older record ends the report before the start of the file.
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(AdminLogFileReportTest, ReachesTheFilesStartThroughAnIncompleteRecord) {
    write(10);
    EXPECT_EQ(report("1061003000000000", "1061005000000000"), users(9, 0));
    EXPECT_THAT(trace.messages(), ElementsAre(endMessage()));
}

TEST_F(AdminLogFileReportTest, IsEmptyWhenEveryRecordIsOlder) {
    write(10);
    EXPECT_THAT(report("1061005000000000", "1061006000000000"), IsEmpty());
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(AdminLogFileReportTest, ReadsTheWholeFileWhenEveryRecordIsNewer) {
    write(10);
    EXPECT_THAT(report("1051005000000000", "1051006000000000"), IsEmpty());
    EXPECT_THAT(trace.messages(), ElementsAre(endMessage()));
}

TEST_F(AdminLogFileReportTest, RaisesASmallBlockSizeToOneRecord) {
    const FakeBlockSize fake(16);
    write(3);
    trace.setLevel(TRC1_DETAIL);
    EXPECT_EQ(wholeReport(), users(2, 0));
    EXPECT_TRUE(trace.contains("Read buffer of size 40 allocated for file " + log + "."));
    EXPECT_TRUE(trace.contains("40 bytes read from file " + log + " from offset 80."));
}

TEST_F(AdminLogFileReportTest, KeepsABlockSizeOf41AndReadsEachRecordWhole) {
    const FakeBlockSize fake(41);
    write(100);
    trace.setLevel(TRC1_DETAIL);
    EXPECT_EQ(wholeReport(), users(99, 0));
    EXPECT_TRUE(trace.contains("Read buffer of size 41 allocated for file " + log + "."));
    EXPECT_TRUE(trace.contains("1 bytes pushed back onto buffer for file " + log + "."));
}

TEST_F(AdminLogFileReportTest, ReadsRecordsAcrossTheBlocksOfAFileSystem) {
    const FakeBlockSize fake(4096);
    write(1000);
    EXPECT_EQ(wholeReport(), users(999, 0));
    EXPECT_THAT(trace.messages(), ElementsAre(endMessage()));
}

TEST_F(AdminLogFileReportTest, TakesTheLast40BytesOfAFileThatEndsWithinARecord) {
    write(2, std::string(10, '\0'));
    // Each record starts 10 bytes late, where there is no user name; 10 bytes remain at the start.
    EXPECT_THAT(wholeReport(), ElementsAre("", ""));
    EXPECT_THAT(trace.messages(), ElementsAre(endMessage(10)));
    trace.clear();
    write(0, std::string(39, 'x'));
    EXPECT_THAT(wholeReport(), IsEmpty());
    EXPECT_THAT(trace.messages(), ElementsAre(endMessage(39)));
}

TEST_F(AdminLogFileReportTest, ReportsWhyItEnds) {
    const auto endOf = [this](int count, const std::string& tail) {
        write(count, tail);
        const ReportOutcome outcome;
        wholeReport();
        return outcome.end();
    };
    EXPECT_EQ(endOf(0, ""), ReportEnd::complete) << "an empty log";
    EXPECT_EQ(endOf(10, ""), ReportEnd::complete);
    EXPECT_EQ(endOf(10, "x"), ReportEnd::brokenRecord);
    const Fault fault("read", EIO);
    EXPECT_EQ(endOf(10, ""), ReportEnd::readError);
}

TEST_F(AdminLogFileReportTest, DoesNotStartOnAnEmptyLog) {
    trace.setLevel(TRC1_DETAIL);
    EXPECT_THAT(wholeReport(), ElementsAre("no report"));
    EXPECT_TRUE(trace.contains("Log " + log + " is empty; report request terminating."));
}

TEST_F(AdminLogFileReportTest, DoesNotStartWithoutABlockSize) {
    write(1);
    const Fault fault("stat", EACCES);
    EXPECT_THAT(wholeReport(), ElementsAre("no report"));
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + log +
                                              ";  errno = 13; Permission denied."));
    // The next report asks again.
    EXPECT_EQ(wholeReport(), users(0, 0));
}

TEST_F(AdminLogFileReportTest, AsksForTheBlockSizeOnce) {
    write(1);
    const Fault fault("stat", EACCES, {.skip = 1, .times = -1});
    EXPECT_EQ(wholeReport(), users(0, 0));
    EXPECT_EQ(wholeReport(), users(0, 0));
    EXPECT_EQ(fault.calls(), 1);
}

TEST_F(AdminLogFileReportTest, DoesNotStartWithoutMemory) {
    const FakeBlockSize fake(4096);
    write(1);
    {
        const Fault fault("new", ENOMEM);
        EXPECT_THAT(wholeReport(), ElementsAre("no report"));
    }
    {
        const Fault fault("new", ENOMEM, {.skip = 1});
        EXPECT_THAT(wholeReport(), ElementsAre("no report"));
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Memory allocation of 32 bytes failed.",
                                              "Memory allocation of 4097 bytes failed."));
}

TEST_F(AdminLogFileReportTest, DoesNotStartWhenTheFileCannotBeOpened) {
    write(1);
    const Fault fault("open", EMFILE);
    EXPECT_THAT(wholeReport(), ElementsAre("no report"));
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + log +
                                              " for report.  errno = 24; Too many open files"));
}

TEST_F(AdminLogFileReportTest, EndsWhenAReadFails) {
    write(1);
    const Fault fault("read", EIO);
    EXPECT_THAT(wholeReport(), IsEmpty());
    EXPECT_THAT(trace.messages(), ElementsAre("Error while reading file " + log +
                                                  ". Bytes requested = 40. Bytes received = -1.",
                                              endMessage(-1)));
}

TEST_F(AdminLogFileReportTest, MayBeEndedEarlyAndLeavesNothingOpen) {
    write(10);
    const std::ptrdiff_t before = descriptorsOfTheLog();
    _RequestThresholds thresholds = window("0700101000000000", "1991231000000000");
    void* state = monitor().startReportRequest(&thresholds);
    ASSERT_NE(state, nullptr);
    EXPECT_EQ(descriptorsOfTheLog(), before + 1);
    EXPECT_EQ(openFilesOfAChild().find("wtmp"), std::string::npos);
    zrm_rmlogent_data_t row;
    EXPECT_EQ(monitor().getNextLogEntry(&row, state, &thresholds), &row);
    const int fd = static_cast<_LogBufferInfo*>(state)->fd;
    monitor().endReportRequest(&state);
    EXPECT_EQ(state, nullptr);
    EXPECT_EQ(lseek(fd, 0, SEEK_CUR), -1);
    EXPECT_EQ(descriptorsOfTheLog(), before);
    monitor().endReportRequest(&state);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

} // namespace
