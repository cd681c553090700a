// What JsonFormat does not read, and how much of an entry it does.

#include "JsonEntry.h"
#include "framework/LogEntry.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

TEST(JsonFormat, SaysWhyAnEntryIsRejected) {
    JsonEntry entry;
    using namespace std::string_literals;
    EXPECT_EQ(entry.reasonOf(""), "it is empty");
    EXPECT_EQ(entry.reasonOf("  "), "it is empty");
    EXPECT_EQ(entry.reasonOf("Nov 22 started"), "it is not a JSON object");
    EXPECT_EQ(entry.reasonOf("[1]"), "it is not a JSON object");
    EXPECT_EQ(entry.reasonOf("\"text\""), "it is not a JSON object");
    EXPECT_EQ(entry.reasonOf("{"), "it does not end with the end of a JSON object");
    EXPECT_EQ(entry.reasonOf(R"({"a":1)"), "it does not end with the end of a JSON object");
    EXPECT_EQ(entry.reasonOf(R"({"a":{"b":1})"), "it does not end with the end of a JSON object");
    EXPECT_EQ(entry.reasonOf(R"({"a":"b)"), "a text in it has no closing quote");
    EXPECT_EQ(entry.reasonOf(R"({"a":1} x)"), "it does not end with the end of a JSON object");
    EXPECT_EQ(entry.reasonOf(R"({"a":1} {"b":2})"), "something follows the JSON object, at byte 9");
    EXPECT_EQ(entry.reasonOf(R"({"a":1}})"), "something follows the JSON object, at byte 8");
    EXPECT_EQ(entry.reasonOf(R"({"a":1,})"), "it is not JSON, at byte 8");
    EXPECT_EQ(entry.reasonOf(R"({"a" 1})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":1 "b":2})"), "it is not JSON, at byte 8");
    EXPECT_EQ(entry.reasonOf(R"({"a":NaN})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":01})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":1.})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":tru})"), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({1:2})"), "it is not JSON, at byte 2");
    EXPECT_EQ(entry.reasonOf("{'a':1}"), "it is not JSON, at byte 2");
    EXPECT_EQ(entry.reasonOf(R"({"a":"\x"})"),
              "a text in it has an escape that is not one of JSON's, at byte 6");
    EXPECT_EQ(entry.reasonOf(R"({"a":"\ud83d"})"),
              "a text in it has an escape that is not one of JSON's, at byte 6");
    EXPECT_EQ(entry.reasonOf("{\"a\":\"\xff\"}"), "it is not valid UTF-8");
    EXPECT_EQ(entry.reasonOf("{\"a\":\"\0\"}"s), "a text in it has a control character");
    EXPECT_EQ(entry.reasonOf("{\"a\":\0}"s), "it is not JSON, at byte 6");
    EXPECT_EQ(entry.reasonOf("{\"a\":\"b\nc\"}"), "a text in it has a control character");
    EXPECT_EQ(entry.reasonOf(R"({"a":1})"), "read");
}

TEST(JsonFormat, SaysThatAnEntryIsTooLong) {
    JsonEntry entry;
    std::string text = "{\"a\":\"" + std::string(EntryKeep::longestText, 'x');
    text.resize(EntryKeep::longestText);
    EXPECT_EQ(entry.reasonOf(text), "it is longer than 65536 bytes");
    text.replace(text.size() - 2, 2, "\"}");
    EXPECT_EQ(entry.reasonOf(text), "read");
    EXPECT_EQ(entry.field("a").size(), text.size() - 8);
}

