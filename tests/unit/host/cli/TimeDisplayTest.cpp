#include "host/cli/TimeDisplay.h"

#include "support/TimeZone.h"

#include <gtest/gtest.h>

using namespace zrm::host;

TEST(TimeDisplayTest, UtcTimesAreShownInLocalTime) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    EXPECT_EQ(TimeDisplay::local("2026-11-20T07:03:09.412Z"), "2026-11-20 08:03:09");
    EXPECT_EQ(TimeDisplay::local("2026-07-20T23:03:09Z"), "2026-07-21 01:03:09");
    EXPECT_EQ(TimeDisplay::local(""), "");
    EXPECT_EQ(TimeDisplay::local("soon"), "soon");
}

TEST(TimeDisplayTest, StampsAreShownAsTheyAre) {
    EXPECT_EQ(TimeDisplay::stamp("1261120070309000"), "2026-11-20 07:03:09");
    EXPECT_EQ(TimeDisplay::stamp("0991231235959000"), "1999-12-31 23:59:59");
    EXPECT_EQ(TimeDisplay::stamp("0000000000000000"), "");
    EXPECT_EQ(TimeDisplay::stamp("blank"), "blank");
}

TEST(TimeDisplayTest, DurationsHaveTwoUnits) {
    EXPECT_EQ(TimeDisplay::duration(0), "0 s");
    EXPECT_EQ(TimeDisplay::duration(59), "59 s");
    EXPECT_EQ(TimeDisplay::duration(123), "2 min 3 s");
    EXPECT_EQ(TimeDisplay::duration(3600), "1 h");
    EXPECT_EQ(TimeDisplay::duration(3 * 86400 + 4 * 3600 + 59), "3 d 4 h");
    EXPECT_EQ(TimeDisplay::between("2026-11-20T07:00:00.900Z", "2026-11-20T08:01:00.100Z"),
              "1 h 1 min");
    EXPECT_EQ(TimeDisplay::between("", "2026-11-20T08:01:00Z"), "");
}

TEST(TimeDisplayTest, BytesHaveAtLeastTwoDigits) {
    EXPECT_EQ(TimeDisplay::bytes(0), "0 B");
    EXPECT_EQ(TimeDisplay::bytes(999), "999 B");
    EXPECT_EQ(TimeDisplay::bytes(1000), "1.0 kB");
    EXPECT_EQ(TimeDisplay::bytes(9949), "9.9 kB");
    EXPECT_EQ(TimeDisplay::bytes(9951), "10 kB");
    EXPECT_EQ(TimeDisplay::bytes(999'600), "1.0 MB");
    EXPECT_EQ(TimeDisplay::bytes(81'234'567), "81 MB");
    EXPECT_EQ(TimeDisplay::bytes(5'000'000'000'000'000), "5000 TB");
}
