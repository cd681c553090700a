#ifndef ZRM_HOST_LOG_RHYTHM_H
#define ZRM_HOST_LOG_RHYTHM_H

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// The longest silence of a log that touched an hour.
struct SilentHour {
    std::int64_t hour = 0;    ///< since 1970, of local time
    std::int64_t silence = 0; ///< seconds, including what was before and after the hour
    bool operator==(const SilentHour&) const = default;
};

/// The same with the log's path.
struct LogSilence {
    std::string log;
    SilentHour hour;
    bool operator==(const LogSilence&) const = default;
};

/// How long a log is usually silent in each hour of the week, learned from the weeks before. Times
/// are seconds since 1970 of local time, since people and their machines live by it. One thread.
class LogRhythm {
public:
    static constexpr std::int64_t weeksKept = 5;
    /// No log is called quiet sooner.
    static constexpr std::chrono::seconds shortestLimit{600};

    explicit LogRhythm(const std::vector<SilentHour>& kept = {});

    /// The log had no entries between these times, and then had one.
    void add(std::int64_t from, std::int64_t to);

    /// How long a silence may last at this time: twice as long as it lasted in this hour of the
    /// week or one beside it. Of three weeks or more, the one with the longest silence does not
    /// count: it may have been a failure. None while a week has not passed, or if no agent has run
    /// in these hours.
    std::optional<std::chrono::seconds> limitAt(std::int64_t now) const;

    /// The hours that have changed since the last call.
    std::vector<SilentHour> takeChanged();

private:
    void forgetBefore(std::int64_t hour);

    std::map<std::int64_t, std::int64_t> m_silences; ///< by hour
    std::map<std::int64_t, std::int64_t> m_changed;
};

} // namespace zrm::host

#endif
