// The forms of syslog lines in logs that are followed.

#include "logtypes/SysLogFile.h"

#include "base/EntryFields.h"
#include "base/ProcessValues.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/RequestThresholds.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/SyslogFields.h"
#include "logtypes/SyslogForms.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdio>
#include <limits>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;

constexpr std::int64_t always = std::numeric_limits<std::int64_t>::min();

template <std::size_t width> std::string column(const char (&bytes)[width]) {
    const std::string text(bytes, width);
    return text.substr(0, text.find_last_not_of(' ') + 1);
}

/// A followed syslog file without a monitor.
class FollowedLog : public SysLogFile {
public:
    explicit FollowedLog(const ValidLog& log) : SysLogFile(log, Unmonitored{}) {}
    using LogFile::ownRow;
};

/// As NAME=VALUE.
std::vector<std::string> textsOf(const EntryFields& fields) {
    std::vector<std::string> texts;
    for (const EntryFields::Field& field : fields.all()) {
        texts.push_back(std::string(field.name) + '=' + std::string(field.value));
    }
    return texts;
}

class SyslogFormsTest : public testing::Test {
protected:
    SyslogFormsTest() { LocaleDouble::reset(); }

    std::unique_ptr<FollowedLog> make(const FollowSettings& settings = {}) const {
        const ValidLog log(
            FurtherLog{m_path, 'S', 'N', "", std::make_shared<const FollowSettings>(settings)});
        return std::make_unique<FollowedLog>(log);
    }
    /// TIME|SYSTEM|SOURCE|DESCRIPTION of a line.
    std::string row(std::string line, const FollowSettings& settings = {}) const {
        zrm_rmlogent_data_t row{};
        line += '\n';
        EXPECT_EQ(make(settings)->formatEntryAsRow(line.data(), &row, nullptr), 0);
        EXPECT_EQ(column(row.entrysrc), column(row.uentrysrc));
        EXPECT_EQ(column(row.entrydesc), column(row.uentrydesc));
        return column(row.entrytime) + '|' + column(row.entrysys) + '|' + column(row.entrysrc) +
               '|' + column(row.entrydesc);
    }
    std::string timeOf(const std::string& line, const FollowSettings& settings = {}) const {
        const std::string text = row(line, settings);
        return text.substr(0, text.find('|'));
    }

    TimeZone m_zone{"CET-1CEST,M3.5.0,M10.5.0/3"};
    FakeClock m_clock{1160049600}; // 5 October 2006, 12:00:00 UTC
    RecordingTrace m_trace{0};
    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("syslog", "");
};

TEST_F(SyslogFormsTest, ReadsTheTraditionalForm) {
    EXPECT_EQ(row("Oct  5 07:03:09 web1 sshd[412]: Failed password"),
              "1061005070309000|web1|sshd[412]|Failed password");
    EXPECT_EQ(row("Oct 05 07:03:09 web1 kernel: [ 1.5] up"),
              "1061005070309000|web1|kernel|[ 1.5] up");
    EXPECT_EQ(row("<34>Oct  5 07:03:09 web1 su: x"), "1061005070309000|web1|su|x");
    EXPECT_EQ(row("Oct  5 07:03:09 web1 last message repeated 3 times"),
              "1061005070309000|web1||last message repeated 3 times");
    EXPECT_EQ(row("Oct  5 07:03:09 last message repeated 3 times"),
              "1061005070309000|||last message repeated 3 times");
}

TEST_F(SyslogFormsTest, ReadsTheIsoFormAndConvertsItsZone) {
    EXPECT_EQ(row("2006-10-05T07:03:09.123456+02:00 web1 sshd[412]: Failed password"),
              "1061005070309000|web1|sshd[412]|Failed password");
    EXPECT_EQ(timeOf("2006-10-05T05:03:09Z web1 a: b"), "1061005070309000");
    EXPECT_EQ(timeOf("2006-10-05T05:03:09.5z web1 a: b"), "1061005070309000");
    EXPECT_EQ(timeOf("2006-10-05T00:33:09-0430 web1 a: b"), "1061005070309000");
    EXPECT_EQ(timeOf("2006-10-05T07:03:09 web1 a: b"), "1061005070309000");
    EXPECT_EQ(timeOf("2005-12-31T23:30:00Z web1 a: b"), "1060101003000000");
    EXPECT_EQ(timeOf("2005-12-31T23:59:60Z web1 a: b"), "1060101010000000");
}

