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
        if (event.judgement != nullptr && event.judgement->state != EventJudgement::SINGLE) {
            EpisodeChange& change = m_episodes.emplace_back();
            change.event = event.id;
            change.raised = event.raised;
            format.appendLog(change.log, event);
            change.node = format.node(event);
            change.situation = event.situation;
            change.judgement = event.judgement;
            m_endsEpisodes |= event.judgement->state == EventJudgement::RESOLVED;
        }
        if (event.log != nullptr) {
            m_positions.insert_or_assign(event.log->name(), event.behind);
            if (event.shares != nullptr) {
                auto& shares = m_shares[event.log->name()];
                shares.insert(shares.end(), event.shares->begin(), event.shares->end());
            }
        }
    }
    return count;
}

void EntryBatch::addReached(const std::vector<PositionValue>& reached) {
    for (const PositionValue& value : reached) {
        m_positions.insert_or_assign(value.log, value.position);
        auto& shares = m_shares[value.log];
        shares.insert(shares.end(), value.shares.begin(), value.shares.end());
    }
}

std::vector<PositionValue> EntryBatch::positions() const {
    std::vector<PositionValue> values;
    for (const auto& [log, position] : m_positions) {
        const auto shares = m_shares.find(log);
        values.push_back({log, position,
                          shares == m_shares.end() ? std::vector<EpisodeShare>() : shares->second});
    }
    return values;
}

} // namespace zrm::host
