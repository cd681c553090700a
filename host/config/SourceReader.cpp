#include "host/config/SourceReader.h"

#include "host/base/TimeText.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

using SourceReader::command;
using SourceReader::journal;

constexpr std::size_t longestValue = 1024; ///< bytes of a unit, an identifier or an argument
constexpr std::size_t mostValues = 1000;

constexpr std::array<std::string_view, 8> priorities = {"emerg",   "alert",  "crit", "err",
                                                        "warning", "notice", "info", "debug"};
constexpr std::array<std::string_view, 11> unitTypes = {
    ".service", ".socket", ".target", ".device", ".mount", ".automount",
    ".swap",    ".timer",  ".path",   ".slice",  ".scope"};

/// The texts of a list that have a usable length.
std::vector<std::string> readValues(ConfigSection& section, std::string_view key) {
    std::vector<std::string> values;
    const auto texts = section.texts(key);
    if (!texts) {
        return values;
    }
    if (texts->empty() || texts->size() > mostValues) {
        section.problem(key, "has " + std::to_string(texts->size()) + " items",
                        "write 1 to " + std::to_string(mostValues) + ", or leave it out");
        return values;
    }
    for (const auto& [text, line] : *texts) {
        if (text.empty() || text.size() > longestValue) {
            section.problem(line, key, "an item has " + std::to_string(text.size()) + " bytes",
                            "write 1 to " + std::to_string(longestValue));
        } else {
            values.push_back(text);
        }
    }
    return values;
}

/// A unit is a service unless its name says otherwise; a glob stands as it is.
std::string unitOf(std::string name) {
    const bool isWhole =
        name.find_first_of("*?[") != name.npos ||
        std::any_of(unitTypes.begin(), unitTypes.end(),
                    [&name](std::string_view type) { return name.ends_with(type); });
    return isWhole ? name : name + ".service";
}

void readPriority(ConfigSection& section, JournalConfig& config) {
    const std::optional<std::string> text = section.text("priority");
    if (!text) {
        return;
    }
    const auto found = std::find(priorities.begin(), priorities.end(), *text);
    if (found == priorities.end()) {
        section.problem("priority", "'" + *text + "' is not a priority",
                        "write emerg, alert, crit, err, warning, notice, info or debug");
    } else {
        config.priority = static_cast<int>(found - priorities.begin());
    }
}

JournalConfig readJournal(ConfigSection& section) {
    JournalConfig config;
    for (std::string& unit : readValues(section, "units")) {
        config.units.push_back(unitOf(std::move(unit)));
    }
    config.identifiers = readValues(section, "identifiers");
    readPriority(section, config);
    if (const std::optional<std::string> boot = section.text("boot")) {
        config.isCurrentBoot = *boot == "current";
        if (*boot != "current" && *boot != "all") {
            section.problem("boot", "'" + *boot + "' is not a choice here",
                            R"(write "all" or "current")");
        }
    }
    if (const std::optional<std::string> directory = section.text("directory")) {
        config.directory = *directory;
        if (!directory->starts_with('/')) {
            section.problem("directory", "'" + *directory + "' is not an absolute path",
                            "begin it with '/', or leave it out for the journal of this machine");
        }
    }
    return config;
}

void readArguments(ConfigSection& section, CommandConfig& config) {
    if (!section.has("command")) {
        section.problem("command", R"(is missing, and type "command" needs it)",
                        R"(write the program and its arguments, for example ["dmesg", "-w"], or )"
                        "one text for the shell");
        return;
    }
    config.arguments = readValues(section, "command");
    if (section.isText("command") && config.arguments.size() == 1) {
        config.arguments = {"/bin/sh", "-c", config.arguments.front()};
    }
}

CommandConfig readCommand(ConfigSection& section) {
    CommandConfig config;
    readArguments(section, config);
    const std::optional<std::string> restart = section.text("restart");
    if (restart == "never") {
        config.restarts = false;
    } else if (restart) {
        const auto pause = DurationText::parse(*restart);
        if (!pause || *pause > CommandConfig::longestPause) {
            section.problem("restart",
                            "'" + *restart + "' is not a duration from a second to a minute",
                            R"(write for example "1s", or "never")");
        } else {
            config.pause = *pause;
        }
    }
    return config;
}

/// What the log is called if the table does not say: the program, or the first word for the shell.
std::string nameOf(const CommandConfig& config, bool isShell) {
    if (config.arguments.empty()) {
        return command;
    }
    std::string_view name = isShell ? config.arguments.back() : config.arguments.front();
    name = name.substr(0, isShell ? name.find_first_of(" \t") : name.npos);
    name.remove_prefix(name.rfind('/') == name.npos ? 0 : name.rfind('/') + 1);
    std::string usable(name.substr(0, longestSourceName));
    std::replace_if(
        usable.begin(), usable.end(),
        [](char character) {
            return !isSourceName({&character, 1});
        },
        '-');
    return usable.empty() ? command : usable;
}

void readName(ConfigSection& section, LogConfig& log) {
    const std::optional<std::string> name = section.text("name");
    log.name = name.value_or(log.command ? nameOf(*log.command, section.isText(command))
                                         : std::string(journal));
    if (!isSourceName(log.name)) {
        section.problem("name", "'" + log.name + "' is not the name of a log",
                        "write 1 to " + std::to_string(longestSourceName) +
                            " letters, digits and characters of -_@:");
    }
}

} // namespace

bool SourceReader::isSource(std::string_view type) noexcept {
    return type == journal || type == command;
}

void SourceReader::read(ConfigSection& section, LogConfig& log) {
    const std::string noMeaning = "has no meaning for type \"" + log.type + '"';
    for (const char* const key : {"path", "exclude", "follow", "rotate_wait", "rotated_to"}) {
        section.refuse(key, noMeaning);
    }
    if (log.type == journal) {
        log.journal = readJournal(section);
        section.refuse("timezone", noMeaning);
    } else {
        log.command = readCommand(section);
        section.refuse("start", noMeaning);
        if (section.truth("resume").value_or(false)) {
            section.problem("resume",
                            noMeaning + ": what a command has printed cannot be read "
                                        "again",
                            "leave it out");
        }
    }
    readName(section, log);
}

} // namespace zrm::host
