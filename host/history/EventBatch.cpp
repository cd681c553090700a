#include "host/history/EventBatch.h"

#include "host/silences/Silencer.h"

#include <algorithm>

namespace zrm::host {

EventBatch::Piece EventBatch::sameOr(std::string_view text, Piece Places::*which) {
    if (!m_places.empty() && at(m_places.back().*which) == text) {
        return m_places.back().*which;
    }
    const std::size_t begin = m_text.size();
    m_text += text;
    return pieceFrom(begin);
}

void EventBatch::add(const Event& event, const EventJson& format, Silencer* silencer) {
    Places places;
    places.situation = sameOr(event.situation->name, &Places::situation);
    places.severity = sameOr(event.situation->severity, &Places::severity);
    places.text = sameOr(event.situation->text, &Places::text);
    const std::size_t log = m_text.size();
    format.appendLog(m_text, event);
    places.log = pieceFrom(log);
    if (!m_places.empty() && at(m_places.back().log) == at(places.log)) {
        m_text.resize(log);
        places.log = m_places.back().log;
    }
    const std::uint64_t silence = silencer == nullptr ? 0 : silencer->of(event, at(places.log));
    const std::size_t json = m_text.size();
    format.append(m_text, event, silence);
    places.json = pieceFrom(json);
    m_places.push_back(places);
    m_records.push_back({event.id, event.raised, {}, {}, {}, {}, {}, silence});
}

void EventBatch::add(const EventRecord& event) {
    Places places;
    places.situation = sameOr(event.situation, &Places::situation);
    places.severity = sameOr(event.severity, &Places::severity);
    places.text = sameOr(event.text, &Places::text);
    places.log = sameOr(event.log, &Places::log);
    const std::size_t json = m_text.size();
    m_text += event.json;
    places.json = pieceFrom(json);
    m_places.push_back(places);
    m_records.push_back({event.id, event.raised, {}, {}, {}, {}, {}, event.silence});
}

std::vector<SilencedEvents> EventBatch::silenced() const {
    std::vector<SilencedEvents> counts;
    for (const EventRecord& event : m_records) {
        if (event.silence == 0) {
            continue;
        }
        auto found = std::find_if(counts.begin(), counts.end(), [&](const SilencedEvents& count) {
            return count.silence == event.silence;
        });
        if (found == counts.end()) {
            found = counts.insert(found, {event.silence, 0, 0});
        }
        ++found->events;
        found->last = std::max(found->last, event.raised);
    }
    return counts;
}

void EventBatch::seal() {
    for (std::size_t index = 0; index < m_records.size(); ++index) {
        const Places& places = m_places[index];
        EventRecord& record = m_records[index];
        record.situation = at(places.situation);
        record.severity = at(places.severity);
        record.text = at(places.text);
        record.log = at(places.log);
        record.json = at(places.json);
    }
    m_places = {};
}

} // namespace zrm::host
