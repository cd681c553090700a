#ifndef ZRM_HOST_FIELD_EXTRACTS_H
#define ZRM_HOST_FIELD_EXTRACTS_H

#include "host/base/Result.h"
#include "host/formats/EntryPattern.h"
#include "host/formats/FormatDescription.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm {
class EntryFields;
}

namespace zrm::host {

/// Fields that regular expressions read from the descriptions of entries, chosen by the program
/// that wrote them. Not changed after it was made; any thread.
class FieldExtracts {
public:
    static constexpr std::size_t mostPatterns = 500; ///< of all extracts

    /// A problem has the field "extract".
    static Result<FieldExtracts> make(const std::vector<FormatDescription::Extract>& extracts);

    /// What reading uses. Allocates nothing once it has been used. One thread.
    struct Workspace {
        EntryPattern::Captures captures;
        EntryPattern::Workspace pattern;
    };

    /// Adds the named captures of the first expression of each extract that is for the source and
    /// matches. A match begins where the description does. `source` may have "[process]" at its
    /// end. The values are views into the description, the names are valid as long as the object.
    void read(std::string_view source, std::string_view description, EntryFields& fields,
              Workspace& workspace) const;

private:
    struct Extract {
        std::string source; ///< glob; empty: all
        std::vector<EntryPattern> patterns;
    };

    std::vector<Extract> m_extracts;
};

} // namespace zrm::host

#endif
