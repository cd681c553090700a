#ifndef ZRM_HOST_SYSLOG_MESSAGE_H
#define ZRM_HOST_SYSLOG_MESSAGE_H

#include "host/events/Event.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Writes events as syslog messages (RFC 5424). Immutable, so any thread.
class SyslogMessage {
public:
    /// The size that every receiver should accept; longer texts are cut.
    static constexpr std::size_t longest = 2048;

    /// `facility` is one of syslogFacilities.
    explicit SyslogMessage(std::string_view facility);

    /// The message without framing: header, structured data and the entry's text.
    std::string text(const EventRecord& event) const;

private:
    std::size_t m_facility; ///< code of the facility
    std::string m_process;  ///< the process id
};

} // namespace zrm::host

#endif
