#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/InputFile.h"
#include "host/cli/Terminal.h"
#include "host/cli/TimeDisplay.h"
#include "host/diagnose/FormatTrial.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdio>
#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

constexpr std::size_t narrowest = 10; ///< the fewest columns of the text that are shown

/// A text with a caret under one position. Two lines, each with its line end: the text in visible
/// form, and the caret under byte `at` (after the text when `at` is its size), both indented by
/// `indent` columns. On a narrow terminal, only the part of the text around the position.
std::string markedAt(std::string_view text, std::size_t at, std::size_t indent,
                     const Terminal& terminal) {
    at = std::min(at, text.size());
    std::string before = DisplayText::visible(text.substr(0, at));
    std::string rest = DisplayText::visible(text.substr(at));
    if (terminal.width > 0) {
        const std::size_t room =
            std::max(narrowest, terminal.width > indent ? terminal.width - indent : 0);
        const std::size_t columns = DisplayText::width(before);
        if (columns + std::max<std::size_t>(DisplayText::width(rest), 1) > room &&
            columns > room / 2) {
            const std::size_t mark = DisplayText::width(terminal.ellipsis());
            const std::size_t dropped = columns - room / 2 + mark;
            before.erase(0, DisplayText::beginning(before, dropped).size());
            before.insert(0, terminal.ellipsis());
        }
        rest = DisplayText::shortened(rest, room - std::min(room, DisplayText::width(before)),
                                      terminal.ellipsis());
    }
    const std::string blanks(indent, ' ');
    return blanks + before + rest + '\n' + blanks + std::string(DisplayText::width(before), ' ') +
           terminal.coloured("^", Colour::BAD) + '\n';
}

using Json = nlohmann::ordered_json;

constexpr std::size_t mostLines = 100000;
constexpr std::size_t numberColumns = 5;
constexpr std::size_t indent = numberColumns + 2;
constexpr std::size_t nameColumns = 12;

std::string_view cell(const FormatTrial::Line& line, std::string_view column) {
    for (const auto& [name, text] : line.row) {
        if (name == column) {
            return text;
        }
    }
    return {};
}

/// The non-empty columns; the second of a pair only if it differs.
std::string columnsOf(const FormatTrial::Line& line, const Terminal& terminal) {
    std::string text;
    for (const auto& [column, value] : line.row) {
        const bool isTwin = column.starts_with('U');
        if (value.empty() || (isTwin && cell(line, column.substr(1)) == value)) {
            continue;
        }
        const std::string shown =
            DisplayText::visible(column == "ENTRYTIME" ? TimeDisplay::stamp(value) : value);
        text += std::string(indent, ' ') + terminal.coloured(column, Colour::FAINT) +
                std::string(nameColumns - std::min(nameColumns, column.size()), ' ') + shown + '\n';
    }
    return text;
}

std::string reasonOf(const std::string& reason, Colour colour, const Terminal& terminal) {
    std::string shown = DisplayText::visible(reason);
    shown.erase(shown.find_last_not_of(' ') + 1);
    return shown.empty() ? "" : std::string(indent, ' ') + terminal.coloured(shown, colour) + '\n';
}

std::string textOf(std::size_t number, const FormatTrial::Line& line, const Terminal& terminal) {
    const std::string digits = std::to_string(number);
    const std::string head =
        std::string(numberColumns - std::min(numberColumns, digits.size()), ' ') + digits + "  ";
    if (!line.matched && line.failedAt) {
        // The line number replaces the leading blanks.
        const std::string marked = markedAt(line.line, *line.failedAt, indent, terminal);
        return head + marked.substr(indent) + reasonOf(line.reason, Colour::BAD, terminal);
    }
    const std::string shown = DisplayText::visible(line.line);
    const std::size_t room = terminal.width > indent ? terminal.width - indent : 1;
    return head +
           (terminal.width > 0 ? DisplayText::shortened(shown, room, terminal.ellipsis()) : shown) +
           '\n' + columnsOf(line, terminal) +
           reasonOf(line.reason, line.matched ? Colour::NOTICE : Colour::BAD, terminal);
}

std::string refusalOf(const std::string& format, const FormatTrial::Result& result,
                      const Terminal& terminal) {
    return (result.position ? markedAt(format, *result.position, 0, terminal) : "") +
           terminal.coloured(DisplayText::visible(result.reason), Colour::BAD) + '\n';
}

