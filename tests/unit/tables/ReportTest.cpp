// Log Entries reports: which log they read, over which window, and the rows they return.

#include "monitor/ReportOutcome.h"
#include "tables/zrm_rmlogent_manager.h"

#include "base/ProcessValues.h"

#include "TestLogs.h"
#include "TestRequest.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <numeric>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr int equal = 1;
constexpr int greaterOrEqual = 3;
constexpr int lessOrEqual = 4;
const std::string startStamp = "1261120070000000";
const std::string endStamp = "1261120080000000";
const std::string noName = "A valid file name was not found.  Request terminating.";
const std::string noWindow = "Report start and/or end time missing. Terminating request.";

class Report : public testing::Test {
protected:
    Report() { gMaxRows = 1000; }
    ~Report() override { gMaxRows = 1000; }

    void name(const std::string& path, const std::string& file) {
        m_test.text("LOGPATH", equal, path).text("LOGNAME", equal, file);
    }
    void window() {
        m_test.text("ENTRYTIME", greaterOrEqual, startStamp)
            .text("ENTRYTIME", lessOrEqual, endStamp);
    }
    /// A report on the whole log.
    void nameAndWindow() {
        name("/var/adm/", "messages");
        window();
    }
    /// Takes one sample and returns its messages.
    std::vector<std::string> sample(unsigned traceClass) {
        if (!m_request) {
            m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
        }
        RecordingTrace trace(traceClass);
        m_request->TakeSample();
        return trace.messages();
    }
    /// The numbers of the rows that the sample collected.
    std::vector<int> rows() const {
        std::vector<int> numbers;
        for (unsigned i = 0; i < m_request->count; ++i) {
            zrm_rmlogent_data_t row;
            std::memcpy(&row, m_request->rows() + std::size_t{i} * sizeof row, sizeof row);
            numbers.push_back(row.rowno);
        }
        return numbers;
    }
    static std::vector<int> upTo(int count) {
        std::vector<int> numbers(static_cast<std::size_t>(count));
        std::iota(numbers.begin(), numbers.end(), 0);
        return numbers;
    }

    TestLogs m_logs;
    TestLog& m_log = m_logs.add("/var/adm/messages");
    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_REPORT, "report"};
    std::unique_ptr<ctreq> m_request;
};

// The hold on the chain of logs.

TEST_F(Report, HoldsTheChainOfLogsFromConstructionToDestruction) {
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    EXPECT_THAT(m_logs.calls, ElementsAre("begin"));
    m_request.reset();
    EXPECT_THAT(m_logs.calls, ElementsAre("begin", "end"));
}

TEST_F(Report, WithoutALogManagerReturnsNothing) {
    m_logs.withdraw();
    nameAndWindow();
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("Log Manager not found. Request terminating."));
    m_request.reset();
    EXPECT_THAT(m_logs.calls, IsEmpty());
}

TEST_F(Report, ConstructionAndDestructionAreNotTraced) {
    RecordingTrace trace(TRC1_DETAIL | TRC1_ERROR);
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    m_request.reset();
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_THAT(m_test.stopped, IsEmpty());
}

// The log.

TEST_F(Report, PathAndNameAreJoined) {
    nameAndWindow();
    sample(0);
    EXPECT_THAT(m_logs.calls, ElementsAre("begin", "find /var/adm/messages"));
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, DecisionsAreTracedInTheDetailClass) {
    nameAndWindow();
    EXPECT_THAT(
        sample(TRC1_DETAIL),
        ElementsAre("Log path = /var/adm/.", "Log name = messages.",
                    "Filter column name  = LOGPATH.", "Filter column name  = LOGNAME.",
                    "Filter column name  = ENTRYTIME.", "Report start time = 1261120070000000.",
                    "Filter column name  = ENTRYTIME.", "Report end time = 1261120080000000.",
                    "Request start time = 1261120070000000; request end time = "
                    "1261120080000000."));
}

TEST_F(Report, APathWithoutItsSeparatorMatchesNoLog) {
    name("/var/adm", "messages");
    window();
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Log file /var/admmessages is not being monitored.", noName));
    EXPECT_EQ(m_request->count, 0U);
}

TEST_F(Report, WithoutAPathOrANameThereIsNoLog) {
    window();
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path is null.", "Log name is null."));
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noName));
    m_test.text("LOGPATH", equal, "/var/adm/").text("LOGNAME", equal, "   ");
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path = /var/adm/.", "Log name is null."));
    m_test.filters.clear();
    m_test.text("LOGNAME", equal, "messages").raw("LOGPATH", equal, 452, "/var/adm/", -1);
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path is null.", "Log name = messages."));
    EXPECT_THAT(m_logs.calls, ElementsAre("begin"));
}

