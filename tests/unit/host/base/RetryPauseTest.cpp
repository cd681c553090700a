#include "host/base/RetryPause.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <set>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

TEST(RetryPause, GrowsToTheLongestAndStartsOver) {
    RetryPause pause(100ms, 1s);
    for (int round = 0; round < 2; ++round) {
        for (auto whole = 100ms; whole < 8s; whole *= 2) {
            const auto most = std::min(whole, std::chrono::milliseconds(1s));
            const auto length = pause.next();
            EXPECT_LE(length, most);
            EXPECT_GE(length, most * 3 / 4);
        }
        pause.reset();
    }
}

TEST(RetryPause, TwoPausesDiffer) {
    RetryPause one(10s, 10s);
    RetryPause other(10s, 10s);
    std::set<std::chrono::milliseconds> lengths;
    for (int count = 0; count < 100; ++count) {
        lengths.insert(one.next());
        lengths.insert(other.next());
    }
    // 200 of 2501 lengths: some come twice, but never so many.
    EXPECT_GT(lengths.size(), 150u);
}

} // namespace
