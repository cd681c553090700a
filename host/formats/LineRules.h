#ifndef ZRM_HOST_LINE_RULES_H
#define ZRM_HOST_LINE_RULES_H

#include "host/base/Result.h"
#include "host/formats/LinePattern.h"
#include "host/formats/Unwrapper.h"
#include "logs/LineJoin.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

struct FormatDescription;

/// Which lines make an entry, as a configuration says it: by what a line begins with, or because
/// the container runtime has cut it.
class LineRules final : public LineJoin {
public:
    /// Null if each line is an entry. A problem names the part that is wrong, as in "entry.starts".
    static Result<std::shared_ptr<const LineJoin>> make(const FormatDescription& description);

    const std::string& definition() const noexcept override { return m_definition; }

protected:
    bool continues(std::string_view before, std::string_view line) const override;
    bool mayBeContinued(std::string_view line) const override;

private:
    struct Parts {
        std::optional<LinePattern> starts;
        std::optional<LinePattern> continues;
        bool isIndented = false;
        std::optional<Unwrapper::Kind> unwrap;

        /// Each line of a program is an entry.
        bool isOnlyUnwrap() const noexcept { return !starts && !continues && !isIndented; }
    };

    LineRules(const FormatDescription& description, Parts parts);

    bool continuesWrapped(std::string_view before, std::string_view line) const;
    bool continuesByRule(std::string_view line) const;

    const Parts m_parts;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
