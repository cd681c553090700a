// ENTRYTIME of entries whose times a format reads: the minute that is remembered.

#include "logtypes/EntryStamp.h"

#include "logs/FollowSettings.h"
#include "support/Faults.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

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
