#include "host/base/Result.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <memory>
#include <string>

using namespace zrm::host;

namespace {

Result<int> half(int number) {
    if (number % 2 != 0) {
        return refused("'" + std::to_string(number) + "' is odd", "write an even number", "n");
    }
    return number / 2;
}

Result<void> locked(int number) {
    if (number != 0) {
        return refused(because("cannot lock /x", number));
    }
    return {};
}

TEST(Result, IsTheValueOrTheProblem) {
    EXPECT_EQ(half(4), 2);
    const Result<int> odd = half(3);
    ASSERT_FALSE(odd);
    EXPECT_EQ(odd.error(), (Problem{"'3' is odd", "write an even number", "n"}));
}

TEST(Result, WithoutAValueSaysWhetherItWorked) {
    EXPECT_TRUE(locked(0));
    const Result<void> failed = locked(EACCES);
    ASSERT_FALSE(failed);
    EXPECT_EQ(failed.error(), (Problem{"cannot lock /x: Permission denied"}));
}

TEST(Result, HandsOverWhatCannotBeCopied) {
    Result<std::unique_ptr<int>> made = std::make_unique<int>(7);
    const std::unique_ptr<int> taken = std::move(*made);
    EXPECT_EQ(*taken, 7);
}

TEST(Problem, ReadsAsWhatIsWrongAndTheCure) {
    EXPECT_EQ((Problem{"it is odd", "write an even number", "n"}).text(),
              "it is odd; write an even number");
    EXPECT_EQ((Problem{"it is odd"}).text(), "it is odd");
}

TEST(Problem, BecauseOfAnErrorNamesItInTheSystemsWords) {
    EXPECT_EQ(because("cannot read /x", ENOENT), "cannot read /x: No such file or directory");
    EXPECT_EQ(because("cannot read /x", 99999), "cannot read /x: Unknown error 99999");
}

} // namespace
