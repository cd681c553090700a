#ifndef ZRM_HOST_ENTRY_LINES_READER_H
#define ZRM_HOST_ENTRY_LINES_READER_H

#include "host/config/ConfigSection.h"
#include "host/formats/FormatDescription.h"

#include <memory>

namespace zrm::host {

/// Reads the key `entry`, which says which lines make an entry. Records what is wrong in the
/// section's problems.
class EntryLinesReader {
public:
    /// What the key says, or what holds without it.
    static EntryLines read(ConfigSection& section);
    /// What joins the lines; null if each is an entry or a problem was recorded.
    static std::shared_ptr<const LineJoin> make(ConfigSection& section,
                                                const FormatDescription& description);
};

} // namespace zrm::host

#endif
