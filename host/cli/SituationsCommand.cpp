#include "host/cli/Commands.h"

#include "host/base/UrlText.h"
#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

const std::string route = "/api/v1/situations";

Table::Cell stateCell(const Json& situation) {
    const std::string state = JsonText::text(situation, "state");
    if (state == "running") {
        return {state, Colour::GOOD};
    }
    return {state, state == "failed" ? Colour::BAD : Colour::NOTICE};
}

std::string count(const Json& situation, const char* key) {
    return JsonText::text(JsonText::member(situation, "counts"), key);
}

std::string factsOf(const Json& situation, const Terminal& terminal) {
    const Table::Cell state = stateCell(situation);
    FactList facts;
    facts.add("situation", JsonText::text(situation, "name"));
    facts.add("text", JsonText::text(situation, "text"));
    facts.add("state", state.text, state.colour);
    facts.add("problem", JsonText::text(situation, "problem"), Colour::BAD);
    facts.add("severity", JsonText::text(situation, "severity"));
    facts.add("source", JsonText::text(situation, "source"));
    const std::string log = JsonText::text(situation, "log");
    facts.add("log", log.empty() ? "every log" : log);
    for (const Json& condition : JsonText::member(situation, "when")) {
        facts.add("when", JsonText::text(condition));
    }
    const std::string frequency = JsonText::text(situation, "frequency");
    facts.add("frequency", frequency.empty()
                               ? ""
                               : frequency + " within " + JsonText::text(situation, "period"));
    for (const Json& name : JsonText::member(situation, "group_by")) {
        facts.add("group by", JsonText::text(name));
    }
    facts.add("distinct", JsonText::text(situation, "distinct"));
    facts.add("then", JsonText::text(situation, "then"));
    facts.add("resolve after", JsonText::text(situation, "resolve_after"));
    facts.add("cooldown", JsonText::text(situation, "cooldown"));
    facts.add("absent", JsonText::text(situation, "absent"));
    const std::string context = JsonText::text(situation, "context");
    facts.add("context", context == "0" ? "" : context);
    facts.add("runbook", JsonText::text(situation, "runbook"));
    const Json& labels = JsonText::member(situation, "labels");
    for (const auto& [name, value] : labels.items()) {
        facts.add("label", name + '=' + JsonText::text(value));
    }
    for (const char* const key : {"offered", "matched", "discarded", "raised"}) {
        facts.add(key, count(situation, key));
    }
    facts.add("last raised", TimeDisplay::local(JsonText::text(situation, "last_raised")));
    return facts.text(terminal);
}

} // namespace

SituationsCommand::SituationsCommand(CLI::App& program)
    : m_command(program.add_subcommand("situations", "List, create, change and stop situations")) {
    using This = SituationsCommand;
    m_command->require_subcommand(0, 1);
    declare("list", "All situations (the default)", &This::list);
    declareNamed("show", "One situation", &This::show);
    m_options.addTo(*declareNamed("add", "Create a situation", &This::add));
    m_options.addTo(
        *declareNamed("set", "Change what the options name in a situation", &This::set));
    declareNamed("remove", "Remove a situation", &This::remove);
    declareNamed("start", "Start a stopped situation", &This::start);
    declareNamed("stop", "Stop a situation", &This::stop);
    m_options.addTo(
        *declareNamed("validate", "Check a definition without creating it", &This::validate));
}

CLI::App* SituationsCommand::declare(const char* name, const char* help, Action action) {
    CLI::App* const command = m_command->add_subcommand(name, help);
    m_choices.push_back({command, action});
    return command;
}

CLI::App* SituationsCommand::declareNamed(const char* name, const char* help, Action action) {
    CLI::App* const command = declare(name, help, action);
    command->add_option("NAME", m_name, "The situation's name")->required();
    return command;
}

bool SituationsCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus SituationsCommand::run(Context& context) {
    for (const Choice& choice : m_choices) {
        if (choice.command->parsed()) {
            return (this->*choice.action)(context);
        }
    }
    return list(context);
}

std::string SituationsCommand::path(const char* below) const {
    return route + '/' + UrlText::encode(m_name) + below;
}

CliStatus SituationsCommand::done(Context& context, const Json& answer, const char* what) const {
    if (context.options().json) {
        context.printJson(answer);
    } else {
        context.print(DisplayText::visible(m_name) + ' ' + what + '\n');
    }
    return CliStatus::DONE;
}

CliStatus SituationsCommand::list(Context& context) {
    const Json answer = context.client().get(route);
    if (context.options().json) {
        context.printJson(answer);
        return CliStatus::DONE;
    }
    Table table({{"SITUATION"},
                 {"STATE", Table::FIXED},
                 {"SEVERITY", Table::FIXED},
                 {"LOG", Table::PATH},
                 {"MATCHED", Table::NUMBER},
                 {"RAISED", Table::NUMBER},
                 {"LAST RAISED", Table::FIXED}});
    for (const Json& situation : JsonText::member(answer, "situations")) {
        table.add({JsonText::text(situation, "name"), stateCell(situation),
                   JsonText::text(situation, "severity"), JsonText::text(situation, "log"),
                   count(situation, "matched"), count(situation, "raised"),
                   TimeDisplay::local(JsonText::text(situation, "last_raised"))});
    }
    if (table.empty()) {
        Context::note("there are no situations");
        return CliStatus::REFUSED;
    }
    context.print(table.text(context.terminal()));
    return CliStatus::DONE;
}

CliStatus SituationsCommand::show(Context& context) {
    const Json situation = context.client().get(path());
    if (context.options().json) {
        context.printJson(situation);
    } else {
        context.print(factsOf(situation, context.terminal()));
    }
    return CliStatus::DONE;
}

CliStatus SituationsCommand::add(Context& context) {
    Json body = m_options.definition(Json::object());
    body.erase("version"); // of the situation that a file was made from
    body["name"] = m_name;
    return done(context, context.client().send("POST", route, body), "added");
}

CliStatus SituationsCommand::set(Context& context) {
    if (!m_options.areGiven()) {
        throw CliError(CliStatus::USAGE,
                       "nothing to change: give --file, or options for what is to change");
    }
    Json body = m_options.definition(context.client().get(path()));
    body["name"] = m_name;
    return done(context, context.client().send("PUT", path(), body), "changed");
}

CliStatus SituationsCommand::remove(Context& context) {
    return done(context, context.client().send("DELETE", path(), nullptr), "removed");
}

CliStatus SituationsCommand::start(Context& context) {
    return done(context, context.client().send("POST", path("/start"), nullptr), "started");
}

CliStatus SituationsCommand::stop(Context& context) {
    return done(context, context.client().send("POST", path("/stop"), nullptr), "stopped");
}

CliStatus SituationsCommand::validate(Context& context) {
    Json body = m_options.definition(Json::object());
    body.erase("version");
    body["name"] = m_name;
    const Json answer = context.client().send("POST", route + "/validate", body);
    const Json& problems = JsonText::member(answer, "problems");
    if (context.options().json) {
        context.printJson(answer);
    } else if (problems.empty()) {
        context.print(DisplayText::visible(m_name) + " is valid\n");
    }
    if (!context.options().json) {
        for (const Json& problem : problems) {
            Context::note(JsonText::text(problem, "field") + ": " +
                          JsonText::text(problem, "detail"));
        }
    }
    return problems.empty() ? CliStatus::DONE : CliStatus::REFUSED;
}

} // namespace zrm::host
