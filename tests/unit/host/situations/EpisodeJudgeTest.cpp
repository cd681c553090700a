#include "host/situations/EpisodeJudge.h"

#include "host/situations/GroupKey.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using Decision = EpisodeJudge::Decision;

constexpr std::int64_t noon = 1'800'000'000;

JudgementConfig lasting(std::int64_t resolveAfter, std::int64_t frequency = 0) {
    JudgementConfig rules;
    rules.resolveAfter = resolveAfter;
    rules.frequency = frequency;
    rules.period = frequency > 0 ? 60 : 0;
    return rules;
}

JudgementConfig grouped(std::size_t most, std::int64_t resolveAfter = 0) {
    JudgementConfig rules = lasting(resolveAfter);
    rules.groupBy = {"ip"};
    rules.maxGroups = most;
    return rules;
}

/// A judge that is told times after noon.
class EpisodeJudgeTest : public testing::Test {
protected:
    Decision at(EpisodeJudge& judge, std::int64_t time, std::string_view group = "",
                std::string_view distinct = "", std::string_view log = "/log") {
        verdict = judge.judge({noon + time, group, distinct, log}, ended);
        return verdict.decision;
    }
    std::vector<Decision> all(EpisodeJudge& judge, const std::vector<std::int64_t>& times) {
        std::vector<Decision> decisions;
        for (const std::int64_t time : times) {
            decisions.push_back(at(judge, time));
        }
        return decisions;
    }

    EpisodeJudge::Verdict verdict;
    std::vector<EndedEpisode> ended;
};

TEST_F(EpisodeJudgeTest, OneEpisodeForABurst) {
    EpisodeJudge judge(lasting(900, 5));
    for (int entry = 0; entry < 74; ++entry) {
        const Decision expected = entry < 4    ? Decision::NONE
                                  : entry == 4 ? Decision::RAISES
                                               : Decision::CONTINUES;
        EXPECT_EQ(at(judge, entry), expected) << entry;
    }
    EXPECT_EQ(verdict.episode->count, 74u) << "those before the threshold was met belong to it";
    EXPECT_EQ(verdict.episode->first, noon);
    EXPECT_EQ(verdict.episode->last, noon + 73);
    EXPECT_TRUE(ended.empty());
}

/// Three others within a minute, then the entry.
JudgementConfig sequence() {
    JudgementConfig rules = lasting(0, 3);
    rules.groupBy = {"ip"};
    rules.then = "result=Accepted";
    return rules;
}

TEST_F(EpisodeJudgeTest, WhatComesAfterOthersRaisesAndIsNotCounted) {
    EpisodeJudge judge(sequence());
    const auto other = [&](std::int64_t time, std::string_view group) {
        verdict = judge.judge({noon + time, group, "", "/log", false}, ended);
        return verdict.decision;
    };
    EXPECT_EQ(other(0, "a"), Decision::NONE);
    EXPECT_EQ(other(1, "a"), Decision::NONE);
    EXPECT_EQ(at(judge, 2, "a"), Decision::NONE);
    EXPECT_EQ(verdict.count, 2);
    EXPECT_EQ(other(3, "a"), Decision::NONE) << "only what comes after them raises";
    EXPECT_EQ(verdict.count, 3);
    EXPECT_EQ(other(3, "b"), Decision::NONE);
    EXPECT_EQ(at(judge, 4, "b"), Decision::NONE) << "another group";
    EXPECT_EQ(at(judge, 59, "a"), Decision::RAISES);
    EXPECT_EQ(verdict.count, 3);
    EXPECT_EQ(verdict.first, noon);
    EXPECT_EQ(at(judge, 60, "a"), Decision::NONE) << "the first of them is too old";
    EXPECT_EQ(verdict.count, 2);
    EXPECT_EQ(at(judge, 2, "a"), Decision::NONE) << "a late one, before which there were two";
}

TEST_F(EpisodeJudgeTest, OthersThatAnEarlierRunHasJudgedCountForWhatComesAfter) {
    EpisodeJudge judge(sequence());
    for (const std::int64_t time : {0, 1, 2}) {
        judge.recount({noon + time, "a", "", "/log", false});
    }
    judge.recount({noon + 3, "a", "", "/log", true});
    EXPECT_EQ(at(judge, 4, "a"), Decision::RAISES);
    EXPECT_EQ(verdict.count, 3);
}

