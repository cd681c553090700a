#ifndef ZRM_HOST_NAMED_SOURCES_H
#define ZRM_HOST_NAMED_SOURCES_H

#include "host/config/LogConfig.h"
#include "host/sources/FoundLogs.h"

#include <vector>

namespace zrm::host {

/// Adds the logs of tables whose entries do not come from files, each under its name. `found` has
/// the tables.
void addNamedSources(const std::vector<LogConfig>& logs, FoundLogs& found);

} // namespace zrm::host

#endif
