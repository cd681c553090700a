#include "host/events/EventQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstring>
#include <future>
#include <string>
#include <thread>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = EventQueue::Clock;

constexpr std::size_t rowSize = 16;
using Row = std::array<char, rowSize>;

Row row(const std::string& text) {
    Row row{};
    text.copy(row.data(), rowSize);
    return row;
}

std::string text(const Event& event) {
    return {event.row, strnlen(event.row, rowSize)};
}

const auto label = std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});

bool push(EventQueue& queue, const std::string& content) {
    return queue.push(label, row(content).data());
}

TEST(EventQueue, ReturnsEventsInOrderWithIdsFromOneAndTheirTime) {
    EventQueue queue(4, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    const auto now = [] {
        return std::chrono::duration_cast<std::chrono::milliseconds>(
                   std::chrono::system_clock::now().time_since_epoch())
            .count();
    };
    const auto before = now();
    EXPECT_TRUE(push(queue, "a"));
    EXPECT_TRUE(push(queue, "b"));
    const auto events = queue.read(reader, 10);
    ASSERT_EQ(events.size(), 2u);
    EXPECT_EQ(events[0].id, 1u);
    EXPECT_EQ(text(events[0]), "a");
    EXPECT_EQ(events[1].id, 2u);
    EXPECT_EQ(text(events[1]), "b");
    EXPECT_EQ(events[1].situation->name, "watch");
    EXPECT_GE(events[0].raised, before);
    EXPECT_LE(events[0].raised, now());
}

TEST(EventQueue, ReturnsTheSameEventsUntilTheyAreReleasedAndAtMostAsManyAsRequested) {
    EventQueue queue(4, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    for (const char* const content : {"a", "b", "c"}) {
        push(queue, content);
    }
    EXPECT_EQ(queue.read(reader, 2).size(), 2u);
    EXPECT_EQ(text(queue.read(reader, 2)[0]), "a");
    queue.release(reader, 1);
    EXPECT_EQ(text(queue.read(reader, 2)[0]), "b");
    EXPECT_EQ(queue.backlog(reader), 2u);
}

TEST(EventQueue, SplitsAReadAtTheEndOfTheRing) {
    EventQueue queue(3, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    for (const char* const content : {"a", "b"}) {
        push(queue, content);
    }
    queue.release(reader, 2);
    for (const char* const content : {"c", "d", "e"}) {
        push(queue, content);
    }
    EXPECT_EQ(queue.read(reader, 10).size(), 1u);
    EXPECT_EQ(text(queue.read(reader, 10)[0]), "c");
    queue.release(reader, 1);
    EXPECT_EQ(queue.read(reader, 10).size(), 2u);
}

TEST(EventQueue, EveryReaderGetsEveryEventFromItsRegistrationOn) {
    EventQueue queue(4, rowSize);
    const EventQueue::Reader first = queue.addReader();
    push(queue, "a");
    const EventQueue::Reader second = queue.addReader();
    push(queue, "b");
    EXPECT_EQ(queue.backlog(first), 2u);
    queue.release(first, 2);
    EXPECT_EQ(text(queue.read(second, 10)[0]), "b");
}

TEST(EventQueue, WithoutReadersNothingIsKept) {
    EventQueue queue(2, rowSize);
    for (int count = 0; count < 10; ++count) {
        EXPECT_TRUE(push(queue, "a"));
    }
}

TEST(EventQueue, EventsOfARowBeyondTheRingAreKeptInOrder) {
    EventQueue queue(2, rowSize);
    const EventQueue::Reader fast = queue.addReader();
    const EventQueue::Reader slow = queue.addReader();
    for (const char* const content : {"a", "b", "c", "d", "e"}) {
        EXPECT_TRUE(push(queue, content));
    }
    EXPECT_EQ(queue.backlog(slow), 5u);
    EXPECT_EQ(queue.state().size, 5u);
    std::string order;
    for (std::uint64_t id = 1; id <= 5; ++id) {
        for (const EventQueue::Reader reader : {fast, slow}) {
            const auto events = queue.read(reader, 1);
            ASSERT_EQ(events.size(), 1u);
            EXPECT_EQ(events[0].id, id);
            order += text(events[0]);
            queue.release(reader, 1);
        }
    }
    EXPECT_EQ(order, "aabbccddee");
    EXPECT_EQ(queue.backlog(slow), 0u);
}

TEST(EventQueue, ReportsWhenItIsFullAndWhenAQuarterIsFreeAgain) {
    EventQueue queue(8, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    std::vector<bool> told;
    queue.onFull([&](bool isFull) { told.push_back(isFull); });
    for (int number = 0; number < 7; ++number) {
        push(queue, std::to_string(number));
    }
    EXPECT_THAT(told, testing::ElementsAre());
    push(queue, "7");
    EXPECT_THAT(told, testing::ElementsAre(true));
    push(queue, "8"); // kept aside
    queue.release(reader, 2);
    EXPECT_THAT(told, testing::ElementsAre(true));
    queue.release(reader, 1);
    EXPECT_THAT(told, testing::ElementsAre(true, false));
}

TEST(EventQueue, CloseRefusesNewEventsAndKeepsTheOthers) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    push(queue, "a");
    push(queue, "b");
    queue.close();
    queue.close();
    EXPECT_FALSE(push(queue, "c"));
    EXPECT_EQ(text(queue.read(reader, 10)[0]), "a");
    EXPECT_FALSE(queue.ended(reader));
    queue.release(reader, 1);
    EXPECT_EQ(text(queue.read(reader, 10)[0]), "b");
    queue.release(reader, 1);
    EXPECT_TRUE(queue.ended(reader));
    EXPECT_TRUE(queue.read(reader, 10).empty());
}

TEST(EventQueue, CloseReleasesAWaitingReader) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    auto waiting = std::async(std::launch::async, [&] { return queue.read(reader, 1).size(); });
    queue.close();
    EXPECT_EQ(waiting.get(), 0u);
}

TEST(EventQueue, KeepsTheOrderOfEachThread) {
    constexpr int producers = 4;
    constexpr int each = 300;
    EventQueue queue(8, rowSize);
    const std::array readers = {queue.addReader(), queue.addReader()};
    std::vector<std::thread> threads;
    std::atomic<int> producing{producers};
    for (int producer = 0; producer < producers; ++producer) {
        threads.emplace_back([&, producer] {
            for (int number = 0; number < each; ++number) {
                while (queue.state().size > 4) { // each finds room for its event
                    std::this_thread::yield();
                }
                push(queue, std::to_string(producer) + "/" + std::to_string(number));
            }
            if (--producing == 0) {
                queue.close();
            }
        });
    }
    for (const EventQueue::Reader reader : readers) {
        threads.emplace_back([&, reader] {
            std::array<int, producers> next{};
            std::uint64_t id = 0;
            for (auto events = queue.read(reader, 5); !events.empty();
                 events = queue.read(reader, 5)) {
                for (const Event& event : events) {
                    const auto producer = static_cast<std::size_t>(event.row[0] - '0');
                    EXPECT_EQ(text(event).substr(2), std::to_string(next[producer]++));
                    EXPECT_EQ(event.id, ++id);
                }
                queue.release(reader, events.size());
            }
            EXPECT_EQ(id, std::uint64_t{producers * each});
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

TEST(EventQueue, GathersEventsForAWaitingReader) {
    EventQueue queue(400, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    // A hundred events, a quarter of the capacity, end the wait for more; the first alone does not.
    // On a busy machine the time for gathering may pass first, but not every time.
    bool gathered = false;
    for (int attempt = 0; attempt < 50 && !gathered; ++attempt) {
        auto woken = std::async(std::launch::async, [&] { return queue.read(reader, 400).size(); });
        std::this_thread::sleep_for(2ms);
        for (int number = 0; number < 100; ++number) {
            push(queue, std::to_string(number));
        }
        gathered = woken.get() >= 100;
        queue.release(reader, 100);
    }
    EXPECT_TRUE(gathered);
}

TEST(EventQueue, ReturnsASingleEventSoon) {
    EventQueue queue(400, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    auto woken = std::async(std::launch::async, [&] { return queue.read(reader, 400).size(); });
    push(queue, "alone");
    EXPECT_EQ(woken.get(), 1u);
}

} // namespace
