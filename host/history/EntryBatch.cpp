#include "host/history/EntryBatch.h"

#include <algorithm>
#include <iterator>

namespace zrm::host {

std::size_t EntryBatch::add(std::span<const Event> events, const EventJson& format,
                            Silencer* silencer) {
    const auto last = std::find_if(events.rbegin(), events.rend(),
                                   [](const Event& event) { return event.endsEntry; });
    m_isWhole = last != events.rend();
    const auto whole = static_cast<std::size_t>(std::distance(last, events.rend()));
    const std::size_t count = m_isWhole ? whole : events.size();
    for (const Event& event : events.first(count)) {
        m_events->add(event, format, silencer);
        if (event.log != nullptr) {
            m_positions.insert_or_assign(event.log->name(), event.behind);
        }
    }
    return count;
}

std::vector<PositionValue> EntryBatch::positions() const {
    std::vector<PositionValue> values;
    for (const auto& [log, position] : m_positions) {
        values.push_back({log, position});
    }
    return values;
}

} // namespace zrm::host
