// What a [[log]] table says about the format of its entries.

#include "host/config/EntryLinesReader.h"
#include "host/config/FormatReader.h"
#include "host/config/LogReader.h"
#include "host/config/NamedFormat.h"
#include "host/config/NamedTextFormat.h"
#include "host/config/PathPattern.h"
#include "host/framework/TraceCapture.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <algorithm>
#include <optional>
#include <string>
#include <utility>

namespace zrm::host {

void LogReader::readFormat(ConfigSection& section, LogConfig& log) {
    if (log.journal) {
        readMessages(section, log);
        return;
    }
    if (log.command) {
        readOutput(section, log);
        return;
    }
    if (section.has("format") && (!section.has("type") || log.type == "syslog")) {
        readNamed(section, log);
        return;
    }
    if (log.letter != 'U' && log.letter != 'E') {
        readEntryFormat(section, log);
        return;
    }
    const std::optional<std::string> format = section.text("format");
    if (!section.has("format")) {
        section.problem("format", "is missing, and type \"" + log.type + "\" needs it",
                        log.letter == 'U'
                            ? "describe the lines, for example 'A,\"%d-%d-%d %255[^\\n]\" "
                              ", year month day description'"
                            : "write the command that prints the error log");
        return;
    }
    log.format = format.value_or("");
    section.refuse("unwrap", "has no meaning for type \"" + log.type + '"',
                   log.letter == 'U' ? "describe what the program writes by an expression: type = "
                                       "\"regex\""
                                     : "leave it out");
    if (format && log.letter == 'U') {
        checkTextFormat(section, log);
    }
    if (log.letter == 'U') {
        FormatDescription lines;
        lines.lines = EntryLinesReader::read(section);
        log.follow.join.value = EntryLinesReader::make(section, lines);
    }
}

/// LogConfig::formatName.
std::string LogReader::formatName(ConfigSection& section, const LogConfig& log) const {
    const bool mayBeNamed = log.letter == FormatLogFile::typeLetter || log.journal || log.command;
    const bool isGood = mayBeNamed && section.has("format") && m_problems.count() == 0;
    const auto texts = isGood ? section.texts("format") : std::nullopt;
    std::string names;
    if (texts) {
        for (const ConfigSection::Text& text : *texts) {
            const bool isName = ReadyFiles::isName(text.first);
            names += isName ? (names.empty() ? "" : ", ") + text.first : "";
        }
    }
    return names.empty() ? log.type : names;
}

/// The format of a log that has no kind of its own.
void LogReader::readEntryFormat(ConfigSection& section, LogConfig& log) {
    const std::optional<FormatDescription> format = FormatReader::read(section, log.type);
    const bool isNeeded =
        log.letter == FormatLogFile::typeLetter || FormatReader::describes(section);
    if (format && isNeeded) {
        log.letter = FormatLogFile::typeLetter;
        useFormat(section, *format, log);
    } else if (format) {
        log.follow.join.value = EntryLinesReader::make(section, *format);
    }
}

void LogReader::useFormat(ConfigSection& section, const FormatDescription& format, LogConfig& log) {
    log.follow.format.value = FormatReader::make(section, format);
    if (log.follow.format) {
        log.follow.join.value = EntryLinesReader::make(section, format);
    }
}

/// What is read from the messages of a journal.
void LogReader::readMessages(ConfigSection& section, LogConfig& log) {
    const std::size_t problems = section.problemCount();
    section.refuse("unwrap", "has no meaning for a journal, whose messages are not wrapped");
    section.refuse("time_format", "has no meaning for a journal, which has each message's time");
    if (section.problemCount() != problems) {
        FormatReader::passOver(section);
        return;
    }
    FormatDescription plain;
    plain.type = log.type;
    const std::optional<FormatDescription> format =
        section.has("format") ? readNamedFormat(section, m_formats)
                              : FormatReader::readOver(section, std::move(plain));
    if (!format) {
        return;
    }
    FormatDescription lines;
    lines.lines = format->lines;
    log.follow.join.value = EntryLinesReader::make(section, lines);
    if (!FormatReader::describes(section)) {
        return;
    }
    auto messages = MessageFormat::make(*format);
    if (!messages) {
        const Problem& problem = messages.error();
        section.problem(section.line(problem.field.substr(0, problem.field.find('.'))),
                        problem.field, problem.what, problem.cure);
        return;
    }
    log.messages.value = std::move(*messages);
}

/// How the lines of a command are taken apart: by a ready format, or by expressions.
void LogReader::readOutput(ConfigSection& section, LogConfig& log) {
    if (!FormatReader::describes(section)) {
        FormatDescription lines;
        lines.lines = EntryLinesReader::read(section);
        log.follow.join.value = EntryLinesReader::make(section, lines);
        return;
    }
    const auto texts = section.texts("format");
    const bool isNamed =
        texts && !texts->empty() &&
        std::all_of(texts->begin(), texts->end(),
                    [](const ConfigSection::Text& text) { return ReadyFiles::isName(text.first); });
    const bool isSyslog = !section.has("format") && section.has("extract");
    const std::optional<FormatDescription> format =
        isNamed ? readNamedFormat(section, m_formats)
                : FormatReader::read(section, isSyslog ? "syslog" : "regex");
    if (format && format->type == "wtmp") {
        section.problem("format", "is one of records, and a command prints lines",
                        "name a format of lines");
    } else if (format) {
        useFormat(section, *format, log);
    }
}

void LogReader::readNamed(ConfigSection& section, LogConfig& log) {
    const std::optional<FormatDescription> format = readNamedFormat(section, m_formats);
    if (!format) {
        return;
    }
    if (section.has("type") && format->type != log.type) {
        section.problem("format", "is a format of type \"" + format->type + '"',
                        "leave the type out: the format brings its own");
        return;
    }
    log.type = format->type;
    log.letter = FormatLogFile::typeLetter;
    useFormat(section, *format, log);
}

void LogReader::checkTextFormat(ConfigSection& section, const LogConfig& log) {
    if (log.format.size() > longestTextFormat) {
        section.problem("format", "has " + std::to_string(log.format.size()) + " bytes",
                        "write at most " + std::to_string(longestTextFormat));
        return;
    }
    TraceCapture errors;
    const StringParser parser(log.format.c_str(), UserLogFile::followedFields());
    if (parser.status() != OBJECT_FORMAT_LEARNED) {
        std::string why = errors.take();
        why.erase(why.find_last_not_of(" .") + 1);
        section.problem("format", "cannot be used" + (why.empty() ? std::string() : ": " + why),
                        "correct it; 'zrmctl try FORMAT FILE' shows where it stops matching");
        return;
    }
    for (const std::string& path : log.paths) {
        if (PathPattern::isPattern(path)) {
            continue; // the files that match are judged when they are found
        }
        if (const Result<void> usable = checkNamedTextFormat(log.format, path); !usable) {
            section.problem("format", usable.error().what, usable.error().cure);
            return;
        }
    }
}

} // namespace zrm::host
