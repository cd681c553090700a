#include "host/formats/SyslogFormat.h"

#include "host/formats/FormatDescription.h"
#include "logtypes/SyslogFields.h"
#include "logtypes/SyslogForms.h"

#include <utility>

namespace zrm::host {

class SyslogFormat::SyslogReader final : public Reader {
public:
    explicit SyslogReader(const SyslogFormat& format) : m_format(format) {}

    bool read(std::string_view entry, EntryColumns& columns) override {
        const SyslogTime time = SyslogForms::recognise(entry);
        columns.hasTime = time.hasTime;
        columns.hasYear = time.hasYear;
        columns.time = time.time;
        columns.offset = time.offset;
        takeApart(entry, time);
        const SyslogParts& parts = m_parts;
        if (const auto priority = SyslogForms::priority(entry)) {
            columns.type = SyslogForms::severityOf(*priority);
            columns.entryClass = SyslogForms::facilityOf(*priority);
        }
        columns.system = parts.host;
        columns.source = sourceOf(parts);
        columns.description = parts.description;
        m_format.m_texts.apply(columns);
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        if (entry.data() != m_line.data() || entry.size() != m_line.size()) {
            takeApart(entry, SyslogForms::recognise(entry));
        }
        SyslogFields::read(entry, m_form, m_parts, fields);
        m_format.m_extracts.read(m_parts.source, m_parts.description, fields, m_workspace);
    }

    std::string_view reason() const noexcept override { return {}; }

private:
    void takeApart(std::string_view line, const SyslogHead& head) {
        m_line = line;
        m_form = head.form;
        m_parts = SyslogForms::split(line, head);
    }
    /// "app[process]", of which the line has the two apart in RFC 5424.
    std::string_view sourceOf(const SyslogParts& parts) {
        if (parts.processId.empty()) {
            return parts.source;
        }
        m_source.assign(parts.source).append("[").append(parts.processId).append("]");
        return m_source;
    }

    const SyslogFormat& m_format;
    // The line that was taken apart last: its fields are mostly asked for next.
    std::string_view m_line = "";
    SyslogHead::Form m_form = SyslogHead::Form::none;
    SyslogParts m_parts;
    std::string m_source;
    FieldExtracts::Workspace m_workspace;
};

SyslogFormat::SyslogFormat(FieldExtracts extracts, ColumnTexts texts, std::string definition)
    : m_extracts(std::move(extracts)), m_texts(std::move(texts)),
      m_definition(std::move(definition)) {}

Result<std::shared_ptr<const EntryFormat>>
SyslogFormat::make(const FormatDescription& description) {
    auto extracts = FieldExtracts::make(description.extracts);
    if (!extracts) {
        return tl::unexpected(std::move(extracts.error()));
    }
    auto texts = ColumnTexts::make(description);
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    return std::shared_ptr<const EntryFormat>(
        new SyslogFormat(std::move(*extracts), std::move(*texts), description.definition()));
}

std::unique_ptr<EntryFormat::Reader> SyslogFormat::reader() const {
    return std::make_unique<SyslogReader>(*this);
}

} // namespace zrm::host
