#include "host/analysis/Backtest.h"

#include "host/config/SituationValidator.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logtypes/SysLogFile.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"
#include "unit/monitor/FakeCompression.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class BacktestTest : public testing::Test {
protected:
    Backtest::Result run(std::vector<std::string> when, const char* frequency = nullptr) {
        SituationText text;
        text.name = "tried";
        text.when = std::move(when);
        if (frequency != nullptr) {
            text.frequency = frequency;
            text.period = "60s";
        }
        const auto [config, problems] = SituationValidator::check(text);
        EXPECT_THAT(problems, IsEmpty());
        Backtest test(config, entries);
        return test.run(logs, from, to, [this] { return isCancelled; });
    }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory directory;
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    TestLog first{directory.write("first.log", "")};
    TestLog second{directory.write("second.log", "")};
    std::vector<LogFile*> logs{&first, &second};
    std::string from = stampAt(0);
    std::string to = stampAt(1000);
    bool isCancelled = false;
};

TEST_F(BacktestTest, ReportsWhenItWouldHaveBeenRaised) {
    first.entries = {{-1, "hit"}, {0, "hit"},    {10, "miss"},
                     {20, "hit"}, {1000, "hit"}, {1001, "hit"}};
    const Backtest::Result result = run({"ENTRYDESC = 'hit'"});
    EXPECT_EQ(result.entries, 4u);
    EXPECT_EQ(result.matched, 3u);
    EXPECT_EQ(result.raised, 3u);
    EXPECT_FALSE(result.isTruncated);
    EXPECT_THAT(result.raisedAt, ElementsAre(stampAt(0), stampAt(20), stampAt(1000)));
    const std::string begin = stampAt(0);
    EXPECT_EQ(result.decision, "Would have been raised 3 times, first at 20" + begin.substr(1, 2) +
                                   "-" + begin.substr(3, 2) + "-" + begin.substr(5, 2) + " " +
                                   begin.substr(7, 2) + ":" + begin.substr(9, 2) + ":" +
                                   begin.substr(11, 2) + ": 3 of 4 entries meet every condition.");
    EXPECT_EQ(first.ends, 1);
}

TEST_F(BacktestTest, JudgesTheEntriesOfAllLogsInTheOrderOfTheirTimes) {
    first.entries = {{0, "a"}, {100, "a"}, {200, "a"}};
    second.entries = {{30, "b"}, {150, "b"}, {140, "late"}, {500, "b"}};
    const Backtest::Result result = run({}, ">= 2");
    EXPECT_THAT(result.raisedAt,
                ElementsAre(stampAt(30), stampAt(140), stampAt(150), stampAt(200)));
    EXPECT_EQ(result.entries, 7u);
}

TEST_F(BacktestTest, ReportsWhyItWouldNotHaveBeenRaised) {
    EXPECT_EQ(run({}).decision,
              "Would not have been raised: there are no entries between these times.");
    first.entries = {{0, "x"}};
    EXPECT_EQ(run({"ENTRYDESC = 'y'"}).decision,
              "Would not have been raised: none of 1 entry meets every condition.");
    EXPECT_EQ(run({}, ">= 2").decision, "Would not have been raised: 1 of 1 entry meets every "
                                        "condition, but never >= 2 in 60 s.");
    first.entries = {{0, "x"}, {100, "x"}};
    EXPECT_EQ(run({}, "> 1").decision, "Would not have been raised: 2 of 2 entries meet every "
                                       "condition, but never >= 2 in 60 s.");
}

/// A followed log that nobody monitors.
class FollowedBacktestTest : public BacktestTest {
protected:
    struct Unmonitored : SysLogFile {
        explicit Unmonitored(const ValidLog& log) : SysLogFile(log, SysLogFile::Unmonitored{}) {}
    };

    FollowedBacktestTest() {
        from = "1061001000000000";
        to = "1061005120004000";
        logs = {&log};
    }
    static std::string line(const std::string& time, const std::string& text) {
        return "2006-10-" + time + " web1 app: " + text + '\n';
    }
    /// As the trace of raised times shows them: day and time.
    static std::vector<std::string> moments(const Backtest::Result& result) {
        std::vector<std::string> moments;
        for (const std::string& stamp : result.raisedAt) {
            moments.push_back(stamp.substr(5, 8));
        }
        return moments;
    }

    const FakeCompression compression;
    const std::string path =
        directory.write("app.log", line("05T12:00:01", "hit") + line("05T12:00:04", "miss") +
                                       line("05T12:00:05", "hit"));
    const ValidLog named{FurtherLog{path, 'S', 'N', "", std::make_shared<const FollowSettings>()}};
    Unmonitored log{named};
};

TEST_F(FollowedBacktestTest, ReadsEveryGeneration) {
    directory.write("app.log.1", line("04T12:00:00", "hit") + line("05T12:00:00", "hit"));
    directory.write("app.log.2.gz", "GZ" + line("02T12:00:00", "hit") + "no entry\n" +
                                        line("02T12:00:30", "hit") + line("03T00:00:00", "miss"));
    directory.write("app.log.3", line("01T00:00:00", "hit"));
    const Backtest::Result all = run({"ENTRYDESC = 'hit'"});
    EXPECT_EQ(all.entries, 8u);
    EXPECT_EQ(all.matched, 6u);
    EXPECT_THAT(moments(all), ElementsAre("01000000", "02120000", "02120030", "04120000",
                                          "05120000", "05120001"));
    EXPECT_TRUE(all.reach.isComplete()) << all.reach.reason;
    EXPECT_EQ(all.reach.reached, "1061001000000000");
    EXPECT_FALSE(all.isTruncated);
    EXPECT_THAT(moments(run({"ENTRYDESC = 'hit'"}, ">= 2")),
                ElementsAre("02120030", "05120001")); // also across two files
}

