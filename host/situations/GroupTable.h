#ifndef ZRM_HOST_GROUP_TABLE_H
#define ZRM_HOST_GROUP_TABLE_H

#include "host/events/Episode.h"
#include "host/situations/DistinctValues.h"
#include "tables/EntryWindows.h"

#include <cstddef>
#include <cstdint>
#include <list>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace zrm::host {

/// A time in which a situation lasts for a group. Times are entries' own, in seconds since 1970.
struct Episode {
    std::shared_ptr<EpisodeId> id = std::make_shared<EpisodeId>();
    std::int64_t first = 0;
    std::int64_t last = 0;
    std::uint64_t count = 0;                                ///< entries
    std::vector<std::shared_ptr<GrowingShare>> shares = {}; ///< one per log
    std::uint64_t used = 0;                                 ///< number of its last entry

    // For the caller, who knows the clock and the event; the judge does not look at them.
    std::string log = {};                ///< full path of the log that raised it
    std::string node = {};               ///< as the rows have it in ORIGINNODE
    std::vector<GroupValue> values = {}; ///< of the entry that raised it, for the text of its end
    std::int64_t cap = 0;                ///< no later time counts as its last entry's; 0: none
};

/// An episode that has ended.
struct EndedEpisode {
    Episode episode;
    std::string group;      ///< its key
    bool isDropped = false; ///< its group made room for others
};

/// What is known of the entries of one group.
struct Group {
    explicit Group(std::string_view name, std::size_t seconds) : key(name), windows(seconds) {}

    const std::string key;
    EntryWindows windows;
    std::unique_ptr<DistinctValues> values; ///< null until one is counted
    std::vector<Episode> episodes;
    std::vector<std::int64_t> raised; ///< times of events whose cooldown may last, newest last
    std::uint64_t entries = 0;
};

/// Groups by their keys, at most so many: the one that was used least recently makes room. An idle
/// group takes about 400 bytes and its key; one with entries in many different seconds 16 bytes for
/// each, at most for `secondsPerGroup` of them.
class GroupTable {
public:
    /// Seconds that all groups together may keep, if all are full.
    static constexpr std::size_t mostSeconds = 4'000'000;

    explicit GroupTable(std::size_t most);

    /// The group of this key; null if there is none.
    Group* find(std::string_view key);

    /// Makes a new group, of a key that has none. Only if the table is not full.
    Group& add(std::string_view key);

    bool isFull() const noexcept { return m_groups.size() >= m_most; }
    /// The group that was used least recently. Only if there is one.
    Group& oldest() noexcept { return m_groups.back(); }
    void removeOldest();

    std::size_t size() const noexcept { return m_groups.size(); }
    std::list<Group>& all() noexcept { return m_groups; }

private:
    const std::size_t m_most;
    const std::size_t m_secondsPerGroup;
    std::list<Group> m_groups; ///< the one used last first
    std::unordered_map<std::string_view, std::list<Group>::iterator> m_byKey;
};

} // namespace zrm::host

#endif
