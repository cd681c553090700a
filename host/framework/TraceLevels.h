#ifndef ZRM_HOST_TRACE_LEVELS_H
#define ZRM_HOST_TRACE_LEVELS_H

#include "framework/trace.h"
#include "host/base/Result.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Which classes of records are written, as given by a text: words separated by commas, each either
/// `class` for every unit or `unit=class`. A unit is a source file with its extension, or the name
/// of a C++ class, which covers all its source files: those of UserLogFile are UserLogFile.cpp,
/// UserLogFileReport.cpp and UserLogFileTime.cpp. Several classes are joined with a plus. Classes
/// are error, flow, detail, fine, all, none, or a number (decimal or 0x..). Classes for every unit
/// add up; without any, errors are written. For a source file, the longest matching name applies;
/// of several equal names the last. Immutable once parsed.
class TraceLevels {
public:
    /// Parses the text. Leaves the levels unchanged when it is refused.
    Result<void> parse(std::string_view text);

    /// The set of TRC1_Class bits of a unit. Neither locks nor allocates.
    unsigned levelOf(std::string_view unit) const noexcept;

private:
    struct Unit {
        std::string name;
        unsigned level;
    };

    Result<void> parseWord(std::string_view word);

    bool m_hasGeneral = false;
    unsigned m_general = TRC1_ERROR;
    std::vector<Unit> m_units;
};

} // namespace zrm::host

#endif
