#ifndef ZRM_HOST_QUEUE_SOURCE_H
#define ZRM_HOST_QUEUE_SOURCE_H

#include "host/events/EventJson.h"
#include "host/events/EventQueue.h"
#include "host/events/EventSource.h"
#include "host/silences/Silencer.h"

#include <string>
#include <vector>

namespace zrm::host {

/// Reads events directly from the queue, for a sink without a history: what the sink has not taken
/// stays in the queue.
class QueueSource : public EventSource {
public:
    /// Registers as a reader of the queue. Queue and silences must outlive the object. `counts`:
    /// the source counts the events that are silenced, as one of several on a queue should.
    QueueSource(EventQueue& queue, EventJson format, Silences& silences, bool counts);

    std::span<const EventRecord> read(std::size_t most) override;
    void release(std::size_t count) override;
    std::uint64_t backlog() const override { return m_queue.backlog(m_reader); }
    void end() override { m_queue.close(); }

private:
    EventQueue& m_queue;
    const EventQueue::Reader m_reader;
    const EventJson m_format;
    Silences& m_silences;
    const bool m_counts;
    Silencer m_silencer;
    std::vector<std::string> m_texts; ///< events of the last read as JSON
    std::vector<std::string> m_logs;  ///< logs of the last read
    std::vector<EventRecord> m_records;
};

} // namespace zrm::host

#endif
