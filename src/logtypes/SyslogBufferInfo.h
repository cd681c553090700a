#ifndef ZRM_SYSLOG_BUFFER_INFO_H
#define ZRM_SYSLOG_BUFFER_INFO_H

#include "monitor/LogBufferInfo.h"

#include <memory>

namespace zrm {

/// The state of one report on a syslog file.
struct SyslogBufferInfo : _LogBufferInfo {
    /// ENTRYTIME of the last formatted entry, initially the time at which the report started.
    /// Determines the year of the entries before it.
    char timestamp[16];
    std::unique_ptr<char[]> block; ///< owns what pBuffer points to
};

} // namespace zrm

#endif
