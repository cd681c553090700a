#include "host/http/ConnectionThreads.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

TEST(ConnectionThreads, RunAsManyAsWantedUpToTheLimit) {
    std::promise<void> go;
    std::shared_future<void> mayGo = go.get_future().share();
    std::atomic<int> done{0};
    ConnectionThreads threads;
    const auto work = [&done, mayGo] {
        mayGo.wait();
        ++done;
    };
    for (int count = 0; count < 100; ++count) {
        EXPECT_TRUE(threads.start(work, 100));
    }
    EXPECT_FALSE(threads.start(work, 100));
    EXPECT_EQ(threads.count(), 100u);
    EXPECT_FALSE(threads.waitForAll(Clock::now() + 10ms));
    go.set_value();
    EXPECT_TRUE(threads.waitForAll(Clock::now() + 60s));
    EXPECT_EQ(done, 100);
    EXPECT_EQ(threads.count(), 0u);
    EXPECT_TRUE(threads.start(work, 1)) << "there is room again";
}

TEST(ConnectionThreads, AreWaitedForAtTheEnd) {
    std::atomic<int> done{0};
    {
        ConnectionThreads threads;
        for (int count = 0; count < 10; ++count) {
            threads.start([&done] { ++done; }, 10);
        }
    }
    EXPECT_EQ(done, 10);
}

} // namespace
