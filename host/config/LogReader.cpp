#include "host/config/LogReader.h"

#include "host/base/TimeText.h"
#include "host/config/OwnFiles.h"
#include "host/config/PathPattern.h"
#include "host/config/SourceReader.h"
#include "host/config/TimeZones.h"
#include "host/formats/FormatDescription.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/SourceLogFile.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <optional>
#include <string_view>
#include <utility>

#include <sys/utsname.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestPath = 4095;
constexpr std::size_t mostPaths = 1000;

struct LogType {
    const char* name;
    char letter;
};

constexpr std::array<LogType, 4> types = {
    {{"syslog", 'S'}, {"text", 'U'}, {"accounting", 'A'}, {"errorlog", 'E'}}};

bool isErrorLogSystem() {
    utsname names;
    return ::uname(&names) == 0 && std::strcmp(names.sysname, "AIX") == 0;
}

/// A text of a list of choices; none when the key is missing or a problem was recorded.
std::optional<std::size_t> readChoice(ConfigSection& section, std::string_view key,
                                      const std::vector<const char*>& choices) {
    const std::optional<std::string> text = section.text(key);
    if (!text) {
        return std::nullopt;
    }
    std::string list;
    for (std::size_t index = 0; index < choices.size(); ++index) {
        if (*text == choices[index]) {
            return index;
        }
        list += (index == 0                    ? ""
                 : index + 1 == choices.size() ? " or "
                                               : ", ") +
                ('"' + std::string(choices[index]) + '"');
    }
    section.problem(key, "'" + *text + "' is not a choice here", "write " + list);
    return std::nullopt;
}

void refuse(ConfigSection& section, std::string_view key, const LogConfig& log) {
    section.refuse(key, "has no meaning for type \"" + log.type + '"');
}

constexpr const char* openBracketCure =
    "close it with ']' in the same name, or write '\\[' for the character itself";

std::string openBracket(const std::string& pattern) {
    return "'" + pattern + "' has a '[' without its ']'";
}

/// Why a path or a glob cannot be used, and what to write instead; empty if it can.
std::pair<std::string, std::string> problemOfPath(const std::string& path) {
    if (path.empty() || path.front() != '/') {
        return {"'" + path + "' is not an absolute path", "begin it with '/'"};
    }
    if (path.back() == '/') {
        return {"'" + path + "' names a directory",
                "name the files in it, for example \"" + path + "*.log\""};
    }
    if (path.size() > longestPath) {
        return {"the path has " + std::to_string(path.size()) + " bytes",
                "write at most " + std::to_string(longestPath)};
    }
    if (path.find("**") != std::string::npos) {
        return {"'" + path + "' holds '**', which does not search directories of every depth",
                "write one '*' for each level of directories"};
    }
    if (PathPattern::hasOpenBracket(path)) {
        return {openBracket(path), openBracketCure};
    }
    return {};
}

} // namespace

LogReader::LogReader(const HostConfig& config, ConfigProblems& problems)
    : m_config(config), m_problems(problems), m_formats(config.formatDirectories),
      m_ownFiles(ownFilesOf(config)) {}

LogConfig LogReader::read(const toml::table& table) {
    ConfigSection section("log", table, m_problems);
    LogConfig log;
    log.line = static_cast<unsigned>(table.source().begin.line);
    readType(section, log);
    if (SourceReader::isSource(log.type)) {
        readSource(section, log);
    } else {
        readExcludes(section, log);
        readPaths(section, log);
    }
    readFormat(section, log);
    log.formatName = formatName(section, log);
    log.debug = section.truth("debug").value_or(false);
    readFollowing(section, log);
    readResumption(section, log);
    readTimezone(section, log);
    readKeep(section, log);
    readQuiet(section, log);
    section.refuseUnknownKeys();
    return log;
}

void LogReader::readSource(ConfigSection& section, LogConfig& log) {
    SourceReader::read(section, log);
    const auto [first, isNew] = m_paths.emplace(log.name, log.line);
    if (!isNew) {
        section.problem("name",
                        "the [[log]] at line " + std::to_string(first->second) + " is named '" +
                            log.name + "' already",
                        R"(give this one another, for example name = ")" + log.name + "-2\"");
    }
}

