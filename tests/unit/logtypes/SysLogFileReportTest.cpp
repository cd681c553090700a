#include "SyslogReportTest.h"

#include "monitor/ReportOutcome.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <thread>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST_F(SyslogReport, ReturnsTheNewestEntryFirst) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "Oct  5 08:00:00 h s: two\n"
                                  "Oct  5 09:00:00 h s: three\n");
    EXPECT_THAT(report(), ElementsAre("three", "two", "one"));
}

TEST_F(SyslogReport, FillsWholeRows) {
    m_directory.write("messages", "Oct  5 07:03:09 web1 sshd[412]: Failed\n");
    start();
    ASSERT_TRUE(next());
    EXPECT_EQ(columnText(m_row.entrytime), "1061005070309000");
    EXPECT_EQ(columnText(m_row.entrysys), "web1");
    EXPECT_EQ(columnText(m_row.entrysrc), "sshd[412]");
    EXPECT_EQ(columnText(m_row.entrydesc), "Failed");
    EXPECT_EQ(columnText(m_row.logname), "messages");
    EXPECT_EQ(columnText(m_row.timestamp), "1061005120000000");
}

TEST_F(SyslogReport, IncludesTheBoundsOfTheWindow) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: older\n"
                                  "Oct  5 08:00:00 h s: first\n"
                                  "Oct  5 09:00:00 h s: last\n"
                                  "Oct  5 10:00:00 h s: newer\n");
    EXPECT_THAT(report("1061005080000000", "1061005090000000"), ElementsAre("last", "first"));
    EXPECT_THAT(report("1061005080001000", "1061005085959000"), IsEmpty());
    EXPECT_THAT(report("1061005100000000", farFuture), ElementsAre("newer"));
    EXPECT_THAT(report(farPast, "1061005070000000"), ElementsAre("older"));
    EXPECT_THAT(report(farPast, "1061005065959000"), IsEmpty());
}

TEST_F(SyslogReport, EndsAtTheFirstEntryThatIsOlder) {
    m_directory.write("messages", "Oct  5 09:00:00 h s: late entry of an early time's log\n"
                                  "Oct  5 07:00:00 h s: older\n"
                                  "Oct  5 09:30:00 h s: in time\n");
    EXPECT_THAT(report("1061005080000000", farFuture), ElementsAre("in time"));
}

TEST_F(SyslogReport, EndsAtALineWithoutAMonth) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "no time at all\n"
                                  "Oct  5 08:00:00 h s: two\n");
    EXPECT_THAT(report("1061005000000000", farFuture), ElementsAre("two"));
    m_directory.append("messages", "\n"); // an empty line
    EXPECT_THAT(report("1061005000000000", farFuture), IsEmpty());
}

TEST_F(SyslogReport, ReportsWhyItEnds) {
    const std::string old = "Oct  5 07:00:00 h s: one\n";
    const std::string last = "Oct  5 08:00:00 h s: two\n";
    const auto endOf = [this](const std::string& content) {
        m_directory.write("messages", content);
        const ReportOutcome outcome;
        report("1061005000000000", farFuture);
        return outcome.end();
    };
    EXPECT_EQ(endOf(old + last), ReportEnd::complete);
    EXPECT_EQ(endOf("Oct  4 07:00:00 h s: before\n" + last), ReportEnd::complete);
    EXPECT_EQ(endOf(old + "no time at all\n" + last), ReportEnd::noTime);
    EXPECT_EQ(endOf(old + "Oct  5 07:30:00 h s: " + std::string(2000, 'x') + "\n" + last),
              ReportEnd::longLine);
    const Fault fault("read", EIO);
    EXPECT_EQ(endOf(old + last), ReportEnd::readError);
}

TEST_F(SyslogReport, AWindowOpenToThePastIncludesTheLinesWithoutAMonth) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "no time at all\n"
                                  "Oct  5 08:00:00 h s: two\n");
    EXPECT_THAT(report("                ", farFuture), ElementsAre("two", "", "one"));
}

TEST_F(SyslogReport, AcceptsALastLineWithoutANewline) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\nOct  5 08:00:00 h s: two");
    EXPECT_THAT(report(), ElementsAre("tw", "one"));
    m_directory.write("messages", "Oct  5 07:00:00 h s: only");
    EXPECT_THAT(report(), ElementsAre("onl"));
}

TEST_F(SyslogReport, CannotStartOnAnEmptyLog) {
    RecordingTrace trace(TRC1_DETAIL);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_TRUE(trace.contains("Log " + m_path + " is empty; report request terminating."));
}

TEST_F(SyslogReport, OmitsWhatIsAppendedMeanwhile) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    start();
    m_directory.append("messages", "Oct  5 08:00:00 h s: two\n");
    ASSERT_TRUE(next());
    EXPECT_EQ(columnText(m_row.entrydesc), "one");
    EXPECT_FALSE(next());
}

TEST_F(SyslogReport, DatesEntriesAcrossTheNewYear) {
    m_clock.set(1167825600); // 3 January 2007, 12:00:00 UTC
    EXPECT_THAT(times("Dec 30 10:00:00 h s: a\n"
                      "Dec 31 10:00:00 h s: b\n"
                      "Jan  1 10:00:00 h s: c\n"
                      "Jan  2 10:00:00 h s: d\n"
                      "Jan  3 10:00:00 h s: e\n"),
                ElementsAre("1070103100000000", "1070102100000000", "1070101100000000",
                            "1061231100000000", "1061230100000000"));
}

