#include "monitor/ReportOutcome.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>

using namespace zrm;

namespace {

TEST(ReportOutcome, IsCompleteUntilSomethingIsNoted) {
    ReportOutcome::note(ReportEnd::longLine); // nobody wants to know
    const ReportOutcome outcome;
    EXPECT_TRUE(outcome.isComplete());
    EXPECT_STREQ(outcome.reason(), "");
    EXPECT_EQ(outcome.reached(), "");
}

TEST(ReportOutcome, KeepsTheFirstEndAndTheLastTime) {
    const ReportOutcome outcome;
    ReportOutcome::noteReached("1261120073000000 and more");
    ReportOutcome::noteReached("1261120072900000");
    ReportOutcome::note(ReportEnd::readError);
    ReportOutcome::note(ReportEnd::rowLimit);
    EXPECT_EQ(outcome.end(), ReportEnd::readError);
    EXPECT_FALSE(outcome.isComplete());
    EXPECT_EQ(outcome.reached(), "1261120072900000");
}

TEST(ReportOutcome, EveryEarlyEndHasItsReason) {
    for (int end = static_cast<int>(ReportEnd::notRead);
         end <= static_cast<int>(ReportEnd::rowLimit); ++end) {
        const ReportOutcome outcome;
        ReportOutcome::note(static_cast<ReportEnd>(end));
        EXPECT_STRNE(outcome.reason(), "") << end;
    }
}

TEST(ReportOutcome, IsThatOfItsThreadAndTheInnermost) {
    const ReportOutcome outer;
    {
        const ReportOutcome inner;
        ReportOutcome::note(ReportEnd::noTime);
        EXPECT_EQ(inner.end(), ReportEnd::noTime);
    }
    std::thread([] { ReportOutcome::note(ReportEnd::longLine); }).join();
    EXPECT_TRUE(outer.isComplete());
    ReportOutcome::note(ReportEnd::formatErrors);
    EXPECT_EQ(outer.end(), ReportEnd::formatErrors);
}

} // namespace
