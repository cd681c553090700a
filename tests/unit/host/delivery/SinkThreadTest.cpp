#include "host/delivery/SinkThread.h"

#include "host/base/TimeText.h"
#include "host/delivery/QueueSource.h"
#include "host/silences/Silences.h"
#include "support/RecordingTrace.h"
#include "unit/host/events/TestEvents.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = EventQueue::Clock;
using testing::ElementsAre;

/// What a test sink does and has seen; shared with the sink, which belongs to its thread.
struct TestState {
    std::atomic<int> failures{0};         ///< deliveries that still fail; -1: all
    std::atomic<std::size_t> taken{1000}; ///< events that a failing delivery takes
    std::atomic<bool> throws{false};      ///< a failing delivery throws
    std::atomic<bool> waits{false};       ///< a delivery waits until it is to give up, and fails
    std::atomic<bool> isWaiting{false};   ///< one is waiting
    std::atomic<Clock::time_point> waitsSince{}; ///< the epoch: it does not wait
    std::mutex mutex;
    std::vector<std::uint64_t> ids;
    std::vector<Clock::time_point> tries;

    std::vector<std::uint64_t> seen() {
        const std::lock_guard guard(mutex);
        return ids;
    }
};

class TestSink : public Sink {
public:
    explicit TestSink(std::shared_ptr<TestState> state) : m_state(std::move(state)) {}
    std::string name() const override { return "test"; }
    std::string error() const override { return "no room"; }
    std::optional<Clock::time_point> waitsSince() const override {
        const Clock::time_point since = m_state->waitsSince;
        return since == Clock::time_point{} ? std::nullopt : std::optional(since);
    }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override {
        while (m_state->waits && !giveUp.stop_requested()) {
            m_state->isWaiting = true;
            std::this_thread::sleep_for(1ms);
        }
        if (m_state->waits) {
            return 0;
        }
        const std::lock_guard guard(m_state->mutex);
        m_state->tries.push_back(Clock::now());
        std::size_t count = events.size();
        if (m_state->failures != 0) {
            m_state->failures -= m_state->failures > 0 ? 1 : 0;
            if (m_state->throws) {
                throw std::runtime_error("no memory");
            }
            count = std::min(count - 1, m_state->taken.load());
        }
        for (const EventRecord& event : events.first(count)) {
            m_state->ids.push_back(event.id);
        }
        return count;
    }

private:
    std::shared_ptr<TestState> m_state;
};

class SinkThreadTest : public testing::Test {
protected:
    void push(int count) {
        for (int number = 0; number < count; ++number) {
            EXPECT_TRUE(queue.push(label, row.bytes()));
        }
    }
    std::unique_ptr<EventSource> source() {
        return std::make_unique<QueueSource>(queue, EventJson(testLayout()), silences, true);
    }
    static std::vector<std::uint64_t> upTo(std::uint64_t last) {
        std::vector<std::uint64_t> ids;
        for (std::uint64_t id = 1; id <= last; ++id) {
            ids.push_back(id);
        }
        return ids;
    }

    static bool eventually(const std::function<bool()>& condition) {
        const auto limit = Clock::now() + 10s;
        while (!condition() && Clock::now() < limit) {
            std::this_thread::sleep_for(1ms);
        }
        return condition();
    }

    RecordingTrace trace{TRC1_ERROR};
    Silences silences;
    TestRow row{"/var/log/", "app.log", "text", 7};
    EventQueue queue{100, sizeof(TestRow)};
    std::shared_ptr<const SituationLabel> label = std::make_shared<const SituationLabel>();
    std::shared_ptr<TestState> state = std::make_shared<TestState>();
    SinkThread thread{source(), std::make_unique<TestSink>(state), "jsonl"};
};

