#include "host/situations/AbsenceJudge.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace zrm::host {

AbsenceJudge::AbsenceJudge(std::int64_t limit, std::size_t mostGroups)
    : m_limit(limit), m_most(std::max<std::size_t>(mostGroups, 1)) {}

AbsenceJudge::Group& AbsenceJudge::came(std::string_view key, std::int64_t time,
                                        std::vector<Group>& dropped) {
    const auto found = m_byKey.find(key);
    if (found == m_byKey.end()) {
        expect({.key = std::string(key), .seen = time}, dropped);
        return m_present.front();
    }
    auto& [at, isAbsent] = found->second;
    m_present.splice(m_present.begin(), isAbsent ? m_absent : m_present, at);
    isAbsent = false;
    at->seen = time;
    return *at;
}

void AbsenceJudge::expect(Group group, std::vector<Group>& dropped) {
    if (m_byKey.size() >= m_most) {
        makeRoom(dropped);
    }
    const bool isAbsent = group.absence != nullptr;
    std::list<Group>& groups = isAbsent ? m_absent : m_present;
    groups.push_front(std::move(group));
    m_byKey.emplace(groups.front().key, Place{groups.begin(), isAbsent});
}

void AbsenceJudge::makeRoom(std::vector<Group>& dropped) {
    std::list<Group>& groups = m_absent.empty() ? m_present : m_absent;
    ++m_dropped;
    m_byKey.erase(groups.back().key);
    dropped.push_back(std::move(groups.back()));
    groups.pop_back();
}

std::int64_t AbsenceJudge::nextDue() const noexcept {
    return m_present.empty() ? std::numeric_limits<std::int64_t>::max()
                             : m_present.back().seen + m_limit;
}

AbsenceJudge::Group* AbsenceJudge::takeDue(std::int64_t time) {
    if (m_present.empty() || nextDue() > time) {
        return nullptr;
    }
    m_absent.splice(m_absent.begin(), m_present, std::prev(m_present.end()));
    m_byKey.find(m_absent.front().key)->second.isAbsent = true;
    return &m_absent.front();
}

} // namespace zrm::host
