#include "host/http/WorkerPool.h"

#include "host/http/HttpServer.h"
#include "host/http/Router.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "unit/host/http/TestClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <future>
#include <set>
#include <string>
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

TEST(HttpWorkers, RequestsWithoutAFreeWorkerAreRefusedAndQuickOnesAreServed) {
    const std::string secret(64, 'a');
    RecordingTrace trace(0);
    Router router;
    std::promise<void> go;
    std::shared_future<void> mayGo = go.get_future().share();
    std::atomic<int> slow{0};
    router.add("GET", "/slow", [&](const HttpRequest&) {
        ++slow;
        mayGo.wait();
        return HttpAnswer::json("{}");
    });
    router.add(
        "GET", "/quick", [](const HttpRequest&) { return HttpAnswer::json("{}"); }, Router::TOKEN,
        Router::QUICK);
    HttpServer server(router, {.workers = 1, .quickWorkers = 1});
    ASSERT_EQ(reasonOf(server.start({"127.0.0.1", 0}, ApiToken(secret))), "");
    const auto ask = [&](const std::string& path) {
        return TestClient("127.0.0.1", server.port(), secret).get(path);
    };
    auto first = std::async(std::launch::async, [&] { return ask("/slow")->status; });
    while (slow == 0) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    auto second = std::async(std::launch::async, [&] { return ask("/slow"); });
    EXPECT_EQ(ask("/quick")->status, 200);
    const auto busy = second.get();
    ASSERT_TRUE(busy);
    EXPECT_EQ(busy->status, 503);
    EXPECT_EQ(busy->header("content-type"), "application/problem+json");
    EXPECT_EQ(busy->header("retry-after"), "5");
    EXPECT_THAT(busy->body, testing::HasSubstr("the agent is busy with other requests"));
    go.set_value();
    EXPECT_EQ(first.get(), 200);
    EXPECT_EQ(ask("/slow")->status, 200) << "workers are free again";
    EXPECT_EQ(slow, 2) << "refused work is not done later";
}

} // namespace
