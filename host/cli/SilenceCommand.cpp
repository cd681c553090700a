#include "host/base/UrlText.h"
#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/JsonText.h"
#include "host/cli/SilenceCommands.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <cstdlib>
#include <utility>

#include <pwd.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

const std::string route = "/api/v1/silences";

/// What a silence matches, in one line.
std::string matchText(const Json& match) {
    std::string text;
    const auto add = [&text](const std::string& name, const std::string& pattern) {
        text += (text.empty() ? "" : " ") + name + '=' + pattern;
    };
    for (const auto& [key, value] : match.items()) {
        if (value.is_object()) {
            for (const auto& [name, pattern] : value.items()) {
                add("group." + name, JsonText::text(pattern));
            }
        } else if (value.is_string()) {
            add(key, JsonText::text(value));
        }
    }
    return text.empty() ? "every event" : text;
}

Table::Cell stateCell(const Json& silence) {
    const std::string state = JsonText::text(silence, "state");
    return {state, state == "active" ? Colour::NOTICE : Colour::NONE};
}

std::string factsOf(const Json& silence, const Terminal& terminal) {
    const Table::Cell state = stateCell(silence);
    const auto time = [&silence](const char* key) {
        return TimeDisplay::local(JsonText::text(silence, key));
    };
    FactList facts;
    facts.add("silence", JsonText::text(silence, "id"));
    facts.add("state", state.text, state.colour);
    facts.add("matches", matchText(JsonText::member(silence, "match")));
    facts.add("created", time("created"));
    facts.add("who", JsonText::text(silence, "who"));
    facts.add("why", JsonText::text(silence, "why"));
    facts.add("until", time("until"));
    facts.add("expired", time("expired"));
    facts.add("expired by", JsonText::text(silence, "expired_by"));
    facts.add("events", JsonText::text(silence, "events"));
    facts.add("last event", time("last"));
    return facts.text(terminal);
}

} // namespace

std::string operatorName() {
    if (const char* const name = std::getenv("SUDO_USER"); name != nullptr && *name != '\0') {
        return name;
    }
    const passwd* const entry = getpwuid(getuid());
    return entry == nullptr ? std::to_string(getuid()) : entry->pw_name;
}

SilenceCommand::SilenceCommand(CLI::App& program)
    : m_command(program.add_subcommand("silence", "Keep events from the sinks for a while")) {
    using This = SilenceCommand;
    m_command->require_subcommand(0, 1);
    declare("list", "The active silences (the default)", &This::list)
        ->add_flag("--expired", m_withExpired, "Also those that are over");
    declare("show", "One silence", &This::show)->add_option("ID", m_id, "Its id")->required();
    declareAdd();
    CLI::App* const expire = declare("expire", "End a silence now", &This::expire);
    expire->add_option("ID", m_id, "Its id")->required();
    expire->add_option("--who", m_who, "Your name (default: that of your account)")
        ->type_name("NAME");
}

CLI::App* SilenceCommand::declare(const char* name, const char* help, Action action) {
    CLI::App* const command = m_command->add_subcommand(name, help);
    m_choices.push_back({command, action});
    return command;
}

void SilenceCommand::declareAdd() {
    CLI::App* const command = declare("add", "Create a silence", &SilenceCommand::add);
    const auto add = [&](const char* name, std::string& value, const char* type, const char* help) {
        return command->add_option(name, value, help)->type_name(type);
    };
    add("--situation", m_situation, "PATTERN",
        "Events of this situation; * stands for any characters, ? for one");
    add("--log", m_log, "PATTERN", "Of this log; * does not stand for a slash");
    add("--severity", m_severity, "PATTERN", "Of this severity");
    add("--node", m_node, "PATTERN", "Of this agent");
    command
        ->add_option("--group", m_groups,
                     "Whose group has this value, for example ip=10.0.0.*; may be repeated")
        ->type_name("NAME=PATTERN")
        ->allow_extra_args(false);
    command->add_flag("--all", m_isAll, "Every event");
    CLI::Option* const length =
        add("--for", m_for, "TIME", "For this long, for example 90s, 2h, 1d");
    add("--until", m_until, "TIME", "Until this time")->excludes(length);
    add("--why", m_why, "TEXT", "The reason, for others to read")->required();
    add("--who", m_who, "NAME", "Your name (default: that of your account)");
}

