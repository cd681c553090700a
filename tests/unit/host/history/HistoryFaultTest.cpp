// Disks that are full, files that are damaged, removed or replaced while a history is in use.
#include "host/history/History.h"

#include "HistoryFixture.h"
#include "host/history/Schema.h"
#include "support/ReasonOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using HistoryFaultTest = HistoryFixture;

TEST_F(HistoryFaultTest, AFullDiskIsReportedOnceAndNothingIsLost) {
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

TEST_F(HistoryFaultTest, AHistoryOpensOnAFullDiskAndStoresEventsOnceThereIsSpace) {
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

TEST_F(HistoryFaultTest, AFullDiskDoesNotDelayTheStop) {
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

TEST_F(HistoryFaultTest, CursorsThatCannotBeStoredAtTheStopAreReported) {
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

TEST_F(HistoryFaultTest, ACorruptFileIsMovedAsideAtTheStart) {
    std::filesystem::create_directory(state);
    std::ofstream(file()) << std::string(100'000, 'x');
    open();
    EXPECT_THAT(message, HasSubstr("zrmagent: the history " + file() +
                                   " is corrupt (file is not a database); it is kept as " + file() +
                                   ".corrupt-"));
    EXPECT_EQ(problem, "");
    ASSERT_EQ(corruptFiles().size(), 1u);
    EXPECT_EQ(std::filesystem::file_size(corruptFiles()[0]), 100'000u);
    pushAndWait(3);
    EXPECT_EQ(ids(), idsFrom(1, 3));
}

TEST_F(HistoryFaultTest, IdsContinueAfterACorruptFileWhereTheyAreReadable) {
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
    EXPECT_THAT(message, HasSubstr("database disk image is malformed"));
    EXPECT_EQ(history->newest(), 100u);
    pushAndWait(2);
    EXPECT_EQ(ids(), idsFrom(101, 102));
    EXPECT_EQ(take(), idsFrom(101, 102));
    close();
    open();
    EXPECT_EQ(history->newest(), 102u);
}

TEST_F(HistoryFaultTest, AFileThatBecomesCorruptIsReplacedWhileTheAgentRuns) {
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

TEST_F(HistoryFaultTest, CorruptionFoundByAReaderIsHandledToo) {
    open();
    pushAndWait(10);
    disk.failReads(SQLITE_CORRUPT);
    EXPECT_EQ(reasonOf(history->query({})), "database disk image is malformed");
    disk.failReads(0);
    EXPECT_TRUE(eventually([&] { return !corruptFiles().empty(); }));
    pushAndWait(10);
    EXPECT_EQ(ids(), idsFrom(11, 20));
}

TEST_F(HistoryFaultTest, ADamagedEventIsTracedOnceAndRefused) {
    open();
    pushAndWait(3);
    EXPECT_EQ(history->state().damaged, 0u);
    run("UPDATE events SET json = replace(json, 'text', 'tex') WHERE id = 2");
    EXPECT_EQ(ids(), (std::vector<std::uint64_t>{1, 3}));
    EXPECT_EQ(ids(), (std::vector<std::uint64_t>{1, 3}));
    EXPECT_EQ(reasonOf(history->event(2)),
              "event 2 is damaged: its content is not what was written");
    EXPECT_EQ(history->state().damaged, 1u);
    EXPECT_THAT(trace.messages(), ElementsAre("Event 2 in the history " + file() +
                                              " is damaged: its content is not what was written."));
}

TEST_F(HistoryFaultTest, RemovedFilesAreCreatedAgainAndIdsContinue) {
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

TEST_F(HistoryFaultTest, RemovingTheWriteAheadLogLosesNothing) {
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

TEST_F(HistoryFaultTest, TheProblemSaysWhenRemovedFilesCannotBeCreatedAgain) {
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

TEST_F(HistoryFaultTest, AnotherHistoryInItsPlaceIsMovedAside) {
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

TEST_F(HistoryFaultTest, IdsContinueWhenTheFileWasRemovedBetweenTwoRuns) {
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

TEST_F(HistoryFaultTest, AfterACrashIdsOfALostFileAreSkippedAndThoseOfAKeptOneContinue) {
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
    EXPECT_EQ(history->newest(), 10 + HistoryDirectory::idsAtOnce);
}

TEST_F(HistoryFaultTest, ACrashBeforeABatchIsStoredSkipsNoIds) {
    open();
    pushAndWait(10);
    history->finish(Clock::now() + 10s);
    sink.reset();
    history.reset();
    const std::string directory = std::filesystem::path(file()).parent_path();
    const std::uint64_t reserved = HistoryDirectory::reservedIdsIn(directory);
    open();
    Database other(file(), Database::Use::WRITE);
    other.run("BEGIN IMMEDIATE");
    push(3);
    while (HistoryDirectory::reservedIdsIn(directory) == reserved) {
        std::this_thread::sleep_for(1ms);
    }
    history->finish(Clock::now() + 10ms); // and nothing more
    sink.reset();
    history.reset();
    other.run("ROLLBACK");
    open();
    EXPECT_EQ(history->newest(), 10u);
}

TEST_F(HistoryFaultTest, AFileOfALaterVersionIsLeftAlone) {
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

TEST_F(HistoryFaultTest, AFileThatTemporarilyCannotBeOpenedIsLeftAlone) {
    disk.failWrites(SQLITE_FULL);
    open();
    EXPECT_EQ(problem, "cannot open " + file() + ": database or disk is full");
    EXPECT_THAT(corruptFiles(), IsEmpty());
}

} // namespace
