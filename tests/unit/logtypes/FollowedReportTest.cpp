// Reports on followed logs: lines that do not fit, generations, windows, faults.

#include "logtypes/FollowedReport.h"

#include "../monitor/FakeCompression.h"
#include "../monitor/TestJoin.h"
#include "LogTypeTest.h"
#include "framework/cancellation.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logtypes/AdminLogFile.h"
#include "logtypes/EntryReader.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/UserLogFile.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

constexpr const char* always = "0000000000000000";
constexpr const char* endOfTime = "1991231235959999";

template <typename Kind> struct Unmonitored : Kind {
    explicit Unmonitored(const ValidLog& log) : Kind(log, typename Kind::Unmonitored{}) {}
};

/// Takes rows whose description does not begin with "no".
class Rows : public FollowedReport::Receiver {
public:
    bool meets(zrm_rmlogent_data_t& row) override {
        return std::string_view(row.entrydesc, 2) != "no";
    }
    void give(const zrm_rmlogent_data_t& row, const FollowedReport::Detail& /*detail*/) override {
        const std::string text(row.entrydesc, sizeof row.entrydesc);
        given.push_back(text.substr(0, text.find_last_not_of(' ') + 1));
        times.emplace_back(row.entrytime, 7);
    }
    void progress(std::int64_t read, std::int64_t total) override {
        EXPECT_GE(read, done);
        EXPECT_LE(read, total);
        done = read;
    }

    std::vector<std::string> given;
    std::vector<std::string> times; ///< the dates
    std::int64_t done = 0;
};

class FollowedReportTest : public LogTypeTest {
protected:
    template <typename Kind>
    std::unique_ptr<EntryReader> entriesOf(char type, const std::string& format = "") const {
        const ValidLog line(
            FurtherLog{path, type, 'N', format, std::make_shared<const FollowSettings>()});
        const Unmonitored<Kind> log(line);
        return EntryReader::of(log);
    }
    /// Reports on the log, syslog lines unless there are other entries.
    std::vector<std::string> run(const std::string& from = always,
                                 const std::string& to = endOfTime, std::size_t limit = 1000) {
        if (!entries) {
            entries = entriesOf<SysLogFile>('S');
        }
        rows = {};
        report = std::make_unique<FollowedReport>(
            path, *entries, FollowedReport::Options{from, to, limit, "", join});
        report->run(rows);
        return rows.given;
    }
    std::vector<std::string> problems() const {
        std::vector<std::string> all;
        for (const FollowedReport::File& file : report->files()) {
            if (!file.problem.empty()) {
                all.push_back(file.path.substr(path.size()) + ": " + file.problem);
            }
        }
        return all;
    }
    /// The names of the files that were read, without that of the log.
    std::vector<std::string> read() const {
        std::vector<std::string> names;
        for (const FollowedReport::File& file : report->files()) {
            if (file.isRead) {
                names.push_back(file.path.substr(path.size()));
            }
        }
        return names;
    }
    static std::string line(const std::string& day, const std::string& text) {
        return "2006-" + day + "T12:00:00 web1 app: " + text + '\n';
    }

    const TimeZone zone{"UTC0"};
    FakeClock clock{1160049600}; // 5 October 2006, 12:00:00 UTC
    const FakeCompression compression;
    const std::string path = directory.file("app.log");
    std::unique_ptr<EntryReader> entries;
    std::shared_ptr<const LineJoin> join;
    std::unique_ptr<FollowedReport> report;
    Rows rows;
};

TEST_F(FollowedReportTest, ReadsEveryGenerationNewestFirst) {
    directory.write("app.log", line("10-05", "six") + line("10-05", "seven"));
    directory.write("app.log.1", line("10-04", "four") + line("10-04", "five"));
    directory.write("app.log.2.gz", "GZ" + line("10-03", "two") + line("10-03", "three"));
    directory.write("app.log.10.gz", "GZ" + line("10-01", "one"));
    EXPECT_THAT(run(), ElementsAre("seven", "six", "five", "four", "three", "two", "one"));
    EXPECT_THAT(read(), ElementsAre("", ".1", ".2.gz", ".10.gz"));
    EXPECT_THAT(problems(), IsEmpty());
    EXPECT_EQ(report->reached(), "1061001120000000");
    EXPECT_FALSE(report->isLimited());
    EXPECT_EQ(rows.done, 7 * line("10-05", "").size() + 27 + 2 * 2) << "all bytes";
}

