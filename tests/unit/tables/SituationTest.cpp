// The life of a Log Entries situation, and which rows its thresholds let through.

#include "tables/zrm_rmlogent_base.h"
#include "tables/zrm_rmlogent_manager.h"

#include "base/BrevanTime.h"
#include "tables/Timestamp.h"

#include "TestLogs.h"
#include "TestRequest.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <memory>
#include <random>
#include <thread>

using namespace zrm;
using namespace zrm::host;

// Timestamp::countEvents finds every chain intact unless a test says otherwise.
namespace {
std::atomic<bool> chainIsCorrupted{false};
}
extern "C" long __real__ZN3zrm9Timestamp11countEventsEl(Timestamp* head, long period);
extern "C" long __wrap__ZN3zrm9Timestamp11countEventsEl(Timestamp* head, long period);
extern "C" long __wrap__ZN3zrm9Timestamp11countEventsEl(Timestamp* head, long period) {
    return chainIsCorrupted ? -1 : __real__ZN3zrm9Timestamp11countEventsEl(head, period);
}

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long now = 1'800'000'000;

/// A row with this time and number.
zrm_rmlogent_data_t rowAt(long time, int number = 0) {
    zrm_rmlogent_data_t row;
    std::memset(&row, ' ', sizeof row);
    BrevanTime::generateTimestamp(time, row.entrytime);
    row.sampleno = 0;
    row.rowno = number;
    return row;
}

zrm_rmlogent_data_t rowOf(const std::string& bytes) {
    zrm_rmlogent_data_t row;
    std::memcpy(&row, bytes.data(), sizeof row);
    return row;
}

class Situation : public testing::Test {
protected:
    ~Situation() override { chainIsCorrupted = false; }

    void open(int op, std::int64_t frequency, std::int64_t period) {
        m_test.number("FREQTHRESH", op, frequency).number("PERIODTHRS", 1, period);
        open();
    }
    void open() {
        m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
        m_manager.requests().Add(m_request.get());
    }
    /// Delivers one event and returns the messages. Accepted rows are appended to `dispatched`.
    std::vector<std::string> arrive(zrm_rmlogent_data_t row, unsigned traceClass = TRC1_DETAIL) {
        RecordingTrace trace(traceClass);
        m_manager.AddDataToEvent(&row, 1);
        return trace.messages();
    }
    /// FREQTHRESH of each accepted row.
    std::vector<int> frequencies() const {
        std::vector<int> values;
        for (const std::string& row : m_test.dispatched) {
            values.push_back(rowOf(row).freqthresh);
        }
        return values;
    }

    TimeZone m_zone{"UTC0"};
    FakeClock m_clock{now};
    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_SITUATION};
    std::unique_ptr<ctreq> m_request;
};

TEST_F(Situation, ConstructionAndDestructionAreTracedWithTheTime) {
    RecordingTrace trace(TRC1_DETAIL);
    open();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Object created for situation alpha at Fri Jan 15 08:00:00 2027\n"));
    trace.clear();
    m_clock.set(now + 61);
    m_request.reset();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Object destroyed for situation alpha at Fri Jan 15 08:01:01 2027\n"));
}

TEST_F(Situation, UsesNoLogManager) {
    TestLogs logs;
    open();
    m_request.reset();
    EXPECT_THAT(logs.calls, IsEmpty());
}

TEST_F(Situation, AnUnknownSampleTypeIsStopped) {
    TestLogs logs;
    m_test.sampleType = static_cast<SampleType>(5);
    RecordingTrace trace(TRC1_ERROR);
    open();
    EXPECT_THAT(trace.messages(), ElementsAre("Invalid request received; sample type = 5"));
    EXPECT_THAT(m_test.stopped, ElementsAre(2));
    EXPECT_EQ(m_test.stops, 0);
    trace.clear();
    trace.setLevel(TRC1_DETAIL | TRC1_ERROR);
    m_request.reset();
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_THAT(logs.calls, IsEmpty());
}

TEST_F(Situation, WithoutThresholdsEveryRowPasses) {
    open();
    EXPECT_THAT(arrive(rowAt(1), TRC1_DETAIL | TRC1_ERROR), IsEmpty());
    zrm_rmlogent_data_t blank;
    std::memset(&blank, ' ', sizeof blank);
    EXPECT_THAT(arrive(blank, TRC1_DETAIL | TRC1_ERROR), IsEmpty());
    EXPECT_THAT(frequencies(), ElementsAre(0, 0));
}

