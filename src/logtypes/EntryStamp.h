#ifndef ZRM_ENTRY_STAMP_H
#define ZRM_ENTRY_STAMP_H

#include "logs/EntryClock.h"
#include "logs/EntryFormat.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace zrm {

struct FollowSettings;
struct ZoneOffset;

/// A time of a followed log's entry in local time, and what is known of it.
struct LocalEntryTime {
    EntryMoment moment;
    std::int64_t seconds; ///< as of CivilTime

    /// `civil` is the time that the entry shows, as of CivilTime, `offset` that of its zone from
    /// UTC if it says, and `zone` that of FollowSettings.
    static LocalEntryTime of(std::int64_t civil, const std::optional<std::int32_t>& offset,
                             const std::vector<ZoneOffset>& zone) noexcept;
};

/// Writes ENTRYTIME, in local time, from what the entries of a followed log say of their times.
/// Remembers the minute of the last entry: an entry of the same minute is not converted. One
/// thread.
class EntryStamp {
public:
    explicit EntryStamp(std::shared_ptr<const FollowSettings> settings) noexcept
        : m_settings(std::move(settings)) {}

    /// Writes the 16 characters and sets lastEntryMoment. `newest`, 16 characters, decides the year
    /// of a time without one; null: the clock does. Returns false, and writes nothing, for a time
    /// that ENTRYTIME cannot show.
    bool write(const EntryColumns& entry, const char* newest, char* out) noexcept;
    /// The same for a time of day alone: of the latest day on which it is at most an hour after
    /// `newest`, or after the clock.
    bool writeTimeOfDay(const EntryColumns& entry, const char* newest, char* out) noexcept;

    /// Writes the present time, as that of an entry that says none.
    static void writePresent(char* out) noexcept;

private:
    static constexpr std::size_t stampLength = 16;

    static CivilTime latestTime(const char* newest) noexcept;
    bool isRemembered(const EntryColumns& entry) const noexcept;
    void remember(const EntryColumns& entry, std::int64_t civil) noexcept;

    const std::shared_ptr<const FollowSettings> m_settings;
    bool m_hasMinute = false;
    CivilTime m_minute; ///< as the entry shows it
    std::optional<std::int32_t> m_offset;
    char m_stamp[stampLength] = {}; ///< of the first second of the minute
    EntryMoment m_moment;           ///< the same
};

} // namespace zrm

#endif
