#include "host/formats/LogfmtFormat.h"

#include "host/formats/FormatDescription.h"
#include "host/formats/KeyValuePairs.h"
#include "host/formats/TimePattern.h"

#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

class LogfmtFormat::LogfmtReader final : public Reader {
public:
    explicit LogfmtReader(const LogfmtFormat& format)
        : m_format(format), m_times(format.m_columns.times()) {
        m_pairs.reserve(EntryFields::most);
    }

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_entry = {};
        m_reason = "it does not begin with a pair such as level=info";
        if (!KeyValuePairs::begin(entry)) {
            return false;
        }
        JsonColumns found;
        findPairs(entry, found);
        if (!FieldColumns::fill(found, m_times, columns)) {
            m_reason = "the value of its time is not a time";
            return false;
        }
        columns.description = descriptionOf(columns.description);
        m_format.m_columns.complete(entry, columns);
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        if (entry.empty() || entry.data() != m_entry.data() || entry.size() != m_entry.size()) {
            KeyValuePairs::addTo(fields, entry);
            return;
        }
        for (const KeyValuePairs::Pair& pair : m_pairs) {
            KeyValuePairs::addTo(fields, pair);
        }
    }

    std::string_view reason() const noexcept override { return m_reason; }

private:
    void findPairs(std::string_view entry, JsonColumns& found) {
        m_pairs.clear();
        KeyValuePairs pairs(entry);
        bool isComplete = true;
        for (KeyValuePairs::Pair pair; pairs.next(pair);) {
            m_format.m_columns.names().find(
                pair.key, [&](const JsonName& name) { found.add(name, pair.value, false); });
            isComplete = m_pairs.size() < EntryFields::most;
            if (isComplete) {
                m_pairs.push_back(pair);
            }
        }
        m_entry = isComplete ? entry : std::string_view();
    }
    std::string_view descriptionOf(std::string_view value) {
        const bool isQuoted = !value.empty() && value.data()[-1] == '"'; // a key is before it
        if (!isQuoted || value.find('\\') == std::string_view::npos) {
            return value;
        }
        m_description.clear();
        KeyValuePairs::unescape(value, m_description);
        return m_description;
    }

    const LogfmtFormat& m_format;
    TimeMemo m_times;
    std::vector<KeyValuePairs::Pair> m_pairs; ///< those of m_entry
    std::string_view m_entry;  ///< that was read last; without data if its pairs are not all kept
    std::string m_description; ///< with its escapes resolved; grows to the longest one
    std::string_view m_reason;
};

Result<std::shared_ptr<const EntryFormat>>
LogfmtFormat::make(const FormatDescription& description) {
    auto columns = FieldColumns::make(description);
    if (!columns) {
        return tl::unexpected(std::move(columns.error()));
    }
    return std::shared_ptr<const EntryFormat>(
        new LogfmtFormat(std::move(*columns), description.definition()));
}

LogfmtFormat::LogfmtFormat(FieldColumns columns, std::string definition)
    : m_columns(std::move(columns)), m_definition(std::move(definition)) {}

std::unique_ptr<EntryFormat::Reader> LogfmtFormat::reader() const {
    return std::make_unique<LogfmtReader>(*this);
}

} // namespace zrm::host
