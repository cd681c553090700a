#include "host/events/QueueSource.h"

#include <utility>

namespace zrm::host {

QueueSource::QueueSource(EventQueue& queue, EventJson format)
    : m_queue(queue), m_reader(queue.addReader()), m_format(std::move(format)) {}

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
        text.clear();
        m_format.append(text, event);
        log.clear();
        m_format.appendLog(log, event);
        const SituationLabel& situation = *event.situation;
        m_records.push_back({event.id, event.raised, situation.name, situation.severity, log, text,
                             situation.text});
    }
    return m_records;
}

} // namespace zrm::host
