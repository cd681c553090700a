#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <algorithm>
#include <array>
#include <map>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

struct Kind {
    std::string_view letter;
    const char* name;
};

constexpr std::array<Kind, 7> kinds = {{{"U", "text"},
                                        {"S", "syslog"},
                                        {"A", "logins"},
                                        {"E", "errors"},
                                        {"F", "format"},
                                        {"J", "journal"},
                                        {"C", "command"}}};

/// False for logs that are read from a command or a library rather than from a file.
bool isFile(const Json& row) {
    const std::string letter = JsonText::text(row, "LOGTYPE");
    return letter != "J" && letter != "C";
}

std::string kindOf(const Json& row) {
    std::string letter = JsonText::text(row, "LOGTYPE");
    for (const Kind& kind : kinds) {
        if (kind.letter == letter) {
            return kind.name;
        }
    }
    return letter;
}

Table::Cell statusCell(const Json& row, const Json& ledger) {
    const std::string status = JsonText::text(row, "MONSTATUS");
    if (status == "Running" && ledger.is_object() &&
        !JsonText::member(ledger, "warnings").empty()) {
        return {"Running (!)", Colour::NOTICE};
    }
    if (status == "Running") {
        return {status, Colour::GOOD};
    }
    return {status, status == "Stopped" || status == "Not started" ? Colour::NOTICE : Colour::BAD};
}

std::string sizeText(const Json& row) {
    const Json& size = JsonText::member(row, "LOGSIZE");
    const bool isThere = size.is_number() && size.get<std::int64_t>() >= 0;
    return isThere ? TimeDisplay::bytes(size.get<std::uint64_t>()) : isFile(row) ? "no file" : "-";
}

std::string lastEntry(const Json& ledger) {
    const std::string time = JsonText::text(ledger, "last_entry");
    return time.ends_with('Z') ? TimeDisplay::local(time) : TimeDisplay::stamp(time);
}

Table::Cell countCell(const Json& object, const char* key) {
    const std::string count = JsonText::text(object, key);
    return {count, count == "0" ? Colour::NONE : Colour::NOTICE};
}

void addLedger(FactList& facts, const Json& ledger) {
    struct Row {
        const char* key;
        const char* name;
    };
    constexpr std::array<Row, 6> rows = {{{"lines", "lines"},
                                          {"rows", "rows"},
                                          {"format_errors", "format errors"},
                                          {"without_time", "without a time"},
                                          {"truncations", "truncations"},
                                          {"restarts", "monitor restarts"}}};
    if (ledger.is_null()) {
        return;
    }
    facts.add("read", TimeDisplay::bytes(JsonText::number(ledger, "bytes_read")));
    for (const Row& row : rows) {
        facts.add(row.name, JsonText::text(ledger, row.key));
    }
    const std::string parsed = JsonText::text(ledger, "percent_parsed");
    facts.add("parsed", parsed.empty() ? "" : parsed + " %");
    if (JsonText::member(ledger, "follow")
            .is_null()) { // where a log is followed, nothing is skipped
        facts.add("skipped", TimeDisplay::bytes(JsonText::number(ledger, "skipped_bytes")));
    }
    facts.add("last entry", lastEntry(ledger));
    facts.add("health", JsonText::text(ledger, "health"));
    for (const Json& warning : JsonText::member(ledger, "warnings")) {
        facts.add("warning", JsonText::text(warning, "text"), Colour::NOTICE);
    }
}

void addFollowing(FactList& facts, const Json& follow, bool ofFile) {
    if (!follow.is_object()) {
        return;
    }
    facts.add("following", JsonText::text(follow, "state"));
    facts.add("problem", JsonText::text(follow, "problem"), Colour::BAD);
    if (!ofFile) {
        return;
    }
    facts.add("generation", JsonText::text(follow, "generation"));
    facts.add("generations", JsonText::text(follow, "generations"));
    facts.add("position", JsonText::text(follow, "position"));
    for (const auto& [key, name] :
         {std::pair("behind", "behind"), std::pair("recovered_bytes", "recovered"),
          std::pair("lost_bytes", "lost")}) {
        facts.add(name, TimeDisplay::bytes(JsonText::number(follow, key)));
    }
    facts.add("cut entries", JsonText::text(follow, "cut_entries"));
}

/// The formats of the followed logs, as their tables name them.
std::map<std::string, std::string> formatsOf(const Json& answer) {
    std::map<std::string, std::string> formats;
    for (const Json& table : JsonText::member(answer, "tables")) {
        for (const Json& file : JsonText::member(table, "files")) {
            formats[file.get<std::string>()] = JsonText::text(table, "format");
        }
    }
    return formats;
}

/// What takes the entries of a log apart: its format, or the kind of log that it is.
std::string formatOf(const Json& log, const std::map<std::string, std::string>& formats) {
    const auto found = formats.find(JsonText::text(log, "log"));
    return found == formats.end() ? kindOf(JsonText::member(log, "row")) : found->second;
}

