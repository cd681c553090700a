#include "host/config/SinkReader.h"

#include "host/config/ConfigFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::vector<SinkConfig> accepted(const std::string& text) {
    ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    if (const auto* const problems = std::get_if<std::vector<std::string>>(&result)) {
        ADD_FAILURE() << problems->front();
        return {};
    }
    return std::get<HostConfig>(std::move(result)).sinks;
}

std::vector<std::string> refused(const std::string& text) {
    const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    const auto* const problems = std::get_if<std::vector<std::string>>(&result);
    return problems == nullptr ? std::vector<std::string>{} : *problems;
}

TEST(SinkReader, ASinkIsCalledByItsTargetOrAsTheFileSays) {
    const auto sinks = accepted(R"(
[[sink]]
type = "jsonl"
path = "-"
[[sink]]
type = "jsonl"
path = "/var/log/events.jsonl"
[[sink]]
type = "jsonl"
path = "/var/log/more.jsonl"
name = "more"
)");
    ASSERT_EQ(sinks.size(), 3u);
    EXPECT_EQ(sinks[0], SinkConfig::jsonl("-"));
    EXPECT_EQ(sinks[0].name, "standard output");
    EXPECT_EQ(sinks[1], SinkConfig::jsonl("/var/log/events.jsonl"));
    EXPECT_EQ(sinks[1].name, "/var/log/events.jsonl");
    EXPECT_EQ(sinks[2].name, "more");
    EXPECT_EQ(sinks[2].text("path"), "/var/log/more.jsonl");
}

TEST(SinkReader, RefusesIncompleteSinks) {
    EXPECT_THAT(refused(R"([[sink]]
[[sink]]
type = "kafka"
path = "events.jsonl"
[[sink]]
type = "jsonl"
[[sink]]
type = 5
)"),
                ElementsAre("zrm.toml:1: sink.type: is missing; write type = \"jsonl\"",
                            "zrm.toml:3: sink.type: 'kafka' is none of the choices; write jsonl",
                            "zrm.toml:5: sink.path: is missing; write path = "
                            "\"/var/log/zrm/events.jsonl\"",
                            "zrm.toml:8: sink.type: is a whole number; write a text in quotes"));
}

TEST(SinkReader, RefusesUnusablePathsAndNames) {
    EXPECT_THAT(
        refused("[[sink]]\ntype = 'jsonl'\npath = 'events.jsonl'\nname = ''\n"
                "[[sink]]\ntype = 'jsonl'\npath = ''\nname = '" +
                std::string(129, 'a') + "'\n[[sink]]\ntype = 'jsonl'\npath = '-'\n" +
                R"(name = "a\tb")"),
        ElementsAre(
            "zrm.toml:3: sink.path: 'events.jsonl' is no absolute path; begin it with '/', or "
            "write \"-\" for standard output",
            "zrm.toml:4: sink.name: '' is no usable text; write 1 to 128 bytes without control "
            "characters",
            "zrm.toml:7: sink.path: '' is no absolute path; begin it with '/', or write \"-\" for "
            "standard output",
            "zrm.toml:8: sink.name: '" + std::string(129, 'a') +
                "' is no usable text; write 1 to 128 bytes without control characters",
            "zrm.toml:12: sink.name: is no usable text; write 1 to 128 bytes without "
            "control characters"));
}

TEST(SinkReader, NoTwoSinksHaveTheSameTargetOrName) {
    EXPECT_THAT(refused(R"([[sink]]
type = "jsonl"
path = "-"
[[sink]]
type = "jsonl"
path = "-"
name = "other"
[[sink]]
type = "jsonl"
path = "/a"
name = "other"
[[sink]]
type = "jsonl"
path = "/b"
name = "/a"
[[sink]]
type = "jsonl"
path = "/c"
name = "standard output"
)"),
                ElementsAre("zrm.toml:6: sink.path: the sink at line 3 has '-' already; give each "
                            "sink a path of its own",
                            "zrm.toml:11: sink.name: the sink at line 7 is called 'other' too; "
                            "give each sink a name of its own",
                            "zrm.toml:19: sink.name: the sink at line 1 is called 'standard "
                            "output' too; give each sink a name of its own"));
}

} // namespace
