#include "host/events/LogRhythm.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <vector>

using namespace zrm::host;

namespace {

using std::chrono::hours;
using std::chrono::minutes;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t minute = 60;
constexpr std::int64_t hour = 60 * minute;
constexpr std::int64_t week = 7 * 24 * hour;
constexpr std::int64_t start = 2900 * week; // in 2025

/// An entry every `every` seconds between two times.
void write(LogRhythm& rhythm, std::int64_t from, std::int64_t to, std::int64_t every) {
    for (std::int64_t time = from; time + every <= to; time += every) {
        rhythm.add(time, time + every);
    }
}

TEST(LogRhythm, LearnsForAWeek) {
    LogRhythm rhythm;
    EXPECT_EQ(rhythm.limitAt(start), std::nullopt);
    write(rhythm, start, start + week, 10 * minute);
    EXPECT_EQ(rhythm.limitAt(start + week - hour), std::nullopt);
    EXPECT_EQ(rhythm.limitAt(start + week + minute), minutes(20));
}

TEST(LogRhythm, NoLimitIsShorterThanTenMinutes) {
    LogRhythm rhythm;
    write(rhythm, start, start + week, minute);
    EXPECT_EQ(rhythm.limitAt(start + week), minutes(10));
}

TEST(LogRhythm, ASilenceBelongsToEveryHourThatItTouches) {
    LogRhythm rhythm;
    // Every day at half past two.
    for (std::int64_t day = 0; day < 7; ++day) {
        const std::int64_t time = start + day * 24 * hour + 2 * hour + 30 * minute;
        rhythm.add(time - 24 * hour, time);
    }
    EXPECT_EQ(rhythm.limitAt(start + week + 12 * hour), hours(48));
    EXPECT_EQ(rhythm.limitAt(start + week + 2 * hour), hours(48));
}

TEST(LogRhythm, NightsAreNotDays) {
    LogRhythm rhythm;
    for (std::int64_t day = 0; day < 8; ++day) {
        const std::int64_t midnight = start + day * 24 * hour;
        rhythm.add(midnight - 4 * hour, midnight + 8 * hour);             // from 20:00 to 8:00
        write(rhythm, midnight + 8 * hour, midnight + 20 * hour, minute); // by day
    }
    EXPECT_EQ(rhythm.limitAt(start + week + 12 * hour), minutes(10));
    EXPECT_EQ(rhythm.limitAt(start + week + 3 * hour), hours(24));
    EXPECT_EQ(rhythm.limitAt(start + week + 7 * hour + 59 * minute), hours(24));
    EXPECT_EQ(rhythm.limitAt(start + week + 9 * hour + 59 * minute), hours(24))
        << "the hour beside it had a silence";
    EXPECT_EQ(rhythm.limitAt(start + week + 10 * hour), minutes(10));
}

TEST(LogRhythm, OfThreeWeeksTheWorstDoesNotCount) {
    LogRhythm rhythm;
    write(rhythm, start, start + week, minute);
    write(rhythm, start + week, start + week + 3 * hour, minute);
    rhythm.add(start + week + 3 * hour, start + week + 9 * hour); // a failure
    write(rhythm, start + week + 9 * hour, start + 2 * week, minute);
    EXPECT_EQ(rhythm.limitAt(start + 2 * week + 6 * hour), hours(12)) << "of two weeks";
    write(rhythm, start + 2 * week, start + 3 * week, minute);
    EXPECT_EQ(rhythm.limitAt(start + 3 * week + 6 * hour), minutes(10));
}

TEST(LogRhythm, WeeksLongAgoAreForgotten) {
    LogRhythm rhythm;
    rhythm.add(start, start + 6 * hour);
    write(rhythm, start + 6 * hour, start + 5 * week + 6 * hour, 5 * minute);
    EXPECT_EQ(rhythm.limitAt(start + 5 * week + 3 * hour), minutes(10));
    write(rhythm, start + 5 * week + 6 * hour, start + 7 * week, 5 * minute);
    EXPECT_EQ(rhythm.limitAt(start + 7 * week), minutes(10));
    rhythm.takeChanged();
    rhythm.add(start, start + 40 * week); // one silence longer than all that is kept
    EXPECT_EQ(rhythm.takeChanged().size(), 5U * 7 * 24 + 1);
}

TEST(LogRhythm, AnHourThatNobodyWatchedHasNoLimit) {
    LogRhythm rhythm;
    write(rhythm, start, start + hour, minute);
    write(rhythm, start + 100 * hour, start + 110 * hour, minute);
    EXPECT_EQ(rhythm.limitAt(start + week + 50 * hour), std::nullopt);
    EXPECT_EQ(rhythm.limitAt(start + week + 105 * hour), minutes(10));
}

TEST(LogRhythm, GoesOnWithWhatWasKept) {
    LogRhythm first;
    write(first, start, start + week, 20 * minute);
    const std::vector<SilentHour> kept = first.takeChanged();
    EXPECT_EQ(kept.size(), 7U * 24 + 1);
    EXPECT_THAT(first.takeChanged(), IsEmpty());
    const LogRhythm next(kept);
    EXPECT_EQ(next.limitAt(start + week + hour), minutes(40));
}

TEST(LogRhythm, AnHourIsTheLongestOfItsSilences) {
    LogRhythm rhythm;
    rhythm.add(start, start + 5 * minute);
    rhythm.add(start + 5 * minute, start + 20 * minute);
    rhythm.add(start + 20 * minute, start + 21 * minute);
    EXPECT_THAT(rhythm.takeChanged(), ElementsAre(SilentHour{start / hour, 15 * minute}));
    rhythm.add(start + 30 * minute, start + 29 * minute); // a clock that was set back
    EXPECT_THAT(rhythm.takeChanged(), IsEmpty());
}

} // namespace
