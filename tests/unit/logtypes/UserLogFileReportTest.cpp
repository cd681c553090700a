#include "UserLogTest.h"

#include "ReportFile.h"
#include "monitor/ReportOutcome.h"

#include <gmock/gmock.h>

#include <atomic>

#include <fcntl.h>

using namespace zrm;

// Reports on user logs: the file read backwards, block by block.

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class UserLogReport : public UserLogTest {
protected:
    static std::vector<std::string> descriptions(const std::vector<zrm_rmlogent_data_t>& rows) {
        std::vector<std::string> texts;
        for (const zrm_rmlogent_data_t& row : rows) {
            texts.push_back(columnText(row.entrydesc));
        }
        return texts;
    }
    static std::vector<std::string> times(const std::vector<zrm_rmlogent_data_t>& rows) {
        std::vector<std::string> texts;
        for (const zrm_rmlogent_data_t& row : rows) {
            texts.push_back(columnText(row.entrytime));
        }
        return texts;
    }
    void setBlockSize(std::int64_t size) { (*m_log).*(&UserLogMembers::OptimumBlockSize) = size; }
};

TEST_F(UserLogReport, ReturnsTheNewestEntryFirst) {
    write("one\ntwo\nthree\n");
    makeLog(wholeLine);
    EXPECT_THAT(descriptions(report()), ElementsAre("three", "two", "one"));
    write("one\ntwo\nthree without an end");
    EXPECT_THAT(descriptions(report()), ElementsAre("three without an end", "two", "one"));
    write("alone");
    EXPECT_THAT(descriptions(report()), ElementsAre("alone"));
}

TEST_F(UserLogReport, ReadsEveryFileAsAForwardReadingDoes) {
    makeLog(wholeLine);
    constexpr std::int64_t block = 32;
    setBlockSize(block);
    ReportFileGenerator generator;
    for (int size = 1; size <= 3 * block + 3; ++size) {
        for (int variant = 0; variant < 2; ++variant) {
            const std::string content =
                generator.content(static_cast<std::size_t>(size), 30, variant == 0);
            write(content);
            ASSERT_EQ(descriptions(report()), ReportFileGenerator::newestFirst(content))
                << "size " << size << ", seed " << generator.seed();
        }
    }
}

TEST_F(UserLogReport, ReadsLinesAcrossWholeFileSystemBlocks) {
    makeLog(wholeLine);
    constexpr std::size_t block = 4096;
    setBlockSize(block);
    ReportFileGenerator generator;
    for (const std::size_t size : {block - 1, block, block + 1, 2 * block - 1, 2 * block,
                                   2 * block + 1, 3 * block, 10 * block + 17}) {
        const std::string content = generator.content(size, 255, true);
        write(content);
        ASSERT_EQ(descriptions(report()), ReportFileGenerator::newestFirst(content))
            << "size " << size << ", seed " << generator.seed();
    }
}

TEST_F(UserLogReport, LinesOfExactlyOneBlock) {
    makeLog(wholeLine);
    setBlockSize(64);
    const std::string whole(63, 'x');
    const std::string shorter(62, 'y');
    write(whole + "\n" + "tail\n");
    EXPECT_THAT(descriptions(report()), ElementsAre("tail", whole)) << "the file's first line";
    write("first\n" + shorter + "\n" + "tail\n");
    EXPECT_THAT(descriptions(report()), ElementsAre("tail", shorter, "first"));
    // A line as long as a block does not fit into it together with the newline before it.
    RecordingTrace trace(TRC1_ERROR);
    write("first\n" + whole + "\n" + "tail\n");
    EXPECT_THAT(descriptions(report()), ElementsAre("tail"));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Line in file " + m_path +
                            " exceeds 64 characters. Remaining contents ignored."));
}