TEST_F(SyslogFormsTest, ReadsRfc5424) {
    EXPECT_EQ(row("<34>1 2006-10-05T05:03:09.003Z web1 su 77 ID47 - 'su root' failed"),
              "1061005070309000|web1|su[77]|'su root' failed");
    EXPECT_EQ(row(R"(<165>1 2006-10-05T05:03:09Z web1 app - - [a@1 k="]\"] x"][b@1] )"
                  "\xEF\xBB\xBFtext"),
              "1061005070309000|web1|app|text");
    EXPECT_EQ(row(R"(<165>1 2006-10-05T05:03:09Z - - - - [a@1 k="v"])"),
              R"(1061005070309000|||[a@1 k="v"])");
    EXPECT_EQ(row("<13>1 - web1 app - - - no time"), "|web1|app|no time");
}

TEST_F(SyslogFormsTest, DecidesLineByLine) {
    const std::unique_ptr<FollowedLog> log = make();
    zrm_rmlogent_data_t row{};
    std::vector<std::string> rows;
    for (const char* const text :
         {"Oct  5 07:03:09 web1 a: a long description\n", "2006-10-05T05:03:10Z web2 b: short\n",
          "no syslog line\n", "<34>1 2006-10-05T05:03:11Z web3 c - - - d\n"}) {
        std::string line = text;
        ASSERT_EQ(log->formatEntryAsRow(line.data(), &row, nullptr), 0);
        rows.push_back(column(row.entrytime) + '|' + column(row.entrysys) + '|' +
                       column(row.entrysrc) + '|' + column(row.entrydesc));
    }
    EXPECT_THAT(rows, ElementsAre("1061005070309000|web1|a|a long description",
                                  "1061005070310000|web2|b|short", "|||no syslog line",
                                  "1061005070311000|web3|c|d"));
}

TEST_F(SyslogFormsTest, LongHostsAndTagsDoNotReachIntoTheDescription) {
    const std::string host(63, 'h');
    const std::string tag(300, 't');
    EXPECT_EQ(row("Oct  5 07:03:09 " + host + ' ' + tag + ": text"),
              "1061005070309000|" + host.substr(0, 32) + '|' + tag.substr(0, 32) + "|text");
    EXPECT_EQ(row("<34>1 2006-10-05T05:03:09Z " + host + ' ' + tag + " 77 - - text"),
              "1061005070309000|" + host.substr(0, 32) + '|' + tag.substr(0, 32) + "|text");
}

TEST_F(SyslogFormsTest, LinesThatAreCutOffAreNotRecognised) {
    for (const std::string line :
         {"<34>1 2006-10-05T05:03:09.123Z web1 su 77 ID47 [a b=\"c\"] text",
          "2006-10-05T05:03:09.123+02:00 web1 sshd[412]: text", "Oct  5 07:03:09 web1 sshd: text",
          "<34>Oct  5 07:03:09 web1 sshd: text"}) {
        for (std::size_t length = 0; length < line.size(); ++length) {
            const std::string_view text = std::string_view(line).substr(0, length);
            const SyslogTime time = SyslogForms::recognise(text);
            EXPECT_LE(time.end, length);
            const SyslogParts parts = SyslogForms::split(text, time);
            EXPECT_LE(parts.description.size(), length);
            if (time.form == SyslogTime::Form::none) {
                EXPECT_EQ(parts.description, text);
            }
        }
    }
    for (const char* const line :
         {"2006-13-05T05:03:09Z a b: c", "2006-02-30T05:03:09Z a b: c",
          "2006-10-05T24:03:09Z a b: c", "2006-10-05T05:03:09+25:00 a b: c",
          "2006-10-05T05:03:09Zx a b: c", "Oct 32 07:03:09 a b: c", "Okt  5 07:03:09 a b: c",
          "Oct  5 07:03:09x a b: c", "<34>2 2006-10-05T05:03:09Z a b", "<>1 2006-10-05T05:03:09Z a",
          "ctN 12 07:03:09 a b: c"}) {
        EXPECT_EQ(SyslogForms::recognise(line).form, SyslogTime::Form::none) << line;
    }
}

