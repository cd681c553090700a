#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/CsvText.h"
#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/ProgressLine.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"
#include "host/cli/TimeInput.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <iterator>
#include <string_view>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

constexpr std::size_t textAtOnce = 16 * 1024; ///< bytes

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

std::string csvRecord(const Json& row, const std::vector<std::string>& columns) {
    std::vector<std::string> fields;
    for (const std::string& column : columns) {
        fields.push_back(csvField(row, column));
    }
    return CsvText::record(fields);
}

/// Adds the members of an object to another one.
void addMembers(Json& answer, const Json& members) {
    for (const auto& [name, value] : members.items()) {
        answer[name] = value;
    }
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
    m_command->add_option("--limit", m_limit, "The number of newest entries (default 1000)")
        ->type_name("COUNT")
        ->check(CLI::Range(1, 10'000));
}

bool ReportCommand::isChosen() const {
    return m_command->parsed();
}

/// Receives a report and writes it: fields at once, anything else when it is complete.
class ReportCommand::Receiver {
public:
    Receiver(const ReportCommand& command, const Context& context)
        : m_command(command), m_context(context),
          m_isJson(context.options().json || command.m_format == "json"),
          m_isCsv(!m_isJson && command.m_format == "csv") {}

    /// One line of the agent's answer.
    void take(Json&& line);
    /// Writes what is left, and what there is to say about the report.
    CliStatus finish();

private:
    void begin(const Json& head);
    void flush();
    void printTable();
    void notes() const;

    const ReportCommand& m_command;
    const Context& m_context;
    const bool m_isJson;
    const bool m_isCsv;
    ProgressLine m_progress;
    std::vector<std::string> m_columns; ///< those that were asked for
    Json m_answer;
    std::size_t m_count = 0; ///< rows received
    std::string m_text;      ///< to be written
};

void ReportCommand::Receiver::take(Json&& line) {
    if (line.contains("begin")) {
        begin(line["begin"]);
    } else if (line.contains("row")) {
        ++m_count;
        if (m_isCsv) {
            m_text += csvRecord(line["row"], m_columns);
        } else {
            m_answer["rows"].push_back(std::move(line["row"]));
        }
        if (m_text.size() >= textAtOnce) {
            flush();
        }
    } else if (line.contains("progress")) {
        flush();
        const Json& progress = line["progress"];
        m_progress.show(JsonText::number(progress, "read"), JsonText::number(progress, "total"),
                        m_count);
    } else if (line.contains("end")) {
        addMembers(m_answer, line["end"]);
    }
}

void ReportCommand::Receiver::begin(const Json& head) {
    m_answer = head;
    m_answer["rows"] = Json::array();
    const Json& known = JsonText::member(m_answer, "columns");
    m_columns = chosen(m_command.m_columns, known);
    if (m_isCsv) {
        if (m_columns.empty()) {
            m_columns = known.get<std::vector<std::string>>();
        }
        m_text = CsvText::record(m_columns);
    }
}

void ReportCommand::Receiver::flush() {
    if (!m_text.empty()) {
        m_progress.clear();
        m_context.print(std::exchange(m_text, {}));
    }
}

CliStatus ReportCommand::Receiver::finish() {
    flush();
    m_progress.clear();
    if (m_isJson) {
        m_context.printJson(m_columns.empty() ? m_answer : withColumns(m_answer, m_columns));
    } else if (m_count > 0 && !m_isCsv) {
        printTable();
    }
    notes();
    if (m_count == 0) {
        Context::note("no entry of " + m_command.m_log +
                      " between these times meets the conditions");
    }
    return m_count == 0 ? CliStatus::REFUSED : CliStatus::DONE;
}

void ReportCommand::Receiver::printTable() {
    const Json& rows = m_answer["rows"];
    if (m_columns.empty()) {
        std::copy_if(usualColumns.begin(), usualColumns.end(), std::back_inserter(m_columns),
                     [&](const char* column) { return hasAny(rows, column); });
    }
    m_context.print(tableText(rows, m_columns, m_context.terminal()));
}

void ReportCommand::Receiver::notes() const {
    const std::uint64_t skipped = JsonText::number(m_answer, "skipped");
    if (skipped > 0) {
        Context::note(std::to_string(skipped) +
                      (skipped == 1 ? " line that is not an entry was passed over"
                                    : " lines that are not entries were passed over"));
    }
    bool hasProblem = false;
    for (const Json& file : JsonText::member(m_answer, "files")) {
        if (const std::string problem = JsonText::text(file, "problem"); !problem.empty()) {
            hasProblem = true;
            Context::note("not all of " + JsonText::text(file, "file") + " was read: " + problem);
        }
    }
    if (JsonText::text(m_answer, "truncated") != "true") {
        if (!hasProblem) {
            Context::noteReach(m_answer);
        }
    } else if (m_count == m_command.m_limit) {
        Context::note("the report has found " + std::to_string(m_count) +
                      " entries, the most that it may: older ones are missing; ask for more with "
                      "--limit, or end earlier");
    } else {
        Context::note("the report has read " + JsonText::text(m_answer, "max_rows") +
                      " entries, the most that it may: older ones are missing; start later or end "
                      "earlier");
    }
}

CliStatus ReportCommand::run(Context& context) {
    const Json body = {{"log", m_log},
                       {"from", Context::time("--from", m_from)},
                       {"to", Context::time("--to", m_to)},
                       {"where", m_where},
                       {"limit", m_limit}};
    Receiver receiver(*this, context);
    context.client().lines("/api/v1/reports", body, "end",
                           [&](Json&& line) { receiver.take(std::move(line)); });
    return receiver.finish();
}

} // namespace zrm::host
