#include "host/diagnose/TrialLine.h"

#include "host/config/PathPattern.h"
#include "host/events/RowText.h"
#include "host/framework/RowLayout.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdio>

namespace zrm::host {

namespace {

using Row = zrm_rmlogent_data_t;

const std::array<RowColumn, 8>& entryColumns() {
    static const auto* const columns = new std::array<RowColumn, 8>{{
        {"ENTRYTIME", offsetof(Row, entrytime), sizeof Row::entrytime, COLUMN_CHARACTER},
        {"ENTRYSYS", offsetof(Row, entrysys), sizeof Row::entrysys, COLUMN_CHARACTER},
        {"ENTRYSRC", offsetof(Row, entrysrc), sizeof Row::entrysrc, COLUMN_CHARACTER},
        {"ENTRYTYPE", offsetof(Row, entrytype), sizeof Row::entrytype, COLUMN_CHARACTER},
        {"ENTRYCLASS", offsetof(Row, entryclass), sizeof Row::entryclass, COLUMN_CHARACTER},
        {"ENTRYDESC", offsetof(Row, entrydesc), sizeof Row::entrydesc, COLUMN_CHARACTER},
        {"UENTRYSRC", offsetof(Row, uentrysrc), sizeof Row::uentrysrc, COLUMN_UTF8},
        {"UENTRYDESC", offsetof(Row, uentrydesc), sizeof Row::uentrydesc, COLUMN_UTF8},
    }};
    return *columns; // never destroyed: threads outlive main
}

bool isControl(char character) {
    const auto code = static_cast<unsigned char>(character);
    return (code < ' ' && character != '\t') || code == 0x7f;
}

/// A text as a string of TOML: as it is where it can be, else with escapes.
std::string tomlString(std::string_view text) {
    const bool isPlain = text.find('\'') == std::string_view::npos &&
                         std::none_of(text.begin(), text.end(), isControl);
    if (isPlain) {
        return '\'' + std::string(text) + '\'';
    }
    std::string quoted = "\"";
    for (const char character : text) {
        if (isControl(character)) {
            char escape[7];
            std::snprintf(escape, sizeof escape, "\\u%04x",
                          static_cast<unsigned>(static_cast<unsigned char>(character)));
            quoted += escape;
            continue;
        }
        if (character == '"' || character == '\\') {
            quoted += '\\';
        }
        quoted += character;
    }
    return quoted + '"';
}

} // namespace

std::unique_ptr<ValidLog> trialLine(char type, const TableSettings& settings) {
    if (!settings) {
        char line[] = "";
        return std::make_unique<ValidLog>(CONFIG_USER, line, nullptr);
    }
    return std::make_unique<ValidLog>(
        FurtherLog{std::string(FormatTrial::someLog), type, 'N', "", settings});
}

std::vector<std::pair<std::string, std::string>> entryTexts(const zrm_rmlogent_data_t& row) {
    std::vector<std::pair<std::string, std::string>> texts;
    std::string room;
    for (const RowColumn& column : entryColumns()) {
        texts.emplace_back(column.name,
                           RowText::of(column, reinterpret_cast<const char*>(&row), room));
    }
    return texts;
}

std::string tableText(std::string_view log, std::string_view format, std::string_view timezone) {
    std::string text = "[[log]]\npath = " + tomlString(PathPattern::literal(log)) + '\n';
    if (!format.empty()) {
        text += "type = 'text'\nformat = " + tomlString(format) + '\n';
    }
    if (!timezone.empty()) {
        text += "timezone = " + tomlString(timezone) + '\n';
    }
    return text;
}

} // namespace zrm::host
