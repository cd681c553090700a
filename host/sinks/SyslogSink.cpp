#include "host/sinks/SyslogSink.h"

#include "base/TraceScope.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SyslogSink.cpp"};

} // namespace

SyslogSink::SyslogSink(const SinkConfig& config)
    : m_name(config.name), m_format(config.text("facility")),
      m_isTcp(config.text("transport") == "tcp"),
      m_connection(ListenAddress::parse(config.text("address")).value_or(ListenAddress{}),
                   m_isTcp ? Connection::TCP : Connection::UDP, config.duration("timeout")) {}

bool SyslogSink::reconnect(const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (!m_connection.open(giveUp)) {
        return trace.result(false);
    }
    for (const std::string& delivery : m_unsure) {
        trace.detail()("%s gets %zu bytes again.", m_name.c_str(), delivery.size());
        if (!m_connection.send(delivery, giveUp)) {
            return trace.result(false);
        }
    }
    return trace.result(true);
}

void SyslogSink::forgetAcknowledged() {
    std::size_t kept = 0;
    for (const std::string& delivery : m_unsure) {
        kept += delivery.size();
    }
    const std::size_t unacknowledged = m_connection.unacknowledged();
    while (m_unsure.size() > 1 && kept - m_unsure.front().size() >= unacknowledged) {
        kept -= m_unsure.front().size();
        m_unsure.pop_front();
    }
}

std::size_t SyslogSink::deliverFrames(std::span<const EventRecord> events,
                                      const std::stop_token& giveUp) {
    std::string frames;
    for (const EventRecord& event : events) {
        const std::string message = m_format.text(event);
        frames += std::to_string(message.size()) + ' ' + message;
    }
    m_connection.closeIfBroken();
    if ((!m_connection.isOpen() && !reconnect(giveUp)) || !m_connection.send(frames, giveUp)) {
        return 0;
    }
    m_unsure.push_back(std::move(frames));
    forgetAcknowledged();
    return events.size();
}

std::size_t SyslogSink::deliverDatagrams(std::span<const EventRecord> events,
                                         const std::stop_token& giveUp) {
    std::size_t delivered = 0;
    if (m_connection.open(giveUp)) {
        while (delivered < events.size() &&
               m_connection.send(m_format.text(events[delivered]), giveUp)) {
            ++delivered;
        }
    }
    return delivered;
}

std::size_t SyslogSink::deliver(std::span<const EventRecord> events,
                                const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    return trace.result(m_isTcp ? deliverFrames(events, giveUp) : deliverDatagrams(events, giveUp));
}

} // namespace zrm::host
