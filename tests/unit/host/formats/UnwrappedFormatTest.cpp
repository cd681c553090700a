#include "host/formats/UnwrappedFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::HasSubstr;

class UnwrappedFormatTest : public testing::Test {
protected:
    UnwrappedFormatTest() {
        m_json.type = "json";
        m_json.unwrap = "docker";
        m_plain.type = "regex";
        m_plain.unwrap = "cri";
    }

    void use(const FormatDescription& description) {
        auto format = makeFormat(description);
        ASSERT_TRUE(format) << format.error().text();
        m_format = *format;
        m_reader = m_format->reader();
    }
    bool read(const std::string& entry) {
        m_entry = entry;
        m_columns = {};
        return m_reader->read(m_entry, m_columns);
    }
    std::string fields() {
        EntryFields fields;
        m_reader->readFields(m_entry, fields);
        std::string text;
        for (const auto& [name, value] : fields.all()) {
            text += std::string(name) + "=" + std::string(value) + ";";
        }
        return text;
    }
    int second() const { return m_columns.time.second; }

    FormatDescription m_json;
    FormatDescription m_plain;
    std::shared_ptr<const EntryFormat> m_format;
    std::unique_ptr<EntryFormat::Reader> m_reader;
    std::string m_entry;
    EntryColumns m_columns;
};

TEST_F(UnwrappedFormatTest, WhatIsInsideIsTakenApartByTheFormat) {
    use(m_json);
    ASSERT_TRUE(read(R"({"log":"{\"msg\":\"it \\\"broke\\\"\",\"level\":\"error\",)"
                     R"(\"time\":\"2026-11-19T10:00:07Z\",\"status\":500}\n",)"
                     R"("stream":"stderr","time":"2026-11-19T10:00:01Z"})"));
    EXPECT_EQ(m_columns.description, "it \"broke\"");
    EXPECT_EQ(m_columns.type, "error");
    EXPECT_EQ(second(), 7) << "the program's own time";
    EXPECT_THAT(fields(), HasSubstr("status=500;"));
    EXPECT_THAT(fields(), HasSubstr("stream=stderr;"));
}

TEST_F(UnwrappedFormatTest, WithoutATimeInsideTheRuntimesCounts) {
    use(m_json);
    ASSERT_TRUE(
        read(R"({"log":"{\"msg\":\"a\"}\n","stream":"stdout","time":"2026-11-19T10:00:01Z"})"));
    EXPECT_TRUE(m_columns.hasTime);
    EXPECT_EQ(second(), 1);
    EXPECT_EQ(m_columns.offset, 0);
}

TEST_F(UnwrappedFormatTest, WithoutAFormatTheTextIsTheDescription) {
    m_plain.defaults["source"] = "web";
    use(m_plain);
    ASSERT_TRUE(read("2026-11-19T10:00:03.5+01:00 stderr P it \n"
                     "2026-11-19T10:00:04.5+01:00 stderr F broke\n"
                     "2026-11-19T10:00:05.5+01:00 stderr F \tat a"));
    EXPECT_EQ(m_columns.description, "it broke\n\tat a");
    EXPECT_EQ(m_columns.type, "stderr");
    EXPECT_EQ(m_columns.source, "web");
    EXPECT_EQ(second(), 3);
    EXPECT_EQ(m_columns.offset, 3600);
    EXPECT_EQ(fields(), "stream=stderr;");
}

TEST_F(UnwrappedFormatTest, SaysWhyAnEntryDoesNotFit) {
    use(m_json);
    EXPECT_FALSE(read("{}"));
    EXPECT_THAT(std::string(m_reader->reason()), HasSubstr("it has no \"log\""));
    EXPECT_EQ(fields(), "");
    EXPECT_FALSE(read(R"({"log":"no JSON\n","stream":"stdout","time":"2026-11-19T10:00:01Z"})"));
    EXPECT_THAT(std::string(m_reader->reason()), HasSubstr("JSON")) << "the inner format's reason";
    EXPECT_FALSE(read(R"({"log":"{}\n","stream":"stdout","time":"soon"})"));
    EXPECT_EQ(m_reader->reason(), "the container runtime's time is not a time");
    EXPECT_FALSE(read(R"({"log":"{}\n","stream":"stdout","time":"10:00:01Z"})"));
    EXPECT_EQ(m_reader->reason(), "the container runtime's time is not a time") << "without a date";
}

TEST_F(UnwrappedFormatTest, FieldsOfAnotherEntryThanTheLast) {
    use(m_json);
    const std::string first =
        R"({"log":"{\"a\":1}\n","stream":"stdout","time":"2026-11-19T10:00:01Z"})";
    const std::string other =
        R"({"log":"{\"b\":2}\n","stream":"stdout","time":"2026-11-19T10:00:01Z"})";
    ASSERT_TRUE(read(first));
    EntryFields fields;
    m_reader->readFields(other, fields);
    ASSERT_NE(fields.find("b"), nullptr);
    EXPECT_EQ(*fields.find("b"), "2");
    EXPECT_EQ(fields.find("a"), nullptr);
}

TEST_F(UnwrappedFormatTest, RefusesOtherRuntimes) {
    m_json.unwrap = "podman";
    const auto format = makeFormat(m_json);
    ASSERT_FALSE(format);
    EXPECT_EQ(format.error().field, "unwrap");
    EXPECT_EQ(format.error().text(),
              "'podman' is not a container runtime's format; write \"docker\" or \"cri\"");
}

TEST_F(UnwrappedFormatTest, TheDefinitionTellsFormatsApart) {
    use(m_json);
    const std::string docker = m_format->definition();
    m_json.unwrap = "cri";
    use(m_json);
    EXPECT_NE(m_format->definition(), docker);
}

} // namespace
