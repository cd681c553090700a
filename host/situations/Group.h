#ifndef ZRM_HOST_GROUP_H
#define ZRM_HOST_GROUP_H

#include "host/events/Episode.h"
#include "host/situations/DistinctValues.h"
#include "tables/EntryWindows.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <boost/container/small_vector.hpp>

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

/// What is known of the entries of one group. Most groups of a busy situation have raised nothing,
/// and an entry of one of many groups costs what it takes to fetch this from memory: three lines of
/// the processor's cache.
class alignas(64) Group {
public:
    /// What a group has once it has raised an event, or where different values are counted.
    struct Extra {
        DistinctValues values;
        std::vector<Episode> episodes;
        std::vector<std::int64_t> events; ///< times whose cooldown may last, newest last
    };

    Group(std::string_view key, std::size_t seconds)
        : m_key(key.begin(), key.end()), m_windows(seconds) {}

    std::string_view key() const noexcept { return {m_key.data(), m_key.size()}; }

    /// Null if there is nothing of it.
    Extra* extra() const noexcept { return m_extra.get(); }
    /// Makes it if need be.
    Extra& makeExtra() {
        if (m_extra == nullptr) {
            m_extra = std::make_unique<Extra>();
        }
        return *m_extra;
    }

    EntryWindows& windows() noexcept { return m_windows; }
    const EntryWindows& windows() const noexcept { return m_windows; }

private:
    static constexpr std::size_t usualKey = 24; ///< bytes; a longer key is kept elsewhere

    boost::container::small_vector<char, usualKey> m_key;
    std::unique_ptr<Extra> m_extra;
    EntryWindows m_windows;
};

} // namespace zrm::host

#endif