TEST_F(UserLogReport, EndsAtALineOfMoreThan2047Characters) {
    makeLog(wholeLine);
    for (const std::int64_t block : {2048, 4096, 65536}) {
        setBlockSize(block);
        RecordingTrace trace(TRC1_ERROR);
        for (const bool hasNewline : {true, false}) {
            const std::string end = hasNewline ? "\n" : "";
            const std::string longest(hasNewline ? 2046 : 2047, 'x');
            write("first\n" + longest + end);
            EXPECT_THAT(descriptions(report()), ElementsAre(longest.substr(0, 255), "first"));
            write(longest + end);
            EXPECT_THAT(descriptions(report()), ElementsAre(longest.substr(0, 255)));
            EXPECT_THAT(trace.messages(), IsEmpty());
            for (const char* before : {"", "first\n"}) {
                write(before + longest + "x" + end);
                EXPECT_THAT(descriptions(report()), IsEmpty());
                EXPECT_THAT(trace.messages(),
                            ElementsAre("Line in file " + m_path +
                                        " exceeds 2048 characters. Remaining contents ignored."));
                trace.clear();
            }
        }
        write("first\n" + std::string(200000, 'x') + "\nlast\n");
        EXPECT_THAT(descriptions(report()), ElementsAre("last"));
    }
}

TEST_F(UserLogReport, StaysEndedAfterALongLine) {
    makeLog(wholeLine);
    write("first\n" + std::string(3000, 'x') + "\nlast\n");
    _RequestThresholds thresholds = window("0700101000000000", "1991231235959000");
    void* state = m_log->startReportRequest(&thresholds);
    zrm_rmlogent_data_t row;
    EXPECT_NE(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    EXPECT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    EXPECT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    m_log->endReportRequest(&state);
    m_log->endReportRequest(&state); // null: nothing to end
}

TEST_F(UserLogReport, KeepsToTheWindow) {
    write("060101 a\n060102 b\n060102 c\n060103 d\n060104 e\n");
    makeLog(R"(A,"%2d%2d%2d %s",year month day description)");
    m_clock.set(1136073600); // midnight, so that all hours are 0
    EXPECT_THAT(descriptions(report("1060102000000000", "1060103000000000")),
                ElementsAre("d", "c", "b"));
    EXPECT_THAT(descriptions(report("1060102000000001", "1060103000000000")), ElementsAre("d"));
    EXPECT_THAT(descriptions(report("1060102000000000", "1060102999999999")),
                ElementsAre("c", "b"));
    EXPECT_THAT(descriptions(report("1060105000000000", "1060106000000000")), IsEmpty());
    EXPECT_THAT(descriptions(report("1050101000000000", "1050102000000000")), IsEmpty());
}

TEST_F(UserLogReport, EndsAtTheFirstEntryOlderThanTheWindow) {
    write("060103 old but behind\n060101 older\n060102 newest\n");
    makeLog(R"(A,"%2d%2d%2d %s",year month day description)");
    EXPECT_THAT(descriptions(report("1060102000000000", "1061231000000000")),
                ElementsAre("newest"));
}

TEST_F(UserLogReport, DatesALogWithoutYearsAcrossNewYear) {
    m_clock.set(1136289600); // 3 January 2006, 12:00:00
    write("1127 a\n1231 b\n1231 c\n0101 d\n0102 e\n");
    makeLog(R"(A,"%2d%2d %s",month day description)");
    EXPECT_THAT(times(report()),
                ElementsAre("1060102120000000", "1060101120000000", "1051231120000000",
                            "1051231120000000", "1051127120000000"));
    write("0105 last year's, as it is still to come\n");
    EXPECT_THAT(times(report()), ElementsAre("1050105120000000"));
    EXPECT_THAT(times(report()), ElementsAre("1050105120000000")) << "each report begins today";
    m_clock.set(883612799); // 31 December 1997, 23:59:59
    EXPECT_THAT(times(report()), ElementsAre("0970105235900000"));
}

TEST_F(UserLogReport, BadLinesAreDroppedUpToTenInARow) {
    makeLog(R"(A,"%d",day)");
    std::string content = "1\n";
    for (int line = 0; line < 10; ++line) {
        content += "bad\n";
    }
    write(content + "2\n" + content.substr(2) + "3\n");
    RecordingTrace trace(TRC1_DETAIL);
    EXPECT_EQ(times(report()).size(), 3U);
    trace.setLevel(TRC1_ERROR);
    trace.clear();
    write("1\nbad\n" + content.substr(2) + "3\n\n");
    EXPECT_EQ(times(report()).size(), 1U);
    EXPECT_EQ(trace.messages().size(), 12U);
    EXPECT_EQ(trace.messages().back(),
              "Error: more than 10 consecutive errors have occurred while trying to build report "
              "for log " +
                  m_path + ". Report request is terminating.");
}

TEST_F(UserLogReport, ReportsWhyItEnds) {
    makeLog(R"(A,"%d %[^\n]",day description)");
    const auto endOf = [this](const std::string& content) {
        write(content);
        const ReportOutcome outcome;
        report();
        return outcome.end();
    };
    std::string bad;
    for (int line = 0; line < 11; ++line) {
        bad += "bad\n";
    }
    EXPECT_EQ(endOf("1 one\n2 two\n"), ReportEnd::complete);
    EXPECT_EQ(endOf("1 one\n" + bad.substr(4) + "2 two\n"), ReportEnd::complete);
    EXPECT_EQ(endOf("1 one\n" + bad + "2 two\n"), ReportEnd::formatErrors);
    EXPECT_EQ(endOf("1 one\n2 " + std::string(2046, 'x') + "\n3 three\n"), ReportEnd::longLine);
    EXPECT_EQ(endOf("1 one\n2 " + std::string(20000, 'x') + "\n3 three\n"), ReportEnd::longLine);
    {
        const Fault fault("read", EIO, {.times = 1});
        EXPECT_EQ(endOf("1 one\n"), ReportEnd::readError);
    }
}

TEST_F(UserLogReport, SkippedRowsEndARunOfErrors) {
    makeLog(R"(A,"%d",day)");
    std::string bad;
    for (int line = 0; line < 10; ++line) {
        bad += "bad\n";
    }
    write("1\n" + bad + "31\n" + bad); // the 31st is later than the window
    EXPECT_THAT(times(report("1061001000000000", "1061030000000000")),
                ElementsAre("1061001123400000"));
}

TEST_F(UserLogReport, NulBytesEndALinesTextOnly) {
    makeLog(wholeLine);
    write(std::string("one\ntw\0o\nthree\n", 15));
    EXPECT_THAT(descriptions(report()), ElementsAre("three", "tw", "one"));
}

// Failures.

TEST_F(UserLogReport, NeedsALearnedFormat) {
    makeLog("nonsense");
    RecordingTrace trace(TRC1_ERROR);
    _RequestThresholds thresholds = window("0", "9");
    EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Error: StringParser anchor missing for file " +
                                              m_path + ". Report request terminating. "));
}

