#include "host/framework/RequestLimit.h"

#include "framework/cancellation.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = RequestLimit::Clock;

TEST(RequestLimit, IsReachedWhenTheTimeIsUpOrTheWorkIsUnwanted) {
    EXPECT_FALSE(CTX1_IsCancelled());
    bool isUnwanted = false;
    const RequestLimit limit(Clock::now() + 1h, [&] { return isUnwanted; });
    EXPECT_FALSE(CTX1_IsCancelled());
    EXPECT_FALSE(limit.wasReached());
    isUnwanted = true;
    EXPECT_FALSE(limit.wasReached()); // nothing has asked yet
    EXPECT_TRUE(CTX1_IsCancelled());
    isUnwanted = false;
    EXPECT_TRUE(CTX1_IsCancelled()); // once reached, it stays reached
    EXPECT_TRUE(limit.wasReached());
    const RequestLimit overdue(Clock::now(), {});
    EXPECT_TRUE(CTX1_IsCancelled());
}

TEST(RequestLimit, TheLatestOfAThreadAppliesAndOtherThreadsHaveNone) {
    const RequestLimit outer(Clock::now(), {});
    {
        const RequestLimit inner(Clock::now() + 1h, {});
        EXPECT_FALSE(CTX1_IsCancelled());
    }
    EXPECT_TRUE(CTX1_IsCancelled());
    std::thread([] { EXPECT_FALSE(CTX1_IsCancelled()); }).join();
}

} // namespace
