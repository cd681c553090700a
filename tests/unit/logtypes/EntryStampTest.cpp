// ENTRYTIME of entries whose times a format reads: the minute that is remembered.

#include "logtypes/EntryStamp.h"

#include "logs/FollowSettings.h"
#include "support/Faults.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <ctime>
#include <memory>
#include <random>
#include <string>

using namespace zrm;

namespace {

EntryColumns at(const CivilTime& time, std::optional<std::int32_t> offset = std::nullopt) {
    EntryColumns entry;
    entry.hasTime = true;
    entry.hasYear = true;
    entry.time = time;
    entry.offset = offset;
    return entry;
}

struct Written {
    std::string stamp;
    EntryMoment::Kind kind;
    std::int64_t seconds;

    bool operator==(const Written&) const = default;
};

Written writeWith(EntryStamp& stamp, const EntryColumns& entry, const char* newest = nullptr) {
    char out[17] = "unset           ";
    lastEntryMoment = {};
    const bool isWritten = stamp.write(entry, newest, out);
    const auto [kind, seconds] = lastEntryMoment;
    // What a column alone shows has no seconds of its own.
    return {isWritten ? std::string(out, 16) : "", kind,
            kind == EntryMoment::Kind::column ? 0 : seconds};
}

class EntryStampTest : public testing::TestWithParam<const char*> {
protected:
    const TimeZone zone{"CET-1CEST,M3.5.0,M10.5.0/3"};
};

TEST_F(EntryStampTest, WhatIsRememberedIsWhatAFreshObjectWrites) {
    auto settings = std::make_shared<FollowSettings>();
    const auto zoned = std::make_shared<FollowSettings>();
    zoned->zone = {{INT64_MIN, 19'800}, {1'793'000'017, 20'700}};
    constexpr std::optional<std::int32_t> offsets[] = {std::nullopt, 0, 3600, -12'345};
    std::mt19937 random(20261122);
    for (const std::shared_ptr<const FollowSettings>& follow :
         {std::shared_ptr<const FollowSettings>(settings),
          std::shared_ptr<const FollowSettings>(zoned)}) {
        EntryStamp remembering(follow);
        std::int64_t civil = 1'793'000'000; // some hours before the clock is set back
        for (int entry = 0; entry < 20'000; ++entry) {
            civil += static_cast<std::int64_t>(random() % 40) - 15;
            CivilTime time = CivilTime::of(civil);
            time.second = random() % 50 == 0 ? 60 : time.second;
            const EntryColumns columns = at(time, offsets[random() % 8 < 6 ? 2 : random() % 4]);
            EntryStamp fresh(follow);
            ASSERT_EQ(writeWith(remembering, columns), writeWith(fresh, columns)) << entry;
        }
    }
}

TEST_F(EntryStampTest, ATimeOfDayIsOfTheLatestDayThatItCanBe) {
    const auto settings = std::make_shared<FollowSettings>();
    EntryStamp stamp(settings);
    const auto stampOf = [&](CivilTime time, const char* newest,
                             std::optional<std::int32_t> offset = std::nullopt) {
        EntryColumns entry = at(time, offset);
        entry.hasTime = entry.hasYear = false;
        entry.hasTimeOfDay = true;
        char out[17] = "unset           ";
        return stamp.writeTimeOfDay(entry, newest, out) ? std::string(out, 16) : "";
    };
    const CivilTime evening{2000, 1, 1, 23, 59, 59};
    const CivilTime night{2000, 1, 1, 0, 0, 1};
    EXPECT_EQ(stampOf(evening, "1261123000000000"), "1261122235959000") << "just before midnight";
    EXPECT_EQ(stampOf(evening, "1261123235959000"), "1261123235959000");
    EXPECT_EQ(stampOf(evening, "1261123120000000"), "1261122235959000") << "not in the future";
    EXPECT_EQ(stampOf(night, "1261123120000000"), "1261123000001000");
    EXPECT_EQ(stampOf(night, "1261122233000000"), "1261123000001000") << "a little out of order";
    EXPECT_EQ(stampOf(night, "1261231233000000"), "1270101000001000");
    EXPECT_EQ(stampOf(evening, "1270101001500000"), "1261231235959000");
    // In Auckland it is tomorrow, in Honolulu yesterday.
    EXPECT_EQ(stampOf(night, "1261123120500000", 13 * 3600), "1261123120001000");
    EXPECT_EQ(stampOf(evening, "1261123120500000", 13 * 3600), "1261123115959000");
    EXPECT_EQ(stampOf(evening, "1261123120500000", -10 * 3600), "1261123105959000");
    EXPECT_EQ(stampOf(night, "1261123120500000", -10 * 3600), "1261123110001000");
    // The night in which the clock is set back.
    EXPECT_EQ(stampOf({2000, 1, 1, 3, 30, 0}, "1261025024500000"), "1261025033000000");
    EXPECT_EQ(stampOf({2000, 1, 1, 1, 30, 0}, "1261025024500000", 3600), "1261025023000000");
}

TEST_F(EntryStampTest, ATimeOfDayIsNearTheClockWhileMonitoring) {
    EntryStamp stamp(std::make_shared<FollowSettings>());
    for (const std::int64_t ago : {0, 60, 3600, 80'000}) {
        const std::int64_t wanted = ZoneTime::toLocal(std::time(nullptr)) - ago;
        EntryColumns entry = at(CivilTime::of(wanted));
        entry.hasTime = entry.hasYear = false;
        entry.hasTimeOfDay = true;
        entry.time.year = 2000;
        entry.time.month = entry.time.day = 1;
        char out[16];
        ASSERT_TRUE(stamp.writeTimeOfDay(entry, nullptr, out));
        EXPECT_EQ(ZoneTime::ofStamp(out).seconds(), wanted);
    }
}

TEST_F(EntryStampTest, ATimeWithoutAYearIsNotRemembered) {
    EntryStamp stamp(std::make_shared<FollowSettings>());
    EntryColumns entry = at({1970, 12, 31, 23, 59, 0});
    entry.hasYear = false;
    EXPECT_EQ(writeWith(stamp, entry, "1270101000000000").stamp, "1261231235900000");
    EXPECT_EQ(writeWith(stamp, entry, "1280101000000000").stamp, "1271231235900000");
    entry.hasYear = true;
    EXPECT_EQ(writeWith(stamp, entry, "1280101000000000").stamp, "0701231235900000");
}

TEST_F(EntryStampTest, AYearThatTheColumnCannotShowIsRefused) {
    EntryStamp stamp(std::make_shared<FollowSettings>());
    EXPECT_EQ(writeWith(stamp, at({9999, 1, 1, 0, 0, 0})).stamp, "");
    EXPECT_EQ(writeWith(stamp, at({2026, 1, 1, 0, 0, 0})).stamp, "1260101000000000");
}

} // namespace
