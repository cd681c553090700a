#ifndef ZRM_HOST_SOURCE_CONFIG_H
#define ZRM_HOST_SOURCE_CONFIG_H

#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

constexpr std::size_t longestSourceName = 64; ///< bytes

/// Whether a log that is not a file may have this name. It can be no path, and no file name with an
/// extension.
bool isSourceName(std::string_view name) noexcept;

/// The keys of a [[log]] of type "journal".
struct JournalConfig {
    static constexpr int leastPriority = 7; ///< debug: everything

    std::string directory; ///< of journal files; empty: this machine's journal
    /// Names of units, with their types, or globs of them. Empty: all.
    std::vector<std::string> units;
    std::vector<std::string> identifiers; ///< of which one must be the entry's; empty: all
    int priority = leastPriority;         ///< entries of this priority and more urgent ones
    bool isCurrentBoot = false;           ///< entries of this boot only

    bool operator==(const JournalConfig&) const = default;
};

/// The keys of a [[log]] of type "command".
struct CommandConfig {
    static constexpr std::chrono::seconds longestPause{60};

    std::vector<std::string> arguments; ///< the program and its arguments
    /// The pause before the command is started again, which doubles up to the longest. None: it is
    /// started once.
    std::chrono::seconds pause{1};
    bool restarts = true;

    bool operator==(const CommandConfig&) const = default;
};

} // namespace zrm::host

#endif
