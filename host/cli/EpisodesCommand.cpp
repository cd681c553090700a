#include "host/cli/EpisodesCommand.h"

#include "host/base/UrlText.h"
#include "host/cli/Context.h"
#include "host/cli/EventLines.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <map>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

constexpr const char* route = "/api/v1/episodes";

std::string groupOf(const Json& episode) {
    std::string text;
    for (const auto& [name, value] : JsonText::member(episode, "group").items()) {
        text += (text.empty() ? "" : " ") + name + '=' + JsonText::text(value);
    }
    return text;
}

} // namespace

EpisodesCommand::EpisodesCommand(CLI::App& program)
    : m_command(program.add_subcommand(
          "episodes", "How long situations lasted, and which last now; those with resolve_after")),
      m_show(nullptr) {
    m_command->require_subcommand(0, 1);
    addFilters(*m_command);
    addFilters(*m_command->add_subcommand("list", "The latest episodes (the default)"));
    m_show = m_command->add_subcommand("show", "One episode with its events");
    m_show->add_option("ID", m_id, "The episode's id, that of the event that raised it")
        ->required();
}

void EpisodesCommand::addFilters(CLI::App& command) {
    const auto anyOf = [&](const char* name, std::vector<std::string>& values, const char* type,
                           const char* help) {
        command.add_option(name, values, help)->type_name(type)->allow_extra_args(false);
    };
    command.add_option("--state", m_state, "open or resolved")->type_name("STATE");
    command.add_flag("--unacknowledged", m_isUnacknowledged, "That nobody has acknowledged");
    anyOf("--situation", m_situations, "NAME", "Of this situation; may be repeated");
    anyOf("--log", m_logs, "LOG", "With entries of this log; may be repeated");
    anyOf("--group", m_groups, "NAME=VALUE", "Whose group has this value; may be repeated");
    command.add_option("--limit", m_limit, "The number of latest episodes (default 100)")
        ->type_name("COUNT")
        ->check(CLI::Range(1, 1000));
}

bool EpisodesCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus EpisodesCommand::run(Context& context) {
    return m_show->parsed() ? show(context) : list(context);
}

CliStatus EpisodesCommand::list(Context& context) {
    std::multimap<std::string, std::string> query;
    for (const auto& [name, values] : {std::pair("situation", &m_situations),
                                       std::pair("log", &m_logs), std::pair("group", &m_groups)}) {
        for (const std::string& value : *values) {
            query.emplace(name, value);
        }
    }
    if (!m_state.empty()) {
        query.emplace("state", m_state);
    }
    if (m_isUnacknowledged) {
        query.emplace("acknowledged", "false");
    }
    if (m_limit > 0) {
        query.emplace("limit", std::to_string(m_limit));
    }
    const Json answer = context.client().get(route, query);
    if (context.options().json) {
        context.printJson(answer);
        return CliStatus::DONE;
    }
    Table table({{"ID", Table::NUMBER},
                 {"STATE", Table::FIXED},
                 {"SEVERITY", Table::FIXED},
                 {"SITUATION"},
                 {"FIRST", Table::FIXED},
                 {"LAST", Table::FIXED},
                 {"COUNT", Table::NUMBER},
                 {"WHO"},
                 {"GROUP"}});
    const Json& episodes = JsonText::member(answer, "episodes");
    for (auto episode = episodes.rbegin(); episode != episodes.rend(); ++episode) {
        table.add({JsonText::text(*episode, "id"), EventLines::stateOf(*episode),
                   JsonText::text(*episode, "severity"), JsonText::text(*episode, "situation"),
                   TimeDisplay::local(JsonText::text(*episode, "first")),
                   TimeDisplay::local(JsonText::text(*episode, "last")),
                   JsonText::text(*episode, "count"),
                   JsonText::text(JsonText::member(*episode, "acknowledged"), "who"),
                   groupOf(*episode)});
    }
    if (table.empty()) {
        Context::note("no such episode");
        return CliStatus::REFUSED;
    }
    context.print(table.text(context.terminal()));
    return CliStatus::DONE;
}

CliStatus EpisodesCommand::show(Context& context) {
    const Json episode = context.client().get(std::string(route) + '/' + UrlText::encode(m_id));
    if (context.options().json) {
        context.printJson(episode);
        return CliStatus::DONE;
    }
    FactList facts;
    facts.add("situation", JsonText::text(episode, "situation"));
    facts.add("state", JsonText::text(episode, "state"),
              JsonText::text(episode, "state") == "open" ? Colour::BAD : Colour::NONE);
    if (const Json& by = JsonText::member(episode, "acknowledged"); by.is_object()) {
        facts.add("acknowledged", "by " + JsonText::text(by, "who") + ", " +
                                      TimeDisplay::local(JsonText::text(by, "time")));
        facts.add("note", JsonText::text(by, "note"));
    }
    facts.add("reason", JsonText::text(episode, "reason"));
    facts.add("severity", JsonText::text(episode, "severity"));
    for (const auto& [name, value] : JsonText::member(episode, "group").items()) {
        facts.add("group", name + '=' + JsonText::text(value));
    }
    facts.add("entries", JsonText::text(episode, "count"));
    for (const char* const key : {"first", "last", "raised", "resolved"}) {
        facts.add(key, TimeDisplay::local(JsonText::text(episode, key)));
    }
    for (const Json& log : JsonText::member(episode, "logs")) {
        facts.add("log", JsonText::text(log, "log") + ", " + JsonText::text(log, "count") +
                             (JsonText::number(log, "count") == 1 ? " entry" : " entries"));
    }
    for (const Json& event : JsonText::member(episode, "events")) {
        facts.add("event", JsonText::text(event, "id") + ", " + JsonText::text(event, "state"));
    }
    context.print(facts.text(context.terminal()));
    return CliStatus::DONE;
}

} // namespace zrm::host