void LogReader::readPaths(ConfigSection& section, LogConfig& log) {
    constexpr const char* cure = R"(write path = "/var/log/syslog", or a list of paths and globs)";
    const auto paths = section.texts("path");
    if (!section.has("path")) {
        section.problem("path", "is missing", cure);
        return;
    }
    if (!paths) {
        return;
    }
    if (paths->empty()) {
        section.problem("path", "names no file", cure);
        return;
    }
    if (paths->size() > mostPaths) {
        section.problem("path", "has " + std::to_string(paths->size()) + " items",
                        "write at most " + std::to_string(mostPaths) + ", and globs for the rest");
        return;
    }
    for (const auto& [path, line] : *paths) {
        const auto [what, itsCure] = problemOfPath(path);
        if (!what.empty()) {
            section.problem(line, "path", what, itsCure);
            continue;
        }
        const auto [first, isNew] = m_paths.emplace(path, line);
        if (!isNew) {
            section.problem(line, "path",
                            "'" + path + "' is named at line " + std::to_string(first->second) +
                                " already",
                            "name it once");
            continue;
        }
        if (log.letter == 'E' && PathPattern::isPattern(path)) {
            section.problem(line, "path", "'" + path + "' is a glob",
                            "name the one file of the error log");
        }
        checkOwnFiles(section, path, line, log);
        log.paths.push_back(path);
    }
}

/// A log that the agent writes itself would raise events that add lines to it, without an end.
void LogReader::checkOwnFiles(ConfigSection& section, const std::string& path, unsigned line,
                              const LogConfig& log) {
    for (const auto& [file, what] : m_ownFiles) {
        const bool isExcluded = std::any_of(
            log.excludes.begin(), log.excludes.end(),
            [&file = file](const auto& pattern) { return PathPattern::excludes(pattern, file); });
        if (isExcluded || (path != file && !PathPattern::matches(path, file))) {
            continue;
        }
        const bool isPattern = path != file;
        section.problem(line, "path",
                        "'" + path + (isPattern ? "' matches " + file + ", " : "' is ") +
                            (isPattern ? "" : "") + what +
                            ": the agent writes this file, and each event would raise the next",
                        isPattern ? "exclude the file, or name the logs more narrowly"
                                  : "leave it out");
        return;
    }
}

void LogReader::readExcludes(ConfigSection& section, LogConfig& log) {
    const auto patterns = section.texts("exclude");
    for (const auto& [pattern, line] : patterns.value_or(std::vector<ConfigSection::Text>())) {
        if (pattern.empty() || (pattern.find('/') != std::string::npos && pattern[0] != '/')) {
            section.problem(line, "exclude", "'" + pattern + "' is neither a path nor a file name",
                            "begin a path with '/', or write a file name without any '/'");
        } else if (pattern.size() > longestPath) {
            section.problem(line, "exclude",
                            "the pattern has " + std::to_string(pattern.size()) + " bytes",
                            "write at most " + std::to_string(longestPath));
        } else if (PathPattern::hasOpenBracket(pattern)) {
            section.problem(line, "exclude", openBracket(pattern), openBracketCure);
        } else {
            log.excludes.push_back(pattern);
        }
    }
}

void LogReader::readType(ConfigSection& section, LogConfig& log) {
    std::vector<const char*> names;
    for (const LogType& type : types) {
        names.push_back(type.name);
    }
    for (const std::string_view format : formatTypes()) {
        if (std::find(names.begin(), names.end(), format) == names.end()) {
            names.push_back(format.data());
        }
    }
    names.insert(names.end(), {SourceReader::journal, SourceReader::command});
    if (const auto choice = readChoice(section, "type", names)) {
        log.type = names[*choice];
        log.letter = *choice < types.size() ? types[*choice].letter : FormatLogFile::typeLetter;
    } else if (section.has("unwrap") && !section.has("type")) {
        log.type = "regex"; // without an expression: what is in the container's lines is all text
        log.letter = FormatLogFile::typeLetter;
    }
    if (SourceReader::isSource(log.type)) {
        log.letter = log.type == SourceReader::journal ? SourceLogFile::journalLetter
                                                       : SourceLogFile::commandLetter;
    }
    if (log.letter == 'E' && !isErrorLogSystem()) {
        section.problem("type", "an error log is read only on AIX", "write another type");
    }
}

