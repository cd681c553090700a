#include "host/config/SituationValidator.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

SituationText named(std::string name) {
    SituationText text;
    text.name = std::move(name);
    return text;
}

/// The fields that are wrong.
std::vector<std::string> fieldsOf(const SituationText& text) {
    std::vector<std::string> fields;
    for (const SituationProblem& problem : SituationValidator::check(text).problems) {
        fields.push_back(problem.field);
    }
    return fields;
}

TEST(SituationValidator, KeepsTheTextAndBuildsConditions) {
    SituationText text = named("ssh");
    text.text = "Failed logins";
    text.severity = "major";
    text.log = "/var/log/auth.log";
    text.when = {"ENTRYSRC starts 'sshd'", "ENTRYDESC contains 'Failed'"};
    text.frequency = "> 4";
    text.period = "1m";
    const auto [situation, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    EXPECT_EQ(situation.name, "ssh");
    EXPECT_EQ(situation.text, "Failed logins");
    EXPECT_EQ(situation.severity, "major");
    EXPECT_EQ(situation.log, "/var/log/auth.log");
    EXPECT_EQ(situation.when, text.when);
    EXPECT_EQ(situation.frequency, "> 4");
    EXPECT_EQ(situation.period, "1m");
    std::vector<std::string> columns;
    for (const Condition& condition : situation.conditions) {
        columns.push_back(condition.column);
    }
    EXPECT_THAT(columns, ElementsAre("LOGPATH", "LOGNAME", "ENTRYSRC", "ENTRYDESC", "FREQTHRESH",
                                     "PERIODTHRS"));
    EXPECT_EQ(situation.conditions.back().number, 60);
}

TEST(SituationValidator, ChecksWhatEventsHaveForPeopleAndReceivers) {
    SituationText text = named("a");
    text.when = {"ENTRYDESC matches 'from (?P<ip>\\S+)'"};
    text.text = "{count} from {ip}";
    text.runbook = "https://wiki.example.org/ssh";
    text.labels = {{"team", "web"}};
    const auto [situation, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    EXPECT_EQ(situation.runbook, text.runbook);
    EXPECT_EQ(situation.labels, text.labels);
    text.text = "{count} from {adress}";
    text.runbook = "wiki";
    text.labels = {{"log", "web"}};
    EXPECT_THAT(fieldsOf(text), ElementsAre("text", "runbook", "labels"));
}

TEST(SituationValidator, KeepsUnknownNamesInBracesOnlyWhereItMust) {
    SituationText text = named("a");
    text.text = "see {wiki}";
    EXPECT_THAT(fieldsOf(text), ElementsAre("text"));
    text.mayHaveBraces = true;
    EXPECT_THAT(fieldsOf(text), IsEmpty());
    text.text = "see {wiki} {count}";
    EXPECT_THAT(fieldsOf(text), ElementsAre("text"));
}

TEST(SituationValidator, WithGroupsOrEpisodesTheHostCounts) {
    SituationText text = named("ssh");
    text.when = {"ENTRYDESC matches 'from (?P<ip>[^ ]+) user (?P<user>[^ ]+)'"};
    text.frequency = "< 5";
    text.period = "1m";
    text.judgement.groupBy = {"ip", "entrysys", "field.x"};
    text.judgement.maxGroups = 7;
    text.judgement.distinct = "user";
    text.judgement.resolveAfter = "15m";
    const auto [situation, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    EXPECT_EQ(situation.conditions.size(), 1u) << "without the threshold";
    EXPECT_EQ(situation.judgement.frequency, 4);
    EXPECT_TRUE(situation.judgement.isUpperBound);
    EXPECT_EQ(situation.judgement.period, 60);
    EXPECT_EQ(situation.judgement.resolveAfter, 900);
    EXPECT_EQ(situation.judgement.maxGroups, 7u);
    text.judgement = {};
    text.judgement.then = "ENTRYSYS=a=b";
    const JudgementConfig sequence = SituationValidator::check(text).situation.judgement;
    EXPECT_TRUE(sequence.isUsed());
    EXPECT_EQ(sequence.thenName(), "ENTRYSYS");
    EXPECT_EQ(sequence.thenValue(), "a=b");
    text.judgement = {};
    text.judgement.cooldown = "1h";
    text.frequency = "> 4";
    EXPECT_EQ(SituationValidator::check(text).situation.judgement.frequency, 5);
    text.frequency = text.period = std::nullopt;
    text.when = {"FREQTHRESH >= 3", "PERIODTHRS = 10"};
    const SituationConfig inConditions = SituationValidator::check(text).situation;
    EXPECT_EQ(inConditions.judgement.frequency, 3);
    EXPECT_EQ(inConditions.judgement.period, 10);
    EXPECT_THAT(inConditions.conditions, IsEmpty());
}

TEST(SituationValidator, RefusesRulesOfGroupsAndEpisodesThatHaveNoEffect) {
    const auto fieldsWith = [](const JudgementText& judgement) {
        SituationText text = named("a");
        text.judgement = judgement;
        return fieldsOf(text);
    };
    EXPECT_THAT(fieldsWith({.groupBy = {"nobody"}}), ElementsAre("group_by"));
    EXPECT_THAT(fieldsWith({.groupBy = {"ENTRYSYS", "ENTRYSYS"}}), ElementsAre("group_by"));
    EXPECT_THAT(fieldsWith({.groupBy = std::vector<std::string>(9, "ENTRYSYS")}).size(), 9u);
    EXPECT_THAT(fieldsWith({.maxGroups = 5}), ElementsAre("max_groups"));
    EXPECT_THAT(fieldsWith({.groupBy = {"ENTRYSYS"}, .maxGroups = 0}), ElementsAre("max_groups"));
    EXPECT_THAT(fieldsWith({.groupBy = {"ENTRYSYS"}, .maxGroups = 1'000'001}),
                ElementsAre("max_groups"));
    EXPECT_THAT(fieldsWith({.distinct = "ENTRYSYS"}), ElementsAre("distinct"));
    EXPECT_THAT(fieldsWith({.then = "ENTRYSYS=web1"}), ElementsAre("then")) << "no threshold";
    for (const char* const then : {"", "=web1", "ENTRYSYS", "nobody=x"}) {
        SituationText text = named("a");
        text.frequency = ">= 2";
        text.period = "1m";
        text.judgement.then = then;
        EXPECT_THAT(fieldsOf(text), ElementsAre("then")) << then;
    }
    EXPECT_THAT(fieldsWith({.resolveAfter = "0s"}), ElementsAre("resolve_after"));
    EXPECT_THAT(fieldsWith({.cooldown = "soon"}), ElementsAre("cooldown"));
    EXPECT_THAT(fieldsWith({.resolveAfter = "1m", .cooldown = "1m"}), ElementsAre("cooldown"));
}

TEST(SituationValidator, AbsenceIsADurationAndGroupsAreItsOnlyCompany) {
    const auto fieldsWith = [](const JudgementText& judgement, bool hasFrequency = false) {
        SituationText text = named("a");
        text.judgement = judgement;
        if (hasFrequency) {
            text.frequency = ">= 5";
            text.period = "60s";
        }
        return fieldsOf(text);
    };
    EXPECT_THAT(fieldsWith({.absent = "1h"}), IsEmpty());
    EXPECT_THAT(fieldsWith({.groupBy = {"ENTRYSYS"}, .maxGroups = 5, .absent = "1h"}), IsEmpty());
    EXPECT_THAT(fieldsWith({.absent = "often"}), ElementsAre("absent"));
    EXPECT_THAT(fieldsWith({.absent = "0s"}), ElementsAre("absent"));
    EXPECT_THAT(fieldsWith({.absent = "1h"}, true), ElementsAre("frequency"));
    EXPECT_THAT(fieldsWith({.distinct = "ENTRYSYS", .absent = "1h"}), ElementsAre("distinct"));
    EXPECT_THAT(fieldsWith({.then = "ENTRYSYS=a", .absent = "1h"}), ElementsAre("then"));
    EXPECT_THAT(fieldsWith({.resolveAfter = "1m", .cooldown = "1m", .absent = "1h"}),
                ElementsAre("resolve_after", "cooldown"));
    SituationText text = named("a");
    text.judgement.absent = "1h";
    text.context = 3;
    EXPECT_THAT(fieldsOf(text), ElementsAre("context"));
    text.context = 0;
    text.when = {"FREQTHRESH >= 5", "PERIODTHRS = 60"};
    EXPECT_THAT(fieldsOf(text), ElementsAre("frequency"));
}

TEST(SituationValidator, NamesOfTheAgentsOwnSituationsAreTaken) {
    for (const char* const name : {"log-quiet", "log-dead", "log-unparsed"}) {
        EXPECT_THAT(fieldsOf(named(name)), ElementsAre("name")) << name;
    }
    EXPECT_THAT(fieldsOf(named("log-quieter")), IsEmpty());
}

TEST(SituationValidator, OnlyANameIsRequired) {
    const auto [situation, problems] = SituationValidator::check(named("a"));
    EXPECT_THAT(problems, IsEmpty());
    EXPECT_EQ(situation.severity, "warning");
    EXPECT_THAT(situation.conditions, IsEmpty());
    EXPECT_FALSE(situation.log);
}

TEST(SituationValidator, ChecksTheLimitsOfNames) {
    EXPECT_THAT(fieldsOf(named(std::string(128, 'n'))), IsEmpty());
    EXPECT_THAT(fieldsOf(named("a/b '\"<>&%\\ \xc3\xa4")), IsEmpty());
    EXPECT_THAT(fieldsOf(named("...")), IsEmpty());
    for (const std::string& name :
         {std::string(), std::string(129, 'n'), std::string("a\nb"), std::string("a\0b", 3),
          std::string("\x7f"), std::string("."), std::string("..")}) {
        EXPECT_THAT(fieldsOf(named(name)), ElementsAre("name")) << name;
    }
    EXPECT_THAT(fieldsOf(SituationText()), ElementsAre("name"));
}

TEST(SituationValidator, ChecksTheLimitsOfTextAndConditions) {
    SituationText text = named("a");
    text.text = std::string(1024, 't');
    text.when.assign(100, "ENTRYSRC = 'x'");
    EXPECT_THAT(fieldsOf(text), IsEmpty());
    text.text->push_back('t');
    text.when.emplace_back("ENTRYSRC = 'x'");
    EXPECT_THAT(fieldsOf(text), ElementsAre("text", "when"));
    text.text.reset();
    text.when.assign(16, std::string(4096, 'x'));
    EXPECT_EQ(fieldsOf(text).size(), 16u) << "each is checked";
    text.when.emplace_back("x");
    EXPECT_THAT(fieldsOf(text), ElementsAre("when"));
}

TEST(SituationValidator, ReportsEveryProblemWithItsPlace) {
    SituationText text;
    text.severity = "fatal";
    text.log = "auth.log";
    text.when = {"ENTRYSRC = 'x'", "NOTHING = 'x'", "ENTRYSRC = 5"};
    text.frequency = "often";
    EXPECT_THAT(fieldsOf(text), ElementsAre("name", "severity", "log", "when[1]", "when[2]",
                                            "frequency", "frequency"));
    const auto problems = SituationValidator::check(text).problems;
    EXPECT_THAT(problems[3].what, HasSubstr("in \"NOTHING = 'x'\": 'NOTHING' is not a column"));
    EXPECT_THAT(problems[3].cure, HasSubstr("the columns are ORIGINNODE, "));
}

TEST(SituationValidator, ThresholdsMayBeGivenOnlyOnce) {
    SituationText text = named("a");
    text.when = {"FREQTHRESH >= 5", "PERIODTHRS = 60"};
    EXPECT_THAT(fieldsOf(text), IsEmpty());
    text.period = "60s";
    EXPECT_THAT(fieldsOf(text), ElementsAre("frequency", "period"));
    text.frequency = ">= 5";
    EXPECT_THAT(fieldsOf(text), ElementsAre("frequency"));
}

TEST(SituationValidator, RegularExpressionsAreLimitedAloneAndTogether) {
    const auto problemsOf = [](const char* pattern, std::size_t times) {
        SituationText text = named("a");
        text.when.assign(times, std::string("ENTRYDESC matches '") + pattern + "'");
        const auto [situation, problems] = SituationValidator::check(text);
        std::vector<std::string> texts;
        for (const SituationProblem& problem : problems) {
            texts.push_back(problem.field + ": " + problem.what);
        }
        if (texts.empty()) {
            EXPECT_GT(situation.patternSize, 0u);
            EXPECT_LE(situation.patternSize, PatternBudget::ofSituation);
        }
        return texts;
    };
    EXPECT_THAT(problemsOf("Failed password .* from [0-9a-f.:]+", 100), IsEmpty());
    EXPECT_THAT(problemsOf("\\pL{400}", 1),
                ElementsAre(HasSubstr("'\\pL{400}' is too large a regular expression")));
    EXPECT_THAT(problemsOf(".{1000}.{1000}", 1), ElementsAre(HasSubstr("is too large")));
    const std::vector<std::string> many = problemsOf("\\pL{400}", 100);
    ASSERT_EQ(many.size(), 100u);
    EXPECT_THAT(many[1], HasSubstr("is too large a regular expression"));
    const std::string spent =
        "the regular expressions before this one already reach the limit for all of them";
    EXPECT_THAT(many[2], HasSubstr(spent)) << "not even compiled";
    const std::vector<std::string> together = problemsOf("\\pL{8}", 4);
    ASSERT_EQ(together.size(), 2u);
    EXPECT_THAT(together[0], HasSubstr("when[2]: "));
    EXPECT_THAT(together[0],
                HasSubstr("together with this one the regular expressions are too large"));
    EXPECT_THAT(together[1], HasSubstr(spent));
}

TEST(SituationValidator, RefusesThresholdsThatHaveNoEffect) {
    const auto refused = [](std::vector<std::string> when) {
        SituationText text = named("a");
        text.when = std::move(when);
        std::vector<std::string> texts;
        for (const SituationProblem& problem : SituationValidator::check(text).problems) {
            texts.push_back(problem.field + ": " + problem.text());
        }
        return texts;
    };
    const std::string period = "PERIODTHRS = 60";
    const std::string noFrequency =
        "when[0]: the condition on FREQTHRESH does not state a frequency that can be reached; "
        "write >=, "
        ">, <= or < and a number of entries, for example FREQTHRESH >= 5";
    for (const char* const condition :
         {"FREQTHRESH = 3", "FREQTHRESH != 3", "FREQTHRESH in [3]", "FREQTHRESH < 1",
          "FREQTHRESH >= 0", "FREQTHRESH > -1", "FREQTHRESH <= 0", "FREQTHRESH > 2147483647"}) {
        EXPECT_THAT(refused({condition, period}), ElementsAre(noFrequency)) << condition;
    }
    for (const char* const condition :
         {"PERIODTHRS = 0", "PERIODTHRS = -1", "PERIODTHRS >= 60", "PERIODTHRS in [60]"}) {
        EXPECT_THAT(
            refused({"FREQTHRESH >= 5", condition}),
            ElementsAre("when[1]: the condition on PERIODTHRS does not state a period; write = "
                        "and a number of seconds from 1, for example PERIODTHRS = 60"))
            << condition;
    }
    EXPECT_THAT(refused({"ENTRYSRC = 'x'", period}),
                ElementsAre("when[1]: PERIODTHRS has no effect without FREQTHRESH; add FREQTHRESH "
                            ">= 5"));
    EXPECT_THAT(refused({"FREQTHRESH > 0"}),
                ElementsAre("when[0]: FREQTHRESH has no effect without PERIODTHRS; add PERIODTHRS "
                            "= 60"));
    EXPECT_THAT(refused({"FREQTHRESH >= 5", period, "FREQTHRESH <= 9"}),
                ElementsAre("when[2]: a second condition on FREQTHRESH has no effect; leave it "
                            "out"));
    EXPECT_THAT(refused({"FREQTHRESH > 0", period}), IsEmpty());
    EXPECT_THAT(refused({"FREQTHRESH < 2", period}), IsEmpty());
}

} // namespace
