#include "host/analysis/Replay.h"

#include "host/config/SituationValidator.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

SituationConfig situation(std::vector<std::string> when, const char* frequency = nullptr,
                          const char* period = nullptr) {
    SituationText text;
    text.name = "tried";
    text.when = std::move(when);
    if (frequency != nullptr) {
        text.frequency = frequency;
        text.period = period;
    }
    const auto [config, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    return config;
}

class ReplayTest : public testing::Test {
protected:
    /// The counts of entries at these seconds; negative where the entry is not raised.
    static std::vector<long> judged(Replay& replay, const std::vector<int>& seconds) {
        std::vector<long> counts;
        for (const int at : seconds) {
            zrm_rmlogent_data_t row = rowAt(at, "hit");
            const Replay::Verdict verdict = replay.judge(row);
            EXPECT_TRUE(verdict.matches);
            counts.push_back(verdict.isRaised ? *verdict.frequency : -*verdict.frequency);
        }
        return counts;
    }

    RecordingTrace trace{TRC1_ERROR};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
};

TEST_F(ReplayTest, JudgesTheConditions) {
    Replay replay(situation({"ENTRYDESC starts 'hit'"}), entries);
    ASSERT_TRUE(replay.isOpen());
    EXPECT_FALSE(replay.hasThresholds());
    zrm_rmlogent_data_t hit = rowAt(0, "hit 1");
    zrm_rmlogent_data_t miss = rowAt(0, "miss");
    EXPECT_TRUE(replay.matches(hit));
    EXPECT_FALSE(replay.matches(miss));
    const Replay::Verdict verdict = replay.judge(hit);
    EXPECT_TRUE(verdict.matches && verdict.isRaised);
    EXPECT_FALSE(verdict.frequency);
    EXPECT_FALSE(replay.judge(miss).matches);
    EXPECT_TRUE(replay.count(hit.entrytime).isRaised);
}

TEST_F(ReplayTest, CountsInThePeriodThatEndsWithTheEntry) {
    Replay replay(situation({}, ">= 3", "60s"), entries);
    EXPECT_TRUE(replay.hasThresholds());
    EXPECT_EQ(replay.frequency(), 3);
    EXPECT_EQ(replay.periodSeconds(), 60);
    // At 60 the entry at 0 is just out; at 1000 all are.
    EXPECT_THAT(judged(replay, {0, 0, 30, 59, 60, 61, 1000, 1001}),
                ElementsAre(-1, -2, 3, 4, 3, 4, -1, -2));
}

TEST_F(ReplayTest, SupportsUpperBounds) {
    Replay replay(situation({}, "< 3", "1m"), entries);
    EXPECT_EQ(replay.frequency(), -2);
    EXPECT_THAT(judged(replay, {0, 1, 2, 100}), ElementsAre(1, 2, -3, 1));
}

TEST_F(ReplayTest, CountsRowsAndTimesAlike) {
    Replay rows(situation({}, ">= 2", "10s"), entries);
    Replay times(situation({}, ">= 2", "10s"), entries);
    for (const int at : {0, 5, 9, 20, 21, 31, 32}) {
        zrm_rmlogent_data_t row = rowAt(at, "");
        const Replay::Verdict expected = rows.judge(row);
        const Replay::Verdict found = times.count(stampAt(at).data());
        EXPECT_EQ(found.isRaised, expected.isRaised) << at;
        EXPECT_EQ(found.frequency, expected.frequency) << at;
    }
}

TEST_F(ReplayTest, MatchingAloneDoesNotCount) {
    Replay replay(situation({"ENTRYDESC = 'hit'"}, ">= 2", "60s"), entries);
    for (int round = 0; round < 5; ++round) {
        zrm_rmlogent_data_t row = rowAt(round, "hit");
        EXPECT_TRUE(replay.matches(row));
        zrm_rmlogent_data_t miss = rowAt(round, "miss");
        EXPECT_FALSE(replay.judge(miss).matches);
    }
    EXPECT_THAT(judged(replay, {10, 11}), ElementsAre(-1, 2));
}

TEST_F(ReplayTest, IsNotOfferedEntriesAsASituation) {
    Replay replay(situation({}), entries);
    zrm_rmlogent_data_t row = rowAt(0, "x");
    EXPECT_EQ(entries.AddDataToEvent(&row, 1), 0u);
    SYS1_GetLock(entries.lock());
    LinkedListIter open(entries.requests());
    EXPECT_EQ(open.Next(), nullptr);
    SYS1_ReleaseLock(entries.lock());
}

} // namespace
