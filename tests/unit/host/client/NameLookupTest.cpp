#include "host/client/NameLookup.h"

#include "support/FakeResolver.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <thread>

#include <netinet/in.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = NameLookup::Clock;
using testing::IsEmpty;

class NameLookupTest : public testing::Test {
protected:
    std::vector<std::string> find(NameLookup& lookup, std::chrono::milliseconds time = 20s) {
        std::vector<std::string> texts;
        for (const SocketAddress& address : lookup.find(Clock::now() + time, giveUp.get_token())) {
            texts.push_back(address.text());
        }
        return texts;
    }

    std::stop_source giveUp;
};

TEST_F(NameLookupTest, NumericAddressesNeedNoLookup) {
    const FakeResolver resolver("127.0.0.1");
    NameLookup four("127.0.0.2", 514);
    EXPECT_THAT(find(four), testing::ElementsAre("127.0.0.2"));
    NameLookup six("::1", 514);
    const std::vector<SocketAddress> found = six.find(Clock::now(), giveUp.get_token());
    ASSERT_EQ(found.size(), 1u);
    EXPECT_EQ(found[0].text(), "::1");
    ASSERT_EQ(found[0].family(), AF_INET6);
    EXPECT_EQ(reinterpret_cast<const sockaddr_in6*>(found[0].pointer())->sin6_port, htons(514));
    EXPECT_EQ(resolver.lookups(), 0);
}

TEST_F(NameLookupTest, FindsTheAddressesOfAName) {
    NameLookup lookup("localhost", 514);
    EXPECT_THAT(find(lookup), testing::Contains("127.0.0.1"));
}

TEST_F(NameLookupTest, ReportsWhyThereAreNone) {
    NameLookup lookup("nowhere.invalid", 514);
    EXPECT_THAT(find(lookup), IsEmpty());
    EXPECT_THAT(lookup.error(), testing::AnyOf("Name or service not known",
                                               "Temporary failure in name resolution"));
}

TEST_F(NameLookupTest, WaitsNoLongerThanItsLimitAndForOneLookupAtATime) {
    FakeResolver resolver("127.0.0.3");
    NameLookup lookup("slow.example", 514);
    const auto begin = Clock::now();
    for (int count = 0; count < 3; ++count) {
        EXPECT_THAT(find(lookup, 20ms), IsEmpty());
        EXPECT_EQ(lookup.error(), "the system is still looking its name up");
    }
    EXPECT_LT(Clock::now() - begin, 10s);
    EXPECT_EQ(resolver.lookups(), 1);
    resolver.answer();
    EXPECT_THAT(find(lookup), testing::ElementsAre("127.0.0.3"));
    EXPECT_EQ(resolver.lookups(), 1);
    EXPECT_THAT(find(lookup), testing::ElementsAre("127.0.0.3"));
    EXPECT_EQ(resolver.lookups(), 2) << "an answer is not kept";
}

TEST_F(NameLookupTest, GivesUpAtOnceAndCanBeDestroyedMeanwhile) {
    const FakeResolver resolver("127.0.0.3");
    auto lookup = std::make_unique<NameLookup>("slow.example", 514);
    std::jthread stopper([this] {
        std::this_thread::sleep_for(20ms);
        giveUp.request_stop();
    });
    const auto begin = Clock::now();
    EXPECT_THAT(find(*lookup, 60s), IsEmpty());
    lookup.reset();
    EXPECT_LT(Clock::now() - begin, 30s);
}

} // namespace
