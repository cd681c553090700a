#include "host/history/History.h"

#include "TestBatch.h"
#include "host/history/Schema.h"
#include "support/FaultyDisk.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/events/TestEvents.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <functional>
#include <future>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = HistoryWriter::Clock;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class HistoryTest : public testing::Test {
protected:
    ~HistoryTest() override { close(); }

    /// Opens the history and starts it on a new queue; its message is in `told`.
    void open() {
        testing::internal::CaptureStderr();
        auto opened = History::open(config, state);
        told = testing::internal::GetCapturedStderr();
        problem = reasonOf(opened);
        if (!opened) {
            return;
        }
        history = std::move(*opened);
        sink = history->source("key", "the sink");
        queue = std::make_unique<EventQueue>(100, sizeof(TestRow), history->newest());
        history->start(*queue, EventJson(testLayout()));
    }
    /// Stops the history in order, as far as possible.
    void close(std::chrono::milliseconds time = 10s) {
        if (history != nullptr) {
            history->finish(Clock::now() + time);
            history->storeRest();
        }
        sink.reset();
        history.reset();
        queue.reset();
    }
    void push(int count) {
        TestRow row("/var/log/", "app.log", "text", 7);
        for (int number = 0; number < count; ++number) {
            ASSERT_TRUE(queue->push(label, row.bytes()));
        }
    }
    void pushAndWait(int count) {
        const std::uint64_t last = history->newest() + static_cast<std::uint64_t>(count);
        push(count);
        EXPECT_GE(history->waitBeyond(last - 1, Clock::now() + 10s, {}), last);
        // The room in the queue is released after the events become visible.
        EXPECT_TRUE(eventually([&] { return queue->state().size == 0; }));
    }
    static bool eventually(const std::function<bool()>& condition) {
        const auto limit = Clock::now() + 10s;
        while (!condition() && Clock::now() < limit) {
            std::this_thread::sleep_for(1ms);
        }
        return condition();
    }
    std::vector<std::uint64_t> ids() {
        std::vector<std::uint64_t> ids;
        const EventPage page = history->query({.limit = 100'000, .newestFirst = false});
        for (const StoredEvent& event : page.events) {
            ids.push_back(event.id);
        }
        return ids;
    }
    /// Delivers to the sink what it would get now, at most `most` events. A read returns no more
    /// than one batch of the writer.
    std::vector<std::uint64_t> take(std::size_t most = SIZE_MAX) {
        std::vector<std::uint64_t> ids;
        while (ids.size() < most && sink->backlog() > 0) {
            const auto events = sink->read(std::min<std::size_t>(10, most - ids.size()));
            for (const EventRecord& event : events) {
                ids.push_back(event.id);
            }
            sink->release(events.size());
        }
        return ids;
    }
    std::vector<std::string> corruptFiles() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(state)) {
            if (entry.path().filename().string().starts_with("history.db.corrupt-")) {
                names.push_back(entry.path());
            }
        }
        return names;
    }
    std::string file() const { return state + "/history.db"; }
    void run(const std::string& sql) const { Database(file(), Database::Use::WRITE).run(sql); }
    std::int64_t number(const std::string& sql) const {
        return Database(file(), Database::Use::READ).number(sql);
    }

    RecordingTrace trace{TRC1_ERROR};
    FaultyDisk disk;
    TemporaryDirectory directory;
    std::string state = directory.file("state");
    HistoryConfig config;
    std::string told;
    std::string problem;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    std::unique_ptr<EventQueue> queue;
    std::unique_ptr<History> history;
    std::unique_ptr<EventSource> sink;
};

