#include "host/base/TimeText.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

using std::chrono::seconds;

TEST(DurationText, ReadsNumbersWithAUnit) {
    EXPECT_EQ(DurationText::parse("60s"), seconds(60));
    EXPECT_EQ(DurationText::parse("5m"), seconds(300));
    EXPECT_EQ(DurationText::parse("1h"), seconds(3600));
    EXPECT_EQ(DurationText::parse("2d"), seconds(172800));
    EXPECT_EQ(DurationText::parse("2147483647s"), seconds(2147483647));
}

TEST(DurationText, RefusesEverythingElse) {
    for (const char* const text : {"", "60", "s", "0s", "-1s", "1 m", "1.5h", "1w", "60sec", " 60s",
                                   "2147483648s", "24856d", "99999999999999999999s", "1S"}) {
        EXPECT_FALSE(DurationText::parse(text)) << text;
    }
}

} // namespace
