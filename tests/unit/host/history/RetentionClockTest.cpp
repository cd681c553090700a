#include "host/history/RetentionClock.h"

#include <gtest/gtest.h>

#include <chrono>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

constexpr std::int64_t hour = 3'600'000; ///< milliseconds

class RetentionClockTest : public testing::Test {
protected:
    std::int64_t after(std::chrono::minutes passed, std::int64_t wall) {
        steady += passed;
        return clock.now(wall, steady);
    }
    RetentionClock clock;
    RetentionClock::Clock::time_point steady{};
};

TEST_F(RetentionClockTest, FollowsTheWallClock) {
    EXPECT_EQ(after(0min, 1000 * hour), 1000 * hour);
    EXPECT_EQ(after(60min, 1001 * hour), 1001 * hour);
    EXPECT_EQ(after(60min, 1003 * hour), 1003 * hour) << "one more hour is not a jump";
    EXPECT_EQ(after(60min, 900 * hour), 900 * hour)
        << "a step back is accepted: nothing expires because of it";
}

TEST_F(RetentionClockTest, AcceptsAJumpThatHasLasted) {
    EXPECT_EQ(after(0min, 1000 * hour), 1000 * hour);
    EXPECT_EQ(after(60min, 9000 * hour), 1001 * hour);
    EXPECT_EQ(after(59min, 9001 * hour), 1001 * hour + 59 * 60'000);
    EXPECT_EQ(after(1min, 9001 * hour), 9001 * hour);
}

TEST_F(RetentionClockTest, IgnoresAJumpThatIsUndone) {
    EXPECT_EQ(after(0min, 1000 * hour), 1000 * hour);
    EXPECT_EQ(after(60min, 9000 * hour), 1001 * hour);
    EXPECT_EQ(after(60min, 1002 * hour), 1002 * hour);
    EXPECT_EQ(after(60min, 9000 * hour), 1003 * hour) << "the hour starts over";
}

} // namespace
