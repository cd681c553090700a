#include "host/http/RequestStatistics.h"

#include <gtest/gtest.h>

#include <array>
#include <chrono>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Kind = RequestStatistics::Kind;

TEST(RequestStatistics, CountsByMethodRouteAndStatus) {
    RequestStatistics statistics;
    statistics.count("GET", "/a/{b}", 200, 1ms);
    statistics.count("GET", "/a/{b}", 200, 2ms);
    statistics.count("GET", "/a/{b}", 404, 600ms);
    statistics.count("POST", "", 404, 20s);
    const auto counts = statistics.counts();
    EXPECT_EQ(counts.size(), 3u);
    EXPECT_EQ(counts.at(Kind{"GET", "/a/{b}", 200}), 2u);
    EXPECT_EQ(counts.at(Kind{"GET", "/a/{b}", 404}), 1u);
    EXPECT_EQ(counts.at(Kind{"POST", "", 404}), 1u);
}

TEST(RequestStatistics, CountsDurationsByTheirLimits) {
    RequestStatistics statistics;
    statistics.count("GET", "/a", 200, 1ms);
    statistics.count("GET", "/a", 200, 2ms);
    statistics.count("PUT", "/a", 500, 600ms);
    statistics.count("PUT", "/a", 200, 20s);
    const auto durations = statistics.durations().at("/a");
    EXPECT_EQ(durations.count, 4u);
    EXPECT_DOUBLE_EQ(durations.seconds, 20.603);
    EXPECT_EQ(durations.upTo, (std::array<std::uint64_t, 7>{1, 2, 2, 2, 2, 3, 3}));
}

} // namespace
