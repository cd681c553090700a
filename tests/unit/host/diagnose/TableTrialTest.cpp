// Trials by the rules of [[log]] tables.

#include "host/diagnose/FormatTrial.h"

#include "host/config/ConfigFile.h"
#include "host/config/PathPattern.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

TableSettings inZone(const std::string& timezone) {
    const auto settings = FormatTrial::settingsOf(timezone);
    EXPECT_TRUE(settings) << timezone;
    return settings.value_or(nullptr);
}

std::string column(const FormatTrial::Line& line, const std::string& name) {
    for (const auto& [key, text] : line.row) {
        if (key == name) {
            return text;
        }
    }
    return "none";
}

TEST(TableTrial, ATableKnowsZones) {
    const TimeZone berlin("Europe/Berlin");
    const std::string format =
        "A,\"%d-%d-%dT%d:%d:%d%s %9[^\n]\",year month day hour minute second zone description";
    EXPECT_FALSE(FormatTrial("A,\"%s\",zone").isAccepted());
    const std::vector<std::string> lines = {"2026-11-20T06:03:09Z a",
                                            "2026-11-20T06:03:09+02:00 b"};
    const FormatTrial::Result result = FormatTrial::run(format, lines, "/a'b", inZone("UTC"));
    ASSERT_TRUE(result.accepted) << result.reason;
    EXPECT_EQ(result.directives[6].column, "ENTRYTIME");
    EXPECT_EQ(result.matched, 2U);
    EXPECT_EQ(column(result.lines[0], "ENTRYTIME"), "1261120070309000");
    EXPECT_EQ(column(result.lines[1], "ENTRYTIME"), "1261120050309000");
    EXPECT_EQ(result.configurationLine, "");
    const ConfigFile::Result config = ConfigFile::parse(result.table, "zrm.toml");
    ASSERT_TRUE(config) << config.error().front();
    ASSERT_EQ(config->logs.size(), 1U);
    EXPECT_THAT(config->logs[0].paths, testing::ElementsAre("/a'b"));
    EXPECT_EQ(config->logs[0].format, format);
    EXPECT_EQ(config->logs[0].follow.timezone, "UTC");
    EXPECT_EQ(FormatTrial::settingsOf("Nowhere/Town"), std::nullopt);
    const std::string odd = "/logs/a*[b]?\\.log";
    const ConfigFile::Result other =
        ConfigFile::parse(FormatTrial::run(format, lines, odd, inZone("UTC")).table, "zrm.toml");
    ASSERT_TRUE(other) << other.error().front();
    EXPECT_TRUE(PathPattern::matches(other->logs[0].paths[0], odd));
    EXPECT_FALSE(PathPattern::matches(other->logs[0].paths[0], "/logs/axbx\\.log"));
}

TEST(TableTrial, OfALongLineATableTakesTheBeginning) {
    const std::vector<std::string> lines = {std::string(5000, 'x')};
    EXPECT_EQ(FormatTrial::run("A,\"%s\",type", lines).lines.size(), 3U);
    const FormatTrial::Result result =
        FormatTrial::run("A,\"%s\",type", lines, FormatTrial::someLog, inZone(""));
    ASSERT_EQ(result.lines.size(), 1U);
    EXPECT_EQ(result.lines[0].line, std::string(2046, 'x'));
    EXPECT_FALSE(
        FormatTrial("A,\"" + std::string(1023, 'a') + "%s\",type", "/a", inZone("")).isAccepted());
}

TEST(TableTrial, ATableTakesAFormatAsItIs) {
    EXPECT_TRUE(FormatTrial(" A,\"%s\",type").isAccepted());
    EXPECT_EQ(FormatTrial(" A,\"%s\",type", "/a", inZone("")).isAccepted(),
              StringParser(" A,\"%s\",type", UserLogFile::followedFields()).status() ==
                  OBJECT_FORMAT_LEARNED);
}

TEST(TableTrial, JudgesSyslogLinesOfEveryForm) {
    const TimeZone berlin("Europe/Berlin");
    const std::vector<std::string> lines = {
        "2026-11-20T06:03:09.5Z web1 sshd[4]: iso",
        "<34>1 2026-11-20T06:03:09Z web1 sshd 4 - - rfc",
        "Nov 20 06:03:09 web1 sshd[4]: traditional",
        "neither",
        std::string(3000, 'x'),
    };
    const FormatTrial::Result result = FormatTrial::runSyslog(lines, "/s", inZone("UTC"));
    EXPECT_EQ(result.matched, 3U);
    ASSERT_EQ(result.lines.size(), 5U);
    for (std::size_t i = 0; i < 3; ++i) {
        const FormatTrial::Line& line = result.lines[i];
        EXPECT_TRUE(column(line, "ENTRYTIME").ends_with("070309000")) << line.line;
        EXPECT_EQ(column(line, "ENTRYSRC"), "sshd[4]");
        ASSERT_GE(line.fields.size(), 4U);
        for (const FormatTrial::Field& field : line.fields) {
            EXPECT_EQ(line.line.substr(field.from, field.to - field.from), field.value);
        }
    }
    EXPECT_FALSE(result.lines[3].matched);
    EXPECT_EQ(column(result.lines[3], "ENTRYDESC"), "neither");
    EXPECT_EQ(column(result.lines[3], "ENTRYTIME"), "");
    EXPECT_THAT(result.lines[3].reason, testing::HasSubstr("no form that system loggers write"));
    EXPECT_EQ(result.lines[4].line.size(), 2046U);
    EXPECT_EQ(result.table, "[[log]]\npath = '/s'\ntimezone = 'UTC'\n");
}

} // namespace
