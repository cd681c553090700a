#include "host/situations/DistinctValues.h"

#include <algorithm>
#include <utility>

#include <xxhash.h>

namespace zrm::host {

DistinctValues::Span& DistinctValues::spanOf(std::int64_t time, std::int64_t period) {
    Span* latest = nullptr; // of those that take the time
    for (Span& span : m_spans) {
        const bool takes = time > span.newest - period && time < span.newest + period;
        latest = takes && (latest == nullptr || span.newest > latest->newest) ? &span : latest;
    }
    if (latest != nullptr) {
        return *latest;
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
    std::int64_t most = 0;
    for (const Span& span : m_spans) {
        const auto found =
            std::count_if(span.times.begin(), span.times.end(), [&](const auto& one) {
                return one.second > time - period && one.second <= time;
            });
        most = std::max<std::int64_t>(most, found);
    }
    return most;
}

} // namespace zrm::host
