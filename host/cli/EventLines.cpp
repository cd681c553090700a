#include "host/cli/EventLines.h"

#include "host/cli/DisplayText.h"
#include "host/cli/JsonText.h"
#include "host/cli/Table.h"
#include "host/cli/Terminal.h"
#include "host/cli/TimeDisplay.h"

#include <algorithm>
#include <cstddef>
#include <utility>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

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

/// The silence that holds the event back.
std::string silenceOf(const Json& event) {
    const std::string silence = JsonText::text(event, "silenced");
    return silence.empty() ? "" : "[silence " + silence + "] ";
}

std::string groupOf(const Json& event) {
    std::string group;
    for (const auto& [name, value] : JsonText::member(event, "group").items()) {
        group += name + '=' + JsonText::text(value) + ' ';
    }
    return group;
}

/// The text made for the event; or else the values of its group before the text of its entry.
std::string entryOf(const Json& event) {
    if (const std::string text = JsonText::text(event, "text"); !text.empty()) {
        return silenceOf(event) +
               (JsonText::text(event, "state") == "resolved" ? "Resolved: " : "") + text;
    }
    const std::string group = silenceOf(event) + groupOf(event);
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

/// What the line of an episode says beside its own columns: whatever state it has now, its text is
/// the same. The values of its group stand for a text that no entry gives.
std::string descriptionOf(const Json& event) {
    if (const std::string text = JsonText::text(event, "text"); !text.empty()) {
        return silenceOf(event) + text;
    }
    if (event.contains("row")) {
        return entryOf(event);
    }
    const std::string reason = JsonText::text(event, "reason");
    return silenceOf(event) + groupOf(event) + reason;
}

/// "open (5) " or "resolved (74) ".
std::string progressOf(const Json& event) {
    const bool isOpen = JsonText::text(event, "state") != "resolved";
    return std::string(isOpen ? "open (" : "resolved (") +
           JsonText::text(JsonText::member(event, "episode"), "count") + ") ";
}

} // namespace

std::uint64_t EventLines::episodeOf(const Json& event) {
    return JsonText::number(JsonText::member(event, "episode"), "id");
}

Table::Cell EventLines::stateOf(const Json& episode) {
    const std::string state = JsonText::text(episode, "state");
    if (state == "resolved") {
        return {state};
    }
    return JsonText::member(episode, "acknowledged").is_object()
               ? Table::Cell("acknowledged", Colour::NOTICE)
               : Table::Cell("open", Colour::BAD);
}

std::string EventLines::line(const Json& event, const Terminal& terminal, bool isByEpisode) {
    constexpr std::size_t severityColumns = 8;
    constexpr std::size_t situationColumns = 20;
    const std::string severity = DisplayText::visible(JsonText::text(event, "severity"));
    const bool isEpisode = isByEpisode && episodeOf(event) > 0;
    const Json& numbered = isEpisode ? JsonText::member(event, "episode") : event;
    const std::string head = padded(JsonText::text(numbered, "id"), 6) + "  " +
                             TimeDisplay::local(JsonText::text(event, "raised")) + "  ";
    const std::string tail =
        padded(DisplayText::visible(JsonText::text(event, "situation")), situationColumns) + "  " +
        DisplayText::visible(isEpisode ? progressOf(event) + descriptionOf(event) : entryOf(event));
    const std::size_t before = head.size() + severityColumns + 2;
    const std::size_t room = terminal.width > before ? terminal.width - before : 1;
    return head + terminal.coloured(padded(severity, severityColumns), colourOf(severity)) + "  " +
           (terminal.width > 0 ? DisplayText::shortened(tail, room, terminal.ellipsis()) : tail) +
           '\n';
}

std::string EventLines::table(const Json& events, const Terminal& terminal) {
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

std::string EventLines::table(const Json& events, const Episodes& episodes,
                              const Terminal& terminal) {
    if (std::all_of(events.begin(), events.end(),
                    [](const Json& event) { return episodeOf(event) == 0; })) {
        return table(events, terminal);
    }
    Table lines({{"ID", Table::NUMBER},
                 {"RAISED", Table::FIXED},
                 {"STATE", Table::FIXED},
                 {"COUNT", Table::NUMBER},
                 {"SEVERITY", Table::FIXED},
                 {"SITUATION"},
                 {"LOG", Table::PATH},
                 {"ENTRY"}});
    for (const Json& event : events) {
        const std::uint64_t id = episodeOf(event);
        const auto found = episodes.find(id);
        // Of an episode that has expired meanwhile, the event says enough.
        const Json& episode =
            found == episodes.end() ? JsonText::member(event, "episode") : found->second;
        const Json& state = found == episodes.end() ? event : found->second;
        const std::string severity = JsonText::text(event, "severity");
        const bool isEpisode = id > 0;
        lines.add({JsonText::text(isEpisode ? episode : event, "id"),
                   TimeDisplay::local(JsonText::text(isEpisode ? episode : event, "raised")),
                   isEpisode ? stateOf(state) : Table::Cell(""),
                   JsonText::text(isEpisode ? episode : event, "count"),
                   {severity, colourOf(severity)},
                   JsonText::text(event, "situation"),
                   logOf(event),
                   isEpisode ? descriptionOf(event) : entryOf(event)});
    }
    return lines.text(terminal);
}

} // namespace zrm::host
