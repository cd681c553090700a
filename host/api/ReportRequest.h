#ifndef ZRM_HOST_REPORT_REQUEST_H
#define ZRM_HOST_REPORT_REQUEST_H

#include "host/framework/Condition.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// What a report is asked for.
struct ReportRequest {
    std::string log;  ///< whole path
    std::string from; ///< 16-character time stamp, as `to`
    std::string to;
    std::vector<Condition> conditions; ///< all of it, as the agent takes it

    /// Reads {"log", "from", "to", "where": [condition, ..]}; without `to`, up to the newest
    /// entry.
    /// Throws RequestRefused.
    static ReportRequest parse(std::string_view body);
};

} // namespace zrm::host

#endif
