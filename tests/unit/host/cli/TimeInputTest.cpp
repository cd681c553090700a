#include "host/cli/TimeInput.h"

#include "support/TimeZone.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

constexpr std::time_t now = 1795158189; // 2026-11-20T07:03:09Z

} // namespace

TEST(TimeInputTest, TimesBeforeNow) {
    const TimeZone zone("UTC");
    EXPECT_EQ(TimeInput::toIso("now", now), "2026-11-20T07:03:09Z");
    EXPECT_EQ(TimeInput::toIso("-9s", now), "2026-11-20T07:03:00Z");
    EXPECT_EQ(TimeInput::toIso("-3m", now), "2026-11-20T07:00:09Z");
    EXPECT_EQ(TimeInput::toIso("-2h", now), "2026-11-20T05:03:09Z");
    EXPECT_EQ(TimeInput::toIso("-1d", now), "2026-11-19T07:03:09Z");
    EXPECT_EQ(TimeInput::toIso("-1w", now), "2026-11-13T07:03:09Z");
}

TEST(TimeInputTest, DaysAndClockTimesAreLocal) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    EXPECT_EQ(TimeInput::toIso("today", now), "2026-11-19T23:00:00Z");
    EXPECT_EQ(TimeInput::toIso("yesterday", now), "2026-11-18T23:00:00Z");
    EXPECT_EQ(TimeInput::toIso("07:30", now), "2026-11-20T06:30:00Z");
    EXPECT_EQ(TimeInput::toIso("23:59:58", now), "2026-11-20T22:59:58Z");
}

TEST(TimeInputTest, YesterdayBeginsAtItsOwnMidnightWhenTheClocksChange) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    constexpr std::time_t afterTheChange = 1792944000; // 2026-10-25T16:00:00Z, winter time
    EXPECT_EQ(TimeInput::toIso("today", afterTheChange), "2026-10-24T22:00:00Z");
}

TEST(TimeInputTest, FormsThatTheAgentReadsAreUnchanged) {
    for (const char* const text :
         {"2026-11-20", "2026-11-20T07:03:09", "2026-11-20T07:03:09+01:00", "1261120070309000"}) {
        EXPECT_EQ(TimeInput::toIso(text, now), text);
    }
}

TEST(TimeInputTest, RefusesEverythingElse) {
    for (const char* const text :
         {"", "-", "-h", "-2", "-2y", "-2hh", "--2h", "2h", "tomorrow", "24:00", "07:60", "7:30",
          "07:30:", "07:30:60", "07-30", "-99999999999h", "-10000000w", "2026-13-01"}) {
        EXPECT_EQ(TimeInput::toIso(text, now), std::nullopt) << text;
    }
}
