#include "host/config/Thresholds.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

TEST(Thresholds, AFrequencyIsAConditionWithItsOperator) {
    const auto check = [](const char* text, int op, int number) {
        const std::optional<Condition> condition = Thresholds::frequency(text);
        ASSERT_TRUE(condition) << text;
        EXPECT_EQ(condition->column, "FREQTHRESH");
        EXPECT_EQ(condition->op, op) << text;
        EXPECT_TRUE(condition->isNumber);
        EXPECT_EQ(condition->number, number) << text;
    };
    check(">= 5", 3, 5);
    check("<= 2", 4, 2);
    check("> 4", 6, 4);
    check("< 3", 5, 3);
    check(">=1", 3, 1);
    check(">  0", 6, 0);
    check("< 2", 5, 2);
}

TEST(Thresholds, RefusesFrequenciesThatAreInvalidOrWouldHaveNoEffect) {
    for (const char* const text :
         {"", "5", "= 5", "!= 5", ">=", ">= five", ">= 5 ", "> -1", ">= 0", "<= 0", "< 1",
          ">= 2147483647", ">= 99999999999999999999", " >= 5", ">= +5", ">= 5x"}) {
        EXPECT_FALSE(Thresholds::frequency(text)) << text;
    }
}

TEST(Thresholds, APeriodIsInSeconds) {
    const auto seconds = [](const char* text) {
        const std::optional<Condition> condition = Thresholds::period(text);
        EXPECT_TRUE(!condition || (condition->column == "PERIODTHRS" &&
                                   condition->op == INTF_EQUAL && condition->isNumber));
        return condition ? condition->number : -1;
    };
    EXPECT_EQ(seconds("60s"), 60);
    EXPECT_EQ(seconds("5m"), 300);
    EXPECT_EQ(seconds("1h"), 3600);
    EXPECT_EQ(seconds("2d"), 172800);
    EXPECT_EQ(seconds("2147483647s"), 2147483647);
    for (const char* const text : {"", "60", "s", "0s", "-1s", "1 m", "1.5h", "1w", "60sec", " 60s",
                                   "2147483648s", "24856d", "99999999999999999999s"}) {
        EXPECT_EQ(seconds(text), -1) << text;
    }
}

} // namespace
