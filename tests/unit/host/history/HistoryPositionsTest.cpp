// Positions of followed logs in the history: together with the events before them, never ahead.

#include "framework/LogPositions.h"
#include "host/base/TimeText.h"
#include "host/events/PositionBook.h"
#include "host/history/History.h"
#include "host/history/Statement.h"
#include "support/FaultyDisk.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/events/TestEvents.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <variant>
#include <vector>

#include <sqlite3.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = HistoryWriter::Clock;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t day = 24 * 60 * 60'000;

LogPosition at(std::int64_t offset) {
    return {UINT64_MAX,
            2,
            offset,
            UINT64_MAX - 7,
            256,
            1'800'000'000'123'456'789,
            "s=ee01;i=" + std::to_string(offset)};
}

class HistoryPositionsTest : public testing::Test {
protected:
    ~HistoryPositionsTest() override {
        close();
        PositionBook::makeCurrent(PositionBook::unkept());
    }

    void open(std::size_t capacity = 100) {
        testing::internal::CaptureStderr();
        auto opened = History::open(config, state);
        testing::internal::GetCapturedStderr();
        history = std::move(*opened);
        queue = std::make_unique<EventQueue>(capacity, sizeof(TestRow), history->newest());
        PositionBook::makeCurrent(history->positions());
        history->positions()->setQueue(queue.get());
        history->start(*queue, EventJson(testLayout()));
    }
    void close(std::chrono::milliseconds time = 10s) {
        if (history != nullptr) {
            history->finish(Clock::now() + time);
            history->storeRest();
        }
        history.reset();
        queue.reset();
    }
    static bool eventually(const std::function<bool()>& condition) {
        const auto limit = Clock::now() + 10s;
        while (!condition() && Clock::now() < limit) {
            std::this_thread::sleep_for(1ms);
        }
        return condition();
    }
    /// An entry that raises so many events.
    void entry(LogPositions& log, int events, std::int64_t behind) {
        log.beginEntry();
        TestRow row("/var/log/", "app.log", "text", 7);
        for (int number = 0; number < events; ++number) {
            ASSERT_TRUE(queue->push(label, row.bytes()));
        }
        if (log.hasEvents()) {
            log.endEntry(at(behind));
        }
    }
    std::string file() const { return state + "/history.db"; }
    void run(const std::string& sql) const { Database(file(), Database::Use::WRITE).run(sql); }
    std::int64_t number(const std::string& sql) const {
        return Database(file(), Database::Use::READ).number(sql);
    }
    /// 0: there is none, or no file that could have it.
    std::int64_t storedOffset(const std::string& log) const {
        try {
            return number("SELECT offset FROM log_positions WHERE log = '" + log + "'");
        } catch (const DatabaseError&) {
            return 0;
        }
    }

    RecordingTrace trace{TRC1_ERROR};
    FaultyDisk disk;
    TemporaryDirectory directory;
    std::string state = directory.file("state");
    HistoryConfig config;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    std::unique_ptr<EventQueue> queue;
    std::unique_ptr<History> history;
};

TEST_F(HistoryPositionsTest, TheNextRunBeginsAtThePositionBehindTheLastStoredEntry) {
    open();
    {
        LogPositions log("/log");
        LogPositions quiet("/quiet");
        EXPECT_TRUE(log.areKept());
        EXPECT_EQ(log.stored(), std::nullopt);
        entry(log, 1, 10);
        entry(log, 2, 20);
        entry(log, 0, 30);
        quiet.reached(at(5));
    }
    close();
    open();
    EXPECT_EQ(history->newest(), 3u);
    EXPECT_EQ(LogPositions("/log").stored(), at(20));
    EXPECT_EQ(LogPositions("/quiet").stored(), at(5));
}

TEST_F(HistoryPositionsTest, TheOlderFilesOfALogAreStoredWithItsPosition) {
    LogPosition older = at(7);
    older.cursor.clear();
    LogPosition oldest = older;
    oldest.inode = 3;
    oldest.guardLength = 0;
    LogPosition position = at(20);
    position.late = LatePositions({oldest, older});
    open();
    LogPositions("/log").reached(position);
    close();
    open();
    EXPECT_EQ(LogPositions("/log").stored(), position);
    close();
    for (const char* const damage : {"[[1,2],[1,2,3,4,5,\"6\"],7]", "[[1,2,3", "{}"}) {
        run("UPDATE log_positions SET late = '" + std::string(damage) + "'");
        open();
        const auto stored = LogPositions("/log").stored();
        ASSERT_TRUE(stored);
        EXPECT_EQ(stored->offset, 20);
        EXPECT_THAT(stored->late.files(), IsEmpty()) << damage;
        close();
    }
}

