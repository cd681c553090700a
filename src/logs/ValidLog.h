#ifndef ZRM_VALID_LOG_H
#define ZRM_VALID_LOG_H

#include "logs/LogBase.h"

namespace zrm {

class TraceScope;
struct FurtherLog;

/// The source of a configuration line.
enum WhenceConfig : char {
    CONFIG_USER = 'U',    ///< log configuration file
    CONFIG_DEFAULT = 'D', ///< syslog configuration file
};

/// One accepted line of the log configuration, or a rejected one if isValid() is false. Stays on
/// the log manager's chain of valid logs until the monitoring objects have been built. Also a log
/// that the framework configures. Manager thread only.
class ValidLog : public LogBase {
public:
    /// Parses `line` (which it modifies) and checks it against the chain that starts at `head`
    /// (null: empty). A valid line joins that chain.
    ValidLog(WhenceConfig whence, char* line, ValidLog* head);
    /// A log that the framework configures; on no chain. The file need not exist. Invalid if the
    /// name is not absolute or a conversion between code pages does not keep it.
    explicit ValidLog(const FurtherLog& log);
    ValidLog(const ValidLog&) = delete;
    /// Leaves the chain if valid.
    ~ValidLog() override;

    bool isValid() const noexcept { return Valid; }
    /// Replaces each "${@}" with the local file name and stores the result. Ends the process if
    /// memory runs out.
    void setLogProcedure(const char* procedure);
    /// Writes the records of LogBase and of this class, whatever the trace level.
    void printSelf() const;

    ValidLog* next() const noexcept { return static_cast<ValidLog*>(Next); }
    ValidLog* prev() const noexcept { return static_cast<ValidLog*>(Prev); }

private:
    /// Parses a line of the log configuration file: name ;debug ;type ;procedure.
    void extractTokens(char* line);
    /// Parses a line of the syslog configuration file: selector, action.
    void extractFileName(char* line);
    /// Rejects this line if its log is already on the chain.
    void checkForDups(const ValidLog* head);

    bool hasSeparatorAsNeeded(const TraceScope& trace, int field, const char* token) const;
    // The fields of a configuration line. A rejected line clears Valid.
    void takeFileName(const TraceScope& trace, const char* token);
    bool isNameUsable(const TraceScope& trace, int isUTF8) const;
    void takeField(const TraceScope& trace, int field, const char* token);
    void takeType(const TraceScope& trace, const char* token);
    void takeProcedure(const TraceScope& trace, const char* procedure);
    bool isErrorLogSystem(const TraceScope& trace) const;

    bool Valid = true;
};

} // namespace zrm

#endif
