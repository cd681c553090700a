#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "framework/LogPositions.h"
#include "host/events/ContextDemand.h"
#include "host/events/EntryContext.h"
#include "host/events/EntryEvents.h"
#include "host/events/Episode.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"
#include "support/AllocationCount.h"
#include "unit/host/events/TestEvents.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>

using namespace zrm;
using namespace zrm::host;
using namespace std::string_literals;

namespace {

class GivenEntry : public LogEntry {
public:
    std::string_view text() const override { return m_text; }
    bool isCut() const override { return m_isCut; }
    const EntryFields& fields() override {
        ++m_reads;
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_keep; }

    std::string m_text = "the whole line";
    bool m_isCut = false;
    EntryFields m_fields;
    EntryKeep m_keep;
    int m_reads = 0;
};

class EntryDetailTest : public testing::Test {
protected:
    EntryDetailTest() {
        entry.m_fields.add("user", "root");
        entry.m_fields.add("pid", "7");
    }
    /// Makes a new book the one that logs are followed with, and gives it the queue.
    static void followWith(EventQueue& queue) {
        const auto book = std::make_shared<PositionBook>(PositionValues{}, true);
        PositionBook::makeCurrent(book);
        book->setQueue(&queue);
    }
    static std::shared_ptr<const SituationLabel> naming(std::vector<std::string> fields) {
        return std::make_shared<const SituationLabel>(
            SituationLabel{"watch", "minor", "", std::move(fields)});
    }
    std::shared_ptr<const EntryDetail> detail(std::vector<std::string> fields = {}) {
        EntryEvents events;
        events.add(naming(std::move(fields)), "row", 3);
        EXPECT_EQ(events.detail(0), nullptr);
        events.describe(entry, {});
        return events.detail(0);
    }