/// The table of the configuration that a followed log comes from.
void addTable(FactList& facts, const Json& answer) {
    const std::string log = JsonText::text(JsonText::member(answer, "logs").front(), "log");
    for (const Json& table : JsonText::member(answer, "tables")) {
        const Json& files = JsonText::member(table, "files");
        if (std::find(files.begin(), files.end(), log) != files.end()) {
            facts.add("configured by", "[[log]] at line " + JsonText::text(table, "line"));
        }
    }
}

/// The latest bytes that were recovered or lost.
std::string rangesText(const Json& follow, const Terminal& terminal) {
    if (!follow.is_object()) {
        return "";
    }
    Table table({{"TIME", Table::FIXED},
                 {"WHAT", Table::FIXED},
                 {"FROM BYTE", Table::NUMBER},
                 {"TO BYTE", Table::NUMBER},
                 {"FILE", Table::PATH}});
    for (const char* const what : {"recovered", "lost"}) {
        for (const Json& range : JsonText::member(follow, what)) {
            table.add({TimeDisplay::local(JsonText::text(range, "time")), std::string(what),
                       JsonText::text(range, "from"), JsonText::text(range, "to"),
                       JsonText::text(range, "source")});
        }
    }
    return table.empty() ? "" : '\n' + table.text(terminal);
}

std::string rejectedText(const Json& ledger, const Terminal& terminal) {
    Table table({{"TIME", Table::FIXED}, {"REJECTED LINE"}, {"REASON"}});
    for (const Json& line : JsonText::member(ledger, "rejected")) {
        table.add({TimeDisplay::local(JsonText::text(line, "time")), JsonText::text(line, "line"),
                   JsonText::text(line, "reason")});
    }
    return table.empty() ? "" : '\n' + table.text(terminal);
}

std::string shapesText(const Json& ledger, const Terminal& terminal) {
    Table table({{"REJECTED", Table::NUMBER}, {"SHAPE"}});
    for (const Json& shape : JsonText::member(ledger, "shapes")) {
        table.add({JsonText::text(shape, "count"), JsonText::text(shape, "shape")});
    }
    return table.empty() ? "" : '\n' + table.text(terminal);
}

std::string skippedText(const Json& ledger, const Terminal& terminal) {
    Table table({{"TIME", Table::FIXED},
                 {"SKIPPED FROM BYTE", Table::NUMBER},
                 {"TO BYTE", Table::NUMBER},
                 {"UNREAD BEFORE", Table::NUMBER},
                 {"NOTICED", Table::FIXED}});
    for (const Json& range : JsonText::member(ledger, "skipped")) {
        const std::string unread = JsonText::text(range, "unread");
        const bool isRegrown = JsonText::text(range, "regrown") == "true";
        table.add({TimeDisplay::local(JsonText::text(range, "time")), JsonText::text(range, "from"),
                   JsonText::text(range, "to"), unread.empty() ? std::string("unknown") : unread,
                   std::string(isRegrown ? "regrown" : "shorter")});
    }
    return table.empty() ? "" : '\n' + table.text(terminal);
}

void noteConfiguration(const Json& answer) {
    const Json& configuration = JsonText::member(answer, "configuration");
    const std::string problem = JsonText::text(configuration, "problem");
    if (!problem.empty()) {
        Context::note("the log configuration " + JsonText::text(configuration, "file") +
                      " cannot be read: " + problem);
    }
}

/// Says which [[log]] tables match nothing, or not everything that they could.
void noteTables(const Json& answer) {
    for (const Json& table : JsonText::member(answer, "tables")) {
        const std::string name = "[[log]] at line " + JsonText::text(table, "line");
        if (const std::string problem = JsonText::text(table, "problem"); !problem.empty()) {
            Context::note(name + ": " + problem);
        }
        if (JsonText::member(table, "files").empty()) {
            Context::note(name + " matches no file that can be followed");
        }
        for (const Json& one : JsonText::member(table, "passed_over")) {
            Context::note(name + " passes over " + JsonText::text(one, "file") + ": " +
                          JsonText::text(one, "reason"));
        }
    }
}

/// Whether the agent reads the log, and the log has a file and no warnings.
bool isMonitored(const Json& log) {
    const Json& ledger = JsonText::member(log, "ledger");
    if (ledger.is_object() && !JsonText::member(ledger, "warnings").empty()) {
        return false;
    }
    const Json& row = JsonText::member(log, "row");
    const Json& size = JsonText::member(row, "LOGSIZE");
    return JsonText::text(row, "MONSTATUS") == "Running" && size.is_number() &&
           size.get<std::int64_t>() >= 0;
}

/// Whether any configured log is not monitored, or no log is configured.
bool isSomethingWrong(const Json& answer) {
    const Json& logs = JsonText::member(answer, "logs");
    const Json& configuration = JsonText::member(answer, "configuration");
    return logs.empty() || !std::all_of(logs.begin(), logs.end(), isMonitored) ||
           !JsonText::member(answer, "unmonitored").empty() ||
           !JsonText::text(configuration, "problem").empty();
}

void noteWarnings(const Json& answer) {
    for (const Json& log : JsonText::member(answer, "logs")) {
        const Json& ledger = JsonText::member(log, "ledger");
        for (const Json& warning :
             ledger.is_object() ? JsonText::member(ledger, "warnings") : Json()) {
            Context::note(JsonText::text(log, "log") + ": " + JsonText::text(warning, "text"));
        }
    }
}

