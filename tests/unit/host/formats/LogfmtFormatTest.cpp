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

TEST(LogfmtFormat, ReadsTheFieldsOfAnyEntry) {
    const auto format = makeFormat(logfmt()).value();
    const auto reader = format->reader();
    std::string many = "level=info";
    for (int i = 0; i < 300; ++i) {
        many += " f" + std::to_string(i) + "=" + std::to_string(i);
    }
    for (const std::string& entry :
         {std::string(R"(level=info user="a \"b\"" port=1 port=2)"), many}) {
        EntryColumns columns;
        ASSERT_TRUE(reader->read(entry, columns));
        EntryFields after; // the entry that was read last
        reader->readFields(entry, after);
        EntryFields anew;
        const std::string copy = entry;
        format->reader()->readFields(copy, anew);
        ASSERT_EQ(after.all().size(), anew.all().size());
        for (std::size_t i = 0; i < after.all().size(); ++i) {
            EXPECT_EQ(after.all()[i].name, anew.all()[i].name);
            EXPECT_EQ(after.all()[i].value, anew.all()[i].value);
        }
        EXPECT_EQ(after.leftOut(), anew.leftOut());
    }
    EntryColumns columns;
    EXPECT_FALSE(reader->read("no pair", columns));
    EntryFields fields;
    reader->readFields("level=info port=80", fields);
    EXPECT_EQ(fields.all().size(), 2U);
}

TEST(LogfmtFormat, OfSeveralPairsWithOneKeyTheFirstCounts) {
    const auto reader = readerOf(logfmt());
    EntryColumns columns;
    ASSERT_TRUE(reader->read("msg=first level=info msg=second n=1 n=2", columns));
    EXPECT_EQ(columns.description, "first");
    EntryFields fields;
    reader->readFields("msg=first level=info msg=second n=1 n=2", fields);
    EXPECT_EQ(*fields.find("n"), "1");
    EXPECT_EQ(fields.all().size(), 3U);
}

TEST(LogfmtFormat, KeepsBytesAndNumbersOfAnyKind) {
    using namespace std::string_literals;
    const auto reader = readerOf(logfmt());
    const std::string entry =
        "level=info msg=\"a\xff\0b\" n=123456789012345678901234567890 tail=\0x"s;
    EntryColumns columns;
    ASSERT_TRUE(reader->read(entry, columns));
    EXPECT_EQ(columns.description, "a\xff\0b"s);
    EntryFields fields;
    reader->readFields(entry, fields);
    EXPECT_EQ(*fields.find("n"), "123456789012345678901234567890");
    EXPECT_EQ(*fields.find("msg"), "a\xff\0b"s);
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
    description.columns = {{"type", std::string(256, 'a')}};
    EXPECT_EQ(makeFormat(description).error().field, "columns.type");
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
