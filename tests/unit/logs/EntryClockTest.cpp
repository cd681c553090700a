#include "logs/EntryClock.h"

#include "logs/FollowSettings.h"
#include "logs/ZoneTime.h"
#include "support/Faults.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <string>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;

constexpr std::int64_t springForward = 1143334800; // 26 March 2006, 01:00:00 UTC
constexpr std::int64_t fallBack = 1162083600;      // 29 October 2006, 01:00:00 UTC
constexpr std::int64_t later = fallBack + 30 * 86'400;
constexpr const char* berlin = "CET-1CEST,M3.5.0,M10.5.0/3";

std::string stampOf(const CivilTime& time) {
    char stamp[16];
    EXPECT_TRUE(ZoneTime::writeStamp(time.seconds(), stamp));
    return {stamp, sizeof stamp};
}

class EntryClockTest : public testing::Test {
protected:
    /// The time of an entry that says no more than its column.
    std::int64_t next(const CivilTime& time) {
        std::string stamp = stampOf(time);
        return m_clock.next({}, stamp.data());
    }
    /// 29 October 2006, relative to the change.
    std::int64_t autumn(unsigned hour, unsigned minute, unsigned second = 0) {
        return next({2006, 10, 29, hour, minute, second}) - fallBack;
    }

    TimeZone m_zone{berlin};
    FakeClock m_now{later};
    EntryClock m_clock{nullptr};
};

TEST_F(EntryClockTest, LocalTimesAreConverted) {
    EXPECT_EQ(next({2006, 3, 26, 1, 59, 59}), springForward - 1);
    EXPECT_EQ(next({2006, 3, 26, 3, 0, 0}), springForward);
    EXPECT_EQ(next({2006, 1, 1, 0, 0, 0}), 1136070000);
    EXPECT_TRUE(m_clock.hadTime());
}

TEST_F(EntryClockTest, ATimeThatTheClockSkipsIsTakenAsNotChanged) {
    EXPECT_EQ(next({2006, 3, 26, 2, 30, 0}), springForward + 1800);
}

TEST_F(EntryClockTest, TheSecondPassOfTheRepeatedHourComesAfterTheFirst) {
    EXPECT_EQ(autumn(1, 59, 59), -3601);
    EXPECT_EQ(autumn(2, 0, 1), -3599);
    EXPECT_EQ(autumn(2, 30), -1800);
    EXPECT_EQ(autumn(2, 29, 58), -1802) << "a late line";
    EXPECT_EQ(autumn(2, 59, 59), -1);
    EXPECT_EQ(autumn(2, 0, 0), 0);
    EXPECT_EQ(autumn(2, 30), 1800);
    EXPECT_EQ(autumn(2, 59, 59), 3599);
    EXPECT_EQ(autumn(3, 0, 0), 3600);
}

TEST_F(EntryClockTest, ReadingBackwardsTheSecondPassComesFirst) {
    EntryClock clock(nullptr, EntryClock::Reading::backward);
    const auto autumn = [&clock](unsigned hour, unsigned minute, unsigned second = 0) {
        std::string stamp = stampOf({2006, 10, 29, hour, minute, second});
        return clock.next({}, stamp.data()) - fallBack;
    };
    EXPECT_EQ(autumn(3, 0, 0), 3600);
    EXPECT_EQ(autumn(2, 59, 0), 3540);
    EXPECT_EQ(autumn(2, 30), 1800);
    EXPECT_EQ(autumn(2, 30, 2), 1802) << "a late line";
    EXPECT_EQ(autumn(2, 0, 0), 0);
    EXPECT_EQ(autumn(2, 59, 59), -1);
    EXPECT_EQ(autumn(2, 30), -1800);
}

TEST_F(EntryClockTest, AnEntryThatHasJustBeenWrittenIsOfNow) {
    m_now.set(fallBack - 1800);
    EXPECT_EQ(autumn(2, 30), -1800);
    EXPECT_EQ(autumn(2, 40), -1200) << "ahead of the clock, which cannot be the second pass";
    m_now.set(fallBack + 1805);
    EXPECT_EQ(autumn(2, 30), 1800) << "nothing was written in between";
}

TEST_F(EntryClockTest, ATimeWithAZoneIsExact) {
    std::string stamp = stampOf({2006, 10, 29, 2, 30, 0});
    EXPECT_EQ(m_clock.next({EntryMoment::Kind::instant, fallBack + 1800}, stamp.data()),
              fallBack + 1800);
    EXPECT_EQ(m_clock.next({EntryMoment::Kind::instant, fallBack - 1800}, stamp.data()),
              fallBack - 1800);
    EXPECT_EQ(stamp, stampOf({2006, 10, 29, 2, 30, 0}));
    constexpr std::int64_t most = std::numeric_limits<std::int64_t>::max();
    EXPECT_EQ(m_clock.next({EntryMoment::Kind::instant, most}, stamp.data()),
              std::int64_t{1} << 40);
}