TEST_F(HistoryTest, StoresAndReturnsEvents) {
    open();
    EXPECT_EQ(history->newest(), 0u);
    EXPECT_EQ(history->state().events, 0u);
    pushAndWait(300);
    EXPECT_EQ(ids(), idsFrom(1, 300));
    const std::optional<StoredEvent> event = history->event(17);
    ASSERT_TRUE(event);
    EXPECT_EQ(event->situation, "watch");
    EXPECT_EQ(event->severity, "minor");
    EXPECT_EQ(event->log, "/var/log/app.log");
    EXPECT_THAT(event->json, testing::StartsWith(R"({"id":17,"situation":"watch",)"));
    EXPECT_EQ(history->event(0), std::nullopt);
    EXPECT_EQ(history->event(301), std::nullopt);
    EXPECT_EQ(history->event(UINT64_MAX), std::nullopt);
    const HistoryState now = history->state();
    EXPECT_EQ(now.events, 300u);
    EXPECT_EQ(now.oldest, 1u);
    EXPECT_EQ(now.newest, 300u);
    EXPECT_GT(now.bytes, 10'000u);
    EXPECT_EQ(now.problem, "");
    EXPECT_EQ(told, "");
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(HistoryTest, AnEventIsStoredAtOnce) {
    open();
    const auto begin = Clock::now();
    pushAndWait(1);
    EXPECT_LT(Clock::now() - begin, 500ms);
}

TEST_F(HistoryTest, IdsAndCursorsContinueAfterARestart) {
    open();
    pushAndWait(50);
    EXPECT_EQ(take(10), idsFrom(1, 10));
    close();
    open();
    EXPECT_EQ(history->newest(), 50u);
    EXPECT_EQ(sink->backlog(), 40u);
    pushAndWait(10);
    EXPECT_EQ(take(), idsFrom(11, 60));
    close();
    open();
    EXPECT_EQ(sink->backlog(), 0u);
    EXPECT_EQ(ids(), idsFrom(1, 60));
}

TEST_F(HistoryTest, ANewSinkBeginsWithTheNextEvent) {
    open();
    pushAndWait(5);
    close();
    auto opened = History::open(config, state);
    history = std::move(opened.value());
    EXPECT_EQ(history->source("other", "other")->backlog(), 0u);
    EXPECT_EQ(history->source("key", "the sink")->backlog(), 5u);
}

TEST_F(HistoryTest, TheCursorOfARunningSinkIsKeptHoweverLongItWasDown) {
    open();
    pushAndWait(5);
    close();
    // As after months in which neither of two sinks got an event.
    run("UPDATE cursors SET used = 1");
    run("INSERT INTO cursors VALUES ('removed', 2, 1)");
    open();
    EXPECT_EQ(sink->backlog(), 5u);
    EXPECT_TRUE(eventually([&] { return number("SELECT count(*) FROM cursors") == 1; }));
    EXPECT_GT(number("SELECT used FROM cursors WHERE sink = 'key'"), 1);
    close();
    open();
    EXPECT_EQ(sink->backlog(), 5u);
}

TEST_F(HistoryTest, ASinkCountsAsInUseUntilTheStop) {
    open();
    pushAndWait(1);
    EXPECT_TRUE(eventually([&] { return number("SELECT count(*) FROM cursors") == 1; }));
    run("UPDATE cursors SET used = 1");
    close();
    EXPECT_GT(number("SELECT used FROM cursors"), 1);
}

TEST_F(HistoryTest, FinishStoresWhatIsQueued) {
    open();
    push(100);
    history->finish(Clock::now() + 10s);
    EXPECT_EQ(history->newest(), 100u);
    EXPECT_EQ(take(), idsFrom(1, 100));
    EXPECT_TRUE(sink->read(1).empty());
    EXPECT_FALSE(queue->push(label, "1234567"));
}

TEST_F(HistoryTest, AFullDiskIsReportedOnceAndNothingIsLost) {
    open();
    pushAndWait(5);
    disk.failWrites(SQLITE_FULL);
    push(100); // fills the queue
    EXPECT_TRUE(trace.waitFor("Error writing the history " + file() +
                              ": database or disk is full. Trying again."));
    EXPECT_EQ(history->state().problem, "database or disk is full");
    EXPECT_TRUE(eventually([&] { return disk.failed() > 3; })) << "it retries";
    EXPECT_EQ(history->newest(), 5u);
    EXPECT_EQ(ids(), idsFrom(1, 5)) << "readers are not affected";
    push(50);
    EXPECT_EQ(queue->state().size, 150u) << "events beyond the queue's end wait, too";
    disk.failWrites(0);
    EXPECT_GE(history->waitBeyond(154, Clock::now() + 20s, {}), 155u);
    EXPECT_EQ(ids(), idsFrom(1, 155));
    EXPECT_EQ(history->state().problem, "");
    EXPECT_EQ(take(), idsFrom(1, 155));
    EXPECT_THAT(trace.messages(), ElementsAre("Error writing the history " + file() +
                                                  ": database or disk is full. Trying again.",
                                              "The history takes events again."));
}

TEST_F(HistoryTest, AHistoryOpensOnAFullDiskAndStoresEventsOnceThereIsSpace) {
    open();
    pushAndWait(5);
    close();
    disk.failWrites(SQLITE_FULL);
    open();
    EXPECT_EQ(problem, "");
    ASSERT_NE(history, nullptr);
    EXPECT_EQ(sink->backlog(), 5u);
    EXPECT_EQ(take(), idsFrom(1, 5)) << "stored events are delivered";
    push(3);
    EXPECT_TRUE(trace.waitFor("Error writing the history " + file() +
                              ": database or disk is full. Trying again."));
    disk.failWrites(0);
    EXPECT_GE(history->waitBeyond(7, Clock::now() + 20s, {}), 8u);
    EXPECT_EQ(ids(), idsFrom(1, 8));
}

TEST_F(HistoryTest, AFullDiskDoesNotDelayTheStop) {
    open();
    disk.failWrites(SQLITE_FULL);
    push(7);
    EXPECT_TRUE(trace.waitFor("Error writing the history " + file() +
                              ": database or disk is full. Trying again."));
    testing::internal::CaptureStderr();
    const auto begin = Clock::now();
    history->finish(begin + 100ms);
    history->finish(begin + 100ms);
    EXPECT_LT(Clock::now() - begin, 5s);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: 7 events were not stored in the history " + file() +
                  ": database or disk is full\n");
    disk.failWrites(0);
    close();
    open();
    EXPECT_EQ(history->newest(), 0u);
    pushAndWait(1);
    EXPECT_EQ(ids(), idsFrom(1, 1));
}

TEST_F(HistoryTest, CursorsThatCannotBeStoredAtTheStopAreReported) {
    open();
    pushAndWait(3);
    EXPECT_EQ(take().size(), 3u);
    history->finish(Clock::now() + 10s);
    sink->release(0);
    // A cursor that is yet to be stored, whatever else has been stored meanwhile.
    std::unique_ptr<EventSource> other = history->source("late", "late");
    disk.failWrites(SQLITE_FULL);
    testing::internal::CaptureStderr();
    history->storeRest();
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: the history " + file() +
                  " could not be written at the end: database or disk is full; sinks may get "
                  "events twice\n");
    disk.failWrites(0);
}

