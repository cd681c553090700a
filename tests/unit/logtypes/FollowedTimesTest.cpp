#include "logs/EntryClock.h"
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
#include <vector>

using namespace zrm;

namespace {

constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();

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