std::string coverageOf(const FormatTrial::Result& result, const Terminal& terminal) {
    char percent[16];
    std::snprintf(percent, sizeof percent, "%.1f", FormatTrial::percent(result));
    const bool isWhole = result.matched == result.lines.size();
    const Colour colour = result.matched == 0 ? Colour::BAD : Colour::NOTICE;
    return terminal.coloured(std::to_string(result.matched) + " of " +
                                 std::to_string(result.lines.size()) + " lines fit (" + percent +
                                 " %)",
                             isWhole ? Colour::GOOD : colour) +
           '\n';
}

TableSettings settingsOf(const std::string& timezone) {
    std::optional<TableSettings> settings = FormatTrial::settingsOf(timezone);
    if (!settings) {
        throw CliError(CliStatus::USAGE, "try: '" + timezone +
                                             "' is not a time zone of this machine; write UTC or a "
                                             "name like Europe/Berlin");
    }
    return std::move(*settings);
}

/// What to write into the configuration.
std::string configurationOf(const FormatTrial::Result& result) {
    if (result.table.empty()) {
        return DisplayText::visible(result.configurationLine) + '\n';
    }
    std::string text;
    for (std::string_view rest = result.table; !rest.empty();) {
        const std::size_t end = std::min(rest.find('\n'), rest.size() - 1);
        text += DisplayText::visible(rest.substr(0, end)) + '\n';
        rest.remove_prefix(end + 1);
    }
    return text;
}

/// The path that the configuration names.
std::string logOf(const std::string& file) {
    std::error_code error;
    const std::filesystem::path path = std::filesystem::absolute(file, error);
    return file == "-" || error ? std::string(FormatTrial::someLog)
                                : path.lexically_normal().string();
}

} // namespace

TryCommand::TryCommand(CLI::App& program)
    : m_command(program.add_subcommand("try", "Try a format on a file; needs no agent")) {
    m_command
        ->add_option("FORMAT", m_format,
                     "The format as in the configuration; left out with --type syslog")
        ->required();
    m_command->add_option("FILE", m_file, "The file with the lines; - is standard input");
    m_command->add_flag("--table", m_isTable,
                        "Judge the lines as a [[log]] table does, not the log configuration");
    m_command
        ->add_option("--type", m_type, "text or syslog; syslog needs no format, implies --table")
        ->type_name("TYPE")
        ->check(CLI::IsMember({"text", "syslog"}));
    m_command
        ->add_option("--timezone", m_timezone, "What times without a zone mean; implies --table")
        ->type_name("ZONE");
    m_command->add_option("--lines", m_lines, "The number of lines, from the first (default 100)")
        ->type_name("COUNT")
        ->check(CLI::Range(std::size_t{1}, mostLines));
}

bool TryCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus TryCommand::run(Context& context) {
    const bool isSyslog = m_type == "syslog";
    if (isSyslog == !m_file.empty()) {
        throw CliError(CliStatus::USAGE, isSyslog ? "try: with --type syslog, name the file alone"
                                                  : "try: FILE is required");
    }
    const std::string& path = isSyslog ? m_format : m_file;
    InputFile file(path);
    std::vector<std::string> lines;
    std::optional<std::string> next;
    while (lines.size() < m_lines && (next = file.line())) {
        lines.push_back(std::move(*next));
    }
    const bool isTable = isSyslog || m_isTable || !m_timezone.empty();
    const TableSettings settings = isTable ? settingsOf(m_timezone) : nullptr;
    const FormatTrial::Result result =
        isSyslog ? FormatTrial::runSyslog(lines, logOf(path), settings)
                 : FormatTrial::run(m_format, lines, logOf(path), settings);
    const CliStatus status =
        result.accepted && result.matched > 0 ? CliStatus::DONE : CliStatus::REFUSED;
    if (context.options().json) {
        context.printJson(Json::parse(FormatTrial::json(result)));
        return status;
    }
    if (!result.accepted) {
        context.print(refusalOf(m_format, result, context.terminal()));
        return status;
    }
    std::size_t number = 0;
    for (const FormatTrial::Line& line : result.lines) {
        context.print(textOf(++number, line, context.terminal()));
    }
    context.print((result.lines.empty() ? "" : "\n") + coverageOf(result, context.terminal()) +
                  configurationOf(result));
    if (lines.empty()) {
        Context::note(path + " has no lines to try the format on");
    }
    return status;
}

} // namespace zrm::host
