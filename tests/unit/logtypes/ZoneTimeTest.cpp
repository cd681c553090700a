#include "logtypes/ZoneTime.h"

#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <limits>
#include <memory>
#include <string>
#include <string_view>

using namespace zrm;

namespace {

constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();
constexpr std::int64_t springForward = 1143334800; // 26 March 2006, 01:00:00 UTC
constexpr std::int64_t fallBack = 1162083600;      // 29 October 2006, 01:00:00 UTC

const std::vector<ZoneOffset> berlin = {{always, 3600}, {springForward, 7200}, {fallBack, 3600}};

TEST(ZoneTime, SecondsAndTimesAreOneToOne) {
    for (const std::int64_t seconds : {std::int64_t{0}, std::int64_t{-1}, std::int64_t{951782399},
                                       std::int64_t{951782400}, std::int64_t{4102444800}}) {
        EXPECT_EQ(CivilTime::of(seconds).seconds(), seconds);
    }
    const CivilTime leapDay = CivilTime::of(951782400);
    EXPECT_EQ(leapDay.month, 2U);
    EXPECT_EQ(leapDay.day, 29U);
}

TEST(ZoneTime, TakesAnOffsetFromTheBeginningOfAText) {
    const auto taken = [](std::string_view text) {
        const std::optional<std::int32_t> offset = ZoneTime::takeOffset(text);
        return (offset ? std::to_string(*offset) : "none") + '|' + std::string(text);
    };
    EXPECT_EQ(taken("Z rest"), "0| rest");
    EXPECT_EQ(taken("+02:00x"), "7200|x");
    EXPECT_EQ(taken("-0330"), "-12600|");
    EXPECT_EQ(taken("+05"), "18000|");
    for (const char* const text : {"", "UTC", "+", "+2", "+24:00", "+01:60", "+01:", "-0a"}) {
        EXPECT_EQ(taken(text), "none|" + std::string(text));
    }
}

TEST(ZoneTime, ConvertsToUtcAcrossClockChanges) {
    EXPECT_EQ(ZoneTime::toUtc(springForward + 3600 - 1, berlin), springForward - 1);
    EXPECT_EQ(ZoneTime::toUtc(springForward + 7200, berlin), springForward);
    EXPECT_EQ(ZoneTime::toUtc(fallBack + 3600 - 1 + 3600, berlin), fallBack - 1);
    EXPECT_EQ(ZoneTime::toUtc(fallBack + 7200, berlin), fallBack + 3600);
    EXPECT_EQ(ZoneTime::toUtc(0, berlin), -3600);
}

TEST(ZoneTime, ConvertsToLocalTimeAcrossClockChanges) {
    const TimeZone zone("CET-1CEST,M3.5.0,M10.5.0/3");
    for (const std::int64_t time : {springForward, fallBack}) {
        const std::int64_t before = time == springForward ? 3600 : 7200;
        EXPECT_EQ(ZoneTime::toLocal(time - 1), time - 1 + before);
        EXPECT_EQ(ZoneTime::toLocal(time), time + 10'800 - before);
        EXPECT_EQ(ZoneTime::toLocal(time - 1), time - 1 + before);
    }
}

TEST(ZoneTime, AStampShowsOnlyTheYearsThatItHasRoomFor) {
    char stamp[17] = "unchanged       ";
    EXPECT_FALSE(ZoneTime::writeStamp(CivilTime{1899, 12, 31, 0, 0, 0}.seconds(), stamp));
    EXPECT_FALSE(ZoneTime::writeStamp(CivilTime{2900, 1, 1, 0, 0, 0}.seconds(), stamp));
    EXPECT_EQ(std::string(stamp), "unchanged       ");
    EXPECT_TRUE(ZoneTime::writeStamp(CivilTime{2026, 11, 22, 3, 4, 5}.seconds(), stamp));
    EXPECT_EQ(std::string(stamp), "1261122030405000");
    EXPECT_EQ(ZoneTime::ofStamp(stamp).seconds(), (CivilTime{2026, 11, 22, 3, 4, 5}.seconds()));
}

/// A text log that is followed, without a monitor.
class FollowedTextLog : public UserLogFile {
public:
    FollowedTextLog(const ValidLog& log, const std::string& format)
        : UserLogFile(log, Unmonitored{}) {
        SPAnchor = std::make_unique<StringParser>(format.c_str(), followedFields());
    }
};

class FollowedTextTest : public testing::Test {
protected:
    FollowedTextTest() { LocaleDouble::reset(); }

    std::string row(std::string line, const std::vector<ZoneOffset>& zone = {}) const {
        constexpr const char* format = R"(A,"%d-%d-%dT%d:%d:%d%s %255[^\n]" ,)"
                                       " year month day hour minute second zone description";
        FollowSettings settings;
        settings.zone = zone;
        const ValidLog valid(FurtherLog{"/var/log/app.log", 'U', 'N', format,
                                        std::make_shared<const FollowSettings>(settings)});
        FollowedTextLog log(valid, format);
        zrm_rmlogent_data_t row{};
        if (log.formatEntryAsRow(line.data(), &row, nullptr) != 0) {
            return "failed";
        }
        const std::string description(row.entrydesc, sizeof row.entrydesc);
        return std::string(row.entrytime, sizeof row.entrytime) + '|' +
               description.substr(0, description.find_last_not_of(' ') + 1);
    }

    TimeZone m_zone{"CET-1CEST,M3.5.0,M10.5.0/3"};
    FakeClock m_clock{1160049600};
    RecordingTrace m_trace{0};
};

TEST_F(FollowedTextTest, ATimeWithAZoneBecomesLocalTime) {
    EXPECT_EQ(row("2006-10-05T05:03:09Z text"), "1061005070309000|text");
    EXPECT_EQ(row("2006-10-05T05:03:09.123456-01:00 text"), "1061005080309000|text");
    EXPECT_EQ(row("2006-12-31T23:30:00Z text"), "1070101003000000|text");
    EXPECT_EQ(row("2006-10-05T07:03:09x text"), "1061005070309000|text");
}

TEST_F(FollowedTextTest, ATimeWithoutAZoneIsOfTheConfiguredOne) {
    const std::vector<ZoneOffset> utc = {{always, 0}};
    EXPECT_EQ(row("2006-10-05T05:03:09.5 text", utc), "1061005070309000|text");
    EXPECT_EQ(row("2006-10-05T05:03:09-01:00 text", utc), "1061005080309000|text");
}

TEST_F(FollowedTextTest, OnlyFormatsOfFollowedLogsNameAZone) {
    const StringParser other("A,\"%s\" , zone", UserLogFile::fields());
    EXPECT_NE(other.status(), OBJECT_FORMAT_LEARNED);
}

} // namespace
