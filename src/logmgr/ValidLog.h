#ifndef ZRM_VALID_LOG_H
#define ZRM_VALID_LOG_H

#include "logmgr/LogBase.h"

/// Where a line comes from.
enum WhenceConfig : char {
    CONFIG_USER = 'U',    ///< a line of the log configuration file
    CONFIG_DEFAULT = 'D', ///< a line of the syslog configuration file
};

/// One accepted line of the log configuration, or, while isValid() is false, a refused one. Lives
/// on the log manager's chain of valid logs, under its lock, until the monitoring objects are
/// built. Manager thread only.
class ValidLog : public LogBase {
public:
    /// Parses `line` (and modifies it), checks it against the chain that starts at `head` (null for
    /// an empty one) and, when it is valid, joins that chain.
    ValidLog(WhenceConfig whence, char* line, ValidLog* head);
    ValidLog(const ValidLog&) = delete;
    /// Leaves the chain when valid.
    ~ValidLog() override;

    bool isValid() const noexcept { return Valid; }
    /// Replaces each "${@}" by the local file name and stores the result.
    void setLogProcedure(const char* procedure);
    void printSelf() const;

private:
    void extractTokens(char* line);
    void extractFileName(char* line);
    void checkForDups(ValidLog* head);

    bool Valid = true;
};

#endif
