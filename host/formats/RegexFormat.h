#ifndef ZRM_HOST_REGEX_FORMAT_H
#define ZRM_HOST_REGEX_FORMAT_H

#include "host/base/Result.h"
#include "host/formats/ColumnTexts.h"
#include "host/formats/EntryPattern.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

struct FormatDescription;
class TimePattern;

/// Entries that regular expressions take apart, of which the first that fits counts. It begins
/// where the entry does, and may leave a rest. Captures with the name of a column fill it, and all
/// others are fields. Without a description, that is the whole entry. An entry fits if its time is
/// one, or if the expression captures none.
class RegexFormat final : public EntryFormat {
public:
    static constexpr std::size_t mostPatterns = 16;

    static Result<std::shared_ptr<const EntryFormat>> make(const FormatDescription& description);

    std::unique_ptr<Reader> reader() const override;
    const std::string& definition() const noexcept override { return m_definition; }

private:
    class RegexReader;

    struct Pattern {
        EntryPattern expression;
        std::vector<std::optional<EntryColumn>> columns; ///< of the captures
    };

    RegexFormat(std::vector<Pattern> patterns, ColumnTexts texts,
                std::shared_ptr<const TimePattern> times, std::string definition);

    const std::vector<Pattern> m_patterns;
    const ColumnTexts m_texts;
    const std::shared_ptr<const TimePattern> m_times;
    const std::string m_definition;
};

} // namespace zrm::host

#endif