TEST_F(UserLogReport, OfAnEmptyOrMissingLogHasNoState) {
    makeLog(wholeLine);
    RecordingTrace trace(TRC1_ERROR);
    _RequestThresholds thresholds = window("0", "9");
    EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    EXPECT_THAT(trace.messages(), IsEmpty());
    const Fault fault("open", EACCES);
    EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + m_path +
                                              " for report.  errno = 13; Permission denied"));
}

TEST_F(UserLogReport, TheBlockSizeIsDeterminedOnce) {
    makeLog(wholeLine);
    write("one\n");
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("stat", EACCES);
        EXPECT_THAT(report(), IsEmpty());
    }
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + m_path +
                                              ";  errno = 13; Permission denied."));
    EXPECT_EQ(report().size(), 1U);
    const Fault fault("stat", EACCES);
    EXPECT_EQ(report().size(), 1U);
    EXPECT_EQ(fault.calls(), 0);
}

TEST_F(UserLogReport, ReportsMemoryThatRunsOut) {
    makeLog(wholeLine);
    write("one\n");
    setBlockSize(512);
    RecordingTrace trace(TRC1_ERROR);
    _RequestThresholds thresholds = window("0", "9");
    {
        const Fault fault("new", ENOMEM);
        EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    }
    {
        const Fault fault("new", ENOMEM, {.skip = 1});
        EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Memory allocation of " + std::to_string(sizeof(UserlogBufferInfo)) +
                                " bytes failed.",
                            "Memory allocation of 513 bytes failed."));
}

