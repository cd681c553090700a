#include "host/cli/Commands.h"

#include "host/base/JsonWriter.h"
#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/InputFile.h"
#include "host/config/ConfigFile.h"
#include "host/config/OwnFiles.h"
#include "host/config/SituationWarnings.h"
#include "host/diagnose/ConfigCheck.h"
#include "host/sources/JournalFiles.h"
#include "host/sources/LogFinder.h"

#include <algorithm>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>
#include <unistd.h>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

constexpr std::size_t numberColumns = 5;
constexpr std::size_t verdictColumns = 8;
constexpr std::size_t indent = numberColumns + 2 + verdictColumns + 2;

/// A relevant line with its number, verdict and reason.
std::string textOf(const ConfigCheck::Line& line, const Terminal& terminal) {
    const bool isRefused = line.verdict == ConfigCheck::Verdict::REFUSED;
    const std::string number = std::to_string(line.number);
    const std::string verdict = ConfigCheck::name(line.verdict);
    const std::string blanks(numberColumns - std::min(numberColumns, number.size()), ' ');
    const std::string shown = DisplayText::visible(line.text);
    const std::size_t room = terminal.width > indent ? terminal.width - indent : 1;
    std::string text =
        blanks + number + "  " +
        terminal.coloured(verdict, isRefused ? Colour::BAD : Colour::GOOD) +
        std::string(verdictColumns - verdict.size() + 2, ' ') +
        (terminal.width > 0 ? DisplayText::shortened(shown, room, terminal.ellipsis()) : shown) +
        '\n';
    std::string reason = DisplayText::visible(line.reason);
    reason.erase(reason.find_last_not_of(' ') + 1);
    if (!reason.empty()) {
        text += std::string(indent, ' ') +
                terminal.coloured(reason, isRefused ? Colour::BAD : Colour::NOTICE) + '\n';
    }
    return text;
}

/// What should be known about a configuration that can be used. An agent that runs does not load
/// one that looks as if it were still being written; a start loads it.
std::vector<std::string> notesOn(const HostConfig& config, const std::string& content,
                                 const std::string& path) {
    std::vector<std::string> notes;
    if (content.find_first_not_of(" \t\r\n") == std::string::npos) {
        notes.push_back(path + " is empty: a running agent does not load it");
    } else if (content.back() != '\n') {
        notes.push_back(path + " has no newline after its last line: a running agent does not load "
                               "it; add the newline");
    }
    for (const std::optional<std::string>& warning :
         {warningOfSecrets(config, path), warningOfDebug(config, path)}) {
        if (warning) {
            notes.push_back(*warning);
        }
    }
    for (std::string& warning : warningsOfSituations(config, path)) {
        notes.push_back(std::move(warning));
    }
    return notes;
}

/// The logs that the agent would monitor by the lines of its log configuration.
std::set<std::string> configuredLogs(const HostConfig& config) {
    std::set<std::string> logs;
    const auto setting =
        std::find_if(config.environment.begin(), config.environment.end(),
                     [](const auto& one) { return one.variable == "ZRM_CONFIG_FILE"; });
    if (setting == config.environment.end() || !ConfigCheck::checkFile(setting->value)) {
        return logs;
    }
    for (const ConfigCheck::Line& line :
         ConfigCheck::check(InputFile(setting->value).text()).lines) {
        if (line.verdict == ConfigCheck::Verdict::ACCEPTED) {
            logs.insert(line.log);
        }
    }
    return logs;
}

/// What the [[log]] tables match on this machine now.
std::vector<FoundLogs::Source> find(const HostConfig& config) {
    return LogFinder()
        .look(config.logs, ownFilesOf(config), LogFinder::Clock::now())
        .sourcesBeside(configuredLogs(config));
}

Json tablesJson(const std::vector<FoundLogs::Source>& tables) {
    return Json::parse(JsonWriter::text([&](JsonWriter& json) {
        json.beginArray();
        for (const FoundLogs::Source& table : tables) {
            table.write(json);
        }
        json.endArray();
    }));
}

/// What a table of type "journal" finds, or the command of another table without files.
std::string textOf(const LogConfig& log, const Terminal& terminal) {
    const std::string name = "  " + DisplayText::visible(log.name);
    if (!log.journal) {
        return name + "  runs " + DisplayText::visible(log.command->arguments.front()) + '\n';
    }
    const JournalFiles found = JournalFiles::look(log.journal->directory);
    if (!found.isReadable()) {
        return name + "  " + terminal.coloured(DisplayText::visible(found.problem()), Colour::BAD) +
               '\n';
    }
    constexpr std::int64_t megabyte = 1024 * 1024;
    std::int64_t bytes = 0;
    std::size_t readable = 0;
    std::string unreadable;
    for (const JournalFiles::File& file : found.files) {
        bytes += file.problem.empty() ? file.size : 0;
        readable += file.problem.empty() ? 1 : 0;
        if (!file.problem.empty()) {
            unreadable += "  " + terminal.coloured("cannot be read", Colour::BAD) + "  " +
                          DisplayText::visible(file.path + ": " + file.problem) + '\n';
        }
    }
    return name + "  " + std::to_string(readable) + " of " + std::to_string(found.files.size()) +
           " files can be read, " + std::to_string(bytes / megabyte) + " MiB\n" + unreadable;
}

