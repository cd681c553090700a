#include "framework/values.h"

#include <gtest/gtest.h>

#include <cstring>

namespace {

TEST(CopyUnpad, DropsThePaddingAndTerminates) {
    char text[17];
    const auto copy = [&text](const char* source, int length) {
        std::memset(text, '#', sizeof text);
        AGF_CopyUnpad(text, source, length);
        return text;
    };
    EXPECT_STREQ(copy("/var/log/       ", 16), "/var/log/");
    EXPECT_STREQ(copy("1261120070309000", 16), "1261120070309000");
    EXPECT_STREQ(copy("a b \0   ", 8), "a b");
    EXPECT_STREQ(copy("    ", 4), "");
    EXPECT_STREQ(copy("abc", 0), "");
    EXPECT_STREQ(copy("abc", -1), "");
    EXPECT_EQ(text[1], '#') << "nothing after the terminator is written";
}

} // namespace
