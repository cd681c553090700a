#include "framework/LogPositions.h"
#include "host/base/TimeText.h"
#include "host/events/EntryEvents.h"
#include "host/events/Episode.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <string>
#include <thread>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t rowSize = 16;

LogPosition at(std::int64_t offset) {
    LogPosition position;
    position.device = 1;
    position.offset = offset;
    return position;
}

/// What logs have added to an episode is handed over with their positions.
class EpisodeSharesTest : public testing::Test {
protected:
    EpisodeSharesTest() {
        PositionBook::makeCurrent(book);
        book->setQueue(&queue);
    }
    ~EpisodeSharesTest() override { PositionBook::makeCurrent(PositionBook::unkept()); }

    /// The log's thread judges an entry of the episode, which may raise an event.
    void entry(LogPositions& log, std::int64_t behind, bool raises = false) {
        log.beginEntry();
        ++share->count;
        EntryEvents::ofThisThread->note(share);
        if (raises) {
            EXPECT_TRUE(queue.push(label, "0123456789abcde"));
            log.endEntry(at(behind));
        }
    }
    static std::vector<std::uint64_t> counts(const std::vector<EpisodeShare>& shares) {
        std::vector<std::uint64_t> counts;
        for (const EpisodeShare& share : shares) {
            counts.push_back(share.count);
        }
        return counts;
    }
    /// Offset and counts of what is to be stored.
    std::vector<std::pair<std::int64_t, std::vector<std::uint64_t>>> unsaved(std::uint64_t event) {
        std::vector<std::pair<std::int64_t, std::vector<std::uint64_t>>> values;
        for (const PositionValue& value : book->unsavedReached(event)) {
            values.emplace_back(value.position.offset, counts(value.shares));
        }
        return values;
    }

    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    std::shared_ptr<GrowingShare> share = std::make_shared<GrowingShare>(
        EpisodeShare{std::make_shared<EpisodeId>(7), "/log", 0, 0, 0});
    EventQueue queue{16, rowSize};
    EventQueue::Reader reader = queue.addReader();
    std::shared_ptr<PositionBook> book = std::make_shared<PositionBook>(PositionValues{}, true);
    using Unsaved = std::pair<std::int64_t, std::vector<std::uint64_t>>;
};

TEST_F(EpisodeSharesTest, TheLastEventOfAnEntryCarriesThem) {
    LogPositions log("/log");
    entry(log, 10);
    entry(log, 20, true);
    const auto events = queue.read(reader, 10);
    ASSERT_EQ(events.size(), 1u);
    ASSERT_NE(events[0].shares, nullptr);
    EXPECT_THAT(counts(*events[0].shares), ElementsAre(2));
    EXPECT_FALSE(share->isNoted);
    EXPECT_THAT(unsaved(0), IsEmpty());
}

TEST_F(EpisodeSharesTest, APositionWithoutEventsCarriesThemUntilItIsStored) {
    LogPositions log("/log");
    entry(log, 10);
    EXPECT_TRUE(share->isNoted) << "an episode does not end before";
    log.reached(at(10));
    EXPECT_FALSE(share->isNoted);
    const std::vector<PositionValue> values = book->unsavedReached(0);
    EXPECT_THAT(unsaved(0), ElementsAre(Unsaved{10, {1}}));
    entry(log, 20);
    log.reached(at(20));
    book->saved(values); // the older one
    EXPECT_THAT(unsaved(0), ElementsAre(Unsaved{20, {2}}));
    book->saved(book->unsavedReached(0));
    EXPECT_THAT(unsaved(0), IsEmpty());
}

TEST_F(EpisodeSharesTest, APositionThatALaterEventHasPassedIsKeptForWhatIsStoredBefore) {
    LogPositions log("/log");
    entry(log, 10);
    log.reached(at(10));
    std::thread([&] { // event 1
        EXPECT_TRUE(queue.push(label, nullptr, std::make_shared<const EventJudgement>()));
    })
        .join();
    entry(log, 20, true); // event 2
    EXPECT_THAT(unsaved(1), ElementsAre(Unsaved{10, {1}})) << "with event 1, but without event 2";
    EXPECT_THAT(unsaved(2), IsEmpty()) << "event 2 has its own";
    const auto events = queue.read(reader, 10);
    ASSERT_EQ(events.size(), 2u);
    EXPECT_THAT(counts(*events[1].shares), ElementsAre(2));
}

TEST_F(EpisodeSharesTest, WhatALateLineAddsIsStoredAlthoughThePositionStays) {
    LogPositions log("/log");
    log.reached(at(10));
    book->saved(book->unsavedReached(0));
    entry(log, 0);
    log.reached(at(10));
    EXPECT_THAT(unsaved(0), ElementsAre(Unsaved{10, {1}}));
}

TEST_F(EpisodeSharesTest, TheBookKnowsUntilWhenLogsAreJudged) {
    constexpr std::int64_t never = std::numeric_limits<std::int64_t>::max();
    EXPECT_EQ(book->judgedUntil(std::nullopt), never) << "nobody follows any";
    LogPositions log("/log");
    EXPECT_TRUE(book->isFollowed("/log"));
    EXPECT_EQ(book->judgedUntil(std::nullopt), 0);
    EXPECT_EQ(book->judgedUntil("/other"), never);
    const std::int64_t before = WallClock::now();
    log.beginLook();
    log.endLook();
    EXPECT_GE(book->judgedUntil("/log"), before);
    {
        LogPositions other("/other");
        EXPECT_EQ(book->judgedUntil(std::nullopt), 0);
        EXPECT_GE(book->judgedUntil("/log"), before);
    }
    EXPECT_GE(book->judgedUntil(std::nullopt), before) << "the other is no longer followed";
}

TEST_F(EpisodeSharesTest, WithoutAHistoryNothingIsCollectedForIt) {
    const auto unkept = PositionBook::unkept();
    unkept->note({{std::make_shared<EpisodeId>(1), "/log", 1, 0, 0}});
    EXPECT_THAT(unkept->takeShares(), IsEmpty());
}

TEST_F(EpisodeSharesTest, EpisodesOfAnEarlierRunAreTakenOnce) {
    StoredEpisode first;
    first.situation = "a";
    StoredEpisode second;
    second.situation = "b";
    book->setEpisodes({first, second});
    EXPECT_EQ(book->takeEpisodes("a").size(), 1u);
    EXPECT_EQ(book->takeEpisodes("a").size(), 0u);
    EXPECT_EQ(book->takeEpisodes(std::nullopt).size(), 1u);
    EXPECT_EQ(book->takeEpisodes(std::nullopt).size(), 0u);
}

} // namespace
