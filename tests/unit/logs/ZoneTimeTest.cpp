#include "logs/ZoneTime.h"

#include "logs/FollowSettings.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <string_view>

using namespace zrm;

namespace {

constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t springForward = 1143334800; // 26 March 2006, 01:00:00 UTC
constexpr std::int64_t fallBack = 1162083600;      // 29 October 2006, 01:00:00 UTC

const std::vector<ZoneOffset> berlin = {{always, 3600}, {springForward, 7200}, {fallBack, 3600}};

TEST(ZoneTime, SecondsAndTimesAreOneToOne) {
    for (const std::int64_t seconds : {std::int64_t{0}, std::int64_t{-1}, std::int64_t{951782399},
                                       std::int64_t{951782400}, std::int64_t{4102444800}}) {
        EXPECT_EQ(CivilTime::of(seconds).seconds(), seconds);
    }
    const CivilTime leapDay = CivilTime::of(951782400);
    EXPECT_EQ(leapDay.month, 2U);
    EXPECT_EQ(leapDay.day, 29U);
}

TEST(ZoneTime, TakesAnOffsetFromTheBeginningOfAText) {
    const auto taken = [](std::string_view text) {
        const std::optional<std::int32_t> offset = ZoneTime::takeOffset(text);
        return (offset ? std::to_string(*offset) : "none") + '|' + std::string(text);
    };
    EXPECT_EQ(taken("Z rest"), "0| rest");
    EXPECT_EQ(taken("+02:00x"), "7200|x");
    EXPECT_EQ(taken("-0330"), "-12600|");
    EXPECT_EQ(taken("+05"), "18000|");
    for (const char* const text : {"", "UTC", "+", "+2", "+24:00", "+01:60", "+01:", "-0a"}) {
        EXPECT_EQ(taken(text), "none|" + std::string(text));
    }
}

TEST(ZoneTime, ConvertsToUtcAcrossClockChanges) {
    EXPECT_EQ(ZoneTime::toUtc(springForward + 3600 - 1, berlin), springForward - 1);
    EXPECT_EQ(ZoneTime::toUtc(springForward + 7200, berlin), springForward);
    EXPECT_EQ(ZoneTime::toUtc(fallBack + 3600 - 1 + 3600, berlin), fallBack - 1);
    EXPECT_EQ(ZoneTime::toUtc(fallBack + 7200, berlin), fallBack + 3600);
    EXPECT_EQ(ZoneTime::toUtc(0, berlin), -3600);
}

TEST(ZoneTime, ConvertsToLocalTimeAcrossClockChanges) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    for (const std::int64_t time : {springForward, fallBack}) {
        const std::int64_t before = time == springForward ? 3600 : 7200;
        EXPECT_EQ(ZoneTime::toLocal(time - 1), time - 1 + before);
        EXPECT_EQ(ZoneTime::toLocal(time), time + 10'800 - before);
        EXPECT_EQ(ZoneTime::toLocal(time - 1), time - 1 + before);
    }
}

TEST(ZoneTime, AStampShowsOnlyTheYearsThatItHasRoomFor) {
    char stamp[17] = "unchanged       ";
    EXPECT_FALSE(ZoneTime::writeStamp(CivilTime{1899, 12, 31, 0, 0, 0}.seconds(), stamp));
    EXPECT_FALSE(ZoneTime::writeStamp(CivilTime{2900, 1, 1, 0, 0, 0}.seconds(), stamp));
    EXPECT_EQ(std::string(stamp), "unchanged       ");
    EXPECT_TRUE(ZoneTime::writeStamp(CivilTime{2026, 11, 22, 3, 4, 5}.seconds(), stamp));
    EXPECT_EQ(std::string(stamp), "1261122030405000");
    EXPECT_EQ(ZoneTime::ofStamp(stamp).seconds(), (CivilTime{2026, 11, 22, 3, 4, 5}.seconds()));
}

} // namespace
