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
    explicit JsonReader(const JsonFormat& format)
        : m_format(format), m_fields(format.m_columns.names()), m_times(format.m_columns.times()) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        m_isTimeWrong = false;
        if (!m_fields.read(entry)) {
            return false;
        }
        const JsonColumns& found = m_fields.columns();
        if (!FieldColumns::fill(found, m_times, columns)) {
            nameTime(found.begin()->name->text);
            return false;
        }
        if (!m_format.m_columns.exchanges(EntryColumn::type)) {
            columns.type = levelOf(found);
        }
        m_format.m_columns.complete(entry, columns);
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
    /// The field is not a time.
    void nameTime(std::string_view field) noexcept {
        m_isTimeWrong = true;
        m_timeReasonLength = 0;
        appendReason("field ");
        appendReason(field);
        appendReason(" is not a time");
    }
    void appendReason(std::string_view text) noexcept {
        m_timeReasonLength +=
            text.copy(m_timeReason + m_timeReasonLength, sizeof m_timeReason - m_timeReasonLength);
    }

    const JsonFormat& m_format;
    FlatJson m_fields;
    TimeMemo m_times;
    bool m_isTimeWrong = false;
    char m_timeReason[128]{};
    std::size_t m_timeReasonLength = 0;
};

Result<std::shared_ptr<const EntryFormat>> JsonFormat::make(const FormatDescription& description) {
    if (!description.patterns.empty()) {
        return refused("entries of type \"json\" have no pattern",
                       "leave it out, or choose type \"regex\"", "format");
    }
    auto columns = FieldColumns::make(description);
    if (!columns) {
        return tl::unexpected(std::move(columns.error()));
    }
    return std::shared_ptr<const EntryFormat>(
        new JsonFormat(std::move(*columns), description.definition()));
}

JsonFormat::JsonFormat(FieldColumns columns, std::string definition)
    : m_columns(std::move(columns)), m_definition(std::move(definition)) {}

std::unique_ptr<EntryFormat::Reader> JsonFormat::reader() const {
    return std::make_unique<JsonReader>(*this);
}

} // namespace zrm::host
