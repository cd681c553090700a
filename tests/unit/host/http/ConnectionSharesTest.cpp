#include "host/http/ConnectionShares.h"

#include <gtest/gtest.h>

#include <chrono>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

TEST(ConnectionShares, NoAddressTakesAllConnections) {
    ConnectionShares shares;
    shares.setMost(80);
    EXPECT_EQ(shares.share(false), 10u);
    EXPECT_EQ(shares.share(true), 60u);
    for (int count = 0; count < 10; ++count) {
        EXPECT_TRUE(shares.take("203.0.113.1", false));
    }
    EXPECT_FALSE(shares.take("203.0.113.1", false));
    EXPECT_TRUE(shares.take("203.0.113.2", false)) << "others are accepted";
    for (int count = 0; count < 60; ++count) {
        EXPECT_TRUE(shares.take("127.0.0.1", true));
    }
    EXPECT_FALSE(shares.take("127.0.0.1", true));
    EXPECT_EQ(shares.count(), 71u);
    EXPECT_EQ(shares.refused(), 2u);
    shares.release("203.0.113.1");
    EXPECT_TRUE(shares.take("203.0.113.1", false)) << "there is room again";
}

TEST(ConnectionShares, TheTotalIsBounded) {
    ConnectionShares shares;
    shares.setMost(4);
    EXPECT_EQ(shares.share(false), 4u) << "enough for a browser";
    for (const char* const address : {"a", "b", "c", "d"}) {
        EXPECT_FALSE(shares.isTight());
        EXPECT_TRUE(shares.take(address, false));
    }
    EXPECT_TRUE(shares.isTight());
    EXPECT_FALSE(shares.take("e", false));
    shares.countRefused();
    EXPECT_EQ(shares.refused(), 2u);
}

TEST(ConnectionShares, WaitsForTheLastConnection) {
    ConnectionShares shares;
    shares.setMost(4);
    EXPECT_TRUE(shares.waitForNone(ConnectionShares::Clock::now()));
    EXPECT_TRUE(shares.take("a", true));
    EXPECT_FALSE(shares.waitForNone(ConnectionShares::Clock::now() + 10ms));
    std::thread later([&] { shares.release("a"); });
    EXPECT_TRUE(shares.waitForNone(ConnectionShares::Clock::now() + 60s));
    later.join();
}

} // namespace
