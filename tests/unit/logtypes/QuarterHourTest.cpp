#include "logtypes/QuarterHour.h"

#include "base/BrevanTime.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <limits>
#include <random>
#include <string>

using namespace zrm;

namespace {

std::string expected(std::int64_t time) {
    char stamp[16];
    BrevanTime::generateTimestamp(time, stamp);
    return {stamp, sizeof stamp};
}

std::string given(QuarterHour& quarterHour, std::int64_t time) {
    char stamp[16];
    quarterHour.generateTimestamp(time, stamp);
    return {stamp, sizeof stamp};
}

class QuarterHourInZone : public testing::TestWithParam<const char*> {};

TEST_P(QuarterHourInZone, ReturnsTheStampsOfBrevanTime) {
    const TimeZone zone(GetParam());
    QuarterHour quarterHour;
    std::mt19937_64 random(900);
    // From 1900, when zones had odd seconds, to 2099, in clusters of close times.
    std::uniform_int_distribution<std::int64_t> anywhere(-2208988800, 4102444799);
    std::uniform_int_distribution<std::int64_t> near(-2000, 2000);
    for (int i = 0; i < 400; ++i) {
        const std::int64_t middle = anywhere(random);
        for (int j = 0; j < 12; ++j) {
            const std::int64_t time = middle + near(random);
            ASSERT_EQ(given(quarterHour, time), expected(time)) << time;
        }
    }
}

// The last two have offsets and changes that fall within a quarter of an hour.
INSTANTIATE_TEST_SUITE_P(Zones, QuarterHourInZone,
                         testing::Values("UTC0", "CET-1CEST,M3.5.0,M10.5.0/3",
                                         "EST5EDT,M3.2.0,M11.1.0", "NPT-5:45",
                                         "LHST-10:30LHDT-11,M10.1.0,M4.1.0", "LMT0:44:30",
                                         "ODD3:59:17EVEN,M2.2.3/1:07:13,M9.3.5/4:51:09"));

TEST(QuarterHour, FollowsAnOffsetThatChangesWithinIt) {
    const TimeZone zone("AAA0BBB0:44:30,M2.1.0/1:07:13,M11.1.0"); // back by that on 1 February 2026
    QuarterHour quarterHour;
    const std::int64_t change = 1769908033;
    ASSERT_EQ(expected(change - 1), "1260201010712000");
    ASSERT_EQ(expected(change), "1260201002243000");
    for (std::int64_t time = change - 2000; time < change + 2000; ++time) {
        ASSERT_EQ(given(quarterHour, time), expected(time)) << time;
    }
}

TEST(QuarterHour, FollowsTheChangesOfDaylightSaving) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    QuarterHour quarterHour;
    for (const std::int64_t change : {1774746000, 1792890000}) { // 2026
        for (std::int64_t time = change - 1000; time < change + 1000; ++time) {
            ASSERT_EQ(given(quarterHour, time), expected(time)) << time;
        }
    }
}

TEST(QuarterHour, AcceptsAnyNumberAsATime) {
    const TimeZone zone("UTC0");
    QuarterHour quarterHour;
    for (const std::int64_t time :
         {std::numeric_limits<std::int64_t>::min(), std::numeric_limits<std::int64_t>::max(),
          std::int64_t{1} << 36, (std::int64_t{1} << 36) + 1, -(std::int64_t{1} << 36),
          std::int64_t{-1}, std::int64_t{0}, std::int64_t{899}, std::int64_t{900}}) {
        EXPECT_EQ(given(quarterHour, time), expected(time)) << time;
    }
}

TEST(QuarterHour, LooksUpLocalTimeOnceForCloseTimes) {
    const TimeZone zone("UTC0");
    QuarterHour quarterHour;
    const Fault asked("localtime_r", EOVERFLOW, {.times = 0});
    for (std::int64_t time = 1795158000; time < 1795158900; ++time) {
        given(quarterHour, time);
    }
    EXPECT_EQ(asked.calls(), 2);
}

TEST(QuarterHour, EachStampIsAnOperationWhileTheFlowIsTraced) {
    const TimeZone zone("UTC0");
    QuarterHour quarterHour;
    EXPECT_EQ(given(quarterHour, 1000000000), expected(1000000000));
    const auto stamps = [&quarterHour](RecordingTrace& trace) {
        trace.clear();
        EXPECT_EQ(given(quarterHour, 1000000001), "1010909014641000");
        const auto events = trace.events();
        return std::count(events.begin(), events.end(), "BrevanTime.cpp entry");
    };
    RecordingTrace trace(TRC1_FLOW);
    EXPECT_EQ(stamps(trace), 1);
    EXPECT_EQ(stamps(trace), 1);
    trace.setLevel(TRC1_ERROR);
    const Fault counter("localtime_r", 0, {.times = 0});
    given(quarterHour, 1000000000);
    const int calls = counter.calls();
    EXPECT_GT(calls, 0);
    given(quarterHour, 1000000001);
    EXPECT_EQ(counter.calls(), calls)
        << "without the flow, each quarter of an hour is looked up once";
}

} // namespace