TEST_F(UserLogReport, NeedsTheDate) {
    makeLog(wholeLine);
    write("one\n");
    RecordingTrace trace(TRC1_ERROR);
    _RequestThresholds thresholds = window("0", "9");
    const Fault fault("time", EFAULT);
    const Fault closed("close", EBADF, {.times = 0});
    EXPECT_EQ(m_log->startReportRequest(&thresholds), nullptr);
    EXPECT_EQ(closed.calls(), 1) << "the descriptor of a report that does not start";
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error: unable to determine current time to complete event entrytime. "
                            "errno = 14; Bad address."));
}

TEST_F(UserLogReport, TracesItsBufferInDetail) {
    makeLog(wholeLine);
    write("one\n");
    setBlockSize(512);
    RecordingTrace trace(TRC1_DETAIL);
    report();
    EXPECT_EQ(trace.count("Read buffer of size 512 allocated for file " + m_path + "."), 1);
}

TEST_F(UserLogReport, ClosesItsDescriptor) {
    makeLog(wholeLine);
    write("one\n");
    _RequestThresholds thresholds = window("0700101000000000", "1991231235959000");
    void* state = m_log->startReportRequest(&thresholds);
    ASSERT_NE(state, nullptr);
    const int fd = static_cast<UserlogBufferInfo*>(state)->fd;
    EXPECT_NE(fcntl(fd, F_GETFD), -1);
    m_log->endReportRequest(&state);
    EXPECT_EQ(fcntl(fd, F_GETFD), -1);
    EXPECT_EQ(errno, EBADF);
}

TEST_F(UserLogReport, AReadErrorEndsItWithWhatItHas) {
    makeLog(wholeLine);
    setBlockSize(16);
    write("line one\nline two\nline three\n");
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("read", EIO, {.skip = 1, .times = 1});
    EXPECT_THAT(descriptions(report()), ElementsAre("line three"))
        << "the cut line is not mistaken for the first";
    EXPECT_THAT(trace.messages(), ElementsAre(HasSubstr("Error while reading file " + m_path)));
}

TEST_F(UserLogReport, OfAFileThatShrinksEndsWithWhatItHas) {
    makeLog(wholeLine);
    setBlockSize(16);
    write("line one\nline two\nline three\n");
    _RequestThresholds thresholds = window("0700101000000000", "1991231235959000");
    void* state = m_log->startReportRequest(&thresholds);
    zrm_rmlogent_data_t row;
    ASSERT_NE(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    write("");
    EXPECT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    EXPECT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
    m_log->endReportRequest(&state);
}

// One chain of directives serves the monitor and every report.

TEST_F(UserLogReport, RunsConcurrentlyWithTheMonitorAndOtherReports) {
    makeLog(R"(A,"%s %d %[^\n]",month day description)");
    std::string content;
    std::vector<std::string> expected;
    for (int number = 0; number < 400; ++number) {
        const std::string text = "entry " + std::to_string(number);
        content += (number % 2 == 0 ? "Mar 7 " : "3 7 ") + text + "\n";
        expected.insert(expected.begin(), text);
    }
    write(content);
    RecordingTrace trace(TRC1_ERROR);
    std::atomic<bool> isDone{false};
    std::thread monitor([&] {
        for (int number = 0; !isDone; ++number) {
            std::string line = (number % 2 == 0 ? "Apr 9 " : "4 9 ") + std::to_string(number);
            zrm_rmlogent_data_t row;
            ASSERT_EQ(m_log->formatEntryAsRow(line.data(), &row, nullptr), 0);
            ASSERT_EQ(columnText(row.entrydesc), std::to_string(number));
            ASSERT_EQ(std::string(row.entrytime, 7), "1060409");
        }
    });
    std::vector<std::thread> reports;
    for (int thread = 0; thread < 3; ++thread) {
        reports.emplace_back([&] {
            for (int round = 0; round < 5; ++round) {
                const auto rows = report();
                ASSERT_EQ(descriptions(rows), expected);
                ASSERT_EQ(std::string(rows.front().entrytime, 7), "1060307");
            }
        });
    }
    for (std::thread& thread : reports) {
        thread.join();
    }
    isDone = true;
    monitor.join();
    EXPECT_THAT(trace.messages(), IsEmpty());
}

} // namespace
