// Both tables under the host's own requests: what an operator's conditions select.

#include "tables/zrm_rmlogent_manager.h"
#include "tables/zrm_rmmonlog_manager.h"

#include "base/BrevanTime.h"
#include "host/framework/Request.h"
#include "host/framework/Sample.h"
#include "host/framework/Tables.h"

#include "TestLogs.h"
#include "support/AllocationCount.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/framework/Conditions.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <memory>
#include <thread>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long now = 1'800'000'000;

/// Keeps the numbers and frequencies of the rows that it receives.
class Receiver : public RowReceiver {
public:
    unsigned receive(const ctreq& request, const char* rows, unsigned count) override {
        for (unsigned i = 0; i < count; ++i) {
            zrm_rmlogent_data_t row;
            std::memcpy(&row, rows + std::size_t{i} * request.rowSize, sizeof row);
            received.emplace_back(row.rowno, row.freqthresh);
        }
        return 0;
    }
    void stopped(const ctreq&, unsigned reason) override { reasons.push_back(reason); }

    std::vector<std::pair<int, int>> received;
    std::vector<unsigned> reasons;
};

template <std::size_t width> void fill(char (&column)[width], std::string_view text) {
    std::memset(column, ' ', width);
    std::memcpy(column, text.data(), std::min(text.size(), width));
}

zrm_rmlogent_data_t rowOf(std::string_view logname, int number, long time = now) {
    zrm_rmlogent_data_t row;
    std::memset(&row, ' ', sizeof row);
    fill(row.logpath, "/var/log/");
    fill(row.logname, logname);
    BrevanTime::generateTimestamp(time, row.entrytime);
    row.freqthresh = row.periodthrs = row.sampleno = 0;
    row.rowno = number;
    return row;
}

RequestDetail situation(std::vector<Condition> conditions) {
    RequestDetail detail;
    detail.name = "alpha";
    detail.conditions = std::move(conditions);
    return detail;
}

class HostRequests : public testing::Test {
protected:
    static void SetUpTestSuite() {
        ASSERT_EQ(zrm_rmmonlog_init(), 0U);
        ASSERT_EQ(zrm_rmlogent_init(), 0U);
    }
    void TearDown() override { EXPECT_THAT(m_trace.messages(), IsEmpty()); }

    static TableManager& logEntries() { return *Tables::find("RMLOGENT"); }

    static void arrive(zrm_rmlogent_data_t row) {
        EXPECT_EQ(zrm_rmlogent_manager::EventArrived(&row, 1), 0U);
    }

    FakeClock m_clock{now};
    RecordingTrace m_trace{TRC1_ERROR};
    Receiver m_receiver;
};

TEST_F(HostRequests, ASituationReceivesTheRowsOfItsLog) {
    const Request request(logEntries(),
                          situation({textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
                                     textCondition("LOGNAME", INTF_EQUAL, "auth.log")}),
                          m_receiver);
    ASSERT_TRUE(request.isOpen());
    arrive(rowOf("auth.log", 1));
    arrive(rowOf("syslog", 2));
    arrive(rowOf("auth.log.1", 3));
    arrive(rowOf("auth.log", 4));
    EXPECT_THAT(m_receiver.received, ElementsAre(std::pair(1, 0), std::pair(4, 0)));
}

TEST_F(HostRequests, AClosedSituationReceivesNothing) {
    { const Request request(logEntries(), situation({}), m_receiver); }
    arrive(rowOf("auth.log", 1));
    EXPECT_THAT(m_receiver.received, IsEmpty());
}

TEST_F(HostRequests, ThresholdConditionsHoldForTheRowsTheyLetThrough) {
    struct Case {
        _IntfOper op;
        int value;
        std::vector<std::pair<int, int>> expected; // number and frequency of accepted rows
    };
    const Case cases[] = {
        {INTF_GREATER_OR_EQUAL, 2, {{2, 2}, {3, 3}}},
        {INTF_GREATER, 2, {{3, 3}}},
        {INTF_LESS_OR_EQUAL, 2, {{1, 1}, {2, 2}}},
        {INTF_LESS, 2, {{1, 1}}},
    };
    for (const Case& test : cases) {
        Receiver receiver;
        const Request request(logEntries(),
                              situation({textCondition("LOGNAME", INTF_EQUAL, "auth.log"),
                                         numberCondition("FREQTHRESH", test.op, test.value),
                                         numberCondition("PERIODTHRS", INTF_EQUAL, 60)}),
                              receiver);
        for (int i = 1; i <= 3; ++i) {
            arrive(rowOf("syslog", 100)); // does not count
            arrive(rowOf("auth.log", i));
        }
        EXPECT_EQ(receiver.received, test.expected) << "operator " << test.op;
    }
}

