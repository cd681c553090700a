#include "host/diagnose/TrialLine.h"

#include "host/config/PathPattern.h"
#include "host/diagnose/TomlText.h"
#include "host/events/RowText.h"
#include "host/framework/RowLayout.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"

#include <array>
#include <cstddef>

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
    std::string text = "[[log]]\npath = " + TomlText::quoted(PathPattern::literal(log)) + '\n';
    if (!format.empty()) {
        text += "type = 'text'\nformat = " + TomlText::quoted(format) + '\n';
    }
    if (!timezone.empty()) {
        text += "timezone = " + TomlText::quoted(timezone) + '\n';
    }
    return text;
}

} // namespace zrm::host
