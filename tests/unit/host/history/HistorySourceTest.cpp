#include "host/history/HistorySource.h"

#include "TestBatch.h"
#include "host/history/HistoryFile.h"
#include "support/FaultyDisk.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <future>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t plenty = 1'000'000;

class HistorySourceTest : public testing::Test {
protected:
    /// Events on disk, and in memory as far as there is room.
    void commit(std::uint64_t first, std::uint64_t last) {
        const auto batch = batchOf(first, last);
        file.store(*batch, {});
        recent.publish(batch);
    }
    /// Reads and releases everything up to this event.
    std::vector<std::uint64_t> takeUntil(std::uint64_t last, std::size_t most = 64) {
        std::vector<std::uint64_t> ids;
        while (ids.empty() || ids.back() < last) {
            const auto events = source.read(most);
            if (events.empty()) {
                break;
            }
            for (const EventRecord& event : events) {
                ids.push_back(event.id);
            }
            source.release(events.size());
        }
        return ids;
    }

    RecordingTrace trace{TRC1_ERROR};
    FaultyDisk disk;
    TemporaryDirectory directory;
    HistoryFile file{directory.file("history.db")};
    RecentEvents recent{plenty, 0};
    ReaderPool readers{directory.file("history.db")};
    Cursor cursor{0};
    HistorySource source{"sink x", recent, readers, cursor};
};

