// Registration of the Log Entries table and the fan-out of new rows to its open situations.

#include "tables/zrm_rmlogent_agent.h"
#include "tables/zrm_rmlogent_manager.h"

#include "TestRequest.h"
#include "host/framework/Tables.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <thread>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// Registration is once per process, so each of these runs in a process of its own.

bool registersOnce() {
    zrm_rmlogent_data_t row{};
    if (zrm_rmlogent_manager::EventArrived(&row, 1) != 0 || zrm_rmlogent_init() != 0) {
        return false;
    }
    TableManager* const manager = Tables::find("RMLOGENT");
    TestRequest test(SAMPLE_SITUATION);
    const std::unique_ptr<ctreq> request(manager->CreateCtreq(&test, nullptr));
    manager->requests().Add(request.get());
    test.dispatchStatus = 5;
    return manager->application() == std::string("ZRM") &&
           zrm_rmlogent_manager::EventArrived(&row, 1) == 5 && test.dispatched.size() == 1;
}

bool reportsMissingMemory() {
    const Fault fault("new", ENOMEM);
    zrm_rmlogent_data_t row{};
    return zrm_rmlogent_init() == 0x21060002 && Tables::find("RMLOGENT") == nullptr &&
           zrm_rmlogent_manager::EventArrived(&row, 1) == 0;
}

bool passesTheFrameworksStatus() {
    TestCalls::registrationStatus() = 0x12345678;
    return zrm_rmlogent_init() == 0x12345678;
}

class LogEntriesRegistrationDeathTest : public testing::Test {
protected:
    LogEntriesRegistrationDeathTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
    static void check(bool (*behaves)()) {
        EXPECT_EXIT(std::_Exit(behaves() ? 7 : 1), testing::ExitedWithCode(7), "");
    }
};

TEST_F(LogEntriesRegistrationDeathTest, EventsReachTheTableOnceItIsRegistered) {
    check(registersOnce);
}

TEST_F(LogEntriesRegistrationDeathTest, MissingMemoryLeavesTheTableUnregistered) {
    check(reportsMissingMemory);
}

TEST_F(LogEntriesRegistrationDeathTest, TheFrameworksStatusIsPassedOn) {
    check(passesTheFrameworksStatus);
}

class LogEntriesManager : public testing::Test {
protected:
    LogEntriesManager() { TestCalls::all().clear(); }

    std::unique_ptr<ctreq> open(TestRequest& test) {
        std::unique_ptr<ctreq> request(m_manager.CreateCtreq(&test, nullptr));
        m_manager.requests().Add(request.get());
        return request;
    }

    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    zrm_rmlogent_data_t m_rows[3]{};
};

TEST_F(LogEntriesManager, CreatesRequestsOfTheTable) {
    TestRequest test(SAMPLE_SITUATION);
    const std::unique_ptr<ctreq> request(m_manager.CreateCtreq(&test, nullptr));
    EXPECT_NE(dynamic_cast<zrm_rmlogent_agent*>(request.get()), nullptr);
    EXPECT_EQ(request->manager(), &m_manager);
    EXPECT_STREQ(request->name(), "alpha");
}

TEST_F(LogEntriesManager, CreatesNoRequestWithoutMemory) {
    TestRequest test(SAMPLE_SITUATION);
    const Fault fault("new", ENOMEM);
    EXPECT_EQ(m_manager.CreateCtreq(&test, nullptr), nullptr);
}

TEST_F(LogEntriesManager, WithoutRequestsNothingHappens) {
    EXPECT_EQ(m_manager.AddDataToEvent(m_rows, 3), 0U);
    EXPECT_THAT(TestCalls::all(), IsEmpty());
}

TEST_F(LogEntriesManager, EveryRequestIsPinnedServedAndDispatchedInTurn) {
    TestRequest alpha(SAMPLE_SITUATION, "alpha");
    TestRequest beta(SAMPLE_SITUATION, "beta");
    const auto first = open(alpha);
    const auto second = open(beta);
    beta.accepts = [](const char*) { return false; };
    EXPECT_EQ(m_manager.AddDataToEvent(m_rows, 3), 0U);
    EXPECT_THAT(TestCalls::all(), ElementsAre("alpha pin", "alpha dispatch 3", "alpha drop",
                                              "beta pin", "beta dispatch 0", "beta drop"));
    EXPECT_EQ(first->count, 0U);
    ASSERT_EQ(alpha.dispatched.size(), 3U);
    // The lock is free again.
    ASSERT_EQ(pthread_mutex_trylock(&m_manager.lock()->mutex), 0);
    pthread_mutex_unlock(&m_manager.lock()->mutex);
}

