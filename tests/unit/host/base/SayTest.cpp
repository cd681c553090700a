#include "host/base/Say.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

std::string said(const std::string& text) {
    testing::internal::CaptureStderr();
    say("%s", text.c_str());
    return testing::internal::GetCapturedStderr();
}

TEST(Say, WritesOneLineToStandardError) {
    EXPECT_EQ(said("no log to monitor"), "zrmagent: no log to monitor\n");
}

TEST(Say, CutsLongMessages) {
    const std::string line = said(std::string(10'000, 'x'));
    EXPECT_EQ(line.size(), 8192u);
    EXPECT_TRUE(line.ends_with("xx\n"));
}

TEST(Say, EscapesControlCharactersAndStaysOneLine) {
    EXPECT_EQ(said("a\033[31m\xc2\x9b\xe2\x80\xae caf\xc3\xa9\nzrmagent: forged"),
              "zrmagent: a\\x1b[31m\\u009b\\u202e caf\xc3\xa9 zrmagent: forged\n");
    const std::string line = said(std::string(10'000, '\033'));
    EXPECT_LE(line.size(), 8192u);
    EXPECT_TRUE(line.ends_with("\\x1b\n"));
}

} // namespace
