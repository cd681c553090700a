#include "tables/EntryWindows.h"

#include <algorithm>
#include <iterator>
#include <span>
#include <utility>

namespace zrm {

namespace {

/// No entries are further apart.
constexpr std::int64_t longestPeriod = std::int64_t{1} << 42;

/// Room for as many seconds is made at once.
constexpr std::size_t usualSeconds = 3;

} // namespace

std::int64_t EntryWindows::add(std::int64_t time, std::int64_t period) {
    period = std::min(period, longestPeriod);
    ++m_additions;
    std::int64_t most = 0;
    const std::size_t count = groups();
    for (std::size_t index = 0; index < count; ++index) {
        Group& taking = group(index);
        if (taking.takes(time, period)) {
            most = std::max(most, taking.add(time, period, m_mostSeconds));
            taking.used = m_additions;
        }
    }
    if (most == 0) {
        Group& begun = spareGroup();
        begun.begin(time);
        begun.used = m_additions;
        return 1;
    }
    if (count > 1) {
        joinAt(time);
    }
    return most;
}

EntryWindows::Counted EntryWindows::within(std::int64_t time, std::int64_t period) const noexcept {
    period = std::min(period, longestPeriod);
    Counted most{0, time};
    for (std::size_t index = 0; index < groups(); ++index) {
        const Counted found = group(index).within(time, period);
        most = found.entries > most.entries ? found : most;
    }
    return most;
}

EntryWindows::Counted EntryWindows::counted(std::int64_t time, std::int64_t period) const noexcept {
    period = std::min(period, longestPeriod);
    Counted most{0, time};
    for (std::size_t index = 0; index < groups(); ++index) {
        const Group& taking = group(index);
        if (taking.takes(time, period)) {
            for (const std::int64_t end : {time, taking.newest()}) {
                const Counted found = taking.within(end, period);
                most = found.entries > most.entries ? found : most;
            }
        }
    }
    return most;
}

bool EntryWindows::isOver(std::int64_t time, std::int64_t period) const noexcept {
    const auto isOver = [&](const Group& group) {
        return time - group.newest() >= std::min(period, longestPeriod);
    };
    return groups() == 0 || (isOver(m_first) && std::ranges::all_of(m_others, isOver));
}

/// A group to begin anew: the one that has not been used for longest, if there are enough.
EntryWindows::Group& EntryWindows::spareGroup() {
    if (m_first.isEmpty()) {
        return m_first;
    }
    if (groups() < mostGroups) {
        return m_others.emplace_back();
    }
    Group* least = &m_first;
    for (Group& other : m_others) {
        least = other.used < least->used ? &other : least;
    }
    return *least;
}

/// Groups whose newest entries are of the same time would take the same entries from now on: the
/// one with most is enough.
void EntryWindows::joinAt(std::int64_t newest) {
    Group* kept = m_first.newest() == newest ? &m_first : nullptr;
    for (auto other = m_others.begin(); other != m_others.end();) {
        if (other->newest() != newest) {
            ++other;
            continue;
        }
        if (kept == nullptr) {
            kept = &*other++;
            continue;
        }
        if (kept->count() < other->count()) {
            std::swap(*kept, *other);
        }
        other = m_others.erase(other);
    }
}

void EntryWindows::Group::begin(std::int64_t time) {
    m_seconds.clear();
    m_seconds.reserve(usualSeconds);
    m_seconds.push_back({time, 1});
    m_gone = 0;
    m_begin = 0;
    m_count = 1;
    m_newest = time;
    m_earliest = time;
    m_width = 0;
}

bool EntryWindows::Group::isSameSecond(std::int64_t left, std::int64_t right) const noexcept {
    return left >> m_width == right >> m_width;
}

std::int64_t EntryWindows::Group::add(std::int64_t time, std::int64_t period,
                                      std::size_t mostSeconds) {
    std::int64_t most = 0;
    if (time < m_newest) {
        most = addLate(time, period);
    } else {
        addNewest(time, period);
        most = m_count;
    }
    if (m_seconds.size() - m_gone > mostSeconds) {
        forget(m_newest - 2 * period);
    }
    if (m_seconds.size() - m_gone > mostSeconds) {
        widen(mostSeconds);
        findBegin(period);
        most = time < m_newest ? most : m_count;
    }
    return most;
}

EntryWindows::Counted EntryWindows::Group::within(std::int64_t time,
                                                  std::int64_t period) const noexcept {
    Counted found{0, time};
    for (std::size_t index = m_seconds.size(); index-- > m_gone;) {
        const Second& second = m_seconds[index];
        if (second.time > time - period && second.time <= time) {
            found = {found.entries + second.entries, second.time};
        }
    }
    return found;
}

void EntryWindows::Group::addNewest(std::int64_t time, std::int64_t period) {
    if (isSameSecond(m_newest, time)) {
        m_seconds.back().time = time;
        ++m_seconds.back().entries;
    } else {
        m_seconds.push_back({time, 1});
    }
    ++m_count;
    m_newest = time;
    if (m_earliest <= time - period) {
        passOver(time - period);
        // The period before is kept for late entries.
        forget(time - 2 * period);
    }
}

/// Counts no longer what is not younger.
void EntryWindows::Group::passOver(std::int64_t until) {
    while (m_seconds[m_begin].time <= until) {
        m_count -= m_seconds[m_begin++].entries;
    }
    m_earliest = m_seconds[m_begin].time;
}

/// Forgets what is not younger.
void EntryWindows::Group::forget(std::int64_t until) {
    while (m_seconds[m_gone].time <= until) {
        ++m_gone;
    }
    if (m_gone > m_seconds.size() / 2) { // so that each second is moved once on the average
        m_seconds.erase(m_seconds.begin(), m_seconds.begin() + static_cast<std::ptrdiff_t>(m_gone));
        m_begin -= m_gone;
        m_gone = 0;
    }
}

/// An entry that is older than the newest one.
std::int64_t EntryWindows::Group::addLate(std::int64_t time, std::int64_t period) {
    // Usually it is not much older.
    const auto oldest = m_seconds.begin() + static_cast<std::ptrdiff_t>(m_gone);
    auto at = m_seconds.end();
    std::int64_t newer = 0;
    while (at != oldest && std::prev(at)->time > time && !isSameSecond(std::prev(at)->time, time)) {
        --at;
        newer += at->entries;
    }
    if (at != oldest && isSameSecond(std::prev(at)->time, time)) {
        addTo(*std::prev(at), time, period);
    } else {
        m_seconds.insert(at, {time, 1});
        ++m_count;
    }
    m_earliest = std::min(m_earliest, time);
    std::int64_t own = m_count - newer;
    for (std::size_t index = m_begin; index-- > m_gone && m_seconds[index].time > time - period;) {
        own += m_seconds[index].entries;
    }
    return std::max(own, m_count);
}

void EntryWindows::Group::addTo(Second& second, std::int64_t time, std::int64_t period) {
    const bool wasOutside = second.time <= m_newest - period;
    ++second.entries;
    second.time = std::max(second.time, time);
    m_count += wasOutside ? second.entries : 1;
    m_begin -= wasOutside ? 1 : 0;
}

/// Joins neighbours until few enough are left.
void EntryWindows::Group::widen(std::size_t mostSeconds) {
    while (m_seconds.size() - m_gone > mostSeconds) {
        ++m_width;
        Seconds joined;
        for (const Second& second : std::span(m_seconds).subspan(m_gone)) {
            if (!joined.empty() && isSameSecond(joined.back().time, second.time)) {
                joined.back().time = second.time;
                joined.back().entries += second.entries;
            } else {
                joined.push_back(second);
            }
        }
        m_seconds = std::move(joined);
        m_gone = 0;
    }
}

void EntryWindows::Group::findBegin(std::int64_t period) {
    m_begin = static_cast<std::uint32_t>(m_seconds.size());
    m_count = 0;
    while (m_begin > m_gone && m_seconds[m_begin - 1].time > m_newest - period) {
        m_count += m_seconds[--m_begin].entries;
        m_earliest = m_seconds[m_begin].time;
    }
}

} // namespace zrm