TEST_F(HostRequests, IncompleteThresholdsLetEveryRowThrough) {
    const std::vector<std::vector<Condition>> inert = {
        {numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 1),
         numberCondition("PERIODTHRS", INTF_EQUAL, 0)},
        {numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 1)},
        {numberCondition("FREQTHRESH", INTF_LESS, 1),
         numberCondition("PERIODTHRS", INTF_EQUAL, 60)},
        {numberCondition("PERIODTHRS", INTF_EQUAL, 60)},
    };
    for (const std::vector<Condition>& conditions : inert) {
        Receiver receiver;
        const Request request(logEntries(), situation(conditions), receiver);
        arrive(rowOf("auth.log", 1));
        EXPECT_THAT(receiver.received, ElementsAre(std::pair(1, 0)))
            << conditions.front().column << ' ' << conditions.front().op;
    }
}

TEST_F(HostRequests, AThresholdThatTheTableRefusesLetsEveryRowThrough) {
    const Request request(logEntries(),
                          situation({numberCondition("FREQTHRESH", INTF_EQUAL, 3),
                                     numberCondition("PERIODTHRS", INTF_EQUAL, 60)}),
                          m_receiver);
    EXPECT_THAT(m_trace.messages(), ElementsAre("Invalid FREQTHRESH threshold compare operator; "
                                                "value is 1. Threshold ignored."));
    m_trace.clear();
    arrive(rowOf("auth.log", 1));
    EXPECT_THAT(m_receiver.received, ElementsAre(std::pair(1, 0)));
}

TEST_F(HostRequests, AReportReadsTheLogNamedByItsEqualConditions) {
    TestLogs logs;
    logs.add("/var/log/auth.log").entries = 3;
    logs.add("/var/log/syslog").entries = 5;
    const auto sample = Sample::take(
        "RMLOGENT", {textCondition("LOGNAME", INTF_NOT_EQUAL, "syslog"),
                     textCondition("LOGPATH", INTF_STARTS, "/var"),
                     textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
                     textCondition("LOGNAME", INTF_EQUAL, "auth.log"),
                     textCondition("ENTRYTIME", INTF_GREATER_OR_EQUAL, "1260101"),
                     textCondition("ENTRYTIME", INTF_LESS_OR_EQUAL, "1270101000000000")});
    ASSERT_TRUE(sample.has_value());
    EXPECT_EQ(sample->size(), 3U);
    EXPECT_THAT(logs.calls, ElementsAre("begin", "find /var/log/auth.log", "end"));
}

TEST_F(HostRequests, ReportsReadTheLogNamedByTheirConditions) {
    TestLogs logs;
    logs.add("/var/log/auth.log").entries = 45;
    const auto sample = Sample::take(
        "RMLOGENT", {textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
                     textCondition("LOGNAME", INTF_EQUAL, "auth.log"),
                     textCondition("ENTRYTIME", INTF_GREATER_OR_EQUAL, "1260101"),
                     textCondition("ENTRYTIME", INTF_LESS_OR_EQUAL, "1270101000000000")});
    ASSERT_TRUE(sample.has_value());
    EXPECT_EQ(sample->size(), 45U);
    // A short time is used unchanged, so it still compares as a text.
    EXPECT_STREQ(logs.logs[0]->seen.startTime, "1260101");
    EXPECT_STREQ(logs.logs[0]->seen.endTime, "1270101000000000");
    EXPECT_EQ(logs.logs[0]->asked, 46);
    EXPECT_THAT(logs.calls, ElementsAre("begin", "find /var/log/auth.log", "end"));
}

TEST_F(HostRequests, MonitoredLogsAreSampled) {
    TestLogs logs;
    const TemporaryDirectory directory;
    for (const char* const name : {"auth.log", "syslog", "other"}) {
        logs.add(directory.write(name, ""));
    }
    const auto sample =
        Sample::take("RMMONLOG", {textCondition("LOGNAME", INTF_NOT_EQUAL, "syslog")});
    ASSERT_TRUE(sample.has_value());
    ASSERT_EQ(sample->size(), 2U);
    const RowColumn* const name = sample->layout().find("LOGNAME");
    EXPECT_EQ(name->text(sample->row(0)), "auth.log");
    EXPECT_EQ(name->text(sample->row(1)), "other");
}

