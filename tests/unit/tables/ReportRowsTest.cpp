// The rows that Log Entries reports return, and how they end.

#include "ReportFixture.h"
#include "monitor/ReportOutcome.h"
#include "support/Faults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <string>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

using ReportRows = Report;

TEST_F(ReportRows, ReturnsTheLogsEntries) {
    nameAndWindow();
    m_log.entries = 7;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(rows(), upTo(7));
    EXPECT_EQ(m_log.asked, 8);
    EXPECT_EQ(m_log.ends, 1);
}

TEST_F(ReportRows, PassesItsRowsToTheFilterButNotAsEvents) {
    nameAndWindow();
    m_log.entries = 2;
    EXPECT_THAT(sample(TRC1_FINE),
                ElementsAre("Passing row 0 to InsertRow().", "Passing row 1 to InsertRow()."));
}

TEST_F(ReportRows, AnEmptyLogReturnsNoRows) {
    nameAndWindow();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.asked, 1);
    EXPECT_EQ(m_log.ends, 1);
}

TEST_F(ReportRows, ReadsInBatchesOfTwenty) {
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

TEST_F(ReportRows, EndsAtTheRowLimit) {
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

TEST_F(ReportRows, ReportsHowFarItReachedAndWhyItEnded) {
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

TEST_F(ReportRows, WhatCannotBeReportedIsNotComplete) {
    const ReportOutcome outcome;
    sample(0);
    EXPECT_EQ(outcome.end(), ReportEnd::notRead);
}

TEST_F(ReportRows, ALimitBelowOneBatchShrinksTheBatch) {
    gMaxRows = 3;
    nameAndWindow();
    m_log.entries = 3;
    EXPECT_EQ(sample(TRC1_DETAIL).back(),
              "Maximum report row limit of 3 reached. Request terminating.");
    EXPECT_EQ(rows(), upTo(3));
    EXPECT_EQ(m_log.asked, 3);
}

TEST_F(ReportRows, TheLimitCountsEntriesReadNotRowsReturned) {
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

TEST_F(ReportRows, ALogThatCannotStartReturnsNoRows) {
    nameAndWindow();
    m_log.entries = 7;
    m_log.canReport = false;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.asked, 0);
    EXPECT_EQ(m_log.ends, 0);
}

TEST_F(ReportRows, WithoutMemoryReturnsNoRows) {
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

TEST_F(ReportRows, ARefusedRowEndsItsBatchOnly) {
    nameAndWindow();
    m_log.entries = 25;
    m_test.insertStatus = {0, 0, 8};
    sample(0);
    EXPECT_THAT(rows(), ElementsAre(0, 1, 20, 21, 22, 23, 24));
}

TEST_F(ReportRows, EachSampleStartsAfresh) {
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