/// A table of the configuration: its files and what is passed over.
std::string textOf(const FoundLogs::Source& source, const Terminal& terminal) {
    std::string text = "[[log]] at line " + std::to_string(source.line) + ": " +
                       std::to_string(source.files.size()) +
                       (source.files.size() == 1 ? " file\n" : " files\n");
    for (const std::string& file : source.files) {
        const bool isThere = ::access(file.c_str(), F_OK) == 0;
        text += "  " + DisplayText::visible(file) +
                (isThere ? "" : terminal.coloured("  (does not exist yet)", Colour::NOTICE)) + '\n';
    }
    for (const FoundLogs::PassedOver& one : source.passedOver) {
        text += "  " + terminal.coloured("passed over", Colour::NOTICE) + "  " +
                DisplayText::visible(one.file) + ": " + DisplayText::visible(one.reason) + ".\n";
    }
    if (source.passedOverCount > source.passedOver.size()) {
        text += "  and " + std::to_string(source.passedOverCount - source.passedOver.size()) +
                " more are passed over\n";
    }
    if (!source.problem.empty()) {
        text += "  " + terminal.coloured(DisplayText::visible(source.problem) + '.', Colour::BAD) +
                '\n';
    }
    return text;
}

} // namespace

CheckCommand::CheckCommand(CLI::App& program)
    : m_command(program.add_subcommand("check", "Check a configuration; needs no agent")) {
    m_command->add_option("CONFIG", m_config,
                          "A log configuration, checked line by line; - is standard input");
    m_command
        ->add_option("--host", m_host, "Check the agent's own configuration instead, a zrm.toml")
        ->type_name("FILE");
}

bool CheckCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus CheckCommand::run(Context& context) {
    if (m_config.empty() == m_host.empty()) {
        throw CliError(CliStatus::USAGE, "check: name either a log configuration or --host FILE");
    }
    return m_config.empty() ? checkHost(context) : checkLogs(context);
}

CliStatus CheckCommand::checkLogs(Context& context) const {
    const ConfigCheck::Result result = ConfigCheck::check(InputFile(m_config).text());
    const CliStatus status = result.refused == 0 ? CliStatus::DONE : CliStatus::REFUSED;
    if (context.options().json) {
        context.printJson(Json::parse(ConfigCheck::json(result)));
        return status;
    }
    std::string text;
    for (const ConfigCheck::Line& line : result.lines) {
        if (line.verdict != ConfigCheck::Verdict::IGNORED) {
            text += textOf(line, context.terminal());
        }
    }
    context.print(text + std::to_string(result.accepted) + " accepted, " +
                  std::to_string(result.refused) + " refused\n");
    if (result.accepted == 0) {
        Context::note("without an accepted line the agent monitors the files of the syslog "
                      "configuration instead");
    }
    return status;
}

CliStatus CheckCommand::checkHost(Context& context) const {
    const std::string content = InputFile(m_host).text();
    const ConfigFile::Result result = ConfigFile::parse(content, m_host);
    const std::vector<std::string> problems = result ? std::vector<std::string>() : result.error();
    const std::vector<std::string> notes =
        result ? notesOn(*result, content, m_host) : std::vector<std::string>();
    if (context.options().json) {
        Json answer{{"accepted", problems.empty()}, {"problems", problems}, {"notes", notes}};
        if (result && !result->logs.empty()) {
            answer["logs"] = tablesJson(find(*result));
        }
        context.printJson(answer);
        return problems.empty() ? CliStatus::DONE : CliStatus::REFUSED;
    }
    if (problems.empty()) {
        std::string text = DisplayText::visible(m_host) + " can be used\n";
        const std::vector<FoundLogs::Source> sources = find(*result);
        for (std::size_t index = 0; index < sources.size(); ++index) {
            const LogConfig& log = result->logs[index];
            if (log.isSource()) {
                text += "[[log]] at line " + std::to_string(log.line) + ": " + log.type + '\n' +
                        textOf(log, context.terminal());
            } else {
                text += textOf(sources[index], context.terminal());
            }
        }
        context.print(text);
    }
    for (const std::string& text : problems.empty() ? notes : problems) {
        Context::note(text);
    }
    return problems.empty() ? CliStatus::DONE : CliStatus::REFUSED;
}

} // namespace zrm::host
