#ifndef ZRM_CREATE_LOG_FILE_H
#define ZRM_CREATE_LOG_FILE_H

namespace zrm {

class LogFile;
class ValidLog;

/// True if the type letter denotes a kind of log that can be monitored.
bool isKnownLogType(char type) noexcept;

/// Creates the monitoring object for the log's type, links it after `chainHead` and starts its
/// thread. Returns null if memory runs out. The type must be known. The caller owns the object.
LogFile* createLogFile(const ValidLog& log, LogFile* chainHead);

} // namespace zrm

#endif
