#ifndef ZRM_ZONE_TIME_H
#define ZRM_ZONE_TIME_H

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace zrm {

struct ZoneOffset;

/// A date and a time of day, without a zone.
struct CivilTime {
    int year = 1970;
    unsigned month = 1; ///< 1 to 12
    unsigned day = 1;
    unsigned hour = 0;
    unsigned minute = 0;
    unsigned second = 0; ///< up to 60

    /// True if there is such a day and such a time.
    bool isValid() const noexcept;
    /// Seconds from 1970-01-01 00:00:00 to this time, without regard to zones.
    std::int64_t seconds() const noexcept;
    static CivilTime of(std::int64_t seconds) noexcept;
};

/// The times of entries in other zones than the local one. Any thread; takes no lock.
namespace ZoneTime {

/// The difference from UTC that a text begins with: "Z", "+hh:mm", "-hhmm" or "+hh", in seconds.
/// Removes it from the text. None if the text begins with something else.
std::optional<std::int32_t> takeOffset(std::string_view& text) noexcept;

/// The UTC time at which this is the zone's time. A time that occurs twice is the first of the two.
/// Both in seconds; at least one offset.
std::int64_t toUtc(std::int64_t civil, const std::vector<ZoneOffset>& zone) noexcept;

/// The UTC times at which a zone's clock shows one time: two in the hour that the clock repeats.
struct UtcTimes {
    std::int64_t first;
    std::int64_t second; ///< the same as the first if there is only one
};

/// The UTC times, in seconds, at which this is the zone's time. Without offsets, the zone is local
/// time. A time that the clock skips is taken as if it had not been changed yet. Looks offsets up
/// several times, so keep the result.
UtcTimes utcTimes(std::int64_t civil, const std::vector<ZoneOffset>& zone) noexcept;

/// The local time at this UTC time, both in seconds. Asks the C library once in a quarter of an
/// hour of log time.
std::int64_t toLocal(std::int64_t utc) noexcept;

/// Writes the 16 characters of a time stamp. Returns false, and writes nothing, for a year that has
/// none.
bool writeStamp(std::int64_t civil, char* out) noexcept;

/// The time that a stamp shows.
CivilTime ofStamp(const char* stamp) noexcept;

} // namespace ZoneTime

} // namespace zrm

#endif
