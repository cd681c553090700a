#ifndef ZRM_CREATE_LOG_FILE_H
#define ZRM_CREATE_LOG_FILE_H

namespace zrm {

class LogFile;
class ValidLog;

/// True when the type letter names a kind of log that can be monitored.
bool isKnownLogType(char type) noexcept;

/// Creates the monitoring object of the log's type, linked behind `chainHead` and with its thread
/// started; null when memory runs out. The type must be known. The caller owns the object.
LogFile* createLogFile(const ValidLog& log, LogFile* chainHead);

} // namespace zrm

#endif
