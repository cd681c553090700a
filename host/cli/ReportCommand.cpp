#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/CsvText.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"
#include "host/cli/TimeInput.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <string_view>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

/// The columns that a table shows by default, those that are blank in every entry excepted.
constexpr std::array usualColumns = {"ENTRYTIME", "ENTRYSYS",   "ENTRYSRC",
                                     "ENTRYTYPE", "ENTRYCLASS", "ENTRYDESC"};

/// The columns that were asked for, as the report names them. Throws CliError for one that it does
/// not have.
std::vector<std::string> chosen(std::vector<std::string> asked, const Json& known) {
    for (std::string& column : asked) {
        std::transform(column.begin(), column.end(), column.begin(), [](char c) {
            return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
        });
        if (std::find(known.begin(), known.end(), column) == known.end()) {
            std::string names;
            for (const Json& name : known) {
                names += (names.empty() ? "" : ", ") + JsonText::text(name);
            }
            throw CliError(CliStatus::USAGE,
                           "--columns: '" + column + "' is not a column; the columns are " + names);
        }
    }
    return asked;
}

/// The answer with these columns alone.
Json withColumns(Json answer, const std::vector<std::string>& columns) {
    answer["columns"] = columns;
    for (Json& row : answer["rows"]) {
        Json chosen = Json::object();
        for (const std::string& column : columns) {
            chosen[column] = JsonText::member(row, column);
        }
        row = std::move(chosen);
    }
    return answer;
}

bool isTime(std::string_view column) {
    return column == "ENTRYTIME" || column == "TIMESTAMP";
}

bool hasAny(const Json& rows, const std::string& column) {
    return std::any_of(rows.begin(), rows.end(),
                       [&](const Json& row) { return !JsonText::text(row, column).empty(); });
}

std::string tableText(const Json& rows, const std::vector<std::string>& columns,
                      const Terminal& terminal) {
    std::vector<Table::Column> headings;
    headings.reserve(columns.size());
    for (const std::string& column : columns) {
        headings.push_back({column, isTime(column) ? Table::FIXED : Table::TEXT});
    }
    Table table(headings);
    for (const Json& row : rows) {
        std::vector<Table::Cell> cells;
        for (const std::string& column : columns) {
            const std::string value = JsonText::text(row, column);
            cells.emplace_back(isTime(column) ? TimeDisplay::stamp(value) : value);
        }
        table.add(std::move(cells));
    }
    return table.text(terminal);
}

/// A value as a field: times are readable, nothing steers a terminal, and no spreadsheet takes a
/// text for a formula.
std::string csvField(const Json& row, const std::string& column) {
    const std::string text = JsonText::text(row, column);
    if (isTime(column)) {
        return TimeDisplay::stamp(text);
    }
    const std::string visible = DisplayText::visible(text);
    const bool isFormula = JsonText::member(row, column).is_string() && !visible.empty() &&
                           std::string_view("=+-@").find(visible.front()) != std::string_view::npos;
    return isFormula ? '\'' + visible : visible;
}

std::string csvText(const Json& rows, const std::vector<std::string>& columns) {
    std::string text = CsvText::record(columns);
    for (const Json& row : rows) {
        std::vector<std::string> fields;
        for (const std::string& column : columns) {
            fields.push_back(csvField(row, column));
        }
        text += CsvText::record(fields);
    }
    return text;
}

} // namespace

ReportCommand::ReportCommand(CLI::App& program)
    : m_command(program.add_subcommand("report", "What a log held between two times")) {
    m_command->add_option("LOG", m_log, "The full path of a log")->required();
    m_command->add_option("--from", m_from, "First time (default -24h)")->type_name("TIME");
    m_command->add_option("--to", m_to, "Last time (default now)")->type_name("TIME");
    m_command
        ->add_option("--where", m_where,
                     "A condition, for example \"ENTRYSRC starts 'sshd'\"; all must hold")
        ->type_name("CONDITION")
        ->allow_extra_args(false);
    m_command->add_option("--columns", m_columns, "The columns to show, separated by commas")
        ->type_name("NAMES")
        ->delimiter(',')
        ->allow_extra_args(false);
    m_command->add_option("--format", m_format, "table, json or csv (default table)")
        ->type_name("FORMAT")
        ->check(CLI::IsMember({"table", "json", "csv"}));
}

bool ReportCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus ReportCommand::run(Context& context) {
    const Json body = {{"log", m_log},
                       {"from", Context::time("--from", m_from)},
                       {"to", Context::time("--to", m_to)},
                       {"where", m_where}};
    const Json answer = context.client().send("POST", "/api/v1/reports", body);
    const Json& rows = JsonText::member(answer, "rows");
    const Json& known = JsonText::member(answer, "columns");
    std::vector<std::string> columns = chosen(m_columns, known);
    if (context.options().json || m_format == "json") {
        context.printJson(columns.empty() ? answer : withColumns(answer, columns));
    } else if (m_format == "csv") {
        if (columns.empty()) {
            columns = known.get<std::vector<std::string>>();
        }
        context.print(csvText(rows, columns));
    } else if (!rows.empty()) {
        if (columns.empty()) {
            std::copy_if(usualColumns.begin(), usualColumns.end(), std::back_inserter(columns),
                         [&](const char* column) { return hasAny(rows, column); });
        }
        context.print(tableText(rows, columns, context.terminal()));
    }
    if (JsonText::text(answer, "truncated") == "true") {
        Context::note("the report has read " + JsonText::text(answer, "max_rows") +
                      " entries, the most that it may: older ones are missing; start later or end "
                      "earlier");
    } else {
        Context::noteReach(answer);
    }
    if (rows.empty()) {
        Context::note("no entry of " + m_log + " between these times meets the conditions");
        return CliStatus::REFUSED;
    }
    return CliStatus::DONE;
}

} // namespace zrm::host
