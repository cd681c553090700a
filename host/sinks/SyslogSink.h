#ifndef ZRM_HOST_SYSLOG_SINK_H
#define ZRM_HOST_SYSLOG_SINK_H

#include "host/config/SinkConfig.h"
#include "host/sinks/Connection.h"
#include "host/sinks/Sink.h"
#include "host/sinks/SyslogMessage.h"

#include <cstddef>
#include <deque>
#include <span>
#include <stop_token>
#include <string>

namespace zrm::host {

/// Sends events as syslog messages: over TCP with octet counting (RFC 6587), over UDP one per
/// datagram. Syslog receivers acknowledge nothing. Over TCP, what the receiver's system had not
/// acknowledged when the connection broke, and at least the last delivery, is therefore sent again;
/// over UDP it is unknown what arrived.
class SyslogSink : public Sink {
public:
    explicit SyslogSink(const SinkConfig& config);

    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_connection.error(); }

private:
    std::size_t deliverFrames(std::span<const EventRecord> events, const std::stop_token& giveUp);
    std::size_t deliverDatagrams(std::span<const EventRecord> events,
                                 const std::stop_token& giveUp);
    bool reconnect(const std::stop_token& giveUp);
    void forgetAcknowledged();

    const std::string m_name;
    const SyslogMessage m_format;
    const bool m_isTcp;
    Connection m_connection;
    std::deque<std::string> m_unsure; ///< deliveries that may be lost with the connection
};

} // namespace zrm::host

#endif
