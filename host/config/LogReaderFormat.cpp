// What a [[log]] table says about the format of its entries.

#include "host/config/EntryLinesReader.h"
#include "host/config/FormatReader.h"
#include "host/config/LogReader.h"
#include "host/config/NamedFormat.h"
#include "host/config/PathPattern.h"
#include "host/framework/TraceCapture.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <optional>
#include <string>

namespace zrm::host {

namespace {

/// The length of a format in which each ${@} is replaced by the log's name.
std::size_t namedLength(std::string_view format, std::string_view name) {
    constexpr std::string_view token = "${@}";
    std::size_t length = format.size();
    for (std::size_t at = format.find(token); at != std::string_view::npos;
         at = format.find(token, at + token.size())) {
        length += name.size();
        length -= token.size();
    }
    return length;
}

} // namespace

void LogReader::readFormat(ConfigSection& section, LogConfig& log) {
    if (log.isSource()) {
        readSourceFormat(section, log);
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
    if (format && log.letter == 'U') {
        checkTextFormat(section, log);
    }
    if (log.letter == 'U') {
        FormatDescription lines;
        lines.lines = EntryLinesReader::read(section);
        log.follow.join.value = EntryLinesReader::make(section, lines);
    }
}

/// The format of a log that has no kind of its own.
void LogReader::readEntryFormat(ConfigSection& section, LogConfig& log) {
    const std::optional<FormatDescription> format = FormatReader::read(section, log.type);
    const bool isNeeded =
        log.letter == FormatLogFile::typeLetter || FormatReader::describes(section);
    if (format && isNeeded) {
        log.letter = FormatLogFile::typeLetter;
        log.follow.format.value = FormatReader::make(section, *format);
    }
    if (format && (!isNeeded || log.follow.format)) {
        log.follow.join.value = EntryLinesReader::make(section, *format);
    }
}

/// The lines of a command may be taken apart, by expressions.
void LogReader::readSourceFormat(ConfigSection& section, LogConfig& log) {
    section.refuse("entry", "has no meaning for type \"" + log.type + '"');
    const bool isDescribed = log.command && FormatReader::describes(section);
    const std::optional<FormatDescription> format =
        FormatReader::read(section, isDescribed ? "regex" : log.type);
    if (format && isDescribed) {
        log.follow.format.value = FormatReader::make(section, *format);
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
    log.follow.format.value = FormatReader::make(section, *format);
    if (log.follow.format) {
        log.follow.join.value = EntryLinesReader::make(section, *format);
    }
}

void LogReader::checkTextFormat(ConfigSection& section, const LogConfig& log) {
    constexpr std::size_t longest = 1022;
    if (log.format.size() > longest) {
        section.problem("format", "has " + std::to_string(log.format.size()) + " bytes",
                        "write at most " + std::to_string(longest));
        return;
    }
    for (const std::string& path : log.paths) {
        const std::size_t length = namedLength(log.format, path);
        if (!PathPattern::isPattern(path) && length > longest) {
            section.problem("format",
                            "has " + std::to_string(length) +
                                " characters once each ${@} is replaced by '" + path + "'",
                            "write at most " + std::to_string(longest) +
                                ", with ${@} in fewer places");
            return;
        }
    }
    TraceCapture errors;
    const StringParser parser(log.format.c_str(), UserLogFile::followedFields());
    if (parser.status() != OBJECT_FORMAT_LEARNED) {
        std::string why = errors.take();
        why.erase(why.find_last_not_of(" .") + 1);
        section.problem("format", "cannot be used" + (why.empty() ? std::string() : ": " + why),
                        "correct it; 'zrmctl try FORMAT FILE' shows where it stops matching");
    }
}

} // namespace zrm::host
