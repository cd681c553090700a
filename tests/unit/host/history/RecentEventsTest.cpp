#include "host/history/RecentEvents.h"

#include "TestBatch.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = RecentEvents::Clock;

constexpr std::size_t plenty = 1'000'000;

TEST(RecentEvents, ReturnsTheBatchAfterAnEvent) {
    RecentEvents recent(plenty, 10);
    EXPECT_EQ(recent.newest(), 10u);
    EXPECT_EQ(recent.after(5), nullptr);
    EXPECT_EQ(recent.after(10), nullptr);
    EXPECT_EQ(recent.oldest(), nullptr);
    recent.publish(batchOf(11, 20));
    recent.publish(batchOf(21, 21));
    EXPECT_EQ(recent.newest(), 21u);
    EXPECT_EQ(recent.after(9), nullptr) << "event 10 is not in memory";
    EXPECT_EQ(recent.after(10)->first(), 11u);
    EXPECT_EQ(recent.after(19)->first(), 11u);
    EXPECT_EQ(recent.after(20)->first(), 21u);
    EXPECT_EQ(recent.after(21), nullptr);
    EXPECT_EQ(recent.oldest()->first(), 11u);
}

TEST(RecentEvents, DropsTheOldestWhenTheyTakeTooMuchMemory) {
    const std::size_t one = batchOf(1, 100)->bytes();
    RecentEvents recent(3 * one + one / 2, 0);
    for (std::uint64_t first = 1; first < 1000; first += 100) {
        recent.publish(batchOf(first, first + 99));
    }
    EXPECT_EQ(recent.after(600), nullptr);
    EXPECT_EQ(recent.after(700)->first(), 701u);
    RecentEvents small(1, 0);
    small.publish(batchOf(1, 5));
    small.publish(batchOf(6, 6));
    EXPECT_EQ(small.oldest()->first(), 6u) << "the newest is always there";
}

TEST(RecentEvents, AWaitEndsWithTheNextEvent) {
    RecentEvents recent(plenty, 4);
    EXPECT_EQ(recent.waitBeyond(3, Clock::time_point::max(), {}), 4u) << "no wait";
    auto waiting = std::async(std::launch::async,
                              [&] { return recent.waitBeyond(4, Clock::time_point::max(), {}); });
    recent.publish(batchOf(5, 7));
    EXPECT_EQ(waiting.get(), 7u);
}

TEST(RecentEvents, AWaitEndsAtItsLimitWithAStopAndWithTheEnd) {
    RecentEvents recent(plenty, 4);
    const auto begin = Clock::now();
    EXPECT_EQ(recent.waitBeyond(4, begin + 20ms, {}), 4u);
    EXPECT_GE(Clock::now() - begin, 20ms);

    std::stop_source stop;
    auto stopped = std::async(std::launch::async, [&] {
        return recent.waitBeyond(4, Clock::time_point::max(), stop.get_token());
    });
    stop.request_stop();
    EXPECT_EQ(stopped.get(), 4u);

    auto ended =
        std::async(std::launch::async, [&] { return recent.waitBeyond(4, begin + 1h, {}); });
    EXPECT_FALSE(recent.ended());
    recent.end();
    EXPECT_EQ(ended.get(), 4u);
    EXPECT_TRUE(recent.ended());
    EXPECT_EQ(recent.waitBeyond(4, Clock::time_point::max(), {}), 4u);
}

} // namespace
