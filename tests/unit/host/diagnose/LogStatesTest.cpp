#include "host/diagnose/LogStates.h"

#include "logs/FollowSettings.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class LogStatesTest : public testing::Test {
protected:
    LogStatesTest() {
        m_log.log = "/var/log/a";
        m_log.settings = m_settings;
        m_log.follow.emplace().state = "reading";
        m_log.lastEntry = 1;
    }

    /// How the log is doing, after this much more time.
    LogHealth after(std::chrono::seconds time) {
        m_time += time;
        std::vector<LogLedgerView> logs{m_log};
        m_states.judge(logs, LogStates::Clock::time_point(m_time),
                       wallStart + std::chrono::milliseconds(m_time).count());
        m_warnings = logs[0].warnings;
        return logs[0].health.value();
    }
    void entry() { m_log.lastEntry = *m_log.lastEntry + 1; }
    std::vector<std::string> kinds() const {
        std::vector<std::string> kinds;
        for (const LogWarning& warning : m_warnings) {
            kinds.push_back(warning.kind);
        }
        return kinds;
    }

    static constexpr std::int64_t wallStart = 1'760'000'000'000;

    /// What is known of a state now.
    std::optional<bool> holds(LogState::Kind kind) const {
        for (const LogState& state : m_states.states()) {
            if (state.kind == kind) {
                return state.holds;
            }
        }
        return std::nullopt;
    }

    LogStates m_states;
    const std::shared_ptr<FollowSettings> m_settings = std::make_shared<FollowSettings>();
    LogLedgerView m_log;
    std::vector<LogWarning> m_warnings;
    std::chrono::seconds m_time{1000};
};

TEST_F(LogStatesTest, ALogIsQuietAfterTheConfiguredTime) {
    m_settings->quiet.after = 10min;
    EXPECT_EQ(after(0s), LogHealth::ok);
    EXPECT_EQ(after(599s), LogHealth::ok);
    EXPECT_THAT(m_warnings, IsEmpty());
    EXPECT_EQ(after(1s), LogHealth::quiet);
    ASSERT_THAT(kinds(), ElementsAre("quiet"));
    EXPECT_EQ(m_warnings[0].text, "The log has had no entries for 10 minutes. The configuration "
                                  "expects one every 10 minutes.");
    EXPECT_EQ(after(50min), LogHealth::quiet);
    EXPECT_THAT(m_warnings[0].text, HasSubstr("no entries for 1 hour."));
    EXPECT_EQ(after(25h), LogHealth::quiet);
    EXPECT_THAT(m_warnings[0].text, HasSubstr("no entries for 1 day 2 hours."));
    entry();
    EXPECT_EQ(after(5s), LogHealth::ok);
    EXPECT_EQ(after(599s), LogHealth::ok) << "counted from that entry";
}

TEST_F(LogStatesTest, StatesAreKnownOfLogsThatAskForThem) {
    after(0s);
    EXPECT_THAT(m_states.states(), IsEmpty());
    m_settings->quiet.after = 10min;
    m_log.lastEntry.reset();
    after(1s);
    EXPECT_EQ(m_states.states().size(), LogState::kinds);
    EXPECT_EQ(holds(LogState::Kind::QUIET), std::nullopt) << "an earlier silence may go on";
    EXPECT_EQ(holds(LogState::Kind::UNPARSED), std::nullopt);
    EXPECT_EQ(holds(LogState::Kind::DEAD), false);
    after(10min);
    EXPECT_EQ(holds(LogState::Kind::QUIET), true);
    EXPECT_EQ(m_states.states()[0].since, 600s);
    EXPECT_THAT(m_states.states()[0].text, HasSubstr("no entries for 10 minutes"));
    m_log.lastEntry = 2;
    after(1s);
    EXPECT_EQ(holds(LogState::Kind::QUIET), false);
    m_log.follow->state = "missing";
    after(29s);
    EXPECT_EQ(holds(LogState::Kind::DEAD), std::nullopt);
    after(30s);
    EXPECT_EQ(holds(LogState::Kind::DEAD), true);
}

TEST_F(LogStatesTest, LinesAreUnparsedUntilMostMatchAgain) {
    m_settings->quiet.after = 24h;
    const auto lines = [&](std::int64_t matching, std::int64_t all) {
        m_log.lines += all;
        m_log.rows += matching;
        after(10min);
        return holds(LogState::Kind::UNPARSED);
    };
    after(0s);
    EXPECT_EQ(lines(0, 100), std::nullopt) << "an earlier run may have found it so";
    EXPECT_EQ(lines(900, 900), false);
    EXPECT_EQ(lines(0, 100), true);
    EXPECT_EQ(lines(0, 100), true);
    EXPECT_EQ(lines(100, 100), false);
}

TEST_F(LogStatesTest, SilenceIsNotJudgedUnlessAskedFor) {
    after(0s);
    EXPECT_EQ(after(1000h), LogHealth::ok);
    EXPECT_THAT(m_warnings, IsEmpty());
}

TEST_F(LogStatesTest, ALogLearnsItsRhythm) {
    m_settings->quiet.isLearned = true;
    EXPECT_EQ(after(0s), LogHealth::learning);
    for (int step = 0; step < 8 * 24 * 4; ++step) {
        entry();
        after(15min);
    }
    EXPECT_EQ(after(29min), LogHealth::ok);
    EXPECT_EQ(after(2min), LogHealth::quiet);
    ASSERT_THAT(kinds(), ElementsAre("quiet"));
    EXPECT_EQ(m_warnings[0].text,
              "The log has had no entries for 31 minutes. At this time of the week it is quiet "
              "after 30 minutes, by the weeks before.");
    EXPECT_THAT(m_states.takeLearned(), testing::Not(IsEmpty()));
    EXPECT_THAT(m_states.takeLearned(), IsEmpty());
}