TEST_F(FollowedReportTest, EntriesOfSeveralLinesAreOneRow) {
    join = TestJoin::indented();
    directory.write("app.log", line("10-05", "six") + " at a\n at b\n" + line("10-05", "seven") +
                                   " at c\n at d");
    directory.write("app.log.1", line("10-04", "four") + line("10-04", "five") + " at e\n");
    directory.write("app.log.2.gz", "GZ" + line("10-03", "two") + " at f\n" +
                                        line("10-03", "three") + " at g\n at h");
    EXPECT_THAT(run(), ElementsAre("seven", "six", "five", "four", "three", "two"));
    EXPECT_EQ(report->skipped(), 0U) << "no line is an entry that does not fit";
    // The only entry of the first file says when it begins.
    directory.write("app.log", line("10-05", "six") + " at a\n");
    EXPECT_THAT(run("1061005000000000"), ElementsAre("six"));
    EXPECT_THAT(read(), ElementsAre("", ".1"));
}

TEST_F(FollowedReportTest, ReadsGenerationsWithDates) {
    directory.write("app.log", line("10-05", "three"));
    directory.write("app.log-20061004", line("10-04", "two"));
    directory.write("app.log-20061003.gz", "GZ" + line("10-03", "one"));
    directory.write("app.log.swp", line("10-02", "another program's"));
    EXPECT_THAT(run(), ElementsAre("three", "two", "one"));
}

TEST_F(FollowedReportTest, LinesThatDoNotFitArePassedOverAndCounted) {
    std::string text = line("10-05", "one");
    for (int number = 0; number < 50; ++number) {
        text += "no syslog line\n";
    }
    directory.write("app.log", text + line("10-05", "two"));
    EXPECT_THAT(run(), ElementsAre("two", "one"));
    EXPECT_EQ(report->skipped(), 50U);
    EXPECT_THAT(problems(), IsEmpty());
}

