#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

std::string headOf(const Json& explanation) {
    const std::string event = JsonText::text(explanation, "event");
    if (!event.empty()) {
        return "event " + event;
    }
    const std::string line = JsonText::text(explanation, "line");
    const Json& row = JsonText::member(explanation, "row");
    return line.empty() ? JsonText::text(row, "ENTRYSRC") + ": " + JsonText::text(row, "ENTRYDESC")
                        : line;
}

std::string textOf(const Json& explanation, const Terminal& terminal) {
    const auto shown = [](const std::string& text) { return DisplayText::visible(text); };
    std::string text = terminal.coloured(shown(headOf(explanation)), Colour::HEADING) + '\n';
    if (const std::string reason = JsonText::text(explanation, "reason"); !reason.empty()) {
        text += "  " + terminal.coloured(shown(reason), Colour::BAD) + '\n';
    }
    for (const Json& condition : JsonText::member(explanation, "conditions")) {
        const bool holds = JsonText::text(condition, "holds") == "true";
        text += "  " +
                terminal.coloured(holds ? "yes" : "no ", holds ? Colour::GOOD : Colour::BAD) +
                "  " + shown(JsonText::text(condition, "condition"));
        text += holds ? "\n" : "; it is '" + shown(JsonText::text(condition, "value")) + "'\n";
    }
    const Json& window = JsonText::member(explanation, "window");
    if (!window.is_null()) {
        const std::string count = shown(JsonText::text(window, "count"));
        text += "  frequency " + shown(JsonText::text(window, "frequency")) + " within " +
                shown(JsonText::text(window, "period")) +
                (count.empty() ? "" : ": " + count + " so far") + '\n';
    }
    const bool isRaised = JsonText::text(explanation, "raised") == "true";
    return text + "  " +
           terminal.coloured(shown(JsonText::text(explanation, "decision")),
                             isRaised ? Colour::GOOD : Colour::NOTICE) +
           '\n';
}

} // namespace

ExplainCommand::ExplainCommand(CLI::App& program)
    : m_command(
          program.add_subcommand("explain", "Why entries raise a situation, or why they do not")) {
    m_command->add_option("SITUATION", m_situation, "The situation's name");
    m_command->add_option("--file", m_file, "A definition as JSON instead of a situation")
        ->type_name("FILE");
    m_command->add_option("--line", m_line, "A line as written in the log")->type_name("TEXT");
    m_command->add_option("--log", m_log, "The full path of a log (default: the situation's)")
        ->type_name("LOG");
    m_command->add_option("--event", m_event, "An event of the history")->type_name("ID");
    m_command->add_option("--last", m_last, "The last entries of the log (default 5)")
        ->type_name("COUNT")
        ->check(CLI::Range(1, 1000));
    m_command->add_option("--to", m_to, "The last entries of this time and before")
        ->type_name("TIME");
}

bool ExplainCommand::isChosen() const {
    return m_command->parsed();
}

Json ExplainCommand::request() const {
    constexpr unsigned usualLast = 5;
    Json body = SituationOptions::subject(m_situation, m_file);
    const bool isEvent = m_event > 0;
    const int ways = (isEvent ? 1 : 0) + (m_line.empty() ? 0 : 1) + (m_last > 0 ? 1 : 0);
    if (ways > 1 || (isEvent && !m_log.empty())) {
        throw CliError(CliStatus::USAGE,
                       "explain one thing: --event ID, or --line TEXT or --last COUNT "
                       "of a log");
    }
    if (!m_to.empty() && (isEvent || !m_line.empty())) {
        throw CliError(CliStatus::USAGE, "--to is for the last entries of a log");
    }
    if (isEvent) {
        body["event"] = m_event;
        return body;
    }
    if (!m_log.empty()) {
        body["log"] = m_log;
    }
    if (m_line.empty()) {
        body["last"] = m_last > 0 ? m_last : usualLast;
        if (!m_to.empty()) {
            body["to"] = Context::time("--to", m_to);
        }
    } else {
        body["line"] = m_line;
    }
    return body;
}

CliStatus ExplainCommand::run(Context& context) {
    const Json answer = context.client().send("POST", "/api/v1/explain", request());
    const Json& explanations = JsonText::member(answer, "explanations");
    if (context.options().json) {
        context.printJson(answer);
    } else {
        std::string text;
        for (const Json& explanation : explanations) {
            text += (text.empty() ? "" : "\n") + textOf(explanation, context.terminal());
        }
        context.print(text);
        Context::noteReach(answer);
        for (const Json& warning : JsonText::member(answer, "warnings")) {
            Context::note("this log: " + JsonText::text(warning, "text"));
        }
    }
    if (explanations.empty()) {
        Context::note("there is no entry to explain");
        return CliStatus::REFUSED;
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
