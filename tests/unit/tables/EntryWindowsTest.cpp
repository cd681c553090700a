#include "tables/EntryWindows.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;

constexpr std::int64_t noon = 1'800'000'000;
constexpr std::int64_t hour = 3600;
constexpr std::int64_t day = 24 * hour;
constexpr std::int64_t year = 365 * day;

/// The counts of entries at these times, in this order.
std::vector<std::int64_t> counts(const std::vector<std::int64_t>& times, std::int64_t period = 60) {
    EntryWindows windows;
    std::vector<std::int64_t> found;
    for (const std::int64_t time : times) {
        found.push_back(windows.add(noon + time, period));
    }
    return found;
}

TEST(EntryWindows, ThePeriodEndsWithTheNewestEntryAndExcludesItsBeginning) {
    EXPECT_THAT(counts({0, 0, 30, 59, 60, 61, 1000, 1001}), ElementsAre(1, 2, 3, 4, 3, 4, 1, 2));
}

TEST(EntryWindows, ALateEntryCountsAndHidesNothing) {
    EXPECT_THAT(counts({0, 50, 20, 51}), ElementsAre(1, 2, 3, 4));
    // Its own period has more than that of the newest entry.
    EXPECT_THAT(counts({0, 1, 2, 58, 90, 59}), ElementsAre(1, 2, 3, 4, 2, 5));
}

TEST(EntryWindows, AnOldEntryHidesNothing) {
    EXPECT_THAT(counts({0, 10, -5000, 20, 30}), ElementsAre(1, 2, 1, 3, 4));
}

TEST(EntryWindows, ATimeOfTheFutureHidesNothing) {
    EXPECT_THAT(counts({0, 10, year, 20, 30, year + 1}), ElementsAre(1, 2, 1, 3, 4, 2));
}

TEST(EntryWindows, AClockThatIsSetBackIsFollowedAtOnce) {
    EXPECT_THAT(counts({0, 10, 20, -hour, -hour + 1, -hour + 2}), ElementsAre(1, 2, 3, 1, 2, 3));
}

TEST(EntryWindows, EntriesOfTheSameTimeCountOnceWhereGroupsMeet) {
    // Up to the time from before the clock was set back, and past it.
    EXPECT_THAT(counts({100, 0, 30, 59, 70, 99, 100, 101}), ElementsAre(1, 1, 2, 3, 3, 4, 5, 6));
}

TEST(EntryWindows, ALogThatIsCaughtUpWithCountsWhatItHas) {
    EntryWindows windows;
    for (std::int64_t second = 0; second < 10 * 60; ++second) {
        EXPECT_EQ(windows.add(noon + second, 60), std::min<std::int64_t>(second + 1, 60));
        EXPECT_GE(windows.add(noon + hour + second, 60), std::min<std::int64_t>(second + 1, 60));
    }
}

TEST(EntryWindows, OnlySoManyGroupsAreKept) {
    EntryWindows windows;
    for (std::size_t group = 0; group <= EntryWindows::mostGroups; ++group) {
        EXPECT_EQ(windows.add(noon + static_cast<std::int64_t>(group) * hour, 60), 1);
    }
    EXPECT_EQ(windows.add(noon + hour, 60), 2);
    EXPECT_EQ(windows.add(noon, 60), 1) << "the group used least recently was given up";
}