TEST_F(LogEntriesManager, RowsAreDispatchedOnce) {
    TestRequest test(SAMPLE_SITUATION);
    const auto request = open(test);
    m_manager.AddDataToEvent(m_rows, 2);
    m_manager.AddDataToEvent(m_rows, 1);
    EXPECT_THAT(test.calls, ElementsAre("pin", "dispatch 2", "pin", "dispatch 1"));
}

TEST_F(LogEntriesManager, AnEmptyArrayIsDispatchedToo) {
    TestRequest test(SAMPLE_SITUATION);
    const auto request = open(test);
    EXPECT_EQ(m_manager.AddDataToEvent(m_rows, 0), 0U);
    EXPECT_THAT(test.calls, ElementsAre("pin", "dispatch 0"));
}

TEST_F(LogEntriesManager, TheLastFailedDispatchIsReportedAndStopsNothing) {
    TestRequest tests[4] = {TestRequest(SAMPLE_SITUATION), TestRequest(SAMPLE_SITUATION),
                            TestRequest(SAMPLE_SITUATION), TestRequest(SAMPLE_SITUATION)};
    std::vector<std::unique_ptr<ctreq>> requests;
    for (TestRequest& test : tests) {
        requests.push_back(open(test));
    }
    tests[0].dispatchStatus = 11;
    tests[2].dispatchStatus = 22;
    EXPECT_EQ(m_manager.AddDataToEvent(m_rows, 1), 22U);
    for (const TestRequest& test : tests) {
        EXPECT_EQ(test.dispatched.size(), 1U);
    }
    // A failed insertion concerns the request alone.
    tests[0].dispatchStatus = tests[2].dispatchStatus = 0;
    tests[1].insertStatus = {99};
    EXPECT_EQ(m_manager.AddDataToEvent(m_rows, 1), 0U);
}

TEST_F(LogEntriesManager, ArraysOfSeveralThreadsAreServedOneAtATime) {
    TestRequest alpha(SAMPLE_SITUATION, "alpha");
    TestRequest beta(SAMPLE_SITUATION, "beta");
    const auto first = open(alpha);
    const auto second = open(beta);
    constexpr int threads = 4;
    constexpr int arrays = 200;
    std::vector<std::thread> logs;
    for (int log = 0; log < threads; ++log) {
        logs.emplace_back([&, log] {
            zrm_rmlogent_data_t rows[2]{};
            for (int i = 0; i < arrays; ++i) {
                rows[0].sampleno = rows[1].sampleno = log;
                rows[0].rowno = 2 * i;
                rows[1].rowno = 2 * i + 1;
                m_manager.AddDataToEvent(rows, 2);
            }
        });
    }
    for (std::thread& log : logs) {
        log.join();
    }
    for (const TestRequest* test : {&alpha, &beta}) {
        ASSERT_EQ(test->dispatched.size(), std::size_t{2 * threads * arrays});
        std::vector<int> next(threads, 0);
        for (std::size_t i = 0; i < test->dispatched.size(); ++i) {
            zrm_rmlogent_data_t row;
            std::memcpy(&row, test->dispatched[i].data(), sizeof row);
            const auto log = static_cast<std::size_t>(row.sampleno);
            ASSERT_EQ(row.rowno, next[log]++) << "a row was lost or out of order";
        }
    }
    // Each array went to both requests before the next one came.
    const std::vector<std::string> turn = {"alpha pin", "alpha dispatch 2", "alpha drop",
                                           "beta pin",  "beta dispatch 2",  "beta drop"};
    for (std::size_t i = 0; i < TestCalls::all().size(); ++i) {
        ASSERT_EQ(TestCalls::all()[i], turn[i % turn.size()]);
    }
}

} // namespace
