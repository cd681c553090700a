#include "tables/Timestamp.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <random>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long now = 1000000;

/// The event times of a chain from the newest to the oldest, checking the links both ways.
std::vector<long> timesOf(const Timestamp* head) {
    std::vector<long> times;
    if (head == nullptr) {
        return times;
    }
    const Timestamp* element = head;
    do {
        EXPECT_EQ(element->isHeadOfChain(), element == head);
        EXPECT_EQ(element->next()->prev(), element);
        EXPECT_EQ(element->prev()->next(), element);
        times.push_back(static_cast<long>(element->eventTime()));
        element = element->next();
    } while (element != head);
    return times;
}

class TimestampChain : public testing::Test {
protected:
    ~TimestampChain() override { delete m_head; }
    void add(long time) { new Timestamp(&m_head, time); }
    std::vector<long> times() const { return timesOf(m_head); }

    FakeClock m_clock{now};
    Timestamp* m_head = nullptr;
};

TEST_F(TimestampChain, TheNewestElementIsTheHead) {
    add(1);
    EXPECT_THAT(times(), ElementsAre(1));
    add(2);
    add(3);
    EXPECT_THAT(times(), ElementsAre(3, 2, 1));
}

TEST_F(TimestampChain, EveryEventWithinThePeriodIsKeptAndCounted) {
    for (const long time : {now - 9, now - 5, now}) {
        add(time);
    }
    EXPECT_EQ(m_head->countEvents(10), 3);
    EXPECT_THAT(times(), ElementsAre(now, now - 5, now - 9));
}

TEST_F(TimestampChain, OlderEventsArePruned) {
    for (const long time : {now - 30, now - 20, now - 5, now}) {
        add(time);
    }
    EXPECT_EQ(m_head->countEvents(10), 2);
    EXPECT_THAT(times(), ElementsAre(now, now - 5));
}

TEST_F(TimestampChain, AnEventAtTheCutOffIsPrunedAndNotCounted) {
    add(now - 10);
    add(now - 9);
    EXPECT_EQ(m_head->countEvents(10), 1);
    EXPECT_THAT(times(), ElementsAre(now - 9));
}

TEST_F(TimestampChain, AnOldHeadIsNotCountedButKeptAlone) {
    add(now - 100);
    EXPECT_EQ(m_head->countEvents(10), 0);
    EXPECT_THAT(times(), ElementsAre(now - 100));
    add(now - 50);
    add(now - 10);
    EXPECT_EQ(m_head->countEvents(10), 0);
    EXPECT_THAT(times(), ElementsAre(now - 10));
}

TEST_F(TimestampChain, TheWalkStopsAtTheFirstElementThatIsOut) {
    // Late entries: the chain is ordered by arrival, not by time.
    for (const long time : {now - 1, now - 50, now - 2}) {
        add(time);
    }
    EXPECT_EQ(m_head->countEvents(10), 1);
    EXPECT_THAT(times(), ElementsAre(now - 2));
}

TEST_F(TimestampChain, APeriodMayEndAtAnotherTimeThanNow) {
    for (const long time : {now - 1000, now - 995, now - 990}) {
        add(time);
    }
    EXPECT_EQ(m_head->countEvents(10, now - 990), 2);
    EXPECT_THAT(times(), ElementsAre(now - 990, now - 995));
    EXPECT_EQ(m_head->countEvents(10), 0);
}

TEST_F(TimestampChain, APeriodBeyondTheEpochCountsEveryEventAfterIt) {
    for (const long time : {0L, 1L, now}) {
        add(time);
    }
    EXPECT_EQ(m_head->countEvents(now + 1000), 2);
    EXPECT_THAT(times(), ElementsAre(now, 1));
}

TEST_F(TimestampChain, CountingIsRefusedOnAnyElementButTheHead) {
    add(now - 100);
    add(now);
    {
        RecordingTrace trace(TRC1_ERROR);
        EXPECT_EQ(m_head->next()->countEvents(10), -1);
        EXPECT_THAT(trace.messages(),
                    ElementsAre("Error: Function not invoked from head-of-chain"));
    }
    {
        RecordingTrace trace(~TRC1_ERROR);
        EXPECT_EQ(m_head->next()->countEvents(10), -1);
        EXPECT_THAT(trace.messages(), IsEmpty());
    }
    EXPECT_THAT(times(), ElementsAre(now, now - 100));
}

TEST_F(TimestampChain, DeletingTheHeadOfALongChainNeedsNoStack) {
    for (int i = 0; i < 1000000; ++i) {
        add(now);
    }
    delete m_head; // a call per element would overflow the stack; a leak shows under ASan
    m_head = nullptr;
}

