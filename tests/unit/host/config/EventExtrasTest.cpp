#include "host/config/EventExtras.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

using testing::HasSubstr;

std::string refusalOf(const EventExtras::Labels& labels) {
    const auto checked = EventExtras::checkLabels(labels);
    return checked ? "" : checked.error().text();
}

TEST(EventExtras, TakesUrlsOfPagesAsRunbooks) {
    for (const char* const url : {"https://wiki.example.org/ssh", "http://10.0.0.1:8080/a?b=c",
                                  "https://[::1]/a#part-2", "https://wiki.example.org#ssh"}) {
        EXPECT_TRUE(EventExtras::checkRunbook(url)) << url;
    }
    for (const std::string& url :
         {std::string("javascript:alert(1)"), std::string("ftp://example.org/"), std::string("/a"),
          std::string("https://"), std::string("https://user:pw@example.org/"),
          std::string("https://example.org/a b"), std::string("https://example.org/#a\"b"),
          std::string("https://example.org/#a#b"), std::string("https://example.org/\n"),
          "https://example.org/" + std::string(2048, 'a')}) {
        const auto checked = EventExtras::checkRunbook(url);
        ASSERT_FALSE(checked) << url;
        EXPECT_EQ(checked.error().field, "runbook");
    }
}

TEST(EventExtras, TakesLabelsThatReceiversTake) {
    EXPECT_EQ(refusalOf({}), "");
    EXPECT_EQ(refusalOf({{"team", "web"},
                         {"_a1", "G\xc3\xbc"
                                 "nther"}}),
              "");
    EXPECT_EQ(refusalOf({{std::string(64, 'n'), std::string(256, 'v')}}), "");
}

TEST(EventExtras, RefusesNamesOfLabels) {
    for (const std::string& name :
         {std::string(), std::string("1a"), std::string("a-b"), std::string("a b"),
          std::string("\xc3\xa4"), std::string(65, 'n')}) {
        EXPECT_THAT(refusalOf({{name, "x"}}), HasSubstr("is not the name of a label")) << name;
    }
    for (const char* const name : {"alertname", "severity", "log", "node", "group_ip"}) {
        EXPECT_THAT(refusalOf({{name, "x"}}), HasSubstr("that events have anyway")) << name;
    }
}

TEST(EventExtras, RefusesValuesOfLabels) {
    for (const std::string& value : {std::string(), std::string(257, 'v'), std::string("a\nb"),
                                     std::string("\xff"), std::string("\xe2\x80\xae")}) {
        EXPECT_THAT(refusalOf({{"team", value}}), HasSubstr("the value of 'team' is not usable"))
            << value;
    }
}

TEST(EventExtras, BoundsTheNumberOfLabels) {
    EventExtras::Labels labels;
    for (int number = 0; number < 32; ++number) {
        labels["l" + std::to_string(number)] = "x";
    }
    EXPECT_EQ(refusalOf(labels), "");
    labels["more"] = "x";
    EXPECT_THAT(refusalOf(labels), HasSubstr("has 33 labels; write at most 32"));
}

} // namespace
