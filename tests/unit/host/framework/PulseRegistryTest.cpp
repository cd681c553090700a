#include "host/framework/PulseRegistry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

std::vector<std::string> working(PulseRegistry::Clock::time_point now) {
    std::vector<std::string> texts;
    for (const PulseRegistry::Working& one : PulseRegistry::look(now)) {
        texts.push_back(one.subject + " " + one.doing + " " + std::to_string(one.standing.count()));
    }
    return texts;
}

TEST(PulseRegistry, ShowsThreadsAtWorkAndHowLongTheyHaveNotMoved) {
    const auto begin = PulseRegistry::Clock::now();
    std::atomic<std::int64_t> lines{0};
    Pulse log("/var/log/a", &lines);
    Pulse manager("the log manager");
    EXPECT_THAT(working(begin), testing::IsEmpty());
    log.work("reads");
    manager.work("refreshes");
    EXPECT_THAT(working(begin),
                testing::UnorderedElementsAre("/var/log/a reads 0", "the log manager refreshes 0"));
    EXPECT_THAT(working(begin + 12s), testing::UnorderedElementsAre(
                                          "/var/log/a reads 12", "the log manager refreshes 12"));
    ++lines; // a long read moves
    manager.rest();
    EXPECT_THAT(working(begin + 13s), testing::ElementsAre("/var/log/a reads 0"));
    EXPECT_FALSE(PulseRegistry::waitUntilAllRest(PulseRegistry::Clock::now()));
    log.rest();
    EXPECT_TRUE(PulseRegistry::waitUntilAllRest(PulseRegistry::Clock::now()));
}

TEST(PulseRegistry, ForgetsPulsesThatEnd) {
    Pulse first("first");
    first.work("works");
    {
        Pulse second("second");
        Pulse third("third");
        second.work("works");
        third.work("works");
        EXPECT_EQ(PulseRegistry::look().size(), 3u);
    }
    EXPECT_EQ(PulseRegistry::look().size(), 1u);
}

} // namespace
