#include "host/metrics/MetricText.h"

#include <gtest/gtest.h>

#include <array>
#include <cstdint>

using namespace zrm::host;

namespace {

TEST(MetricText, WritesFamilies) {
    MetricText text;
    text.counter("zrm_a_total", "What is counted.");
    text.add(std::uint64_t{3}, {{"log", "/var/log/\"x\"\n\\"}, {"state", ""}});
    text.add(1.5);
    text.gauge("zrm_b", "What changes.");
    text.add(-1.0);
    EXPECT_EQ(text.text(), "# HELP zrm_a_total What is counted.\n"
                           "# TYPE zrm_a_total counter\n"
                           "zrm_a_total{log=\"/var/log/\\\"x\\\"\\n\\\\\",state=\"\"} 3\n"
                           "zrm_a_total 1.5\n"
                           "# HELP zrm_b What changes.\n"
                           "# TYPE zrm_b gauge\n"
                           "zrm_b -1\n");
}

TEST(MetricText, OmitsFamiliesWithoutValues) {
    MetricText text;
    text.gauge("zrm_none", "Nothing.");
    text.counter("zrm_none_total", "Nothing either.");
    EXPECT_EQ(text.text(), "");
}

TEST(MetricText, WritesHistograms) {
    MetricText text;
    text.histogram("zrm_seconds", "How long.");
    const std::array limits = {0.5, 2.0};
    const std::array<std::uint64_t, 2> upTo = {1, 3};
    text.add(limits, upTo, 4, 12.5, {{"route", "/x"}});
    EXPECT_EQ(text.text(), "# HELP zrm_seconds How long.\n"
                           "# TYPE zrm_seconds histogram\n"
                           "zrm_seconds_count{route=\"/x\"} 4\n"
                           "zrm_seconds_sum{route=\"/x\"} 12.5\n"
                           "zrm_seconds_bucket{route=\"/x\",le=\"0.5\"} 1\n"
                           "zrm_seconds_bucket{route=\"/x\",le=\"2\"} 3\n"
                           "zrm_seconds_bucket{route=\"/x\",le=\"+Inf\"} 4\n");
}

} // namespace
