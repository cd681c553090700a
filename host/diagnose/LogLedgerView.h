#ifndef ZRM_HOST_LOG_LEDGER_VIEW_H
#define ZRM_HOST_LOG_LEDGER_VIEW_H

#include "monitor/FileIdentity.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Something about a log, monitored without an error, that wants an operator's attention.
struct LogWarning {
    std::string kind;   ///< missing, replaced, without_time or not_records
    std::int64_t since; ///< when it was first noticed
    std::string text;   ///< what is wrong and the cure, in sentences
};

/// What the monitor of one log has read and what it has passed over, since the log is monitored,
/// at one moment. A refresh that changes the log's type or procedure begins a new one. Times are
/// in milliseconds since 1970-01-01 UTC.
struct LogLedgerView {
    /// A line that did not fit; its bytes, without the line end.
    struct Rejected {
        std::int64_t time;
        std::string line;
        std::string reason; ///< where it stops fitting and why
    };
    /// What a truncation has kept from the monitor.
    struct Skipped {
        std::int64_t time;
        std::int64_t from; ///< bytes of the present contents
        std::int64_t to;
        std::optional<std::int64_t> unread; ///< bytes of the old contents; none: not known
        bool isRegrown; ///< the file had grown past its old size again before it was noticed
    };

    std::string log;                      ///< the whole path, in UTF-8
    std::string file;                     ///< the same in the process's code page
    std::optional<FileIdentity> openFile; ///< that the monitor reads at present
    char type = 'S';
    std::string procedure; ///< a user log's format
    std::int64_t bytesRead = 0;
    std::int64_t lines = 0;
    std::int64_t rows = 0;
    std::int64_t formatErrors = 0;
    std::int64_t truncations = 0;
    std::int64_t skippedBytes = 0;
    std::int64_t withoutTime = 0; ///< rows
    std::int64_t restarts = 0;    ///< of the monitor
    std::optional<std::int64_t> lastEntry;

    std::vector<LogWarning> warnings; ///< none unless LogWatch was asked

    // The latest, the oldest first. Only of a log that was asked for by name.
    std::vector<Rejected> rejected;
    std::vector<Skipped> skipped;
};

} // namespace zrm::host

#endif
