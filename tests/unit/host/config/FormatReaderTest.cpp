#include "host/config/FormatReader.h"

#include "host/config/ConfigProblems.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <optional>
#include <string>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::SizeIs;

class FormatReaderTest : public testing::Test {
protected:
    std::optional<FormatDescription> read(const std::string& text, const std::string& type) {
        m_problems.emplace("zrm.toml");
        const toml::table table = toml::parse(text);
        ConfigSection section("log", table, *m_problems);
        std::optional<FormatDescription> format = FormatReader::read(section, type);
        section.refuseUnknownKeys();
        return format;
    }
    std::vector<std::string> refused(const std::string& text, const std::string& type) {
        const auto format = read(text, type);
        EXPECT_EQ(format.has_value(), m_problems->none());
        return m_problems->texts();
    }

    std::optional<ConfigProblems> m_problems;
};

TEST_F(FormatReaderTest, ReadsARegularExpressionWithAllThatGoesWithIt) {
    const auto format = read(R"(
format = ['(?P<time>\S+) a', 'b']
time_format = "%H:%M"
defaults = { source = "app", class = "none" }
values.type = { I = "INFO", W = "WARNING" }
values.class = { x = "y" }
unwrap = "cri"
)",
                             "regex");
    ASSERT_TRUE(format) << m_problems->texts().front();
    EXPECT_EQ(format->type, "regex");
    EXPECT_THAT(format->patterns, ElementsAre("(?P<time>\\S+) a", "b"));
    EXPECT_EQ(format->timeFormat, "%H:%M");
    EXPECT_THAT(format->defaults, ElementsAre(Pair("class", "none"), Pair("source", "app")));
    ASSERT_EQ(format->values.size(), 2U);
    EXPECT_THAT(format->values.at("type"), ElementsAre(Pair("I", "INFO"), Pair("W", "WARNING")));
    EXPECT_EQ(format->unwrap, "cri");
    EXPECT_TRUE(m_problems->none());
}

TEST_F(FormatReaderTest, ReadsJsonColumnsAndExtracts) {
    const auto json = read("columns = { time = 'ts', description = 'log.msg' }\n", "json");
    ASSERT_TRUE(json);
    EXPECT_THAT(json->columns, ElementsAre(Pair("description", "log.msg"), Pair("time", "ts")));
    const auto syslog = read("[[extract]]\nsource = 'sshd*'\npatterns = ['a', 'b']\n"
                             "[[extract]]\npatterns = 'c'\n",
                             "syslog");
    ASSERT_TRUE(syslog);
    ASSERT_EQ(syslog->extracts.size(), 2U);
    EXPECT_EQ(syslog->extracts[0].source, "sshd*");
    EXPECT_THAT(syslog->extracts[0].patterns, ElementsAre("a", "b"));
    EXPECT_THAT(syslog->extracts[1].patterns, ElementsAre("c"));
}

TEST_F(FormatReaderTest, SaysWhichKeysHaveNoMeaningForTheType) {
    EXPECT_THAT(refused("columns = { time = 'ts' }\nformat = 'a'\n", "regex"),
                ElementsAre("zrm.toml:1: log.columns: has no meaning for type \"regex\"; leave it "
                            "out"));
    EXPECT_THAT(refused("time_format = 'auto'\n", "accounting"),
                ElementsAre("zrm.toml:1: log.time_format: has no meaning for type \"accounting\"; "
                            "leave it out"));
}

TEST_F(FormatReaderTest, SaysWhatIsWrongWithAKey) {
    EXPECT_THAT(refused("\n", "regex"),
                ElementsAre("zrm.toml:1: log.format: is missing, and type \"regex\" needs it; "
                            "describe the entries, for example '(?P<time>\\S+ \\S+) "
                            "(?P<type>\\w+) (?P<description>.*)'"));
    EXPECT_THAT(refused("columns = 'ts'\ndefaults.source = 1\nvalues = { type = 'x' }\n", "json"),
                ElementsAre("zrm.toml:1: log.columns: is a text; write it as [log.columns]",
                            "zrm.toml:2: log.defaults.source: is a whole number; write a text in "
                            "quotes",
                            "zrm.toml:3: log.values.type: is a text; write it as "
                            "[log.values.type]"));
    EXPECT_THAT(refused("[[extract]]\nsuorce = 'sshd'\npatterns = ['a']\n", "syslog"), SizeIs(1U));
    EXPECT_THAT(refused("", "json"), IsEmpty());
}

} // namespace
