#ifndef ZRM_ENTRY_CLOCK_H
#define ZRM_ENTRY_CLOCK_H

#include <cstdint>
#include <memory>
#include <optional>

namespace zrm {

struct FollowSettings;

/// What an entry says about its time. Set on the thread that formats the entry.
struct EntryMoment {
    enum class Kind : unsigned char {
        column,  ///< no more than ENTRYTIME shows, in local time
        instant, ///< the time has a zone: `seconds` since 1970-01-01 UTC
        zoned,   ///< a time of the log's `timezone`: `seconds` as of CivilTime
    };

    Kind kind = Kind::column;
    std::int64_t seconds = 0;
};

/// Of the entry that the calling thread formatted last. Each row begins with an empty one.
inline constinit thread_local EntryMoment lastEntryMoment;

/// While it exists, the thread judges an entry of a followed log that was written at this time.
/// Without one, the entry is of a log of the log configuration.
class EntryInstant {
public:
    /// Seconds since 1970-01-01 UTC.
    explicit EntryInstant(std::int64_t seconds) noexcept : m_outer(current) { current = seconds; }
    ~EntryInstant() { current = m_outer; }
    EntryInstant(const EntryInstant&) = delete;
    EntryInstant& operator=(const EntryInstant&) = delete;

    static const std::optional<std::int64_t>& ofThisThread() noexcept { return current; }

private:
    static inline constinit thread_local std::optional<std::int64_t> current;

    const std::optional<std::int64_t> m_outer;
};

/// Gives each entry of a followed log its UTC time, entry by entry, since of a time that the clock
/// shows twice only the entries around it say which one it is. An entry without a readable time has
/// that of the entry before it. One thread.
class EntryClock {
public:
    enum class Reading : unsigned char {
        forward,
        backward, ///< the newest entry first
    };

    explicit EntryClock(std::shared_ptr<const FollowSettings> settings,
                        Reading reading = Reading::forward) noexcept;

    /// The time of the next entry in seconds since 1970-01-01 UTC. `stamp` are the 16 characters of
    /// its ENTRYTIME, which are corrected where they show the wrong one of two times.
    std::int64_t next(const EntryMoment& moment, char* stamp) noexcept;
    /// Whether the time of the last entry could be read.
    bool hadTime() const noexcept { return m_hadTime; }

    /// The earliest and the latest time that the entry can have, whatever is around it. None if its
    /// time cannot be read.
    struct Range {
        std::int64_t earliest;
        std::int64_t latest;
    };
    std::optional<Range> rangeOf(const EntryMoment& moment, const char* stamp) noexcept;

private:
    bool isInMinute(const char* stamp) const noexcept;
    std::int64_t find(const EntryMoment& moment, char* stamp) noexcept;
    void rememberMinute(const char* stamp, std::int64_t time) noexcept;
    std::int64_t choose(const Range& range) const noexcept;

    const std::shared_ptr<const FollowSettings> m_settings;
    const Reading m_reading;
    std::optional<std::int64_t> m_last; ///< time of the entry before
    bool m_hadTime = true;
    // The minute that an entry's column showed last, if each of its seconds has only one time.
    char m_minute[16] = {}; ///< as a stamp
    std::int64_t m_minuteTime = 0;
    // The quarter of an hour in which times were looked up last.
    std::int64_t m_quarter;
    bool m_isZoned = false;
    std::int64_t m_first = 0;  ///< from the clock's time to the first UTC time
    std::int64_t m_second = 0; ///< the same, to the second
};

} // namespace zrm

#endif