TEST_F(SyslogReport, GoesBackOneYearAtEachCrossing) {
    m_clock.set(946857600); // 3 January 2000
    EXPECT_THAT(times("Mar  1 10:00:00 h s: a\n"
                      "Dec 31 10:00:00 h s: b\n"
                      "Feb  1 10:00:00 h s: c\n"
                      "Dec 31 10:00:00 h s: d\n"
                      "Jan  2 10:00:00 h s: e\n"),
                ElementsAre("1000102100000000", "0991231100000000", "0990201100000000",
                            "0981231100000000", "0980301100000000"));
}

TEST_F(SyslogReport, AnEntryDatedAfterTodayIsFromLastYear) {
    EXPECT_THAT(times("Oct  6 00:00:00 h s: a\n"
                      "Oct  5 23:00:00 h s: later today\n"),
                ElementsAre("1061005230000000", "1051006000000000"));
}

TEST_F(SyslogReport, DatesSkippedEntriesToo) {
    m_clock.set(1167825600); // 3 January 2007
    m_directory.write("messages", "Dec 31 10:00:00 h s: a\n"
                                  "Jan  1 10:00:00 h s: b\n");
    EXPECT_THAT(report(farPast, "1061231235959000"), ElementsAre("a"));
}

TEST_F(SyslogReport, TracesTheBufferInDetail) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    const FakeBlockSize blocks(4096);
    RecordingTrace trace(TRC1_DETAIL);
    start();
    EXPECT_EQ(trace.messages()[0], "Read buffer of size 4097 allocated for file " + m_path + ".");
}

TEST_F(SyslogReport, CannotStartWhenTheFileIsGone) {
    std::filesystem::remove(m_path);
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + m_path +
                                              ";  errno = 2; No such file or directory."));
}

TEST_F(SyslogReport, CannotStartWithoutMemory) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    const FakeBlockSize blocks(4096);
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("new", ENOMEM);
        EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Memory allocation of " + std::to_string(sizeof(SyslogBufferInfo)) +
                            " bytes failed."));
    trace.clear();
    {
        const Fault fault("new", ENOMEM, {.skip = 1});
        EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Memory allocation of 4097 bytes failed."));
}

TEST_F(SyslogReport, CannotStartWhenTheFileCannotBeOpened) {
    const Fault fault("open", EACCES);
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + m_path +
                                              " for report.  errno = 13; Permission denied"));
}

TEST_F(SyslogReport, ClosesItsDescriptorAtItsEnd) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    start();
    const int fd = static_cast<SyslogBufferInfo*>(m_state)->fd;
    RecordingTrace trace(TRC1_DETAIL);
    m_log->endReportRequest(&m_state);
    EXPECT_EQ(m_state, nullptr);
    EXPECT_THAT(trace.messages(),
                ElementsAre("fd " + std::to_string(fd) + " closed for report on " + m_path + "."));
    m_log->endReportRequest(&m_state); // a report that never started
}

TEST_F(SyslogReport, AReadThatFailsEndsTheReportWithWhatItHas) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 100; ++i) {
        content += "Oct  5 07:00:00 h s: line " + std::to_string(i) + "\n";
    }
    m_directory.write("messages", content);
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("read", EIO, {.skip = 1});
    start();
    int given = 0;
    while (next()) {
        ++given;
    }
    EXPECT_GT(given, 20);
    EXPECT_LT(given, 100);
    EXPECT_FALSE(next()); // it has ended permanently
    EXPECT_THAT(trace.messages(), ElementsAre("Error while reading file " + m_path +
                                              ". Bytes requested = 1024. Bytes received = -1."));
}

TEST_F(SyslogReport, ALogThatShrinksEndsTheReportWithWhatItHas) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 100; ++i) {
        content += "Oct  5 07:00:00 h s: line\n";
    }
    m_directory.write("messages", content);
    start();
    ASSERT_TRUE(next());
    m_directory.write("messages", "");
    int given = 1;
    while (next()) {
        ++given;
    }
    EXPECT_GT(given, 20);
    EXPECT_LT(given, 100);
    EXPECT_FALSE(next());
}

TEST_F(SyslogReport, TwoReportsAtOnceDoNotDisturbEachOther) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 200; ++i) {
        content += "Oct  5 07:00:00 h s: line " + std::to_string(i) + ".\n";
    }
    m_directory.write("messages", content);
    const auto read = [&] {
        _RequestThresholds thresholds = window(farPast, farFuture);
        for (int round = 0; round < 20; ++round) {
            void* state = m_log->startReportRequest(nullptr);
            zrm_rmlogent_data_t row;
            for (int i = 199; i >= 0; --i) {
                ASSERT_NE(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
                ASSERT_EQ(columnText(row.entrydesc), "line " + std::to_string(i) + ".");
            }
            ASSERT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
            m_log->endReportRequest(&state);
        }
    };
    std::thread other(read);
    read();
    other.join();
}

} // namespace
