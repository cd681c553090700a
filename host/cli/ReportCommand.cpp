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
#include <set>
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

/// The answer with these columns alone, and the fields that it has.
Json withColumns(Json answer, const std::vector<std::string>& columns) {
    answer["columns"] = columns;
    for (Json& row : answer["rows"]) {
        Json chosen = Json::object();
        for (const std::string& column : columns) {
            chosen[column] = JsonText::member(row, column);
        }
        for (const char* const key : {"fields", "fields_cut"}) {
            if (row.contains(key)) {
                chosen[key] = std::move(row[key]);
            }
        }
        row = std::move(chosen);
    }
    return answer;
}

/// A field as the heading of a column, as in conditions.
const std::string fieldPrefix = "field.";

/// What a row has in a column, or in the field that it names.
const Json& cell(const Json& row, const std::string& column) {
    return column.starts_with(fieldPrefix) ? JsonText::member(JsonText::member(row, "fields"),
                                                              column.substr(fieldPrefix.size()))
                                           : JsonText::member(row, column);
}

bool areAll(const std::vector<std::string>& fields) {
    return std::find(fields.begin(), fields.end(), "*") != fields.end();
}

/// The columns for these fields; for all of them those that the rows have, in the order in which
/// they occur.
std::vector<std::string> fieldColumns(const std::vector<std::string>& fields, const Json& rows) {
    std::vector<std::string> columns;
    std::set<std::string> known;
    const auto add = [&](const std::string& name) {
        if (known.insert(name).second) {
            columns.push_back(fieldPrefix + name);
        }
    };
    if (!areAll(fields)) {
        std::for_each(fields.begin(), fields.end(), add);
        return columns;
    }
    for (const Json& row : rows) {
        for (const auto& field : JsonText::member(row, "fields").items()) {
            add(field.key());
        }
    }
    return columns;
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
            const std::string value = JsonText::text(cell(row, column));
            cells.emplace_back(isTime(column) ? TimeDisplay::stamp(value) : value);
        }
        table.add(std::move(cells));
    }
    return table.text(terminal);
}

/// A value as a field: times are readable, nothing steers a terminal, and no spreadsheet takes a
/// text for a formula.
std::string csvField(const Json& row, const std::string& column) {
    const Json& value = cell(row, column);
    const std::string text = JsonText::text(value);
    if (isTime(column)) {
        return TimeDisplay::stamp(text);
    }
    const std::string visible = DisplayText::visible(text);
    const bool isFormula = value.is_string() && !visible.empty() &&
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
    m_command
        ->add_option("--fields", m_fields,
                     "The fields to show after the columns, separated by commas; * for all")
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
          m_isCsv(!m_isJson && command.m_format == "csv"),
          m_isWritten(m_isCsv && !areAll(command.m_fields)) {}

    /// One line of the agent's answer.
    void take(Json&& line);
    /// Writes what is left, and what there is to say about the report.
    CliStatus finish();

private:
    void begin(const Json& head);
    /// Headings of CSV, whose rows may follow.
    void beginCsv();
    /// Adds the columns of the fields to those of the table.
    void addFieldColumns();
    void flush();
    void printTable();
    void notes() const;

    const ReportCommand& m_command;
    const Context& m_context;
    const bool m_isJson;
    const bool m_isCsv;
    const bool m_isWritten; ///< each row at once; false: the rows decide on the columns
    ProgressLine m_progress;
    std::vector<std::string> m_columns; ///< those that were asked for
    Json m_answer;
    std::size_t m_count = 0; ///< rows received
    std::size_t m_cut = 0;   ///< of these, rows whose fields are cut
    std::string m_text;      ///< to be written
};

void ReportCommand::Receiver::take(Json&& line) {
    if (line.contains("begin")) {
        begin(line["begin"]);
    } else if (line.contains("row")) {
        ++m_count;
        m_cut += line["row"].contains("fields_cut") ? 1 : 0;
        if (m_isWritten) {
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
    if (m_isCsv && m_columns.empty()) {
        m_columns = known.get<std::vector<std::string>>();
    }
    if (m_isWritten) {
        beginCsv();
    }
}

void ReportCommand::Receiver::beginCsv() {
    addFieldColumns();
    m_text = CsvText::record(m_columns);
}

void ReportCommand::Receiver::addFieldColumns() {
    const std::vector<std::string> fields = fieldColumns(m_command.m_fields, m_answer["rows"]);
    m_columns.insert(m_columns.end(), fields.begin(), fields.end());
}

void ReportCommand::Receiver::flush() {
    if (!m_text.empty()) {
        m_progress.clear();
        m_context.print(std::exchange(m_text, {}));
    }
}

CliStatus ReportCommand::Receiver::finish() {
    if (m_isCsv && !m_isWritten) {
        beginCsv();
        for (const Json& row : m_answer["rows"]) {
            m_text += csvRecord(row, m_columns);
        }
    }
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
    addFieldColumns();
    m_context.print(tableText(rows, m_columns, m_context.terminal()));
}

void ReportCommand::Receiver::notes() const {
    const std::uint64_t skipped = JsonText::number(m_answer, "skipped");
    if (skipped > 0) {
        Context::note(std::to_string(skipped) +
                      (skipped == 1 ? " line that is not an entry was passed over"
                                    : " lines that are not entries were passed over"));
    }
    if (m_cut > 0) {
        Context::note("not all fields of " + std::to_string(m_cut) +
                      (m_cut == 1 ? " entry are shown: it has" : " entries are shown: each has") +
                      " more than a row may have; ask for fewer with --fields");
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
    Json body = {{"log", m_log},
                 {"from", Context::time("--from", m_from)},
                 {"to", Context::time("--to", m_to)},
                 {"where", m_where},
                 {"limit", m_limit}};
    if (!m_fields.empty()) {
        body["fields"] = m_fields;
    }
    Receiver receiver(*this, context);
    context.client().lines("/api/v1/reports", body, "end",
                           [&](Json&& line) { receiver.take(std::move(line)); });
    return receiver.finish();
}

} // namespace zrm::host
