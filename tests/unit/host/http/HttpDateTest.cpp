#include "host/http/ResponseText.h"

#include <gtest/gtest.h>

#include <ctime>

using namespace zrm::host;

namespace {

TEST(HttpDateTest, WritesTimesInTheFormOfHeaders) {
    EXPECT_EQ(HttpDate::text(784111777), "Sun, 06 Nov 1994 08:49:37 GMT");
    EXPECT_EQ(HttpDate::text(0), "Thu, 01 Jan 1970 00:00:00 GMT");
    EXPECT_EQ(HttpDate::text(1709164800), "Thu, 29 Feb 2024 00:00:00 GMT");
    EXPECT_EQ(HttpDate::text(4133980799), "Fri, 31 Dec 2100 23:59:59 GMT");
}

TEST(HttpDateTest, NowIsNow) {
    const std::time_t before = std::time(nullptr);
    const std::string now = HttpDate::now();
    const std::time_t after = std::time(nullptr);
    bool isBetween = false;
    for (std::time_t at = before; at <= after; ++at) {
        isBetween = isBetween || now == HttpDate::text(at);
    }
    EXPECT_TRUE(isBetween) << now;
}

} // namespace
