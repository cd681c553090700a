#include "host/delivery/QueueSource.h"

#include "host/events/AgentNode.h"
#include "host/silences/Silences.h"

#include <utility>

namespace zrm::host {

QueueSource::QueueSource(EventQueue& queue, EventJson format, Silences& silences, bool counts)
    : m_queue(queue), m_reader(queue.addReader()), m_format(std::move(format)),
      m_silences(silences), m_counts(counts), m_silencer(silences, AgentNode::name()) {}

std::span<const EventRecord> QueueSource::read(std::size_t most) {
    const std::span<const Event> events = m_queue.read(m_reader, most);
    if (m_texts.size() < events.size()) {
        m_texts.resize(events.size());
        m_logs.resize(events.size());
    }
    m_records.clear();
    for (const Event& event : events) {
        std::string& text = m_texts[m_records.size()];
        std::string& log = m_logs[m_records.size()];
        log.clear();
        m_format.appendLog(log, event);
        const std::uint64_t silence = m_silencer.of(event, log);
        text.clear();
        m_format.append(text, event, silence);
        const SituationLabel& situation = *event.situation;
        m_records.push_back({event.id, event.raised, situation.name, situation.severity, log, text,
                             situation.text, silence});
    }
    return m_records;
}

void QueueSource::release(std::size_t count) {
    if (m_counts) {
        std::vector<SilencedEvents> silenced;
        for (const EventRecord& event : std::span(m_records).first(count)) {
            if (event.silence != 0) {
                silenced.push_back({event.silence, 1, event.raised});
            }
        }
        m_silences.count(silenced);
    }
    m_queue.release(m_reader, count);
}

} // namespace zrm::host
