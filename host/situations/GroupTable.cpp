#include "host/situations/GroupTable.h"

#include <algorithm>

namespace zrm::host {

namespace {

/// A period of a minute and the one before it, which late entries need.
constexpr std::size_t fewestSeconds = 128;

} // namespace

GroupTable::GroupTable(std::size_t most)
    : m_most(std::max<std::size_t>(most, 1)),
      m_secondsPerGroup(
          std::clamp(mostSeconds / m_most, fewestSeconds, EntryWindows::mostSeconds)) {}

Group* GroupTable::find(std::string_view key) {
    if (!m_groups.empty() && m_groups.front().key == key) {
        return &m_groups.front();
    }
    const auto found = m_byKey.find(key);
    if (found == m_byKey.end()) {
        return nullptr;
    }
    m_groups.splice(m_groups.begin(), m_groups, found->second);
    return &m_groups.front();
}

Group& GroupTable::add(std::string_view key) {
    m_groups.emplace_front(key, m_secondsPerGroup);
    m_byKey.emplace(m_groups.front().key, m_groups.begin());
    return m_groups.front();
}

void GroupTable::removeOldest() {
    m_byKey.erase(m_groups.back().key);
    m_groups.pop_back();
}

} // namespace zrm::host
