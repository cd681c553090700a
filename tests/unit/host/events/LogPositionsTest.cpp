#include "framework/LogPositions.h"

#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <memory>
#include <optional>
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
    return {1, 2, offset, static_cast<std::uint64_t>(offset) * 31, 4};
}

class LogPositionsTest : public testing::Test {
protected:
    LogPositionsTest() {
        PositionBook::makeCurrent(book);
        book->setQueue(&queue);
    }
    ~LogPositionsTest() override { PositionBook::makeCurrent(PositionBook::unkept()); }

    void raise(const std::string& text) {
        std::array<char, rowSize> row{};
        text.copy(row.data(), rowSize);
        EXPECT_TRUE(queue.push(label, row.data()));
    }
    void entry(LogPositions& log, const std::vector<std::string>& events, std::int64_t behind) {
        log.beginEntry();
        for (const std::string& event : events) {
            raise(event);
        }
        EXPECT_EQ(log.hasEvents(), !events.empty());
        if (log.hasEvents()) {
            log.endEntry(at(behind));
        }
    }
    /// The events in the queue; the last of an entry with its log and the offset behind.
    std::vector<std::string> take() {
        std::vector<std::string> taken;
        while (queue.backlog(reader) > 0) {
            const auto events = queue.read(reader, 100);
            for (const Event& event : events) {
                std::string text(event.row, strnlen(event.row, rowSize));
                if (event.log != nullptr) {
                    text += " " + event.log->name() + std::to_string(event.behind.offset);
                }
                taken.push_back(text + (event.endsEntry ? "" : " ..."));
            }
            queue.release(reader, events.size());
        }
        return taken;
    }

    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    EventQueue queue{4, rowSize};
    EventQueue::Reader reader = queue.addReader();
    std::shared_ptr<PositionBook> book =
        std::make_shared<PositionBook>(PositionValues{{{"/old", at(7)}}, {}}, true);
};

TEST_F(LogPositionsTest, AnEntrysEventsEnterTheQueueTogetherAndTheLastCarriesThePosition) {
    LogPositions log("/log");
    log.beginEntry();
    raise("a");
    raise("b");
    EXPECT_EQ(queue.backlog(reader), 0u);
    log.endEntry(at(10));
    raise("c"); // of no entry
    entry(log, {"d"}, 20);
    EXPECT_THAT(take(), ElementsAre("a ...", "b /log10", "c", "d /log20"));
}

TEST_F(LogPositionsTest, AnEntryThatIsLargerThanTheQueueStaysInOrder) {
    LogPositions log("/log");
    raise("0");
    entry(log, {"1", "2", "3", "4", "5", "6"}, 10);
    entry(log, {"7"}, 20);
    EXPECT_THAT(take(), ElementsAre("0", "1 ...", "2 ...", "3 ...", "4 ...", "5 ...", "6 /log10",
                                    "7 /log20"));
}

TEST_F(LogPositionsTest, AnEntryThatWasNotEndedIsDropped) {
    {
        LogPositions log("/log");
        log.beginEntry();
        raise("a");
        entry(log, {"b"}, 10);
        log.beginEntry();
        raise("c");
    }
    raise("d");
    EXPECT_THAT(take(), ElementsAre("b /log10", "d"));
}

TEST_F(LogPositionsTest, OnlyTheLogsOwnThreadCollects) {
    LogPositions log("/log");
    log.beginEntry();
    std::thread([&] { raise("other"); }).join();
    EXPECT_FALSE(log.hasEvents());
    EXPECT_THAT(take(), ElementsAre("other"));
}

TEST_F(LogPositionsTest, KnowsThePositionOfAnEarlierRunAndItsOwn) {
    LogPositions old("/old");
    EXPECT_TRUE(old.areKept());
    EXPECT_EQ(old.stored(), at(7));
    old.reached(at(8));
    EXPECT_EQ(old.stored(), at(8));
    entry(old, {"a"}, 9);
    EXPECT_EQ(old.stored(), at(9));
    EXPECT_EQ(LogPositions("/new").stored(), std::nullopt);
}

TEST_F(LogPositionsTest, AnObjectIsOfTheFirstUntilTheRunHasAPosition) {
    EXPECT_TRUE(LogPositions("/old").isFirstOfRun());
    {
        LogPositions waiting("/old"); // for its file, and then with other settings
        EXPECT_TRUE(waiting.isFirstOfRun());
        waiting.reached(at(7));
        EXPECT_TRUE(waiting.isFirstOfRun());
    }
    EXPECT_FALSE(LogPositions("/old").isFirstOfRun());
}

TEST_F(LogPositionsTest, APositionWithoutEventsIsNotAheadOfEarlierEvents) {
    LogPositions log("/log");
    log.reached(at(1));
    EXPECT_THAT(book->unsaved(0), ElementsAre(PositionValue{"/log", at(1)}));
    entry(log, {"a", "b"}, 2);
    EXPECT_THAT(book->unsaved(2), IsEmpty()); // the events carry it
    log.reached(at(3));
    EXPECT_THAT(book->unsaved(1), IsEmpty());
    EXPECT_THAT(book->unsaved(2), ElementsAre(PositionValue{"/log", at(3)}));
}

TEST_F(LogPositionsTest, APositionIsToBeSavedUntilItIs) {
    LogPositions log("/log");
    log.reached(at(1));
    const std::vector<PositionValue> first = book->unsaved(0);
    log.reached(at(2));
    book->saved(first);
    EXPECT_THAT(book->unsaved(0), ElementsAre(PositionValue{"/log", at(2)}));
    book->saved(book->unsaved(0));
    EXPECT_THAT(book->unsaved(0), IsEmpty());
    log.reached(at(2)); // nothing new
    EXPECT_THAT(book->unsaved(0), IsEmpty());
}