TEST_F(HistorySourceTest, ReturnsWhatIsInMemoryWithoutReadingTheFile) {
    disk.failReads(SQLITE_IOERR_READ);
    recent.publish(batchOf(1, 100));
    recent.publish(batchOf(101, 150));
    EXPECT_EQ(source.backlog(), 150u);
    EXPECT_EQ(source.read(30).size(), 30u);
    EXPECT_EQ(source.read(10).front().id, 1u) << "nothing was released";
    source.release(7);
    EXPECT_EQ(source.read(10).front().id, 8u);
    EXPECT_EQ(cursor, 7u);
    EXPECT_EQ(source.backlog(), 143u);
    EXPECT_EQ(takeUntil(150), idsFrom(8, 150));
    EXPECT_EQ(source.backlog(), 0u);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(HistorySourceTest, ReturnsTheSituationsTextFromTheFileToo) {
    std::vector<EventRecord> events = {testEvent(1), testEvent(2)};
    events[1].text = "The door was opened";
    file.store(*batchOf(events), {});
    RecentEvents later(plenty, 2);
    HistorySource late("late", later, readers, cursor);
    const auto given = late.read(10);
    ASSERT_EQ(given.size(), 2u);
    EXPECT_EQ(given[0].text, "");
    EXPECT_EQ(given[1].text, "The door was opened");
}

TEST_F(HistorySourceTest, CatchesUpFromTheFileAndContinuesInMemory) {
    file.store(*batchOf(1, 1000), {});
    RecentEvents later(plenty, 1000);
    cursor = 10;
    HistorySource late("late", later, readers, cursor);
    std::vector<std::uint64_t> ids;
    while (late.backlog() > 0) {
        const auto events = late.read(64);
        for (const EventRecord& event : events) {
            EXPECT_EQ(event.situation, "watch");
            EXPECT_EQ(event.severity, "minor");
            EXPECT_EQ(event.log, "/var/log/app.log");
            EXPECT_EQ(event.json, "{}");
            EXPECT_EQ(event.raised, testTime);
            ids.push_back(event.id);
        }
        late.release(events.size());
        if (ids.size() == 64) {
            const auto batch = batchOf(1001, 1010);
            file.store(*batch, {});
            later.publish(batch);
        }
    }
    EXPECT_EQ(ids, idsFrom(11, 1010));
}

TEST_F(HistorySourceTest, ReadsAtMostSomeMegabytesOfTheFileAtOnce) {
    constexpr std::uint64_t last = 20;
    std::vector<EventRecord> events;
    const std::string json = "\"" + std::string(1024 * 1024, 'x') + "\"";
    for (std::uint64_t id = 1; id <= last; ++id) {
        events.push_back(testEvent(id));
        events.back().json = json;
    }
    file.store(*batchOf(events), {});
    RecentEvents later(plenty, last);
    HistorySource late("late", later, readers, cursor);
    std::vector<std::uint64_t> ids;
    std::vector<std::size_t> reads;
    while (late.backlog() > 0) {
        const auto read = late.read(64);
        reads.push_back(read.size());
        for (const EventRecord& event : read) {
            ids.push_back(event.id);
        }
        late.release(read.size());
    }
    EXPECT_THAT(reads, ElementsAre(8u, 8u, 4u));
    EXPECT_EQ(ids, idsFrom(1, last));
}

TEST_F(HistorySourceTest, WaitsForEvents) {
    auto reading = std::async(std::launch::async, [&] { return source.read(10).size(); });
    EXPECT_EQ(reading.wait_for(20ms), std::future_status::timeout);
    commit(1, 3);
    EXPECT_EQ(reading.get(), 3u);
}

TEST_F(HistorySourceTest, ReturnsWhatIsLeftAfterTheEnd) {
    auto waiting = std::async(std::launch::async, [&] { return takeUntil(UINT64_MAX); });
    commit(1, 5);
    source.end();
    EXPECT_EQ(waiting.get(), idsFrom(1, 5));
    EXPECT_TRUE(source.read(1).empty());
}

TEST_F(HistorySourceTest, SkipsAndReportsWhatTheHistoryNoLongerHolds) {
    file.store(*batchOf(1, 1000), {});
    while (file.expire({100, 0, testTime})) {
    }
    RecentEvents later(plenty, 1000);
    cursor = 250;
    HistorySource late("late", later, readers, cursor);
    testing::internal::CaptureStderr();
    EXPECT_EQ(late.read(1).front().id, 901u);
    EXPECT_EQ(
        testing::internal::GetCapturedStderr(),
        "zrmagent: late did not get the events 251 to 900: the history no longer contains them\n");
    EXPECT_EQ(cursor, 900u);
    EXPECT_EQ(late.backlog(), 100u);
}

TEST_F(HistorySourceTest, SkipsAndReportsDamagedEvents) {
    for (std::uint64_t first = 1; first <= 1000; first += 100) {
        file.store(*batchOf(first, first + 99), {});
    }
    RecentEvents nothingInMemory(plenty, 1000);
    HistorySource sourceOfFile("sink x", nothingInMemory, readers, cursor);
    Database writer(directory.file("history.db"), Database::Use::WRITE);
    writer.run("UPDATE events SET json = '{,}' WHERE id IN (1, 300) OR id BETWEEN 400 AND 800");
    testing::internal::CaptureStderr();
    std::vector<std::uint64_t> ids;
    while (ids.empty() || ids.back() < 1000) {
        const auto events = sourceOfFile.read(64);
        for (const EventRecord& event : events) {
            ids.push_back(event.id);
        }
        sourceOfFile.release(events.size());
    }
    const std::string told = testing::internal::GetCapturedStderr();
    std::vector<std::uint64_t> expected = idsFrom(2, 299);
    for (const auto& [first, last] : {std::pair(301, 399), std::pair(801, 1000)}) {
        const auto more =
            idsFrom(static_cast<std::uint64_t>(first), static_cast<std::uint64_t>(last));
        expected.insert(expected.end(), more.begin(), more.end());
    }
    EXPECT_EQ(ids, expected);
    EXPECT_EQ(std::count(told.begin(), told.end(), '\n'), 403);
    EXPECT_EQ(told.substr(0, told.find('\n')),
              "zrmagent: sink x did not get the event 1: it is damaged in the history, its content "
              "is not what was written");
}

TEST_F(HistorySourceTest, FindsOlderEventsInMemoryWhenTheFileIsNew) {
    // The file was replaced: events 1 to 20 are gone, 21 to 30 are still in memory.
    recent.publish(batchOf(21, 30));
    testing::internal::CaptureStderr();
    EXPECT_EQ(takeUntil(30), idsFrom(21, 30));
    RecentEvents nothing(plenty, 40);
    HistorySource late("late", nothing, readers, cursor);
    nothing.end();
    EXPECT_TRUE(late.read(1).empty());
    EXPECT_EQ(cursor, 40u);
    EXPECT_EQ(
        testing::internal::GetCapturedStderr(),
        "zrmagent: sink x did not get the events 1 to 20: the history no longer contains them\n"
        "zrmagent: late did not get the events 31 to 40: the history no longer contains them\n");
}

TEST_F(HistorySourceTest, RetriesWhenTheFileCannotBeRead) {
    file.store(*batchOf(1, 10), {});
    RecentEvents later(plenty, 10);
    HistorySource late("late", later, readers, cursor);
    disk.failReads(SQLITE_IOERR_READ);
    auto reading = std::async(std::launch::async, [&] { return late.read(10).size(); });
    EXPECT_TRUE(trace.waitFor("Error reading the history for late: disk I/O error. Trying again."));
    disk.failReads(0);
    EXPECT_EQ(reading.get(), 10u);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error reading the history for late: disk I/O error. Trying again.",
                            "The history can be read again for late."));
    EXPECT_FALSE(readers.takeCorruption());
}

TEST_F(HistorySourceTest, AnUnreadableFileDoesNotDelayTheStop) {
    file.store(*batchOf(1, 10), {});
    RecentEvents later(plenty, 10);
    HistorySource late("late", later, readers, cursor);
    disk.failReads(SQLITE_CORRUPT);
    auto reading = std::async(std::launch::async, [&] { return late.read(10).size(); });
    EXPECT_TRUE(trace.waitFor(
        "Error reading the history for late: database disk image is malformed. Trying again."));
    late.end();
    EXPECT_EQ(reading.get(), 0u);
    EXPECT_EQ(late.backlog(), 10u);
    EXPECT_TRUE(readers.takeCorruption());
}

} // namespace
