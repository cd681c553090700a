#include "host/formats/LogfmtFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

FormatDescription logfmt() {
    FormatDescription description;
    description.type = "logfmt";
    return description;
}

std::unique_ptr<EntryFormat::Reader> readerOf(const FormatDescription& description) {
    static std::shared_ptr<const EntryFormat> format; // outlives its reader
    format = makeFormat(description).value();
    return format->reader();
}

TEST(LogfmtFormat, FillsColumnsFromTheUsualKeysInAnyOrder) {
    const auto reader = readerOf(logfmt());
    EntryColumns columns;
    ASSERT_TRUE(reader->read(R"(caller=main.go:17 level=warn ts=2026-11-19T10:00:01.5Z )"
                             R"(msg="a \"b\"" port=80)",
                             columns));
    EXPECT_TRUE(columns.hasTime);
    EXPECT_EQ(columns.time.second, 1U);
    EXPECT_EQ(columns.offset, 0);
    EXPECT_EQ(columns.source, "main.go:17");
    EXPECT_EQ(columns.type, "warn");
    EXPECT_EQ(columns.description, "a \"b\"");
    EntryFields fields;
    reader->readFields("level=warn port=80", fields);
    ASSERT_NE(fields.find("port"), nullptr);
    EXPECT_EQ(*fields.find("port"), "80");
}

TEST(LogfmtFormat, KeepsTheBackslashesOfValuesWithoutQuotes) {
    const auto reader = readerOf(logfmt());
    EntryColumns columns;
    ASSERT_TRUE(reader->read(R"(level=info msg=C:\new)", columns));
    EXPECT_EQ(columns.description, R"(C:\new)");
}

TEST(LogfmtFormat, AnEntryWithoutAMessageIsItsDescription) {
    const auto reader = readerOf(logfmt());
    EntryColumns columns;
    ASSERT_TRUE(reader->read("level=info port=80", columns));
    EXPECT_EQ(columns.description, "level=info port=80");
    EXPECT_FALSE(columns.hasTime);
}

TEST(LogfmtFormat, RefusesWhatDoesNotBeginWithAPairOrHasAWrongTime) {
    const auto reader = readerOf(logfmt());
    EntryColumns columns;
    EXPECT_FALSE(reader->read("text level=info", columns));
    EXPECT_EQ(reader->reason(), "it does not begin with a pair such as level=info");
    EXPECT_FALSE(reader->read("", columns));
    EXPECT_FALSE(reader->read("time=soon level=info", columns));
    EXPECT_EQ(reader->reason(), "the value of its time is not a time");
}

TEST(LogfmtFormat, TakesColumnsAndTimesAsDescribed) {
    FormatDescription description = logfmt();
    description.columns = {{"time", "at"}, {"type", "kind"}};
    description.timeFormat = "%d.%m.%Y";
    description.values["type"] = {{"W", "WARNING"}};
    const auto reader = readerOf(description);
    EntryColumns columns;
    ASSERT_TRUE(reader->read("at=19.11.2026 kind=W level=info", columns));
    EXPECT_EQ(columns.time.day, 19U);
    EXPECT_EQ(columns.type, "WARNING");

    description.columns = {{"when", "at"}};
    EXPECT_EQ(makeFormat(description).error().field, "columns.when");
    description.columns.clear();
    description.timeFormat = "never";
    EXPECT_EQ(makeFormat(description).error().field, "time_format");
}

TEST(PairedFormat, AddsThePairsOfTheDescription) {
    FormatDescription description;
    description.type = "json";
    description.pairs = true;
    const auto reader = readerOf(description);
    const std::string entry = R"({"msg":"started port=80 user=anna","port":"1"})";
    for (const bool isReadFirst : {true, false}) {
        EntryColumns columns;
        if (isReadFirst) {
            ASSERT_TRUE(reader->read(entry, columns));
        }
        EntryFields fields;
        reader->readFields(entry, fields);
        ASSERT_NE(fields.find("user"), nullptr);
        EXPECT_EQ(*fields.find("user"), "anna");
        EXPECT_EQ(*fields.find("port"), "1") << "what the format itself reads comes first";
    }
    EntryColumns columns;
    EXPECT_FALSE(reader->read("no JSON", columns));
    EXPECT_FALSE(reader->reason().empty());
    EntryFields fields;
    reader->readFields("no JSON a=b", fields);
    EXPECT_TRUE(fields.all().empty());
}

TEST(PairedFormat, FormatsWithAndWithoutPairsDiffer) {
    FormatDescription description;
    description.type = "json";
    const std::string plain = makeFormat(description).value()->definition();
    description.pairs = true;
    EXPECT_NE(makeFormat(description).value()->definition(), plain);
}

} // namespace