TEST_F(LogPositionsTest, WhatTheStoreLostIsSavedAgain) {
    LogPositions log("/log");
    entry(log, {"a"}, 1);
    book->saved({{"/log", at(1)}}); // with the event
    entry(log, {"b"}, 2);
    book->forgetSaved();
    EXPECT_THAT(book->unsaved(1),
                ElementsAre(PositionValue{"/log", at(1)}, PositionValue{"/old", at(7)}));
}

TEST_F(LogPositionsTest, WhatIsNoLongerFollowedMayBeRemoved) {
    {
        LogPositions log("/log");
        log.reached(at(1));
        book->saved(book->unsaved(0));
        book->removed({"/log", "/old"});
        EXPECT_THAT(book->unsaved(0), ElementsAre(PositionValue{"/log", at(1)}));
        book->saved(book->unsaved(0));
        book->renewFollowed();
        EXPECT_THAT(book->unsaved(0), ElementsAre(PositionValue{"/log", at(1)}));
    }
    EXPECT_EQ(LogPositions("/old").stored(), std::nullopt);
    EXPECT_EQ(LogPositions("/log").stored(), at(1));
}

TEST_F(LogPositionsTest, TheNewestFollowerOfALogTakesOver) {
    LogPositions before("/log");
    entry(before, {"a"}, 1);
    before.beginEntry();
    raise("b");
    std::thread([&] {
        LogPositions after("/log");
        EXPECT_EQ(after.stored(), at(1));
        entry(after, {"b again"}, 2);
        before.endEntry(at(2)); // as the older thread would
        before.reached(at(3));
        EXPECT_EQ(after.stored(), at(2));
    }).join();
    EXPECT_THAT(take(), ElementsAre("a /log1", "b again /log2"));
}

TEST_F(LogPositionsTest, TheFirstPositionOfALogIsForTheWriterToStoreAtOnce) {
    LogPositions log("/log");
    queue.read(reader, 1, EventQueue::Clock::now()); // the writer begins
    std::thread writer([&] {
        EXPECT_TRUE(
            queue.read(reader, 1, EventQueue::Clock::now() + std::chrono::hours(1)).empty());
        EXPECT_THAT(book->unsaved(0), ElementsAre(PositionValue{"/log", at(0)}));
    });
    log.reached(at(0));
    writer.join();
}

TEST_F(LogPositionsTest, PositionsFromBeforeThereWasAQueueAreForTheWriterToStoreAtOnce) {
    book->setQueue(nullptr);
    LogPositions log("/log");
    log.reached(at(0));
    book->setQueue(&queue);
    EXPECT_TRUE(queue.read(reader, 1, EventQueue::Clock::now() + std::chrono::hours(1)).empty());
}

TEST_F(LogPositionsTest, WhatTheQueueRefusesIsNotPassed) {
    LogPositions log("/log");
    entry(log, {"a"}, 1);
    queue.close();
    entry(log, {"b"}, 2);
    log.reached(at(3));
    EXPECT_EQ(log.stored(), at(1));
    EXPECT_THAT(book->unsaved(1), IsEmpty());
    EXPECT_THAT(take(), ElementsAre("a /log1"));
}

TEST_F(LogPositionsTest, OnceTheSituationsCloseNothingMoves) {
    LogPositions log("/log");
    entry(log, {"a"}, 1);
    book->close();
    entry(log, {"b"}, 2);
    log.reached(at(3));
    EXPECT_EQ(log.stored(), at(1));
    EXPECT_THAT(take(), ElementsAre("a /log1"));
}

TEST_F(LogPositionsTest, AnotherLogContinuesInAFileThatHasItsNameNow) {
    book->setRenamed({{{1, 2}, "/new"}});
    LogPosition left = at(20);
    {
        LogPositions log("/log");
        entry(log, {"a"}, 10);
        log.reached(left);
        left.modified = 77;
        log.left({9, 9, 1}, false); // a file without another name
        log.left(left, true);
        EXPECT_FALSE(book->takenOver("/new"));
        EXPECT_EQ(log.stored(), at(20));
        LogPosition withOlder = left;
        withOlder.late = LatePositions({at(5)}); // those files stay this log's
        log.left(withOlder, false);
        EXPECT_EQ(book->takenOver("/new"), left);
        LogPosition blank;
        blank.modified = 77;
        EXPECT_EQ(log.stored(), blank);
    }
    // Both are stored, and not before the event.
    EXPECT_THAT(book->unsaved(0), IsEmpty());
    EXPECT_EQ(book->unsaved(1).size(), 2U);
    {
        LogPositions log("/new");
        EXPECT_FALSE(log.isFirstOfRun()); // it continues even without resumption
        EXPECT_EQ(log.stored(), left);
        EXPECT_FALSE(book->takenOver("/new"));
        LogPositions other("/log");
        other.left(at(5), false);
        EXPECT_EQ(log.stored(), left); // it is followed already
    }
}

TEST_F(LogPositionsTest, WithoutAStoreAPositionLivesAsLongAsTheProcess) {
    PositionBook::makeCurrent(PositionBook::unkept());
    {
        LogPositions log("/log");
        EXPECT_FALSE(log.areKept());
        EXPECT_EQ(log.stored(), std::nullopt);
        log.reached(at(1));
    }
    EXPECT_EQ(LogPositions("/log").stored(), at(1));
}

} // namespace
