#include "host/http/ConnectionShares.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <string>

#include <sys/resource.h>

using namespace zrm::host;

namespace {

/// Sets the process's soft limit of descriptors while it lives.
class SoftLimit {
public:
    explicit SoftLimit(rlim_t soft) {
        getrlimit(RLIMIT_NOFILE, &m_before);
        rlimit limit = m_before;
        limit.rlim_cur = soft;
        EXPECT_EQ(setrlimit(RLIMIT_NOFILE, &limit), 0);
    }
    ~SoftLimit() { setrlimit(RLIMIT_NOFILE, &m_before); }

private:
    rlimit m_before{};
};

rlim_t softLimit() {
    rlimit limit{};
    getrlimit(RLIMIT_NOFILE, &limit);
    return limit.rlim_cur;
}

TEST(DescriptorRoom, LeavesTheLowDescriptorsToTheAgent) {
    rlimit limit{};
    getrlimit(RLIMIT_NOFILE, &limit);
    if (limit.rlim_max < 2000) {
        GTEST_FAIL() << "the tests need a hard limit of 2000 descriptors";
    }
    const SoftLimit low(256);
    const DescriptorRoom room = DescriptorRoom::make(500);
    EXPECT_EQ(room.count, 500u);
    EXPECT_EQ(room.lowest, 1024);
    EXPECT_GE(softLimit(), 1024u + 500u) << "the soft limit was raised";
}

/// The current size of the process's descriptor table.
int tableSize() {
    std::ifstream status("/proc/self/status");
    std::string word;
    while (status >> word && word != "FDSize:") {
    }
    int size = 0;
    status >> size;
    return size;
}

TEST(DescriptorRoom, IsReservedBeforeTheFirstClient) {
    const auto inAProcessOfItsOwn = [] {
        const bool wasSmall = tableSize() <= 1024;
        const DescriptorRoom room = DescriptorRoom::make(500);
        std::exit(wasSmall && tableSize() > room.lowest ? 0 : 1);
    };
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(inAProcessOfItsOwn(), testing::ExitedWithCode(0), "");
}

TEST(DescriptorRoom, TakesHalfOfFewDescriptors) {
    const auto inAProcessOfItsOwn = [] {
        const rlimit few{100, 100};
        setrlimit(RLIMIT_NOFILE, &few);
        const DescriptorRoom room = DescriptorRoom::make(500);
        std::exit(room.count == 50 && room.lowest == 0 ? 0 : 1);
    };
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(inAProcessOfItsOwn(), testing::ExitedWithCode(0), "");
}

} // namespace
