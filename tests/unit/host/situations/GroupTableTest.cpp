#include "host/situations/GroupTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <list>
#include <random>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

constexpr std::int64_t noon = 1'800'000'000;
constexpr std::int64_t period = 60;

std::vector<std::string> keysOf(GroupTable& table) {
    std::vector<std::string> keys;
    table.visitAll([&](const Group& group) { keys.emplace_back(group.key()); });
    return keys;
}

TEST(GroupTable, HasTheGroupUsedLastFirst) {
    GroupTable table(10);
    for (const char* const key : {"a", "b", "c"}) {
        EXPECT_EQ(table.find(key), nullptr);
        EXPECT_EQ(table.add(key).key(), key);
    }
    EXPECT_EQ(table.find("a")->key(), "a");
    EXPECT_THAT(keysOf(table), ElementsAre("a", "c", "b"));
    EXPECT_EQ(table.find("c")->key(), "c");
    EXPECT_EQ(table.find("c")->key(), "c");
    EXPECT_THAT(keysOf(table), ElementsAre("c", "a", "b"));
    EXPECT_EQ(table.oldest().key(), "b");
}

TEST(GroupTable, TheGroupThatMakesRoomLeavesNothingBehind) {
    GroupTable table(1);
    Group& first = table.add("a");
    first.windows().add(noon, period);
    first.makeExtra().events.push_back(noon);
    ASSERT_TRUE(table.isFull());
    Group& second = table.add("b");
    EXPECT_EQ(second.key(), "b");
    EXPECT_EQ(second.extra(), nullptr);
    EXPECT_EQ(second.windows().add(noon, period), 1);
    EXPECT_EQ(table.find("a"), nullptr);
    EXPECT_EQ(table.size(), 1u);
}

TEST(GroupTable, GroupsStayWhereTheyAreWhenOthersAreAdded) {
    GroupTable table(10'000);
    Group* const first = &table.add("first");
    for (int number = 1; number < 10'000; ++number) {
        table.add(std::to_string(number));
    }
    EXPECT_EQ(table.find("first"), first);
}

/// A key that shares its beginning with many others; some are too long to be kept in the group.
std::string keyOf(std::size_t number) {
    return std::string(number % 4 * 20, 'x') + std::to_string(number);
}

TEST(GroupTable, AgreesWithAPlainListWhateverIsAsked) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned seed =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
    std::mt19937 random(seed);
    for (const std::size_t most : {1, 2, 100, 3000}) {
        GroupTable table(most);
        std::list<std::string> plain; // the one used last first
        for (int step = 0; step < 20'000; ++step) {
            const std::string key = keyOf(random() % (most * 3 / 2 + 2));
            Group* const found = table.find(key);
            const auto known = std::find(plain.begin(), plain.end(), key);
            ASSERT_EQ(found != nullptr, known != plain.end()) << "step " << step;
            if (found != nullptr) {
                ASSERT_EQ(found->key(), key);
                plain.splice(plain.begin(), plain, known);
                continue;
            }
            ASSERT_EQ(table.isFull(), plain.size() == most);
            if (table.isFull()) {
                ASSERT_EQ(table.oldest().key(), plain.back());
                plain.pop_back();
            }
            ASSERT_EQ(table.add(key).key(), key);
            plain.push_front(key);
        }
        EXPECT_EQ(table.size(), plain.size());
        EXPECT_THAT(keysOf(table), testing::ElementsAreArray(plain));
    }
}

} // namespace
