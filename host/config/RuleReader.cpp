#include "host/config/RuleReader.h"

#include <utility>

namespace zrm::host {

std::vector<SituationConfig> RuleReader::read(ConfigSection& file) {
    if (file.has("use") && file.isTables("use")) {
        const auto tables = file.tables("use").value_or(std::vector<const toml::table*>());
        for (const toml::table* const table : tables) {
            readTable(*table);
        }
    } else {
        readNames(file);
    }
    return std::move(m_situations);
}

void RuleReader::readNames(ConfigSection& file) {
    for (const auto& [name, line] :
         file.texts("use").value_or(std::vector<ConfigSection::Text>())) {
        add(name, line, toml::table());
    }
}

void RuleReader::readTable(const toml::table& table) {
    ConfigSection section("use", table, m_problems);
    const std::optional<std::string> name = section.text("rule");
    if (!section.has("rule")) {
        section.problem("rule", "is missing", "write the name of a ready situation");
    }
    if (name) {
        add(*name, section.line("rule"), table);
    }
}

/// The keys of a table that uses a rule replace those of the rule.
void RuleReader::add(const std::string& name, unsigned line, const toml::table& changes) {
    const Result<ReadyRule> rule = m_rules.find(name);
    if (!rule) {
        m_problems.add(line, {rule.error().what, rule.error().cure, "use"});
        return;
    }
    toml::table situation = *rule->table;
    for (const auto& [key, value] : changes) {
        if (key.str() != "rule") {
            situation.insert_or_assign(key.str(), value);
        }
    }
    // What is copied has forgotten its line.
    const ConfigProblems::Place place(m_problems, line);
    SituationConfig config = m_reader.read(situation, {}, "use");
    config.rule = rule->name;
    config.ruleFile = rule->path;
    config.ruleLogs = rule->logs;
    m_situations.push_back(std::move(config));
}

} // namespace zrm::host