TEST_F(FollowedBacktestTest, JudgesConditionsOnFields) {
    directory.write("app.log.1.gz", "GZ" + line("04T12:00:00", "hit"));
    EXPECT_THAT(moments(run({"field.message = 'hit'", "field.host = 'web1'"})),
                ElementsAre("04120000", "05120001"));
    EXPECT_EQ(run({"field.pid = 7"}).matched, 0u);
}

TEST_F(FollowedBacktestTest, SaysWhichFileCannotBeRead) {
    directory.write("app.log.1.gz", "GZ" + line("04T12:00:00", "hit") + "\1");
    const Backtest::Result result = run({"ENTRYDESC = 'hit'"});
    EXPECT_EQ(result.matched, 2u);
    EXPECT_FALSE(result.isTruncated);
    EXPECT_THAT(result.reach.reason, testing::HasSubstr("app.log.1.gz was read: it is damaged"));
}

TEST_F(FollowedBacktestTest, CanBeCancelled) {
    isCancelled = true;
    const Backtest::Result result = run({});
    EXPECT_EQ(result.entries, 0u);
    EXPECT_TRUE(result.isTruncated);
    EXPECT_EQ(result.reach.reason, path + ": the backtest was cancelled");
}

TEST_F(BacktestTest, NamesOnlyTheFirstTimes) {
    for (int n = 0; n < 1001; ++n) {
        first.entries.emplace_back(n, "x");
    }
    const Backtest::Result result = run({});
    EXPECT_EQ(result.raised, 1001u);
    ASSERT_EQ(result.raisedAt.size(), 1000u);
    EXPECT_EQ(result.raisedAt.back(), stampAt(999));
}

TEST_F(BacktestTest, EndsEarlyWhenItIsCancelledAndSaysSo) {
    for (int n = 0; n < 3000; ++n) {
        first.entries.emplace_back(n / 3, "x");
    }
    isCancelled = true;
    EXPECT_TRUE(run({}).isTruncated);
    EXPECT_EQ(first.ends, first.reports) << "the report is closed";
    EXPECT_EQ(second.reports, 0);
    EXPECT_THAT(run({}).decision,
                testing::EndsWith("; older entries were not examined: " +
                                  directory.file("first.log") + ": the backtest was cancelled."));
}

TEST_F(BacktestTest, ReportsHowFarItReached) {
    first.entries = {{0, "x"}, {100, "x"}};
    second.entries = {{50, "x"}};
    Backtest::Result result = run({});
    EXPECT_TRUE(result.reach.isComplete());
    EXPECT_EQ(result.reach.reached, stampAt(0));
    second.canReport = false;
    result = run({});
    EXPECT_FALSE(result.isTruncated);
    EXPECT_EQ(result.reach.reason, directory.file("second.log") + ": the log cannot be read");
    EXPECT_EQ(result.reach.reached, "") << "of that log nothing was read";
    EXPECT_THAT(result.decision, testing::EndsWith("; older entries were not examined: " +
                                                   result.reach.reason + "."));
}

TEST_F(BacktestTest, ReportsWhyTheReadingEndedEarly) {
    first.entries = {{0, "x"}, {100, "x"}};
    second.entries = {{50, "x"}};
    first.endsWith = ReportEnd::formatErrors;
    second.endsWith = ReportEnd::longLine;
    const Backtest::Result result = run({});
    EXPECT_THAT(result.reach.reason, testing::StartsWith(directory.file("first.log") + ": eleven"));
    EXPECT_EQ(result.reach.reached, stampAt(50)) << "from there on both were read";
}

TEST_F(BacktestTest, EndsEarlyEvenBeforeTheFirstEntryOfTheWindow) {
    for (int n = 0; n < 3000; ++n) {
        first.entries.emplace_back(2000 + n, "x"); // all of them behind the last time
    }
    EXPECT_EQ(run({}).entries, 0u);
    EXPECT_FALSE(run({}).isTruncated);
    isCancelled = true;
    const Backtest::Result result = run({});
    EXPECT_EQ(result.entries, 0u);
    EXPECT_TRUE(result.isTruncated);
}

TEST_F(BacktestTest, LetsTheErrorLogsCommandFindTheLastTime) {
    const FakeUname aix("AIX");
    TestLog errors(directory.write("errpt", ""), " ;N ;E");
    errors.entries = {{5, "x"}, {2000, "x"}};
    logs = {&errors};
    EXPECT_THAT(run({}).raisedAt, ElementsAre(stampAt(5)));
    EXPECT_EQ(errors.window().endTime, to);
}

TEST_F(BacktestTest, DoesNotWaitForAPipeInTheLogsPlace) {
    TestLog piped(directory.write("pipe", ""));
    ASSERT_EQ(unlink(directory.file("pipe").c_str()), 0);
    ASSERT_EQ(mkfifo(directory.file("pipe").c_str(), 0600), 0);
    piped.entries = {{5, "x"}};
    logs = {&piped};
    EXPECT_EQ(run({}).entries, 0u);
    EXPECT_EQ(piped.reports, 0);
}

TEST_F(BacktestTest, AnUnreadableLogHasNoEntries) {
    first.canReport = false;
    second.entries = {{5, "x"}};
    const Backtest::Result result = run({});
    EXPECT_THAT(result.raisedAt, ElementsAre(stampAt(5)));
    EXPECT_EQ(first.ends, 0);
}

} // namespace
