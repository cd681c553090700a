#ifndef ZRM_HOST_CONFIG_CHECK_H
#define ZRM_HOST_CONFIG_CHECK_H

#include <cstddef>
#include <functional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Judges the lines of a log configuration as the agent does when it starts on this machine, with
/// the agent's own code, and monitors nothing. Works without an agent; the process's locale and
/// working directory count as the agent's would. Stateless.
class ConfigCheck {
public:
    enum class Verdict {
        ACCEPTED,
        REFUSED,
        IGNORED,
        OUTSIDE, ///< not judged: the file lies in none of the directories given
    };
    /// What has decided against a line.
    enum class Cause {
        NONE,
        TEXT, ///< the line itself
        FILE, ///< the file that it names, as it is at present
    };

    struct Line {
        std::size_t number; ///< counted from 1
        std::string text;   ///< as it stands in the configuration, without its newline
        Verdict verdict;
        std::string log;    ///< the file that it names, where it names one; UTF-8
        std::string reason; ///< the agent's messages, where it has some; also of accepted lines
        Cause cause;
    };

    struct Result {
        std::vector<Line> lines; ///< every line of the text
        std::size_t accepted;
        std::size_t refused;
    };

    /// Judges a log configuration. A user log whose format cannot be learned is refused too: the
    /// agent would list that log, but never read it. Any thread.
    static Result check(std::string_view text);

    /// Directories with their last '/'.
    using Directories = std::set<std::string, std::less<>>;
    /// The same for whoever may not learn which files this machine has: of a line whose file lies
    /// in none of the directories, nothing is looked at.
    static Result check(std::string_view text, const Directories& directories);

    /// Why a log cannot be read from this path, as a sentence without its full stop; empty when it
    /// can. Names no system call: it is meant for people who write configurations.
    static std::string problemOfFile(const std::string& path);

    /// "accepted", "refused", "ignored" or "outside".
    static const char* name(Verdict verdict) noexcept;
    /// "text" or "file"; null for none.
    static const char* name(Cause cause) noexcept;

    /// A result as the JSON object that the API answers.
    static std::string json(const Result& result);
};

} // namespace zrm::host

#endif
