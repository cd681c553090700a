#include "host/analysis/Explainer.h"

#include "host/analysis/LogTail.h"
#include "host/analysis/StoredRow.h"
#include "host/config/SituationValidator.h"
#include "host/events/RowJson.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logtypes/SysLogFile.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include <sys/stat.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

SituationConfig situation(const char* frequency = nullptr) {
    SituationText text;
    text.name = "tried";
    text.when = {"ENTRYDESC starts 'hit'"};
    if (frequency != nullptr) {
        text.frequency = frequency;
        text.period = "60s";
    }
    const auto [config, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    return config;
}

class ExplainerTest : public testing::Test {
protected:
    std::vector<std::string> linesOf(TestLog& log) {
        std::vector<std::string> lines;
        problem = reasonOf(LogTail(log).read([&](auto line, zrm_rmlogent_data_t* row) {
            lines.push_back(std::string(line.value_or("-")) + (row != nullptr ? "" : " (no row)"));
        }));
        return lines;
    }
    static std::vector<long> counts(const std::vector<Explanation>& explanations) {
        std::vector<long> counts;
        for (const Explanation& explanation : explanations) {
            counts.push_back(explanation.window->count.value_or(-1));
        }
        return counts;
    }
    Explainer explainer(const char* frequency = nullptr, bool isStopped = false) {
        return Explainer(situation(frequency), isStopped, entries);
    }
    void write(const std::string& text) { directory.write("app.log", text); }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory directory;
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    TestLog log{directory.write("app.log", ""), " ;N ;S"};
    std::string problem;
};

TEST_F(ExplainerTest, ReadsTheLogsLines) {
    EXPECT_THAT(linesOf(log), IsEmpty());
    write("1 a\nnonsense\n2 b");
    EXPECT_THAT(linesOf(log), ElementsAre("1 a", "nonsense (no row)", "2 b"));
    EXPECT_EQ(log.numEvents(), 0) << "the monitor's counters count nothing of it";
    EXPECT_EQ(log.numFormatErrors(), 0);
    std::filesystem::remove(directory.file("app.log"));
    EXPECT_THAT(linesOf(log), IsEmpty());
    EXPECT_EQ(problem, "the log cannot be read: No such file or directory");
}

TEST_F(ExplainerTest, ReportsHowFarBackItRead) {
    write("nonsense\n1 a\n2 b\n");
    Explainer whole = explainer();
    whole.last(log, 1);
    EXPECT_TRUE(whole.reach().isComplete());
    EXPECT_EQ(whole.reach().reached, stampAt(1));
    write("1 front\n" + std::string(LogTail::longest, 'y') + "\n3 end\n");
    Explainer tail = explainer();
    tail.last(log, 1);
    EXPECT_EQ(tail.reach().reason, "only the end of the log is read, 4 MiB");
    EXPECT_EQ(tail.reach().reached, stampAt(3));
    std::filesystem::remove(directory.file("app.log"));
    Explainer gone = explainer();
    gone.line(log, "5 hit");
    EXPECT_EQ(gone.reach().reason, "the log cannot be read: No such file or directory");
    EXPECT_EQ(gone.reach().reached, "");
}

TEST_F(ExplainerTest, ReportsHowFarBackItReadALogWithoutLines) {
    TestLog logins(directory.write("wtmp", ""), " ;N ;A");
    logins.entries = {{1, "a"}, {2, "b"}};
    Explainer whole = explainer();
    whole.last(logins, 1);
    EXPECT_TRUE(whole.reach().isComplete());
    EXPECT_EQ(whole.reach().reached, stampAt(1));
    logins.endsWith = ReportEnd::brokenRecord;
    whole.last(logins, 1);
    EXPECT_EQ(whole.reach().reason, "the log does not consist of whole records");
    logins.canReport = false;
    whole.last(logins, 1);
    EXPECT_EQ(whole.reach().reason, "the log cannot be read");
}

TEST_F(ExplainerTest, DoesNotWaitForAPipeInTheLogsPlace) {
    TestLog binary(directory.file("app.log"), " ;N ;A");
    binary.entries = {{0, "hit"}};
    std::filesystem::remove(directory.file("app.log"));
    ASSERT_EQ(mkfifo(directory.file("app.log").c_str(), 0600), 0);
    EXPECT_THAT(linesOf(log), IsEmpty());
    EXPECT_EQ(problem, "the log cannot be read: it is not a regular file");
    EXPECT_EQ(reasonOf(explainer().last(binary, 2)), problem);
    EXPECT_EQ(binary.reports, 0);
}

TEST_F(ExplainerTest, EndsAlthoughTheLogKeepsGrowing) {
    write("1 a\n");
    std::ofstream more(directory.file("app.log"), std::ios::app);
    const std::string line = "1 " + std::string(2000, 'x') + "\n";
    std::size_t lines = 0;
    EXPECT_EQ(reasonOf(LogTail(log).read([&](auto, auto*) {
                  ++lines;
                  // The reading is always behind.
                  more << line << line << std::flush;
              })),
              "");
    EXPECT_GT(lines, LogTail::longest / line.size());
    EXPECT_LT(lines, 3 * LogTail::longest / line.size());
}

TEST_F(ExplainerTest, ReadsTheLastWholeLinesOfALargeLog) {
    const std::string line = "1 " + std::string(97, 'x') + "\n";
    std::string text;
    for (std::size_t size = 0; size < LogTail::longest + 1000; size += line.size()) {
        text += line;
    }
    write(text);
    EXPECT_EQ(linesOf(log).size(), LogTail::longest / line.size());
    EXPECT_EQ(linesOf(log).front() + "\n", line);
    // A line that begins just where the reading does is one of them.
    write("front\n" + std::string(LogTail::longest - 4, 'y') + "\nend");
    EXPECT_EQ(linesOf(log).front(), std::string(2047, 'y') + " (no row)");
    write("front\n" + std::string(LogTail::longest - 3, 'y') + "\nend");
    EXPECT_THAT(linesOf(log), ElementsAre("end (no row)"));
}

/// A followed log that nobody monitors.
struct FollowedSyslog : SysLogFile {
    explicit FollowedSyslog(const ValidLog& log) : SysLogFile(log, SysLogFile::Unmonitored{}) {}
};

TEST_F(ExplainerTest, ReadsOlderGenerationsOfAFollowedLog) {
    const auto line = [](int day, const std::string& text) {
        return "2006-10-0" + std::to_string(day) + "T12:00:00 web1 app: " + text + '\n';
    };
    const ValidLog named(FurtherLog{directory.file("app.log"), 'S', 'N', "",
                                    std::make_shared<const FollowSettings>()});
    FollowedSyslog followed(named);
    const auto read = [&](LogTail& tail) {
        std::vector<std::string> texts;
        EXPECT_TRUE(tail.read([&](auto text, zrm_rmlogent_data_t*) {
            texts.emplace_back(text->substr(text->rfind(' ') + 1));
        }));
        return texts;
    };
    write(line(5, "four") + line(5, "five"));
    directory.write("app.log.1", line(5, "four")); // a copy
    directory.write("app.log.2", line(3, "two") + line(4, "three"));
    directory.write("app.log.3", line(2, "one"));
    LogTail whole(followed);
    EXPECT_THAT(read(whole), ElementsAre("one", "two", "three", "four", "five"));
    EXPECT_TRUE(whole.reach().isComplete()) << whole.reach().reason;
    EXPECT_EQ(whole.reach().reached.substr(0, 7), "1061002");
    std::filesystem::rename(directory.file("app.log.3"), directory.file("app.log.3.gz"));
    LogTail cut(followed);
    EXPECT_THAT(read(cut), ElementsAre("two", "three", "four", "five"));
    EXPECT_EQ(cut.reach().reason,
              directory.file("app.log.3.gz") + " and older generations are not read");
    write(line(5, std::string(LogTail::longest - 60, 'x')));
    LogTail full(followed);
    EXPECT_EQ(read(full).size(), 1U);
    EXPECT_FALSE(full.reach().isComplete());
}

TEST_F(ExplainerTest, ExplainsTheLastEntriesOldestFirst) {
    write("0 hit\n1 miss\n2 hit\nnonsense\n3 hit\n");
    Explainer asked = explainer(">= 2");
    const std::vector<Explanation> all = asked.last(log, 3).value();
    ASSERT_EQ(all.size(), 3u);
    EXPECT_EQ(all[0].line, "2 hit");
    EXPECT_EQ(all[0].decision, "Would be raised: 2 entries in 60 s, the threshold is >= 2.");
    EXPECT_EQ(all[1].line, "nonsense");
    EXPECT_EQ(all[1].row, "");
    EXPECT_EQ(all[1].decision, "Would not be raised: the line yields no entry.");
    EXPECT_EQ(all[2].window->count, 3);
    const std::vector<Explanation> two = explainer(">= 2").last(log, 5).value();
    EXPECT_EQ(two[0].decision, "Would not be raised: 1 entry in 60 s, the threshold is >= 2.");
    EXPECT_EQ(two[1].decision, "Would not be raised: ENTRYDESC 'miss' does not start with 'hit'.");
    EXPECT_FALSE(two[1].window->count);
}

TEST_F(ExplainerTest, ExplainsALineInTheLogOrAsTheNextOne) {
    write("0 hit\n10 hit\n20 hit\n30 hit\n");
    EXPECT_THAT(counts(explainer(">= 9").line(log, "20 hit").value()), ElementsAre(3)) << "held";
    EXPECT_THAT(counts(explainer(">= 9").line(log, "65 hit").value()), ElementsAre(4)) << "next";
    EXPECT_THAT(counts(explainer(">= 9").line(log, "15 hit").value()), ElementsAre(3)) << "between";
    EXPECT_THAT(counts(explainer(">= 9").line(log, "500 hit").value()), ElementsAre(1));
    const std::vector<Explanation> nonsense = explainer().line(log, "nonsense").value();
    ASSERT_EQ(nonsense.size(), 1u);
    EXPECT_FALSE(nonsense[0].isRaised);
    EXPECT_NE(nonsense[0].reason, "");
}

TEST_F(ExplainerTest, ReportsThatTheSituationDoesNotRun) {
    write("0 hit\n1 miss\n");
    const std::vector<Explanation> all = explainer(nullptr, true).last(log, 2).value();
    EXPECT_EQ(all[0].decision,
              "Would be raised if the situation were started: every condition holds.");
    EXPECT_EQ(all[1].decision, "Would not be raised: ENTRYDESC 'miss' does not start with 'hit'.");
}

TEST_F(ExplainerTest, FindsTheEntryOfAnEventInItsLog) {
    write("0 hit\n10 hit\n10 hit\n20 hit\n");
    Explainer::EventEntry event{7, true, rowAt(10, "hit")};
    event.row.freqthresh = 3; // the second of the two
    Explanation explanation = explainer(">= 2").event(&log, event);
    EXPECT_EQ(explanation.event, 7u);
    EXPECT_EQ(explanation.line, "10 hit");
    EXPECT_EQ(explanation.window->count, 3);
    EXPECT_TRUE(explanation.isRaised);
    // For another situation the last such entry stands for it.
    event.isOwn = false;
    EXPECT_EQ(explainer(">= 2").event(&log, event).window->count, 3);
}

TEST_F(ExplainerTest, ExplainsAnEventThatItsLogNoLongerHolds) {
    Explainer::EventEntry event{7, true, rowAt(10, "hit")};
    event.row.freqthresh = 5;
    Explanation own = explainer(">= 5").event(&log, event);
    EXPECT_FALSE(own.line);
    EXPECT_EQ(own.decision, "Would be raised: 5 entries in 60 s, the threshold is >= 5.");
    event.isOwn = false;
    Explanation other = explainer(">= 2").event(nullptr, event);
    EXPECT_TRUE(other.matches);
    EXPECT_FALSE(other.isRaised);
    EXPECT_FALSE(other.window->count);
    EXPECT_EQ(other.decision, "Cannot be determined: every condition holds, but the log no longer "
                              "contains the entry, so the ones before it cannot be counted.");
    EXPECT_EQ(explainer().event(nullptr, event).decision,
              "Would be raised: every condition holds.");
    event.row = rowAt(10, "miss");
    EXPECT_EQ(explainer(">= 2").event(nullptr, event).decision,
              "Would not be raised: ENTRYDESC 'miss' does not start with 'hit'.");
}

TEST_F(ExplainerTest, ReadsTheEntriesOfOtherLogsThroughReports) {
    TestLog binary(directory.write("wtmp", ""), " ;N ;A");
    EXPECT_FALSE(LogTail(binary).hasLines());
    binary.entries = {{0, "hit"}, {5, "miss"}, {10, "hit"}};
    const std::vector<Explanation> all = explainer(">= 1").last(binary, 2).value();
    ASSERT_EQ(all.size(), 2u);
    EXPECT_FALSE(all[0].line);
    EXPECT_FALSE(all[0].matches);
    EXPECT_EQ(all[1].window->count, 2);
    EXPECT_EQ(binary.ends, 1);
}

TEST_F(ExplainerTest, RebuildsRowsFromEvents) {
    Explainer asked = explainer();
    zrm_rmlogent_data_t row = rowAt(10, "it's \"hit\" \\ <b>");
    row.freqthresh = 5;
    const std::string event = JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("id", 1).key("row");
        RowJson(asked.layout()).write(json, reinterpret_cast<const char*>(&row));
        json.endObject();
    });
    zrm_rmlogent_data_t read;
    ASSERT_TRUE(StoredRow::fill(read, asked.layout(), event));
    EXPECT_TRUE(StoredRow::isSameEntry(asked.layout(), row, read));
    EXPECT_EQ(read.freqthresh, 5);
    read.entrysrc[0] = 'x';
    EXPECT_FALSE(StoredRow::isSameEntry(asked.layout(), row, read));
    for (const char* const text : {"", "{}", "{\"row\":5}", "[]", "{\"row\":"}) {
        EXPECT_FALSE(StoredRow::fill(read, asked.layout(), text)) << text;
    }
    EXPECT_TRUE(StoredRow::fill(read, asked.layout(), "{\"row\":{\"FREQTHRESH\":\"x\"}}"));
    EXPECT_EQ(read.freqthresh, 0);
}

} // namespace
