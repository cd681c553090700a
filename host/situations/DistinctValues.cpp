#include "host/situations/DistinctValues.h"

#include <algorithm>
#include <utility>

#include <xxhash.h>

namespace zrm::host {

/// Of the spans that take the time, the latest; the end if none does.
std::size_t DistinctValues::find(std::int64_t time, std::int64_t period) const {
    std::size_t latest = m_spans.size();
    for (std::size_t at = 0; at < m_spans.size(); ++at) {
        const Span& span = m_spans[at];
        const bool takes = time > span.newest - period && time < span.newest + period;
        if (takes && (latest == m_spans.size() || span.newest > m_spans[latest].newest)) {
            latest = at;
        }
    }
    return latest;
}

DistinctValues::Span& DistinctValues::spanOf(std::int64_t time, std::int64_t period) {
    if (const std::size_t found = find(time, period); found < m_spans.size()) {
        return m_spans[found];
    }
    if (m_spans.size() < mostSpans) {
        m_spans.emplace_back();
    } else {
        const auto least =
            std::min_element(m_spans.begin(), m_spans.end(),
                             [](const Span& a, const Span& b) { return a.used < b.used; });
        std::swap(*least, m_spans.back());
        m_spans.back() = {};
    }
    m_spans.back().newest = m_spans.back().oldest = time;
    return m_spans.back();
}

std::int64_t DistinctValues::add(std::int64_t time, std::int64_t period, std::string_view value) {
    Span& span = spanOf(time, period);
    span.used = ++m_additions;
    span.newest = std::max(span.newest, time);
    span.oldest = std::min(span.oldest, time);
    if (span.oldest <= span.newest - period) {
        span.oldest = span.newest;
        std::erase_if(span.times, [&](const auto& known) {
            const bool isOver = known.second <= span.newest - period;
            span.oldest = isOver ? span.oldest : std::min(span.oldest, known.second);
            return isOver;
        });
        span.oldest = std::min(span.oldest, time);
    }
    const std::uint64_t hash = XXH3_64bits(value.data(), value.size());
    if (span.times.size() < m_most) {
        const auto [known, isNew] = span.times.emplace(hash, time);
        known->second = std::max(known->second, time);
    } else if (const auto known = span.times.find(hash); known != span.times.end()) {
        known->second = std::max(known->second, time);
    }
    return static_cast<std::int64_t>(span.times.size());
}

std::int64_t DistinctValues::within(std::int64_t time, std::int64_t period) const {
    const std::size_t found = find(time, period);
    if (found == m_spans.size()) {
        return 0;
    }
    const Span& span = m_spans[found];
    const std::int64_t end = std::max(time, span.newest);
    return std::count_if(span.times.begin(), span.times.end(),
                         [&](const auto& one) { return one.second > end - period; });
}

} // namespace zrm::host
