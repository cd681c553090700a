#include "host/sinks/EventRow.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

EventRow rowOf(std::string_view json) {
    EventRecord record;
    record.json = json;
    return EventRow(record);
}

TEST(EventRow, HasTheColumnsInTableOrder) {
    const EventRow row = rowOf(
        R"({"id":1,"row":{"ORIGINNODE":"web1:ZRM","ENTRYTIME":"1261120070309000","ROWNO":-3,"A":""}})");
    std::vector<std::string> names;
    for (const EventRow::Column& column : row.columns()) {
        names.push_back(column.name);
    }
    EXPECT_THAT(names, testing::ElementsAre("ORIGINNODE", "ENTRYTIME", "ROWNO", "A"));
    EXPECT_EQ(std::get<std::int64_t>(row.columns()[2].value), -3);
    EXPECT_EQ(row.text("ENTRYTIME"), "1261120070309000");
    EXPECT_EQ(row.text("ROWNO"), "");
    EXPECT_EQ(row.text("NONE"), "");
}

TEST(EventRow, PrefersTheTextsInUtf8) {
    const EventRow utf8 = rowOf(
        R"({"row":{"ENTRYSRC":"a","ENTRYDESC":"b","UENTRYSRC":"\u00e4","UENTRYDESC":"\u00f6"}})");
    EXPECT_EQ(utf8.source(), "\xc3\xa4");
    EXPECT_EQ(utf8.description(), "\xc3\xb6");
    const EventRow local =
        rowOf(R"({"row":{"ENTRYSRC":"a","ENTRYDESC":"b","UENTRYSRC":"","UENTRYDESC":""}})");
    EXPECT_EQ(local.source(), "a");
    EXPECT_EQ(local.description(), "b");
}

TEST(EventRow, TheNodeHasNoType) {
    EXPECT_EQ(rowOf(R"({"row":{"ORIGINNODE":"web1:ZRM"}})").node(), "web1");
    EXPECT_EQ(rowOf(R"({"row":{"ORIGINNODE":"a:b:ZRM"}})").node(), "a:b");
    EXPECT_EQ(rowOf(R"({"row":{"ORIGINNODE":"web1"}})").node(), "web1");
    EXPECT_EQ(rowOf(R"({"row":{}})").node(), "");
}

TEST(EventRow, TheTextOfAResolvedEventSaysSo) {
    EXPECT_EQ(rowOf(R"({"state":"raised","text":"5 logins","row":{"ENTRYDESC":"a"}})").message(),
              "5 logins");
    const EventRow resolved = rowOf(R"({"state":"resolved","text":"74 logins"})");
    EXPECT_EQ(resolved.message(), "Resolved: 74 logins");
    EXPECT_EQ(resolved.eventText(), "Resolved: 74 logins");
    EXPECT_EQ(rowOf(R"({"state":"resolved"})").message(), "resolved");
}

TEST(EventRow, JsonWithoutARowHasNoColumns) {
    for (const char* const json :
         {"", "{", "[]", "{}", R"({"row":5})", "null", R"({"row":{"A":1)"}) {
        EXPECT_TRUE(rowOf(json).columns().empty()) << json;
    }
}

TEST(SeverityCodes, FollowTheSeverity) {
    const auto codes = [](const char* severity) {
        const SeverityCodes& known = SeverityCodes::of(severity);
        return std::pair(known.syslog, known.otel);
    };
    EXPECT_EQ(codes("info"), std::pair(6, 9));
    EXPECT_EQ(codes("minor"), std::pair(5, 10));
    EXPECT_EQ(codes("warning"), std::pair(4, 13));
    EXPECT_EQ(codes("major"), std::pair(3, 17));
    EXPECT_EQ(codes("critical"), std::pair(2, 21));
    EXPECT_EQ(codes("fatal"), std::pair(4, 13));
}

} // namespace
