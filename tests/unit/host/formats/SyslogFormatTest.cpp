#include "host/formats/SyslogFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/SyslogFields.h"

#include <cstring>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

namespace {

constexpr const char* lines[] = {
    "Oct  5 07:03:09 web1 sshd[412]: Failed password for root from 203.0.113.7 port 40022 ssh2",
    "<34>Oct  5 07:03:09 web1 su: 'su root' failed",
    "2026-10-05T07:03:09.123456+02:00 ip-10-0-0-17.eu-central-1.compute.internal "
    "systemd-networkd-wait-online[12345]: Timeout occurred",
    "<165>1 2026-10-05T07:03:09Z host app 71 ID47 [a@1 b=\"c \\\"d\\\"\"] \xEF\xBB\xBFit runs",
    "<165>1 2026-10-05T07:03:09Z host an-app-with-a-name-that-fills-the-column 7100 - - it runs",
    "Oct  5 07:03:09 last message repeated 3 times",
    "Oct  5 07:03:09 web1",
};

struct Syslog final : SysLogFile {
    explicit Syslog(const ValidLog& log) : SysLogFile(log, Unmonitored{}) {}
};
struct Formatted final : FormatLogFile {
    explicit Formatted(const ValidLog& log) : FormatLogFile(log, Unmonitored{}) {}
};

FormatDescription described(std::vector<FormatDescription::Extract> extracts = {}) {
    FormatDescription description;
    description.type = "syslog";
    description.extracts = std::move(extracts);
    return description;
}

std::shared_ptr<const EntryFormat> formatOf(const FormatDescription& description) {
    auto format = makeFormat(description);
    EXPECT_TRUE(format) << format.error().text();
    return *format;
}

ValidLog logOf(char letter, std::shared_ptr<const EntryFormat> format) {
    FollowSettings settings;
    settings.format.value = std::move(format);
    return ValidLog(FurtherLog{"/var/log/syslog", letter, 'N', "",
                               std::make_shared<const FollowSettings>(settings)});
}

template <class Log> zrm_rmlogent_data_t rowOf(Log& log, std::string_view line) {
    zrm_rmlogent_data_t row;
    std::memset(&row, ' ', sizeof row);
    std::string text = std::string(line) + "\n";
    EXPECT_EQ(log.formatEntryAsRow(text.data(), &row, nullptr), 0);
    return row;
}

TEST(SyslogFormat, FillsColumnsAsAFollowedSyslogFileDoes) {
    Syslog syslog(logOf('S', nullptr));
    Formatted formatted(logOf(FormatLogFile::typeLetter, formatOf(described())));
    for (const char* line : lines) {
        const zrm_rmlogent_data_t expected = rowOf(syslog, line);
        const zrm_rmlogent_data_t row = rowOf(formatted, line);
        EXPECT_EQ(std::memcmp(&row, &expected, sizeof row), 0) << line;
    }
    EXPECT_EQ(std::string_view(rowOf(formatted, "something").entrydesc, 11), "something  ");
}

TEST(SyslogFormat, FillsTypeAndClassFromThePriority) {
    Syslog syslog(logOf('S', nullptr));
    Formatted formatted(logOf(FormatLogFile::typeLetter, formatOf(described())));
    const auto expect = [&](const char* line, std::string_view type, std::string_view name) {
        for (const zrm_rmlogent_data_t& row : {rowOf(syslog, line), rowOf(formatted, line)}) {
            EXPECT_EQ(std::string_view(row.entrytype, type.size()), type) << line;
            EXPECT_EQ(std::string_view(row.entryclass, name.size()), name) << line;
        }
    };
    expect(lines[0], "                ", "                ");
    expect(lines[1], "crit            ", "auth            ");
    expect(lines[3], "notice          ", "local4          ");
    expect("<0>Oct  5 07:03:09 web1 kernel: oops", "emerg ", "kern ");
    expect("<191>Oct  5 07:03:09 web1 app: last", "debug ", "local7 ");
    expect("<192>Oct  5 07:03:09 web1 app: none", "                ", "                ");
    expect(lines[0], "                ", "                ");
}

std::string fieldsOf(EntryFormat::Reader& reader, std::string_view line) {
    EntryFields fields;
    EntryColumns columns;
    EXPECT_TRUE(reader.read(line, columns));
    reader.readFields(line, fields);
    EntryFields plain;
    SyslogFields::read(line, plain);
    std::string result;
    for (std::size_t index = 0; index < fields.all().size(); ++index) {
        const EntryFields::Field& field = fields.all()[index];
        if (index < plain.all().size()) {
            EXPECT_EQ(field.name, plain.all()[index].name) << line;
            EXPECT_EQ(field.value, plain.all()[index].value) << line;
        } else {
            result.append(field.name).append("=").append(field.value).append(";");
        }
    }
    return result;
}

TEST(SyslogFormat, ReadsTheFieldsOfALineThatIsNotTheLastOne) {
    const auto format = formatOf(described());
    const auto reader = format->reader();
    EntryColumns columns;
    ASSERT_TRUE(reader->read(lines[0], columns));
    EntryFields fields;
    reader->readFields(lines[3], fields);
    EXPECT_EQ(*fields.find("a@1.b"), "c \"d\"");
    fields.clear();
    reader->readFields(lines[0], fields);
    EXPECT_EQ(*fields.find("pid"), "412");
}

TEST(SyslogFormat, AddsFieldsOfTheFirstExpressionThatMatchesTheMessage) {
    const auto format = formatOf(
        described({{"sshd*",
                    {R"(Failed \w+ for (?:invalid user )?(?P<user>\S+) from (?P<from>\S+))",
                     R"((?P<what>Failed|Accepted))"}},
                   {"", {R"((?P<first>\S+) )"}},
                   {"s?", {R"('(?P<command>[^']*)')"}}}));
    const auto reader = format->reader();
    EXPECT_EQ(fieldsOf(*reader, lines[0]), "user=root;from=203.0.113.7;first=Failed;");
    EXPECT_EQ(fieldsOf(*reader, "Oct  5 07:03:09 web1 sshd-session[1]: Accepted it"),
              "what=Accepted;first=Accepted;");
    EXPECT_EQ(fieldsOf(*reader, lines[1]), "first='su;command=su root;");
    EXPECT_EQ(fieldsOf(*reader, lines[3]), "first=it;");
    EXPECT_EQ(fieldsOf(*reader, "Oct  5 07:03:09 web1 xsshd: it Failed"), "first=it;");
    EXPECT_EQ(fieldsOf(*reader, "Oct  5 07:03:09 web1 sshd: Invalid user Failed"), "first=Invalid;")
        << "what a stranger writes into a message is not taken for its beginning";
    EXPECT_EQ(fieldsOf(*reader, ""), "");
}

TEST(SyslogFormat, ChoosesSourcesByGlobs) {
    const auto matches = [](const char* glob, const std::string& source) {
        const auto format = formatOf(described({{glob, {"(?P<x>x)"}}}));
        const auto reader = format->reader();
        return fieldsOf(*reader, "Oct  5 07:03:09 web1 " + source + ": x") == "x=x;";
    };
    EXPECT_TRUE(matches("postfix/*", "postfix/smtpd[7]"));
    EXPECT_TRUE(matches("*a*b*", "xaybz"));
    EXPECT_TRUE(matches("*ab", "aab"));
    EXPECT_TRUE(matches("app", "app[7]"));
    EXPECT_TRUE(matches("a?p", "app"));
    EXPECT_FALSE(matches("a?p", "ap"));
    EXPECT_FALSE(matches("app", "apps"));
    EXPECT_FALSE(matches("app", "ap"));
    EXPECT_FALSE(matches("*a*b", "ba"));
    EXPECT_FALSE(matches("postfix/*", "postfix"));
}

TEST(SyslogFormat, ShowsOtherTextsInColumns) {
    FormatDescription description = described();
    description.defaults = {{"type", "syslog"}};
    const auto format = formatOf(description);
    const auto reader = format->reader();
    EntryColumns columns;
    EXPECT_TRUE(reader->read(lines[0], columns));
    EXPECT_EQ(columns.type, "syslog");
    EXPECT_EQ(columns.source, "sshd[412]");
}

std::string refusal(std::vector<FormatDescription::Extract> extracts) {
    const auto format = makeFormat(described(std::move(extracts)));
    EXPECT_FALSE(format);
    return format ? "" : format.error().field + ": " + format.error().what;
}

TEST(SyslogFormat, RefusesExtractsThatCannotBeRead) {
    EXPECT_EQ(refusal({{"sshd", {}}}), "extract: has no patterns");
    EXPECT_EQ(refusal({{"sshd", {"(?P<a>x)", "x"}}}), "extract: 'x' has no named capture");
    EXPECT_EQ(refusal({{"", {"(?P<a>"}}}),
              "extract: '(?P<a>' is not a regular expression: missing ): (?P<a>");
    EXPECT_EQ(refusal({{"", std::vector<std::string>(300, "(?P<a>x)")},
                       {"", std::vector<std::string>(201, "(?P<a>x)")}}),
              "extract: there are more than 500 patterns");
}

} // namespace
