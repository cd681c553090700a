#include "host/formats/TimePattern.h"

#include <cstdio>
#include <string>
#include <string_view>

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

namespace {

/// The time that a text is by a pattern, as "YYYY-MM-DD hh:mm:ss+SECONDS"; without a year it begins
/// with "yyyy". "not a time" if it is none.
std::string timeOf(const std::string& pattern, std::string_view text) {
    const auto time = TimePattern::compile(pattern);
    if (!time) {
        return "bad pattern: " + time.error().what;
    }
    EntryColumns columns;
    if (!(*time)->read(text, columns)) {
        EXPECT_FALSE(columns.hasTime || columns.hasTimeOfDay);
        return "not a time";
    }
    char buffer[64];
    const CivilTime& civil = columns.time;
    if (!columns.hasTime) {
        EXPECT_TRUE(columns.hasTimeOfDay);
        std::snprintf(buffer, sizeof buffer, "no date %02u:%02u:%02u", civil.hour, civil.minute,
                      civil.second);
        return buffer;
    }
    std::snprintf(buffer, sizeof buffer, "%04d-%02u-%02u %02u:%02u:%02u", civil.year, civil.month,
                  civil.day, civil.hour, civil.minute, civil.second);
    std::string result = columns.hasYear ? buffer : "yyyy" + std::string(buffer + 4);
    if (columns.offset) {
        std::snprintf(buffer, sizeof buffer, "%+d", *columns.offset);
        result += buffer;
    }
    return result;
}

std::string common(std::string_view text) {
    return timeOf("auto", text);
}

constexpr const char* local = "2026-11-19 10:00:05";
constexpr const char* utc = "2026-11-19 10:00:05+0";
constexpr const char* east = "2026-11-19 10:00:05+3600";
constexpr const char* yearless = "yyyy-11-19 10:00:05";

struct Form {
    const char* text;
    const char* time;
};

void PrintTo(const Form& form, std::ostream* stream) {
    *stream << form.text;
}

class CommonForm : public testing::TestWithParam<Form> {};

TEST_P(CommonForm, IsRead) {
    EXPECT_EQ(common(GetParam().text), GetParam().time);
    EXPECT_EQ(common(std::string(" ") + GetParam().text + " "), GetParam().time);
    EXPECT_EQ(common(std::string(GetParam().text) + "x"), "not a time");
}

INSTANTIATE_TEST_SUITE_P(
    Iso, CommonForm,
    testing::Values(
        Form{"2026-11-19T10:00:05Z", utc}, Form{"2026-11-19T10:00:05.123Z", utc},
        Form{"2026-11-19T10:00:05.123456789+01:00", east}, Form{"2026-11-19 10:00:05", local},
        Form{"2026-11-19 10:00:05,123", local}, Form{"2026-11-19 10:00:05.123 UTC", utc},
        Form{"2026-11-19 10:00:05.123 CET", east}, Form{"2026-11-19 10:00:05.123456 +0100", east},
        Form{"2026-11-19T10:00:05-0330", "2026-11-19 10:00:05-12600"},
        Form{"2026-11-19 10:00:05+01", east}, Form{"20261119T100005Z", utc},
        Form{"20261119T100005.5+0100", east}, Form{"20261119100005", local},
        Form{"20261119-10:00:05:606", local}, Form{"2026-11-19-10.00.05.675872", local},
        Form{"2026-11-19_10:00:05", local}, Form{"2026-11-19T10:00", "2026-11-19 10:00:00"},
        Form{"2026-11-19T10:00:05+01:00[Europe/Berlin]", east},
        Form{"2026-11-19  10:00:05", local}));

INSTANTIATE_TEST_SUITE_P(
    YearFirst, CommonForm,
    testing::Values(Form{"2026/11/19 10:00:05", local}, Form{"2026/11/19 10:00:05.123456", local},
                    Form{"2026.11.19 10:00:05", local}, Form{"2026-Nov-19 10:00:05.123456", local},
                    Form{"2026 Nov 19 10:00:05.123", local}, Form{"2026:11:19-10:00:05", local},
                    Form{"2026-11-19 10h00.05", local}, Form{"20261119100005.123", local},
                    Form{"2026-11-19][10:00:05", local}, Form{"2026-11-19] [10:00:05", local},
                    Form{"26/11/19 10:00:05", local}, Form{"26-11-19 10:00:05,123", local},
                    Form{"261119 10:00:05", local}, Form{"261119  1:02:03", "2026-11-19 01:02:03"},
                    Form{"261119 100005", local}));

INSTANTIATE_TEST_SUITE_P(
    DayFirst, CommonForm,
    testing::Values(Form{"19/Nov/2026:10:00:05 +0100", east}, Form{"19/Nov/2026:10:00:05", local},
                    Form{"19 Nov 2026 10:00:05.123", local},
                    Form{"19-Nov-2026 10:00:05.123", local},
                    Form{"19-NOV-26 10.00.05.123456 AM", local},
                    Form{"19 Nov 10:00:05.123", yearless}, Form{"19 November 2026 10:00:05", local},
                    Form{"19-11-2026 10:00:05", local}, Form{"19.11.2026 10:00:05", local},
                    Form{"19/11/2026 -- 10:00:05", local}, Form{"19/11/2026 10:00:05", local},
                    Form{"19/11/2026 - 10:00:05", local}, Form{"19.11.26, 10:00:05", local},
                    Form{"Thu, 19 Nov 2026 10:00:05 +0100", east},
                    Form{"Thu, 19 Nov 2026 10:00:05 GMT", utc},
                    Form{"Thu, 19 Nov 2026 10:00:05 +0100 (CET)", east},
                    Form{"Thursday, 19-Nov-26 10:00:05 GMT", utc}));

INSTANTIATE_TEST_SUITE_P(
    MonthFirst, CommonForm,
    testing::Values(
        Form{"Nov 19 10:00:05", yearless}, Form{"Nov  9 10:00:05", "yyyy-11-09 10:00:05"},
        Form{"Nov 9 10:00:05", "yyyy-11-09 10:00:05"}, Form{"nov 19 10:00:05.123", yearless},
        Form{"Nov 19 2026 10:00:05", local}, Form{"Nov 19 10:00:05 2026", local},
        Form{"Nov 19, 2026 10:00:05 AM", local}, Form{"nov/19/2026 10:00:05", local},
        Form{"11/19-10:00:05.123456", yearless}, Form{"11-19|10:00:05.123", yearless},
        Form{"Nov 19, 2026 10:00:05\u202FPM", "2026-11-19 22:00:05"},
        Form{"Nov 19, 2026, 12:00:05 AM", "2026-11-19 00:00:05"},
        Form{"Thu Nov 19 10:00:05 2026", local}, Form{"Thu Nov 19 10:00:05.123456 2026", local},
        Form{"Thu Nov 19 10:00:05 CET 2026", east},
        Form{"Thu Nov 19 2026 10:00:05 GMT+0100 (CET)", east},
        Form{"Thu Nov 19 10:00:05 +0100 2026", east}, Form{"Thu 2026-11-19 10:00:05 CET", east},
        Form{"11/19/2026 10:00:05", local}, Form{"11/19/26 10:00:05", local},
        Form{"11/19/26\",\"10:00:05", local}, Form{"9/3/26 10:00:05", "2026-09-03 10:00:05"},
        Form{"11-19-26 10:00:05", local}, Form{"Nov19 10:00:05", yearless},
        Form{"11/19/2026 10:00:05 AM", local},
        Form{"11/19/2026, 10:00:05 PM", "2026-11-19 22:00:05"},
        Form{"1119 10:00:05.123456", yearless}, Form{"11-19 10:00:05.123", yearless},
        Form{"11/19 10:00:05", yearless}, Form{"11.19 10:00:05", yearless},
        Form{"Feb 29 10:00:05", "yyyy-02-29 10:00:05"}));

INSTANTIATE_TEST_SUITE_P(Epoch, CommonForm,
                         testing::Values(Form{"1795082405", "2026-11-19 10:00:05+0"},
                                         Form{"1795082405.123", utc}, Form{"1795082405123", utc},
                                         Form{"1795082405123.456", utc},
                                         Form{"1795082405123456", utc},
                                         Form{"1795082405123456789", utc}));

INSTANTIATE_TEST_SUITE_P(AtomicLabel, CommonForm,
                         testing::Values(Form{"@400000006afec8af12345678", utc},
                                         Form{"@400000006afec8af", utc}));

TEST(TimePattern, RefusesLabelsThatAreNoTime) {
    EXPECT_EQ(common("@"), "not a time");
    EXPECT_EQ(common("@400000006afec8a"), "not a time");
    EXPECT_EQ(common("@400000006afec8ag12345678"), "not a time");
    EXPECT_EQ(common("@000000006afec8af"), "not a time");
    EXPECT_EQ(common("@ffffffffffffffff"), "not a time");
}

TEST(TimePattern, TheOrderOfADateMayBeSaid) {
    EXPECT_EQ(timeOf("day-first", "03/04/2026 10:00:05"), "2026-04-03 10:00:05");
    EXPECT_EQ(timeOf("month-first", "03/04/2026 10:00:05"), "2026-03-04 10:00:05");
    EXPECT_EQ(timeOf("day-first", "03/04/26 10:00:05"), "2026-04-03 10:00:05");
    EXPECT_EQ(timeOf("month-first", "03-04-26 10:00:05"), "2026-03-04 10:00:05");
    EXPECT_EQ(timeOf("year-first", "03/04/26 10:00:05"), "2003-04-26 10:00:05");
    EXPECT_EQ(timeOf("month-first", "19/11/2026 10:00:05"), "not a time");
    EXPECT_EQ(timeOf("day-first", "11/19/2026 10:00:05"), "not a time");
    // Others are read as they always are.
    EXPECT_EQ(timeOf("day-first", "2026-11-19 10:00:05"), local);
    EXPECT_EQ(timeOf("day-first", "Nov 19 10:00:05"), yearless);
}

INSTANTIATE_TEST_SUITE_P(TimeOfDay, CommonForm,
                         testing::Values(Form{"10:00:05", "no date 10:00:05"},
                                         Form{"10:00:05.123", "no date 10:00:05"},
                                         Form{"9:00:05 PM", "no date 21:00:05"}));

TEST(TimePattern, RefusesWhatIsNotATime) {
    for (const char* text : {"",
                             " ",
                             "-",
                             "x",
                             "24",
                             "2026",
                             "2026-11-19",
                             "20261119",
                             "2026-11-19 ",
                             "2026-11-19T",
                             "2026-11-19 10",
                             "2026-11-19 24:00:00",
                             "2026-11-19 10:60:00",
                             "2026-11-19 10:00:60",
                             "2026-02-29 10:00:00",
                             "2026-13-01 10:00:00",
                             "2026-00-01 10:00:00",
                             "2026-01-00 10:00:00",
                             "2026-11-19 10:00:00.",
                             "2026-11-19 10:00:00.1763546400",
                             "2026-11-19 10:00:00 INFO",
                             "2026-11-19 10:00:00 +25:00",
                             "2026-11-19 10:00:00 2026",
                             "2026-11-19 10:00:00 AM PM",
                             "2026-11-19 13:00:00 PM",
                             "2026-11-19 0:00:00 AM",
                             "2026/11-19 10:00:00",
                             "Nov 31 10:00:00",
                             "Nov 10:00:00",
                             "Nove 19 10:00:00",
                             "Xyz 19 10:00:00",
                             "Feb 30 10:00:00",
                             "32/11/2026 10:00:00",
                             "13/13/2026 10:00:00",
                             "19/Nov/2026",
                             "12345678",
                             "123456789012",
                             "12345678901234567890",
                             "1795082405.",
                             "1795082405.1.2",
                             "1795082405 10:00:05",
                             "10:00:05 UTC UTC",
                             "Thu Nov 19 10:00:00 20266",
                             "2026-11-19T10:00:05+01:00[Europe/Berlin",
                             "1/1/1",
                             "1.1",
                             "1 1 10:00:00",
                             "192.168.0.17",
                             "4.19.0-17"}) {
        EXPECT_EQ(common(text), "not a time") << text;
    }
}

TEST(TimePattern, TakesNothingButADigitWhereADigitBelongs) {
    const std::string time = "2026-11-19T12:34:56.123Z";
    for (const std::size_t at : {0, 1, 2, 3, 5, 6, 8, 9, 11, 12, 14, 15, 17, 18}) {
        for (int byte = 0; byte < 256; ++byte) {
            std::string changed = time;
            changed[at] = static_cast<char>(byte);
            if (byte < '0' || byte > '9') {
                EXPECT_EQ(common(changed), "not a time") << changed;
            }
        }
        std::string changed = time;
        changed[at] = time[at] == '1' ? '0' : '1';
        EXPECT_EQ(common(changed), changed.substr(0, 10) + " " + changed.substr(11, 8) + "+0");
    }
    for (std::size_t length = 1; length < time.find('.'); ++length) {
        EXPECT_EQ(timeOf("iso8601", time.substr(0, length)).find("2026-11-19 12:34:56"),
                  std::string::npos)
            << length;
    }
}

TEST(TimePattern, GivesZonesThatStandForSeveralOffsetsNone) {
    for (const char* zone : {"CST", "CDT", "IST"}) {
        EXPECT_EQ(common("2026-11-19 10:00:05 " + std::string(zone)), local) << zone;
    }
    EXPECT_EQ(common("2026-07-19 10:00:05 EDT"), "2026-07-19 10:00:05-14400");
    EXPECT_EQ(common("2026-07-19 10:00:05 est"), "2026-07-19 10:00:05-18000");
    EXPECT_EQ(common("2026-07-19 10:00:05 ACST"), "2026-07-19 10:00:05+34200");
    EXPECT_EQ(common("2026-07-19 10:00:05 NST"), "2026-07-19 10:00:05-12600");
}

TEST(TimePattern, ReadsIso8601AndEpochAlone) {
    EXPECT_EQ(timeOf("iso8601", "2026-11-19T10:00:05.5Z"), utc);
    EXPECT_EQ(timeOf("iso8601", "20261119T100005+0100"), east);
    EXPECT_EQ(timeOf("iso8601", "20261119100005"), local);
    EXPECT_EQ(timeOf("iso8601", "Nov 19 10:00:05"), "not a time");
    EXPECT_EQ(timeOf("iso8601", "2026/11/19 10:00:05"), "not a time");
    EXPECT_EQ(timeOf("iso8601", "1795082405"), "not a time");
    EXPECT_EQ(timeOf("epoch", "1795082405"), utc);
    EXPECT_EQ(timeOf("epoch", "0"), "1970-01-01 00:00:00+0");
    EXPECT_EQ(timeOf("epoch", "99999999999"), "5138-11-16 09:46:39+0");
    EXPECT_EQ(timeOf("epoch", "100000000000"), "1973-03-03 09:46:40+0");
    EXPECT_EQ(timeOf("epoch", "-5"), "not a time");
    EXPECT_EQ(timeOf("epoch", "12345678901234567890"), "not a time");
    EXPECT_EQ(timeOf("epoch", "2026-11-19T10:00:05Z"), "not a time");
}

TEST(TimePattern, FollowsDirectives) {
    EXPECT_EQ(timeOf("%Y-%m-%d %H:%M:%S", "2026-11-19 10:00:05"), local);
    EXPECT_EQ(timeOf("%d/%b/%Y:%H:%M:%S %z", "19/Nov/2026:10:00:05 +0100"), east);
    EXPECT_EQ(timeOf("%d/%m/%y %I:%M:%S %p", "19/11/26 10:00:05 pm"), "2026-11-19 22:00:05");
    EXPECT_EQ(timeOf("%d/%m/%y %l:%M:%S %p", "19/11/26 12:00:05 am"), "2026-11-19 00:00:05");
    EXPECT_EQ(timeOf("%A, %B %e %Y %T", "THURSDAY, november 19 2026 10:00:05"), local);
    EXPECT_EQ(timeOf("%F %T.%f", "2026-11-19 10:00:05.123456789"), local);
    EXPECT_EQ(timeOf("%F %T%f", "2026-11-19 10:00:05,1"), local);
    EXPECT_EQ(timeOf("%F %T,%f", "2026-11-19 10:00:05.1"), "not a time");
    EXPECT_EQ(timeOf("%F %T,%f", "2026-11-19 10:00:05,1234567890"), "not a time");
    EXPECT_EQ(timeOf("%D %R", "11/19/26 10:00"), "2026-11-19 10:00:00");
    EXPECT_EQ(timeOf("%Y.%j %T", "2026.323 10:00:05"), local);
    EXPECT_EQ(timeOf("%y%j%H%M%S", "26323100005"), local);
    EXPECT_EQ(timeOf("%Y %j %H", "2026 366 10"), "not a time");
    EXPECT_EQ(timeOf("%Y %j %H", "2024 366 10"), "2024-12-31 10:00:00");
    EXPECT_EQ(timeOf("%s.%f", "1795082405.250"), utc);
    EXPECT_EQ(timeOf("%s", "1795082405250"), "not a time");
    EXPECT_EQ(timeOf("[%b %e %k:%M:%S]", "[Nov  9  1:00:05]"), "yyyy-11-09 01:00:05");
    EXPECT_EQ(timeOf("%Y%m%d%H%M%S", "20261119100005"), local);
    EXPECT_EQ(timeOf("%m  %d %H", "11 \t 19   10"), "yyyy-11-19 10:00:00");
    EXPECT_EQ(timeOf("%m %d %H", "11-19 10"), "not a time");
    EXPECT_EQ(timeOf("%F", "2026-11-19"), "2026-11-19 00:00:00");
    EXPECT_EQ(timeOf("%H:%M:%S.%f", "10:00:05.123"), "no date 10:00:05");
    EXPECT_EQ(timeOf("%H:%M", "24:00"), "not a time");
    EXPECT_EQ(timeOf("%F %T", "2026-11-19 10:00:60"), "not a time");
    EXPECT_EQ(timeOf("%F %T %%", "2026-11-19 10:00:05 %"), local);
    EXPECT_EQ(timeOf("%y-%m-%d", "69-01-02"), "1969-01-02 00:00:00");
    EXPECT_EQ(timeOf("%y-%m-%d", "68-01-02"), "2068-01-02 00:00:00");
}

TEST(TimePattern, FollowsDirectivesOfZones) {
    for (const char* zone : {"+01:00", "+0100", "+01", "CET", "GMT+0100", "utc+01:00"}) {
        EXPECT_EQ(timeOf("%F %T %z", "2026-11-19 10:00:05 " + std::string(zone)), east) << zone;
        EXPECT_EQ(timeOf("%F %T %Z", "2026-11-19 10:00:05 " + std::string(zone)), east) << zone;
    }
    EXPECT_EQ(timeOf("%F %T %Z", "2026-11-19 10:00:05 Europe/Berlin"), local);
    EXPECT_EQ(timeOf("%F %T %Z", "2026-11-19 10:00:05 CST"), local);
    EXPECT_EQ(timeOf("%F %T %z", "2026-11-19 10:00:05 Europe/Berlin"), "not a time");
    EXPECT_EQ(timeOf("%F %T %Z", "2026-11-19 10:00:05 "), "not a time");
}

void expectRefused(const std::string& pattern, const std::string& what) {
    const auto time = TimePattern::compile(pattern);
    ASSERT_FALSE(time) << pattern;
    EXPECT_EQ(time.error().what, what);
    EXPECT_EQ(time.error().field, "time_format");
    EXPECT_NE(time.error().cure, "");
}

TEST(TimePattern, RefusesPatternsThatReadNoTime) {
    expectRefused("%Q", "'%Q' is not a directive");
    expectRefused("%H:%", "'%' is not a directive");
    expectRefused("iso", "'iso' is not the form of a time");
    EXPECT_EQ(timeOf("", "2026-11-19T10:00:05Z"), utc) << "auto";
    expectRefused(" ", "' ' is not the form of a time");
    expectRefused("%%", "has no directive for a time");
    expectRefused("%Z", "has no directive for a time");
    expectRefused("%Y %T", "the date is not complete");
    expectRefused("%m %T", "the date is not complete");
    expectRefused("%d %T", "the date is not complete");
    expectRefused("%j %T", "the day of the year (%j) needs a year");
    expectRefused("%F %T %p", "%p says which half of the day an hour of %I is in");
    expectRefused("%H" + std::string(255, 'x'), "is longer than 256 bytes");
}

TEST(TimeMemo, GivesTheTimeOfTheTextThatItIsAskedFor) {
    TimeMemo memo(TimePattern::common());
    const auto read = [&memo](std::string_view text) {
        EntryColumns columns;
        return memo.read(text, columns)
                   ? static_cast<int>(columns.time.second) + (columns.offset ? 100 : 0) +
                         (columns.hasTime ? 0 : 1000)
                   : -1;
    };
    EXPECT_EQ(read(""), -1);
    EXPECT_EQ(read("2026-11-19 10:00:05"), 5);
    EXPECT_EQ(read("2026-11-19 10:00:05"), 5);
    EXPECT_EQ(read("2026-11-19 10:00:06"), 6);
    EXPECT_EQ(read("2026-11-19 10:00:6x"), -1);
    EXPECT_EQ(read("2026-11-19 10:00:06"), 6);
    EXPECT_EQ(read("2026-11-19 10:00:06Z"), 106);
    EXPECT_EQ(read("2026-11-19 10:00:06"), 6);
    EXPECT_EQ(read("10:00:07"), 1007);
    EXPECT_EQ(read("10:00:07"), 1007);
    EXPECT_EQ(read("2026-11-19 10:00:08" + std::string(100, ' ')), 8);
    EXPECT_EQ(read("2026-11-19 10:00:09" + std::string(100, ' ')), 9);
}

/// What is read after another text must be what is read without it.
void expectSameAfter(const char* pattern, std::string_view before, std::string_view text) {
    const auto times = TimePattern::compile(pattern).value();
    TimeMemo memo(times);
    EntryColumns columns;
    EXPECT_TRUE(memo.read(before, columns)) << before;
    columns = {};
    EntryColumns fresh;
    EXPECT_EQ(memo.read(text, columns), times->read(text, fresh)) << text;
    EXPECT_EQ(columns.hasTime, fresh.hasTime) << text;
    EXPECT_EQ(columns.time.seconds(), fresh.time.seconds()) << text;
    EXPECT_EQ(columns.offset, fresh.offset) << text;
}

TEST(TimeMemo, IgnoresOnlyTheFractionOfATime) {
    constexpr std::string_view first = "2026-11-19T10:00:05.123Z";
    for (const char* pattern : {"auto", "iso8601"}) {
        for (const char* text :
             {"2026-11-19T10:00:05.987Z", "2026-11-19T10:00:06.123Z", "2026-11-19T10:00:05.1234",
              "2026-11-19T10:00:05.12+1", "2026-11-19T10:00:05.12xZ", "2026-11-19T10:00:05.987x",
              "2026-11-19T10:00:05:987Z", "2026-11-19 10:00:05.987Z", "2026-11-19T10:00:05.98"}) {
            expectSameAfter(pattern, first, text);
        }
        expectSameAfter(pattern, "2026-11-19 10:00:05,1 +0100", "2026-11-19 10:00:05,2 +0200");
        expectSameAfter(pattern, "2026-11-19 10:00:05.1", "2026-11-19 10:00:05.x");
        expectSameAfter(pattern, "2026-11-19 10:00:05", "2026-11-19 10:00:06");
    }
    expectSameAfter("%Y-%m-%d %H:%M:%S.%j", "2026-11-19 10:00:05.123", "2026-11-19 10:00:05.124");
}

} // namespace
