#ifndef ZRM_HOST_TIME_PATTERN_H
#define ZRM_HOST_TIME_PATTERN_H

#include "host/base/Result.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string>
#include <string_view>

namespace zrm::host {

/// Reads the times of a log's entries. Not changed after it was made; any thread. Reading allocates
/// nothing and does not ask the locale.
class TimePattern {
public:
    /// A pattern of strftime's directives (with %f for a fraction, %s for seconds since 1970, %z
    /// for any way to write an offset), or the name of a common form: "iso8601", "epoch" (of
    /// seconds, milliseconds, microseconds or nanoseconds, told apart by size), "auto" (whichever
    /// common form fits), "day-first", "month-first", "year-first" (the same, but for the order of
    /// dates such as 03/04/26). An empty text stands for "auto".
    static Result<std::shared_ptr<const TimePattern>> compile(const std::string& pattern);
    /// "auto".
    static std::shared_ptr<const TimePattern> common();

    TimePattern(const TimePattern&) = delete;
    TimePattern& operator=(const TimePattern&) = delete;
    virtual ~TimePattern() = default;

    /// Sets the time of the columns, or the time of day if there is no date, from a text that is
    /// nothing but the time. Returns false, and leaves the columns alone, if the text is not such a
    /// time.
    virtual bool read(std::string_view text, EntryColumns& columns) const noexcept = 0;

    /// True if times of the shape of IsoShape, with whatever fraction, are read as such.
    virtual bool readsIso() const noexcept { return false; }

protected:
    TimePattern() = default;
};

/// Reads times by a pattern and remembers the last one, since entries often come in the same
/// second, of which the fraction does not matter. One thread.
class TimeMemo {
public:
    explicit TimeMemo(std::shared_ptr<const TimePattern> pattern) noexcept;

    /// As TimePattern::read().
    bool read(std::string_view text, EntryColumns& columns) noexcept;

private:
    bool isRemembered(std::string_view text) const noexcept;

    const std::shared_ptr<const TimePattern> m_pattern;
    char m_text[48]{}; ///< longer texts are not remembered
    std::size_t m_length = 0;
    std::size_t m_fraction =
        0;                  ///< where the digits of the fraction begin; the length if it has none
    EntryColumns m_columns; ///< of which the time counts
};

} // namespace zrm::host

#endif