    GivenEntry entry;
};

TEST_F(EntryDetailTest, EventsHaveTheFieldsThatTheirConditionsName) {
    EXPECT_EQ(detail({"user", "absent"})->fields, R"({"user":"root"})");
    EXPECT_EQ(detail({"absent"})->fields, "");
    EXPECT_EQ(detail()->text, R"("the whole line")");
}

TEST_F(EntryDetailTest, FieldsAreReadOnlyWhereTheyAreKept) {
    detail();
    EXPECT_EQ(entry.m_reads, 0);
    detail({"user"});
    EXPECT_EQ(entry.m_reads, 1);
}

TEST_F(EntryDetailTest, KeepTakesTheirPlace) {
    entry.m_keep.fields = {"pid"};
    EXPECT_EQ(detail({"user"})->fields, R"({"pid":"7"})");
    entry.m_keep.fields = {"*"};
    EXPECT_EQ(detail({"user"})->fields, R"({"user":"root","pid":"7"})");
    entry.m_keep.fields.emplace();
    EXPECT_EQ(detail({"user"})->fields, "");
}

TEST_F(EntryDetailTest, TheTextIsCutBetweenCharacters) {
    entry.m_text = "gr\xc3\xbc\xc3\x9f";
    entry.m_keep.textBytes = 3;
    EXPECT_EQ(detail()->text, "\"gr\"");
    EXPECT_TRUE(detail()->isCut);
    entry.m_keep.textBytes = 6;
    EXPECT_FALSE(detail()->isCut);
    entry.m_isCut = true;
    EXPECT_TRUE(detail()->isCut);
    entry.m_keep.textBytes = 0;
    EXPECT_EQ(detail()->text, "");
    EXPECT_FALSE(detail()->isCut);
}

TEST_F(EntryDetailTest, BytesThatAreNotTextBecomeJson) {
    entry.m_text = "a\0b\xff\x1b\""s;
    entry.m_fields.add("\xff", "\xc3(");
    EXPECT_EQ(detail()->text, "\"a\\u0000b\xef\xbf\xbd\\u001b\\\"\"");
    EXPECT_EQ(detail({"\xff"})->fields, "{\"\xef\xbf\xbd\":\"\xef\xbf\xbd(\"}");
}

TEST_F(EntryDetailTest, SituationsThatKeepTheSameShareIt) {
    EntryEvents events;
    events.add(naming({"user"}), "row", 3);
    events.add(naming({"user"}), "row", 3);
    events.add(naming({}), "row", 3);
    events.describe(entry, {});
    EXPECT_EQ(events.detail(0), events.detail(1));
    EXPECT_NE(events.detail(1), events.detail(2));
    EXPECT_EQ(events.detail(2)->fields, "");
}

TEST_F(EntryDetailTest, AnEventWithoutARowHasNone) {
    EntryEvents events;
    events.add(naming({"user"}), "row", 3);
    events.add(naming({"user"}), nullptr, 3, std::make_shared<const EventJudgement>());
    events.add(naming({"user"}), "row", 3);
    events.describe(entry, {});
    EXPECT_EQ(events.detail(1), nullptr);
    EXPECT_NE(events.detail(0), nullptr);
    EXPECT_EQ(events.detail(0), events.detail(2));
}

TEST_F(EntryDetailTest, TheJsonOfAnEventHasIt) {
    TestEvents events;
    events.add("text");
    Event event = events.all().front();
    const EventJson format(testLayout());
    std::string plain;
    format.append(plain, event);
    event.detail = std::make_shared<const EntryDetail>(
        EntryDetail{R"({"a":"b"})", R"("line")", true, R"(["before"])"});
    std::string text;
    format.append(text, event);
    plain.pop_back();
    EXPECT_EQ(text, plain + R"(,"fields":{"a":"b"},"entry":"line","entry_cut":true,)" +
                        R"("context":["before"]})");
}

TEST_F(EntryDetailTest, TheEventsOfTheThreadsEntryAreDescribed) {
    EventQueue queue(4, 16);
    const EventQueue::Reader reader = queue.addReader();
    followWith(queue);
    {
        const LogEntry::Offer offer(entry);
        LogPositions log("/log");
        log.beginEntry();
        EXPECT_TRUE(queue.push(naming({"user"}), "0123456789abcdef"));
        log.endEntry({});
    }
    const auto events = queue.read(reader, 10);
    ASSERT_EQ(events.size(), 1u);
    ASSERT_NE(events[0].detail, nullptr);
    EXPECT_EQ(events[0].detail->fields, R"({"user":"root"})");
    PositionBook::makeCurrent(PositionBook::unkept());
}

TEST_F(EntryDetailTest, SituationsGetTheEntriesBefore) {
    const ContextDemand::Hold other("/other", 50);
    std::optional<ContextDemand::Hold> hold(std::in_place, "/log", 2);
    EventQueue queue(100, 16);
    const EventQueue::Reader reader = queue.addReader();
    followWith(queue);
    const LogEntry::Offer offer(entry);
    LogPositions log("/log");
    const auto wanting = [](std::size_t context) {
        return std::make_shared<const SituationLabel>(
            SituationLabel{"watch", "minor", "", {}, context});
    };
    const auto raised = [&](std::string text, std::size_t context) {
        entry.m_text = std::move(text);
        log.beginEntry();
        EXPECT_TRUE(queue.push(wanting(context), "0123456789abcdef"));
        log.endEntry({});
        const std::string shown = queue.read(reader, 1)[0].detail->context;
        queue.release(reader, 1);
        return shown;
    };
    EXPECT_EQ(raised("one", 2), "");
    EXPECT_EQ(raised("two", 2), R"(["one"])");
    EXPECT_EQ(raised("three", 0), "");
    EXPECT_EQ(raised("four", 2), R"(["two","three"])");
    EXPECT_EQ(raised("five", 1), R"(["four"])");
    {
        const ContextDemand::Hold every(std::nullopt, 3);
        EXPECT_EQ(raised("six", 3), R"(["three","four","five"])") << "what was kept so far";
        EXPECT_EQ(raised("seven", 3), R"(["four","five","six"])");
    }
    hold.reset();
    EXPECT_EQ(raised("eight", 2), "") << "nobody wants it any more";
    PositionBook::makeCurrent(PositionBook::unkept());
}

TEST(EntryContext, IsBoundedAndAllocatesNothingPerEntry) {
    EntryContext context;
    context.keep(EntryContext::mostEntries + 1);
    const std::string line(10'000, 'x');
    const long before = allocationCount();
    for (int entry = 0; entry < 1000; ++entry) {
        context.add(line);
    }
    EXPECT_EQ(allocationCount(), before);
    const auto texts = context.before(1000);
    EXPECT_EQ(texts.size(), EntryContext::mostBytes / EntryContext::longestEntry);
    EXPECT_EQ(texts.front().size(), EntryContext::longestEntry);
    context.keep(EntryContext::mostEntries);
    for (int entry = 0; entry < 1000; ++entry) {
        context.add(std::to_string(entry));
    }
    EXPECT_EQ(context.before(1000).size(), EntryContext::mostEntries);
    EXPECT_EQ(context.before(1000).front(), "899");
    context.keep(0);
    EXPECT_FALSE(context.isKept());
}

class DetailRoomTest : public testing::Test {
protected:
    DetailRoomTest() {
        queue.onFull([this](bool full) { isFull = full; });
        entry.m_text = std::string(EntryKeep::longestText, 'x');
    }
    void push() {
        EntryEvents events;
        events.add(label, "0123456789abcdef", 16);
        events.describe(entry, {});
        queue.pushEntry(events, nullptr, {});
    }

    GivenEntry entry;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    bool isFull = false;
    EventQueue queue{1000, 16};
    EventQueue::Reader first = queue.addReader();
    EventQueue::Reader second = queue.addReader();
};

TEST_F(DetailRoomTest, LargeEventsFillTheQueue) {
    constexpr std::size_t most = EventQueue::detailRoom / EntryKeep::longestText;
    std::size_t pushed = 0;
    for (; pushed < 1000 && !isFull; ++pushed) {
        push();
    }
    EXPECT_NEAR(static_cast<double>(pushed), static_cast<double>(most), 1.0);
    queue.release(first, pushed);
    EXPECT_TRUE(isFull) << "the other reader has them still";
    queue.release(second, pushed / 8);
    EXPECT_TRUE(isFull) << "only an eighth is free";
    queue.release(second, pushed / 4);
    EXPECT_FALSE(isFull);
}

TEST_F(DetailRoomTest, AnEventThatEveryReaderHasReleasedKeepsNoMemory) {
    push();
    const std::weak_ptr<const EntryDetail> detail = queue.read(first, 1)[0].detail;
    queue.release(first, 1);
    EXPECT_FALSE(detail.expired());
    queue.release(second, 1);
    EXPECT_TRUE(detail.expired());
}

} // namespace