TEST_F(SyslogFormsTest, FieldsAreThoseOfTheTextWhateverRowWasMadeBefore) {
    const std::unique_ptr<FollowedLog> log = make();
    const auto expectFields = [&log](std::string_view text) {
        EntryFields expected;
        SyslogFields::read(text, expected);
        EntryFields fields;
        log->readFields(text, fields);
        EXPECT_EQ(textsOf(fields), textsOf(expected)) << text;
        EXPECT_FALSE(textsOf(fields).empty()) << text;
    };
    for (const char* const line :
         {"Oct  5 07:03:09 web1 sshd[412]: text\n", "2006-10-05T05:03:10Z web2 cron: short\n",
          "<34>1 2006-10-05T05:03:11Z web3 c 7 - [a b=\"c\"] d\n", "no syslog line\r\n"}) {
        std::string entry = line;
        ASSERT_EQ(log->formatEntryAsRow(entry.data(), log->ownRow(), nullptr), 0);
        const std::string_view text =
            std::string_view(entry).substr(0, entry.find_first_of("\r\n"));
        expectFields(text);
        expectFields(text.substr(0, text.size() - 1));
        expectFields("Oct  5 07:03:10 web9 other: another line");
        zrm_rmlogent_data_t row{};
        std::string other = "Oct  5 07:03:11 web8 third: a row that is not the log's own\n";
        ASSERT_EQ(log->formatEntryAsRow(other.data(), &row, nullptr), 0);
        expectFields(text);
    }
}

TEST_F(SyslogFormsTest, ATimeWithoutAZoneIsOfTheConfiguredOne) {
    FollowSettings utc;
    utc.zone = {{always, 0}};
    EXPECT_EQ(timeOf("Oct  5 05:03:09 web1 a: b", utc), "1061005070309000");
    EXPECT_EQ(timeOf("2006-10-05T05:03:09 web1 a: b", utc), "1061005070309000");
    EXPECT_EQ(timeOf("2006-10-05T05:03:09-01:00 web1 a: b", utc), "1061005080309000");
}

TEST_F(SyslogFormsTest, AnEntryIsOfTheNearestYear) {
    FakeClock newYear(1167609600); // 1 January 2007, 00:00:00 UTC
    EXPECT_EQ(timeOf("Dec 31 23:59:59 web1 a: b"), "1061231235959000");
    EXPECT_EQ(timeOf("Jan  1 00:59:59 web1 a: b"), "1070101005959000");
    EXPECT_EQ(timeOf("Jan  1 22:00:00 web1 a: b"), "1070101220000000"); // a clock that is ahead
    EXPECT_EQ(timeOf("Feb 29 12:00:00 web1 a: b"), "1040229120000000");
}

TEST_F(SyslogFormsTest, AReportReadsEveryForm) {
    m_directory.write("syslog", "Dec 30 10:00:00 web1 a: oldest\n"
                                "2005-12-31T10:00:00Z web1 a: iso\n"
                                "neither\n"
                                "Jan  2 10:00:00 web1 a: newest\n");
    const std::unique_ptr<FollowedLog> log = make();
    _RequestThresholds window{};
    std::snprintf(window.startTime, sizeof window.startTime, "%s", "1051231000000000");
    std::snprintf(window.endTime, sizeof window.endTime, "%s", "1061231000000000");
    void* state = log->startReportRequest(&window);
    ASSERT_NE(state, nullptr);
    std::vector<std::string> rows;
    zrm_rmlogent_data_t row;
    while (log->getNextLogEntry(&row, state, &window) != nullptr) {
        rows.push_back(column(row.entrytime) + '|' + column(row.entrydesc));
    }
    log->endReportRequest(&state);
    EXPECT_THAT(rows, ElementsAre("1060102100000000|newest", "1051231110000000|iso"));
}

} // namespace
