#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/FormatCommands.h"
#include "host/cli/ReadyFilesText.h"
#include "host/cli/Table.h"
#include "host/config/ConfigFile.h"
#include "host/config/ReadyFormats.h"
#include "host/config/ReadyRules.h"
#include "host/diagnose/RuleSamples.h"

#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

SampleOutcome testOf(const ReadyRules::Place& place, const ReadyFormats& formats) {
    SampleOutcome outcome{place};
    const auto rule = ReadyRules::load(place);
    if (!rule) {
        outcome.failures = rule.error();
        return outcome;
    }
    outcome.samples = rule->samples.size();
    outcome.add(RuleSamples::check(*rule, formats));
    return outcome;
}

ReadyRule ruleOf(const ReadyRules& rules, const std::string& name) {
    Result<ReadyRule> rule = rules.find(name);
    if (!rule) {
        throw CliError(CliStatus::REFUSED, "rules: " + rule.error().text());
    }
    return std::move(*rule);
}

} // namespace

RulesCommand::RulesCommand(CLI::App& program)
    : m_command(program.add_subcommand("rules", "Ready situations; needs no agent")) {
    m_command->require_subcommand(0, 1);
    m_command->add_option("--directory", m_directories, "Look here for rules first; repeatable")
        ->type_name("DIR")
        ->allow_extra_args(false);
    m_command->add_subcommand("list", "All rules (the default)");
    m_show = m_command->add_subcommand("show", "What a rule says");
    m_show->add_option("NAME", m_name, "The rule's name")->required();
    m_test = m_command->add_subcommand("test", "Hold rules to their samples");
    m_test->add_option("NAME", m_names, "Names of rules, or files; none: all rules");
}

bool RulesCommand::isChosen() const {
    return m_command->parsed();
}

ReadyRules RulesCommand::rules(const Context& context) const {
    const std::string& config = context.options().config;
    std::vector<std::string> directories = m_directories;
    if (const ConfigFile::Result agent = agentAccess(config)) {
        directories.insert(directories.end(), agent->ruleDirectories.begin(),
                           agent->ruleDirectories.end());
    }
    return ReadyRules(std::move(directories));
}

CliStatus RulesCommand::run(Context& context) {
    if (m_show->parsed()) {
        return show(context);
    }
    return m_test->parsed() ? test(context) : list(context);
}

CliStatus RulesCommand::list(Context& context) const {
    Table table({{"RULE", Table::FIXED}, {"SEVERITY", Table::FIXED}, {"OF"}});
    Json all = Json::array();
    for (const ReadyRules::Place& place : rules(context).list()) {
        const auto rule = ReadyRules::load(place);
        const std::string about = rule ? rule->about : rule.error().front();
        const std::string severity = rule ? rule->situation.severity : "";
        table.add({place.name, severity, {about, rule ? Colour::NONE : Colour::BAD}});
        all.push_back({{"name", place.name},
                       {"severity", severity},
                       {"description", rule ? about : ""},
                       {"logs", rule ? Json(rule->logs) : Json::array()},
                       {"format", rule ? rule->format : ""},
                       {"path", place.path},
                       {"problem", rule ? "" : about}});
    }
    if (context.options().json) {
        context.printJson({{"rules", all}});
    } else if (!table.empty()) {
        context.print(table.text(context.terminal()));
    }
    if (table.empty()) {
        Context::note("there are no ready situations; --directory names a directory with some");
        return CliStatus::REFUSED;
    }
    return CliStatus::DONE;
}

CliStatus RulesCommand::show(Context& context) const {
    const ReadyRule rule = ruleOf(rules(context), m_name);
    printFile(context, {rule.name, rule.path}, rule.text);
    return CliStatus::DONE;
}

CliStatus RulesCommand::test(Context& context) const {
    const ReadyRules rules = this->rules(context);
    const ReadyFormats formats = readyFormatsOf(context.options().config, {});
    std::vector<ReadyRules::Place> places;
    for (const std::string& name : m_names) {
        ReadyRules::Place place = placeOfFile(name);
        place.path = place.path.empty() ? ruleOf(rules, name).path : place.path;
        places.push_back(std::move(place));
    }
    std::vector<SampleOutcome> outcomes;
    for (const ReadyRules::Place& place : m_names.empty() ? rules.list() : places) {
        outcomes.push_back(testOf(place, formats));
    }
    return printOutcomes(context, "rules", outcomes);
}

} // namespace zrm::host
