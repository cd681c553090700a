#include "host/config/SituationWarnings.h"

#include "host/config/HostConfig.h"
#include "host/config/PathPattern.h"
#include "host/config/TextTemplate.h"

#include <algorithm>
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

bool hasLogConfig(const HostConfig& config) {
    return std::any_of(config.environment.begin(), config.environment.end(),
                       [](const auto& one) { return one.variable == "ZRM_CONFIG_FILE"; });
}

/// A rule whose log nobody monitors is never raised. Logs of the log configuration are not known
/// here.
std::string ruleWarning(const HostConfig& config, const SituationConfig& situation) {
    if (situation.rule.empty() || hasLogConfig(config)) {
        return {};
    }
    std::vector<std::string> logs = situation.ruleLogs;
    if (situation.log) {
        logs = {*situation.log};
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
               : "no [[log]] table names " + names +
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