TEST_F(HistoryPositionsTest, AnEntryIsStoredWithItsPositionOrNotAtAll) {
    // More events per entry than a transaction usually has, and than the queue holds.
    for (const int each : {1, 7, 300, 700}) {
        open(64);
        const auto before = static_cast<std::int64_t>(history->newest());
        std::atomic<bool> done{false};
        std::thread reader([&] {
            Database database(file(), Database::Use::READ);
            Statement state(database, "SELECT (SELECT max(id) FROM events), (SELECT offset FROM"
                                      " log_positions WHERE log = '/log')");
            while (!done) {
                if (state.step() && state.integer(0) > before) {
                    EXPECT_EQ(state.integer(0) - before, state.integer(1) * each);
                }
                state.reset();
            }
        });
        const int entries = 2100 / each;
        {
            LogPositions log("/log");
            for (int number = 1; number <= entries; ++number) {
                while (queue->state().size >= 64) { // a log waits for room
                    std::this_thread::yield();
                }
                entry(log, each, number);
            }
        }
        EXPECT_TRUE(eventually([&] { return storedOffset("/log") == entries; }));
        done = true;
        reader.join();
        EXPECT_EQ(static_cast<std::int64_t>(history->newest()), before + entries * each);
        close();
    }
}

TEST_F(HistoryPositionsTest, TheEndOfAnEpisodeIsStoredWithThePositionsReachedBefore) {
    open();
    LogPositions log("/log");
    entry(log, 1, 10);
    EXPECT_TRUE(eventually([&] { return storedOffset("/log") == 10; }));
    for (std::int64_t round = 1; round <= 100; ++round) {
        log.reached(at(10 + round));
        auto judgement = std::make_shared<EventJudgement>();
        judgement->state = EventJudgement::RESOLVED;
        judgement->episode = std::make_shared<EpisodeId>(1);
        judgement->log = "/log";
        const std::int64_t before = number("SELECT max(id) FROM events");
        EXPECT_TRUE(queue->push(label, nullptr, judgement));
        EXPECT_TRUE(eventually([&] { return number("SELECT max(id) FROM events") > before; }));
        EXPECT_EQ(storedOffset("/log"), 10 + round) << "not a second later";
    }
}

TEST_F(HistoryPositionsTest, APositionWithoutEventsIsStoredWithinSecondsButNotBeforeEarlierEvents) {
    open();
    LogPositions log("/log");
    log.reached(at(1));
    EXPECT_TRUE(eventually([&] { return storedOffset("/log") == 1; }));
    disk.failWrites(SQLITE_FULL);
    entry(log, 1, 2);
    log.reached(at(3));
    EXPECT_TRUE(eventually([&] { return disk.failed() > 3; }));
    EXPECT_EQ(history->positions()->unsaved(history->newest()), std::vector<PositionValue>{});
    EXPECT_EQ(storedOffset("/log"), 1);
    disk.failWrites(0);
    EXPECT_TRUE(eventually([&] { return storedOffset("/log") == 3; }));
    EXPECT_EQ(history->newest(), 1u);
}

TEST_F(HistoryPositionsTest, WhatADiskDoesNotTakeBeforeTheEndIsJudgedAgain) {
    open();
    {
        LogPositions log("/log");
        entry(log, 1, 10);
        ASSERT_TRUE(eventually([&] { return storedOffset("/log") == 10; }));
        disk.failWrites(SQLITE_FULL);
        entry(log, 2, 20);
        log.reached(at(30));
        testing::internal::CaptureStderr();
        close(100ms);
        EXPECT_THAT(testing::internal::GetCapturedStderr(),
                    testing::ContainsRegex("2 events were not stored.*; entries of \\[\\[log\\]\\] "
                                           "logs are read again at the next start"));
        disk.failWrites(0);
    }
    open();
    EXPECT_EQ(history->newest(), 1u);
    EXPECT_EQ(LogPositions("/log").stored(), at(10));
}

TEST_F(HistoryPositionsTest, AnEntryThatTheQueueNoLongerTakesIsJudgedAgain) {
    open();
    {
        LogPositions log("/log");
        entry(log, 1, 10);
        history->positions()->close(); // the process ends; the situations follow
        entry(log, 1, 20);
        log.reached(at(30));
    }
    close();
    open();
    EXPECT_EQ(history->newest(), 1u);
    EXPECT_EQ(LogPositions("/log").stored(), at(10));
}

