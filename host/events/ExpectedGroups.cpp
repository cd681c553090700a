#include "host/events/ExpectedGroups.h"

#include <algorithm>

namespace zrm::host {

ExpectedGroups::ExpectedGroups(bool isKept, std::function<Clock::time_point()> clock)
    : m_isKept(isKept), m_clock(std::move(clock)), m_begin(m_clock()) {}

void ExpectedGroups::load(ExpectedValues stored) {
    const std::lock_guard guard(m_mutex);
    m_saved = stored.watched;
    std::int64_t before = stored.watched;
    for (const ExpectedGroup& group : stored.groups) {
        before = std::max(before, group.seen); // it may have been stored after the time
    }
    m_before.store(before, std::memory_order_relaxed);
    m_stored = std::move(stored.groups);
}

std::int64_t ExpectedGroups::watched() const {
    return m_before.load(std::memory_order_relaxed) +
           std::chrono::duration_cast<std::chrono::milliseconds>(m_clock() - m_begin).count();
}

std::vector<ExpectedGroup> ExpectedGroups::take(const std::string& situation,
                                                std::int64_t definition) {
    std::vector<ExpectedGroup> taken;
    const std::lock_guard guard(m_mutex);
    std::erase_if(m_stored, [&](ExpectedGroup& group) {
        if (group.situation != situation) {
            return false;
        }
        if (group.definition == definition) {
            taken.push_back(std::move(group));
        } else {
            m_forgotten.emplace_back(group.situation, group.key);
        }
        return true;
    });
    m_isUsed = m_isUsed || !taken.empty();
    return taken;
}

void ExpectedGroups::forgetLeft() {
    const std::lock_guard guard(m_mutex);
    for (const ExpectedGroup& group : m_stored) {
        m_forgotten.emplace_back(group.situation, group.key);
    }
    m_stored.clear();
}

void ExpectedGroups::note(ExpectedGroup group) {
    if (m_isKept) {
        const std::lock_guard guard(m_mutex);
        m_isUsed = true;
        Key key(group.situation, group.key);
        m_changed.insert_or_assign(std::move(key), std::move(group));
    }
}

void ExpectedGroups::forget(const std::string& situation, const std::string& key) {
    if (m_isKept) {
        const std::lock_guard guard(m_mutex);
        m_changed.erase({situation, key});
        m_forgotten.emplace_back(situation, key);
    }
}

std::uint64_t ExpectedGroups::losses() const {
    const std::lock_guard guard(m_mutex);
    return m_losses;
}

ExpectedValues ExpectedGroups::unsaved(bool isLast) const {
    ExpectedValues values;
    const std::lock_guard guard(m_mutex);
    for (const auto& [key, group] : m_changed) {
        values.groups.push_back(group);
    }
    values.forgotten = m_forgotten;
    const std::int64_t now = watched();
    const bool isDue = isLast || now - m_saved >= storedEvery || !m_changed.empty();
    values.watched = m_isUsed && isDue ? now : 0;
    return values;
}

void ExpectedGroups::saved(const ExpectedValues& values) {
    const std::lock_guard guard(m_mutex);
    for (const ExpectedGroup& group : values.groups) {
        const auto found = m_changed.find({group.situation, group.key});
        if (found != m_changed.end() && found->second == group) { // not seen again meanwhile
            m_changed.erase(found);
        }
    }
    m_forgotten.erase(m_forgotten.begin(),
                      m_forgotten.begin() + static_cast<std::ptrdiff_t>(values.forgotten.size()));
    m_saved = std::max(m_saved, values.watched);
}

void ExpectedGroups::forgetSaved() {
    const std::lock_guard guard(m_mutex);
    ++m_losses;
    m_saved = 0;
    m_forgotten.clear();
}

} // namespace zrm::host
