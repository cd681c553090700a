#include "host/framework/TraceClock.h"

#include "support/Faults.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <string>

#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

std::string text(const TraceClock::Time& time) {
    char buffer[64];
    std::snprintf(buffer, sizeof buffer, "%04ld-%02u-%02u %02d:%02d:%02d.%06ld", time.year,
                  time.month, time.day, time.hour, time.minute, time.second, time.microsecond);
    return buffer;
}

std::string localText(std::time_t seconds, long nanoseconds = 0) {
    return text(TraceClock::local({seconds, nanoseconds}));
}

class TraceClockTest : public testing::Test {
protected:
    TraceClockTest() {
        setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1);
        tzset();
    }
    ~TraceClockTest() override {
        unsetenv("TZ");
        tzset();
    }
};

TEST_F(TraceClockTest, ReturnsTheLocalTimeToTheMicrosecond) {
    EXPECT_EQ(localText(1795158189, 412345999), "2026-11-20 08:03:09.412345");
    EXPECT_EQ(localText(1780000000, 999), "2026-05-28 22:26:40.000000");
}

TEST_F(TraceClockTest, FollowsTheChangeOfTheZone) {
    EXPECT_EQ(localText(1792889999), "2026-10-25 02:59:59.000000");
    EXPECT_EQ(localText(1792890000), "2026-10-25 02:00:00.000000");
    EXPECT_EQ(localText(1774745999), "2026-03-29 01:59:59.000000");
    EXPECT_EQ(localText(1774746000), "2026-03-29 03:00:00.000000");
}

TEST_F(TraceClockTest, AgreesWithTheCLibraryThroughoutTheYears) {
    for (std::time_t seconds = 1750000000; seconds < 1900000000; seconds += 123457) {
        std::tm parts{};
        localtime_r(&seconds, &parts);
        char expected[64];
        std::strftime(expected, sizeof expected, "%Y-%m-%d %H:%M:%S.000000", &parts);
        ASSERT_EQ(localText(seconds), expected);
    }
}

TEST_F(TraceClockTest, AsksTheCLibraryOnceAQuarterOfAnHour) {
    constexpr std::time_t start = 1800000000;
    Fault counter("localtime_r", 0, {.times = 0});
    for (std::time_t second = 0; second < 3600; ++second) {
        localText(start + second);
    }
    EXPECT_EQ(counter.calls(), 4);
}

TEST_F(TraceClockTest, KeepsTheLastOffsetWhenTheCLibraryFails) {
    EXPECT_EQ(localText(1810000000), "2027-05-11 03:46:40.000000");
    Fault fault("localtime_r", EOVERFLOW, {.times = -1});
    EXPECT_EQ(localText(1810000900), "2027-05-11 04:01:40.000000");
    EXPECT_EQ(fault.failed(), 1);
}

// The C library's time-zone lock may be held by a thread that the child does not have.
TEST_F(TraceClockTest, AForkedChildNeverAsksTheCLibrary) {
    EXPECT_EQ(localText(1820000000), "2027-09-03 21:33:20.000000");
    Fault counter("localtime_r", 0, {.times = 0});
    const pid_t child = fork();
    if (child == 0) {
        const bool same = localText(1830000000) == "2027-12-28 15:20:00.000000";
        _exit(counter.calls() == 0 && same ? 0 : 1);
    }
    int status = -1;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0) << "the offset is still that of summer";
    EXPECT_EQ(localText(1830000000), "2027-12-28 14:20:00.000000");
    EXPECT_EQ(counter.calls(), 1);
}

} // namespace
