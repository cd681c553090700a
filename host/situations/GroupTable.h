#ifndef ZRM_HOST_GROUP_TABLE_H
#define ZRM_HOST_GROUP_TABLE_H

#include "host/situations/Group.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

#include <boost/container/deque.hpp>
#include <boost/unordered/unordered_flat_set.hpp>

namespace zrm::host {

/// Groups by their keys, at most so many: the one that was used least recently makes room. A group
/// takes about 280 bytes, more if its key is long, and with entries in many different seconds 16 to
/// 64 bytes for each, at most for `secondsPerGroup` of them at a time.
class GroupTable {
public:
    /// Seconds that all groups together may keep, if all are full.
    static constexpr std::size_t mostSeconds = 4'000'000;

    explicit GroupTable(std::size_t most);
    GroupTable(const GroupTable&) = delete;
    GroupTable& operator=(const GroupTable&) = delete;

    /// The group of this key, which is now the one used last; null if there is none.
    Group* find(std::string_view key);

    /// Makes a group, of a key that has none. In a full table it replaces the oldest.
    Group& add(std::string_view key);

    bool isFull() const noexcept { return m_groups.size() >= m_most; }
    /// The group that was used least recently. Only if there is one.
    Group& oldest() noexcept { return m_groups[m_oldest]; }

    std::size_t size() const noexcept { return m_groups.size(); }

    /// Calls `visit` with each group, the one used last first.
    template <typename Visit> void visitAll(const Visit& visit) {
        for (Index index = m_newest; index != none; index = m_places[index].older) {
            visit(m_groups[index]);
        }
    }

private:
    using Index = std::uint32_t; ///< in m_groups
    static constexpr Index none = UINT32_MAX;

    // Groups do not move when others are added.
    using Groups = boost::container::deque<
        Group, std::allocator<Group>,
        boost::container::deque_options_t<boost::container::block_size<64>>>;

    /// What finding a group changes, and what its place in the set depends on. Kept together, apart
    /// from the groups, so that it fits into the processor's cache.
    struct Place {
        std::uint32_t hash;
        Index newer;
        Index older;
    };
    using Places = std::vector<Place>;

    struct Wanted {
        std::uint32_t hash;
        std::string_view key;
    };
    struct Hash {
        using is_transparent = void;
        const Places* places;
        std::size_t operator()(Index index) const noexcept { return (*places)[index].hash; }
        std::size_t operator()(const Wanted& wanted) const noexcept { return wanted.hash; }
    };
    struct Equal {
        using is_transparent = void;
        const Groups* groups;
        bool operator()(Index left, Index right) const noexcept { return left == right; }
        bool operator()(const Wanted& wanted, Index index) const noexcept {
            return (*groups)[index].key() == wanted.key;
        }
        bool operator()(Index index, const Wanted& wanted) const noexcept {
            return (*this)(wanted, index);
        }
    };

    std::uint32_t hashOf(std::string_view key) const noexcept;
    void unlink(Index index) noexcept;
    void linkNewest(Index index) noexcept;

    const std::size_t m_most;
    const std::size_t m_secondsPerGroup;
    const std::uint64_t m_seed; ///< so that nobody can choose keys of the same hash
    Groups m_groups;
    Places m_places; ///< of each group
    Index m_newest = none;
    Index m_oldest = none;
    boost::unordered_flat_set<Index, Hash, Equal> m_byKey;
};

} // namespace zrm::host

#endif
