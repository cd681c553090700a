#ifndef ZRM_HOST_NAMED_FORMAT_H
#define ZRM_HOST_NAMED_FORMAT_H

#include "host/config/ConfigSection.h"
#include "host/formats/FormatDescription.h"

#include <optional>

namespace zrm::host {

class ReadyFormats;

/// The format of a [[log]] table whose key `format` names ready formats: one, or several of the
/// type "syslog", whose extracts are joined. The table's other keys count in place of theirs. None
/// when a problem was recorded.
std::optional<FormatDescription> readNamedFormat(ConfigSection& section,
                                                 const ReadyFormats& formats);

} // namespace zrm::host

#endif