TEST_F(EpisodeJudgeTest, AnEpisodeOfASequenceHasAllItsEntries) {
    JudgementConfig rules = sequence();
    rules.resolveAfter = 100;
    EpisodeJudge judge(rules);
    for (const std::int64_t time : {0, 1, 2}) {
        judge.judge({noon + time, "a", "", "/log", false}, ended);
    }
    EXPECT_EQ(at(judge, 10, "a"), Decision::RAISES);
    EXPECT_EQ(verdict.episode->count, 4u);
    EXPECT_EQ(verdict.episode->first, noon);
    verdict = judge.judge({noon + 50, "a", "", "/log", false}, ended);
    EXPECT_EQ(verdict.decision, Decision::CONTINUES);
    EXPECT_EQ(verdict.episode->count, 5u);
}

TEST_F(EpisodeJudgeTest, ASequenceMayCountDifferentValues) {
    JudgementConfig rules = sequence();
    rules.distinct = "user";
    EpisodeJudge judge(rules);
    EXPECT_EQ(at(judge, 0, "a"), Decision::NONE) << "nothing came before";
    for (const char* const user : {"x", "y", "x", "x"}) {
        judge.judge({noon + 1, "a", user, "/log", false}, ended);
    }
    EXPECT_EQ(at(judge, 2, "a", "z"), Decision::NONE);
    EXPECT_EQ(verdict.count, 2);
    judge.judge({noon + 3, "a", "w", "/log", false}, ended);
    EXPECT_EQ(at(judge, 4, "a", "z"), Decision::RAISES);
    EXPECT_EQ(at(judge, 61, "a", "z"), Decision::NONE) << "only one is recent enough";
    EXPECT_EQ(verdict.count, 1);
}

TEST_F(EpisodeJudgeTest, AnyMatchingEntryKeepsItOpen) {
    EpisodeJudge judge(lasting(100, 2));
    EXPECT_THAT(all(judge, {0, 1, 100, 199, 298}),
                ElementsAre(Decision::NONE, Decision::RAISES, Decision::CONTINUES,
                            Decision::CONTINUES, Decision::CONTINUES));
    EXPECT_EQ(at(judge, 398), Decision::NONE) << "too late, and alone";
    ASSERT_EQ(ended.size(), 1u);
    EXPECT_EQ(ended[0].episode.count, 5u);
    EXPECT_EQ(ended[0].episode.last, noon + 298);
    EXPECT_FALSE(ended[0].isDropped);
    EXPECT_EQ(judge.episodes(), 0u);
}

TEST_F(EpisodeJudgeTest, ALateEntryBelongsToTheEpisodeAndMovesItsFirst) {
    EpisodeJudge judge(lasting(100));
    EXPECT_THAT(all(judge, {0, -99, 50}),
                ElementsAre(Decision::RAISES, Decision::CONTINUES, Decision::CONTINUES));
    EXPECT_EQ(verdict.episode->first, noon - 99);
    EXPECT_EQ(verdict.episode->last, noon + 50);
    EXPECT_EQ(at(judge, -199), Decision::RAISES) << "an episode of its own";
    EXPECT_EQ(judge.episodes(), 2u);
    EXPECT_TRUE(ended.empty()) << "earlier entries end nothing";
}

TEST_F(EpisodeJudgeTest, AClockThatIsSetForwardAndBackIsFollowedAtOnce) {
    constexpr std::int64_t day = 86'400;
    EpisodeJudge judge(lasting(900));
    EXPECT_THAT(all(judge, {0, 60, day + 60, 120, day + 90}),
                ElementsAre(Decision::RAISES, Decision::CONTINUES, Decision::RAISES,
                            Decision::RAISES, Decision::CONTINUES));
    ASSERT_EQ(ended.size(), 1u) << "tomorrow's entry ended today's episode";
    EXPECT_EQ(judge.episodes(), 2u);
}

TEST_F(EpisodeJudgeTest, LogsThatAreReadAtDifferentTimesHaveEpisodesSideBySide) {
    constexpr std::int64_t day = 86'400;
    EpisodeJudge judge(lasting(900));
    for (int entry = 0; entry < 100; ++entry) {
        const Decision expected = entry == 0 ? Decision::RAISES : Decision::CONTINUES;
        EXPECT_EQ(at(judge, entry, "", "", "/live"), expected);
        EXPECT_EQ(at(judge, entry - day, "", "", "/resumed"), expected);
    }
    EXPECT_TRUE(ended.empty());
    EXPECT_EQ(judge.episodes(), 2u);
}

TEST_F(EpisodeJudgeTest, EachLogHasAShare) {
    EpisodeJudge judge(lasting(900));
    at(judge, 0, "", "", "/a");
    at(judge, 5, "", "", "/b");
    at(judge, 7, "", "", "/a");
    ASSERT_EQ(verdict.episode->shares.size(), 2u);
    EXPECT_EQ(verdict.share, verdict.episode->shares[0]);
    EXPECT_EQ(verdict.share->log, "/a");
    EXPECT_EQ(verdict.share->count, 2u);
    EXPECT_EQ(verdict.share->last, noon + 7);
    EXPECT_EQ(verdict.episode->shares[1]->count, 1u);
    EXPECT_EQ(verdict.episode->count, 3u);
    EXPECT_EQ(at(judge, 2000, "", "", "/a"), Decision::RAISES);
    EXPECT_TRUE(ended.empty()) << "the other log may not have been read so far";
}

