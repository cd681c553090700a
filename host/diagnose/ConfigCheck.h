#ifndef ZRM_HOST_CONFIG_CHECK_H
#define ZRM_HOST_CONFIG_CHECK_H

#include "host/base/Result.h"

#include <cstddef>
#include <functional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Checks the lines of a log configuration as the agent does when it starts on this machine, with
/// the agent's own code, but monitors nothing. Works without a running agent; the process's locale
/// and working directory apply as the agent's would. Stateless.
class ConfigCheck {
public:
    enum class Verdict {
        ACCEPTED,
        REFUSED,
        IGNORED,
        OUTSIDE, ///< not checked: the file is in none of the given directories
    };
    /// The reason for the verdict on a line.
    enum class Cause {
        NONE,
        TEXT, ///< the line itself
        FILE, ///< the current state of the file that it names
    };

    struct Line {
        std::size_t number; ///< counted from 1
        std::string text;   ///< as in the configuration, without its newline
        Verdict verdict;
        std::string log;    ///< the file that it names, if any; UTF-8
        std::string reason; ///< the agent's messages, if any, also for accepted lines
        Cause cause;
    };

    struct Result {
        std::vector<Line> lines; ///< all lines of the text
        std::size_t accepted;
        std::size_t refused;
    };

    /// Checks a log configuration. A user log with an invalid format is refused, too: the agent
    /// would list that log, but never read it. Any thread.
    static Result check(std::string_view text);

    /// Directories with their last '/'.
    using Directories = std::set<std::string, std::less<>>;
    /// The same for callers who must not learn which files exist on this machine: a line whose file
    /// is in none of the directories is not checked at all.
    static Result check(std::string_view text, const Directories& directories);

    /// Whether a log can be read from this path. A problem is a sentence without its full stop and
    /// names no system call, since it is meant for authors of configurations.
    static zrm::host::Result<void> checkFile(const std::string& path);

    /// "accepted", "refused", "ignored" or "outside".
    static const char* name(Verdict verdict) noexcept;
    /// "text" or "file"; null for none.
    static const char* name(Cause cause) noexcept;

    /// A result as the JSON object that the API returns.
    static std::string json(const Result& result);
};

} // namespace zrm::host

#endif
