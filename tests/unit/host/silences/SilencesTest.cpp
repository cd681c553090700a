#include "host/silences/Silences.h"

#include "host/base/TimeText.h"
#include "host/events/Episode.h"
#include "host/events/Event.h"
#include "host/silences/Silencer.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using Groups = std::vector<GroupValue>;

constexpr std::int64_t hour = 3'600'000;

class SilencesTest : public testing::Test {
protected:
    std::uint64_t add(SilenceMatch match, std::int64_t length = hour) {
        Silence silence;
        silence.match = std::move(match);
        silence.created = now;
        silence.until = now + length;
        return silences.add(silence).value().id;
    }
    std::uint64_t addFor(std::string SilenceMatch::*member, const std::string& pattern) {
        SilenceMatch match;
        match.*member = pattern;
        return add(match);
    }
    std::uint64_t find(const char* situation, const char* severity = "minor",
                       const char* log = "/var/log/app.log", const Groups& group = {},
                       std::int64_t raised = 0) {
        return silencer.find({situation, severity, log, group, raised == 0 ? now : raised});
    }

    const std::int64_t now = WallClock::now();
    Silences silences;
    Silencer silencer{silences, "web1:ZRM",
                      [](std::uint64_t event) { return std::uint64_t{event == 77 ? 9u : 0u}; }};
};

TEST_F(SilencesTest, HoldNothingBackWhileThereAreNone) {
    EXPECT_EQ(find("disk"), 0u);
}

TEST_F(SilencesTest, HoldBackWhatMeetsAllThatTheyName) {
    SilenceMatch match;
    match.situation = "disk*";
    match.severity = "m*";
    match.log = "/var/log/*.log";
    const std::uint64_t id = add(match);
    EXPECT_EQ(find("disk-full"), id);
    EXPECT_EQ(find("disk-full", "major"), id);
    EXPECT_EQ(find("disk-full", "info"), 0u);
    EXPECT_EQ(find("login"), 0u);
    EXPECT_EQ(find("disk-full", "minor", "/var/log/nginx/app.log"), 0u);
}

TEST_F(SilencesTest, NameTheNodeWithOrWithoutItsType) {
    addFor(&SilenceMatch::node, "web2");
    EXPECT_EQ(find("disk"), 0u);
    const std::uint64_t id = addFor(&SilenceMatch::node, "web1");
    EXPECT_EQ(find("disk"), id);
    silences.expire(id, "", now);
    EXPECT_EQ(find("disk"), 0u);
    EXPECT_NE(addFor(&SilenceMatch::node, "web1:*"), 0u);
    EXPECT_NE(find("disk"), 0u);
}

TEST_F(SilencesTest, HoldBackTheGroupsThatTheyName) {
    SilenceMatch match;
    match.group = {{"ip", "10.0.*"}, {"user", "root"}};
    const std::uint64_t id = add(match);
    const char* const log = "/log";
    EXPECT_EQ(find("ssh", "info", log, {{"ip", "10.0.0.1"}, {"user", "root"}}), id);
    EXPECT_EQ(find("ssh", "info", log, {{"user", "root"}, {"ip", "10.0.0.1"}, {"a", "b"}}), id);
    EXPECT_EQ(find("ssh", "info", log, {{"ip", "10.0.0.1"}, {"user", "ann"}}), 0u);
    EXPECT_EQ(find("ssh", "info", log, {{"ip", "10.0.0.1"}}), 0u);
    EXPECT_EQ(find("ssh", "info", log), 0u);
}

TEST_F(SilencesTest, TheOldestActiveOneHoldsAnEventBack) {
    const std::uint64_t brief = add({}, hour);
    const std::uint64_t longer = add({}, 2 * hour);
    EXPECT_EQ(find("disk"), brief);
    EXPECT_EQ(find("disk", "minor", "/log", {}, now + hour - 1), brief);
    EXPECT_EQ(find("disk", "minor", "/log", {}, now + hour), longer);
    EXPECT_EQ(find("disk", "minor", "/log", {}, now + 2 * hour), 0u);
}

