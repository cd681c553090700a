#include "host/events/EventJson.h"

#include "host/base/TimeText.h"
#include "host/events/RowJson.h"
#include "host/events/RowText.h"

#include <charconv>
#include <utility>

namespace zrm::host {

namespace {

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
    UtcTime::append(text, event.raised);
    text += "\",\"row\":";
    RowJson::append(text, m_layout, event.row);
    text += '}';
}

void EventJson::appendLog(std::string& text, const Event& event) const {
    LogPath::append(text, m_layout, event.row);
}

} // namespace zrm::host
