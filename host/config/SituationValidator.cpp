#include "host/config/SituationValidator.h"

#include "host/config/BuiltInSituations.h"
#include "host/config/ConditionParser.h"
#include "host/config/EventExtras.h"
#include "host/config/TextTemplate.h"
#include "host/config/Thresholds.h"

#include <algorithm>
#include <array>
#include <utility>

namespace zrm::host {

namespace {

using Problems = std::vector<SituationProblem>;

constexpr std::array<std::string_view, 5> severities = {"info", "minor", "warning", "major",
                                                        "critical"};
constexpr const char* defaultSeverity = "warning";

SituationProblem inCondition(std::size_t index, std::string what, std::string cure) {
    return {{std::move(what), std::move(cure), "when[" + std::to_string(index) + ']'}, index};
}

bool isControl(char c) {
    return static_cast<unsigned char>(c) < 0x20 || c == 0x7f;
}

std::string inBytes(std::size_t bytes) {
    return std::to_string(bytes) + " bytes";
}

void checkName(const std::optional<std::string>& name, Problems& problems) {
    if (!name) {
        problems.push_back({{"is missing", "give the situation a name", "name"}});
        return;
    }
    // Clients treat "." and ".." as directories, so no request could name such a situation.
    if (name->empty() || name->size() > SituationValidator::longestName || *name == "." ||
        *name == ".." || std::any_of(name->begin(), name->end(), isControl)) {
        problems.push_back({{"is not a usable name",
                             "write 1 to " + inBytes(SituationValidator::longestName) +
                                 " without control characters, and not . or ..",
                             "name"}});
    }
}

/// Their episodes and silences would be confused.
void checkNotBuiltIn(const std::string& name, Problems& problems) {
    if (BuiltInSituations::contain(name)) {
        problems.push_back({{"'" + name + "' is the name of a situation of the agent itself",
                             "choose another name", "name"}});
    }
}

void checkText(const std::string& text, Problems& problems) {
    if (text.size() > SituationValidator::longestText) {
        problems.push_back({{"has " + inBytes(text.size()),
                             "write at most " + inBytes(SituationValidator::longestText), "text"}});
    }
}

void checkSeverity(const std::string& severity, Problems& problems) {
    if (std::find(severities.begin(), severities.end(), severity) == severities.end()) {
        problems.push_back({{"'" + severity + "' is not a severity",
                             "write info, minor, warning, major or critical", "severity"}});
    }
}

void addLog(const std::string& log, SituationConfig& situation, Problems& problems) {
    Result<std::vector<Condition>> conditions = ConditionBuilder::ofLog(log);
    if (!conditions) {
        problems.push_back({{conditions.error().what, conditions.error().cure, "log"}});
        return;
    }
    situation.conditions = std::move(*conditions);
}

/// The thresholds stated as conditions. Conditions that put no threshold in force are refused: the
/// situation would run without the threshold its author wrote.
class WrittenThresholds {
public:
    explicit WrittenThresholds(Problems& problems) : m_problems(problems) {}

    /// Records a condition on a threshold column.
    void add(std::size_t index, const Condition& condition) {
        Threshold& threshold = condition.column == "FREQTHRESH" ? m_frequency : m_period;
        if (threshold.index) {
            m_problems.push_back(
                inCondition(index, "a second condition on " + condition.column + " has no effect",
                            "leave it out"));
            return;
        }
        threshold.index = index;
        if (!threshold.isInForce(condition)) {
            m_problems.push_back(inCondition(index, threshold.what, threshold.cure));
        }
    }

    /// Call after all conditions have been added.
    void finish() {
        requireOther(m_frequency, m_period, "add PERIODTHRS = 60");
        requireOther(m_period, m_frequency, "add FREQTHRESH >= 5");
    }

    bool any() const { return m_frequency.index || m_period.index; }

private:
    struct Threshold {
        const char* column;
        bool (*isInForce)(const Condition& condition);
        const char* what;
        const char* cure;
        std::optional<std::size_t> index = {}; ///< index of the condition that states it
    };

    void requireOther(const Threshold& one, const Threshold& other, const char* cure) {
        if (one.index && !other.index) {
            m_problems.push_back(inCondition(
                *one.index, std::string(one.column) + " has no effect without " + other.column,
                cure));
        }
    }

