#include "host/formats/JsonFormat.h"

#include "host/formats/FlatJson.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/TimePattern.h"

#include <cstring>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::string_view tens[] = {"TRACE", "DEBUG", "INFO", "WARN", "ERROR", "FATAL"};
constexpr std::string_view severities[] = {"emerg",   "alert",  "crit", "err",
                                           "warning", "notice", "info", "debug"};

bool hasName(const JsonCandidate& field, std::string_view name) noexcept {
    return field.name != nullptr && field.name->text == name;
}

/// What the type is, if it is one of the numbers that loggers write for levels.
std::string_view levelOf(const JsonColumns& columns) noexcept {
    const JsonCandidate& level = columns.of(EntryColumn::type);
    const std::string_view number = level.value;
    const char digit = number.empty() ? ' ' : number.front();
    const bool isGelf = hasName(columns.of(EntryColumn::description), "short_message");
    if (hasName(level, "PRIORITY") || (isGelf && hasName(level, "level"))) {
        const bool isSeverity = number.size() == 1 && digit >= '0' && digit <= '7';
        return isSeverity ? severities[digit - '0'] : number;
    }
    const bool isTens = level.isNumber && hasName(level, "level") && number.size() == 2 &&
                        number[1] == '0' && digit >= '1' && digit <= '6';
    return isTens ? tens[digit - '1'] : number;
}

} // namespace

class JsonFormat::JsonReader final : public Reader {
public:
    explicit JsonReader(const JsonFormat& format) : m_format(format), m_fields(format.m_names) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_isTimeWrong = false;
        if (!m_fields.read(entry)) {
            return false;
        }
        const JsonColumns& found = m_fields.columns();
        if (!readTime(found, columns)) {
            m_isTimeWrong = true;
            return false;
        }
        columns.system = found.of(EntryColumn::system).value;
        columns.source = found.of(EntryColumn::source).value;
        columns.type = m_format.m_texts.exchanges(EntryColumn::type)
                           ? found.of(EntryColumn::type).value
                           : levelOf(found);
        columns.entryClass = found.of(EntryColumn::entryClass).value;
        columns.description = found.of(EntryColumn::description).value;
        m_format.m_texts.apply(columns);
        if (columns.description.empty()) {
            columns.description = entry;
        }
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        if (m_fields.isOf(entry) || m_fields.read(entry)) {
            m_fields.addTo(fields);
        }
    }

    std::string_view reason() const noexcept override {
        return m_isTimeWrong ? std::string_view(m_timeReason, m_timeReasonLength)
                             : m_fields.reason();
    }

private:
    /// False if there are fields for the time, but none is one.
    bool readTime(const JsonColumns& found, EntryColumns& columns) noexcept {
        for (const JsonCandidate& candidate : found) {
            if (m_format.m_times->read(candidate.value, columns)) {
                return true;
            }
        }
        if (found.begin() == found.end()) {
            return true;
        }
        m_timeReasonLength = 0;
        appendReason("field ");
        appendReason(found.begin()->name->text);
        appendReason(" is not a time");
        return false;
    }
    void appendReason(std::string_view text) noexcept {
        m_timeReasonLength +=
            text.copy(m_timeReason + m_timeReasonLength, sizeof m_timeReason - m_timeReasonLength);
    }

    const JsonFormat& m_format;
    FlatJson m_fields;
    bool m_isTimeWrong = false;
    char m_timeReason[128]{};
    std::size_t m_timeReasonLength = 0;
};

Result<std::shared_ptr<const EntryFormat>> JsonFormat::make(const FormatDescription& description) {
    if (!description.patterns.empty()) {
        return refused("entries of type \"json\" have no pattern",
                       "leave it out, or choose type \"regex\"", "format");
    }
    for (const auto& [name, field] : description.columns) {
        if (!entryColumnOf(name)) {
            return refused("there is no column \"" + name + "\"", std::string(entryColumnChoice),
                           "columns." + name);
        }
        if (field.size() > EntryFields::longestName) {
            return refused("the name of a field has at most 255 bytes", "", "columns." + name);
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
        new JsonFormat(description, std::move(*texts), std::move(times)));
}

JsonFormat::JsonFormat(const FormatDescription& description, ColumnTexts texts,
                       std::shared_ptr<const TimePattern> times)
    : m_names(description.columns), m_texts(std::move(texts)), m_times(std::move(times)),
      m_definition(description.definition()) {}

std::unique_ptr<EntryFormat::Reader> JsonFormat::reader() const {
    return std::make_unique<JsonReader>(*this);
}

} // namespace zrm::host
