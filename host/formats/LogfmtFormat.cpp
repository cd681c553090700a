#include "host/formats/LogfmtFormat.h"

#include "host/formats/FormatDescription.h"
#include "host/formats/KeyValuePairs.h"
#include "host/formats/TimePattern.h"

#include <string_view>
#include <utility>

namespace zrm::host {

class LogfmtFormat::LogfmtReader final : public Reader {
public:
    explicit LogfmtReader(const LogfmtFormat& format) : m_format(format) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_reason = "it does not begin with a pair such as level=info";
        if (!KeyValuePairs::begin(entry)) {
            return false;
        }
        JsonColumns found;
        KeyValuePairs pairs(entry);
        for (KeyValuePairs::Pair pair; pairs.next(pair);) {
            m_format.m_names.find(
                pair.key, [&](const JsonName& name) { found.add(name, pair.value, false); });
        }
        if (!readTime(found, columns)) {
            m_reason = "the value of its time is not a time";
            return false;
        }
        columns.system = found.of(EntryColumn::system).value;
        columns.source = found.of(EntryColumn::source).value;
        columns.type = found.of(EntryColumn::type).value;
        columns.entryClass = found.of(EntryColumn::entryClass).value;
        columns.description = descriptionOf(found);
        m_format.m_texts.apply(columns);
        if (columns.description.empty()) {
            columns.description = entry;
        }
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        KeyValuePairs::addTo(fields, entry);
    }

    std::string_view reason() const noexcept override { return m_reason; }

private:
    /// False if there are pairs for the time, but none is one.
    bool readTime(const JsonColumns& found, EntryColumns& columns) const noexcept {
        for (const JsonCandidate& candidate : found) {
            if (m_format.m_times->read(candidate.value, columns)) {
                return true;
            }
        }
        return found.begin() == found.end();
    }

    std::string_view descriptionOf(const JsonColumns& found) {
        const std::string_view value = found.of(EntryColumn::description).value;
        const bool isQuoted = !value.empty() && value.data()[-1] == '"'; // a key is before it
        if (!isQuoted || value.find('\\') == std::string_view::npos) {
            return value;
        }
        m_description.clear();
        KeyValuePairs::unescape(value, m_description);
        return m_description;
    }

    const LogfmtFormat& m_format;
    std::string m_description; ///< with its escapes resolved; grows to the longest one
    std::string_view m_reason;
};

Result<std::shared_ptr<const EntryFormat>>
LogfmtFormat::make(const FormatDescription& description) {
    for (const auto& [name, key] : description.columns) {
        if (!entryColumnOf(name)) {
            return refused("there is no column \"" + name + "\"", std::string(entryColumnChoice),
                           "columns." + name);
        }
    }
    auto texts = ColumnTexts::make(description);
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    std::shared_ptr<const TimePattern> times = TimePattern::common();
    if (!description.timeFormat.empty()) {
        auto compiled = TimePattern::compile(description.timeFormat);
        if (!compiled) {
            compiled.error().field = "time_format";
            return tl::unexpected(std::move(compiled.error()));
        }
        times = std::move(*compiled);
    }
    return std::shared_ptr<const EntryFormat>(
        new LogfmtFormat(description, std::move(*texts), std::move(times)));
}

LogfmtFormat::LogfmtFormat(const FormatDescription& description, ColumnTexts texts,
                           std::shared_ptr<const TimePattern> times)
    : m_names(description.columns), m_texts(std::move(texts)), m_times(std::move(times)),
      m_definition(description.definition()) {}

std::unique_ptr<EntryFormat::Reader> LogfmtFormat::reader() const {
    return std::make_unique<LogfmtReader>(*this);
}

} // namespace zrm::host