    Problems& m_problems;
    Threshold m_frequency{
        "FREQTHRESH", &Thresholds::isFrequency,
        "the condition on FREQTHRESH does not state a frequency that can be reached",
        "write >=, >, <= or < and a number of entries, for example "
        "FREQTHRESH >= 5"};
    Threshold m_period{"PERIODTHRS", &Thresholds::isPeriod,
                       "the condition on PERIODTHRS does not state a period",
                       "write = and a number of seconds from 1, for example PERIODTHRS = 60"};
};

void addConditions(const SituationText& text, SituationConfig& situation, PatternBudget& budget,
                   Problems& problems) {
    const std::vector<std::string>& texts = text.when;
    const bool hasThresholdKeys = text.frequency || text.period;
    if (texts.size() > SituationValidator::mostConditions) {
        problems.push_back(
            {{"has " + std::to_string(texts.size()) + " conditions",
              "write at most " + std::to_string(SituationValidator::mostConditions), "when"}});
        return;
    }
    std::size_t bytes = 0;
    for (const std::string& text : texts) {
        bytes += text.size();
    }
    if (bytes > SituationValidator::longestConditions) {
        problems.push_back(
            {{"has conditions of " + inBytes(bytes) + " together",
              "write at most " + inBytes(SituationValidator::longestConditions), "when"}});
        return;
    }
    const ConditionParser parser("RMLOGENT");
    WrittenThresholds thresholds(problems);
    for (std::size_t index = 0; index < texts.size(); ++index) {
        Result<Condition> condition = parser.parse(texts[index], budget);
        if (!condition) {
            const Problem& problem = condition.error();
            problems.push_back(
                inCondition(index, "in \"" + texts[index] + "\": " + problem.what, problem.cure));
            continue;
        }
        if (isThresholdColumn(condition->column)) {
            thresholds.add(index, *condition);
        }
        situation.conditions.push_back(std::move(*condition));
    }
    if (!hasThresholdKeys) {
        thresholds.finish();
    } else if (thresholds.any()) {
        problems.push_back({{"the conditions name FREQTHRESH or PERIODTHRS as well",
                             "leave those conditions out", "frequency"}});
    }
}

void addThresholds(const SituationText& text, SituationConfig& situation, Problems& problems) {
    if (text.frequency && !text.period) {
        problems.push_back({{"has no period", "add period = \"60s\"", "frequency"}});
    }
    if (text.period && !text.frequency) {
        problems.push_back({{"has no frequency", "add frequency = \">= 5\"", "period"}});
    }
    const auto add = [&](std::string_view field, const std::optional<std::string>& value,
                         const std::optional<Condition>& condition, const char* what,
                         const char* cure) {
        if (condition) {
            situation.conditions.push_back(*condition);
        } else if (value) {
            problems.push_back({{"'" + *value + "' is " + what, cure, std::string(field)}});
        }
    };
    add("frequency", text.frequency,
        text.frequency ? Thresholds::frequency(*text.frequency) : std::nullopt,
        "not a frequency that can be reached",
        "write >=, >, <= or < and a number of entries, for example \">= 5\"");
    add("period", text.period, text.period ? Thresholds::period(*text.period) : std::nullopt,
        "not a period", "write a number and s, m, h or d, for example \"60s\"");
}

/// What the events have for people and receivers. The text may name what the conditions capture.
void addExtras(const SituationText& text, SituationConfig& situation, Problems& problems) {
    const auto note = [&](const char* field, const Problem& problem) {
        problems.push_back({{problem.what, problem.cure, field}});
    };
    const auto parsed = TextTemplate::parse(situation.text, situation.conditions);
    if (!parsed) {
        note("text", parsed.error());
    } else if (!parsed->ignored().what.empty() && !text.mayHaveBraces) {
        note("text", parsed->ignored());
    }
    situation.runbook = text.runbook.value_or("");
    if (const auto checked = EventExtras::checkRunbook(situation.runbook);
        !situation.runbook.empty() && !checked) {
        note("runbook", checked.error());
    }
    situation.labels = text.labels;
    if (const auto checked = EventExtras::checkLabels(situation.labels); !checked) {
        note("labels", checked.error());
    }
}

} // namespace

SituationValidator::Verdict SituationValidator::check(const SituationText& text,
                                                      PatternBudget budget) {
    Verdict verdict;
    SituationConfig& situation = verdict.situation;
    Problems& problems = verdict.problems;
    situation.name = text.name.value_or("");
    situation.text = text.text.value_or("");
    situation.severity = text.severity.value_or(defaultSeverity);
    situation.log = text.log;
    situation.when = text.when;
    situation.frequency = text.frequency;
    situation.period = text.period;
    checkName(text.name, problems);
    checkNotBuiltIn(situation.name, problems);
    checkText(situation.text, problems);
    checkSeverity(situation.severity, problems);
    if (text.log) {
        addLog(*text.log, situation, problems);
    }
    addConditions(text, situation, budget, problems);
    situation.patternSize = budget.used();
    addThresholds(text, situation, problems);
    if (text.context && (*text.context < 0 || *text.context > mostContext)) {
        problems.push_back(
            {{std::to_string(*text.context) + " is not a usable number of entries",
              "write a number from 0 to " + std::to_string(mostContext), "context"}});
    }
    situation.context = static_cast<std::size_t>(text.context.value_or(0));
    addExtras(text, situation, problems);
    std::vector<Problem> ofJudgement;
    situation.judgement = JudgementRules::check(text.judgement, situation.conditions, ofJudgement);
    for (Problem& problem : ofJudgement) {
        problems.push_back({std::move(problem)});
    }
    if (text.judgement.absent && situation.context > 0) {
        problems.push_back({{"has no effect with absent, whose events have no entry",
                             "leave one of the two out", "context"}});
    }
    return verdict;
}

} // namespace zrm::host
