#include "HistoryFixture.h"
#include "host/base/TimeText.h"
#include "host/events/Episode.h"

#include <gmock/gmock.h>

#include <sqlite3.h>

namespace {

using namespace std::chrono_literals;

constexpr std::int64_t hour = 3'600'000;

/// Silences in a real history.
class SilencesKept : public HistoryFixture {
protected:
    Silence add(const std::string& situation, std::int64_t length = hour) {
        Silence silence;
        silence.match.situation = situation;
        silence.created = WallClock::now();
        silence.until = silence.created + length;
        silence.who = "anna";
        silence.why = "maintenance";
        return history->silences().add(silence).value();
    }
    std::vector<std::uint64_t> idsOf(std::optional<bool> silenced) {
        std::vector<std::uint64_t> ids;
        const EventPage page =
            history->query({.silenced = silenced, .limit = 1000, .newestFirst = false}).value();
        for (const StoredEvent& event : page.events) {
            ids.push_back(event.id);
        }
        return ids;
    }
};

TEST_F(SilencesKept, MarkTheirEventsAndCountThem) {
    open();
    pushAndWait(2);
    const Silence silence = add("wat*");
    pushAndWait(3);
    EXPECT_EQ(idsOf(true), idsFrom(3, 5));
    EXPECT_EQ(idsOf(false), idsFrom(1, 2));
    EXPECT_EQ(idsOf(std::nullopt), idsFrom(1, 5));
    EXPECT_THAT(history->event(4).value()->json, testing::HasSubstr(",\"silenced\":1,"));
    EXPECT_THAT(history->event(2).value()->json, testing::Not(testing::HasSubstr("silenced")));
    EXPECT_EQ(history->silences().find(silence.id)->events, 3u);
    EXPECT_EQ(number("SELECT events FROM silences"), 3);
    EXPECT_GT(number("SELECT last FROM silences"), 0);
}

TEST_F(SilencesKept, SourcesSayWhichEventsAreSilenced) {
    open();
    add("watch");
    pushAndWait(1);
    const auto fromMemory = sink->read(10);
    ASSERT_EQ(fromMemory.size(), 1u);
    EXPECT_EQ(fromMemory[0].silence, 1u);
    close();
    open(); // now from the file
    const auto fromFile = sink->read(10);
    ASSERT_EQ(fromFile.size(), 1u);
    EXPECT_EQ(fromFile[0].silence, 1u);
}

TEST_F(SilencesKept, SurviveARestartWithTheirCounts) {
    open();
    const Silence first = add("watch");
    const Silence second = add("other");
    pushAndWait(2);
    const Silence ended = history->silences().expire(second.id, "ben", WallClock::now()).value();
    close();
    open();
    EXPECT_TRUE(history->silences().areKept());
    Silence counted = first;
    counted.events = 2;
    counted.last = history->silences().find(first.id)->last;
    EXPECT_EQ(history->silences().find(first.id), counted);
    EXPECT_EQ(history->silences().find(second.id), ended);
    pushAndWait(1);
    EXPECT_EQ(number("SELECT events FROM silences WHERE id = 1"), 3);
    EXPECT_EQ(add("third").id, 3u);
}

TEST_F(SilencesKept, AnEpisodeOfAnEarlierRunEndsAsSilentlyAsItBegan) {
    const auto pushJudged = [&](EventJudgement::State state, std::uint64_t episode) {
        const auto judgement = std::make_shared<EventJudgement>();
        judgement->state = state;
        judgement->episode = std::make_shared<EpisodeId>(episode);
        TestRow row("/var/log/", "app.log", "text", 7);
        const std::uint64_t last = history->newest();
        ASSERT_TRUE(queue->push(label, row.bytes(), judgement));
        EXPECT_TRUE(eventually([&] { return history->newest() > last; }));
    };
    open();
    pushJudged(EventJudgement::RAISED, 0);
    const Silence silence = add("watch");
    pushJudged(EventJudgement::RAISED, 0);
    close();
    open();
    ASSERT_TRUE(history->silences().expire(silence.id, "ben", WallClock::now()));
    pushJudged(EventJudgement::RESOLVED, 2);
    add("watch");
    pushJudged(EventJudgement::RESOLVED, 1);
    EXPECT_EQ(idsOf(true), (std::vector<std::uint64_t>{2, 3}));
    EXPECT_EQ(idsOf(false), (std::vector<std::uint64_t>{1, 4}));
}

TEST_F(SilencesKept, AnIdIsNotGivenAgain) {
    open();
    add("a");
    add("b");
    close();
    run("DELETE FROM silences");
    open();
    EXPECT_EQ(add("c").id, 3u);
}

TEST_F(SilencesKept, AreRemovedAsLongAfterTheirEndAsEvents) {
    config.keepDays = 2;
    open();
    add("kept");
    add("removed");
    close();
    run("UPDATE silences SET until = until - 3 * 86400000 WHERE id = 2");
    open();
    EXPECT_TRUE(eventually([&] { return number("SELECT count(*) FROM silences") == 1; }));
    EXPECT_FALSE(history->silences().find(2));
    EXPECT_TRUE(history->silences().find(1));
}

TEST_F(SilencesKept, ADamagedOneIsLeftOutAndNamed) {
    open();
    add("a");
    add("b");
    close();
    run("UPDATE silences SET match = '{}' WHERE id = 1");
    open();
    EXPECT_THAT(message, testing::HasSubstr("silence 1 is damaged in the history"));
    EXPECT_FALSE(history->silences().find(1));
    EXPECT_TRUE(history->silences().find(2));
}

TEST_F(SilencesKept, AChangeIsRefusedWhileTheDiskIsFull) {
    open();
    const Silence silence = add("watch");
    disk.failWrites(SQLITE_FULL);
    const auto expired = history->silences().expire(silence.id, "ben", WallClock::now());
    ASSERT_FALSE(expired);
    EXPECT_EQ(expired.error().reason, SilenceRefusal::NOT_KEPT);
    EXPECT_THAT(expired.error().problem.what, testing::HasSubstr("database or disk is full"));
    disk.failWrites(0);
    EXPECT_TRUE(history->silences().find(silence.id)->isActive(WallClock::now()));
    EXPECT_TRUE(history->silences().expire(silence.id, "ben", WallClock::now()));
}

TEST_F(SilencesKept, AChangeIsRefusedAfterTheEnd) {
    open();
    history->finish(Clock::now() + 10s);
    Silence silence;
    silence.until = WallClock::now() + hour;
    EXPECT_EQ(history->silences().add(silence).error().problem.text(),
              "the change was not made: the history has ended");
}

TEST_F(SilencesKept, ANewFileInPlaceOfARemovedOneGetsThemAgain) {
    open();
    add("watch");
    pushAndWait(1);
    for (const char* const ending : {"", "-wal", "-shm"}) {
        std::filesystem::remove(file() + ending);
    }
    ASSERT_TRUE(eventually([&] { return trace.messages().size() == 2; }));
    pushAndWait(1);
    close();
    open();
    ASSERT_TRUE(history->silences().find(1));
    EXPECT_EQ(history->silences().find(1)->events, 2u);
}

} // namespace
