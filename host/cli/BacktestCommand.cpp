#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/SituationOptions.h"
#include "host/cli/TimeDisplay.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

std::string groupOf(const JsonText::Json& episode) {
    std::string text;
    const JsonText::Json& group = JsonText::member(episode, "group");
    for (const auto& [name, value] : group.items()) {
        text += (text.empty() ? "" : ", ") + name + '=' + JsonText::text(value);
    }
    return DisplayText::visible(text);
}

std::string episodesOf(const JsonText::Json& answer) {
    const JsonText::Json& episodes = JsonText::member(answer, "episodes");
    if (!episodes.is_array() || episodes.empty()) {
        return "";
    }
    std::string text = "episodes: " + JsonText::text(answer, "episode_count") + '\n';
    for (const JsonText::Json& episode : episodes) {
        const std::string group = groupOf(episode);
        text += "  " + TimeDisplay::local(JsonText::text(episode, "first")) + " to " +
                TimeDisplay::local(JsonText::text(episode, "last")) + "  " +
                JsonText::text(episode, "count") + " entries" +
                (JsonText::text(episode, "over") == "true" ? "" : ", lasting") +
                (group.empty() ? "" : "  " + group) + '\n';
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
    for (const JsonText::Json& time : JsonText::member(answer, "raised_at")) {
        text += "  " + DisplayText::visible(TimeDisplay::stamp(JsonText::text(time))) + '\n';
    }
    text += episodesOf(answer);
    context.print(text);
    Context::noteReach(answer);
    if (JsonText::text(answer, "truncated") == "true") {
        Context::note("start later or end earlier to read less");
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
