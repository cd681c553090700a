#include "host/config/SituationWarnings.h"

#include "host/config/HostConfig.h"
#include "host/config/PathPattern.h"
#include "host/config/TextTemplate.h"

#include <algorithm>
#include <fstream>
#include <string_view>

namespace zrm::host {

namespace {

bool hasFields(const LogConfig& log) {
    const bool isLines = log.command && !log.follow.format;
    return !isLines && std::string_view("UAE").find(log.letter) == std::string_view::npos;
}

/// Whether the table has the name, or names the file or matches it, and does not exclude it.
bool isOf(const LogConfig& log, const std::string& file) {
    if (log.isSource()) {
        return log.name == file;
    }
    return std::any_of(log.paths.begin(), log.paths.end(),
                       [&file](const std::string& path) {
                           return path == file || PathPattern::matches(path, file);
                       }) &&
           std::none_of(log.excludes.begin(), log.excludes.end(),
                        [&file](const std::string& pattern) {
                            return PathPattern::excludes(pattern, file);
                        });
}

/// Why no entry that the situation judges has fields; empty if some may.
std::string reason(const HostConfig& config, const SituationConfig& situation) {
    if (!situation.log) {
        return std::any_of(config.logs.begin(), config.logs.end(), hasFields)
                   ? ""
                   : "no [[log]] table has a type whose entries have fields";
    }
    const auto table =
        std::find_if(config.logs.begin(), config.logs.end(),
                     [&](const LogConfig& log) { return isOf(log, *situation.log); });
    if (table == config.logs.end()) {
        return "no [[log]] table names " + *situation.log +
               ", and entries of other logs have no fields";
    }
    return hasFields(*table) ? ""
                             : "entries of type \"" + table->type + "\", as the [[log]] at line " +
                                   std::to_string(table->line) + " has them, have no fields";
}

/// Why the situation may not do what its author meant, as far as its fields go; empty: it does.
std::string fieldWarning(const HostConfig& config, const SituationConfig& situation) {
    const auto condition = std::find_if(situation.conditions.begin(), situation.conditions.end(),
                                        [](const Condition& one) { return one.isOnField(); });
    const std::string why =
        condition == situation.conditions.end() ? "" : reason(config, situation);
    return why.empty() ? "" : condition->column + " is in no entry: " + why;
}

std::string textWarning(const SituationConfig& situation) {
    const auto text = TextTemplate::parse(situation.text, situation.conditions);
    return !text || text->ignored().what.empty() ? ""
                                                 : "the text is kept as it is written, since it "
                                                   "names nothing that its events have: " +
                                                       text->ignored().text();
}

bool isMonitored(const HostConfig& config, const std::string& log) {
    return std::any_of(config.logs.begin(), config.logs.end(), [&](const LogConfig& table) {
        return isOf(table, log) ||
               (!table.name.empty() && (log == table.name || log == table.type));
    });
}

/// The log configuration; empty: none.
std::string logConfigOf(const HostConfig& config) {
    const auto found = std::find_if(
        config.environment.begin(), config.environment.end(),
        [](const EnvironmentSetting& one) { return one.variable == "ZRM_CONFIG_FILE"; });
    return found == config.environment.end() ? "" : found->value;
}

/// Whether a line of the log configuration is, or may be, about one of these logs. Without lines
/// the agent takes the logs of the system's syslog.
bool mayName(const std::string& logConfig, const std::vector<std::string>& logs) {
    std::ifstream lines(logConfig);
    bool hasLines = false;
    for (std::string line; std::getline(lines, line);) {
        const std::string_view text =
            std::string_view(line).substr(std::min(line.find_first_not_of(" \t"), line.size()));
        hasLines = hasLines || (!text.empty() && text.front() != '#');
        const auto isAbout = [text](const std::string& log) {
            return text.starts_with(log) && (text.size() == log.size() || text[log.size()] == ';' ||
                                             text[log.size()] == ' ' || text[log.size()] == '\t');
        };
        if (std::any_of(logs.begin(), logs.end(), isAbout)) {
            return true;
        }
    }
    return !hasLines;
}

/// A rule whose log nobody monitors is never raised.
std::string ruleWarning(const HostConfig& config, const SituationConfig& situation) {
    if (situation.rule.empty()) {
        return {};
    }
    std::vector<std::string> logs = situation.ruleLogs;
    if (situation.log) {
        logs = {*situation.log};
    }
    const std::string logConfig = logConfigOf(config);
    if (!logConfig.empty() && mayName(logConfig, logs)) {
        return {};
    }
    std::string names;
    for (const std::string& log : logs) {
        if (isMonitored(config, log)) {
            return {};
        }
        names += (names.empty() ? "" : " or ") + log;
    }
    return names.empty()
               ? ""
               : "no [[log]] table " +
                     (logConfig.empty() ? "" : "and no line of " + logConfig + ' ') + "names " +
                     names +
                     (situation.log
                          ? "; add one, or name another log"
                          : "; add one, or name the log that has such entries: [[use]] with "
                            "rule and log");
}

} // namespace

std::vector<std::string> warningsOfSituations(const HostConfig& config, const std::string& path) {
    std::vector<std::string> warnings;
    for (const SituationConfig& situation : config.situations) {
        for (const std::string& why : {fieldWarning(config, situation), textWarning(situation),
                                       ruleWarning(config, situation)}) {
            if (!why.empty()) {
                warnings.push_back(path + ": situation '" + situation.name + "': " + why);
            }
        }
    }
    return warnings;
}

} // namespace zrm::host
