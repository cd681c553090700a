#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/DisplayText.h"
#include "host/cli/EventFollower.h"
#include "host/cli/JsonText.h"
#include "host/cli/StopSignals.h"
#include "host/cli/Table.h"
#include "host/cli/TimeDisplay.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <optional>
#include <system_error>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

constexpr unsigned usualLimit = 100;
constexpr unsigned usualBeforeFollowing = 10;

Colour colourOf(const std::string& severity) {
    if (severity == "critical" || severity == "major") {
        return Colour::BAD;
    }
    return severity == "info" ? Colour::NONE : Colour::NOTICE;
}

std::string logOf(const Json& event) {
    if (!event.contains("row")) {
        return JsonText::text(event, "log");
    }
    const Json& row = JsonText::member(event, "row");
    const std::string name = JsonText::text(row, "ULOGNAME");
    return name.empty() ? JsonText::text(row, "LOGPATH") + JsonText::text(row, "LOGNAME")
                        : JsonText::text(row, "ULOGPATH") + name;
}

/// What an event without an entry says of its episode.
std::string summaryOf(const Json& event) {
    const Json& episode = JsonText::member(event, "episode");
    std::string text = JsonText::text(event, "state");
    if (event.contains("reason")) {
        text += ": " + JsonText::text(event, "reason");
    }
    if (const std::uint64_t count = JsonText::number(episode, "count"); count > 0) {
        text += "; " + std::to_string(count) + (count == 1 ? " entry" : " entries") + " from " +
                TimeDisplay::local(JsonText::text(episode, "first")) + " to " +
                TimeDisplay::local(JsonText::text(episode, "last"));
    }
    return text;
}

/// The text made for the event; or else the values of its group before the text of its entry.
/// Before both, the silence that holds the event back.
std::string entryOf(const Json& event) {
    std::string group;
    if (const std::string silence = JsonText::text(event, "silenced"); !silence.empty()) {
        group = "[silence " + silence + "] ";
    }
    if (const std::string text = JsonText::text(event, "text"); !text.empty()) {
        return group + (JsonText::text(event, "state") == "resolved" ? "Resolved: " : "") + text;
    }
    for (const auto& [name, value] : JsonText::member(event, "group").items()) {
        group += name + '=' + JsonText::text(value) + ' ';
    }
    if (!event.contains("row")) {
        return group + summaryOf(event);
    }
    const Json& row = JsonText::member(event, "row");
    const auto either = [&](const char* utf8, const char* local) {
        const std::string text = JsonText::text(row, utf8);
        return text.empty() ? JsonText::text(row, local) : text;
    };
    const std::string source = either("UENTRYSRC", "ENTRYSRC");
    return group + (source.empty() ? "" : source + ": ") + either("UENTRYDESC", "ENTRYDESC");
}

std::string padded(const std::string& text, std::size_t columns) {
    const std::size_t width = DisplayText::width(text);
    return text + std::string(width < columns ? columns - width : 0, ' ');
}

/// The number of an event; none when it is no such number.
std::optional<std::int64_t> numberOf(const std::string& text) {
    std::int64_t number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end && number >= 0 ? std::optional(number)
                                                              : std::nullopt;
}

std::string problemOfNumber(const std::string& text) {
    return numberOf(text) ? "" : '\'' + text + "' is not the id of an event";
}

/// One event while following: what comes next is not known, so columns have a width of their own.
std::string lineOf(const Json& event, const Terminal& terminal) {
    constexpr std::size_t severityColumns = 8;
    constexpr std::size_t situationColumns = 20;
    const std::string severity = DisplayText::visible(JsonText::text(event, "severity"));
    const std::string head = padded(JsonText::text(event, "id"), 6) + "  " +
                             TimeDisplay::local(JsonText::text(event, "raised")) + "  ";
    const std::string tail =
        padded(DisplayText::visible(JsonText::text(event, "situation")), situationColumns) + "  " +
        DisplayText::visible(entryOf(event));
    const std::size_t before = head.size() + severityColumns + 2;
    const std::size_t room = terminal.width > before ? terminal.width - before : 1;
    return head + terminal.coloured(padded(severity, severityColumns), colourOf(severity)) + "  " +
           (terminal.width > 0 ? DisplayText::shortened(tail, room, terminal.ellipsis()) : tail) +
           '\n';
}

std::string tableText(const Json& events, const Terminal& terminal) {
    Table table({{"ID", Table::NUMBER},
                 {"RAISED", Table::FIXED},
                 {"SEVERITY", Table::FIXED},
                 {"SITUATION"},
                 {"LOG", Table::PATH},
                 {"ENTRY"}});
    for (const Json& event : events) {
        const std::string severity = JsonText::text(event, "severity");
        table.add({JsonText::text(event, "id"),
                   TimeDisplay::local(JsonText::text(event, "raised")),
                   {severity, colourOf(severity)},
                   JsonText::text(event, "situation"),
                   logOf(event),
                   entryOf(event)});
    }
    return table.text(terminal);
}

struct Found {
    Json events = Json::array(); ///< newest first
    std::uint64_t newest = 0;    ///< the newest id of the whole history
};