TEST_F(HistoryPositionsTest, FilesThatAreMadeAnewHaveThePositionsToo) {
    open();
    LogPositions log("/log");
    LogPositions quiet("/quiet");
    entry(log, 1, 10);
    quiet.reached(at(5));
    ASSERT_TRUE(
        eventually([&] { return storedOffset("/log") == 10 && storedOffset("/quiet") == 5; }));
    std::filesystem::remove_all(state);
    EXPECT_TRUE(eventually([&] {
        return std::filesystem::exists(file()) && trace.messages().size() == 2 &&
               storedOffset("/log") == 10 && storedOffset("/quiet") == 5;
    }));
    testing::internal::CaptureStderr();
    disk.failWrites(SQLITE_CORRUPT);
    EXPECT_TRUE(eventually([&] {
        entry(log, 1, 20);
        return disk.failed() > 0;
    }));
    disk.failWrites(0);
    EXPECT_TRUE(
        eventually([&] { return storedOffset("/log") == 20 && storedOffset("/quiet") == 5; }));
    EXPECT_THAT(testing::internal::GetCapturedStderr(), testing::HasSubstr("is corrupt"));
}

TEST_F(HistoryPositionsTest, ACorruptFileGivesItsPositionsToTheNewOneWhereTheyCanBeRead) {
    open();
    {
        LogPositions log("/log");
        entry(log, 1, 10);
    }
    close();
    const std::int64_t page = number("SELECT rootpage FROM sqlite_schema WHERE name = 'cursors'");
    std::fstream(file(), std::ios::in | std::ios::out | std::ios::binary)
        .seekp((page - 1) * 16384)
        .write(std::string(16384, 'x').data(), 16384);
    open();
    EXPECT_EQ(number("SELECT count(*) FROM events"), 0);
    EXPECT_EQ(LogPositions("/log").stored(), at(10));
    EXPECT_EQ(storedOffset("/log"), 10);
}

TEST_F(HistoryPositionsTest, TheNextRunKnowsUntilWhenPathsWereWatched) {
    using Watched = std::map<std::string, std::int64_t>;
    open();
    WatchedPaths& paths = history->positions()->paths();
    paths.note("/log/*", 1'000'000);
    EXPECT_TRUE(eventually([&] { return paths.unsaved(0).empty(); }));
    paths.note("/log/*", 1'000'001); // renewed seldom, and at the end
    EXPECT_THAT(paths.unsaved(WatchedPaths::storedEvery), IsEmpty());
    EXPECT_EQ(number("SELECT watched FROM watched_paths"), 1'000'000);
    close();
    open();
    EXPECT_EQ(history->positions()->paths().all(), (Watched{{"/log/*", 1'000'001}}));
    EXPECT_THAT(history->positions()->paths().unsaved(0), IsEmpty());
    std::filesystem::remove_all(state);
    EXPECT_TRUE(eventually([&] {
        return std::filesystem::exists(file()) && history->positions()->paths().unsaved(0).empty();
    }));
    EXPECT_EQ(number("SELECT watched FROM watched_paths"), 1'000'001);
}

TEST_F(HistoryPositionsTest, AThousandPositionsAreReadInMuchLessThanASecond) {
    open();
    PositionValues values;
    for (int number = 0; number < 1000; ++number) {
        values.logs.push_back({"/var/log/" + std::to_string(number), at(number)});
    }
    close();
    HistoryFile(file()).keepPositions(values);
    const auto begin = Clock::now();
    open();
    EXPECT_EQ(LogPositions("/var/log/999").stored(), at(999));
    EXPECT_LT(Clock::now() - begin, 500ms);
}

TEST(HistoryFilePositions, PathsNotWatchedForLongAreRemoved) {
    const TemporaryDirectory directory;
    HistoryFile file(directory.file("history.db"));
    const std::int64_t now = WallClock::now();
    file.keepPositions({{}, {{"/old", now - 31 * day}, {"/new", now}}});
    EXPECT_THAT(file.removeOldPositions(now - 30 * day), IsEmpty());
    EXPECT_THAT(file.positions().paths, ElementsAre(WatchedPath{"/new", now}));
}

TEST(HistoryFilePositions, ThoseOfLogsNotFollowedForLongAreRemovedByName) {
    const TemporaryDirectory directory;
    const std::string path = directory.file("history.db");
    HistoryFile file(path);
    file.keepPositions({{{"/old", at(1)}, {"/new", at(2)}}, {}});
    file.keepPositions({{{"/new", at(3)}}, {}});
    const std::int64_t now = WallClock::now();
    Database(path, Database::Use::WRITE)
        .run("UPDATE log_positions SET noted = " + std::to_string(now - 31 * day) +
             " WHERE log = '/old'");
    EXPECT_THAT(file.removeOldPositions(now - 30 * day), ElementsAre("/old"));
    EXPECT_THAT(file.positions().logs, ElementsAre(PositionValue{"/new", at(3)}));
    EXPECT_THAT(file.removeOldPositions(now - 30 * day), ElementsAre());
}

} // namespace