TEST_F(HostRequests, RefusedRowsCostNoAllocation) {
    std::vector<std::unique_ptr<Request>> requests;
    for (int i = 0; i < 100; ++i) {
        requests.push_back(std::make_unique<Request>(
            logEntries(),
            situation({textCondition("LOGNAME", INTF_EQUAL, "auth.log"),
                       textCondition("ENTRYDESC", INTF_EQUAL, "situation " + std::to_string(i)),
                       numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 5),
                       numberCondition("PERIODTHRS", INTF_EQUAL, 60)}),
            m_receiver));
    }
    zrm_rmlogent_data_t row = rowOf("auth.log", 1);
    zrm_rmlogent_manager::EventArrived(&row, 1); // conditions are compiled with the first row
    const long before = allocationCount();
    for (int i = 0; i < 100; ++i) {
        zrm_rmlogent_manager::EventArrived(&row, 1);
    }
    EXPECT_EQ(allocationCount() - before, 0);
    EXPECT_THAT(m_receiver.received, IsEmpty());
}

TEST_F(HostRequests, ARowKeepsTheLastRequestsThresholdsEvenIfItIsSkipped) {
    const Request first(logEntries(), situation({}), m_receiver);
    const auto conditions = [](std::string log, int frequency, int period) {
        return situation({textCondition("LOGNAME", INTF_EQUAL, std::move(log)),
                          numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, frequency),
                          numberCondition("PERIODTHRS", INTF_EQUAL, period)});
    };
    const Request second(logEntries(), conditions("syslog", 5, 60), m_receiver);
    zrm_rmlogent_data_t row = rowOf("auth.log", 1);
    EXPECT_EQ(zrm_rmlogent_manager::EventArrived(&row, 1), 0U);
    EXPECT_EQ(row.freqthresh, 5);
    EXPECT_EQ(row.periodthrs, 60);
    EXPECT_THAT(m_receiver.received, ElementsAre(std::pair(1, 0)));
    // A request that accepts the row leaves its count of entries there.
    const Request third(logEntries(), conditions("auth.log", 1, 50), m_receiver);
    EXPECT_EQ(zrm_rmlogent_manager::EventArrived(&row, 1), 0U);
    EXPECT_EQ(row.freqthresh, 1);
    EXPECT_EQ(row.periodthrs, 50);
}

TEST_F(HostRequests, NoRequestIsSkippedWhileTheTraceWouldShowIt) {
    const Request mine(logEntries(), situation({textCondition("LOGNAME", INTF_EQUAL, "auth.log")}),
                       m_receiver);
    const Request other(logEntries(), situation({textCondition("LOGNAME", INTF_EQUAL, "syslog")}),
                        m_receiver);
    arrive(rowOf("auth.log", 1));
    m_trace.setLevel(TRC1_FINE);
    arrive(rowOf("auth.log", 2));
    m_trace.setLevel(TRC1_ERROR);
    arrive(rowOf("auth.log", 3));
    EXPECT_EQ(m_trace.count("Event passed to situation alpha for evaluation."), 2);
    EXPECT_EQ(m_trace.count("Passing row 0 to InsertRow()."), 1);
    EXPECT_THAT(m_receiver.received,
                ElementsAre(std::pair(1, 0), std::pair(2, 0), std::pair(3, 0)));
    m_trace.clear();
}

TEST_F(HostRequests, SituationsComeAndGoWhileRowsArrive) {
    Receiver lasting;
    const Request request(logEntries(), situation({}), lasting);
    constexpr int threads = 3;
    constexpr int rows = 300;
    std::atomic<int> running{threads};
    std::vector<std::thread> logs;
    for (int log = 0; log < threads; ++log) {
        logs.emplace_back([&] {
            for (int i = 0; i < rows; ++i) {
                arrive(rowOf("auth.log", i));
            }
            --running;
        });
    }
    do {
        Receiver receiver;
        const Request passing(logEntries(),
                              situation({numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 1),
                                         numberCondition("PERIODTHRS", INTF_EQUAL, 60)}),
                              receiver);
        ASSERT_TRUE(passing.isOpen());
    } while (running != 0);
    for (std::thread& log : logs) {
        log.join();
    }
    EXPECT_EQ(lasting.received.size(), std::size_t{threads * rows});
}

} // namespace