void LogReader::readFollowing(ConfigSection& section, LogConfig& log) {
    using std::chrono::seconds;
    constexpr seconds longestWait = std::chrono::hours(1);
    if (log.letter == 'E') {
        for (const char* const key : {"follow", "start", "rotate_wait", "rotated_to"}) {
            refuse(section, key, log);
        }
    }
    if (const auto choice = readChoice(section, "follow", {"name", "file"})) {
        log.follow.follow =
            *choice == 0 ? FollowSettings::Follow::name : FollowSettings::Follow::file;
    }
    if (const auto choice = readChoice(section, "start", {"end", "beginning"})) {
        log.follow.start =
            *choice == 0 ? FollowSettings::Start::end : FollowSettings::Start::beginning;
    }
    if (const std::optional<std::string> text = section.text("rotate_wait")) {
        const std::optional<seconds> wait = DurationText::parse(*text);
        if (!wait || *wait > longestWait) {
            section.problem("rotate_wait",
                            "'" + *text + "' is not a duration from a second to an hour",
                            "write for example \"2s\" or \"5m\"");
        } else {
            log.follow.rotateWait = *wait;
        }
    }
    if (const std::optional<std::string> directory = section.text("rotated_to")) {
        if (directory->empty() || directory->size() > longestPath) {
            section.problem("rotated_to",
                            directory->empty()
                                ? "is not a directory"
                                : "has " + std::to_string(directory->size()) + " bytes",
                            "write the directory to which rotation moves older files, for example "
                            "\"/var/log/old\"");
        } else {
            log.follow.rotatedTo = *directory;
        }
    }
}

void LogReader::readResumption(ConfigSection& section, LogConfig& log) {
    if (log.letter == 'E') {
        refuse(section, "resume", log);
    }
    const std::optional<bool> resume = section.truth("resume");
    if (resume.value_or(false) && !m_config.history.enabled) {
        section.problem("resume", "needs the history, which stores how far each log was read",
                        "write enabled = true in [history], or resume = false");
    }
    log.follow.resume = resume.value_or(m_config.history.enabled);
}

void LogReader::readTimezone(ConfigSection& section, LogConfig& log) {
    if (log.letter == 'A' || log.letter == 'E' || log.type == "wtmp") {
        refuse(section, "timezone", log);
    }
    const std::optional<std::string> zone = section.text("timezone");
    if (!zone) {
        return;
    }
    log.follow.timezone = *zone;
    log.follow.zone = TimeZones::offsetsOf(*zone);
    if (log.follow.zone.empty()) {
        section.problem("timezone", "'" + *zone + "' is not a time zone of this machine",
                        "write \"UTC\" or a name like \"Europe/Berlin\" (timedatectl "
                        "list-timezones lists them)");
    }
}

void LogReader::readQuiet(ConfigSection& section, LogConfig& log) {
    using std::chrono::seconds;
    constexpr seconds shortest{10};
    constexpr seconds longest = std::chrono::hours(24 * 366);
    const std::optional<std::string> text = section.text("quiet");
    if (!text) {
        return;
    }
    if (*text == "learn") {
        log.follow.quiet.isLearned = true;
        return;
    }
    const std::optional<seconds> after = DurationText::parse(*text);
    if (!after || *after < shortest || *after > longest) {
        section.problem("quiet",
                        "'" + *text + "' is neither learn nor a duration from 10 s to a year",
                        R"(write "learn", or for example "30m" or "2h")");
        return;
    }
    log.follow.quiet.after = *after;
}

} // namespace zrm::host