std::string unmonitoredText(const Json& answer, const Terminal& terminal) {
    Table table({{"NOT MONITORED", Table::PATH}, {"LINE", Table::NUMBER}, {"REASON"}});
    for (const Json& log : JsonText::member(answer, "unmonitored")) {
        table.add({{JsonText::text(log, "log"), Colour::BAD},
                   JsonText::text(log, "line"),
                   JsonText::text(log, "reason")});
    }
    return table.empty() ? "" : table.text(terminal);
}

} // namespace

LogsCommand::LogsCommand(CLI::App& program)
    : m_command(program.add_subcommand("logs", "The monitored logs, or everything about one")) {
    m_command->add_option("LOG", m_log, "The full path of a log");
    m_command->add_flag("--check", m_check, "Exit with status 1 when a log is not monitored");
}

bool LogsCommand::isChosen() const {
    return m_command->parsed();
}

CliStatus LogsCommand::run(Context& context) {
    return m_log.empty() ? list(context) : show(context);
}

CliStatus LogsCommand::outcome(bool isWrong) const {
    return m_check && isWrong ? CliStatus::REFUSED : CliStatus::DONE;
}

CliStatus LogsCommand::list(Context& context) {
    const Json answer = context.client().get("/api/v1/logs");
    const CliStatus status = outcome(isSomethingWrong(answer));
    if (context.options().json) {
        context.printJson(answer);
        return status;
    }
    Table table({{"LOG", Table::PATH},
                 {"TYPE", Table::FIXED},
                 {"STATUS", Table::FIXED},
                 {"ENTRIES", Table::NUMBER},
                 {"ERRORS", Table::NUMBER},
                 {"SIZE", Table::NUMBER},
                 {"CHANGED", Table::FIXED}});
    const std::map<std::string, std::string> formats = formatsOf(answer);
    for (const Json& log : JsonText::member(answer, "logs")) {
        const Json& row = JsonText::member(log, "row");
        table.add({JsonText::text(log, "log"), formatOf(log, formats),
                   statusCell(row, JsonText::member(log, "ledger")),
                   JsonText::text(row, "NUMEVENTS"), countCell(row, "NUMERRORS"), sizeText(row),
                   TimeDisplay::stamp(JsonText::text(row, "LOGMODDATE"))});
    }
    noteConfiguration(answer);
    noteTables(answer);
    noteWarnings(answer);
    const std::string unmonitored = unmonitoredText(answer, context.terminal());
    if (table.empty()) {
        Context::note("the agent does not monitor any log");
        context.print(unmonitored);
        return CliStatus::REFUSED;
    }
    context.print(table.text(context.terminal()) + (unmonitored.empty() ? "" : "\n") + unmonitored);
    return status;
}

CliStatus LogsCommand::show(Context& context) {
    const Json answer = context.client().get("/api/v1/logs", {{"log", m_log}});
    const Json& logs = JsonText::member(answer, "logs");
    if (const Json& unmonitored = JsonText::member(answer, "unmonitored"); !unmonitored.empty()) {
        throw CliError(CliStatus::REFUSED, "the agent does not monitor " + m_log + " (line " +
                                               JsonText::text(unmonitored.front(), "line") +
                                               " of its configuration): " +
                                               JsonText::text(unmonitored.front(), "reason"));
    }
    if (logs.empty()) {
        throw CliError(CliStatus::REFUSED, "the agent does not monitor " + m_log +
                                               "; 'zrmctl logs' lists what it monitors");
    }
    const CliStatus exitStatus = outcome(!isMonitored(logs.front()));
    if (context.options().json) {
        context.printJson(logs.front());
        return exitStatus;
    }
    const Json& row = JsonText::member(logs.front(), "row");
    const Json& ledger = JsonText::member(logs.front(), "ledger");
    const Table::Cell status = statusCell(row, ledger);
    FactList facts;
    facts.add("log", JsonText::text(logs.front(), "log"));
    facts.add("type", formatOf(logs.front(), formatsOf(answer)));
    addTable(facts, answer);
    facts.add("status", status.text, status.colour);
    facts.add("since", TimeDisplay::stamp(JsonText::text(row, "MONTIME")));
    facts.add("size", sizeText(row));
    facts.add("changed", TimeDisplay::stamp(JsonText::text(row, "LOGMODDATE")));
    facts.add("format", JsonText::text(row, "FORMATTER"));
    facts.add("entries", JsonText::text(row, "NUMEVENTS"));
    facts.add("errors", JsonText::text(row, "NUMERRORS"));
    addLedger(facts, ledger);
    const Json& follow = JsonText::member(ledger, "follow");
    addFollowing(facts, follow, isFile(row));
    context.print(facts.text(context.terminal()) + shapesText(ledger, context.terminal()) +
                  rejectedText(ledger, context.terminal()) +
                  skippedText(ledger, context.terminal()) + rangesText(follow, context.terminal()));
    return exitStatus;
}

} // namespace zrm::host
