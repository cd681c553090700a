#include "host/base/TimeText.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <ctime>
#include <string>

using namespace zrm::host;

namespace {

std::string stampOf(const std::string& text) {
    return TimeText::toStamp(text).value_or("none");
}

/// Sets the time zone while it lives.
class TimeZone {
public:
    explicit TimeZone(const char* zone) {
        const char* const before = std::getenv("TZ");
        m_before = before == nullptr ? "" : before;
        setenv("TZ", zone, 1);
        tzset();
    }
    ~TimeZone() {
        if (m_before.empty()) {
            unsetenv("TZ");
        } else {
            setenv("TZ", m_before.c_str(), 1);
        }
        tzset();
    }

private:
    std::string m_before;
};

TEST(TimeText, KeepsLocalTimes) {
    EXPECT_EQ(stampOf("2026-11-20T07:03:09"), "1261120070309000");
    EXPECT_EQ(stampOf("2026-11-20 07:03:09"), "1261120070309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03:09.412"), "1261120070309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03"), "1261120070300000");
    EXPECT_EQ(stampOf("2026-11-20"), "1261120000000000");
    EXPECT_EQ(stampOf("1999-12-31T23:59:60"), "0991231235960000");
    EXPECT_EQ(stampOf("2024-02-29"), "1240229000000000");
}

TEST(TimeText, ConvertsTimesWithAZoneToLocalTime) {
    const TimeZone zone("CET-1");
    EXPECT_EQ(stampOf("2026-11-20T07:03:09Z"), "1261120080309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03:09.5Z"), "1261120080309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03:09+01:00"), "1261120070309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03:09-0530"), "1261120133309000");
    EXPECT_EQ(stampOf("2026-11-20T07:03+01"), "1261120070300000");
    EXPECT_EQ(stampOf("2026-12-31T23:30:00Z"), "1270101003000000");
    EXPECT_EQ(stampOf("2024-02-28T23:30:00Z"), "1240229003000000");
}

TEST(TimeText, AcceptsTimeStamps) {
    EXPECT_EQ(stampOf("1261120070309000"), "1261120070309000");
    EXPECT_EQ(stampOf("0991231235959999"), "0991231235959999");
    EXPECT_EQ(stampOf("0000000000000000"), "0000000000000000");
}

TEST(TimeText, RefusesEverythingElse) {
    for (const char* const text : {"",
                                   "now",
                                   "2026",
                                   "2026-11",
                                   "2026-13-01",
                                   "2026-00-01",
                                   "2026-11-00",
                                   "2026-11-31",
                                   "2026-02-29",
                                   "2026-11-20T",
                                   "2026-11-20T7:03:09",
                                   "2026-11-20T24:00:00",
                                   "2026-11-20T07:60",
                                   "2026-11-20T07:03:61",
                                   "2026-11-20T07:03:09.",
                                   "2026-11-20T07:03:09,5",
                                   "2026-11-20T07:03:09 Z",
                                   "2026-11-20T07:03:09+",
                                   "2026-11-20T07:03:09+1",
                                   "2026-11-20T07:03:09+24:00",
                                   "2026-11-20T07:03:09+01:",
                                   "2026-11-20T07:03:09+01:60",
                                   "2026-11-20T07:03:09Zx",
                                   "2026-11-20Z",
                                   "1899-12-31",
                                   "2100-01-01",
                                   "20261120",
                                   "126112007030900",
                                   "12611200703090000",
                                   "2261120070309000",
                                   "1261320070309000",
                                   "1261131070309000",
                                   "1261120240309000",
                                   "126112007030900x"}) {
        EXPECT_EQ(stampOf(text), "none") << text;
    }
}

TEST(TimeText, ReturnsMilliseconds) {
    const TimeZone zone("CET-1CEST");
    EXPECT_EQ(TimeText::toMilliseconds("1970-01-01T00:00:00Z"), 0);
    EXPECT_EQ(TimeText::toMilliseconds("2026-11-20T07:03:09.412Z"), 1795158189412);
    EXPECT_EQ(TimeText::toMilliseconds("2026-11-20T08:03:09.4"), 1795158189400);
    EXPECT_EQ(TimeText::toMilliseconds("2026-11-20T08:03:09.41299+01:00"), 1795158189412);
    EXPECT_EQ(TimeText::toMilliseconds("1261120080309000"), 1795158189000);
    EXPECT_EQ(TimeText::toMilliseconds("2026-07-01"), 1782856800000) << "summer time";
    // An hour that comes twice is told apart by its zone.
    EXPECT_EQ(TimeText::toMilliseconds("2026-10-25T01:30:00Z").value() -
                  TimeText::toMilliseconds("2026-10-25T00:30:00Z").value(),
              3'600'000);
    for (const char* const none : {"", "soon", "0000000000000000", "1261320080309000", "2026-02-30",
                                   "2026-11-20T07:03:09.412Zx"}) {
        EXPECT_EQ(TimeText::toMilliseconds(none), std::nullopt) << none;
    }
}

} // namespace
