#ifndef ZRM_HOST_TIME_INPUT_H
#define ZRM_HOST_TIME_INPUT_H

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Times as typed on a command line. Stateless.
class TimeInput {
public:
    /// Converts a time to a form that the agent accepts: "now", "today" and "yesterday" (their
    /// midnight, local time), "-90s", "-30m", "-2h", "-7d", "-2w" (before `now`) and "07:30" or
    /// "07:30:15" (of today) become UTC times; ISO 8601 and 16-digit stamps stay as they are. None
    /// for anything else. Any thread.
    static std::optional<std::string> toIso(std::string_view text, std::time_t now);

    /// The accepted forms, for messages and help.
    static constexpr const char* forms = "-2h (s, m, h, d, w), now, today, yesterday, 07:30, "
                                         "2026-11-20, 2026-11-20T07:30:00, optionally with a zone";
};

} // namespace zrm::host

#endif
