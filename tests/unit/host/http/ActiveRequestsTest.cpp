#include "host/http/RequestDispatcher.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

TEST(ActiveRequests, CloseWaitsForOthersAndAdmitsNoMore) {
    ActiveRequests requests;
    std::promise<void> begun;
    std::promise<void> go;
    std::thread other([&] {
        const ActiveRequests::Guard guard(requests);
        EXPECT_TRUE(guard);
        begun.set_value();
        go.get_future().wait();
    });
    begun.get_future().wait();
    const auto begin = Clock::now();
    requests.close(begin + 20ms);
    EXPECT_GE(Clock::now() - begin, 20ms);
    EXPECT_FALSE(ActiveRequests::Guard(requests));
    go.set_value();
    requests.close(Clock::now() + 30s);
    EXPECT_LT(Clock::now() - begin, 20s);
    other.join();
}

TEST(ActiveRequests, CloseDoesNotWaitForItsOwnThread) {
    ActiveRequests requests;
    const ActiveRequests::Guard guard(requests);
    const auto begin = Clock::now();
    requests.close(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 20s);
}

} // namespace
