#ifndef ZRM_HOST_FOUND_LOGS_JSON_H
#define ZRM_HOST_FOUND_LOGS_JSON_H

#include "host/sources/LogFinder.h"

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// What was found for each [[log]] table, as a JSON list. Names of files may hold any bytes: write
/// it with replacement of what is not UTF-8.
nlohmann::ordered_json foundLogsJson(const FoundLogs& found);

} // namespace zrm::host

#endif
