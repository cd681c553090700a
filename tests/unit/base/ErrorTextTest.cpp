#include "base/ErrorText.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

using namespace zrm;

TEST(ErrorText, HasTheSystemsTextAndTheNumber) {
    const ErrorText error(ENOENT);
    EXPECT_EQ(error.number(), ENOENT);
    EXPECT_STREQ(error.text(), "No such file or directory");
}

TEST(ErrorText, HasATextForNumbersUnknownToTheSystem) {
    EXPECT_NE(std::strstr(ErrorText(99999).text(), "Unknown error"), nullptr);
}