TEST_F(Report, PaddingOfNamesIsIgnored) {
    name("/var/adm/   ", "messages        ");
    window();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, UTF8NamesAreConvertedToTheLocalCodePage) {
    TestLog& umlaut = m_logs.add("/var/\xFC/gr\xFC\xDF"
                                 "e");
    m_test
        .text("ULOGNAME", equal,
              "gr\xC3\xBC\xC3\x9F"
              "e")
        .text("ULOGPATH", equal, "/var/\xC3\xBC/");
    window();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(umlaut.starts, 1);
}

TEST_F(Report, TheFirstSpellingOfEachPartWins) {
    m_test.text("ULOGPATH", equal, "/var/adm/")
        .text("LOGPATH", equal, "/other/")
        .text("LOGNAME", equal, "messages")
        .text("ULOGNAME", equal, "other");
    window();
    sample(0);
    EXPECT_EQ(m_log.starts, 1);
    EXPECT_EQ(m_logs.calls.back(), "find /var/adm/messages");
}

TEST_F(Report, ConditionsAreReadUntilTheLogIsNamed) {
    name("/var/adm/", "other");
    m_test.text("ENTRYSRC", equal, "sshd").text("ENTRYTYPE", equal, "never reached");
    sample(0);
    EXPECT_EQ(m_test.fetched, 2);
}

TEST_F(Report, NamesAreCutAtTheirColumns) {
    const std::string path = "/" + std::string(300, 'p');
    const std::string file(200, 'n');
    name(path, file);
    window();
    sample(0);
    EXPECT_EQ(m_logs.calls.back(), "find " + path.substr(0, 256) + file.substr(0, 128));
}

TEST_F(Report, TheLongestConvertedNamesAreJoinedWhole) {
    const std::string path = "/" + std::string(3000, 'p');
    const std::string file(3000, 'n');
    m_test.text("ULOGPATH", equal, path).text("ULOGNAME", equal, file);
    window();
    EXPECT_EQ(sample(TRC1_ERROR).size(), 2U);
    EXPECT_EQ(m_logs.calls.back(), "find " + path.substr(0, 1152) + file.substr(0, 384));
}

// The window.

TEST_F(Report, NeedsBothTimes) {
    name("/var/adm/", "messages");
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
    m_test.text("ENTRYTIME", greaterOrEqual, startStamp);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.starts, 0);
    // The batch left from the previous sample is replaced.
    m_log.entries = 3;
    m_test.text("ENTRYTIME", lessOrEqual, endStamp);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(rows(), upTo(3));
}

TEST_F(Report, NeedsAnEndWithAStart) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, endStamp);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
}

TEST_F(Report, ABlankTimeCountsAsMissing) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, endStamp)
        .text("ENTRYTIME", greaterOrEqual, std::string(16, ' '));
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
}

TEST_F(Report, TimesOfAnImpossibleLengthAreIgnored) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", greaterOrEqual, startStamp + "0")
        .raw("ENTRYTIME", lessOrEqual, 452, endStamp, -1);
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Invalid ENTRYTIME threshold; value length is 17. Threshold ignored.",
                            "Invalid ENTRYTIME threshold; value length is -1. Threshold ignored.",
                            noWindow));
}

TEST_F(Report, TimesWithAnotherOperatorAreIgnored) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", 6, startStamp).text("ENTRYTIME", 5, endStamp);
    window();
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Invalid ENTRYTIME compare operator; value is 6. Threshold ignored.",
                            "Invalid ENTRYTIME compare operator; value is 5. Threshold ignored."));
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, ALaterTimeReplacesAnEarlierOneUntilBothAreKnown) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, "1111111111111111")
        .text("ENTRYTIME", lessOrEqual, endStamp)
        .text("ENTRYTIME", greaterOrEqual, startStamp)
        .text("ENTRYTIME", greaterOrEqual, "0000000000000000");
    sample(0);
    EXPECT_STREQ(m_log.seen.startTime, startStamp.c_str());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, TimesAreReadUntilBothAreKnown) {
    name("/var/adm/", "messages");
    window();
    m_test.text("ENTRYTIME", lessOrEqual, "9999999999999999").text("ENTRYTIME", equal, startStamp);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, ATimeIsTakenAsSixteenBytesWhateverItsLength) {
    name("/var/adm/", "messages");
    m_test.raw("ENTRYTIME", greaterOrEqual, 452, startStamp, 0)
        .raw("ENTRYTIME", lessOrEqual, 452, endStamp, 13);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_STREQ(m_log.seen.startTime, startStamp.c_str());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, HasNoEventRateThresholds) {
    m_test.number("FREQTHRESH", greaterOrEqual, 5).number("PERIODTHRS", equal, 60);
    nameAndWindow();
    m_log.entries = 2;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_log.seen.freqThreshold, 0);
    EXPECT_EQ(m_log.seen.periodThreshold, 0);
    EXPECT_EQ(rows(), upTo(2));
}

// The rows.

TEST_F(Report, ReturnsTheLogsEntries) {
    nameAndWindow();
    m_log.entries = 7;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(rows(), upTo(7));
    EXPECT_EQ(m_log.asked, 8);
    EXPECT_EQ(m_log.ends, 1);
}

