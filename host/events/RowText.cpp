#include "host/events/RowText.h"

#include "host/base/Utf8.h"
#include "host/framework/CodePages.h"
#include "host/framework/Converter.h"

#include <string_view>

namespace zrm::host {

namespace {

/// No single-byte character needs more bytes in UTF-8, and no longer one needs more per byte.
constexpr std::size_t maxGrowth = 3;

const LOC2_Locale& localCodeSet() {
    const LOC2_Locale* const local = LOC2_GetLocale(0, 0, 0, nullptr);
    return local->codePage == 0 ? *CodePages::byNumber(LOC2_UTF8) : *local;
}

/// The text as valid UTF-8, as RowText::of gives it.
std::string_view inUtf8(std::string_view text, bool isUtf8, std::string& room) {
    if (Utf8::validPrefix(text) == text.size()) {
        return text;
    }
    const LOC2_Locale& utf8 = *CodePages::byNumber(LOC2_UTF8);
    room.resize(text.size() * maxGrowth);
    Converted converted =
        Converter::convert(utf8, room.data(), room.size(), isUtf8 ? utf8 : localCodeSet(), text);
    if (!converted.supported) {
        converted = Converter::convert(utf8, room.data(), room.size(), utf8, text);
    }
    return {room.data(), converted.written};
}

} // namespace

std::string_view RowText::of(const RowColumn& column, const char* row, std::string& room) {
    return inUtf8(column.text(row), column.type == COLUMN_UTF8, room);
}

std::string_view RowText::ofLocal(std::string_view text, std::string& room) {
    return inUtf8(text, false, room);
}

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