TEST_F(EpisodeJudgeTest, GroupsAreJudgedApart) {
    EpisodeJudge judge([] {
        JudgementConfig rules = grouped(10, 900);
        rules.frequency = 3;
        rules.period = 60;
        return rules;
    }());
    for (int entry = 0; entry < 2; ++entry) {
        EXPECT_EQ(at(judge, entry, "a"), Decision::NONE);
        EXPECT_EQ(at(judge, entry, "b"), Decision::NONE);
    }
    EXPECT_EQ(at(judge, 2, "a"), Decision::RAISES);
    EXPECT_EQ(at(judge, 100, "b"), Decision::NONE) << "its first two are too long ago";
    EXPECT_EQ(judge.groups(), 2u);
    EXPECT_EQ(judge.episodes(), 1u);
}

TEST_F(EpisodeJudgeTest, TheGroupUsedLeastRecentlyMakesRoom) {
    EpisodeJudge judge(grouped(2, 900));
    at(judge, 0, "a");
    at(judge, 1, "b");
    at(judge, 2, "a");
    EXPECT_EQ(at(judge, 3, "c"), Decision::RAISES);
    ASSERT_EQ(ended.size(), 1u);
    EXPECT_EQ(ended[0].group, "b");
    EXPECT_TRUE(ended[0].isDropped);
    EXPECT_EQ(judge.droppedGroups(), 1u);
    EXPECT_EQ(judge.groups(), 2u);
    EXPECT_EQ(at(judge, 4, "a"), Decision::CONTINUES);
    EXPECT_EQ(at(judge, 5000, "d"), Decision::RAISES);
    EXPECT_FALSE(ended[1].isDropped) << "it was over";
}

TEST_F(EpisodeJudgeTest, AnIdleGroupThatMakesRoomIsNotCountedAsDropped) {
    JudgementConfig rules = grouped(1);
    rules.frequency = 5;
    rules.period = 60;
    EpisodeJudge judge(rules);
    at(judge, 0, "a");
    at(judge, 60, "b");
    EXPECT_EQ(judge.droppedGroups(), 0u);
    at(judge, 61, "a");
    EXPECT_EQ(judge.droppedGroups(), 1u);
}

TEST_F(EpisodeJudgeTest, DifferentValuesAreCounted) {
    JudgementConfig rules = grouped(10);
    rules.frequency = 3;
    rules.period = 60;
    rules.distinct = "user";
    EpisodeJudge judge(rules);
    EXPECT_EQ(at(judge, 0, "a", "root"), Decision::NONE);
    EXPECT_EQ(at(judge, 1, "a", "admin"), Decision::NONE);
    EXPECT_EQ(at(judge, 2, "a", "root"), Decision::NONE);
    EXPECT_EQ(verdict.count, 2);
    EXPECT_EQ(at(judge, 3, "b", "guest"), Decision::NONE) << "another group";
    EXPECT_EQ(at(judge, 4, "a", "guest"), Decision::RAISES);
    EXPECT_EQ(verdict.count, 3);
    EXPECT_EQ(at(judge, 61, "a", "other"), Decision::RAISES) << "root is there since 12:00:02";
    EXPECT_EQ(verdict.count, 3) << "and admin no longer";
}

TEST_F(EpisodeJudgeTest, OfTooManyDifferentValuesAtLeastThatManyAreCounted) {
    DistinctValues values(100);
    for (int value = 0; value < 1000; ++value) {
        const std::int64_t exact = std::min(value + 1, 100);
        EXPECT_EQ(values.add(noon, 60, std::to_string(value)), exact);
    }
    EXPECT_EQ(values.add(noon + 60, 60, "new"), 1);
}

TEST_F(EpisodeJudgeTest, AfterAnEventAGroupCoolsDownByTheEntriesTimes) {
    JudgementConfig rules = grouped(10);
    rules.cooldown = 100;
    EpisodeJudge judge(rules);
    EXPECT_EQ(at(judge, 0, "a"), Decision::RAISES);
    EXPECT_EQ(at(judge, 99, "a"), Decision::NONE);
    EXPECT_EQ(at(judge, 99, "b"), Decision::RAISES);
    EXPECT_EQ(at(judge, 100, "a"), Decision::RAISES);
    EXPECT_EQ(at(judge, 1, "a"), Decision::NONE) << "late";
    judge.restorePause("c", noon + 50, ended);
    EXPECT_EQ(at(judge, 149, "c"), Decision::NONE);
    EXPECT_EQ(at(judge, 150, "c"), Decision::RAISES);
}

