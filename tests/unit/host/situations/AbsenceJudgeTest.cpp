#include "host/situations/AbsenceJudge.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t hour = 3600;

/// A judge that is told times, and the groups that it has found.
class AbsenceJudgeTest : public testing::Test {
protected:
    /// Whether the entry ends an absence.
    bool came(AbsenceJudge& judge, const char* key, std::int64_t time) {
        AbsenceJudge::Group& group = judge.came(key, time, dropped);
        return std::exchange(group.absence, nullptr) != nullptr;
    }
    static std::vector<std::string> due(AbsenceJudge& judge, std::int64_t time) {
        std::vector<std::string> keys;
        while (AbsenceJudge::Group* const group = judge.takeDue(time)) {
            group->absence = std::make_shared<EpisodeId>(keys.size() + 1);
            keys.push_back(group->key);
        }
        return keys;
    }
    std::vector<std::string> droppedKeys() {
        std::vector<std::string> keys;
        for (const AbsenceJudge::Group& group : std::exchange(dropped, {})) {
            keys.push_back(group.key);
        }
        return keys;
    }

    std::vector<AbsenceJudge::Group> dropped;
};

TEST_F(AbsenceJudgeTest, AGroupIsAbsentFromTheLimitOnUntilItsNextEntry) {
    AbsenceJudge judge(hour, 10);
    EXPECT_FALSE(came(judge, "a", 100));
    EXPECT_EQ(judge.nextDue(), 100 + hour);
    EXPECT_THAT(due(judge, 100 + hour - 1), IsEmpty());
    EXPECT_THAT(due(judge, 100 + hour), ElementsAre("a"));
    EXPECT_THAT(due(judge, 100 + 9 * hour), IsEmpty()) << "raised once";
    EXPECT_EQ(judge.absent().size(), 1u);
    EXPECT_TRUE(came(judge, "a", 100 + 9 * hour));
    EXPECT_EQ(judge.absent().size(), 0u);
    EXPECT_FALSE(came(judge, "a", 100 + 9 * hour + 5));
    EXPECT_THAT(due(judge, 100 + 10 * hour + 4), IsEmpty());
    EXPECT_THAT(due(judge, 100 + 10 * hour + 5), ElementsAre("a"));
}

TEST_F(AbsenceJudgeTest, GroupsAreJudgedApartInTheOrderOfTheirLastEntries) {
    AbsenceJudge judge(hour, 10);
    came(judge, "a", 0);
    came(judge, "b", 10);
    came(judge, "c", 20);
    came(judge, "a", 30);
    EXPECT_THAT(due(judge, hour + 20), ElementsAre("b", "c"));
    EXPECT_THAT(due(judge, hour + 30), ElementsAre("a"));
    EXPECT_EQ(judge.nextDue(), std::numeric_limits<std::int64_t>::max());
    EXPECT_EQ(judge.groups(), 3u);
}

TEST_F(AbsenceJudgeTest, WhatIsExpectedFromTheBeginningIsAbsentWithoutAnyEntry) {
    AbsenceJudge judge(hour, 1);
    judge.expect({.key = "", .seen = 50}, dropped);
    EXPECT_THAT(due(judge, 50 + hour), ElementsAre(""));
}

TEST_F(AbsenceJudgeTest, AnAbsenceOfAnEarlierRunGoesOn) {
    AbsenceJudge judge(hour, 10);
    judge.expect({.key = "a", .seen = 0, .absence = std::make_shared<EpisodeId>(7)}, dropped);
    judge.expect({.key = "b", .seen = 0}, dropped);
    EXPECT_THAT(due(judge, hour), ElementsAre("b"));
    EXPECT_TRUE(came(judge, "a", hour));
}

TEST_F(AbsenceJudgeTest, TheGroupWithoutEntriesForLongestMakesRoom) {
    AbsenceJudge judge(hour, 2);
    came(judge, "a", 0);
    came(judge, "b", 1);
    came(judge, "a", 2);
    came(judge, "c", 3);
    EXPECT_THAT(droppedKeys(), ElementsAre("b"));
    EXPECT_THAT(due(judge, 2 + hour), ElementsAre("a"));
    came(judge, "d", 3 + hour);
    EXPECT_THAT(droppedKeys(), ElementsAre("a")) << "what is absent has had none for longer";
    EXPECT_EQ(judge.groups(), 2u);
    EXPECT_EQ(judge.droppedGroups(), 2u);
}

TEST_F(AbsenceJudgeTest, ANewGroupPerEntryTakesBoundedRoom) {
    AbsenceJudge judge(hour, 100);
    for (int number = 0; number < 10'000; ++number) {
        came(judge, std::to_string(number).c_str(), number / 100);
        dropped.clear();
    }
    EXPECT_EQ(judge.groups(), 100u);
    EXPECT_EQ(judge.droppedGroups(), 9'900u);
    EXPECT_EQ(due(judge, 100 + hour).size(), 100u);
}

} // namespace
