#include "host/history/HistoryFile.h"

#include "TestBatch.h"
#include "host/base/TimeText.h"
#include "support/FaultyDisk.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <vector>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

constexpr std::int64_t day = 24 * 60 * 60'000;
constexpr HistoryFile::Limits noLimits{1'000'000, 0, testTime};

class HistoryFileTest : public testing::Test {
protected:
    HistoryFileTest() { reopen(); }
    void reopen() {
        file.reset();
        file.emplace(path);
    }
    std::int64_t number(const std::string& sql) const {
        return Database(path, Database::Use::READ).number(sql);
    }
    std::int64_t count() const { return number("SELECT count(*) FROM events"); }
    /// Expires everything that the limits allow.
    void expireAll(const HistoryFile::Limits& limits) {
        while (file->expire(limits)) {
        }
    }

    FaultyDisk disk;
    TemporaryDirectory directory;
    std::string path = directory.file("history.db");
    std::optional<HistoryFile> file;
};

TEST_F(HistoryFileTest, KnowsItsOldestAndNewestEventAcrossStarts) {
    EXPECT_EQ(file->newest(), 0u);
    EXPECT_EQ(file->oldest(), 0u);
    file->store(*batchOf(1, 3), {});
    file->store(*batchOf(4, 2000), {});
    EXPECT_EQ(file->newest(), 2000u);
    EXPECT_EQ(file->oldest(), 1u);
    reopen();
    EXPECT_EQ(file->newest(), 2000u);
    EXPECT_EQ(file->oldest(), 1u);
    EXPECT_EQ(count(), 2000);
}

TEST_F(HistoryFileTest, AnEmptyHistoryContinuesAfterTheGivenId) {
    file->continueAfter(500);
    EXPECT_EQ(file->newest(), 500u);
    reopen();
    EXPECT_EQ(file->newest(), 500u);
    file->store(*batchOf(501, 502), {});
    reopen();
    EXPECT_EQ(file->newest(), 502u);
    EXPECT_EQ(file->oldest(), 501u);
}

TEST_F(HistoryFileTest, StoresSharedTextsOnce) {
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= 100; ++id) {
        events.push_back(testEvent(id, testTime, id % 2 == 0 ? "a" : "b",
                                   id % 3 == 0 ? "/log/x" : "/log/y", "info"));
    }
    file->store(*batchOf(events), {});
    reopen();
    events.clear();
    events.push_back(testEvent(101, testTime, "a", "/log/x", "info"));
    events.push_back(testEvent(102, testTime, "a", "/log/x", "major"));
    file->store(*batchOf(events), {});
    EXPECT_EQ(number("SELECT count(*) FROM logs"), 2);
    EXPECT_EQ(number("SELECT count(*) FROM labels"), 5);
    EXPECT_EQ(number("SELECT count(*) FROM events JOIN labels ON labels.id = label"
                     " WHERE situation = 'a'"),
              52);
}

TEST_F(HistoryFileTest, EventsKeepTheTextOfTheirSituation) {
    std::vector<EventRecord> events = {testEvent(1), testEvent(2), testEvent(3)};
    events[1].text = "as it was changed";
    file->store(*batchOf(events), {});
    reopen();
    events = {testEvent(4)};
    events[0].text = "as it was changed";
    file->store(*batchOf(events), {});
    EXPECT_EQ(number("SELECT count(*) FROM labels"), 2);
    EXPECT_EQ(number("SELECT sum(events.id) FROM events JOIN labels ON labels.id = label"
                     " WHERE text = 'as it was changed'"),
              6);
    EXPECT_EQ(number("SELECT sum(events.id) FROM events JOIN labels ON labels.id = label"
                     " WHERE text = ''"),
              4);
}