TEST(EntryWindows, AnyNumberOfEntriesInOneSecondIsCounted) {
    EntryWindows windows;
    std::int64_t last = 0;
    for (int entry = 0; entry < 300'000; ++entry) {
        last = windows.add(noon, day);
    }
    EXPECT_EQ(last, 300'000);
}

TEST(EntryWindows, APeriodWithTooManySecondsIsCountedMoreCoarsely) {
    EntryWindows windows;
    for (std::int64_t second = 0; second < 3 * day; ++second) {
        const std::int64_t exact = std::min<std::int64_t>(second + 1, day);
        const std::int64_t found = windows.add(noon + second, day);
        ASSERT_GE(found, exact) << second;
        ASSERT_LE(found, exact + day / 2048) << second;
    }
    // Late entries too.
    const std::int64_t before = windows.add(noon + 3 * day - 1, day);
    const std::int64_t late = windows.add(noon + 2 * day + hour, day);
    EXPECT_GT(late, before);
    EXPECT_LE(late, before + 1 + day / 2048);
}

TEST(EntryWindows, ExtremeTimesAndPeriodsAreCounted) {
    EntryWindows windows;
    constexpr std::int64_t farthest = std::int64_t{1} << 40;
    EXPECT_EQ(windows.add(-farthest, INT64_MAX), 1);
    EXPECT_EQ(windows.add(farthest, INT64_MAX), 2);
    EXPECT_EQ(windows.add(0, INT64_MAX), 3);
}

TEST(EntryWindows, TheFirstOfTheCountedEntriesIsKnown) {
    EntryWindows windows;
    for (const std::int64_t time : {0, 1, 2, 58, 90}) {
        windows.add(noon + time, 60);
    }
    EXPECT_EQ(windows.counted(noon + 90, 60).entries, 2);
    EXPECT_EQ(windows.counted(noon + 90, 60).first, noon + 58);
    EXPECT_EQ(windows.add(noon + 59, 60), 5);
    EXPECT_EQ(windows.counted(noon + 59, 60).entries, 5);
    EXPECT_EQ(windows.counted(noon + 59, 60).first, noon) << "its own period has more";
}

TEST(EntryWindows, IsOverWhenNothingWouldBeCountedWithIt) {
    EntryWindows windows;
    EXPECT_TRUE(windows.isOver(noon, 60));
    windows.add(noon, 60);
    EXPECT_FALSE(windows.isOver(noon + 59, 60));
    EXPECT_TRUE(windows.isOver(noon + 60, 60));
    EXPECT_FALSE(windows.isOver(noon - 60, 60)) << "a later entry may still come";
}

TEST(EntryWindows, FewerSecondsAreKeptOnRequest) {
    EntryWindows windows(128);
    for (std::int64_t second = 0; second < 10 * 60; ++second) {
        EXPECT_EQ(windows.add(noon + second, 60), std::min<std::int64_t>(second + 1, 60));
    }
    for (std::int64_t second = 0; second < 2 * hour; ++second) {
        const std::int64_t found = windows.add(noon + day + second, hour);
        const std::int64_t exact = std::min<std::int64_t>(second + 1, hour);
        ASSERT_GE(found, exact);
        ASSERT_LE(found, exact + hour / 16);
    }
}

TEST(EntryWindows, ForgottenSecondsTakeNoRoomFromOthers) {
    EntryWindows windows(5);
    for (const std::int64_t time : {0, 5, 12, 13, 15, 20}) {
        windows.add(noon + time, 10);
    }
    EXPECT_EQ(windows.counted(noon + 20, 10).entries, 4);
    EXPECT_EQ(windows.counted(noon + 20, 10).first, noon + 12) << "told apart from the next one";
}

/// The same by plain lists of times.
class PlainWindows {
public:
    std::int64_t add(std::int64_t time, std::int64_t period) {
        ++m_additions;
        std::int64_t most = 0;
        std::vector<std::size_t> met;
        for (std::size_t index = 0; index < m_groups.size(); ++index) {
            Group& group = m_groups[index];
            if (std::abs(time - group.newest) >= period) {
                continue;
            }
            group.times.push_back(time);
            group.newest = std::max(group.newest, time);
            group.used = m_additions;
            most =
                std::max({most, within(group, time, period), within(group, group.newest, period)});
            if (group.newest == time) {
                met.push_back(index);
            }
        }
        if (most == 0) {
            Group group{{time}, time, m_additions};
            if (m_groups.size() == EntryWindows::mostGroups) {
                *std::min_element(m_groups.begin(), m_groups.end(),
                                  [](const Group& a, const Group& b) { return a.used < b.used; }) =
                    std::move(group);
            } else {
                m_groups.push_back(std::move(group));
            }
            return 1;
        }
        // Groups that are equal from now on: the first with most is kept.
        for (std::size_t other = 1; other < met.size(); ++other) {
            Group& kept = m_groups[met.front()];
            Group& group = m_groups[met[other]];
            if (within(group, time, period) > within(kept, time, period)) {
                std::swap(kept, group);
            }
        }
        for (; met.size() > 1; met.pop_back()) {
            m_groups.erase(m_groups.begin() + static_cast<std::ptrdiff_t>(met.back()));
        }
        return most;
    }

private:
    struct Group {
        std::vector<std::int64_t> times;
        std::int64_t newest;
        std::uint64_t used;
    };
    static std::int64_t within(const Group& group, std::int64_t end, std::int64_t period) {
        // What is older than two periods is forgotten.
        return std::count_if(group.times.begin(), group.times.end(),
                             [&](std::int64_t time) { return time > end - period && time <= end; });
    }

    std::vector<Group> m_groups;
    std::uint64_t m_additions = 0;
};

class EntryWindowsModel : public testing::TestWithParam<unsigned> {};

TEST_P(EntryWindowsModel, AgreesWithPlainListsOfTimes) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned seed =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
    std::mt19937 random(seed + GetParam());
    const auto below = [&random](std::int64_t limit) {
        return static_cast<std::int64_t>(random() % static_cast<std::uint64_t>(limit));
    };
    for (int round = 0; round < 40 && !HasFailure(); ++round) {
        EntryWindows windows;
        PlainWindows plain;
        const std::int64_t period = std::vector<std::int64_t>{1, 2, 10, 60, 600}[random() % 5];
        std::int64_t now = noon;
        for (int entry = 0; entry < 500 && !HasFailure(); ++entry) {
            std::int64_t time = now;
            switch (random() % 20) {
            case 0: // a pause
                now += below(3 * period);
                break;
            case 1: // the clock is set
                now += below(20 * period) - 10 * period;
                break;
            case 2: // a time from far away
                time = now + below(100 * period) - 50 * period;
                break;
            case 3:
            case 4:
            case 5: // a late line
                time = now - below(2 * period);
                break;
            default:
                now += below(std::max<std::int64_t>(period / 8, 2));
                time = now;
            }
            ASSERT_EQ(windows.add(time, period), plain.add(time, period))
                << "period " << period << ", entry " << entry << " of round " << round;
        }
    }
}

INSTANTIATE_TEST_SUITE_P(Seeds, EntryWindowsModel, testing::Range(0U, 8U));

} // namespace