TEST_F(TimestampChain, CountingAgreesWithAPlainModel) {
    const unsigned seed = std::random_device{}();
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 random(seed);
    std::vector<long> model; // newest first
    long clock = now;
    for (int step = 0; step < 5000; ++step) {
        m_clock.set(clock += static_cast<long>(random() % 6) - 1); // set back now and then
        const long time = clock - static_cast<long>(random() % 20);
        add(time);
        model.insert(model.begin(), time);
        const long period = static_cast<long>(random() % 30);
        std::size_t within = 0;
        while (within < model.size() && model[within] > clock - period) {
            ++within;
        }
        if (random() % 2 == 0) {
            ASSERT_EQ(m_head->countEvents(period), static_cast<long>(within));
            if (within < model.size()) {
                model.resize(std::max<std::size_t>(within, 1));
            }
        }
        ASSERT_EQ(times(), model);
    }
}

TEST_F(TimestampChain, CountingABusyPeriodDoesNotWalkOverIt) {
    constexpr long events = 200000; // walking over them at each event would take minutes
    for (long number = 1; number <= events; ++number) {
        add(now - 5);
        ASSERT_EQ(m_head->countEvents(10), number);
    }
    m_clock.set(now + 5);
    add(now);
    EXPECT_EQ(m_head->countEvents(10), 1);
    EXPECT_THAT(times(), ElementsAre(now));
}

class TimestampText : public TimestampChain {
protected:
    const Timestamp* addText(const char* text) { return new Timestamp(&m_head, text); }

    TimeZone m_zone{"UTC0"};
};

TEST_F(TimestampText, JoinsTheChainAtItsTime) {
    addText("1000101000000000");
    addText("1061005070309000");
    EXPECT_THAT(times(), ElementsAre(1160031789, 946684800));
}

TEST_F(TimestampText, TheFirstThreeDigitsAreTheYearsSince1900) {
    addText("0991231235959000");
    EXPECT_THAT(times(), ElementsAre(946684799));
}

TEST_F(TimestampText, IsReadAsLocalTime) {
    const TimeZone zone("XYZ5");
    addText("1000101000000000");
    EXPECT_THAT(times(), ElementsAre(946684800 + 5 * 3600));
}

TEST_F(TimestampText, TheSystemDecidesOnDaylightSaving) {
    const TimeZone zone("XYZ5XDT,M3.2.0,M11.1.0");
    addText("1060105070309000");
    addText("1060705070309000");
    EXPECT_THAT(times(), ElementsAre(1152097389, 1136462589));
}

TEST_F(TimestampText, TheEpochIsATime) {
    addText("0700101000000000");
    EXPECT_THAT(times(), ElementsAre(0));
}

TEST_F(TimestampText, NeedsNoTerminator) {
    const std::unique_ptr<char[]> column(new char[16]); // a read of a 17th byte shows under ASan
    std::copy_n("1000101000000000", 16, column.get());
    addText(column.get());
    EXPECT_THAT(times(), ElementsAre(946684800));
}

TEST_F(TimestampText, OutOfRangePartsAreNormalised) {
    RecordingTrace trace(TRC1_ERROR);
    addText("1061324120000000"); // month 13 of 2006, day 24
    EXPECT_THAT(times(), ElementsAre(1169640000));
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(TimestampText, TracesItsPiecesInTheFineClass) {
    {
        RecordingTrace trace(TRC1_FINE);
        addText("1061005070309000");
        EXPECT_THAT(trace.messages(),
                    ElementsAre("timestamp passed: sec 09, min 03, hour 07, mday 05, mon 10, "
                                "year 06, century 1"));
    }
    {
        RecordingTrace trace(~TRC1_FINE);
        addText("1061005070309000");
        EXPECT_THAT(trace.messages(), IsEmpty());
    }
}

TEST_F(TimestampText, ATimeBeforeTheEpochStaysOutsideTheChain) {
    add(now);
    RecordingTrace trace(TRC1_ERROR);
    const std::unique_ptr<const Timestamp> outside(addText("0691231235959000"));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error converting timestamp 0691231235959000 to UNIX time format. "
                            "errno = 0; Success, m_eventTime -1"));
    EXPECT_THAT(times(), ElementsAre(now));
    EXPECT_THAT(timesOf(outside.get()), ElementsAre(-1));
    EXPECT_TRUE(outside->isHeadOfChain());
}

TEST_F(TimestampText, ABlankStampStaysOutsideTheChain) {
    RecordingTrace trace(TRC1_ERROR);
    const std::unique_ptr<const Timestamp> outside(addText("                "));
    EXPECT_EQ(m_head, nullptr);
    EXPECT_LT(outside->eventTime(), 0);
    ASSERT_EQ(trace.messages().size(), 1U);
    EXPECT_THAT(trace.messages().front(),
                testing::StartsWith("Error converting timestamp                  to UNIX time "
                                    "format. errno = 0; Success, m_eventTime "));
}

TEST_F(TimestampText, TheErrorIsSilentWhenItsClassIsOff) {
    RecordingTrace trace(~(TRC1_ERROR | TRC1_FINE));
    const std::unique_ptr<const Timestamp> outside(addText("0691231235959000"));
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(TimestampText, DeletingAnElementOutsideTheChainLeavesTheChain) {
    add(now);
    delete addText("0691231235959000");
    EXPECT_THAT(times(), ElementsAre(now));
}

} // namespace