TEST_F(HistoryFileTest, ABatchIsStoredCompletelyOrNotAtAll) {
    file->store(*batchOf(1, 2), {{"sink", 1}});
    disk.failWrites(SQLITE_FULL);
    const auto batch = batchOf({testEvent(3, testTime, "new situation", "/new/log")});
    for (int attempt = 0; attempt < 3; ++attempt) {
        try {
            file->store(*batch, {{"sink", 2}});
            FAIL() << "the disk is full";
        } catch (const DatabaseError& error) {
            EXPECT_THAT(error.what(), testing::StartsWith("database or disk is full"));
            EXPECT_FALSE(error.isCorruption());
        }
    }
    EXPECT_EQ(file->newest(), 2u);
    disk.failWrites(0);
    EXPECT_EQ(count(), 2);
    EXPECT_EQ(file->cursor("sink"), 1u);
    file->store(*batch, {{"sink", 2}});
    EXPECT_EQ(file->newest(), 3u);
    EXPECT_EQ(file->cursor("sink"), 2u);
    EXPECT_EQ(number("SELECT label = labels.id AND path = '/new/log' FROM events"
                     " JOIN labels ON labels.id = label JOIN logs ON logs.id = log"
                     " WHERE events.id = 3"),
              1);
}

TEST_F(HistoryFileTest, KeepsCursorsUntilTheirSinkHasLongBeenUnused) {
    EXPECT_EQ(file->cursor("a"), std::nullopt);
    file->keepCursors({{"a", 10}, {"b", 20}});
    file->keepCursors({{"a", 11}});
    reopen();
    EXPECT_EQ(file->cursor("a"), 11u);
    EXPECT_EQ(file->cursor("b"), 20u);
    Database(path, Database::Use::WRITE)
        .run("UPDATE cursors SET used = " + std::to_string(WallClock::now() - 31 * day) +
             " WHERE sink = 'b'");
    file->removeOldCursors(30);
    EXPECT_EQ(file->cursor("a"), 11u);
    EXPECT_EQ(file->cursor("b"), std::nullopt);
}

TEST_F(HistoryFileTest, KeepsTheNewestEvents) {
    file->store(*batchOf(1, 5000), {});
    EXPECT_FALSE(file->expire({5000, 0, testTime}));
    EXPECT_TRUE(file->expire({100, 0, testTime}));
    EXPECT_EQ(count(), 5000 - 1024) << "a little at a time";
    expireAll({100, 0, testTime});
    EXPECT_EQ(count(), 100);
    EXPECT_EQ(file->oldest(), 4901u);
    EXPECT_EQ(number("SELECT min(part) FROM marks"), 4901 / 1024);
    expireAll({1, 0, testTime});
    EXPECT_EQ(count(), 1);
    reopen();
    EXPECT_EQ(file->oldest(), 5000u);
    EXPECT_EQ(file->newest(), 5000u);
}

TEST_F(HistoryFileTest, RemovesOldEventsButNeverTheNewest) {
    file->store(*batchOf(1, 10, testTime - 40 * day), {});
    file->store(*batchOf(11, 20, testTime - 20 * day), {});
    expireAll({1'000'000, testTime - 30 * day, testTime});
    EXPECT_EQ(file->oldest(), 11u);
    EXPECT_EQ(count(), 10);
    expireAll({1'000'000, testTime - 10 * day, testTime});
    EXPECT_EQ(file->oldest(), 20u);
    EXPECT_EQ(count(), 1);
    EXPECT_FALSE(file->expire({1'000'000, testTime, testTime})) << "ids continue from it";
}

TEST_F(HistoryFileTest, AClockThatWasAheadDoesNotKeepEventsForEver) {
    // 3000 events from a clock that was years ahead, among others that have expired.
    file->store(*batchOf(1, 10, testTime - 50 * day), {});
    file->store(*batchOf(11, 3010, testTime + 4000 * day), {});
    file->store(*batchOf(3011, 3020, testTime - 49 * day), {});
    file->store(*batchOf(3021, 3030, testTime), {});
    expireAll({1'000'000, testTime - 30 * day, testTime});
    EXPECT_EQ(file->oldest(), 3021u);
    // The same at the very beginning of a history.
    file.reset();
    path = directory.file("other.db");
    file.emplace(path);
    file->store(*batchOf(1, 3010, testTime + 4000 * day), {});
    file->store(*batchOf(3011, 3020, testTime - 49 * day), {});
    file->store(*batchOf(3021, 3030, testTime), {});
    expireAll({1'000'000, testTime - 30 * day, testTime});
    EXPECT_EQ(file->oldest(), 3021u);
}

