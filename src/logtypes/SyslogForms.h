#ifndef ZRM_SYSLOG_FORMS_H
#define ZRM_SYSLOG_FORMS_H

#include "logs/ZoneTime.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace zrm {

/// What a syslog line begins with, up to its time.
struct SyslogHead {
    enum class Form : unsigned char {
        none,        ///< not recognised
        traditional, ///< "Oct  5 07:03:09 host source: message"
        iso,         ///< "2026-10-05T07:03:09.123456+02:00 host source: message"
        rfc5424,     ///< "<34>1 2026-10-05T07:03:09Z host app procid msgid - message"
    };

    Form form = Form::none;
    std::size_t end = 0; ///< where the rest of the line begins
};

/// The same with the time.
struct SyslogTime : SyslogHead {
    bool hasTime = false; ///< false also for "-" in place of the time
    bool hasYear = false;
    CivilTime time;
    std::optional<std::int32_t> offset; ///< of its zone from UTC in seconds, if it says
};

/// Where the time of a syslog line begins: behind its priority and version, if it has them.
struct SyslogStart {
    std::size_t at = 0;
    bool isRfc5424 = false;
};

/// The rest of a syslog line. Parts that it does not have are empty.
struct SyslogParts {
    std::string_view host = "";
    std::string_view source = "";    ///< of RFC 5424: APP-NAME[PROCID]
    std::string_view processId = ""; ///< of RFC 5424; the source is then APP-NAME alone
    std::string_view messageId = ""; ///< of RFC 5424
    std::string_view data = "";      ///< of RFC 5424: the structured data
    std::string_view description = "";
};

/// The forms of lines that system loggers write, recognised line by line. A line may begin with a
/// priority. Stateless; any thread.
namespace SyslogForms {

/// `line` is without its newline, here and below.
SyslogStart start(std::string_view line) noexcept;

SyslogTime recognise(std::string_view line) noexcept;

/// The rest of a line whose beginning was recognised. A line that was not is all description.
SyslogParts split(std::string_view line, const SyslogHead& head) noexcept;

/// The number in the line's "<PRI>": facility * 8 + severity. None if it has none, or no valid one.
std::optional<unsigned> priority(std::string_view line) noexcept;

/// The words for such a number, "warning" and "daemon" for example.
std::string_view severityOf(unsigned priority) noexcept;
std::string_view facilityOf(unsigned priority) noexcept;

/// The year of a time without one: the one that brings it nearest to, but at most a day behind,
/// the reference.
int yearOf(const CivilTime& time, const CivilTime& reference) noexcept;

} // namespace SyslogForms

} // namespace zrm

#endif