TEST_F(Situation, AtLeastTwoDiscardsTheFirstAndAcceptsTheSecond) {
    open(3, 2, 60);
    EXPECT_THAT(arrive(rowAt(now)),
                ElementsAre("Event frequency of 1 is < the thresholdof 2 for situation alpha. "
                            "Event discarded."));
    EXPECT_THAT(frequencies(), IsEmpty());
    m_clock.set(now + 30);
    EXPECT_THAT(arrive(rowAt(now + 30)),
                ElementsAre("Event frequency of 2 is >= the threshold of 2 for situation alpha. "
                            "Event accepted."));
    EXPECT_THAT(frequencies(), ElementsAre(2));
    EXPECT_EQ(rowOf(m_test.dispatched[0]).periodthrs, 60);
    m_clock.set(now + 31);
    arrive(rowAt(now + 31));
    EXPECT_THAT(frequencies(), ElementsAre(2, 3)) << "the observed frequency, not the threshold";
    // Both earlier events are now outside the period.
    m_clock.set(now + 95);
    EXPECT_THAT(arrive(rowAt(now + 95)),
                ElementsAre("Event frequency of 1 is < the thresholdof 2 for situation alpha. "
                            "Event discarded."));
}

TEST_F(Situation, AtMostTwoAcceptsUntilThereAreMore) {
    open(4, 2, 60);
    EXPECT_THAT(arrive(rowAt(now)),
                ElementsAre("Event frequency of 1 is <= the threshold of 2 for situation alpha. "
                            "Event accepted."));
    arrive(rowAt(now));
    EXPECT_THAT(arrive(rowAt(now)),
                ElementsAre("Event frequency of 3 is > the thresholdof 2 for situation alpha. "
                            "Event discarded."));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2));
    m_clock.set(now + 60);
    arrive(rowAt(now + 60));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2, 1));
}

TEST_F(Situation, ChecksAreTracedPerRow) {
    open(3, 1, 60);
    EXPECT_THAT(arrive(rowAt(now), TRC1_FINE),
                ElementsAre("Event passed to situation alpha for evaluation.",
                            "Passing row 0 to InsertRow().",
                            "Performing frequency/period threshold checks for situation alpha.",
                            "timestamp passed: sec 00, min 00, hour 08, mday 15, mon 01, year 27, "
                            "century 1"));
}

TEST_F(Situation, RowsThatFailTheConditionsDoNotCount) {
    open(3, 2, 60);
    m_test.accepts = [](const char*) { return false; };
    arrive(rowAt(now));
    arrive(rowAt(now));
    m_test.accepts = nullptr;
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), IsEmpty());
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), ElementsAre(2));
}

TEST_F(Situation, RowsWithoutAUsableTimeAreDropped) {
    open(3, 1, 60);
    zrm_rmlogent_data_t blank;
    std::memset(&blank, ' ', sizeof blank);
    // Dropped as the first of its kind, when there is no chain, ...
    EXPECT_THAT(arrive(blank), IsEmpty());
    EXPECT_THAT(arrive(rowAt(-86400)), IsEmpty()) << "before the epoch";
    EXPECT_THAT(frequencies(), IsEmpty());
    arrive(rowAt(now));
    // ... and without disturbing the chain.
    EXPECT_THAT(arrive(blank), IsEmpty());
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2));
    EXPECT_THAT(m_test.stopped, IsEmpty());
}

TEST_F(Situation, AnEventOutsideThePeriodDropsTheChain) {
    open(4, 5, 60);
    arrive(rowAt(now));
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2));
    // An entry older than the period, as when a log is read late.
    EXPECT_THAT(arrive(rowAt(now - 61), TRC1_DETAIL | TRC1_ERROR), IsEmpty());
    EXPECT_THAT(frequencies(), ElementsAre(1, 2));
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2, 1)) << "the count starts over";
    // Setting the clock back does not restore the dropped event.
    arrive(rowAt(now - 61));
    m_clock.set(now - 61);
    arrive(rowAt(now - 61));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2, 1, 1));
}

TEST_F(Situation, ACorruptedChainStopsIt) {
    open(3, 1, 60);
    chainIsCorrupted = true;
    EXPECT_THAT(arrive(rowAt(now), TRC1_ERROR),
                ElementsAre("Timestamp chain corrupted.  Stopping situation."));
    EXPECT_THAT(m_test.stopped, ElementsAre(1));
    EXPECT_EQ(m_test.stops, 1);
    EXPECT_THAT(m_test.calls, ElementsAre("pin", "stopped 1", "stop", "dispatch 0"));
}

