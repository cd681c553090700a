// Thresholds of situations on entries of logs that are followed.

#include "tables/zrm_rmlogent_agent.h"
#include "tables/zrm_rmlogent_manager.h"

#include "TestRequest.h"
#include "logs/EntryClock.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class FollowedSituation : public testing::Test {
protected:
    void open(std::int64_t frequency, std::int64_t period, int op = 3) {
        m_test.number("FREQTHRESH", op, frequency).number("PERIODTHRS", 1, period);
        m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
        m_manager.requests().Add(m_request.get());
    }
    static zrm_rmlogent_data_t blankRow() {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        return row;
    }
    /// FREQTHRESH of the rows that are accepted when entries of these times arrive.
    std::vector<int> arrive(const std::vector<std::int64_t>& times) {
        m_test.dispatched.clear();
        for (const std::int64_t time : times) {
            zrm_rmlogent_data_t row = blankRow();
            const EntryInstant instant(time);
            m_manager.AddDataToEvent(&row, 1);
        }
        std::vector<int> frequencies;
        for (const std::string& bytes : m_test.dispatched) {
            zrm_rmlogent_data_t row;
            std::memcpy(&row, bytes.data(), sizeof row);
            frequencies.push_back(row.freqthresh);
        }
        return frequencies;
    }
    zrm_rmlogent_agent& agent() { return static_cast<zrm_rmlogent_agent&>(*m_request); }

    FakeClock m_clock{1'800'000'000};
    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_SITUATION};
    std::unique_ptr<ctreq> m_request;
    RecordingTrace m_trace{TRC1_ERROR};
};

TEST_F(FollowedSituation, EntriesCountAtTheirOwnTimesWhateverTheClockSays) {
    open(2, 60);
    EXPECT_THAT(arrive({1000, 1059, 1060, 5000, 5001, 1061}), ElementsAre(2, 2, 2, 3));
    EXPECT_THAT(m_trace.messages(), IsEmpty()) << "the columns are blank";
}

TEST_F(FollowedSituation, UpperBoundsCountTheSame) {
    open(2, 60, 4);
    EXPECT_THAT(arrive({1000, 1001, 1002, 1003, 1100}), ElementsAre(1, 2, 1));
}

TEST_F(FollowedSituation, EntriesOfTheLogConfigurationCountApart) {
    open(2, 60);
    zrm_rmlogent_data_t row = blankRow();
    std::memcpy(row.entrytime, "1270115080000000", sizeof row.entrytime);
    m_manager.AddDataToEvent(&row, 1);
    EXPECT_THAT(arrive({1'800'000'000}), IsEmpty());
    EXPECT_THAT(arrive({1'800'000'000}), ElementsAre(2));
}

TEST_F(FollowedSituation, TheTraceShowsTheDecision) {
    open(2, 60);
    m_trace.setLevel(TRC1_DETAIL);
    arrive({1000, 1001});
    EXPECT_THAT(
        m_trace.messages(),
        ElementsAre("Event frequency of 1 is < the thresholdof 2 for situation alpha. Event "
                    "discarded.",
                    "Event frequency of 2 is >= the threshold of 2 for situation alpha. Event "
                    "accepted."));
}

TEST_F(FollowedSituation, EarlierEntriesCountAndRaiseNothing) {
    open(2, 60);
    m_test.accepts = [](const char* row) { return row[0] != 'x'; };
    const EntryInstant instant(1000);
    zrm_rmlogent_data_t row = blankRow();
    agent().countEarlier(row);
    agent().countEarlier(row);
    row.originnode[0] = 'x'; // does not meet the conditions
    agent().countEarlier(row);
    EXPECT_THAT(m_test.dispatched, IsEmpty());
    EXPECT_THAT(arrive({1010}), ElementsAre(3));
}

TEST_F(FollowedSituation, OnlyConditionsOnTheLogDecideWhetherItCountsALogsEntries) {
    zrm_rmlogent_data_t row = blankRow();
    m_test.text("ENTRYDESC", 1, "another").text("LOGPATH", 1, "/var/log/");
    open(2, 60);
    m_test.comparison = 1;
    EXPECT_EQ(agent().periodOn(row), 60);
    m_test.comparison = 0;
    EXPECT_EQ(agent().periodOn(row), 0);
}

TEST_F(FollowedSituation, EarlierEntriesGoToAnOpenerThatCountsThemItself) {
    m_test.text("LOGPATH", 1, "/var/log/");
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    m_test.earlierPeriod = 300;
    m_test.accepts = [](const char* row) { return row[0] != 'x'; };
    zrm_rmlogent_data_t row = blankRow();
    m_test.comparison = 1;
    EXPECT_EQ(agent().periodOn(row), 300);
    m_test.comparison = 0;
    EXPECT_EQ(agent().periodOn(row), 0) << "another log";
    agent().countEarlier(row);
    EXPECT_THAT(m_test.earlier, IsEmpty()) << "of no followed log";
    const EntryInstant instant(1000);
    agent().countEarlier(row);
    row.originnode[0] = 'x'; // does not meet the conditions
    agent().countEarlier(row);
    EXPECT_EQ(m_test.earlier.size(), 1u);
    EXPECT_THAT(m_test.dispatched, IsEmpty());
}

TEST_F(FollowedSituation, WithoutThresholdsNothingIsCounted) {
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    zrm_rmlogent_data_t row = blankRow();
    EXPECT_EQ(agent().periodOn(row), 0);
    const EntryInstant instant(1000);
    agent().countEarlier(row);
    EXPECT_THAT(m_test.dispatched, IsEmpty());
}

} // namespace
