#include "host/situations/SituationRunner.h"

#include "base/LockGuard.h"
#include "host/events/EventQueue.h"
#include "logs/zrm_rmlogent_data.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstring>
#include <memory>
#include <optional>
#include <thread>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using State = SituationRunner::State;

SituationConfig named(const char* name) {
    SituationConfig config;
    config.name = name;
    config.severity = "info";
    return config;
}

class SituationRunnerTest : public testing::Test {
protected:
    void arrive() {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        entries.AddDataToEvent(&row, 1);
    }
    std::size_t raised() const { return queue.backlog(reader); }

    RecordingTrace trace{TRC1_ERROR};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    EventQueue queue{64, sizeof(zrm_rmlogent_data_t)};
    EventQueue::Reader reader = queue.addReader();
    std::shared_ptr<SituationCounts> counts = std::make_shared<SituationCounts>();
};

TEST_F(SituationRunnerTest, OpensAndCloses) {
    SituationRunner runner(entries, queue);
    EXPECT_EQ(runner.state("a"), State::ABSENT);
    runner.start("a", named("a"), counts);
    EXPECT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::OPEN);
    arrive();
    EXPECT_EQ(raised(), 1u);
    EXPECT_EQ(counts->raised(), 1u);
    EXPECT_GT(counts->lastRaised(), 1'700'000'000'000);
    runner.stop("a");
    EXPECT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::ABSENT);
    arrive();
    EXPECT_EQ(raised(), 1u);
    // The counts continue where they were.
    runner.start("a", named("a"), counts);
    EXPECT_TRUE(runner.settle(10s));
    arrive();
    EXPECT_EQ(counts->raised(), 2u);
    EXPECT_EQ(counts->requests.judged(), 2u);
    EXPECT_EQ(counts->requests.matched(), 2u);
}

TEST_F(SituationRunnerTest, WaitsForTheTablesLockWithoutBlockingTheCaller) {
    SituationRunner runner(entries, queue);
    runner.start("old", named("old"), counts);
    ASSERT_TRUE(runner.settle(10s));
    auto newCounts = std::make_shared<SituationCounts>();
    {
        // As a log thread does that waits for room in the queue.
        const LockGuard guard(entries.lock());
        runner.stop("old");
        runner.start("new", named("new"), newCounts);
        EXPECT_FALSE(runner.settle(20ms));
        EXPECT_EQ(runner.state("old"), State::ABSENT);
        EXPECT_EQ(runner.state("new"), State::OPENING);
    }
    EXPECT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("new"), State::OPEN);
    arrive();
    EXPECT_EQ(counts->raised(), 0u);
    EXPECT_EQ(newCounts->raised(), 1u);
}

TEST_F(SituationRunnerTest, TheLastRequestWinsWhileItWaits) {
    SituationRunner runner(entries, queue);
    auto later = std::make_shared<SituationCounts>();
    {
        const LockGuard guard(entries.lock());
        for (int round = 0; round < 10; ++round) {
            runner.start("a", named("a"), counts);
            runner.stop("a");
        }
        runner.start("a", named("a"), later);
        runner.start("b", named("b"), counts);
        runner.stop("b");
    }
    EXPECT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::OPEN);
    EXPECT_EQ(runner.state("b"), State::ABSENT);
    arrive();
    EXPECT_EQ(raised(), 1u);
    EXPECT_EQ(later->raised(), 1u);
    EXPECT_EQ(counts->raised(), 0u);
}

TEST_F(SituationRunnerTest, CloseIsFinal) {
    SituationRunner runner(entries, queue);
    runner.start("a", named("a"), counts);
    runner.start("b", named("b"), std::make_shared<SituationCounts>());
    runner.close();
    runner.close();
    arrive();
    EXPECT_EQ(raised(), 0u);
    runner.start("a", named("a"), counts);
    EXPECT_EQ(runner.state("a"), State::ABSENT);
    EXPECT_TRUE(runner.settle(0s));
}

TEST(SituationRunner, ReportsWhatTheTableRefusedAndWhatTheAgentStopped) {
    const RecordingTrace trace(TRC1_ERROR);
    TestManager table;
    EventQueue queue(1, sizeof(TestRow));
    SituationRunner runner(table, queue);
    table.gives = false;
    runner.start("a", named("a"), std::make_shared<SituationCounts>());
    ASSERT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::REFUSED);
    table.gives = true;
    table.onCreate = [](TestRequest& request) { request.Stopped(1); };
    runner.start("a", named("a"), std::make_shared<SituationCounts>());
    ASSERT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::ENDED);
    table.onCreate = nullptr;
    runner.start("a", named("a"), std::make_shared<SituationCounts>());
    ASSERT_TRUE(runner.settle(10s));
    EXPECT_EQ(runner.state("a"), State::OPEN);
}

} // namespace