TEST_F(SinkThreadTest, DeliversEverythingInOrder) {
    thread.start();
    push(250); // more than fits into the queue
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
    EXPECT_EQ(state->seen(), upTo(250));
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(SinkThreadTest, PassesOverWhatIsSilenced) {
    push(10);
    Silence silence;
    silence.until = WallClock::now() + 3'600'000;
    ASSERT_TRUE(silences.add(silence));
    push(10); // judged when the source reads them: a source without a history judges late
    thread.start();
    ASSERT_TRUE(eventually([&] { return queue.state().size == 0; }));
    EXPECT_THAT(state->seen(), ElementsAre());
    EXPECT_EQ(silences.find(1)->events, 20u);
    ASSERT_TRUE(silences.expire(1, "", WallClock::now()));
    push(2);
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
    EXPECT_THAT(state->seen(), ElementsAre(21u, 22u));
}

/// A source whose events with even ids are silenced.
class HalfSilenced : public EventSource {
public:
    explicit HalfSilenced(std::uint64_t count) {
        for (std::uint64_t id = 1; id <= count; ++id) {
            EventRecord& event = m_events.emplace_back();
            event.id = id;
            event.silence = id % 2 == 0 ? 1 : 0;
        }
    }
    std::span<const EventRecord> read(std::size_t most) override {
        const auto rest = std::span<const EventRecord>(m_events).subspan(m_begin);
        return rest.first(std::min(most, rest.size()));
    }
    void release(std::size_t count) override { m_begin += count; }
    std::uint64_t backlog() const override { return m_events.size() - m_begin; }
    void end() override {}

private:
    std::vector<EventRecord> m_events;
    std::atomic<std::size_t> m_begin{0};
};

TEST_F(SinkThreadTest, ARetryBeginsWithTheFirstEventThatIsNotSilencedAndWasNotTaken) {
    state->taken = 3;
    state->failures = 2;
    SinkThread half(std::make_unique<HalfSilenced>(21), std::make_unique<TestSink>(state), "jsonl");
    half.start();
    EXPECT_EQ(half.finish(Clock::now() + 10s), 0u);
    EXPECT_THAT(state->seen(), ElementsAre(1u, 3u, 5u, 7u, 9u, 11u, 13u, 15u, 17u, 19u, 21u));
    EXPECT_EQ(half.state().delivered, 11u);
}

TEST_F(SinkThreadTest, AReaderThatTakesNothingForSecondsIsAFailure) {
    thread.start();
    state->waitsSince = Clock::now();
    EXPECT_NE(thread.state().condition, SinkState::Condition::FAILING);
    EXPECT_EQ(thread.state().error, "");
    state->waitsSince = Clock::now() - 20s;
    EXPECT_EQ(thread.state().condition, SinkState::Condition::FAILING);
    EXPECT_THAT(thread.state().error,
                testing::MatchesRegex("the reader has taken nothing for 2[0-9] s"));
    state->waitsSince = Clock::time_point{};
    EXPECT_NE(thread.state().condition, SinkState::Condition::FAILING);
    EXPECT_EQ(thread.state().error, "");
}

TEST_F(SinkThreadTest, DeliversAtOnce) {
    thread.start();
    const auto pushed = Clock::now();
    push(1);
    while (state->seen().empty()) {
        ASSERT_LT(Clock::now() - pushed, 10s);
        std::this_thread::yield();
    }
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
}

TEST_F(SinkThreadTest, RetriesAfterGrowingPausesFromWhereItStopped) {
    state->failures = 3;
    state->taken = 2;
    thread.start();
    push(20);
    EXPECT_TRUE(trace.waitFor("Sink test takes events again."));
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
    EXPECT_EQ(state->seen(), upTo(20));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error delivering events to test: no room. Trying again.",
                            "Sink test takes events again."));
}

TEST_F(SinkThreadTest, ThePausesGrowWhileNothingIsDelivered) {
    state->failures = 3;
    state->taken = 0;
    push(2); // two, so that a failing delivery takes none
    thread.start();
    EXPECT_TRUE(trace.waitFor("Sink test takes events again."));
    thread.finish(Clock::now() + 10s);
    ASSERT_GE(state->tries.size(), 4u);
    EXPECT_GE(state->tries[1] - state->tries[0], 75ms);
    EXPECT_GE(state->tries[2] - state->tries[1], 150ms);
    EXPECT_GE(state->tries[3] - state->tries[2], 300ms);
}

TEST_F(SinkThreadTest, ADeliveryInterruptedByTheStopIsNotRetried) {
    state->waits = true;
    thread.start();
    push(3);
    while (thread.state().lag < 3 || !state->isWaiting) {
        std::this_thread::sleep_for(1ms);
    }
    EXPECT_EQ(thread.finish(Clock::now()), 3u);
    EXPECT_THAT(trace.messages(), ElementsAre()) << "there is no retry to announce";
    EXPECT_EQ(thread.state().error, "no room");
}