TEST(JsonFormat, BoundsNesting) {
    JsonEntry entry;
    const auto nested = [](std::size_t depth, const std::string& inside) {
        std::string text;
        for (std::size_t i = 0; i < depth; ++i) {
            text += "{\"a\":";
        }
        return text + inside + std::string(depth, '}');
    };
    std::string name = "a";
    for (int i = 1; i < 16; ++i) {
        name += ".a";
    }
    ASSERT_TRUE(entry.read(nested(16, "1")));
    EXPECT_EQ(entry.field(name), "1");
    ASSERT_TRUE(entry.read(nested(17, "1 ")));
    EXPECT_EQ(entry.field(name), "{\"a\":1 }");
    ASSERT_TRUE(entry.read(nested(10000, "[]")));
    EXPECT_EQ(entry.field(name), nested(10000 - 16, "[]"));
    std::string arrays = "{\"a\":" + std::string(10000, '[') + std::string(10000, ']') + "}";
    ASSERT_TRUE(entry.read(arrays));
    EXPECT_EQ(entry.fields.all().size(), 1u);
    arrays.erase(arrays.size() - 2, 1);
    EXPECT_NE(entry.reasonOf(arrays), "read");
}

TEST(JsonFormat, BoundsFieldsAndStillFillsColumns) {
    JsonEntry entry;
    std::string text = "{\"n\":[0";
    for (int i = 1; i < 300; ++i) {
        text += "," + std::to_string(i);
    }
    ASSERT_TRUE(entry.read(text + "],\"msg\":\"behind\"}"));
    EXPECT_EQ(entry.fields.all().size(), EntryFields::most);
    EXPECT_EQ(entry.fields.leftOut(), 300u + 1 - EntryFields::most);
    EXPECT_EQ(entry.field("n.255"), "255");
    EXPECT_EQ(entry.columns.description, "behind");
}

TEST(JsonFormat, LeavesOutNamesThatAreTooLongOrEmpty) {
    JsonEntry entry;
    const std::string longest(EntryFields::longestName, 'n');
    ASSERT_TRUE(entry.read("{\"" + longest + "\":1,\"" + longest + "n\":2,\"\":3}"));
    EXPECT_EQ(entry.field(longest), "1");
    EXPECT_EQ(entry.fields.leftOut(), 2u);
    const std::string outer(EntryFields::longestName - 2, 'o');
    ASSERT_TRUE(
        entry.read("{\"" + outer + "\":{\"i\":1,\"ii\":2,\"j\":{\"k\":3}},\"\":{\"l\":4}}"));
    EXPECT_EQ(entry.field(outer + ".i"), "1");
    EXPECT_EQ(entry.field(".l"), "4");
    EXPECT_EQ(entry.fields.all().size(), 2u);
    EXPECT_EQ(entry.fields.leftOut(), 2u);
}

TEST(JsonFormat, ReadsTheFieldsOfAnyEntry) {
    JsonEntry entry;
    EntryColumns columns;
    EntryFields fields;
    std::string text = R"({"a":"1"})";
    ASSERT_TRUE(entry.reader().read(text, columns));
    // The same memory, the same size, another entry.
    text[6] = '2';
    entry.reader().readFields(text, fields);
    ASSERT_NE(fields.find("a"), nullptr);
    EXPECT_EQ(*fields.find("a"), "2");
    text[6] = '3';
    EXPECT_EQ(*fields.find("a"), "2") << "views into memory of the reader";

    fields.clear();
    entry.reader().readFields("no object", fields);
    EXPECT_TRUE(fields.all().empty());
}

TEST(JsonFormat, RefusesWhatCannotBeConfigured) {
    const auto fieldOf = [](const FormatDescription& description) {
        const auto format = JsonFormat::make(description);
        return format ? "made" : format.error().field;
    };
    EXPECT_EQ(fieldOf(withColumns({{"level", "lvl"}})), "columns.level");
    EXPECT_EQ(fieldOf(withColumns({{"type", std::string(256, 'a')}})), "columns.type");
    FormatDescription description;
    description.patterns = {".*"};
    EXPECT_EQ(fieldOf(description), "format");
    description = {};
    description.timeFormat = "%Q";
    EXPECT_EQ(fieldOf(description), "time_format");
    description = {};
    description.defaults["time"] = "now";
    EXPECT_EQ(fieldOf(description), "defaults.time");
}