TEST_F(Situation, WithoutMemoryARowIsDropped) {
    open(3, 1, 60);
    arrive(rowAt(now));
    {
        const Fault fault("new", ENOMEM);
        EXPECT_THAT(arrive(rowAt(now), TRC1_ERROR),
                    ElementsAre("Memory allocation for " + std::to_string(sizeof(Timestamp)) +
                                " bytes failed. Event discarded."));
    }
    arrive(rowAt(now));
    EXPECT_THAT(frequencies(), ElementsAre(1, 2));
}

TEST_F(Situation, TheFrameworksStatusOfAnInsertionIsPassedOn) {
    open(3, 1, 60);
    m_test.insertStatus = {13};
    zrm_rmlogent_data_t rows[2] = {rowAt(now), rowAt(now)};
    EXPECT_EQ(static_cast<zrm_rmlogent_base&>(*m_request).AddData(rows, 2), 13U);
    EXPECT_EQ(m_request->count, 0U);
}

/// What a situation with thresholds is meant to do, told with a plain list.
class Model {
public:
    Model(bool atMost, long bound, long period)
        : m_atMost(atMost), m_bound(bound), m_period(period) {}

    /// The frequency of an accepted event, or 0 if it is discarded.
    long arrive(long time, long clock) {
        m_times.insert(m_times.begin(), time);
        const long cutOff = std::max(clock - m_period, 0L);
        std::size_t count = 0;
        while (count < m_times.size() && m_times[count] > cutOff) {
            ++count;
        }
        m_times.resize(count); // nothing is kept once the head is outside the period
        const auto frequency = static_cast<long>(count);
        return frequency != 0 && (m_atMost ? frequency <= m_bound : frequency >= m_bound)
                   ? frequency
                   : 0;
    }

private:
    bool m_atMost;
    long m_bound;
    long m_period;
    std::vector<long> m_times; ///< newest arrival first
};

TEST_F(Situation, BehavesLikeAPlainModelOfRandomEvents) {
    const unsigned seed = std::random_device{}();
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 random(seed);
    const auto pick = [&](long low, long high) {
        return std::uniform_int_distribution<long>(low, high)(random);
    };
    for (int run = 0; run < 200; ++run) {
        const bool atMost = pick(0, 1) == 1;
        const long bound = pick(1, 8);
        const long period = pick(0, 9) == 0 ? 2 * now : pick(1, 120);
        TestRequest test(SAMPLE_SITUATION);
        test.number("FREQTHRESH", atMost ? 4 : 3, bound).number("PERIODTHRS", 1, period);
        const std::unique_ptr<ctreq> request(m_manager.CreateCtreq(&test, nullptr));
        m_manager.requests().Add(request.get());

        Model model(atMost, bound, period);
        std::vector<std::pair<int, int>> expected; // number of the event, frequency
        long clock = now;
        for (int event = 0; event < 100; ++event) {
            clock += pick(0, 3) == 0 ? pick(0, period) % 200 : pick(0, 3);
            m_clock.set(clock);
            // Mostly the current time; sometimes late, out of order or ahead of the clock.
            const long time = pick(0, 4) != 0 ? clock : clock - pick(-10, period % 200 + 10);
            zrm_rmlogent_data_t row = rowAt(time, event);
            if (pick(0, 19) == 0) {
                std::memset(row.entrytime, ' ', sizeof row.entrytime);
            } else if (const long frequency = model.arrive(time, clock)) {
                expected.emplace_back(event, static_cast<int>(frequency));
            }
            m_manager.AddDataToEvent(&row, 1);
        }
        std::vector<std::pair<int, int>> accepted;
        for (const std::string& row : test.dispatched) {
            accepted.emplace_back(rowOf(row).rowno, rowOf(row).freqthresh);
        }
        ASSERT_EQ(accepted, expected) << (atMost ? "at most " : "at least ") << bound << " in "
                                      << period << " seconds, run " << run;
        m_manager.requests().Remove(request.get());
    }
}

TEST_F(Situation, CountsTheEventsOfSeveralThreads) {
    open(3, 1, 1000);
    constexpr int threads = 4;
    constexpr int events = 250;
    std::vector<std::thread> logs;
    for (int log = 0; log < threads; ++log) {
        logs.emplace_back([&] {
            for (int i = 0; i < events; ++i) {
                zrm_rmlogent_data_t row = rowAt(now);
                m_manager.AddDataToEvent(&row, 1);
            }
        });
    }
    for (std::thread& log : logs) {
        log.join();
    }
    std::vector<int> expected(threads * events);
    for (std::size_t i = 0; i < expected.size(); ++i) {
        expected[i] = static_cast<int>(i + 1);
    }
    EXPECT_EQ(frequencies(), expected);
}

} // namespace