TEST_F(SinkThreadTest, AnExceptionIsAFailure) {
    state->failures = 2;
    state->throws = true;
    thread.start();
    push(3);
    EXPECT_TRUE(trace.waitFor("Sink test takes events again."));
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
    EXPECT_EQ(state->seen(), upTo(3));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error delivering events to test: no memory. Trying again.",
                            "Sink test takes events again."));
    EXPECT_EQ(thread.state().error, "");
}

TEST_F(SinkThreadTest, FinishGivesUpAtTheLimitAndCountsWhatIsLeft) {
    state->failures = -1;
    state->taken = 0;
    thread.start();
    push(5);
    EXPECT_TRUE(trace.waitFor("Error delivering events to test: no room. Trying again."));
    EXPECT_EQ(thread.finish(Clock::now() + 50ms), 5u);
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 5u) << "once is enough";
    EXPECT_FALSE(queue.push(label, "1234567"));
}

TEST_F(SinkThreadTest, FinishRetriesSoonHoweverLongThePauseHasGrown) {
    state->failures = -1;
    state->taken = 0;
    push(2);
    thread.start();
    const auto tries = [&] {
        const std::lock_guard guard(state->mutex);
        return state->tries.size();
    };
    while (tries() < 3) {
        std::this_thread::sleep_for(1ms);
    }
    // A pause of 400 ms is in progress; finish does not wait for it.
    state->failures = 0;
    const auto begin = Clock::now();
    EXPECT_EQ(thread.finish(begin + 10s), 0u);
    EXPECT_LT(Clock::now() - begin, 290ms);
    EXPECT_EQ(state->seen(), upTo(2));
}

TEST_F(SinkThreadTest, AFailingSinkDoesNotDelayAnother) {
    auto otherState = std::make_shared<TestState>();
    SinkThread other(source(), std::make_unique<TestSink>(otherState), "jsonl");
    state->failures = -1;
    state->taken = 0;
    thread.start();
    other.start();
    push(100); // fills the queue
    const auto limit = Clock::now() + 10s;
    while (otherState->seen().size() < 100 && Clock::now() < limit) {
        std::this_thread::sleep_for(1ms);
    }
    EXPECT_EQ(otherState->seen(), upTo(100));
    EXPECT_EQ(thread.finish(Clock::now()), 100u);
    EXPECT_EQ(other.finish(Clock::now() + 10s), 0u);
}

TEST_F(SinkThreadTest, ReportsItsState) {
    EXPECT_STREQ(thread.state().conditionName(), "starting");
    EXPECT_EQ(thread.state().name, "test");
    EXPECT_EQ(thread.state().type, "jsonl");
    push(5);
    EXPECT_EQ(thread.state().lag, 5u);
    EXPECT_EQ(thread.state().retryIn, std::nullopt);
    state->failures = -1;
    state->taken = 2;
    thread.start();
    const auto limit = Clock::now() + 10s;
    // Two of five, then two of three; the last delivery has one event, of which a failing one
    // takes none.
    while ((thread.state().delivered < 4 || !thread.state().retryIn) && Clock::now() < limit) {
        std::this_thread::sleep_for(1ms);
    }
    const SinkState failing = thread.state();
    EXPECT_STREQ(failing.conditionName(), "failing");
    EXPECT_EQ(failing.delivered, 4u);
    EXPECT_EQ(failing.lag, 1u);
    EXPECT_EQ(failing.error, "no room");
    ASSERT_TRUE(failing.retryIn);
    EXPECT_LE(*failing.retryIn, 30s);
    state->failures = 0;
    EXPECT_EQ(thread.finish(Clock::now() + 10s), 0u);
    const SinkState up = thread.state();
    EXPECT_STREQ(up.conditionName(), "up");
    EXPECT_EQ(up.delivered, 5u);
    EXPECT_EQ(up.lag, 0u);
    EXPECT_EQ(up.error, "");
    EXPECT_EQ(up.retryIn, std::nullopt);
}

TEST_F(SinkThreadTest, EndsWithoutFinish) {
    thread.start();
    push(1);
}

} // namespace
