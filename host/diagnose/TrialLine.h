#ifndef ZRM_HOST_TRIAL_LINE_H
#define ZRM_HOST_TRIAL_LINE_H

#include "host/diagnose/FormatTrial.h"
#include "logs/zrm_rmlogent_data.h"

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {
class ValidLog;
}

// What trials of every kind of log share.

namespace zrm::host {

/// A line of the log configuration that names no log, or a log of a [[log]] table.
std::unique_ptr<ValidLog> trialLine(char type, const TableSettings& settings);

/// The columns of a row that are filled from a line, and their texts.
std::vector<std::pair<std::string, std::string>> entryTexts(const zrm_rmlogent_data_t& row);

/// A [[log]] table in TOML: of a text log with this format, or without one of a syslog file.
std::string tableText(std::string_view log, std::string_view format, std::string_view timezone);

} // namespace zrm::host

#endif
