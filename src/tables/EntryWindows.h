#ifndef ZRM_ENTRY_WINDOWS_H
#define ZRM_ENTRY_WINDOWS_H

#include <cstddef>
#include <cstdint>
#include <vector>

namespace zrm {

/// The times of a situation's entries in followed logs, counted within the situation's period by
/// these times alone; the clock plays no part. Times may come in any order: late lines, several
/// logs, a clock that was set back or is wrong. Times further apart than the period form groups of
/// their own, so that none hides the others; the groups used last are kept.
///
/// Memory does not grow with the number of entries: a group keeps how many there are in each
/// second, and once it has `mostSeconds` of them, in each two seconds, four, and so on. The table
/// manager's lock guards a situation's times.
class EntryWindows {
public:
    static constexpr std::size_t mostGroups = 8;
    static constexpr std::size_t mostSeconds = 16'384; ///< with entries, per group

    /// Keeps at most so many seconds per group, and no more than `mostSeconds`.
    explicit EntryWindows(std::size_t seconds = mostSeconds) noexcept
        : m_mostSeconds(static_cast<std::uint32_t>(seconds < mostSeconds ? seconds : mostSeconds)) {
    }

    /// Adds an entry's time. Returns the number of entries in the period (time - period, time] or
    /// in the one that ends with the newest entry of its group, whichever is larger. Both in
    /// seconds; times are at most 2^40 away from 0.
    std::int64_t add(std::int64_t time, std::int64_t period);

    struct Counted {
        std::int64_t entries = 0;
        std::int64_t first = 0; ///< the time of the first of them
    };
    /// What add has just counted for this time.
    Counted counted(std::int64_t time, std::int64_t period) const noexcept;

    /// The entries that were added of the period (time - period, time].
    Counted within(std::int64_t time, std::int64_t period) const noexcept;

    /// Whether no entry from this time on would be counted together with one that was added.
    bool isOver(std::int64_t time, std::int64_t period) const noexcept;

private:
    /// Entries of which each is less than the period away from the newest one, at the time when it
    /// was added.
    class Group {
    public:
        void begin(std::int64_t time);
        bool isEmpty() const noexcept { return m_seconds.empty(); }
        bool takes(std::int64_t time, std::int64_t period) const noexcept {
            return time > m_newest - period && time < m_newest + period;
        }
        /// The same as EntryWindows::add, of a time that it takes.
        std::int64_t add(std::int64_t time, std::int64_t period, std::size_t mostSeconds);
        /// How many entries there are in the period that ends with this time, and the first.
        Counted within(std::int64_t time, std::int64_t period) const noexcept;
        std::int64_t newest() const noexcept { return m_newest; }
        std::int64_t count() const noexcept { return m_count; }

        std::uint64_t used = 0; ///< number of the last addition

    private:
        /// Usually one second; several in a group that is full.
        struct Second {
            std::int64_t time; ///< the latest that was added
            std::int64_t entries;
        };
        using Seconds = std::vector<Second>;

        bool isSameSecond(std::int64_t left, std::int64_t right) const noexcept;
        void addTo(Second& second, std::int64_t time, std::int64_t period);
        void addNewest(std::int64_t time, std::int64_t period);
        void passOver(std::int64_t until);
        std::int64_t addLate(std::int64_t time, std::int64_t period);
        void forget(std::int64_t until);
        void widen(std::size_t mostSeconds);
        void findBegin(std::int64_t period);

        Seconds m_seconds;         ///< oldest first, twice the period
        std::uint32_t m_gone = 0;  ///< at the front: forgotten, and soon removed
        std::uint32_t m_begin = 0; ///< the first within the period that ends with the newest
        std::int64_t m_count = 0;  ///< entries from there on
        std::int64_t m_newest = 0; ///< time
        /// Of those that m_count counts none is earlier. While this is within the period, an entry
        /// is added without a look at the seconds, which are rarely in the processor's cache.
        std::int64_t m_earliest = 0;
        int m_width = 0; ///< of a second: the power of two
    };

    std::size_t groups() const noexcept { return m_first.isEmpty() ? 0 : 1 + m_others.size(); }
    const Group& group(std::size_t index) const noexcept {
        return index == 0 ? m_first : m_others[index - 1];
    }
    Group& group(std::size_t index) noexcept { return index == 0 ? m_first : m_others[index - 1]; }
    Group& spareGroup();
    void joinAt(std::int64_t newest);

    Group m_first; ///< nearly always the only one, so it is kept here
    std::vector<Group> m_others;
    std::uint64_t m_additions = 0;
    std::uint32_t m_mostSeconds;
};

} // namespace zrm

#endif
