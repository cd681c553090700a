#include "base/BrevanTime.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>

using namespace zrm;

namespace {

std::string stampOf(long time) {
    char out[18];
    std::memset(out, '#', sizeof out);
    BrevanTime::generateTimestamp(time, out);
    EXPECT_EQ(std::string(out + 16, 2), "##") << "wrote more than 16 characters";
    return {out, 16};
}

std::string currentStamp() {
    char out[18];
    std::memset(out, '#', sizeof out);
    BrevanTime::generateCurrentTimestamp(out);
    EXPECT_EQ(std::string(out + 16, 2), "##") << "wrote more than 16 characters";
    return {out, 16};
}

TEST(BrevanTime, CenturyDigitChangesWithTheYear2000) {
    const TimeZone zone("UTC0");
    EXPECT_EQ(stampOf(946684799), "0991231235959000");
    EXPECT_EQ(stampOf(946684800), "1000101000000000");
}

TEST(BrevanTime, WritesLocalTime) {
    const TimeZone zone("XYZ5");
    EXPECT_EQ(stampOf(946684800), "0991231190000000");
    EXPECT_EQ(stampOf(946684800 + 5 * 3600), "1000101000000000");
}

TEST(BrevanTime, TheEpochAndTheLastDayOfALeapFebruary) {
    const TimeZone zone("UTC0");
    EXPECT_EQ(stampOf(0), "0700101000000000");
    EXPECT_EQ(stampOf(1709251199), "1240229235959000");
}

TEST(BrevanTime, YearsBeyondTheDigitsAreCutAtSixteenCharacters) {
    const TimeZone zone("UTC0");
    EXPECT_EQ(stampOf(32503680000), "1100010100000000"); // 1 January 3000: 1100 years since 1900
}

TEST(BrevanTime, TheCurrentStampFollowsTheClock) {
    const TimeZone zone("UTC0");
    FakeClock clock(946684799);
    EXPECT_EQ(currentStamp(), "0991231235959000");
    EXPECT_EQ(currentStamp(), "0991231235959000");
    clock.set(946684800);
    EXPECT_EQ(currentStamp(), "1000101000000000");
    clock.set(946684799); // a clock that was set back
    EXPECT_EQ(currentStamp(), "0991231235959000");
}

TEST(BrevanTime, TheCurrentStampLooksUpLocalTimeOncePerSecond) {
    const TimeZone zone("UTC0");
    FakeClock clock(1000000000);
    const Fault counter("localtime_r", 0, {.times = 0});
    for (int i = 0; i < 1000; ++i) {
        currentStamp();
    }
    EXPECT_EQ(counter.calls(), 1);
    clock.set(1000000001);
    currentStamp();
    EXPECT_EQ(counter.calls(), 2);
}

TEST(BrevanTime, EachCurrentStampIsAnOperationWhileTheFlowIsTraced) {
    const TimeZone zone("UTC0");
    FakeClock clock(1000000000);
    currentStamp();
    RecordingTrace trace(TRC1_FLOW);
    currentStamp();
    currentStamp();
    EXPECT_THAT(trace.events(),
                testing::ElementsAre("BrevanTime.cpp entry", "BrevanTime.cpp exit",
                                     "BrevanTime.cpp entry", "BrevanTime.cpp exit"));
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    currentStamp();
    const Fault counter("localtime_r", 0, {.times = 0});
    currentStamp();
    EXPECT_EQ(counter.calls(), 0) << "without the flow, each second is looked up once";
    EXPECT_THAT(trace.events(), testing::IsEmpty());
}

} // namespace
