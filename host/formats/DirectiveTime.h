#ifndef ZRM_HOST_DIRECTIVE_TIME_H
#define ZRM_HOST_DIRECTIVE_TIME_H

#include "host/base/Result.h"
#include "host/formats/CommonTime.h"
#include "host/formats/TimePattern.h"

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Times of a form that strftime's directives describe.
class DirectiveTime final : public TimePattern {
public:
    static Result<std::shared_ptr<const TimePattern>> make(const std::string& pattern);

    bool read(std::string_view text, EntryColumns& columns) const noexcept override;

private:
    /// A directive, or a character that has to come.
    struct Step {
        bool isDirective;
        char character;
    };
    class Reading;

    explicit DirectiveTime(std::vector<Step> steps);
    bool has(std::string_view directives) const noexcept;
    Result<std::shared_ptr<const TimePattern>>
    checked(std::shared_ptr<const DirectiveTime> self) const;

    const std::vector<Step> m_steps;
    const bool m_hasDate;
};

} // namespace zrm::host

#endif
