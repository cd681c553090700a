#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

std::string historyText(const Json& history) {
    if (std::string problem = JsonText::text(history, "problem"); !problem.empty()) {
        return problem;
    }
    if (JsonText::text(history, "enabled") != "true") {
        return "off";
    }
    const std::uint64_t events = JsonText::number(history, "events");
    return std::to_string(events) + " events" +
           (events > 0 ? ", " + JsonText::text(history, "oldest") + " to " +
                             JsonText::text(history, "newest")
                       : "") +
           ", " + TimeDisplay::bytes(JsonText::number(history, "bytes"));
}

std::string queueText(const Json& queue) {
    const double seconds = JsonText::member(queue, "waited_seconds").is_number()
                               ? JsonText::member(queue, "waited_seconds").get<double>()
                               : 0;
    return JsonText::text(queue, "size") + " of " + JsonText::text(queue, "capacity") +
           (JsonText::number(queue, "waits") > 0
                ? ", logs waited " + JsonText::text(queue, "waits") + " times, " +
                      TimeDisplay::duration(static_cast<std::uint64_t>(seconds))
                : "");
}

/// Whether the history or a sink is failing; says which on standard error.
bool isSomethingWrong(const Json& status) {
    bool isWrong = false;
    const std::string problem = JsonText::text(JsonText::member(status, "history"), "problem");
    if (!problem.empty()) {
        Context::note("the history does not work: " + problem);
        isWrong = true;
    }
    for (const Json& sink : JsonText::member(status, "sinks")) {
        if (JsonText::text(sink, "state") == "failing") {
            Context::note("the sink " + JsonText::text(sink, "name") +
                          " fails: " + JsonText::text(sink, "error"));
            isWrong = true;
        }
    }
    return isWrong;
}

Colour colourOf(const std::string& state) {
    if (state == "up") {
        return Colour::GOOD;
    }
    return state == "failing" ? Colour::BAD : Colour::NOTICE;
}

} // namespace

StatusCommand::StatusCommand(CLI::App& program)
    : m_command(program.add_subcommand("status", "The state of the agent itself")) {
    m_command->add_flag("--check", m_check,
                        "Exit with status 1 when the history or a sink does not work");
}

bool StatusCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus StatusCommand::run(Context& context) {
    const Json status = context.client().get("/api/v1/status");
    const CliStatus outcome =
        m_check && isSomethingWrong(status) ? CliStatus::REFUSED : CliStatus::DONE;
    if (context.options().json) {
        context.printJson(status);
        return outcome;
    }
    const Json& history = JsonText::member(status, "history");
    FactList facts;
    facts.add("agent", "zrmagent " + JsonText::text(status, "version") + " on " +
                           JsonText::text(status, "node"));
    const std::string started = JsonText::text(status, "started");
    facts.add("up", TimeDisplay::between(started, JsonText::text(status, "time")) + ", since " +
                        TimeDisplay::local(started));
    facts.add("history", historyText(history),
              JsonText::text(history, "problem").empty() ? Colour::NONE : Colour::BAD);
    facts.add("queue", queueText(JsonText::member(status, "queue")));
    facts.add("trace", JsonText::text(status, "trace"));
    context.print(facts.text(context.terminal()));
    Table sinks({{"SINK"},
                 {"TYPE", Table::FIXED},
                 {"STATE", Table::FIXED},
                 {"LAG", Table::NUMBER},
                 {"DELIVERED", Table::NUMBER},
                 {"ERROR"}});
    for (const Json& sink : JsonText::member(status, "sinks")) {
        const std::string state = JsonText::text(sink, "state");
        sinks.add({JsonText::text(sink, "name"),
                   JsonText::text(sink, "type"),
                   {state, colourOf(state)},
                   JsonText::text(sink, "lag"),
                   JsonText::text(sink, "delivered"),
                   JsonText::text(sink, "error")});
    }
    if (!sinks.empty()) {
        context.print('\n' + sinks.text(context.terminal()));
    }
    for (const Json& warning : JsonText::member(status, "warnings")) {
        Context::note(JsonText::text(warning, "log") + ": " + JsonText::text(warning, "text"));
    }
    return outcome;
}

} // namespace zrm::host
