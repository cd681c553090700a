#ifndef ZRM_SYSLOG_FIELDS_H
#define ZRM_SYSLOG_FIELDS_H

#include "logtypes/SyslogForms.h"

#include <string_view>

namespace zrm {

class EntryFields;

/// The fields of a syslog line, in any form of SyslogForms:
///
///     host, tag, pid, message     in every form; tag is the program's name without its process id
///     app, procid, msgid          of RFC 5424, where tag and pid are the same as app and procid
///     SDID.NAME                   of RFC 5424: each parameter of the structured data
///     facility, facility_code, severity, severity_code    of a line that begins with "<PRI>"
///
/// A part that the line does not have is no field.
namespace SyslogFields {

/// Adds the fields of a line without its line end. They are views into the line. Any thread.
void read(std::string_view line, EntryFields& fields) noexcept;
/// Does the same for a line that SyslogForms has already taken apart.
void read(std::string_view line, SyslogHead::Form form, const SyslogParts& parts,
          EntryFields& fields) noexcept;

} // namespace SyslogFields

} // namespace zrm

#endif