TEST_F(Report, PassesItsRowsToTheFilterButNotAsEvents) {
    nameAndWindow();
    m_log.entries = 2;
    EXPECT_THAT(sample(TRC1_FINE),
                ElementsAre("Passing row 0 to InsertRow().", "Passing row 1 to InsertRow()."));
}

TEST_F(Report, AnEmptyLogReturnsNoRows) {
    nameAndWindow();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.asked, 1);
    EXPECT_EQ(m_log.ends, 1);
}

TEST_F(Report, ReadsInBatchesOfTwenty) {
    nameAndWindow();
    m_log.entries = 40;
    sample(0);
    EXPECT_EQ(rows(), upTo(40));
    EXPECT_EQ(m_log.asked, 41);
    ASSERT_EQ(m_log.places.size(), 41U);
    for (std::size_t i = 0; i < m_log.places.size(); ++i) {
        EXPECT_EQ(m_log.places[i], static_cast<std::ptrdiff_t>(i % 20 * 2864)) << i;
    }
}

TEST_F(Report, EndsAtTheRowLimit) {
    gMaxRows = 25;
    nameAndWindow();
    m_log.entries = 100;
    const auto messages = sample(TRC1_DETAIL);
    EXPECT_EQ(messages.back(), "Maximum report row limit of 25 reached. Request terminating.");
    EXPECT_EQ(rows(), upTo(25));
    EXPECT_EQ(m_log.asked, 25) << "a batch of 20 and one of 5";
    EXPECT_EQ(m_log.places[20], 0);
    EXPECT_EQ(m_log.places[24], 4 * 2864);
    EXPECT_EQ(m_log.ends, 1);
}

TEST_F(Report, ReportsHowFarItReachedAndWhyItEnded) {
    nameAndWindow();
    m_log.entries = 30;
    {
        const ReportOutcome outcome;
        sample(0);
        EXPECT_TRUE(outcome.isComplete());
        EXPECT_EQ(outcome.reached(), "1261120073000000");
    }
    gMaxRows = 25;
    {
        const ReportOutcome outcome;
        sample(0);
        EXPECT_EQ(outcome.end(), ReportEnd::rowLimit);
    }
    m_log.canReport = false;
    const ReportOutcome outcome;
    sample(0);
    EXPECT_EQ(outcome.end(), ReportEnd::notRead);
    EXPECT_EQ(outcome.reached(), "");
}

TEST_F(Report, WhatCannotBeReportedIsNotComplete) {
    const ReportOutcome outcome;
    sample(0);
    EXPECT_EQ(outcome.end(), ReportEnd::notRead);
}

TEST_F(Report, ALimitBelowOneBatchShrinksTheBatch) {
    gMaxRows = 3;
    nameAndWindow();
    m_log.entries = 3;
    EXPECT_EQ(sample(TRC1_DETAIL).back(),
              "Maximum report row limit of 3 reached. Request terminating.");
    EXPECT_EQ(rows(), upTo(3));
    EXPECT_EQ(m_log.asked, 3);
}

TEST_F(Report, TheLimitCountsEntriesReadNotRowsReturned) {
    gMaxRows = 25;
    nameAndWindow();
    m_log.entries = 100;
    m_test.accepts = [](const char* row) {
        std::int32_t number;
        std::memcpy(&number, row + offsetof(zrm_rmlogent_data_t, rowno), sizeof number);
        return number % 10 == 0;
    };
    sample(0);
    EXPECT_THAT(rows(), ElementsAre(0, 10, 20));
    EXPECT_EQ(m_log.asked, 25);
}

TEST_F(Report, ALogThatCannotStartReturnsNoRows) {
    nameAndWindow();
    m_log.entries = 7;
    m_log.canReport = false;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.asked, 0);
    EXPECT_EQ(m_log.ends, 0);
}

TEST_F(Report, WithoutMemoryReturnsNoRows) {
    nameAndWindow();
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    const Fault fault("new", ENOMEM, {.times = 2});
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Memory allocation for 57280 bytes failed. Request terminating."));
    gMaxRows = 3;
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Memory allocation for 8592 bytes failed. Request terminating."));
    EXPECT_EQ(m_log.starts, 0);
}

TEST_F(Report, ARefusedRowEndsItsBatchOnly) {
    nameAndWindow();
    m_log.entries = 25;
    m_test.insertStatus = {0, 0, 8};
    sample(0);
    EXPECT_THAT(rows(), ElementsAre(0, 1, 20, 21, 22, 23, 24));
}

TEST_F(Report, EachSampleStartsAfresh) {
    nameAndWindow();
    m_log.entries = 2;
    sample(0);
    m_log.entries = 1;
    sample(0);
    EXPECT_EQ(rows(), upTo(1));
    EXPECT_EQ(m_log.starts, 2);
    EXPECT_EQ(m_log.ends, 2);
}

} // namespace