TEST_F(HistoryTest, ACorruptFileIsMovedAsideAtTheStart) {
    std::filesystem::create_directory(state);
    std::ofstream(file()) << std::string(100'000, 'x');
    open();
    EXPECT_THAT(told, HasSubstr("zrmagent: the history " + file() +
                                " is corrupt (file is not a database); it is kept as " + file() +
                                ".corrupt-"));
    EXPECT_EQ(problem, "");
    ASSERT_EQ(corruptFiles().size(), 1u);
    EXPECT_EQ(std::filesystem::file_size(corruptFiles()[0]), 100'000u);
    pushAndWait(3);
    EXPECT_EQ(ids(), idsFrom(1, 3));
}

TEST_F(HistoryTest, IdsContinueAfterACorruptFileWhereTheyAreReadable) {
    open();
    pushAndWait(100);
    close();
    // The page of one table is garbage; the events can still be read.
    const auto page = Database(file(), Database::Use::READ)
                          .number("SELECT rootpage FROM sqlite_schema WHERE name = 'cursors'");
    std::fstream(file(), std::ios::in | std::ios::out | std::ios::binary)
        .seekp((page - 1) * 16384)
        .write(std::string(16384, 'x').data(), 16384);
    open();
    EXPECT_THAT(told, HasSubstr("database disk image is malformed"));
    EXPECT_EQ(history->newest(), 100u);
    pushAndWait(2);
    EXPECT_EQ(ids(), idsFrom(101, 102));
    EXPECT_EQ(take(), idsFrom(101, 102));
    close();
    open();
    EXPECT_EQ(history->newest(), 102u);
}

TEST_F(HistoryTest, AFileThatBecomesCorruptIsReplacedWhileTheAgentRuns) {
    open();
    pushAndWait(100);
    EXPECT_EQ(take(10), idsFrom(1, 10));
    testing::internal::CaptureStderr();
    disk.failWrites(SQLITE_CORRUPT);
    push(50);
    EXPECT_TRUE(eventually([&] { return !corruptFiles().empty(); }));
    disk.failWrites(0);
    EXPECT_GE(history->waitBeyond(149, Clock::now() + 10s, {}), 150u);
    EXPECT_THAT(testing::internal::GetCapturedStderr(),
                HasSubstr("zrmagent: the history " + file() +
                          " is corrupt (database disk image is malformed); it is kept as "));
    EXPECT_EQ(ids(), idsFrom(101, 150));
    EXPECT_EQ(take(), idsFrom(11, 150)) << "the sink gets what was in memory";
    close();
    open();
    EXPECT_EQ(sink->backlog(), 0u) << "its position is in the new file";
    EXPECT_EQ(history->newest(), 150u);
}

TEST_F(HistoryTest, CorruptionFoundByAReaderIsHandledToo) {
    open();
    pushAndWait(10);
    disk.failReads(SQLITE_CORRUPT);
    EXPECT_THROW(
        {
            try {
                history->query({});
            } catch (const HistoryError& error) {
                EXPECT_STREQ(error.what(), "database disk image is malformed");
                throw;
            }
        },
        HistoryError);
    disk.failReads(0);
    EXPECT_TRUE(eventually([&] { return !corruptFiles().empty(); }));
    pushAndWait(10);
    EXPECT_EQ(ids(), idsFrom(11, 20));
}

TEST_F(HistoryTest, ADamagedEventIsTracedOnceAndRefused) {
    open();
    pushAndWait(3);
    EXPECT_EQ(history->state().damaged, 0u);
    run("UPDATE events SET json = replace(json, 'text', 'tex') WHERE id = 2");
    EXPECT_EQ(ids(), (std::vector<std::uint64_t>{1, 3}));
    EXPECT_EQ(ids(), (std::vector<std::uint64_t>{1, 3}));
    EXPECT_THROW(
        {
            try {
                history->event(2);
            } catch (const HistoryError& error) {
                EXPECT_STREQ(error.what(),
                             "event 2 is damaged: its content is not what was written");
                throw;
            }
        },
        HistoryError);
    EXPECT_EQ(history->state().damaged, 1u);
    EXPECT_THAT(trace.messages(), ElementsAre("Event 2 in the history " + file() +
                                              " is damaged: its content is not what was written."));
}

TEST_F(HistoryTest, RemovedFilesAreCreatedAgainAndIdsContinue) {
    for (const bool isWhole : {false, true}) {
        open();
        const std::uint64_t before = history->newest();
        pushAndWait(10);
        EXPECT_EQ(take().size(), 10u);
        trace.clear();
        if (isWhole) {
            std::filesystem::remove_all(state);
        } else {
            for (const char* const ending : {"", "-wal", "-shm"}) {
                std::filesystem::remove(file() + ending);
            }
        }
        ASSERT_TRUE(eventually([&] { return trace.messages().size() == 2; }));
        EXPECT_THAT(trace.messages(),
                    ElementsAre("Error writing the history " + file() +
                                    ": its files were removed or replaced while the agent ran; a "
                                    "new history follows. Trying again.",
                                "The history takes events again."));
        EXPECT_EQ(history->state().problem, "");
        EXPECT_THAT(ids(), IsEmpty());
        pushAndWait(5);
        EXPECT_EQ(ids(), idsFrom(before + 11, before + 15));
        EXPECT_EQ(take(), idsFrom(before + 11, before + 15));
        close();
        open();
        EXPECT_EQ(history->newest(), before + 15);
        EXPECT_EQ(sink->backlog(), 0u);
        EXPECT_TRUE(std::filesystem::exists(state + "/history.lock"));
        close();
    }
}

TEST_F(HistoryTest, RemovingTheWriteAheadLogLosesNothing) {
    open();
    pushAndWait(10);
    std::filesystem::remove(file() + "-wal");
    ASSERT_TRUE(eventually([&] { return trace.messages().size() == 2; }));
    EXPECT_THAT(trace.messages()[0], HasSubstr("its write-ahead log was removed"));
    pushAndWait(5);
    EXPECT_EQ(ids(), idsFrom(1, 15));
    close();
    open();
    EXPECT_EQ(ids(), idsFrom(1, 15));
}

TEST_F(HistoryTest, TheProblemSaysWhenRemovedFilesCannotBeCreatedAgain) {
    open();
    pushAndWait(10);
    std::filesystem::remove_all(state);
    std::ofstream(state) << "not a directory";
    EXPECT_TRUE(eventually([&] {
        return history->state().problem.starts_with("cannot open " + state + "/history.lock: ");
    })) << history->state().problem;
    push(5);
    std::filesystem::remove(state);
    EXPECT_GE(history->waitBeyond(14, Clock::now() + 20s, {}), 15u);
    EXPECT_EQ(history->state().problem, "");
    EXPECT_EQ(ids(), idsFrom(11, 15));
}

TEST_F(HistoryTest, AnotherHistoryInItsPlaceIsMovedAside) {
    {
        HistoryFile other(directory.file("other.db"));
        other.store(*batchOf(1, 500), {});
    }
    open();
    pushAndWait(10);
    testing::internal::CaptureStderr();
    std::filesystem::rename(directory.file("other.db"), file());
    EXPECT_TRUE(eventually([&] { return corruptFiles().size() == 1; }));
    pushAndWait(5);
    EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("it is another history"));
    EXPECT_EQ(ids(), idsFrom(11, 15));
}

TEST_F(HistoryTest, IdsContinueWhenTheFileWasRemovedBetweenTwoRuns) {
    open();
    pushAndWait(10);
    close();
    for (const char* const ending : {"", "-wal", "-shm"}) {
        std::filesystem::remove(file() + ending);
    }
    open();
    EXPECT_EQ(history->newest(), 10u);
    pushAndWait(5);
    EXPECT_EQ(ids(), idsFrom(11, 15));
}

TEST_F(HistoryTest, AfterACrashIdsOfALostFileAreSkippedAndThoseOfAKeptOneContinue) {
    open();
    pushAndWait(10);
    history->finish(Clock::now() + 10s); // and nothing more
    sink.reset();
    history.reset();
    open();
    EXPECT_EQ(history->newest(), 10u);
    pushAndWait(1);
    EXPECT_EQ(ids(), idsFrom(1, 11));
    history->finish(Clock::now() + 10s);
    sink.reset();
    history.reset();
    for (const char* const ending : {"", "-wal", "-shm"}) {
        std::filesystem::remove(file() + ending);
    }
    open();
    EXPECT_EQ(history->newest(), 11 + HistoryDirectory::idsAtOnce);
}

TEST_F(HistoryTest, AFileOfALaterVersionIsLeftAlone) {
    open();
    close();
    Database(file(), Database::Use::WRITE).run("PRAGMA user_version = 1000");
    open();
    EXPECT_EQ(problem, "cannot open " + file() +
                           ": it has version 1000, and this program knows versions up to " +
                           std::to_string(Schema::version) +
                           "; use the program that wrote it, or move the file out of the way");
    EXPECT_THAT(corruptFiles(), IsEmpty());
}

TEST_F(HistoryTest, AFileThatTemporarilyCannotBeOpenedIsLeftAlone) {
    disk.failWrites(SQLITE_FULL);
    open();
    EXPECT_EQ(problem, "cannot open " + file() + ": database or disk is full");
    EXPECT_THAT(corruptFiles(), IsEmpty());
}

TEST_F(HistoryTest, KeepsTheConfiguredNumberOfEvents) {
    config.keepEvents = 100;
    open();
    for (int round = 0; round < 40; ++round) {
        pushAndWait(100);
    }
    EXPECT_TRUE(eventually([&] { return history->state().events == 100; }));
    EXPECT_EQ(history->state().oldest, 3901u);
    EXPECT_EQ(ids(), idsFrom(3901, 4000));
    testing::internal::CaptureStderr();
    EXPECT_FALSE(take().empty());
    testing::internal::GetCapturedStderr();
}

TEST_F(HistoryTest, KeepsEventsForTheConfiguredTime) {
    open();
    pushAndWait(10);
    close();
    Database(file(), Database::Use::WRITE)
        .run("UPDATE events SET raised = raised - 40 * 86400000 WHERE id <= 6");
    open();
    EXPECT_TRUE(eventually([&] { return history->state().oldest == 7; }));
    EXPECT_EQ(ids(), idsFrom(7, 10));
}

TEST_F(HistoryTest, ReturnsTheRatesOfEventsAndEntries) {
    open();
    pushAndWait(20);
    const std::int64_t raised = history->event(1)->raised;
    const std::int64_t minute = raised / 60'000;
    history->addEntries({minute, {{"/var/log/app.log", 500}}});
    const auto entries = [&]() -> std::optional<std::uint64_t> {
        const Rates rates = history->rates(raised, raised + 1, 60'000);
        return rates.logs.size() == 1 ? rates.logs[0].entries.at(0) : std::nullopt;
    };
    EXPECT_TRUE(eventually([&] { return entries() == 500u; }));
    EXPECT_EQ(history->rates(raised, raised + 1, 60'000).start, minute * 60'000);
    history->addEntries({minute, {{"/var/log/app.log", 1}}});
    close();
    open();
    EXPECT_EQ(entries(), 501u);
}

TEST_F(HistoryTest, ReadersWaitForNewEvents) {
    open();
    auto waiting = std::async(std::launch::async,
                              [&] { return history->waitBeyond(0, Clock::now() + 10s, {}); });
    push(1);
    EXPECT_EQ(waiting.get(), 1u);
    const auto begin = Clock::now();
    EXPECT_EQ(history->waitBeyond(1, begin + 10ms, {}), 1u);
    EXPECT_LT(Clock::now() - begin, 5s);
}

TEST_F(HistoryTest, ManyReadersDoNotDisturbTheWriter) {
    open();
    std::vector<std::thread> readers;
    std::atomic<bool> done{false};
    std::atomic<int> read{0};
    for (int number = 0; number < 6; ++number) {
        readers.emplace_back([&] {
            while (!done) {
                const auto newest = history->newest();
                const auto events = history->query({.situations = {"watch"}, .limit = 50}).events;
                ++read;
                if (newest > 0) {
                    EXPECT_GE(events.front().id, newest);
                }
                history->state();
            }
        });
    }
    for (int round = 0; round < 50; ++round) {
        pushAndWait(20);
    }
    done = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    EXPECT_GT(read, 0);
    EXPECT_EQ(ids(), idsFrom(1, 1000));
    EXPECT_EQ(take(), idsFrom(1, 1000));
}

} // namespace