TEST_F(EpisodeJudgeTest, AnUpperBoundIsMetByRareEntries) {
    JudgementConfig rules = lasting(0, 2);
    rules.isUpperBound = true;
    rules.groupBy = {"ip"};
    EpisodeJudge judge(rules);
    EXPECT_THAT(all(judge, {0, 1, 2}),
                ElementsAre(Decision::RAISES, Decision::RAISES, Decision::NONE));
}

TEST_F(EpisodeJudgeTest, EarlierEntriesCountButRaiseNothing) {
    EpisodeJudge judge(lasting(900, 3));
    for (const std::int64_t time : {0, 1, 2, 3}) {
        judge.recount({noon + time, "", "", "/log"});
    }
    EXPECT_EQ(judge.episodes(), 0u);
    EXPECT_EQ(at(judge, 4), Decision::RAISES);
    EXPECT_EQ(verdict.count, 5);
}

TEST_F(EpisodeJudgeTest, EarlierEntriesAddNothingToAnEpisodeOfAnEarlierRun) {
    EpisodeJudge judge(lasting(900, 3));
    Episode episode;
    episode.id->set(17);
    episode.first = noon;
    episode.last = noon + 3;
    episode.count = 4;
    episode.shares.push_back(
        std::make_shared<GrowingShare>(EpisodeShare{episode.id, "/log", 4, noon, noon + 3}));
    judge.restore("", std::move(episode), ended);
    judge.recount({noon + 3, "", "", "/log"});
    EXPECT_EQ(at(judge, 5), Decision::CONTINUES);
    EXPECT_EQ(verdict.episode->id->value(), 17u);
    EXPECT_EQ(verdict.share->count, 5u);
}

TEST_F(EpisodeJudgeTest, TheCallerEndsWhatIsOverByTheClock) {
    EpisodeJudge judge(grouped(10, 900));
    at(judge, 0, "a");
    at(judge, 50, "b");
    EXPECT_EQ(judge.earliestLast(), noon);
    judge.takeOver([](const Episode& episode) { return episode.last == noon; }, ended);
    ASSERT_EQ(ended.size(), 1u);
    EXPECT_EQ(ended[0].group, "a");
    EXPECT_EQ(judge.earliestLast(), noon + 50);
    EXPECT_EQ(judge.episodes(), 1u);
    EXPECT_EQ(at(judge, 10, "a"), Decision::RAISES) << "it begins another";
}

TEST_F(EpisodeJudgeTest, AGroupHasOnlySoManyEpisodesSideBySide) {
    EpisodeJudge judge(lasting(10));
    for (std::int64_t number = 0; number <= std::int64_t{EpisodeJudge::mostEpisodes}; ++number) {
        EXPECT_EQ(at(judge, -number * 1000), Decision::RAISES);
    }
    ASSERT_EQ(ended.size(), 1u);
    EXPECT_TRUE(ended[0].isDropped);
    EXPECT_EQ(ended[0].episode.first, noon);
    EXPECT_EQ(judge.episodes(), EpisodeJudge::mostEpisodes);
}

TEST(GroupKey, ValuesComeBackAndDifferentOnesStayDifferent) {
    const std::vector<std::string> names = {"ip", "user"};
    const auto keyOf = [](const std::string& first, const std::string& second) {
        std::string key;
        GroupKey::append(key, first);
        GroupKey::append(key, second);
        return key;
    };
    EXPECT_THAT(
        GroupKey::values(keyOf("10.0.0.1", std::string("a\0b\n", 4)), names),
        ElementsAre(GroupValue{"ip", "10.0.0.1"}, GroupValue{"user", std::string("a\0b\n", 4)}));
    EXPECT_NE(keyOf("ab", "c"), keyOf("a", "bc"));
    EXPECT_NE(keyOf("", "a"), keyOf("a", ""));
    const std::string large(65'536, 'x');
    EXPECT_NE(keyOf(large + "1", ""), keyOf(large + "2", ""));
    EXPECT_LE(keyOf(large, large).size(), 2 * (GroupKey::longestValue + 2));
    const std::vector<GroupValue> cut = GroupKey::values(keyOf(large, "b"), names);
    EXPECT_EQ(cut[0].value.size(), GroupKey::longestValue);
    EXPECT_EQ(GroupKey::of(cut, names), keyOf(large, "b")) << "as the history gives it back";
    EXPECT_THAT(GroupKey::values("", names),
                ElementsAre(GroupValue{"ip", ""}, GroupValue{"user", ""}));
}

} // namespace
