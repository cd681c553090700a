#ifndef ZRM_HOST_FOUND_LOGS_H
#define ZRM_HOST_FOUND_LOGS_H

#include "logs/FurtherLogs.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

class JsonWriter;

/// What one look at the file system finds for the [[log]] tables.
struct FoundLogs {
    /// A file that a glob matches, or a path that is named, and that is not followed.
    struct PassedOver {
        std::string file;
        std::string reason; ///< a sentence without its full stop
    };
    /// One table.
    struct Source {
        unsigned line = 0;                  ///< in the configuration
        std::string format;                 ///< LogConfig::formatName
        std::vector<std::string> paths;     ///< as configured
        std::vector<std::string> files;     ///< that are followed
        std::vector<PassedOver> passedOver; ///< the first mostPassedOver
        std::size_t passedOverCount = 0;
        std::string problem; ///< why the look is incomplete, without a full stop; empty if complete

        /// Counts a file that is not followed, and keeps one of the first.
        void passOver(std::string file, std::string reason);
        /// Whether the file is among those that are followed, or those passed over that are kept.
        bool mentions(std::string_view file) const;
        /// Writes the table as an object.
        void write(JsonWriter& json) const;
    };
    static constexpr std::size_t mostPassedOver = 100;

    /// The tables as they are followed beside a log configuration that names these files: its
    /// lines apply, and the tables pass over the files.
    std::vector<Source> sourcesBeside(const std::set<std::string>& configured) const;

    /// Files that were followed under other names, and the names of logs that they have now.
    std::map<std::pair<std::uint64_t, std::uint64_t>, std::string> renamed; ///< by device and inode
    std::vector<Source> sources; ///< in the order of the configuration
    FurtherLogs::List logs;
};

} // namespace zrm::host

#endif