/// The latest events that the query asks for, at most `limit`. A search for a text takes the
/// agent several requests.
Found find(Context& context, std::multimap<std::string, std::string> query, std::size_t limit) {
    Found found;
    std::uint64_t before = UINT64_MAX;
    for (bool isMore = true; isMore && found.events.size() < limit;) {
        query.erase("limit");
        query.emplace("limit", std::to_string(limit - found.events.size()));
        const Json answer = context.client().get("/api/v1/events", query);
        for (const Json& event : JsonText::member(answer, "events")) {
            found.events.push_back(event);
        }
        for (const Json& id : JsonText::member(answer, "damaged")) {
            Context::note("event " + JsonText::text(id) +
                          " is damaged in the history: its content is not what was written");
        }
        found.newest = std::max(found.newest, JsonText::number(answer, "newest"));
        const std::uint64_t next = JsonText::number(answer, "next");
        isMore = next > 0 && next < before;
        before = next;
        query.erase("before");
        query.emplace("before", std::to_string(next));
    }
    return found;
}

} // namespace

EventsCommand::EventsCommand(CLI::App& program)
    : m_command(program.add_subcommand("events",
                                       "The events that situations have raised; -f follows them")) {
    const auto anyOf = [&](const char* name, std::vector<std::string>& values, const char* type,
                           const char* help) {
        m_command->add_option(name, values, help)->type_name(type)->allow_extra_args(false);
    };
    m_command->add_flag("-f,--follow", m_follow, "Continue with new events until Ctrl-C");
    m_command->add_option("--after", m_after, "Events after this one")
        ->type_name("ID")
        ->check(problemOfNumber);
    m_command->add_option("--before", m_before, "Events before this one")
        ->type_name("ID")
        ->check(problemOfNumber);
    m_command->add_option("--from", m_from, "Raised at this time or later")->type_name("TIME");
    m_command->add_option("--to", m_to, "Raised at this time or earlier")->type_name("TIME");
    anyOf("--situation", m_situations, "NAME", "Of this situation; may be repeated");
    anyOf("--log", m_logs, "LOG", "Of this log; may be repeated");
    anyOf("--severity", m_severities, "SEVERITY", "Of this severity; may be repeated");
    m_command->add_option("--silenced", m_silenced, "true: held back by a silence; false: not")
        ->type_name("true|false")
        ->check(CLI::IsMember({"true", "false"}));
    m_command->add_option("--text", m_text, "Containing this text, in upper or lower case")
        ->type_name("TEXT");
    m_command
        ->add_option("--limit", m_limit, "The number of latest events (default 100; with -f 10)")
        ->type_name("COUNT")
        ->check(CLI::Range(1, 1000));
}

bool EventsCommand::isChosen() const {
    return m_command->parsed();
}

std::multimap<std::string, std::string> EventsCommand::filters() const {
    std::multimap<std::string, std::string> query;
    for (const auto& [name, values] :
         {std::pair("situation", &m_situations), std::pair("log", &m_logs),
          std::pair("severity", &m_severities)}) {
        for (const std::string& value : *values) {
            query.emplace(name, value);
        }
    }
    if (!m_silenced.empty()) {
        query.emplace("silenced", m_silenced);
    }
    if (!m_text.empty()) {
        query.emplace("text", m_text);
    }
    return query;
}

CliStatus EventsCommand::list(Context& context) {
    std::multimap<std::string, std::string> query = filters();
    const auto add = [&](const char* name, const std::string& value) {
        if (!value.empty()) {
            query.emplace(name, value);
        }
    };
    add("after", m_after);
    add("before", m_before);
    add("from", m_from.empty() ? "" : Context::time("--from", m_from));
    add("to", m_to.empty() ? "" : Context::time("--to", m_to));
    Json events = find(context, query, m_limit > 0 ? m_limit : usualLimit).events;
    std::reverse(events.begin(), events.end()); // the newest is next to the prompt
    if (events.empty()) {
        Context::note("no such event");
        return CliStatus::REFUSED;
    }
    if (context.options().json) {
        for (const Json& event : events) {
            context.print(JsonText::dump(event, true) + '\n');
        }
    } else {
        context.print(tableText(events, context.terminal()));
    }
    return CliStatus::DONE;
}

CliStatus EventsCommand::follow(Context& context) {
    if (!m_before.empty() || !m_to.empty()) {
        throw CliError(CliStatus::USAGE,
                       "--before and --to cannot be combined with -f, which has no end");
    }
    StopSignals signals;
    AgentClient& client = context.client();
    std::multimap<std::string, std::string> query = filters();
    const auto show = [&](const Json& event) {
        context.print(context.options().json ? JsonText::dump(event, true) + '\n'
                                             : lineOf(event, context.terminal()));
    };
    std::uint64_t after = 0;
    if (!m_after.empty()) {
        after = static_cast<std::uint64_t>(*numberOf(m_after));
    } else {
        if (!m_from.empty()) {
            query.emplace("from", Context::time("--from", m_from));
        }
        const Found found = find(context, query, m_limit > 0 ? m_limit : usualBeforeFollowing);
        std::for_each(found.events.rbegin(), found.events.rend(), show);
        after = found.newest;
    }
    EventFollower follower(client, filters(), signals, &Context::note);
    follower.follow(after, show);
    return CliStatus::DONE;
}

CliStatus EventsCommand::run(Context& context) {
    return m_follow ? follow(context) : list(context);
}

} // namespace zrm::host
