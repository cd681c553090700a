#include "host/formats/MessageFormat.h"

#include "host/formats/FormatDescription.h"
#include "host/formats/KeyValuePairs.h"

#include <utility>

namespace zrm::host {

namespace {

/// Whether the messages themselves are what expressions are for, without a format of their own.
bool isPlain(const FormatDescription& description) {
    return description.type == "journal" || description.type == "syslog";
}

Result<std::shared_ptr<const EntryFormat>> linesOf(const FormatDescription& description) {
    if (isPlain(description)) {
        return nullptr;
    }
    if (!description.unwrap.empty() || description.type == "wtmp") {
        return refused("is not a format of a program's messages",
                       "name the format in which the program writes its lines", "format");
    }
    return makeFormat(description);
}

} // namespace

Result<std::shared_ptr<const MessageFormat>>
MessageFormat::make(const FormatDescription& description) {
    auto lines = linesOf(description);
    if (!lines) {
        return tl::unexpected(std::move(lines.error()));
    }
    auto extracts = FieldExtracts::make(description.extracts);
    if (!extracts) {
        return tl::unexpected(std::move(extracts.error()));
    }
    auto texts = ColumnTexts::make(isPlain(description) ? description : FormatDescription());
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    return std::shared_ptr<const MessageFormat>(
        new MessageFormat(description, std::move(*extracts), std::move(*texts), std::move(*lines)));
}

MessageFormat::MessageFormat(const FormatDescription& description, FieldExtracts extracts,
                             ColumnTexts texts, std::shared_ptr<const EntryFormat> lines)
    : m_extracts(std::move(extracts)), m_texts(std::move(texts)),
      m_hasPairs(description.pairs && lines == nullptr), m_lines(std::move(lines)),
      m_definition(description.definition()) {}

MessageFormat::Reader::Reader(const MessageFormat& format)
    : m_format(format), m_lines(format.m_lines ? format.m_lines->reader() : nullptr) {}

void MessageFormat::Reader::read(EntryColumns& columns) {
    if (!m_lines) {
        m_format.m_texts.apply(columns);
        return;
    }
    EntryColumns found;
    m_fits = m_lines->read(columns.description, found);
    if (m_fits && !found.type.empty()) {
        columns.type = found.type;
    }
    if (m_fits && !found.description.empty()) {
        columns.description = found.description;
    }
}

void MessageFormat::Reader::readFields(std::string_view source, std::string_view message,
                                       EntryFields& fields) {
    if (m_lines && m_fits) {
        m_lines->readFields(message, fields);
    }
    m_format.m_extracts.read(source, message, fields, m_workspace);
    if (m_format.m_hasPairs) {
        KeyValuePairs::addTo(fields, message);
    }
}

} // namespace zrm::host
