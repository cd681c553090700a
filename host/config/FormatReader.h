#ifndef ZRM_HOST_FORMAT_READER_H
#define ZRM_HOST_FORMAT_READER_H

#include "host/config/ConfigSection.h"
#include "host/formats/FormatDescription.h"

#include <memory>
#include <optional>
#include <string>

namespace zrm::host {

/// Reads what a table of a configuration file says about the format of entries. Records what is
/// wrong in the section's problems.
class FormatReader {
public:
    /// Reads the keys that describe a format. `type` decides which of them have a meaning. None
    /// when a problem was recorded.
    static std::optional<FormatDescription> read(ConfigSection& section, const std::string& type);

    /// Reads these keys except `format`, each in place of what the description says already.
    static std::optional<FormatDescription> readOver(ConfigSection& section,
                                                     FormatDescription format);

    /// Makes the format; null when a problem was recorded.
    static std::shared_ptr<const EntryFormat> make(ConfigSection& section,
                                                   const FormatDescription& description);

    /// A problem keeps these keys from being read; they are not unknown.
    static void passOver(ConfigSection& section);

    /// True if the table has a key that describes a format.
    static bool describes(const ConfigSection& section);
};

} // namespace zrm::host

#endif