TEST_F(SilencesTest, EveryEventFindsWhatChangedBeforeIt) {
    EXPECT_EQ(find("disk"), 0u);
    const std::uint64_t id = addFor(&SilenceMatch::situation, "disk");
    EXPECT_EQ(find("disk"), id);
    EXPECT_TRUE(silences.expire(id, "ben", now));
    EXPECT_EQ(find("disk"), 0u);
}

/// Otherwise receivers would never see the end, or one without a beginning.
TEST_F(SilencesTest, TheEndOfAnEpisodeIsAsSilentAsItsBeginning) {
    const auto label = std::make_shared<const SituationLabel>(SituationLabel{"disk", "minor"});
    const auto event = [&](std::uint64_t id, EventJudgement::State state, std::uint64_t episode) {
        const auto judgement = std::make_shared<EventJudgement>();
        judgement->state = state;
        judgement->episode = std::make_shared<EpisodeId>(episode);
        judgement->group = {{"ip", "10.0.0." + std::to_string(episode)}};
        Event one;
        one.id = id;
        one.raised = now;
        one.situation = label;
        one.judgement = judgement;
        return silencer.of(one, "/log");
    };
    EXPECT_EQ(event(1, EventJudgement::RAISED, 1), 0u);
    SilenceMatch match;
    match.group = {{"ip", "10.0.0.[12]"}};
    add(match);
    match.group = {{"ip", "10.0.0.?"}};
    const std::uint64_t id = add(match);
    EXPECT_EQ(event(2, EventJudgement::RAISED, 2), id);
    EXPECT_EQ(event(3, EventJudgement::RAISED, 3), id);
    EXPECT_EQ(event(4, EventJudgement::RESOLVED, 1), 0u) << "its beginning was delivered";
    silences.expire(id, "", now);
    EXPECT_EQ(event(5, EventJudgement::RESOLVED, 2), id) << "its beginning was silenced";
    EXPECT_EQ(event(6, EventJudgement::RESOLVED, 2), 0u) << "an episode ends once";
    EXPECT_EQ(event(7, EventJudgement::RESOLVED, 77), 9u) << "of an earlier run";
}

TEST_F(SilencesTest, AreListedNewestFirst) {
    const std::uint64_t first = add({});
    const std::uint64_t second = add({});
    const auto list = silences.list();
    ASSERT_EQ(list.size(), 2u);
    EXPECT_EQ(list[0].id, second);
    EXPECT_EQ(list[1].id, first);
    EXPECT_FALSE(silences.find(second + 1));
}

TEST_F(SilencesTest, TheSecondToExpireOneHearsOfTheFirst) {
    const std::uint64_t id = add({});
    EXPECT_EQ(silences.expire(id, "ben", now + 1).value().expiredBy, "ben");
    const auto second = silences.expire(id, "carl", now + 2);
    ASSERT_FALSE(second);
    EXPECT_EQ(second.error().reason, SilenceRefusal::OVER);
    EXPECT_THAT(second.error().problem.what, HasSubstr(", when ben expired it"));
    EXPECT_EQ(silences.expire(id + 1, "", now).error().reason, SilenceRefusal::UNKNOWN);
    const std::uint64_t brief = add({}, 1);
    EXPECT_EQ(silences.expire(brief, "", now + 1).error().problem.what,
              "silence 2 has been over since " + UtcTime::text(now + 1));
}

TEST_F(SilencesTest, AChangeThatIsNotStoredIsNotMade) {
    const std::uint64_t id = add({});
    bool fails = true;
    std::vector<Silence> stored;
    silences.storeWith([&](const Silence& silence) -> Result<void> {
        stored.push_back(silence);
        return fails ? refused("the disk is full") : Result<void>();
    });
    const auto added = silences.add(Silence{0, {}, now, now + hour, "anna", "w"});
    ASSERT_FALSE(added);
    EXPECT_EQ(added.error().reason, SilenceRefusal::NOT_KEPT);
    EXPECT_EQ(added.error().problem.what, "the change was not made: the disk is full");
    EXPECT_EQ(silences.list().size(), 1u);
    EXPECT_EQ(silences.expire(id, "ben", now).error().reason, SilenceRefusal::NOT_KEPT);
    EXPECT_TRUE(silences.find(id)->isActive(now));
    fails = false;
    EXPECT_TRUE(silences.expire(id, "ben", now)) << "another try is possible";
    EXPECT_EQ(stored.back().expiredBy, "ben");
}

