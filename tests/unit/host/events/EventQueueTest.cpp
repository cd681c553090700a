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

TEST(EventQueue, GivesEventsInOrderWithIdsFromOneAndTheirTime) {
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

TEST(EventQueue, GivesTheSameEventsUntilTheyAreReleasedAndAtMostAsManyAsAsked) {
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

TEST(EventQueue, EndsARunAtTheEndOfTheRing) {
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

TEST(EventQueue, EveryReaderGetsEveryEventFromItsBeginningOn) {
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

TEST(EventQueue, AFullQueueMakesPushWaitForTheSlowestReader) {
    constexpr int count = 500;
    EventQueue queue(4, rowSize);
    const EventQueue::Reader fast = queue.addReader();
    const EventQueue::Reader slow = queue.addReader();
    std::thread producer([&] {
        for (int number = 1; number <= count; ++number) {
            EXPECT_TRUE(push(queue, std::to_string(number)));
        }
        queue.close();
    });
    std::thread reader([&] {
        for (auto events = queue.read(fast, 2); !events.empty(); events = queue.read(fast, 2)) {
            queue.release(fast, events.size());
        }
    });
    // An event that was overwritten before its release would show another number.
    int expected = 1;
    for (auto events = queue.read(slow, 3); !events.empty(); events = queue.read(slow, 3)) {
        std::this_thread::yield();
        EXPECT_LE(queue.backlog(slow), 4u);
        for (const Event& event : events) {
            EXPECT_EQ(text(event), std::to_string(expected));
            EXPECT_EQ(event.id, static_cast<std::uint64_t>(expected));
            ++expected;
        }
        queue.release(slow, events.size());
    }
    EXPECT_EQ(expected, count + 1);
    producer.join();
    reader.join();
}

TEST(EventQueue, APushWaitsUntilThereIsRoom) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    push(queue, "a");
    auto second = std::async(std::launch::async, [&] { return push(queue, "b"); });
    EXPECT_EQ(second.wait_for(20ms), std::future_status::timeout);
    queue.release(reader, 1);
    EXPECT_TRUE(second.get());
    EXPECT_EQ(text(queue.read(reader, 1)[0]), "b");
}

TEST(EventQueue, CloseReleasesAWaitingPushAndTakesNothingMore) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    push(queue, "a");
    auto second = std::async(std::launch::async, [&] { return push(queue, "b"); });
    queue.close();
    EXPECT_FALSE(second.get());
    queue.close();
    EXPECT_FALSE(push(queue, "c"));
    EXPECT_EQ(text(queue.read(reader, 10)[0]), "a");
    queue.release(reader, 1);
    EXPECT_TRUE(queue.read(reader, 10).empty());
    EXPECT_FALSE(push(queue, "d"));
}

TEST(EventQueue, CloseReleasesAWaitingReader) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    auto waiting = std::async(std::launch::async, [&] { return queue.read(reader, 1).size(); });
    queue.close();
    EXPECT_EQ(waiting.get(), 0u);
}

TEST(EventQueue, ALimitEndsAWaitUnderWayAndLaterOnes) {
    EventQueue queue(1, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    push(queue, "a");
    auto second = std::async(std::launch::async, [&] { return push(queue, "b"); });
    queue.limitWaits(Clock::now() + 10ms);
    EXPECT_FALSE(second.get());
    EXPECT_FALSE(push(queue, "c"));
    // A later limit does not lengthen the waits again.
    queue.limitWaits(Clock::now() + 24h);
    EXPECT_FALSE(push(queue, "d"));
    // Where there is room, nothing waits.
    queue.release(reader, 1);
    EXPECT_TRUE(push(queue, "e"));
    EXPECT_EQ(text(queue.read(reader, 1)[0]), "e");
}

TEST(EventQueue, CountsTheWaitsForRoom) {
    EventQueue queue(2, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    push(queue, "a");
    push(queue, "b");
    EXPECT_EQ(queue.state().size, 2u);
    EXPECT_EQ(queue.state().capacity, 2u);
    EXPECT_EQ(queue.state().waits, 0u);
    EXPECT_EQ(queue.state().waited, 0ns);
    auto third = std::async(std::launch::async, [&] { return push(queue, "c"); });
    while (queue.state().waits == 0) {
        std::this_thread::yield();
    }
    std::this_thread::sleep_for(20ms);
    queue.release(reader, 1);
    EXPECT_TRUE(third.get());
    EXPECT_EQ(queue.state().waits, 1u);
    EXPECT_GE(queue.state().waited, 20ms);
    EXPECT_LT(queue.state().waited, 10s);
    queue.release(reader, 1);
    EXPECT_EQ(queue.state().size, 1u);
}

TEST(EventQueue, ManyThreadsKeepTheOrderOfEach) {
    constexpr int producers = 4;
    constexpr int each = 300;
    EventQueue queue(8, rowSize);
    const std::array readers = {queue.addReader(), queue.addReader()};
    std::vector<std::thread> threads;
    std::atomic<int> producing{producers};
    for (int producer = 0; producer < producers; ++producer) {
        threads.emplace_back([&, producer] {
            for (int number = 0; number < each; ++number) {
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

TEST(EventQueue, WakesAThreadThatWaitsForRoomWhenAQuarterIsFree) {
    EventQueue queue(8, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    for (int number = 0; number < 8; ++number) {
        push(queue, std::to_string(number));
    }
    auto ninth = std::async(std::launch::async, [&] { return push(queue, "8"); });
    while (queue.state().waits == 0) {
        std::this_thread::yield();
    }
    queue.read(reader, 1);
    queue.release(reader, 1);
    EXPECT_EQ(ninth.wait_for(20ms), std::future_status::timeout);
    queue.read(reader, 1);
    queue.release(reader, 1);
    EXPECT_TRUE(ninth.get());
    EXPECT_EQ(queue.backlog(reader), 7u);
}

TEST(EventQueue, LetsEventsGatherForAReaderThatItWakes) {
    EventQueue queue(400, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    // A hundred events, a quarter of the room, end the gathering; the first alone does not. A
    // machine that is busy elsewhere may let the time of gathering pass, but not every time.
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

TEST(EventQueue, GivesASingleEventSoon) {
    EventQueue queue(400, rowSize);
    const EventQueue::Reader reader = queue.addReader();
    auto woken = std::async(std::launch::async, [&] { return queue.read(reader, 400).size(); });
    push(queue, "alone");
    EXPECT_EQ(woken.get(), 1u);
}

} // namespace
