#include "host/analysis/Backtest.h"

#include "host/config/SituationValidator.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

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
