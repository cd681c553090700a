#include "host/events/LogPath.h"

#include "host/events/RowText.h"

#include <string_view>

namespace zrm::host {

namespace {

void appendColumn(std::string& text, const RowLayout& layout, const char* row,
                  std::string_view name) {
    if (const RowColumn* const column = layout.find(name)) {
        std::string room;
        text += RowText::of(*column, row, room);
    }
}

} // namespace

void LogPath::append(std::string& text, const RowLayout& layout, const char* row) {
    const std::size_t before = text.size();
    appendColumn(text, layout, row, "ULOGPATH");
    appendColumn(text, layout, row, "ULOGNAME");
    if (text.size() == before) {
        appendColumn(text, layout, row, "LOGPATH");
        appendColumn(text, layout, row, "LOGNAME");
    }
}

std::string LogPath::of(const RowLayout& layout, const char* row) {
    std::string text;
    append(text, layout, row);
    return text;
}

} // namespace zrm::host
