#include "host/events/LogRhythm.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::int64_t secondsPerHour = 3600;
constexpr std::int64_t hoursPerWeek = 7 * 24;
constexpr std::int64_t hoursKept = LogRhythm::weeksKept * hoursPerWeek;
constexpr std::size_t weeksForOutliers = 3;

std::int64_t hourOf(std::int64_t time) noexcept {
    return time / secondsPerHour - (time % secondsPerHour < 0 ? 1 : 0);
}

} // namespace

LogRhythm::LogRhythm(const std::vector<SilentHour>& kept) {
    for (const SilentHour& hour : kept) {
        m_silences[hour.hour] = hour.silence;
    }
}

void LogRhythm::add(std::int64_t from, std::int64_t to) {
    const std::int64_t last = hourOf(to);
    const std::int64_t silence = std::max<std::int64_t>(to - from, 0);
    for (std::int64_t hour = std::max(hourOf(from), last - hoursKept); hour <= last; ++hour) {
        const auto [at, isNew] = m_silences.try_emplace(hour, silence);
        if (isNew || at->second < silence) {
            at->second = silence;
            m_changed[hour] = silence;
        }
    }
    // The week of which an hour is the same is not yet over at its end.
    forgetBefore(last - hoursKept - 1);
}

void LogRhythm::forgetBefore(std::int64_t hour) {
    m_silences.erase(m_silences.begin(), m_silences.lower_bound(hour));
}

std::optional<std::chrono::seconds> LogRhythm::limitAt(std::int64_t now) const {
    const std::int64_t hour = hourOf(now);
    if (m_silences.empty() || m_silences.begin()->first > hour - hoursPerWeek) {
        return std::nullopt;
    }
    std::vector<std::int64_t> weeks;
    for (std::int64_t week = 1; week <= weeksKept; ++week) {
        const std::int64_t same = hour - week * hoursPerWeek;
        const auto end = m_silences.upper_bound(same + 1);
        const auto longest = std::max_element(
            m_silences.lower_bound(same - 1), end,
            [](const auto& left, const auto& right) { return left.second < right.second; });
        if (longest != end) {
            weeks.push_back(longest->second);
        }
    }
    if (weeks.empty()) {
        return std::nullopt;
    }
    std::sort(weeks.begin(), weeks.end(), std::greater<>());
    const std::int64_t usual = weeks[weeks.size() >= weeksForOutliers ? 1 : 0];
    return std::max(shortestLimit, std::chrono::seconds(2 * usual));
}

std::vector<SilentHour> LogRhythm::takeChanged() {
    std::vector<SilentHour> changed;
    for (const auto& [hour, silence] : std::exchange(m_changed, {})) {
        changed.push_back({hour, silence});
    }
    return changed;
}

} // namespace zrm::host