TEST_F(LogStatesTest, ARhythmIsThatOfEarlierRuns) {
    m_settings->quiet.isLearned = true;
    std::vector<SilentHour> hours;
    for (std::int64_t hour = 0; hour < 14 * 24; ++hour) {
        hours.push_back({wallStart / 3'600'000 + 24 - hour, 600});
    }
    m_states = LogStates({{"/var/log/a", hours}, {"/var/log/b", {}}});
    EXPECT_EQ(after(0s), LogHealth::ok);
    EXPECT_EQ(after(19min), LogHealth::ok);
    EXPECT_EQ(after(1min), LogHealth::quiet);
}

TEST_F(LogStatesTest, ALogWithoutAFileIsDeadAfterAWhile) {
    m_settings->quiet.after = 10h;
    m_log.follow->state = "missing";
    EXPECT_EQ(after(0s), LogHealth::ok) << "a rotation may take that long";
    EXPECT_EQ(after(29s), LogHealth::ok);
    EXPECT_EQ(after(1s), LogHealth::dead);
    EXPECT_THAT(kinds(), ElementsAre("dead"));
    m_log.follow->state = "reading";
    EXPECT_EQ(after(1s), LogHealth::ok);
    m_log.follow->state = "missing";
    EXPECT_EQ(after(1s), LogHealth::ok) << "counted anew";
}

TEST_F(LogStatesTest, ALogThatNeverHadAFileIsDeadOnlyWhereItsSilenceMatters) {
    m_log.follow->state = "waiting";
    after(0s);
    EXPECT_EQ(after(30s), LogHealth::ok);
    m_settings->quiet.after = 10h;
    after(0s);
    EXPECT_EQ(after(29s), LogHealth::ok);
    EXPECT_EQ(after(1s), LogHealth::dead);
    EXPECT_THAT(kinds(), ElementsAre("dead"));
    EXPECT_EQ(holds(LogState::Kind::DEAD), true);
    EXPECT_THAT(m_states.states().back().text, HasSubstr("no file has its name"));
}

TEST_F(LogStatesTest, ALogThatCannotBeReadIsDead) {
    m_log.follow->problem = "Input/output error";
    after(0s);
    EXPECT_EQ(after(30s), LogHealth::dead);
    EXPECT_THAT(m_warnings, IsEmpty()) << "there is a warning of another kind";
    m_log.follow->problem.clear();
    m_log.follow->state = "missing";
    EXPECT_EQ(after(30s), LogHealth::dead);
    EXPECT_THAT(m_warnings, IsEmpty()) << "nobody said that the log must be there";
}

TEST_F(LogStatesTest, LinesThatStopMatchingAreSaid) {
    after(0s);
    m_log.lines = 1000;
    m_log.rows = 990;
    EXPECT_EQ(after(10min), LogHealth::ok);
    m_log.lines += 19; // too few
    EXPECT_EQ(after(10min), LogHealth::ok);
    m_log.lines += 1;
    EXPECT_EQ(after(1min), LogHealth::unparsed);
    ASSERT_THAT(kinds(), ElementsAre("unparsed"));
    EXPECT_THAT(m_warnings[0].text, HasSubstr("Only 0% of the latest lines match"));
    m_log.lines += 100;
    m_log.rows += 40;
    EXPECT_EQ(after(10min), LogHealth::unparsed);
    EXPECT_THAT(m_warnings[0].text, HasSubstr("Only 40%"));
    m_log.lines += 100;
    m_log.rows += 50;
    EXPECT_EQ(after(9min), LogHealth::unparsed) << "the window is not over";
    EXPECT_EQ(after(1min), LogHealth::ok);
}

TEST_F(LogStatesTest, LinesThatNeverMatchedAreNotUnparsed) {
    after(0s);
    m_log.lines = 1000;
    m_log.rows = 800;
    after(10min);
    m_log.lines += 1000;
    EXPECT_EQ(after(10min), LogHealth::ok) << "the ledger shows what does not match";
}

TEST_F(LogStatesTest, ANewLedgerBeginsAtZero) {
    m_log.lines = m_log.rows = 1000;
    after(0s);
    m_log.lines = 50;
    m_log.rows = 50;
    EXPECT_EQ(after(10min), LogHealth::ok);
    m_log.lines = 150;
    EXPECT_EQ(after(10min), LogHealth::unparsed);
}

TEST_F(LogStatesTest, ALogThatWasGoneBeginsAnew) {
    m_settings->quiet.after = 10min;
    after(9min);
    std::vector<LogLedgerView> none;
    m_states.judge(none, LogStates::Clock::time_point(m_time), wallStart);
    EXPECT_EQ(after(9min), LogHealth::ok);
}

TEST_F(LogStatesTest, LogsOfTheLogConfigurationAreNotJudged) {
    m_log.follow.reset();
    m_log.settings.reset();
    std::vector<LogLedgerView> logs{m_log};
    m_states.judge(logs, LogStates::Clock::time_point(m_time), wallStart);
    EXPECT_EQ(logs[0].health, std::nullopt);
}

} // namespace
