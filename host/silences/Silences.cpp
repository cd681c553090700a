#include "host/silences/Silences.h"

#include "host/base/TimeText.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

using Reason = SilenceRefusal::Reason;

tl::unexpected<SilenceRefusal> refuse(Reason reason, std::string what, std::string cure = "") {
    return tl::unexpected(SilenceRefusal{reason, {std::move(what), std::move(cure), "id"}});
}

std::string nameOf(std::uint64_t id) {
    return "silence " + std::to_string(id);
}

tl::unexpected<SilenceRefusal> isOver(const Silence& silence) {
    std::string by;
    if (silence.expired) {
        by = silence.expiredBy.empty() ? ", when somebody expired it"
                                       : ", when " + silence.expiredBy + " expired it";
    }
    return refuse(SilenceRefusal::OVER,
                  nameOf(silence.id) + " has been over since " + UtcTime::text(silence.end()) + by);
}

tl::unexpected<SilenceRefusal> notKept(const Problem& problem) {
    return tl::unexpected(SilenceRefusal{
        SilenceRefusal::NOT_KEPT, {"the change was not made: " + problem.what, problem.cure}});
}

} // namespace

Silences::Silences(KeptSilences kept) : m_lastId(kept.lastId) {
    for (Silence& silence : kept.silences) {
        const std::uint64_t id = silence.id;
        m_lastId = std::max(m_lastId, id);
        m_silences.emplace(id, std::move(silence));
    }
}

std::size_t Silences::countActive(std::int64_t now) const {
    return static_cast<std::size_t>(
        std::count_if(m_silences.begin(), m_silences.end(),
                      [now](const auto& one) { return one.second.isActive(now); }));
}

std::size_t Silences::activeCount(std::int64_t now) const {
    const std::lock_guard guard(m_mutex);
    return countActive(now);
}

Silences::Change Silences::add(Silence silence) {
    {
        const std::lock_guard guard(m_mutex);
        if (countActive(silence.created) >= mostActive) {
            return tl::unexpected(
                SilenceRefusal{SilenceRefusal::TOO_MANY,
                               {"there are " + std::to_string(mostActive) + " active silences",
                                "expire one first, or name more with one by a pattern"}});
        }
        silence.id = ++m_lastId;
    }
    if (m_store) {
        if (const Result<void> stored = m_store(silence); !stored) {
            return notKept(stored.error());
        }
    }
    const std::lock_guard guard(m_mutex);
    m_silences.emplace(silence.id, silence);
    ++m_version;
    return silence;
}

Silences::Change Silences::expire(std::uint64_t id, const std::string& who, std::int64_t now) {
    Silence silence;
    {
        const std::lock_guard guard(m_mutex);
        const auto found = m_silences.find(id);
        if (found == m_silences.end()) {
            return refuse(SilenceRefusal::UNKNOWN, "there is no " + nameOf(id));
        }
        silence = found->second;
        if (!silence.isActive(now)) {
            return isOver(silence);
        }
        if (!m_expiring.insert(id).second) {
            return refuse(SilenceRefusal::OVER, "somebody else is expiring " + nameOf(id));
        }
    }
    silence.expired = now;
    silence.expiredBy = who;
    const Result<void> stored = m_store ? m_store(silence) : Result<void>();
    const std::lock_guard guard(m_mutex);
    m_expiring.erase(id);
    if (!stored) {
        return notKept(stored.error());
    }
    if (const auto found = m_silences.find(id); found != m_silences.end()) {
        found->second.expired = now;
        found->second.expiredBy = who;
        silence = found->second; // with what was counted meanwhile
    }
    ++m_version;
    return silence;
}

std::vector<Silence> Silences::list() const {
    const std::lock_guard guard(m_mutex);
    std::vector<Silence> all;
    all.reserve(m_silences.size());
    std::for_each(m_silences.rbegin(), m_silences.rend(),
                  [&](const auto& one) { all.push_back(one.second); });
    return all;
}

std::optional<Silence> Silences::find(std::uint64_t id) const {
    const std::lock_guard guard(m_mutex);
    const auto found = m_silences.find(id);
    return found == m_silences.end() ? std::nullopt : std::optional(found->second);
}

std::vector<Silence> Silences::active(std::int64_t now) const {
    const std::lock_guard guard(m_mutex);
    std::vector<Silence> active;
    for (const auto& [id, silence] : m_silences) {
        if (silence.isActive(now)) {
            active.push_back(silence);
        }
    }
    return active;
}

void Silences::count(const std::vector<SilencedEvents>& events) {
    if (events.empty()) {
        return;
    }
    const std::lock_guard guard(m_mutex);
    for (const SilencedEvents& counted : events) {
        m_heldBack.fetch_add(counted.events, std::memory_order_relaxed);
        if (const auto found = m_silences.find(counted.silence); found != m_silences.end()) {
            found->second.events += counted.events;
            found->second.last = std::max(found->second.last, counted.last);
        }
    }
}

bool Silences::areTooManyExpired() const {
    const std::lock_guard guard(m_mutex);
    return m_silences.size() > mostActive + mostExpired;
}

std::vector<std::uint64_t> Silences::removeExpired(std::int64_t time) {
    const std::int64_t now = WallClock::now();
    const std::lock_guard guard(m_mutex);
    std::vector<std::pair<std::int64_t, std::uint64_t>> expired; // by end
    for (const auto& [id, silence] : m_silences) {
        if (!silence.isActive(now)) {
            expired.emplace_back(silence.end(), id);
        }
    }
    std::sort(expired.begin(), expired.end());
    std::vector<std::uint64_t> removed;
    for (std::size_t index = 0; index < expired.size(); ++index) {
        const auto& [end, id] = expired[index];
        if (end < time || expired.size() - index > mostExpired) {
            m_silences.erase(id);
            removed.push_back(id);
        }
    }
    return removed;
}

} // namespace zrm::host
