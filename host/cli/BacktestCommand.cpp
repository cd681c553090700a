#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/SituationOptions.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

std::string groupOf(const JsonText::Json& episode) {
    std::string text;
    const JsonText::Json& group = JsonText::member(episode, "group");
    for (const auto& [name, value] : group.items()) {
        text += (text.empty() ? "" : " ") + name + '=' + JsonText::text(value);
    }
    return text;
}

std::string tableOf(const JsonText::Json& episodes, const Terminal& terminal) {
    Table table({{"STATE", Table::FIXED},
                 {"FIRST", Table::FIXED},
                 {"LAST", Table::FIXED},
                 {"COUNT", Table::NUMBER},
                 {"GROUP"}});
    for (const JsonText::Json& episode : episodes) {
        const bool isOver = JsonText::text(episode, "over") == "true";
        table.add({{isOver ? "resolved" : "open", isOver ? Colour::NONE : Colour::BAD},
                   TimeDisplay::local(JsonText::text(episode, "first")),
                   TimeDisplay::local(JsonText::text(episode, "last")),
                   JsonText::text(episode, "count"),
                   groupOf(episode)});
    }
    return table.text(terminal);
}

std::string timesOf(const JsonText::Json& raised) {
    std::string text;
    for (const JsonText::Json& time : raised) {
        text += "  " + DisplayText::visible(TimeDisplay::stamp(JsonText::text(time))) + '\n';
    }
    return text;
}

} // namespace

BacktestCommand::BacktestCommand(CLI::App& program)
    : m_command(program.add_subcommand("backtest",
                                       "Run a situation over what its log already contains")) {
    m_command->add_option("SITUATION", m_situation, "The situation's name");
    m_command->add_option("--file", m_file, "A definition as JSON instead of a situation")
        ->type_name("FILE");
    m_command->add_option("--from", m_from, "First time (default -24h)")->type_name("TIME");
    m_command->add_option("--to", m_to, "Last time (default now)")->type_name("TIME");
}

bool BacktestCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus BacktestCommand::run(Context& context) {
    JsonText::Json body = SituationOptions::subject(m_situation, m_file);
    body["from"] = Context::time("--from", m_from);
    body["to"] = Context::time("--to", m_to);
    const JsonText::Json answer = context.client().send("POST", "/api/v1/backtest", body);
    if (context.options().json) {
        context.printJson(answer);
        return CliStatus::DONE;
    }
    std::string text = DisplayText::visible(JsonText::text(answer, "decision")) + '\n';
    const JsonText::Json& episodes = JsonText::member(answer, "episodes");
    text += episodes.empty() ? timesOf(JsonText::member(answer, "raised_at"))
                             : tableOf(episodes, context.terminal());
    context.print(text);
    Context::noteReach(answer);
    if (JsonText::text(answer, "truncated") == "true") {
        Context::note("start later or end earlier to read less");
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
