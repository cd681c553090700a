#include "host/config/ConfigFile.h"

#include "ConfigText.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

TEST(ConfigFile, AnEmptyFileGivesTheDefaults) {
    const HostConfig config = accepted("");
    EXPECT_EQ(config.stateDirectory, "/var/lib/zrm");
    EXPECT_THAT(config.environment, IsEmpty());
    EXPECT_FALSE(config.http.listen);
    EXPECT_TRUE(config.history.enabled);
    EXPECT_EQ(config.history.directory, "");
    EXPECT_EQ(config.history.keepDays, 30);
    EXPECT_EQ(config.history.keepEvents, 5'000'000u);
    EXPECT_THAT(config.sinks, ElementsAre(SinkConfig::jsonl("-")));
    EXPECT_THAT(config.situations, IsEmpty());
}

TEST(ConfigFile, ReadsEveryKey) {
    const HostConfig config = accepted(R"(
state_directory = "/srv/zrm"

[agent]
log_config  = "/etc/zrm/logs.conf"
syslog_conf = "/etc/syslog.conf"
debug_log   = ""
max_rows    = 1_000
trace       = "error,LogManager=detail"

[http]
listen = "[::1]:0"
token_file = "/srv/token"

[history]
enabled     = false
directory   = "/srv/history"
keep_days   = 7
keep_events = 100_000

[[sink]]
type = "jsonl"
path = "/var/log/events.jsonl"

[[situation]]
name      = "ssh-bruteforce"
text      = "Repeated failed SSH logins"
severity  = "critical"
log       = "/var/log/auth.log"
when      = ["ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed password'"]
frequency = ">= 5"
period    = "60s"
runbook   = "https://wiki.example.org/ssh"
labels    = { team = "web", tier = "2" }
)");
    EXPECT_EQ(config.stateDirectory, "/srv/zrm");
    EXPECT_THAT(config.environment,
                ElementsAre(EnvironmentSetting{"ZRM_CONFIG_FILE", "/etc/zrm/logs.conf"},
                            EnvironmentSetting{"ZRM_SYSLOG_CONF", "/etc/syslog.conf"},
                            EnvironmentSetting{"ZRM_MAX_ROWS", "1000"},
                            EnvironmentSetting{"QFW_TRC1", "error,LogManager=detail"}));
    EXPECT_EQ(config.http.listen, (ListenAddress{"::1", 0}));
    EXPECT_EQ(config.history, (HistoryConfig{false, "/srv/history", 7, 100'000}));
    EXPECT_EQ(config.http.tokenFile, "/srv/token");
    EXPECT_THAT(config.sinks, ElementsAre(SinkConfig::jsonl("/var/log/events.jsonl")));
    ASSERT_EQ(config.situations.size(), 1u);
    const SituationConfig& situation = config.situations[0];
    EXPECT_EQ(situation.name, "ssh-bruteforce");
    EXPECT_EQ(situation.text, "Repeated failed SSH logins");
    EXPECT_EQ(situation.severity, "critical");
    EXPECT_EQ(situation.runbook, "https://wiki.example.org/ssh");
    EXPECT_THAT(situation.labels, ElementsAre(Pair("team", "web"), Pair("tier", "2")));
    std::vector<std::string> conditions;
    for (const Condition& condition : situation.conditions) {
        conditions.push_back(
            condition.column + " " + std::to_string(condition.op) + " " +
            (condition.isNumber ? std::to_string(condition.number) : condition.text));
    }
    EXPECT_THAT(conditions,
                ElementsAre("LOGPATH 1 /var/log/", "LOGNAME 1 auth.log", "ENTRYSRC 102 sshd",
                            "ENTRYDESC 101 Failed password", "FREQTHRESH 3 5", "PERIODTHRS 1 60"));
}

TEST(ConfigFile, ASituationNeedsOnlyAName) {
    const HostConfig config = accepted("[[situation]]\nname = 'all'\n");
    EXPECT_EQ(config.situations.at(0).severity, "warning");
    EXPECT_EQ(config.situations.at(0).text, "");
    EXPECT_THAT(config.situations.at(0).conditions, IsEmpty());
}

TEST(ConfigFile, WhenMayBeASingleText) {
    const HostConfig config = accepted("[[situation]]\nname = 'a'\nwhen = \"ENTRYSRC = 'x'\"\n");
    EXPECT_EQ(config.situations.at(0).conditions.at(0).text, "x");
}

TEST(ConfigFile, HttpAndSinksCanBeOff) {
    EXPECT_EQ(accepted("[http]").http.listen, (ListenAddress{"127.0.0.1", 7186}));
    EXPECT_FALSE(accepted("http.listen = ''").http.listen);
    EXPECT_THAT(accepted("sink = []").sinks, IsEmpty());
}

TEST(ConfigFile, RefusesUnknownKeysEverywhere) {
    EXPECT_THAT(
        problemsOf(R"(colour = "red"
[agent]
log_confg = "/etc/zrm/logs.conf"
[http]
port = 7186
[[sink]]
type = "jsonl"
path = "-"
rotate = true
[[situation]]
name = "a"
threshold = 5
[histories]
keep_days = 30
)"),
        ElementsAre(
            "zrm.toml:1: colour: unknown key; the keys here are state_directory, agent, http, "
            "history, formats, rules, sink, log, situation, use",
            "zrm.toml:3: agent.log_confg: unknown key; the keys here are log_config, "
            "syslog_conf, debug_log, max_rows, trace",
            "zrm.toml:5: http.port: unknown key; the keys here are listen, certificate, "
            "token_file, key",
            "zrm.toml:9: sink.rotate: unknown key; the keys here are type, name, path",
            "zrm.toml:12: situation.threshold: unknown key; the keys here are name, text, "
            "severity, log, when, frequency, period, context, runbook, labels, group_by, "
            "max_groups, distinct, then, resolve_after, cooldown, absent",
            "zrm.toml:13: histories: unknown key; the keys here are state_directory, agent, "
            "http, history, formats, rules, sink, log, situation, use"));
}

TEST(ConfigFile, RefusesValuesOfAnotherType) {
    EXPECT_THAT(
        problemsOf(R"([agent]
log_config = 5
max_rows = "many"
trace = true
[http]
listen = 7186
[[situation]]
name = ["a"]
when = 5
[[situation]]
name = "b"
when = ["ENTRYSRC = 'a'", 1.5]
text = 2026-11-20
severity = { a = 1 }
)"),
        ElementsAre("zrm.toml:2: agent.log_config: is a whole number; write a text in quotes",
                    "zrm.toml:3: agent.max_rows: is a text; write a whole number",
                    "zrm.toml:4: agent.trace: is a boolean; write a text in quotes",
                    "zrm.toml:6: http.listen: is a whole number; write a text in quotes",
                    "zrm.toml:8: situation.name: is a list; write a text in quotes",
                    "zrm.toml:9: situation.when: is a whole number; write a list of texts in "
                    "quotes",
                    "zrm.toml:12: situation.when: is a number with a fraction; write a list of "
                    "texts in quotes",
                    "zrm.toml:13: situation.text: is a date or time; write a text in quotes",
                    "zrm.toml:14: situation.severity: is a table; write a text in quotes"));
}

TEST(ConfigFile, RefusesTablesOfAnotherKind) {
    EXPECT_THAT(problemsOf("agent = 5\nsink = 'x'\nsituation = [1]\n"),
                ElementsAre("zrm.toml:1: agent: is a whole number; write it as [agent]",
                            "zrm.toml:2: sink: is a text; write it as [[sink]]",
                            "zrm.toml:3: situation: is a whole number; write it as "
                            "[[situation]]"));
    EXPECT_THAT(problemsOf("[situation]\nname = 'a'\n"),
                ElementsAre("zrm.toml:1: situation: is a table; write it as [[situation]]"));
}

TEST(ConfigFile, RefusesUnusableValues) {
    EXPECT_THAT(
        problemsOf(R"(state_directory = "zrm"
[agent]
log_config = "logs.conf"
syslog_conf = "a\u0000b"
max_rows = 0
[http]
listen = "7186"
token_file = "token"
)"),
        ElementsAre(
            "zrm.toml:1: state_directory: 'zrm' is not an absolute path; begin it with '/'",
            "zrm.toml:3: agent.log_config: 'logs.conf' is not an absolute path; begin it with '/'",
            "zrm.toml:4: agent.syslog_conf: contains a NUL character; leave it out",
            "zrm.toml:5: agent.max_rows: is not a usable number of rows; write a number from 1 to "
            "2147483647",
            "zrm.toml:7: http.listen: '7186' is not an address to listen on; write ADDRESS:PORT, "
            "for "
            "example \"127.0.0.1:7186\", or \"\" for none",
            "zrm.toml:8: http.token_file: 'token' is not an absolute path; begin it with '/'"));
}

TEST(ConfigFile, RefusesZeroBytesInListsToo) {
    for (const std::string when : {R"("ENTRYDESC contains 'a\u0000b'")",
                                   R"(["ENTRYSRC = 'x'", "ENTRYDESC contains 'a\u0000b'"])"}) {
        EXPECT_THAT(
            problemsOf("[[situation]]\nname = \"a\"\ntext = \"x\"\nseverity = \"info\"\n"
                       "log = \"/a\"\nwhen = " +
                       when),
            ElementsAre("zrm.toml:6: situation.when: contains a NUL character; leave it out"));
    }
}

TEST(ConfigFile, RefusesToListenForOtherMachinesWithoutTls) {
    for (const std::string address : {"0.0.0.0:7186", "[::]:7186", "192.168.1.5:7186", "web1:80"}) {
        EXPECT_THAT(
            problemsOf("http.listen = \"" + address + "\""),
            ElementsAre("zrm.toml:1: http.listen: '" + address +
                        "' can be reached from other machines; write a loopback address "
                        "(127.0.0.1, [::1] or localhost), or add certificate and key, to use TLS"));
    }
}

TEST(ConfigFile, ListensForOtherMachinesUnderTls) {
    const auto result = ConfigFile::parse("[http]\nlisten = \"0.0.0.0:7186\"\n"
                                          "certificate = \"/etc/zrm/cert.pem\"\n"
                                          "key = \"/etc/zrm/key.pem\"\n",
                                          "zrm.toml");
    ASSERT_TRUE(result);
    const HttpConfig& http = result->http;
    EXPECT_EQ(http.listen->text(), "0.0.0.0:7186");
    EXPECT_EQ(http.certificate, "/etc/zrm/cert.pem");
    EXPECT_EQ(http.key, "/etc/zrm/key.pem");
}

TEST(ConfigFile, RefusesHalfOfACertificate) {
    EXPECT_THAT(problemsOf("http.certificate = \"/c\""),
                ElementsAre("zrm.toml:1: http.certificate: is given alone; give both certificate "
                            "and key, or neither"));
    EXPECT_THAT(
        problemsOf("http.key = \"/k\""),
        ElementsAre("zrm.toml:1: http.key: is given alone; give both certificate and key, or "
                    "neither"));
    EXPECT_THAT(
        problemsOf("http = {certificate = \"c\", key = \"k\"}"),
        ElementsAre("zrm.toml:1: http.certificate: 'c' is not an absolute path; begin it with "
                    "'/'",
                    "zrm.toml:1: http.key: 'k' is not an absolute path; begin it with '/'"));
}

TEST(ConfigFile, RefusesSituationsWithoutAUniqueName) {
    EXPECT_THAT(
        problemsOf(R"([[situation]]
text = "a"
[[situation]]
name = ""
[[situation]]
name = "disk"
[[situation]]
name = "disk"
[[situation]]
name = "a\nb"
)"),
        ElementsAre(
            "zrm.toml:1: situation.name: is missing; give the situation a name",
            "zrm.toml:4: situation.name: is not a usable name; write 1 to 128 bytes without "
            "control characters, and not . or ..",
            "zrm.toml:8: situation.name: 'disk' is the name of the situation at line 6 "
            "too; give each situation a name of its own",
            "zrm.toml:10: situation.name: is not a usable name; write 1 to 128 bytes without "
            "control characters, and not . or .."));
}

TEST(ConfigFile, RefusesInvalidSituations) {
    EXPECT_THAT(
        problemsOf(R"([[situation]]
name = "a"
severity = "fatal"
log = "auth.log"
when = ["ENTRYSOURCE = 'x'",
        "ENTRYSRC is 'x'",
        "ENTRYSRC = 5"]
frequency = "often"
period = "60"
)"),
        ElementsAre(
            "zrm.toml:3: situation.severity: 'fatal' is not a severity; write info, minor, "
            "warning, "
            "major or critical",
            "zrm.toml:4: situation.log: 'auth.log' is not the absolute path of a file; write the "
            "log's path as in the log configuration, beginning with '/'",
            "zrm.toml:5: situation.when: in \"ENTRYSOURCE = 'x'\": 'ENTRYSOURCE' is not a column; "
            "the columns are ORIGINNODE, LOGPATH, LOGNAME, ENTRYTIME, ENTRYSYS, ENTRYSRC, "
            "ENTRYTYPE, ENTRYCLASS, ENTRYDESC, FREQTHRESH, PERIODTHRS, TIMESTAMP, SAMPLENO, "
            "ROWNO, ULOGPATH, ULOGNAME, UENTRYSRC, UENTRYDESC, and field.NAME for the fields of "
            "entries",
            "zrm.toml:6: situation.when: in \"ENTRYSRC is 'x'\": 'is' is not an operator; the "
            "operators are =, !=, >=, <=, <, >, contains, starts, matches, in",
            "zrm.toml:7: situation.when: in \"ENTRYSRC = 5\": ENTRYSRC holds text; write the "
            "value in quotes",
            "zrm.toml:8: situation.frequency: 'often' is not a frequency that can be reached; "
            "write "
            ">=, >, <= or < and a number of entries, for example \">= 5\"",
            "zrm.toml:9: situation.period: '60' is not a period; write a number and s, m, h or d, "
            "for example \"60s\""));
}

TEST(ConfigFile, FrequencyAndPeriodGoTogether) {
    EXPECT_THAT(problemsOf("[[situation]]\nname = 'a'\nfrequency = '>= 5'\n"),
                ElementsAre("zrm.toml:3: situation.frequency: has no period; add period "
                            "= \"60s\""));
    EXPECT_THAT(problemsOf("[[situation]]\nname = 'a'\nperiod = '60s'\n"),
                ElementsAre("zrm.toml:3: situation.period: has no frequency; add "
                            "frequency = \">= 5\""));
    EXPECT_THAT(problemsOf("[[situation]]\nname = 'a'\nfrequency = '>= 5'\nperiod = '60s'\n"
                           "when = ['PERIODTHRS = 5']\n"),
                ElementsAre("zrm.toml:3: situation.frequency: the conditions name FREQTHRESH or "
                            "PERIODTHRS as well; leave those conditions out"));
}

TEST(ConfigFile, ThresholdsMayBeAmongTheConditions) {
    const HostConfig config =
        accepted("[[situation]]\nname = 'a'\nwhen = ['FREQTHRESH >= 5', 'PERIODTHRS = 60']\n");
    EXPECT_EQ(config.situations.at(0).conditions.size(), 2u);
}

TEST(ConfigFile, TheRegularExpressionsOfAFileAreLimitedTogether) {
    // Each situation takes more than two thirds of its budget.
    const std::string pattern = "\"ENTRYDESC matches '[^,]{800}'\"";
    const auto file = [&](int situations) {
        std::string text;
        for (int number = 0; number < situations; ++number) {
            text += "[[situation]]\nname = '" + std::to_string(number) + "'\nwhen = [" + pattern +
                    ", " + pattern + "]\n";
        }
        return text;
    };
    EXPECT_EQ(accepted(file(50)).situations.size(), 50u);
    const std::vector<std::string> problems = problemsOf(file(100));
    ASSERT_FALSE(problems.empty());
    EXPECT_THAT(
        problems.back(),
        testing::HasSubstr(
            "the regular expressions before this one already reach the limit for all of them"));
}

TEST(ConfigFile, ReportsWhatIsWrongWithTheHistory) {
    EXPECT_THAT(
        problemsOf("[history]\n"
                   "enabled = \"yes\"\n"
                   "directory = \"state\"\n"
                   "keep_days = 0\n"
                   "keep_events = 1_000_000_000_001\n"
                   "keep = 1\n"),
        ElementsAre("zrm.toml:2: history.enabled: is a text; write true or false",
                    "zrm.toml:3: history.directory: 'state' is not an absolute path; begin it "
                    "with '/'",
                    "zrm.toml:4: history.keep_days: 0 is out of bounds; write a number "
                    "from 1 to 36500",
                    "zrm.toml:5: history.keep_events: 1000000000001 is out of bounds; "
                    "write a number from 1 to 1000000000000",
                    "zrm.toml:6: history.keep: unknown key; the keys here are enabled, "
                    "directory, keep_days, keep_events"));
    EXPECT_THAT(problemsOf("history = true"),
                ElementsAre("zrm.toml:1: history: is a boolean; write it as [history]"));
    EXPECT_THAT(problemsOf("[history]\nkeep_days = 1.5\nkeep_events = \"all\"\n"),
                ElementsAre("zrm.toml:2: history.keep_days: is a number with a fraction; write a "
                            "whole number",
                            "zrm.toml:3: history.keep_events: is a text; write a whole number"));
}

} // namespace
