#include "host/base/TimeText.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

TEST(UtcTime, HasMillisecondsAndTheZone) {
    EXPECT_EQ(UtcTime::text(0), "1970-01-01T00:00:00.000Z");
    EXPECT_EQ(UtcTime::text(1'795'158'189'412), "2026-11-20T07:03:09.412Z");
    EXPECT_EQ(UtcTime::text(1'709'210'096'007), "2024-02-29T12:34:56.007Z");
}

TEST(UtcTime, HandlesUnusualYears) {
    EXPECT_EQ(UtcTime::text(253'402'300'799'999), "9999-12-31T23:59:59.999Z");
    EXPECT_EQ(UtcTime::text(253'402'300'800'000), "10000-01-01T00:00:00.000Z");
    EXPECT_EQ(UtcTime::text(-1), "1970-01-01T00:00:00.-01Z");
    EXPECT_EQ(UtcTime::text(-62'135'596'800'000), "0001-01-01T00:00:00.000Z");
}

TEST(UtcTime, IsAppended) {
    std::string text = "at ";
    UtcTime::append(text, 1);
    EXPECT_EQ(text, "at 1970-01-01T00:00:00.001Z");
}

} // namespace
