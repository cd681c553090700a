#include "host/cli/SituationOptions.h"

#include "host/cli/CliError.h"
#include "host/cli/InputFile.h"
#include "host/cli/JsonText.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <system_error>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = SituationOptions::Json;

Json fileContent(const std::string& path) {
    Json value = JsonText::parse(InputFile(path).text());
    if (!value.is_object()) {
        throw CliError(CliStatus::USAGE,
                       "--file: " + path +
                           " does not contain a JSON object; 'zrmctl situations show NAME "
                           "--json' prints one");
    }
    return value;
}

/// Removes what the agent reports about a situation besides its definition, and null members.
Json withoutState(Json definition) {
    for (const char* const key : {"source", "state", "problem", "counts", "last_raised"}) {
        definition.erase(key);
    }
    for (auto member = definition.begin(); member != definition.end();) {
        member = member->is_null() ? definition.erase(member) : std::next(member);
    }
    return definition;
}

int numberOf(const char* option, const std::string& text) {
    int number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    if (error != std::errc() || stop != end) {
        throw CliError(CliStatus::USAGE, std::string(option) + ": '" + text + "' is not a number");
    }
    return number;
}

Json labelsOf(const std::vector<std::string>& texts) {
    Json labels = Json::object();
    for (const std::string& text : texts) {
        const std::size_t equals = text.find('=');
        if (equals == std::string::npos) {
            throw CliError(CliStatus::USAGE, "--label: write NAME=VALUE, not '" + text + "'");
        }
        labels[text.substr(0, equals)] = text.substr(equals + 1);
    }
    return labels;
}

} // namespace

Json SituationOptions::subject(const std::string& name, const std::string& file) {
    if (name.empty() == file.empty()) {
        throw CliError(CliStatus::USAGE, "name either a situation or --file");
    }
    if (file.empty()) {
        return {{"situation", name}};
    }
    // Before the list begins: an exception inside one may leak memory.
    Json definition = withoutState(fileContent(file));
    definition.erase("version");
    return {{"definition", std::move(definition)}};
}

void SituationOptions::addTo(CLI::App& command) {
    const auto add = [&](const char* name, std::string& value, const char* type, const char* help) {
        return command.add_option(name, value, help)->type_name(type);
    };
    const auto addMember = [&](const char* key, std::string& value, const char* type,
                               const char* help) {
        std::string option = std::string("--") + key;
        std::replace(option.begin(), option.end(), '_', '-');
        m_members.push_back({key, add(option.c_str(), value, type, help), &value});
    };
    add("--file", m_file, "FILE", "The definition as JSON; - is standard input");
    addMember("text", m_text, "TEXT", "What people read, for example \"login from {ENTRYSYS}\"");
    addMember("severity", m_severity, "SEVERITY", "info, minor, warning, major or critical");
    addMember("log", m_log, "LOG", "The full path of a log; without it, every log");
    command
        .add_option("--when", m_when,
                    "A condition, for example \"ENTRYSRC starts 'sshd'\"; all must hold")
        ->type_name("CONDITION")
        ->allow_extra_args(false);
    addMember("frequency", m_frequency, "COUNT",
              "At least or at most this many entries, for example \">= 5\"");
    addMember("period", m_period, "TIME", "Within this time, for example 60s, 5m, 1h");
    addMember("context", m_context, "COUNT", "How many entries before it an event has, 0 to 100");
    addMember("runbook", m_runbook, "URL", "A page that says what to do about an event");
    command.add_option("--label", m_labels, "A label of its events; repeatable")
        ->type_name("NAME=VALUE")
        ->allow_extra_args(false);
    command
        .add_option("--group-by", m_groupBy,
                    "Judge the entries of each value apart: a column, a field or a capture; may be "
                    "repeated")
        ->type_name("NAME")
        ->allow_extra_args(false);
    addMember("max_groups", m_maxGroups, "COUNT", "How many groups are kept at a time");
    addMember("distinct", m_distinct, "NAME", "Count different values of this, not entries");
    addMember("then", m_then, "NAME=VALUE",
              "Raise only with an entry of this value, before which the others have come");
    addMember("resolve_after", m_resolveAfter, "TIME",
              "Raise one event per episode, which ends when nothing has come for this long");
    addMember("cooldown", m_cooldown, "TIME", "Raise at most one event within this time");
    addMember("absent", m_absent, "TIME",
              "Raise one event when no such entry has come for this long; the next resolves it");
}

bool SituationOptions::areGiven() const {
    return !m_file.empty() || !m_when.empty() || !m_groupBy.empty() || !m_labels.empty() ||
           std::any_of(m_members.begin(), m_members.end(),
                       [](const Member& member) { return member.option->count() > 0; });
}

Json SituationOptions::definition(const Json& base) const {
    Json definition = withoutState(m_file.empty() ? base : fileContent(m_file));
    for (const Member& member : m_members) {
        if (member.option->count() > 0 && member.value->empty()) {
            definition.erase(member.key);
        } else if (member.option->count() > 0) {
            definition[member.key] = *member.value;
        }
    }
    for (const auto& [key, option] :
         {std::pair("context", "--context"), std::pair("max_groups", "--max-groups")}) {
        if (const auto number = definition.find(key);
            number != definition.end() && number->is_string()) {
            definition[key] = numberOf(option, number->get<std::string>());
        }
    }
    if (m_labels == std::vector<std::string>{""}) {
        definition.erase("labels");
    } else if (!m_labels.empty()) {
        definition["labels"] = labelsOf(m_labels);
    }
    for (const auto& [key, values] :
         {std::pair("when", &m_when), std::pair("group_by", &m_groupBy)}) {
        if (*values == std::vector<std::string>{""}) {
            definition.erase(key);
        } else if (!values->empty()) {
            definition[key] = *values;
        }
    }
    return definition;
}

} // namespace zrm::host
