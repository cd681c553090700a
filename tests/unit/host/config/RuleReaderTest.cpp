#include "host/config/RuleReader.h"

#include "host/config/ConfigFile.h"
#include "host/config/SituationWarnings.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

class RuleReaderTest : public testing::Test {
protected:
    RuleReaderTest() {
        directory.write("disk.toml",
                        "description = 'Disks'\nlogs = ['/var/log/kern.log', 'journal']\n"
                        "[situation]\ntext = '{disk} failed'\nseverity = 'major'\n"
                        "when = \"ENTRYDESC matches 'disk (?P<disk>.)'\"\n"
                        "frequency = '>= 2'\nperiod = '1m'\n");
        directory.write("bad.toml", "[situation]\nwhen = \"GONE = 'x'\"\n");
        directory.write("named.toml", "[situation]\nname = 'a'\nlog = '/a'\n");
    }
    ConfigFile::Result parse(const std::string& top, const std::string& tables = "") {
        return ConfigFile::parse(top + "\n[rules]\ndirectory = '" + directory.path().string() +
                                     "'\n" + tables,
                                 "zrm.toml");
    }
    std::vector<std::string> problems(const std::string& top, const std::string& tables = "") {
        const ConfigFile::Result result = parse(top, tables);
        return result ? std::vector<std::string>{"none"} : result.error();
    }
    std::vector<std::string> warnings(const std::string& top, const std::string& tables = "") {
        const ConfigFile::Result result = parse(top, tables);
        EXPECT_TRUE(result) << result.error().front();
        return warningsOfSituations(*result, "zrm.toml");
    }

    TemporaryDirectory directory;
};

TEST_F(RuleReaderTest, MakesSituationsOfNames) {
    const ConfigFile::Result result = parse("use = ['disk']");
    ASSERT_TRUE(result) << result.error().front();
    ASSERT_EQ(result->situations.size(), 1u);
    const SituationConfig& situation = result->situations[0];
    EXPECT_EQ(situation.name, "disk");
    EXPECT_EQ(situation.rule, "disk");
    EXPECT_EQ(situation.severity, "major");
    EXPECT_EQ(situation.frequency, ">= 2");
    EXPECT_EQ(situation.log, std::nullopt);
    EXPECT_THAT(parse("use = []")->situations, IsEmpty());
    EXPECT_EQ(parse("use = 'disk'")->situations.size(), 1u);
}

TEST_F(RuleReaderTest, TablesReplaceKeys) {
    const ConfigFile::Result result =
        parse("", "[[use]]\nrule = 'disk'\nlog = '/a'\nseverity = 'info'\nlabels = { a = 'b' }\n"
                  "[[use]]\nrule = 'disk'\nname = 'other'\nfrequency = '>= 9'\n");
    ASSERT_TRUE(result) << result.error().front();
    ASSERT_EQ(result->situations.size(), 2u);
    EXPECT_EQ(result->situations[0].log, "/a");
    EXPECT_EQ(result->situations[0].severity, "info");
    EXPECT_EQ(result->situations[0].labels.at("a"), "b");
    EXPECT_EQ(result->situations[0].frequency, ">= 2");
    EXPECT_EQ(result->situations[1].name, "other");
    EXPECT_EQ(result->situations[1].frequency, ">= 9");
}

TEST_F(RuleReaderTest, NamesTheLineThatAsksForARule) {
    EXPECT_THAT(
        problems("use = ['disk',\n'disc']"),
        ElementsAre(
            "zrm.toml:2: use: 'disc' is not a ready situation; write a name such as 'disk'"));
    EXPECT_THAT(problems("use = ['/etc/passwd']"),
                ElementsAre(HasSubstr("is not the name of a ready situation")));
    EXPECT_THAT(problems("use = ['bad']").front(),
                AllOf(StartsWith("zrm.toml:1: use: the rule 'bad' cannot be used: "),
                      HasSubstr("bad.toml:2: situation.when: ")));
    EXPECT_THAT(problems("use = ['named']").front(), HasSubstr("situation.name: belongs to"));
    EXPECT_THAT(problems("", "[[use]]\nrule = 'disk'\nfrequency = 'often'\n").front(),
                StartsWith("zrm.toml:5: use.frequency: 'often' is not a frequency"));
    EXPECT_THAT(problems("", "[[use]]\nrule = 'disk'\ncolour = 'red'\n").front(),
                StartsWith("zrm.toml:5: use.colour: unknown key"));
    EXPECT_THAT(problems("", "[[use]]\nlog = '/a'\n").front(),
                StartsWith("zrm.toml:4: use.rule: is missing"));
    EXPECT_THAT(problems("use = [5]").front(), HasSubstr("use: is a whole number"));
}

TEST_F(RuleReaderTest, ANameIsTakenOnce) {
    EXPECT_THAT(problems("use = ['disk', 'disk']").front(),
                StartsWith("zrm.toml:1: use.name: 'disk' is the name of the situation at line 1"));
}

TEST_F(RuleReaderTest, WarnsIfNoLogOfTheRuleIsMonitored) {
    const std::string cure =
        "add one, or name the log that has such entries: [[use]] with rule and "
        "log";
    EXPECT_THAT(
        warnings("use = ['disk']"),
        ElementsAre("zrm.toml: situation 'disk': no [[log]] table names /var/log/kern.log or "
                    "journal; " +
                    cure));
    EXPECT_THAT(warnings("use = ['disk']", "[[log]]\npath = '/var/log/*.log'\n"), IsEmpty());
    EXPECT_THAT(warnings("use = ['disk']", "[[log]]\ntype = 'journal'\n"), IsEmpty());
    EXPECT_THAT(warnings("", "[[use]]\nrule = 'disk'\nlog = '/a'\n[[log]]\npath = '/b'\n"),
                ElementsAre(HasSubstr("no [[log]] table names /a; add one, or name another log")));
    EXPECT_THAT(warnings("use = ['disk']", "[agent]\nlog_config = '/none/logs.conf'\n"), IsEmpty())
        << "the agent takes the logs of the system's syslog";
    const std::string logs = directory.path().string() + "/logs.conf";
    const std::string tables = "[agent]\nlog_config = '" + logs + "'\n";
    directory.write("logs.conf", "# /var/log/kern.log\n/var/log/kern.log.1 ;N ;S\n");
    EXPECT_THAT(warnings("use = ['disk']", tables),
                ElementsAre(HasSubstr("no [[log]] table and no line of " + logs +
                                      " names /var/log/kern.log or journal; add one")));
    directory.write("logs.conf", "/a ;N ;S\n  /var/log/kern.log;N ;S\n");
    EXPECT_THAT(warnings("use = ['disk']", tables), IsEmpty());
    directory.write("logs.conf", "# nothing\n");
    EXPECT_THAT(warnings("use = ['disk']", tables), IsEmpty());
}

} // namespace
