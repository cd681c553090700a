#include "host/situations/GroupTable.h"

#include <algorithm>
#include <random>

#include <xxhash.h>

namespace zrm::host {

namespace {

/// A period of a minute and the one before it, which late entries need.
constexpr std::size_t fewestSeconds = 128;

} // namespace

GroupTable::GroupTable(std::size_t most)
    : m_most(std::max<std::size_t>(most, 1)),
      m_secondsPerGroup(std::clamp(mostSeconds / m_most, fewestSeconds, EntryWindows::mostSeconds)),
      m_seed(std::random_device()()), m_byKey(0, Hash{&m_places}, Equal{&m_groups}) {}

std::uint32_t GroupTable::hashOf(std::string_view key) const noexcept {
    return static_cast<std::uint32_t>(XXH3_64bits_withSeed(key.data(), key.size(), m_seed));
}

Group* GroupTable::find(std::string_view key) {
    if (m_newest != none && m_groups[m_newest].key() == key) {
        return &m_groups[m_newest];
    }
    const auto found = m_byKey.find(Wanted{hashOf(key), key});
    if (found == m_byKey.end()) {
        return nullptr;
    }
    const Index index = *found;
    unlink(index);
    linkNewest(index);
    return &m_groups[index];
}

Group& GroupTable::add(std::string_view key) {
    Index index = static_cast<Index>(m_groups.size());
    if (isFull()) {
        index = m_oldest;
        m_byKey.erase(index);
        unlink(index);
        m_groups[index] = Group(key, m_secondsPerGroup);
    } else {
        m_groups.emplace_back(key, m_secondsPerGroup);
        m_places.emplace_back();
    }
    m_places[index].hash = hashOf(key);
    m_byKey.insert(index);
    linkNewest(index);
    return m_groups[index];
}

void GroupTable::unlink(Index index) noexcept {
    const Place& place = m_places[index];
    (place.newer == none ? m_newest : m_places[place.newer].older) = place.older;
    (place.older == none ? m_oldest : m_places[place.older].newer) = place.newer;
}

void GroupTable::linkNewest(Index index) noexcept {
    m_places[index].newer = none;
    m_places[index].older = m_newest;
    (m_newest == none ? m_oldest : m_places[m_newest].newer) = index;
    m_newest = index;
}

} // namespace zrm::host
