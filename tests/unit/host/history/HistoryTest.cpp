#include "host/history/History.h"

#include "HistoryFixture.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <future>
#include <optional>
#include <string>
#include <thread>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::IsEmpty;
using HistoryTest = HistoryFixture;

TEST_F(HistoryTest, KnowsTheLogsOfItsEventsAndEntries) {
    open();
    EXPECT_THAT(history->logs(), IsEmpty());
    pushAndWait(1);
    history->addEntries({1, {{"/var/log/quiet.log", 3}}});
    close();
    open();
    EXPECT_THAT(history->logs(), testing::ElementsAre("/var/log/app.log", "/var/log/quiet.log"));
}

TEST_F(HistoryTest, StoresAndReturnsEvents) {
    open();
    EXPECT_EQ(history->newest(), 0u);
    EXPECT_EQ(history->state().events, 0u);
    pushAndWait(300);
    EXPECT_EQ(ids(), idsFrom(1, 300));
    const std::optional<StoredEvent> event = history->event(17).value();
    ASSERT_TRUE(event);
    EXPECT_EQ(event->situation, "watch");
    EXPECT_EQ(event->severity, "minor");
    EXPECT_EQ(event->log, "/var/log/app.log");
    EXPECT_THAT(event->json, testing::StartsWith(R"({"id":17,"situation":"watch",)"));
    EXPECT_EQ(history->event(0).value(), std::nullopt);
    EXPECT_EQ(history->event(301).value(), std::nullopt);
    EXPECT_EQ(history->event(UINT64_MAX).value(), std::nullopt);
    const HistoryState now = history->state();
    EXPECT_EQ(now.events, 300u);
    EXPECT_EQ(now.oldest, 1u);
    EXPECT_EQ(now.newest, 300u);
    EXPECT_GT(now.bytes, 10'000u);
    EXPECT_EQ(now.problem, "");
    EXPECT_EQ(message, "");
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(HistoryTest, AnEventIsStoredAtOnce) {
    open();
    const auto begin = Clock::now();
    pushAndWait(1);
    EXPECT_LT(Clock::now() - begin, 500ms);
}

TEST_F(HistoryTest, IdsAndCursorsContinueAfterARestart) {
    open();
    pushAndWait(50);
    EXPECT_EQ(take(10), idsFrom(1, 10));
    close();
    open();
    EXPECT_EQ(history->newest(), 50u);
    EXPECT_EQ(sink->backlog(), 40u);
    pushAndWait(10);
    EXPECT_EQ(take(), idsFrom(11, 60));
    close();
    open();
    EXPECT_EQ(sink->backlog(), 0u);
    EXPECT_EQ(ids(), idsFrom(1, 60));
}

TEST_F(HistoryTest, ANewSinkBeginsWithTheNextEvent) {
    open();
    pushAndWait(5);
    close();
    auto opened = History::open(config, state);
    history = std::move(opened.value());
    EXPECT_EQ(history->source("other", "other")->backlog(), 0u);
    EXPECT_EQ(history->source("key", "the sink")->backlog(), 5u);
}

TEST_F(HistoryTest, TheCursorOfARunningSinkIsKeptHoweverLongItWasDown) {
    open();
    pushAndWait(5);
    close();
    // As after months in which neither of two sinks got an event.
    run("UPDATE cursors SET used = 1");
    run("INSERT INTO cursors VALUES ('removed', 2, 1)");
    open();
    EXPECT_EQ(sink->backlog(), 5u);
    EXPECT_TRUE(eventually([&] { return number("SELECT count(*) FROM cursors") == 1; }));
    EXPECT_GT(number("SELECT used FROM cursors WHERE sink = 'key'"), 1);
    close();
    open();
    EXPECT_EQ(sink->backlog(), 5u);
}

TEST_F(HistoryTest, ASinkCountsAsInUseUntilTheStop) {
    open();
    pushAndWait(1);
    EXPECT_TRUE(eventually([&] { return number("SELECT count(*) FROM cursors") == 1; }));
    run("UPDATE cursors SET used = 1");
    close();
    EXPECT_GT(number("SELECT used FROM cursors"), 1);
}

TEST_F(HistoryTest, FinishStoresWhatIsQueued) {
    open();
    push(100);
    history->finish(Clock::now() + 10s);
    EXPECT_EQ(history->newest(), 100u);
    EXPECT_EQ(take(), idsFrom(1, 100));
    EXPECT_TRUE(sink->read(1).empty());
    EXPECT_FALSE(queue->push(label, "1234567"));
}

TEST_F(HistoryTest, KeepsTheConfiguredNumberOfEvents) {
    config.keepEvents = 100;
    open();
    for (int round = 0; round < 40; ++round) {
        pushAndWait(100);
    }
    EXPECT_TRUE(eventually([&] { return history->state().events == 100; }));
    EXPECT_EQ(history->state().oldest, 3901u);
    EXPECT_EQ(ids(), idsFrom(3901, 4000));
    testing::internal::CaptureStderr();
    EXPECT_FALSE(take().empty());
    testing::internal::GetCapturedStderr();
}

TEST_F(HistoryTest, KeepsEventsForTheConfiguredTime) {
    open();
    pushAndWait(10);
    close();
    Database(file(), Database::Use::WRITE)
        .run("UPDATE events SET raised = raised - 40 * 86400000 WHERE id <= 6");
    open();
    EXPECT_TRUE(eventually([&] { return history->state().oldest == 7; }));
    EXPECT_EQ(ids(), idsFrom(7, 10));
}

TEST_F(HistoryTest, ReturnsTheRatesOfEventsAndEntries) {
    open();
    pushAndWait(20);
    const std::int64_t raised = history->event(1).value()->raised;
    const std::int64_t minute = raised / 60'000;
    history->addEntries({minute, {{"/var/log/app.log", 500}}});
    const auto entries = [&]() -> std::optional<std::uint64_t> {
        const Rates rates = history->rates(raised, raised + 1, 60'000).value();
        return rates.logs.size() == 1 ? rates.logs[0].entries.at(0) : std::nullopt;
    };
    EXPECT_TRUE(eventually([&] { return entries() == 500u; }));
    EXPECT_EQ(history->rates(raised, raised + 1, 60'000)->start, minute * 60'000);
    history->addEntries({minute, {{"/var/log/app.log", 1}}});
    close();
    open();
    EXPECT_EQ(entries(), 501u);
}

TEST_F(HistoryTest, ReadersWaitForNewEvents) {
    open();
    auto waiting = std::async(std::launch::async,
                              [&] { return history->waitBeyond(0, Clock::now() + 10s, {}); });
    push(1);
    EXPECT_EQ(waiting.get(), 1u);
    const auto begin = Clock::now();
    EXPECT_EQ(history->waitBeyond(1, begin + 10ms, {}), 1u);
    EXPECT_LT(Clock::now() - begin, 5s);
}

TEST_F(HistoryTest, ManyReadersDoNotDisturbTheWriter) {
    open();
    std::vector<std::thread> readers;
    std::atomic<bool> done{false};
    std::atomic<int> read{0};
    for (int number = 0; number < 6; ++number) {
        readers.emplace_back([&] {
            while (!done) {
                const auto newest = history->newest();
                const auto events = history->query({.situations = {"watch"}, .limit = 50})->events;
                ++read;
                if (newest > 0) {
                    EXPECT_GE(events.front().id, newest);
                }
                history->state();
            }
        });
    }
    for (int round = 0; round < 50; ++round) {
        pushAndWait(20);
    }
    done = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_GT(read, 0);
    EXPECT_EQ(ids(), idsFrom(1, 1000));
    EXPECT_EQ(take(), idsFrom(1, 1000));
}

} // namespace