TEST_F(SilencesTest, OneThatIsBeingExpiredIsNotExpiredTwice) {
    const std::uint64_t id = add({});
    silences.storeWith([&](const Silence&) -> Result<void> {
        EXPECT_EQ(silences.expire(id, "carl", now).error().problem.what,
                  "somebody else is expiring silence 1");
        silences.count({{id, 5, now}});
        return {};
    });
    const Silence expired = silences.expire(id, "ben", now).value();
    EXPECT_EQ(expired.expiredBy, "ben");
    EXPECT_EQ(expired.events, 5u) << "what was counted meanwhile";
}

TEST_F(SilencesTest, CountWhatTheyHoldBack) {
    const std::uint64_t id = add({});
    silences.count({{id, 2, now}, {99, 1, now}});
    silences.count({{id, 1, now - 5}});
    EXPECT_EQ(silences.find(id)->events, 3u);
    EXPECT_EQ(silences.find(id)->last, now);
}

TEST_F(SilencesTest, IdsFollowTheLargestEverGiven) {
    Silence known;
    known.id = 3;
    known.until = now + hour;
    Silences kept({{known}, 7});
    EXPECT_EQ(kept.add(known).value().id, 8u);
    Silences fromFile({{known}, 0});
    EXPECT_EQ(fromFile.add(known).value().id, 4u);
}

TEST_F(SilencesTest, AreRemovedLongAfterTheirEnd) {
    KeptSilences kept;
    for (std::uint64_t id = 1; id <= 3; ++id) {
        Silence silence;
        silence.id = id;
        silence.until = id == 3 ? now + hour : now - static_cast<std::int64_t>(id) * hour;
        kept.silences.push_back(silence);
    }
    Silences some(kept);
    EXPECT_THAT(some.removeExpired(now - 2 * hour), ElementsAre());
    EXPECT_THAT(some.removeExpired(now - hour), ElementsAre(2u));
    EXPECT_THAT(some.removeExpired(now + 2 * hour), ElementsAre(1u)) << "an active one stays";
    EXPECT_EQ(some.list().size(), 1u);
}

TEST_F(SilencesTest, AreBoundedInNumber) {
    KeptSilences kept;
    for (std::uint64_t id = 1; id <= Silences::mostActive; ++id) {
        Silence silence;
        silence.id = id;
        silence.until = now + hour;
        kept.silences.push_back(silence);
    }
    Silences full(kept);
    const auto added = full.add(Silence{0, {}, now, now + hour, "anna", "w"});
    ASSERT_FALSE(added);
    EXPECT_EQ(added.error().reason, SilenceRefusal::TOO_MANY);
    EXPECT_FALSE(full.areTooManyExpired());
    for (std::uint64_t more = 0; more <= Silences::mostExpired; ++more) {
        Silence silence;
        silence.id = Silences::mostActive + 1 + more;
        silence.until = static_cast<std::int64_t>(more);
        kept.silences.push_back(silence);
    }
    Silences over(kept);
    EXPECT_TRUE(over.areTooManyExpired());
    EXPECT_THAT(over.removeExpired(0), ElementsAre(Silences::mostActive + 1));
    EXPECT_FALSE(over.areTooManyExpired());
}

/// What the events of many logs remember stays bounded, and what is found stays right.
TEST_F(SilencesTest, ManyKindsOfEventsFindTheirSilences) {
    std::vector<std::uint64_t> ids;
    for (int number = 0; number < 1000; ++number) {
        ids.push_back(addFor(&SilenceMatch::log, "/log/" + std::to_string(number) + "*"));
    }
    for (int round = 0; round < 2; ++round) {
        for (int number = 0; number < 1000; ++number) {
            const std::string log = "/log/" + std::to_string(number) + "-" + std::to_string(round);
            const std::uint64_t id = find("disk", "info", log.c_str());
            EXPECT_TRUE(log.starts_with(
                silences.find(id)->match.log.substr(0, silences.find(id)->match.log.size() - 1)));
        }
    }
}

} // namespace