TEST_F(HistoryFileTest, AClockThatWasBehindDoesNotRemoveNewEvents) {
    file->store(*batchOf(1, 10, testTime - day), {});
    file->store(*batchOf(11, 20, 0), {}); // 1970
    file->store(*batchOf(21, 30, testTime), {});
    expireAll({1'000'000, testTime - 30 * day, testTime});
    EXPECT_EQ(count(), 30);
}

TEST_F(HistoryFileTest, AClockThatIsBehindRemovesNothingByAge) {
    file->store(*batchOf(1, 3000, testTime), {});
    const std::int64_t now = testTime - 9000 * day;
    EXPECT_FALSE(file->expire({1'000'000, now - 30 * day, now}));
    EXPECT_TRUE(file->expire({2000, now - 30 * day, now}))
        << "the limit of the number still applies";
}

TEST_F(HistoryFileTest, ReturnsSpaceALittleAtATime) {
    std::vector<EventRecord> events;
    const std::string json(2000, 'x');
    for (std::uint64_t id = 1; id <= 20'000; ++id) {
        events.push_back(testEvent(id));
        events.back().json = json;
    }
    file->store(*batchOf(events), {});
    EXPECT_FALSE(file->shrink());
    expireAll({10, 0, testTime});
    const std::int64_t before = number("PRAGMA page_count");
    EXPECT_TRUE(file->shrink());
    EXPECT_EQ(number("PRAGMA page_count"), before - 64);
    while (file->shrink()) {
    }
    EXPECT_LE(number("PRAGMA freelist_count"), 1024);
    EXPECT_EQ(count(), 10);
    EXPECT_EQ(number("SELECT count(*) FROM pragma_integrity_check WHERE integrity_check <> 'ok'"),
              0);
}

TEST_F(HistoryFileTest, RemovesUnusedLabelsAtTheNextStart) {
    file->store(*batchOf({testEvent(1, testTime, "gone", "/log/gone")}), {});
    file->store(*batchOf(2, 3), {});
    expireAll({1, 0, testTime});
    Database(path, Database::Use::WRITE).run("DELETE FROM rates");
    reopen();
    EXPECT_EQ(number("SELECT count(*) FROM labels"), 1);
    EXPECT_EQ(number("SELECT count(*) FROM logs"), 1);
    EXPECT_FALSE(file->expire(noLimits));
}

TEST_F(HistoryFileTest, CountsEventsAndEntriesPerMinute) {
    const std::int64_t minute = testTime / 60'000;
    file->store(*batchOf(1, 5), {});
    file->store(*batchOf(6, 8), {});
    file->addEntries({{minute, {{"/var/log/app.log", 100}, {"/var/log/quiet.log", 7}}}});
    const Rates rates = RateTable::read(*std::make_unique<Database>(path, Database::Use::READ),
                                        minute * 60'000, (minute + 1) * 60'000, 60'000);
    ASSERT_EQ(rates.logs.size(), 2u);
    EXPECT_EQ(rates.logs[0].log, "/var/log/app.log");
    EXPECT_THAT(rates.logs[0].events, testing::ElementsAre(8));
    EXPECT_THAT(rates.logs[0].entries, testing::ElementsAre(100));
    EXPECT_THAT(rates.logs[1].events, testing::ElementsAre(0));
    EXPECT_THAT(rates.logs[1].entries, testing::ElementsAre(7));
}

} // namespace
