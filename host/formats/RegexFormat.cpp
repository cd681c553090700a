#include "host/formats/RegexFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/TimePattern.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

class RegexFormat::RegexReader final : public Reader {
public:
    explicit RegexReader(const RegexFormat& format) : m_format(format), m_time(format.m_times) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        if (!find(entry, columns)) {
            return false;
        }
        for (std::size_t index = 0; index < m_captures.size(); ++index) {
            const std::optional<EntryColumn> column = m_pattern->columns[index];
            if (column && *column != EntryColumn::time) {
                *textOf(columns, *column) = m_captures[index];
            }
        }
        m_format.m_texts.apply(columns);
        if (columns.description.empty()) {
            columns.description = entry;
        }
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        EntryColumns columns;
        const bool isLast = m_pattern != nullptr && entry.data() == m_entry.data() &&
                            entry.size() == m_entry.size();
        if (!isLast && !find(entry, columns)) {
            return;
        }
        const std::vector<std::string>& names = m_pattern->expression.names();
        for (std::size_t index = 0; index < names.size(); ++index) {
            const bool isField = !m_pattern->columns[index] && !names[index].empty();
            if (isField && m_captures[index].data() != nullptr) {
                fields.add(names[index], m_captures[index]);
            }
        }
    }

    std::string_view reason() const noexcept override { return m_reason; }

private:
    /// Finds the pattern that fits, and sets the time.
    bool find(std::string_view entry, EntryColumns& columns) {
        m_reason = "it does not match the format";
        m_entry = entry;
        for (const Pattern& pattern : m_format.m_patterns) {
            if (pattern.expression.match(entry, m_captures, m_workspace)) {
                if (readTime(pattern, columns)) {
                    m_pattern = &pattern;
                    return true;
                }
                m_reason = "its time is not one that the format reads";
            }
        }
        m_pattern = nullptr;
        return false;
    }
    /// False if the entry's time is not one.
    bool readTime(const Pattern& pattern, EntryColumns& columns) noexcept {
        const auto time = std::ranges::find(pattern.columns, EntryColumn::time);
        if (time == pattern.columns.end()) {
            return true;
        }
        const std::string_view text =
            m_captures[static_cast<std::size_t>(time - pattern.columns.begin())];
        return text.empty() || m_time.read(text, columns);
    }

    const RegexFormat& m_format;
    TimeMemo m_time;
    EntryPattern::Workspace m_workspace;
    // Of the entry that was read last.
    std::string_view m_entry;
    const Pattern* m_pattern = nullptr; ///< null: it fits none
    EntryPattern::Captures m_captures;
    std::string_view m_reason;
};

RegexFormat::RegexFormat(std::vector<Pattern> patterns, ColumnTexts texts,
                         std::shared_ptr<const TimePattern> times, std::string definition)
    : m_patterns(std::move(patterns)), m_texts(std::move(texts)), m_times(std::move(times)),
      m_definition(std::move(definition)) {}

Result<std::shared_ptr<const EntryFormat>> RegexFormat::make(const FormatDescription& description) {
    if (description.patterns.empty() || description.patterns.size() > mostPatterns) {
        return refused(
            "a format of type \"regex\" has 1 to " + std::to_string(mostPatterns) + " expressions",
            "write one, or a list of them, with captures such as (?P<time>...)", "format");
    }
    std::vector<Pattern> patterns;
    bool hasTime = false;
    for (const std::string& expression : description.patterns) {
        auto compiled = EntryPattern::compile(expression);
        if (!compiled) {
            compiled.error().field = "format";
            return tl::unexpected(std::move(compiled.error()));
        }
        std::vector<std::optional<EntryColumn>> columns;
        for (const std::string& name : compiled->names()) {
            columns.push_back(entryColumnOf(name));
            hasTime |= columns.back() == EntryColumn::time;
        }
        patterns.push_back({std::move(*compiled), std::move(columns)});
    }
    if (!hasTime && !description.timeFormat.empty()) {
        return refused("the format captures no time", "write (?P<time>...) in it", "time_format");
    }
    auto times = TimePattern::compile(description.timeFormat);
    if (!times) {
        return tl::unexpected(std::move(times.error()));
    }
    auto texts = ColumnTexts::make(description);
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    return std::shared_ptr<const EntryFormat>(new RegexFormat(
        std::move(patterns), std::move(*texts), std::move(*times), description.definition()));
}

std::unique_ptr<EntryFormat::Reader> RegexFormat::reader() const {
    return std::make_unique<RegexReader>(*this);
}

} // namespace zrm::host