TEST_F(FollowedReportTest, LinesThatDoNotFitATextLogsFormatArePassedOverAndCounted) {
    entries =
        entriesOf<UserLogFile>('U', R"(A , "%d-%d-%d %255[^\n]" , year month day description)");
    ASSERT_NE(entries, nullptr);
    const std::string longLine = "2006-10-05 long " + std::string(100'000, 'x') + '\n';
    std::string text = "2006-10-04 one\n" + longLine;
    for (int number = 0; number < 12; ++number) {
        text += "neither\n" + std::string(3000, 'y') + '\n';
    }
    directory.write("app.log", text + "2006-10-05 two\n");
    directory.write("app.log.1.gz", "GZ2006-10-03 zero\nneither\n");
    EXPECT_THAT(run(), ElementsAre("two", "long " + std::string(250, 'x'), "one", "zero"))
        << "of a long line, the beginning is the entry";
    EXPECT_EQ(report->skipped(), 25U);
}

TEST_F(FollowedReportTest, AFormatThatCannotBeUsedHasNoReader) {
    EXPECT_EQ(entriesOf<UserLogFile>('U', "nothing of the kind"), nullptr);
}

TEST_F(FollowedReportTest, ReadsRecordsOverGenerations) {
    entries = entriesOf<AdminLogFile>('A');
    const auto record = [](std::int64_t time) {
        AdminLogFile::utmp utmp{};
        utmp.ut_time = time;
        return std::string(reinterpret_cast<const char*>(&utmp), sizeof utmp);
    };
    directory.write("app.log", record(1160049600) + record(1160049601) + "incomplete");
    directory.write("app.log.1", record(1159963200));
    run();
    EXPECT_THAT(rows.times, ElementsAre("1061005", "1061005", "1061004"));
    run("1061004120000000", "1061004120000000");
    EXPECT_THAT(rows.times, ElementsAre("1061004"));
}

TEST_F(FollowedReportTest, TheLimitCountsTheRowsThatMeetTheConditions) {
    directory.write("app.log", line("10-05", "three") + line("10-05", "no a"));
    directory.write("app.log.1.gz",
                    "GZ" + line("10-03", "one") + line("10-03", "no b") + line("10-04", "two"));
    EXPECT_THAT(run(always, endOfTime, 1), ElementsAre("three"));
    EXPECT_TRUE(report->isLimited());
    EXPECT_THAT(read(), ElementsAre(""));
    EXPECT_THAT(run(always, endOfTime, 2), ElementsAre("three", "two"))
        << "the newest of a compressed generation";
    EXPECT_TRUE(report->isLimited());
    EXPECT_THAT(run(always, endOfTime, 4), ElementsAre("three", "two", "one"));
    EXPECT_FALSE(report->isLimited());
}

TEST_F(FollowedReportTest, TheProgressNeverGoesBack) {
    std::string text = "GZ";
    for (int number = 0; number < 30'000; ++number) {
        text += line("10-04", "text");
    }
    directory.write("app.log", line("10-05", "newest"));
    directory.write("app.log.1.gz", text);
    EXPECT_THAT(run(always, endOfTime, 1000), SizeIs(1000)); // the receiver checks it
    EXPECT_EQ(rows.done, line("10-05", "newest").size() + text.size());
}

TEST_F(FollowedReportTest, GenerationsOutsideTheWindowAreNotRead) {
    directory.write("app.log", line("10-05", "five"));
    directory.write("app.log.1.gz", "GZ" + line("10-04", "four"));
    directory.write("app.log.2.gz", "GZ" + line("10-03", "three"));
    directory.write("app.log.3.gz", "GZ" + line("10-02", "two"));
    directory.write("app.log.4.gz", "GZ" + line("10-01", "one"));
    EXPECT_THAT(run("1061003000000000", "1061003235959000"), ElementsAre("three"));
    EXPECT_THAT(read(), ElementsAre(".2.gz", ".3.gz")) << "older lines may follow in .3.gz";
    const Fault fault("open", EACCES, {.skip = 2, .times = -1});
    EXPECT_THAT(run("1061004180000000"), ElementsAre("five"));
    EXPECT_EQ(fault.failed(), 0) << "what is older than the window is not even opened";
}

TEST_F(FollowedReportTest, EntriesOutOfOrderAreFound) {
    directory.write("app.log", line("10-04", "one") + "2006-10-03T11:30:00 web1 app: older\n" +
                                   "2001-01-01T00:00:00 web1 app: clock not set\n" +
                                   line("10-05", "two"));
    EXPECT_THAT(run("1061004000000000"), ElementsAre("two", "one"));
}

TEST_F(FollowedReportTest, TheReadingEndsWhereEntriesAreTooOld) {
    std::string text = "not a syslog line\n";
    for (int number = 0; number < 20'000; ++number) {
        text += line("10-03", "old");
    }
    directory.write("app.log", text + line("10-05", "new"));
    EXPECT_THAT(run("1061004000000000"), ElementsAre("new"));
    EXPECT_EQ(report->skipped(), 0U) << "the first line was not reached";
}

TEST_F(FollowedReportTest, TimesWithoutAYearGetTheirsFromWhatIsNewer) {
    directory.write("app.log", "Jan  2 00:00:00 web1 app: four\n");
    directory.write("app.log.1",
                    "Dec 31 00:00:00 web1 app: two\nJan  1 00:00:00 web1 app: three\n");
    directory.write("app.log.2.gz", "GZFeb  1 00:00:00 web1 app: one\n"
                                    "Dec 30 00:00:00 web1 app: one and a half\n");
    run();
    EXPECT_THAT(rows.times, ElementsAre("1060102", "1060101", "1051231", "1051230", "1050201"));
    entries = entriesOf<UserLogFile>('U', R"(A , "%s %d %255[^\n]" , month day description)");
    directory.write("app.log", "Jan 2 four\n");
    directory.write("app.log.1", "Dec 31 two\nJan 1 three\nDec 31 late\n");
    directory.write("app.log.2.gz", "GZFeb 1 one\nDec 30 one and a half\n");
    run();
    EXPECT_THAT(rows.times,
                ElementsAre("1060102", "1051231", "1060101", "1051231", "1051230", "1050201"));
}

TEST_F(FollowedReportTest, OfADamagedGenerationWhatCanBeReadIsGiven) {
    directory.write("app.log", line("10-05", "three"));
    directory.write("app.log.1.gz", "GZ" + line("10-04", "two") + "\1" + line("10-04", "lost"));
    directory.write("app.log.2.gz", "no compressed file");
    directory.write("app.log.3.gz", "GZ" + line("10-02", "one"));
    EXPECT_THAT(run(), ElementsAre("three", "two", "one"));
    EXPECT_THAT(problems(),
                ElementsAre(".1.gz: it is damaged: only the first 34 bytes of its contents can "
                            "be read, and the last of them may be wrong",
                            ".2.gz: it is damaged: only the first 0 bytes of its contents can be "
                            "read"));
}

TEST_F(FollowedReportTest, AGenerationThatCannotBeOpenedIsNamed) {
    directory.write("app.log", line("10-05", "two"));
    directory.write("app.log.1", line("10-04", "secret"));
    directory.write("app.log.2", line("10-03", "one"));
    const Fault fault("open", EACCES, {.skip = 1});
    EXPECT_THAT(run(), ElementsAre("two", "one"));
    EXPECT_THAT(problems(), ElementsAre(".1: it cannot be opened: Permission denied"));
}

TEST_F(FollowedReportTest, AFailedReadIsNamedAndTheOthersAreRead) {
    directory.write("app.log", line("10-05", "two"));
    directory.write("app.log.1", line("10-04", "one"));
    const Fault fault("pread", EIO, {.skip = 1}); // the first read looks for the first time
    EXPECT_THAT(run(), ElementsAre("one"));
    EXPECT_THAT(problems(), ElementsAre(": reading it failed before byte 34: Input/output error"));
}

TEST_F(FollowedReportTest, ALogThatIsNoFileDoesNotKeepItWaiting) {
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    directory.write("app.log.1", line("10-04", "one"));
    EXPECT_THAT(run(), ElementsAre("one"));
    EXPECT_THAT(problems(), ElementsAre(": it is not a regular file"));
}

TEST_F(FollowedReportTest, ALogWithoutAFileIsAProblemOnlyWithoutGenerations) {
    run();
    EXPECT_THAT(problems(), ElementsAre(": there is no such file"));
    directory.write("app.log.1", line("10-04", "one"));
    EXPECT_THAT(run(), ElementsAre("one"));
    EXPECT_THAT(problems(), IsEmpty());
}

TEST_F(FollowedReportTest, AFileIsReadOnceUnderTwoNames) {
    directory.write("app.log", line("10-05", "two"));
    ASSERT_EQ(link(path.c_str(), directory.file("app.log.1").c_str()), 0);
    directory.write("app.log.2", line("10-04", "one"));
    directory.write("app.log.2.gz", "GZ" + line("10-04", "one"));
    EXPECT_THAT(run(), ElementsAre("two", "one"));
}

TEST_F(FollowedReportTest, CopiesOfTheLogAreNotReadAgain) {
    const std::string oldest = line("10-03", "one");
    directory.write("app.log", oldest + line("10-04", "two") + line("10-05", "three"));
    directory.write("app.log.1", oldest + line("10-04", "two"));
    directory.write("app.log.2", oldest);
    directory.write("app.log.3", line("10-03", "another") + line("10-03", "one"));
    EXPECT_THAT(run(), ElementsAre("three", "two", "one", "one", "another"));
    EXPECT_THAT(read(), ElementsAre("", ".3"));
    EXPECT_THAT(problems(), IsEmpty());
}

TEST_F(FollowedReportTest, CompressedCopiesOfTheLogAreNotReadAgain) {
    const std::string oldest = line("10-03", "one");
    directory.write("app.log", oldest + line("10-04", "two") + line("10-05", "three"));
    directory.write("app.log.1.gz", "GZ" + oldest + line("10-04", "two"));
    directory.write("app.log.2.gz", "GZ" + oldest);
    directory.write("app.log.3.gz", "GZ" + oldest + line("10-03", "another"));
    EXPECT_THAT(run(), ElementsAre("three", "two", "one", "another", "one"));
    EXPECT_THAT(read(), ElementsAre("", ".3.gz"));
    EXPECT_THAT(problems(), IsEmpty());
}

TEST_F(FollowedReportTest, EntriesWithAWrongTimeAtTheBeginningHideNoGeneration) {
    const std::string wrong = "1999-01-01T12:00:00 web1 app: boot\n";
    directory.write("app.log", wrong + wrong + line("10-05", "three"));
    directory.write("app.log.1", "2027-01-01T12:00:00 web1 app: early\n" + line("10-04", "two"));
    directory.write("app.log.2", line("10-03", "one"));
    EXPECT_THAT(run("1061003000000000", "1061006000000000"), ElementsAre("three", "two", "one"));
}

TEST_F(FollowedReportTest, GenerationsAreWhereRotationMovesThemAndBesideALinksTarget) {
    std::filesystem::create_directories(directory.path() / "real/old");
    directory.write("real/app.log", line("10-05", "three"));
    directory.write("real/app.log.1", line("10-04", "two"));
    directory.write("real/old/app.log.2", line("10-03", "one"));
    ASSERT_EQ(symlink("real/app.log", path.c_str()), 0);
    entries = entriesOf<SysLogFile>('S');
    report = std::make_unique<FollowedReport>(
        path, *entries, FollowedReport::Options{always, endOfTime, 10, "old"});
    report->run(rows);
    EXPECT_THAT(rows.given, ElementsAre("three", "two", "one"));
}

TEST_F(FollowedReportTest, AGenerationThatIsReplacedMeanwhileIsNamed) {
    directory.write("app.log", line("10-05", "two"));
    directory.write("app.log.1", line("10-04", "one"));
    struct Rotating : Rows {
        explicit Rotating(TemporaryDirectory& directory) : files(directory) {}
        void give(const zrm_rmlogent_data_t& row, const FollowedReport::Detail& detail) override {
            Rows::give(row, detail);
            files.write("other", line("10-03", "not asked for"));
            rename(files.file("other").c_str(), files.file("app.log.1").c_str());
        }
        TemporaryDirectory& files;
    } rotating(directory);
    entries = entriesOf<SysLogFile>('S');
    report = std::make_unique<FollowedReport>(path, *entries,
                                              FollowedReport::Options{always, endOfTime, 10, ""});
    report->run(rotating);
    EXPECT_THAT(rotating.given, ElementsAre("two"));
    EXPECT_THAT(problems(), ElementsAre(".1: it was replaced while the report was being read"));
}

TEST_F(FollowedReportTest, WhatIsTruncatedMeanwhileIsNamed) {
    std::string text;
    while (text.size() < 600'000) {
        text += line("10-05", "text");
    }
    directory.write("app.log", text);
    struct Truncating : Rows {
        explicit Truncating(std::string log) : path(std::move(log)) {}
        void progress(std::int64_t, std::int64_t) override {
            EXPECT_EQ(truncate(path.c_str(), 0), 0);
        }
        std::string path;
    } truncating(path);
    entries = entriesOf<SysLogFile>('S');
    report = std::make_unique<FollowedReport>(
        path, *entries, FollowedReport::Options{always, endOfTime, 100'000, ""});
    report->run(truncating);
    EXPECT_FALSE(truncating.given.empty());
    EXPECT_THAT(problems(), ElementsAre(": it was truncated while the report was being read"));
}

} // namespace
