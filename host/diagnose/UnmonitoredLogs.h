#ifndef ZRM_HOST_UNMONITORED_LOGS_H
#define ZRM_HOST_UNMONITORED_LOGS_H

#include "host/base/Result.h"

#include <cstddef>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class JsonWriter;

/// Finds the logs that the log configuration names and the agent does not monitor. The agent skips
/// a line that it cannot use, and its tables have no row for it; the operator wants to see it all
/// the same. Stateless.
class UnmonitoredLogs {
public:
    struct Log {
        std::string log; ///< as named in the configuration, so not always a full path
        std::size_t line;
        std::string reason;
        const char* cause; ///< "file", "text", or "refresh" when only that is missing; "touch":
                           ///< and a refresh would take the configuration for unchanged

        /// Writes the object that the API answers.
        void write(JsonWriter& json) const;
    };

    struct Result {
        std::string file;               ///< the log configuration; empty when none is set
        std::optional<Problem> problem; ///< why it cannot be read
        std::vector<Log> logs;          ///< in the order of its lines, each once

        /// Writes the file and its problem as the API answers them; null where nothing is set.
        void writeConfiguration(JsonWriter& json) const;
    };

    /// The configuration of this process as it is now, against the logs that its agent monitors.
    /// Any thread, while the agent runs.
    static Result read();

    /// The logs that a configuration's text names and that are not among `monitored`, which are
    /// local names. Any thread.
    /// `isTakenOver`: a refresh would take the configuration for unchanged.
    static std::vector<Log> find(std::string_view text, const std::set<std::string>& monitored,
                                 bool isTakenOver = false);
};

} // namespace zrm::host

#endif
