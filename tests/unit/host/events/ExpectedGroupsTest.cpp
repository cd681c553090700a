#include "host/events/ExpectedGroups.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using std::chrono::milliseconds;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

/// With a steady clock of its own.
class ExpectedGroupsTest : public testing::Test {
protected:
    static ExpectedGroup group(const std::string& key, std::int64_t seen,
                               const std::string& situation = "backup") {
        return {situation, key, 17, seen, 1'800'000'000, "/log", "web1:ZRM"};
    }

    ExpectedGroups::Clock::time_point now{milliseconds(5'000'000)};
    ExpectedGroups groups{true, [this] { return now; }};
};

TEST_F(ExpectedGroupsTest, TheTimeGoesOnWhereTheLastRunEnded) {
    groups.load({.watched = 100'000});
    EXPECT_EQ(groups.watched(), 100'000);
    now += milliseconds(250);
    EXPECT_EQ(groups.watched(), 100'250);
}

TEST_F(ExpectedGroupsTest, TheTimeIsNotBeforeWhatWasSeen) {
    groups.load({.watched = 100'000, .groups = {group("a", 104'000), group("b", -1)}});
    EXPECT_EQ(groups.watched(), 104'000);
}

TEST_F(ExpectedGroupsTest, TheTimeIsStoredNowAndThenIfThereAreGroups) {
    now += milliseconds(60'000);
    EXPECT_TRUE(groups.unsaved(true).isEmpty()) << "nobody waits for anything";
    groups.note(group("a", 60'000));
    EXPECT_EQ(groups.unsaved(false).watched, 60'000);
    groups.saved(groups.unsaved(false));
    now += milliseconds(9'999);
    EXPECT_TRUE(groups.unsaved(false).isEmpty());
    EXPECT_EQ(groups.unsaved(true).watched, 69'999);
    now += milliseconds(1);
    EXPECT_EQ(groups.unsaved(false).watched, 70'000);
}

TEST_F(ExpectedGroupsTest, WhatIsNotedIsStoredOnceAndAgainWhenItChanges) {
    groups.note(group("a", 1));
    groups.note(group("b", 1));
    const ExpectedValues values = groups.unsaved(false);
    EXPECT_THAT(values.groups, ElementsAre(group("a", 1), group("b", 1)));
    groups.note(group("b", 2));
    groups.saved(values);
    EXPECT_THAT(groups.unsaved(false).groups, ElementsAre(group("b", 2)));
}

TEST_F(ExpectedGroupsTest, WhatIsForgottenIsRemovedFromTheStore) {
    groups.note(group("a", 1));
    groups.forget("backup", "a");
    const ExpectedValues values = groups.unsaved(false);
    EXPECT_THAT(values.groups, IsEmpty());
    EXPECT_THAT(values.forgotten, ElementsAre(Pair("backup", "a")));
    groups.forget("backup", "b");
    groups.saved(values);
    EXPECT_THAT(groups.unsaved(false).forgotten, ElementsAre(Pair("backup", "b")));
}

TEST_F(ExpectedGroupsTest, GroupsOfAnEarlierRunAreTakenByTheSameDefinitionOnly) {
    groups.load({.groups = {group("a", 1), group("b", 1), group("c", 1, "other"),
                            group("d", 1, "removed")}});
    EXPECT_THAT(groups.take("backup", 17), ElementsAre(group("a", 1), group("b", 1)));
    EXPECT_THAT(groups.take("backup", 17), IsEmpty());
    EXPECT_THAT(groups.take("other", 18), IsEmpty());
    groups.forgetLeft();
    EXPECT_THAT(groups.unsaved(false).forgotten,
                ElementsAre(Pair("other", "c"), Pair("removed", "d")));
}

TEST_F(ExpectedGroupsTest, WithoutAHistoryNothingIsCollected) {
    ExpectedGroups unkept(false, [this] { return now; });
    unkept.note(group("a", 1));
    unkept.forget("backup", "b");
    EXPECT_TRUE(unkept.unsaved(true).isEmpty());
}

TEST_F(ExpectedGroupsTest, ALostStoreIsFilledAgain) {
    groups.note(group("a", 1));
    groups.saved(groups.unsaved(false));
    EXPECT_EQ(groups.losses(), 0u);
    groups.forget("backup", "b");
    groups.forgetSaved();
    EXPECT_EQ(groups.losses(), 1u) << "who has the groups notes them again";
    EXPECT_THAT(groups.unsaved(false).forgotten, IsEmpty());
}

} // namespace
