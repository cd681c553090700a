#include "host/config/Columns.h"

#include <algorithm>
#include <array>

namespace zrm::host {

namespace {

constexpr Column text(std::string_view name, int width) {
    return {name, width, false, false};
}
constexpr Column number(std::string_view name) {
    return {name, 4, true, false};
}
constexpr Column time(std::string_view name) {
    return {name, 16, false, true};
}
constexpr Column utf8(std::string_view name, int width) {
    return {name, width, false, false, true};
}

constexpr std::array logEntries = {
    text("ORIGINNODE", 64), text("LOGPATH", 256),    text("LOGNAME", 128),  time("ENTRYTIME"),
    text("ENTRYSYS", 32),   text("ENTRYSRC", 32),    text("ENTRYTYPE", 16), text("ENTRYCLASS", 16),
    text("ENTRYDESC", 256), number("FREQTHRESH"),    number("PERIODTHRS"),  time("TIMESTAMP"),
    number("SAMPLENO"),     number("ROWNO"),         utf8("ULOGPATH", 768), utf8("ULOGNAME", 384),
    utf8("UENTRYSRC", 96),  utf8("UENTRYDESC", 768),
};

constexpr std::array monitoredLogs = {
    text("ORIGINNODE", 64), text("LOGPATH", 256), text("LOGNAME", 128), text("LOGTYPE", 1),
    text("MONSTATUS", 32),  time("MONTIME"),      number("NUMEVENTS"),  number("NUMERRORS"),
    number("LOGSIZE"),      time("LOGMODDATE"),   text("DEBUGMODE", 1), text("FORMATTER", 256),
    time("TIMESTAMP"),      number("SAMPLENO"),   number("ROWNO"),      utf8("ULOGPATH", 768),
    utf8("ULOGNAME", 384),
};

} // namespace

std::span<const Column> columnsOf(std::string_view table) noexcept {
    if (table == "RMLOGENT") {
        return logEntries;
    }
    if (table == "RMMONLOG") {
        return monitoredLogs;
    }
    return {};
}

const Column* findColumn(std::span<const Column> columns, std::string_view name) noexcept {
    const auto found = std::find_if(columns.begin(), columns.end(),
                                    [&](const Column& column) { return column.name == name; });
    return found == columns.end() ? nullptr : &*found;
}

} // namespace zrm::host