bool SilenceCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus SilenceCommand::run(Context& context) {
    for (const Choice& choice : m_choices) {
        if (choice.command->parsed()) {
            return (this->*choice.action)(context);
        }
    }
    return list(context);
}

CliStatus SilenceCommand::list(Context& context) {
    AgentClient::Query query;
    if (!m_withExpired) {
        query.emplace("state", "active");
    }
    const Json answer = context.client().get(route, query);
    if (context.options().json) {
        context.printJson(answer);
        return CliStatus::DONE;
    }
    Table table({{"ID", Table::NUMBER},
                 {"STATE", Table::FIXED},
                 {"UNTIL", Table::FIXED},
                 {"EVENTS", Table::NUMBER},
                 {"WHO"},
                 {"MATCHES"},
                 {"WHY"}});
    for (const Json& silence : JsonText::member(answer, "silences")) {
        const char* const end = JsonText::text(silence, "expired").empty() ? "until" : "expired";
        table.add({JsonText::text(silence, "id"), stateCell(silence),
                   TimeDisplay::local(JsonText::text(silence, end)),
                   JsonText::text(silence, "events"), JsonText::text(silence, "who"),
                   matchText(JsonText::member(silence, "match")), JsonText::text(silence, "why")});
    }
    if (JsonText::text(answer, "kept") == "false") {
        Context::note("the history is off: silences end with the agent");
    }
    if (table.empty()) {
        Context::note(m_withExpired ? "there are no silences" : "no silence is active");
        return CliStatus::REFUSED;
    }
    context.print(table.text(context.terminal()));
    return CliStatus::DONE;
}

CliStatus SilenceCommand::show(Context& context) {
    const Json silence = context.client().get(route + '/' + UrlText::encode(m_id));
    if (context.options().json) {
        context.printJson(silence);
    } else {
        context.print(factsOf(silence, context.terminal()));
    }
    return CliStatus::DONE;
}

Json SilenceCommand::match() const {
    Json match = Json::object();
    for (const auto& [key, pattern] :
         {std::pair("situation", &m_situation), std::pair("log", &m_log),
          std::pair("severity", &m_severity), std::pair("node", &m_node)}) {
        if (!pattern->empty()) {
            match[key] = *pattern;
        }
    }
    for (const std::string& group : m_groups) {
        const std::size_t equals = group.find('=');
        if (equals == std::string::npos || equals == 0) {
            throw CliError(CliStatus::USAGE,
                           "--group: write NAME=PATTERN in place of '" + group + "'");
        }
        match["group"][group.substr(0, equals)] = group.substr(equals + 1);
    }
    if (match.empty() && !m_isAll) {
        throw CliError(
            CliStatus::USAGE,
            "name a situation, log, severity, node or group; --all silences every event");
    }
    if (m_isAll) {
        match["all"] = true;
    }
    return match;
}

std::string SilenceCommand::until() const {
    if (m_for.empty() == m_until.empty()) {
        throw CliError(CliStatus::USAGE, "say how long: --for 2h, or --until with a time");
    }
    return m_until.empty() ? m_for : Context::time("--until", m_until);
}

CliStatus SilenceCommand::add(Context& context) {
    Json body = Json::object();
    body["match"] = match();
    body["until"] = until();
    body["who"] = m_who.empty() ? operatorName() : m_who;
    body["why"] = m_why;
    const Json silence = context.client().send("POST", route, body);
    if (context.options().json) {
        context.printJson(silence);
    } else {
        context.print("silence " + JsonText::text(silence, "id") + " lasts until " +
                      TimeDisplay::local(JsonText::text(silence, "until")) + '\n');
    }
    return CliStatus::DONE;
}

CliStatus SilenceCommand::expire(Context& context) {
    Json body = Json::object();
    body["who"] = m_who.empty() ? operatorName() : m_who;
    const Json silence = context.client().send("DELETE", route + '/' + UrlText::encode(m_id), body);
    if (context.options().json) {
        context.printJson(silence);
    } else {
        context.print("silence " + JsonText::text(silence, "id") + " has expired; it held back " +
                      JsonText::text(silence, "events") + " events\n");
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
