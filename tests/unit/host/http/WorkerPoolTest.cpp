#include "host/http/WorkerPool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <set>
#include <thread>

using namespace zrm::host;

namespace {

TEST(WorkerPool, RunsWorkInOrderOnAtMostTheGivenThreads) {
    std::promise<void> go;
    std::shared_future<void> mayGo = go.get_future().share();
    std::atomic<int> begun{0};
    std::atomic<int> done{0};
    {
        WorkerPool pool(2, 4);
        const auto work = [&] {
            ++begun;
            mayGo.wait();
            ++done;
        };
        EXPECT_TRUE(pool.submit(work));
        EXPECT_TRUE(pool.submit(work));
        while (begun < 2) {
            std::this_thread::yield();
        }
        for (int count = 0; count < 4; ++count) {
            EXPECT_TRUE(pool.submit(work));
        }
        EXPECT_FALSE(pool.submit(work)) << "the queue is full";
        EXPECT_EQ(begun, 2) << "there are no more threads";
        go.set_value();
    }
    EXPECT_EQ(done, 6) << "accepted work is done";
}

TEST(WorkerPool, AnIdleThreadTakesTheNextWork) {
    WorkerPool pool(8, 8);
    std::set<std::thread::id> threads;
    for (int count = 0; count < 20; ++count) {
        std::promise<std::thread::id> done;
        EXPECT_TRUE(pool.submit([&] { done.set_value(std::this_thread::get_id()); }));
        threads.insert(done.get_future().get());
    }
    EXPECT_LE(threads.size(), 8u);
}

} // namespace
