#include "host/events/EventJson.h"

#include "host/events/RowJson.h"
#include "host/events/RowText.h"

#include <charconv>
#include <cstdio>
#include <ctime>
#include <utility>

namespace {

/// UTC with milliseconds: 2026-11-20T07:03:09.412Z.
void appendTime(std::string& text, std::int64_t milliseconds) {
    const auto seconds = static_cast<std::time_t>(milliseconds / 1000);
    std::tm utc{};
    gmtime_r(&seconds, &utc);
    char buffer[96];
    const int length = std::snprintf(buffer, sizeof buffer, "%04d-%02d-%02dT%02d:%02d:%02d.%03dZ",
                                     utc.tm_year + 1900, utc.tm_mon + 1, utc.tm_mday, utc.tm_hour,
                                     utc.tm_min, utc.tm_sec, static_cast<int>(milliseconds % 1000));
    text.append(buffer, static_cast<std::size_t>(length));
}

void appendNumber(std::string& text, std::uint64_t number) {
    char buffer[24];
    const auto [end, error] = std::to_chars(buffer, buffer + sizeof buffer, number);
    text.append(buffer, end);
}

} // namespace

EventJson::EventJson(RowLayout layout) : m_layout(std::move(layout)) {}

void EventJson::append(std::string& text, const Event& event) const {
    text += "{\"id\":";
    appendNumber(text, event.id);
    text += ",\"situation\":";
    RowJson::appendText(text, event.situation->name);
    text += ",\"severity\":";
    RowJson::appendText(text, event.situation->severity);
    text += ",\"raised\":\"";
    appendTime(text, event.raised);
    text += "\",\"row\":";
    RowJson::append(text, m_layout, event.row);
    text += '}';
}

void EventJson::appendColumn(std::string& text, const Event& event, std::string_view name) const {
    if (const RowColumn* const column = m_layout.find(name)) {
        std::string room;
        text += RowText::of(*column, event.row, room);
    }
}

void EventJson::appendLog(std::string& text, const Event& event) const {
    const std::size_t before = text.size();
    appendColumn(text, event, "ULOGPATH");
    appendColumn(text, event, "ULOGNAME");
    if (text.size() == before) {
        appendColumn(text, event, "LOGPATH");
        appendColumn(text, event, "LOGNAME");
    }
}