TEST_F(EntryClockTest, AnEntryWithoutATimeHasThatOfTheOneBefore) {
    std::string none(16, ' ');
    EXPECT_EQ(m_clock.next({}, none.data()), later) << "the clock's, if there is none before";
    EXPECT_FALSE(m_clock.hadTime());
    EXPECT_EQ(autumn(3, 0, 0), 3600);
    EXPECT_TRUE(m_clock.hadTime());
    EXPECT_EQ(m_clock.next({}, none.data()), fallBack + 3600);
    EXPECT_EQ(none, std::string(16, ' '));
    std::string invalid = "10610290300x0000";
    EXPECT_EQ(m_clock.next({}, invalid.data()), fallBack + 3600);
    EXPECT_FALSE(m_clock.hadTime());
    EXPECT_FALSE(m_clock.rangeOf({}, invalid.data()));
}

TEST_F(EntryClockTest, TimesOfOneMinuteAreThoseOfAnyOther) {
    std::vector<CivilTime> times;
    for (const unsigned hour : {0U, 1U, 3U, 4U, 23U}) {
        for (const unsigned second : {9U, 8U, 8U, 59U, 60U, 0U, 30U}) {
            times.push_back({2006, 10, 29, hour, 14, second});
            times.push_back({2006, 3, 26, hour, 14, second});
            times.push_back({2006, 3, 26, hour, 15, second});
        }
    }
    for (std::size_t step : {1U, 3U}) { // alternating and one after the other
        for (std::size_t first = 0; first < step; ++first) {
            for (std::size_t at = first; at < times.size(); at += step) {
                EntryClock alone(nullptr);
                std::string stamp = stampOf(times[at]);
                EXPECT_EQ(next(times[at]), alone.next({}, stamp.data())) << stamp;
            }
        }
    }
}

TEST_F(EntryClockTest, AMinuteThatIsRepeatedIsNotRemembered) {
    EXPECT_EQ(autumn(2, 30, 10), -1790);
    EXPECT_EQ(autumn(2, 30, 11), -1789);
    EXPECT_EQ(autumn(3, 0, 0), 3600);
    EXPECT_EQ(autumn(2, 59, 50), 3590);
    EXPECT_EQ(autumn(2, 59, 51), 3591);
}

TEST_F(EntryClockTest, AStampThatIsNotATimeIsNotOfTheMinuteBefore) {
    EXPECT_EQ(autumn(3, 0, 0), 3600);
    std::string other = "10610290300";
    for (const char* const end : {"x0000", "0x000", ":0000", "0:000", "00 00", "0000 "}) {
        std::string stamp = other + end;
        EXPECT_EQ(m_clock.next({}, stamp.data()), fallBack + 3600) << stamp;
        EXPECT_FALSE(m_clock.hadTime()) << stamp;
    }
}

TEST_F(EntryClockTest, RangesHoldBothPasses) {
    const auto range = m_clock.rangeOf({}, stampOf({2006, 10, 29, 2, 30, 0}).data());
    EXPECT_EQ(range->earliest, fallBack - 1800);
    EXPECT_EQ(range->latest, fallBack + 1800);
}

TEST(EntryClockZone, TimesOfAConfiguredZoneAreToldApartAndShownInLocalTime) {
    const TimeZone utc("UTC0");
    const FakeClock now(later);
    FollowSettings settings;
    settings.zone = {
        {std::numeric_limits<std::int64_t>::min(), 3600}, {springForward, 7200}, {fallBack, 3600}};
    EntryClock clock(std::make_shared<const FollowSettings>(settings));
    std::vector<std::string> shown;
    for (const CivilTime time : {CivilTime{2006, 10, 29, 2, 30, 0},
                                 {2006, 10, 29, 2, 59, 59},
                                 {2006, 10, 29, 2, 0, 0},
                                 {2006, 10, 29, 2, 30, 0}}) {
        // The column has the first of the two, as formatting makes it.
        std::string stamp = stampOf(CivilTime::of(time.seconds() - 7200));
        clock.next({EntryMoment::Kind::zoned, time.seconds()}, stamp.data());
        shown.push_back(stamp.substr(7, 6));
    }
    EXPECT_THAT(shown, ElementsAre("003000", "005959", "010000", "013000"));
}

} // namespace
