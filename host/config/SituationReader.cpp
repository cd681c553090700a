#include "host/config/SituationReader.h"

#include "host/config/SituationValidator.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

/// Reads the fields of a situation from its table.
class Fields {
public:
    explicit Fields(ConfigSection& section) : m_section(section) {}

    /// The section has recorded a value of another type as a problem: an empty text replaces it,
    /// and further problems with that are not worth reporting.
    std::optional<std::string> text(std::string_view key) {
        std::optional<std::string> value = m_section.text(key);
        if (!value && m_section.has(key)) {
            m_noted.push_back(key);
            value = "";
        }
        return value;
    }
    bool isNoted(std::string_view key) const {
        return std::find(m_noted.begin(), m_noted.end(), key) != m_noted.end();
    }

private:
    ConfigSection& m_section;
    std::vector<std::string_view> m_noted;
};

} // namespace

SituationConfig SituationReader::read(const toml::table& table, const std::string& name,
                                      const char* sectionName) {
    ConfigSection section(sectionName, table, m_problems);
    Fields fields(section);
    SituationText text;
    text.name = name.empty() ? fields.text("name") : name;
    text.text = fields.text("text");
    text.severity = fields.text("severity");
    text.log = fields.text("log");
    const std::vector<ConfigSection::Text> conditions =
        section.texts("when").value_or(std::vector<ConfigSection::Text>());
    for (const auto& [condition, line] : conditions) {
        text.when.push_back(condition);
    }
    text.frequency = fields.text("frequency");
    text.period = fields.text("period");
    text.context = section.number("context");
    text.runbook = fields.text("runbook");
    if (std::optional<ConfigSection> labels = section.section("labels")) {
        for (const std::string& label : labels->keys()) {
            text.labels[label] = labels->text(label).value_or("-"); // a problem is recorded
        }
    }
    text.mayHaveBraces = true; // warningsOfSituations reports them
    for (const ConfigSection::Text& name :
         section.texts("group_by").value_or(std::vector<ConfigSection::Text>())) {
        text.judgement.groupBy.push_back(name.first);
    }
    text.judgement.maxGroups = section.number("max_groups");
    text.judgement.distinct = fields.text("distinct");
    text.judgement.then = fields.text("then");
    text.judgement.resolveAfter = fields.text("resolve_after");
    text.judgement.cooldown = fields.text("cooldown");
    text.judgement.absent = fields.text("absent");

    auto [situation, problems] = SituationValidator::check(text, m_patterns.ofNext());
    bool isNamed = true;
    for (const SituationProblem& problem : problems) {
        isNamed = isNamed && problem.field != "name";
        if (problem.condition) {
            section.problem(conditions[*problem.condition].second, "when", problem.what,
                            problem.cure);
        } else if (!fields.isNoted(problem.field)) {
            section.problem(problem.field, problem.what, problem.cure);
        }
    }
    if (text.log && isSourceName(*text.log)) {
        checkLog(section, *text.log);
    }
    m_patterns.spend(situation.patternSize);
    if (isNamed) {
        noteName(section, situation.name);
    }
    section.refuseUnknownKeys();
    return std::move(situation);
}

/// A name that no log has would be a situation that is never raised.
void SituationReader::checkLog(ConfigSection& section, const std::string& log) {
    if (std::none_of(m_logs.begin(), m_logs.end(),
                     [&log](const LogConfig& one) { return one.name == log; })) {
        section.problem(
            "log", "'" + log + "' is not the absolute path of a file, and no log has this name",
            "begin a path with '/', or name a [[log]] that is not a file, such as "
            "\"journal\"");
    }
}

void SituationReader::noteName(ConfigSection& section, const std::string& name) {
    const auto [first, isNew] = m_names.emplace(name, m_problems.lineOr(section.line("name")));
    if (!isNew) {
        section.problem("name",
                        "'" + name + "' is the name of the situation at line " +
                            std::to_string(first->second) + " too",
                        "give each situation a name of its own");
    }
}

} // namespace zrm::host
