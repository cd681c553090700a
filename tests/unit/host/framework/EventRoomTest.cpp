#include "framework/EventRoom.h"
#include "host/framework/EventRoomControl.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using State = EventRoom::State;

class EventRoomTest : public testing::Test {
protected:
    ~EventRoomTest() override {
        EventRoomControl::setFull(false);
        EventRoomControl::open();
    }

    static std::future<State> waiter(const std::atomic<bool>& isWanted) {
        return std::async(std::launch::async,
                          [&] { return EventRoom::wait([&] { return isWanted.load(); }); });
    }

    std::atomic<bool> isWanted{true};
};

TEST_F(EventRoomTest, IsOpenByDefault) {
    EXPECT_TRUE(EventRoom::mayOffer());
    EXPECT_EQ(EventRoom::wait([] { return true; }), State::FREE);
    EventRoomControl::setFull(true);
    EXPECT_EQ(EventRoom::now(), State::FULL);
    EventRoomControl::hold();
    EXPECT_EQ(EventRoom::now(), State::HELD);
    EventRoomControl::close();
    EXPECT_EQ(EventRoom::now(), State::CLOSED);
    EventRoomControl::open();
    EXPECT_EQ(EventRoom::now(), State::FULL);
    EXPECT_FALSE(EventRoom::mayOffer());
}

TEST_F(EventRoomTest, AWaitEndsWithRoomOrWhenTheProcessEnds) {
    EventRoomControl::setFull(true);
    auto first = waiter(isWanted);
    EXPECT_EQ(first.wait_for(20ms), std::future_status::timeout);
    EventRoomControl::setFull(false);
    EXPECT_EQ(first.get(), State::FREE);
    EventRoomControl::hold();
    auto second = waiter(isWanted);
    EventRoomControl::close();
    EXPECT_EQ(second.get(), State::CLOSED);
}

TEST_F(EventRoomTest, AWaitEndsWhenTheRowIsNoLongerWanted) {
    EventRoomControl::setFull(true);
    auto waiting = waiter(isWanted);
    EXPECT_EQ(waiting.wait_for(20ms), std::future_status::timeout);
    isWanted = false;
    EXPECT_EQ(waiting.get(), State::FULL);
}

TEST_F(EventRoomTest, CountsWaitsForAFullQueueWhileTheyLast) {
    const EventRoomControl::Waits before = EventRoomControl::waits();
    EventRoomControl::setFull(true);
    auto waiting = waiter(isWanted);
    while (EventRoomControl::waits().count == before.count) {
        std::this_thread::yield();
    }
    std::this_thread::sleep_for(20ms);
    EXPECT_GE(EventRoomControl::waits().waited - before.waited, 20ms);
    EventRoomControl::setFull(false);
    waiting.get();
    EXPECT_EQ(EventRoomControl::waits().count, before.count + 1);
    const auto after = EventRoomControl::waits().waited;
    std::this_thread::sleep_for(5ms);
    EXPECT_EQ(EventRoomControl::waits().waited, after);
}

} // namespace
