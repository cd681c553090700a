#include "host/formats/MessageFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>

using namespace zrm;
using namespace zrm::host;

namespace {

class MessageFormatTest : public testing::Test {
protected:
    MessageFormatTest() { description.type = "journal"; }

    /// "TYPE|CLASS|DESCRIPTION|NAME=VALUE;..." of a message of sshd[7].
    std::string read(const std::string& message) {
        auto format = MessageFormat::make(description);
        EXPECT_TRUE(format) << format.error().text();
        MessageFormat::Reader reader(**format);
        return read(reader, message);
    }
    static std::string read(MessageFormat::Reader& reader, const std::string& message) {
        EntryColumns columns;
        columns.type = "info";
        columns.entryClass = "ssh";
        columns.source = "sshd[7]";
        columns.description = message;
        reader.read(columns);
        EntryFields fields;
        fields.add("PRIORITY", "6");
        reader.readFields("sshd[7]", message, fields);
        std::string text = std::string(columns.type) + '|' + std::string(columns.entryClass) + '|' +
                           std::string(columns.description) + '|';
        EXPECT_EQ(columns.source, "sshd[7]");
        for (const auto& [name, value] : fields.all()) {
            text += std::string(name) + '=' + std::string(value) + ';';
        }
        return text;
    }
    std::string problem() {
        const auto format = MessageFormat::make(description);
        return format ? "" : format.error().field + ": " + format.error().what;
    }

    FormatDescription description;
};

TEST_F(MessageFormatTest, ExpressionsGiveFieldsOfTheirSources) {
    description.extracts = {{"sshd*", {R"(Failed \w+ for (?P<user>\S+) from (?P<address>\S+))"}},
                            {"cron", {R"((?P<word>\w+))"}}};
    EXPECT_EQ(read("Failed password for root from 192.0.2.7"),
              "info|ssh|Failed password for root from 192.0.2.7|PRIORITY=6;user=root;"
              "address=192.0.2.7;");
    EXPECT_EQ(read("Accepted"), "info|ssh|Accepted|PRIORITY=6;");
    description.type = "syslog"; // as a ready format has it
    EXPECT_EQ(read("Failed password for a from b"),
              "info|ssh|Failed password for a from b|PRIORITY=6;user=a;address=b;");
}

TEST_F(MessageFormatTest, PairsValuesAndDefaultsCount) {
    description.pairs = true;
    description.values = {{"type", {{"info", "INFORMATION"}}}};
    EXPECT_EQ(read("done port=80"), "INFORMATION|ssh|done port=80|PRIORITY=6;port=80;");
}

TEST_F(MessageFormatTest, LinesOfAProgramAreTakenApart) {
    description.type = "json";
    auto format = MessageFormat::make(description);
    ASSERT_TRUE(format);
    MessageFormat::Reader reader(**format);
    EXPECT_EQ(read(reader, R"({"level":"error","msg":"no room","logger":"db","class":"x","n":5})"),
              "error|ssh|no room|PRIORITY=6;level=error;msg=no room;logger=db;class=x;n=5;")
        << "source and class are the journal's";
    EXPECT_EQ(read(reader, "Started the service."), "info|ssh|Started the service.|PRIORITY=6;");
    EXPECT_EQ(read(reader, R"({"PRIORITY":"0"})"), R"(emerg|ssh|{"PRIORITY":"0"}|PRIORITY=6;)")
        << "what the journal says comes first";
}

TEST_F(MessageFormatTest, RefusesWhatMessagesAreNot) {
    description.type = "json";
    description.unwrap = "docker";
    EXPECT_EQ(problem(), "format: is not a format of a program's messages");
    description.unwrap.clear();
    description.type = "wtmp";
    EXPECT_EQ(problem(), "format: is not a format of a program's messages");
    description.type = "journal";
    description.extracts = {{"a", {"("}}};
    EXPECT_EQ(problem().substr(0, 9), "extract: ");
}

TEST_F(MessageFormatTest, EveryPartDecides) {
    const std::string plain = (*MessageFormat::make(description))->definition();
    description.pairs = true;
    EXPECT_NE((*MessageFormat::make(description))->definition(), plain);
}

} // namespace
