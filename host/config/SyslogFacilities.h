#ifndef ZRM_HOST_SYSLOG_FACILITIES_H
#define ZRM_HOST_SYSLOG_FACILITIES_H

#include <array>
#include <string_view>

namespace zrm::host {

/// The facilities of RFC 5424 by their usual names; the index is the code.
inline constexpr std::array<std::string_view, 24> syslogFacilities = {
    "kern",   "user",   "mail",     "daemon", "auth",   "syslog", "lpr",    "news",
    "uucp",   "cron",   "authpriv", "ftp",    "ntp",    "audit",  "alert",  "clock",
    "local0", "local1", "local2",   "local3", "local4", "local5", "local6", "local7"};

} // namespace zrm::host

#endif
